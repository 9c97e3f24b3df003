#pragma once

// The buffered file writer and reader of design databases: fields of the
// record format that Orb_ModelIO.h describes (tags, decimal numbers,
// "<length>:<bytes>" strings). Internal to the platform.

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace Orb_IO {

// A path as messages quote it: whole, in single quotes.
std::string QuotePath(std::string_view path);

// The longest string (name or value) a database holds: a save refuses a
// longer one, and an open refuses a longer length before it reads any byte.
constexpr std::uint64_t kMaxString = std::uint64_t(1) << 30;

// Writes a temporary file next to the target through a buffer. Commit syncs
// it and renames it over the target; until then the destructor removes it,
// so a failed save leaves the target as it was. The target is the file a
// symbolic link at the path leads to (the link stays), and a file it
// replaces passes on its permission bits.
class ByteWriter {
public:
  explicit ByteWriter(std::string const &path);
  ByteWriter(ByteWriter const &) = delete;
  ByteWriter &operator=(ByteWriter const &) = delete;
  ~ByteWriter();

  void Raw(std::string_view data);
  void Tag(char tag) { Raw(std::string_view(&tag, 1)); }
  void Num(std::uint64_t value);
  void Str(std::string_view text);
  void End() { Raw("\n"); }
  // A whole record of a tag and one string.
  void Named(char tag, std::string_view name) {
    Tag(tag);
    Str(name);
    End();
  }

  // Throws Orb_Exception naming the target if the data cannot be made
  // durable or the rename fails.
  void Commit();
  // Throws Orb_Exception naming the target and `what`.
  [[noreturn]] void Refuse(std::string const &what) const;

private:
  [[noreturn]] void Fail(char const *step, int error) const;
  void Flush();

  std::string m_Path;
  std::string m_Target;
  std::string m_TempPath;
  int m_Fd = -1;
  bool m_Committed = false;
  // The permission bits of the file being replaced; -1 when there is none.
  int m_Mode = -1;
  std::string m_Buffer;
};

// Reads a design database through a buffer, field by field. Every failure
// throws Orb_Exception naming the file and, for broken data, the offset.
class ByteReader {
public:
  explicit ByteReader(std::string const &path);
  ByteReader(ByteReader const &) = delete;
  ByteReader &operator=(ByteReader const &) = delete;
  ~ByteReader();

  // The next byte, or -1 at the end of the file.
  int Get() {
    if (m_Pos == m_Size && !Fill())
      return -1;
    return static_cast<unsigned char>(m_Buffer[m_Pos++]);
  }

  // A record's tag; the end of the file here means the file was cut.
  char Tag();
  std::uint64_t Num();
  // A string of any bytes.
  void Str(std::string &out);
  // A string without NUL.
  void Name(std::string &out);
  void End() { Expect('\n', "end of record"); }

  [[noreturn]] void Refuse(std::string const &what) const;
  [[noreturn]] void Truncated() const;
  [[noreturn]] void Corrupt(std::string const &what) const;

private:
  bool Fill();
  void Expect(char expected, char const *what);
  std::uint64_t Digits();

  std::string m_Path;
  int m_Fd = -1;
  // The size of a regular file; UINT64_MAX for anything else.
  std::uint64_t m_FileSize = UINT64_MAX;
  std::vector<char> m_Buffer;
  std::size_t m_Pos = 0;
  std::size_t m_Size = 0;
  std::uint64_t m_BufferOffset = 0;
};

} // namespace Orb_IO

#pragma once

// A file mapped read-only into memory, for the readers: a large file costs
// address space and page cache, not heap. `padding` zero bytes follow the
// contents (simdjson reads a little past the end).

#include <cstddef>
#include <string>
#include <string_view>

class Lum_MappedFile {
public:
  // Throws Lum_ExceptionInvalidFormat naming the file when it cannot be
  // opened, is not a regular file or cannot be mapped.
  explicit Lum_MappedFile(std::string const &path, std::size_t padding = 0);
  ~Lum_MappedFile();
  Lum_MappedFile(Lum_MappedFile const &) = delete;
  Lum_MappedFile &operator=(Lum_MappedFile const &) = delete;

  char const *Data() const { return m_Base; }
  std::size_t Size() const { return m_Size; }
  std::string_view Text() const { return {m_Base, m_Size}; }

private:
  char *m_Base = nullptr;
  std::size_t m_Length = 0; // the whole mapping: contents, padding, rounded to pages
  std::size_t m_Size = 0;
};

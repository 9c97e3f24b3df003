#pragma once

// The lexical level of the Liberty reader: bytes, blanks, comments,
// backslash-newline continuations, names, quoted strings and values, and
// skipping whole groups by brace matching. A file is streamed through a
// fixed window, so memory stays bounded whatever the file's size; text in
// memory is read in place. Tokens are views into the window (no allocation
// per token), valid until the next call. Every failure throws
// Lum_ExceptionInvalidFormat with the file, line and column.

#include <cstddef>
#include <cstdio>
#include <string>
#include <string_view>
#include <vector>

class Lum_LibertyScanner {
public:
  struct Position {
    std::size_t line = 0;
    std::size_t column = 0;
  };
  // The longest name or value the reader keeps; longer ones are refused.
  static constexpr std::size_t kMaxToken = 64 * 1024;
  // How deep groups may nest.
  static constexpr unsigned kMaxDepth = 256;

  // Over text that the caller keeps alive while the scanner is used.
  Lum_LibertyScanner(std::string_view text, std::string path);
  // Over an open file, read from its current position through a window.
  Lum_LibertyScanner(std::FILE *file, std::string path);

  // The next byte, or -1 at the end of the input; Advance moves past it.
  int Peek() {
    if (m_Cur < m_End || Refill())
      return static_cast<unsigned char>(*m_Cur);
    return -1;
  }
  int PeekAt(std::size_t ahead);
  void Advance();
  Position Where() const;
  std::string const &GetPath() const { return m_Path; }

  [[noreturn]] void Fail(Position at, std::string const &what) const;
  // "'x'", "a newline", "byte 0x00", "the end of the file".
  static std::string Describe(int c);

  // Skips blanks, comments and continuations. With stopAtNewline it stops
  // before a newline; returns whether it stopped at or crossed one.
  bool SkipBlanks(bool stopAtNewline);
  // A bare name; `inArgs` lets it hold ':' (bus ranges "A[3:0]"). Empty
  // when the next byte cannot start one.
  std::string_view Name(bool inArgs);
  // A quoted string from its opening quote; its contents without the quotes
  // when kept, else empty (it is streamed past, whatever its length).
  std::string_view Quoted(bool keep);
  // A bare value up to ';', a newline, '}' or a comment, without trailing
  // blanks.
  std::string_view BareValue();
  // From after '(' to after its matching ')', uninterpreted.
  void SkipArgs(Position open);
  // From after '{' to after its matching '}', uninterpreted; `depth` is the
  // nesting of the group itself.
  void SkipGroup(Position open, unsigned depth);

  // Copies a kept token, dropping backslash-newline continuations.
  static void Assign(std::string &out, std::string_view token);

private:
  bool Refill();
  void SkipBlockComment();
  void SkipLineComment();
  void NewLine(char const *at);
  void BeginToken() { m_Mark = m_Cur; }
  std::string_view EndToken(Position at);
  std::size_t Offset(char const *p) const { return m_Base + static_cast<std::size_t>(p - m_Begin); }

  std::string m_Path;
  std::FILE *m_File = nullptr;
  std::vector<char> m_Window;
  char const *m_Begin = nullptr; // window or text start, at offset m_Base
  char const *m_Cur = nullptr;
  char const *m_End = nullptr;
  char const *m_Mark = nullptr; // start of the token being kept, or null
  std::size_t m_Base = 0;
  std::size_t m_Line = 1;
  std::size_t m_LineStart = 0; // offset of the current line's first byte
};

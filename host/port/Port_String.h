#pragma once

#include "Lum_PlatformApi.h"

#include <cstdarg>
#include <cstddef>
#include <string>

namespace Port {

// Byte string of the portability layer. Equality compares length and bytes;
// ordering compares bytes as unsigned values, a prefix before any longer
// string that begins with it.
template <class C> class StringBase;

template <> class LUM_PLATFORM_API StringBase<char> {
public:
  StringBase() = default;
  StringBase(char const *text) : m_Text(text ? text : "") {}
  StringBase(char const *text, std::size_t length) : m_Text(text, length) {}
  explicit StringBase(std::string text) : m_Text(std::move(text)) {}

  char const *c_str() const { return m_Text.c_str(); }
  std::size_t length() const { return m_Text.size(); }
  bool empty() const { return m_Text.empty(); }
  std::string const &str() const { return m_Text; }

  StringBase &operator+=(StringBase const &other) {
    m_Text += other.m_Text;
    return *this;
  }
  StringBase &operator+=(char const *text) {
    m_Text += text ? text : "";
    return *this;
  }
  StringBase &operator+=(char c) {
    m_Text += c;
    return *this;
  }

  // Replaces the contents with the formatted text (Port::vformat below).
  StringBase &doFormat(char const *format, ...);

  // Replaces every occurrence of `from` by `to`; returns how many were
  // replaced. An empty `from` replaces nothing.
  std::size_t Replace(StringBase const &from, StringBase const &to);

  // Finds the next token at or after `pos`, skipping any of `delimiters`.
  // Sets [begin, end) and returns true, or returns false when none is left.
  bool NextTokenRange(std::size_t pos, char const *delimiters, std::size_t &begin,
                      std::size_t &end) const;

  friend bool operator==(StringBase const &a, StringBase const &b) { return a.m_Text == b.m_Text; }
  friend bool operator!=(StringBase const &a, StringBase const &b) { return !(a == b); }
  // std::string compares through char_traits<char>, which orders bytes as
  // unsigned values.
  friend bool operator<(StringBase const &a, StringBase const &b) { return a.m_Text < b.m_Text; }

private:
  std::string m_Text;
};

// A small std::sscanf with defined behaviour on any input. The format may
// hold white space (matching any run of white space, also none), literal
// bytes, "%%", and the conversions %d (int *) and %u (unsigned *), each
// skipping leading white space and reading an optionally signed decimal
// number. A number out of its type's range (int for %d; a magnitude above
// UINT_MAX for %u, where a minus sign negates as strtoul does) is a failed
// conversion: its argument is left alone and scanning stops there. Any
// other conversion stops the scan too and reads no argument. Returns the
// count of assigned arguments, or EOF when the text ends before the first
// conversion.
LUM_PLATFORM_API int sscanf(char const *text, char const *format, ...)
    __attribute__((format(scanf, 2, 3)));

// Safe printf-style formatting shared by the printer, the messages and
// StringBase::doFormat. A conversion is '%', flags ("-0+ #"), a width, a
// precision (".digits", each at most 65535) and one of: %d int, %u
// unsigned, %c int, %s char const * (null prints "(null)"; the precision
// caps the bytes taken), %x uintptr_t ('#' adds "0x"), %lU uint64_t, %%.
// Each reads exactly one argument of that size. An unknown, malformed or
// unfinished conversion ends the formatting: the rest of the format is
// copied as it stands and no further argument is read.
LUM_PLATFORM_API std::string vformat(char const *format, va_list args);
LUM_PLATFORM_API std::string format(char const *format, ...);

} // namespace Port

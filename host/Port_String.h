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

  // Replaces the contents with the formatted text. Conversions: %s (null
  // prints "(null)"), %d, %u, %x (uintptr_t), %lU (uint64_t), %c, %%.
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

// As std::sscanf.
LUM_PLATFORM_API int sscanf(char const *text, char const *format, ...)
    __attribute__((format(scanf, 2, 3)));

// Safe printf-style formatting shared by the printer, the messages and
// StringBase::doFormat. Each conversion reads exactly one argument of the
// documented size: %d int, %u unsigned, %c int, %s char const *, %x uintptr_t,
// %lU uint64_t. Anything else is copied as it stands and reads nothing.
LUM_PLATFORM_API std::string vformat(char const *format, va_list args);
LUM_PLATFORM_API std::string format(char const *format, ...);

} // namespace Port

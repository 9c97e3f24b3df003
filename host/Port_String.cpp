#include "Port_String.h"

#include <cinttypes>
#include <cstdint>
#include <cstdio>

namespace Port {

namespace {

void AppendUnsigned(std::string &out, std::uint64_t value, unsigned base) {
  char digits[32];
  int n = 0;
  do {
    unsigned digit = static_cast<unsigned>(value % base);
    digits[n++] = static_cast<char>(digit < 10 ? '0' + digit : 'a' + (digit - 10));
    value /= base;
  } while (value != 0);
  while (n > 0)
    out += digits[--n];
}

} // namespace

std::string vformat(char const *format, va_list args) {
  std::string out;
  if (!format)
    return out;
  for (char const *p = format; *p; ++p) {
    if (*p != '%') {
      out += *p;
      continue;
    }
    char const c = p[1];
    switch (c) {
    case '%':
      out += '%';
      ++p;
      break;
    case 's': {
      char const *text = va_arg(args, char const *);
      out += text ? text : "(null)";
      ++p;
      break;
    }
    case 'd': {
      int value = va_arg(args, int);
      if (value < 0) {
        out += '-';
        AppendUnsigned(out, static_cast<std::uint64_t>(-static_cast<std::int64_t>(value)), 10);
      } else {
        AppendUnsigned(out, static_cast<std::uint64_t>(value), 10);
      }
      ++p;
      break;
    }
    case 'u':
      AppendUnsigned(out, va_arg(args, unsigned), 10);
      ++p;
      break;
    case 'c':
      out += static_cast<char>(va_arg(args, int));
      ++p;
      break;
    case 'x':
      AppendUnsigned(out, va_arg(args, std::uintptr_t), 16);
      ++p;
      break;
    case 'l':
      if (p[2] == 'U') {
        AppendUnsigned(out, va_arg(args, std::uint64_t), 10);
        p += 2;
      } else {
        out += '%';
      }
      break;
    default:
      // Unknown or truncated conversion: copied, no argument read.
      out += '%';
      break;
    }
  }
  return out;
}

std::string format(char const *fmt, ...) {
  va_list args;
  va_start(args, fmt);
  std::string text = vformat(fmt, args);
  va_end(args);
  return text;
}

int sscanf(char const *text, char const *fmt, ...) {
  va_list args;
  va_start(args, fmt);
  int const n = std::vsscanf(text ? text : "", fmt, args);
  va_end(args);
  return n;
}

StringBase<char> &StringBase<char>::doFormat(char const *fmt, ...) {
  va_list args;
  va_start(args, fmt);
  m_Text = vformat(fmt, args);
  va_end(args);
  return *this;
}

std::size_t StringBase<char>::Replace(StringBase const &from, StringBase const &to) {
  if (from.m_Text.empty())
    return 0;
  std::size_t count = 0;
  std::string out;
  std::size_t pos = 0;
  for (;;) {
    std::size_t const hit = m_Text.find(from.m_Text, pos);
    if (hit == std::string::npos)
      break;
    out.append(m_Text, pos, hit - pos);
    out += to.m_Text;
    pos = hit + from.m_Text.size();
    ++count;
  }
  if (count != 0) {
    out.append(m_Text, pos, std::string::npos);
    m_Text.swap(out);
  }
  return count;
}

bool StringBase<char>::NextTokenRange(std::size_t pos, char const *delimiters, std::size_t &begin,
                                      std::size_t &end) const {
  char const *delims = delimiters ? delimiters : "";
  std::size_t const start = m_Text.find_first_not_of(delims, pos);
  if (start == std::string::npos)
    return false;
  std::size_t stop = m_Text.find_first_of(delims, start);
  begin = start;
  end = stop == std::string::npos ? m_Text.size() : stop;
  return true;
}

} // namespace Port

#include "Port_String.h"

#include <climits>
#include <cstdint>
#include <cstdio>
#include <string_view>

namespace Port {

namespace {

// Widths and precisions above this are refused as malformed: a format is
// text, and a typo must not make the printer allocate gigabytes.
constexpr unsigned kMaxField = 65535;

// One conversion's flags, width and precision.
struct Conversion {
  bool left = false;  // '-'
  bool zero = false;  // '0'
  bool plus = false;  // '+'
  bool space = false; // ' '
  bool alt = false;   // '#'
  unsigned width = 0;
  int precision = -1; // -1: none given
};

// Reads a decimal field at p, advancing it. False when it exceeds kMaxField.
bool ReadField(char const *&p, unsigned &value) {
  value = 0;
  while (*p >= '0' && *p <= '9') {
    value = value * 10 + static_cast<unsigned>(*p++ - '0');
    if (value > kMaxField)
      return false;
  }
  return true;
}

// Appends the body, padded with blanks to the width.
void Pad(std::string &out, Conversion const &conv, std::string_view body) {
  std::size_t const fill = conv.width > body.size() ? conv.width - body.size() : 0;
  if (!conv.left)
    out.append(fill, ' ');
  out.append(body);
  if (conv.left)
    out.append(fill, ' ');
}

// A number as printf lays it out: sign or prefix, zeros up to the
// precision, then padding to the width (zeros with '0' unless '-' or a
// precision is given).
void AppendNumber(std::string &out, Conversion const &conv, std::string_view prefix,
                  std::uint64_t magnitude, unsigned base) {
  char digits[32];
  int n = 0;
  // A zero precision prints nothing for the value zero.
  if (magnitude != 0 || conv.precision != 0) {
    do {
      auto const digit = static_cast<unsigned>(magnitude % base);
      digits[n++] = static_cast<char>(digit < 10 ? '0' + digit : 'a' + (digit - 10));
      magnitude /= base;
    } while (magnitude != 0);
  }
  std::size_t zeros =
      conv.precision > n ? static_cast<std::size_t>(conv.precision - n) : std::size_t(0);
  std::size_t const length = prefix.size() + zeros + static_cast<std::size_t>(n);
  if (conv.zero && !conv.left && conv.precision < 0 && conv.width > length)
    zeros += conv.width - length;
  std::string body(prefix);
  body.append(zeros, '0');
  while (n > 0)
    body += digits[--n];
  Pad(out, conv, body);
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
    char const *const start = p++;
    Conversion conv;
    for (;; ++p) {
      if (*p == '-')
        conv.left = true;
      else if (*p == '0')
        conv.zero = true;
      else if (*p == '+')
        conv.plus = true;
      else if (*p == ' ')
        conv.space = true;
      else if (*p == '#')
        conv.alt = true;
      else
        break;
    }
    bool valid = ReadField(p, conv.width);
    if (valid && *p == '.') {
      unsigned precision = 0;
      valid = ReadField(++p, precision);
      conv.precision = static_cast<int>(precision);
    }
    // The conversion; '\0' for one that is unknown or malformed. 'U' stands
    // for %lU and is unknown on its own.
    char conversion = valid ? *p : '\0';
    if (conversion == 'U')
      conversion = '\0';
    else if (conversion == 'l')
      conversion = p[1] == 'U' ? (++p, 'U') : '\0';
    switch (conversion) {
    case '%':
      out += '%';
      break;
    case 's': {
      char const *text = va_arg(args, char const *);
      std::string_view value = text ? text : "(null)";
      if (conv.precision >= 0 && value.size() > static_cast<std::size_t>(conv.precision))
        value = value.substr(0, static_cast<std::size_t>(conv.precision));
      Pad(out, conv, value);
      break;
    }
    case 'c': {
      char const c = static_cast<char>(va_arg(args, int));
      Pad(out, conv, std::string_view(&c, 1));
      break;
    }
    case 'd': {
      int const value = va_arg(args, int);
      // Through int64: the magnitude of INT_MIN does not fit an int.
      auto const wide = static_cast<std::int64_t>(value);
      std::string_view const sign = value < 0 ? "-" : conv.plus ? "+" : conv.space ? " " : "";
      AppendNumber(out, conv, sign, static_cast<std::uint64_t>(value < 0 ? -wide : wide), 10);
      break;
    }
    case 'u':
      AppendNumber(out, conv, "", va_arg(args, unsigned), 10);
      break;
    case 'x': {
      std::uintptr_t const value = va_arg(args, std::uintptr_t);
      AppendNumber(out, conv, conv.alt && value != 0 ? "0x" : "", value, 16);
      break;
    }
    case 'U':
      AppendNumber(out, conv, "", va_arg(args, std::uint64_t), 10);
      break;
    default:
      // Unknown, malformed or cut short: the arguments that follow can no
      // longer be matched to conversions, so the rest is text.
      out.append(start);
      return out;
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

namespace {

bool IsSpace(char c) { return c == ' ' || (c >= '\t' && c <= '\r'); }

// Reads an optionally signed decimal number at p, advancing past it. False,
// with p unchanged, when there is no digit; sets `overflow` when the
// magnitude exceeds `limit`.
bool ReadNumber(char const *&p, std::uint64_t limit, bool &negative, std::uint64_t &magnitude,
                bool &overflow) {
  char const *q = p;
  negative = *q == '-';
  if (*q == '-' || *q == '+')
    ++q;
  if (*q < '0' || *q > '9')
    return false;
  magnitude = 0;
  overflow = false;
  for (; *q >= '0' && *q <= '9'; ++q) {
    if (!overflow) {
      magnitude = magnitude * 10 + static_cast<unsigned>(*q - '0');
      overflow = magnitude > limit;
    }
  }
  p = q;
  return true;
}

} // namespace

int sscanf(char const *text, char const *fmt, ...) {
  char const *in = text ? text : "";
  char const *f = fmt ? fmt : "";
  // Becomes EOF when the input ends before the first conversion, as with
  // std::sscanf.
  int assigned = 0;
  va_list args;
  va_start(args, fmt);
  while (*f) {
    if (IsSpace(*f)) {
      while (IsSpace(*f))
        ++f;
      while (IsSpace(*in))
        ++in;
      continue;
    }
    if (*f != '%' || f[1] == '%') {
      // A literal; "%%" matches '%' after any white space.
      if (*f == '%') {
        while (IsSpace(*in))
          ++in;
        ++f;
      }
      if (*in == '\0' && assigned == 0)
        assigned = EOF;
      if (*in != *f)
        break;
      ++in;
      ++f;
      continue;
    }
    char const conversion = f[1];
    if (conversion != 'd' && conversion != 'u')
      break;
    f += 2;
    while (IsSpace(*in))
      ++in;
    if (*in == '\0') {
      if (assigned == 0)
        assigned = EOF;
      break;
    }
    bool negative = false;
    bool overflow = false;
    std::uint64_t magnitude = 0;
    if (conversion == 'd') {
      // INT_MIN's magnitude is one more than INT_MAX.
      std::uint64_t const limit = static_cast<std::uint64_t>(INT_MAX) + 1;
      if (!ReadNumber(in, limit, negative, magnitude, overflow) || overflow ||
          (!negative && magnitude > static_cast<std::uint64_t>(INT_MAX)))
        break;
      *va_arg(args, int *) = negative ? static_cast<int>(-static_cast<std::int64_t>(magnitude))
                                      : static_cast<int>(magnitude);
    } else {
      if (!ReadNumber(in, UINT_MAX, negative, magnitude, overflow) || overflow)
        break;
      // As strtoul: a minus sign negates in the unsigned type.
      auto const value = static_cast<unsigned>(magnitude);
      *va_arg(args, unsigned *) = negative ? 0u - value : value;
    }
    ++assigned;
  }
  va_end(args);
  return assigned;
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

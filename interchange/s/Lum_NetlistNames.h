#pragma once

// How the netlist mapping names pins and signals after ports and nets, and
// how it writes a port's or a net's declaration into a property value.

#include "Lum_Netlist.h"

#include <algorithm>
#include <charconv>
#include <cstdint>
#include <string>
#include <string_view>
#include <utility>

namespace Lum_NetlistNames {

// The name of bit `position` of a vector: the vector's name for a one-bit
// vector without an index, else "name[index]".
inline std::string BitName(std::string_view name, Lum_NetlistVector const &vector,
                           std::uint32_t position) {
  std::string text(name);
  if (vector.bits.width == 1 && vector.offset == 0 && !vector.upto)
    return text;
  text += '[';
  text += std::to_string(vector.IndexOf(position));
  text += ']';
  return text;
}

// "B[3]" -> ("B", 3); any other name -> (name, 0), and `indexed` false. The
// base views the given text.
inline std::pair<std::string_view, std::int64_t> SplitBitName(std::string_view name,
                                                              bool *indexed = nullptr) {
  if (indexed)
    *indexed = false;
  std::size_t const open = name.rfind('[');
  if (open == std::string_view::npos || open == 0 || name.back() != ']' || open + 2 >= name.size())
    return {name, 0};
  std::string_view const digits = name.substr(open + 1, name.size() - open - 2);
  std::size_t const start = digits[0] == '-' ? 1 : 0;
  if (start == digits.size() || digits.size() > 10 ||
      digits.find_first_not_of("0123456789", start) != std::string_view::npos)
    return {name, 0};
  if (indexed)
    *indexed = true;
  std::int64_t value = 0;
  for (std::size_t i = start; i < digits.size(); ++i)
    value = value * 10 + (digits[i] - '0');
  return {name.substr(0, open), start ? -value : value};
}

inline char const *DirectionWord(Lum_NetlistDirection direction) {
  switch (direction) {
  case Lum_NetlistDirection::Input:
    return "input";
  case Lum_NetlistDirection::Output:
    return "output";
  case Lum_NetlistDirection::Inout:
    return "inout";
  default:
    return "unknown";
  }
}

inline Lum_NetlistDirection DirectionOf(std::string_view word) {
  return word == "input"    ? Lum_NetlistDirection::Input
         : word == "output" ? Lum_NetlistDirection::Output
         : word == "inout"  ? Lum_NetlistDirection::Inout
                            : Lum_NetlistDirection::Unknown;
}

namespace Detail {
// "<width> <offset> <upto> <signed>", then " <hidden>" for a net; made in
// a local buffer, so that the short result allocates nothing.
inline std::string Meta(char const *direction, Lum_NetlistVector const &vector, bool net) {
  char text[64];
  char *at = text;
  for (char const *c = direction; c && *c; ++c)
    *at++ = *c;
  if (direction)
    *at++ = ' ';
  at = std::to_chars(at, text + 24, vector.bits.width).ptr;
  *at++ = ' ';
  at = std::to_chars(at, text + 48, vector.offset).ptr;
  *at++ = ' ';
  *at++ = vector.upto ? '1' : '0';
  *at++ = ' ';
  *at++ = vector.isSigned ? '1' : '0';
  if (net) {
    *at++ = ' ';
    *at++ = vector.hidden ? '1' : '0';
  }
  return std::string(text, at);
}
} // namespace Detail

// "<direction> <width> <offset> <upto> <signed>"
inline std::string PortMeta(Lum_NetlistVector const &port) {
  return Detail::Meta(DirectionWord(port.direction), port, false);
}

// "<width> <offset> <upto> <signed> <hidden>"
inline std::string NetMeta(Lum_NetlistVector const &net) {
  return Detail::Meta(nullptr, net, true);
}

// Reads a value PortMeta or NetMeta wrote into `vector` (its width into
// bits.width); false when the text is not one.
inline bool ParseMeta(std::string_view text, bool port, Lum_NetlistVector &vector) {
  // The next blank-separated word of `text`, consumed.
  // (A plain loop: find_first_of with a set costs a search per character.)
  auto word = [&text]() {
    auto blank = [](char c) { return c == ' ' || c == '\t'; };
    std::size_t start = 0;
    while (start < text.size() && blank(text[start]))
      ++start;
    std::size_t end = start;
    while (end < text.size() && !blank(text[end]))
      ++end;
    std::string_view const found = text.substr(start, end - start);
    text.remove_prefix(end);
    return found;
  };
  auto number = [&word](auto &value) {
    std::string_view const digits = word();
    auto const [end, error] = std::from_chars(digits.data(), digits.data() + digits.size(), value);
    return error == std::errc() && end == digits.data() + digits.size();
  };
  Lum_NetlistDirection direction = Lum_NetlistDirection::Unknown;
  if (port) {
    std::string_view const name = word();
    if (name.empty())
      return false;
    direction = DirectionOf(name);
  }
  std::uint32_t width = 0;
  std::int32_t offset = 0;
  int upto = 0;
  int isSigned = 0;
  int hidden = 0;
  if (!number(width) || !number(offset) || !number(upto) || !number(isSigned) ||
      (!port && !number(hidden)))
    return false;
  if (port)
    vector.direction = direction;
  vector.bits.width = width;
  vector.offset = offset;
  vector.upto = upto != 0;
  vector.isSigned = isSigned != 0;
  vector.hidden = hidden != 0;
  return true;
}

// A module's name as a type block name: a type block name cannot hold ":".
inline std::string TypeBlockName(std::string const &module) {
  std::string name;
  for (char c : module) {
    if (c == '%')
      name += "%25";
    else if (c == ':')
      name += "%3A";
    else
      name += c;
  }
  return name;
}

} // namespace Lum_NetlistNames

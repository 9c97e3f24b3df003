#include "Lum_NetlistVerilogReader.h"

#include "Lum_ExceptionInvalidFormat.h"
#include "Lum_MappedFile.h"

#include <algorithm>
#include <array>
#include <cctype>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <iterator>
#include <sstream>
#include <unordered_map>
#include <unordered_set>
#include <vector>

namespace {

// Bounds that keep memory and time linear whatever the input.
constexpr std::size_t kMaxToken = 1U << 16;   // bytes of a name or a number
constexpr std::uint64_t kMaxWidth = 1U << 20; // bits of one constant or range
constexpr int kMaxNesting = 64;               // concatenations within concatenations

// ---------------------------------------------------------------------------
// Lexer: a table of character classes drives it.

enum CharClass : std::uint8_t { kOther, kSpace, kNewline, kIdentStart, kDigit, kPunct };

constexpr std::array<std::uint8_t, 256> MakeClasses() {
  std::array<std::uint8_t, 256> classes{};
  for (int c = 'a'; c <= 'z'; ++c)
    classes[c] = kIdentStart;
  for (int c = 'A'; c <= 'Z'; ++c)
    classes[c] = kIdentStart;
  classes['_'] = kIdentStart;
  for (int c = '0'; c <= '9'; ++c)
    classes[c] = kDigit;
  for (char c : {' ', '\t', '\r', '\f', '\v'})
    classes[static_cast<unsigned char>(c)] = kSpace;
  classes['\n'] = kNewline;
  for (char c : {'(', ')', '[', ']', '{', '}', ',', ';', ':', '.', '#', '=', '\''})
    classes[static_cast<unsigned char>(c)] = kPunct;
  return classes;
}
constexpr std::array<std::uint8_t, 256> kClasses = MakeClasses();

enum class TokenKind { End, Name, Number, String, Punct };

struct Token {
  TokenKind kind = TokenKind::End;
  std::string_view text; // a name without its escape, a number as written
  bool escaped = false;
  std::uint32_t line = 0;
  std::uint32_t column = 0;
};

class Lexer {
public:
  Lexer(std::string_view text, std::string const &path) : m_Text(text), m_Path(path) {}

  [[noreturn]] void Fail(std::uint32_t line, std::uint32_t column, std::string const &what) const {
    throw Lum_ExceptionInvalidFormat(
        __FILE__, __LINE__, m_Path, line, column,
        "line " + std::to_string(line) + ", column " + std::to_string(column), what);
  }

  Token Next() {
    SkipBlanks();
    Token token;
    token.line = m_Line;
    token.column = Column();
    if (m_Pos >= m_Text.size())
      return token;
    auto const c = static_cast<unsigned char>(m_Text[m_Pos]);
    std::size_t const start = m_Pos;
    switch (kClasses[c]) {
    case kIdentStart:
      while (m_Pos < m_Text.size() && IsNameChar(m_Text[m_Pos]))
        ++m_Pos;
      token.kind = TokenKind::Name;
      break;
    case kDigit:
      while (m_Pos < m_Text.size() && (IsNameChar(m_Text[m_Pos]) || m_Text[m_Pos] == '?'))
        ++m_Pos;
      token.kind = TokenKind::Number;
      break;
    case kPunct:
      ++m_Pos;
      token.kind = TokenKind::Punct;
      break;
    default:
      if (c == '\\') {
        // An escaped name runs to the next white space.
        ++m_Pos;
        std::size_t const begin = m_Pos;
        while (m_Pos < m_Text.size() &&
               kClasses[static_cast<unsigned char>(m_Text[m_Pos])] != kSpace &&
               m_Text[m_Pos] != '\n')
          ++m_Pos;
        if (m_Pos == begin)
          Fail(token.line, token.column, "an escaped name is empty");
        CheckLength(m_Pos - begin, token);
        token.kind = TokenKind::Name;
        token.escaped = true;
        token.text = m_Text.substr(begin, m_Pos - begin);
        return token;
      }
      if (c == '"') {
        ++m_Pos;
        std::size_t const begin = m_Pos;
        while (m_Pos < m_Text.size() && m_Text[m_Pos] != '"' && m_Text[m_Pos] != '\n')
          m_Pos += m_Text[m_Pos] == '\\' && m_Pos + 1 < m_Text.size() ? 2 : 1;
        if (m_Pos >= m_Text.size() || m_Text[m_Pos] != '"')
          Fail(token.line, token.column, "a string is not closed on its line");
        CheckLength(m_Pos - begin, token);
        token.kind = TokenKind::String;
        token.text = m_Text.substr(begin, m_Pos - begin);
        ++m_Pos;
        return token;
      }
      if (c == '$')
        Fail(token.line, token.column, "system tasks and functions are not structural");
      Fail(token.line, token.column,
           "unexpected character '" + Printable(static_cast<char>(c)) +
               "' (only nets, bit- and part-selects, concatenations and constants are allowed)");
    }
    CheckLength(m_Pos - start, token);
    token.text = m_Text.substr(start, m_Pos - start);
    return token;
  }

  // After a size and "'": the rest of a based number ("sh1F", "b0101").
  std::string_view BasedDigits(Token const &at) {
    std::size_t const start = m_Pos;
    if (m_Pos < m_Text.size() && (m_Text[m_Pos] == 's' || m_Text[m_Pos] == 'S'))
      ++m_Pos;
    if (m_Pos < m_Text.size() &&
        std::string_view("bBoOdDhH").find(m_Text[m_Pos]) != std::string_view::npos)
      ++m_Pos;
    else
      Fail(at.line, at.column, "a based number needs b, o, d or h after '");
    SkipBlanks();
    while (m_Pos < m_Text.size() && (IsNameChar(m_Text[m_Pos]) || m_Text[m_Pos] == '?'))
      ++m_Pos;
    CheckLength(m_Pos - start, at);
    return m_Text.substr(start, m_Pos - start);
  }

  static std::string Printable(char c) {
    if (static_cast<unsigned char>(c) < 0x20 || static_cast<unsigned char>(c) >= 0x7f) {
      char hex[8];
      std::snprintf(hex, sizeof hex, "\\x%02x", static_cast<unsigned char>(c));
      return hex;
    }
    return std::string(1, c);
  }

private:
  static bool IsNameChar(char c) {
    auto const k = kClasses[static_cast<unsigned char>(c)];
    return k == kIdentStart || k == kDigit || c == '$';
  }

  std::uint32_t Column() const { return static_cast<std::uint32_t>(m_Pos - m_LineStart + 1); }

  void CheckLength(std::size_t length, Token const &at) const {
    if (length > kMaxToken)
      Fail(at.line, at.column,
           "a token longer than " + std::to_string(kMaxToken) + " bytes (" +
               std::to_string(length) + ")");
  }

  void NewLine() {
    ++m_Line;
    m_LineStart = m_Pos;
  }

  void SkipBlanks() {
    while (m_Pos < m_Text.size()) {
      char const c = m_Text[m_Pos];
      auto const k = kClasses[static_cast<unsigned char>(c)];
      if (k == kSpace) {
        ++m_Pos;
      } else if (k == kNewline) {
        ++m_Pos;
        NewLine();
      } else if (c == '/' && m_Pos + 1 < m_Text.size() && m_Text[m_Pos + 1] == '/') {
        while (m_Pos < m_Text.size() && m_Text[m_Pos] != '\n')
          ++m_Pos;
      } else if (c == '/' && m_Pos + 1 < m_Text.size() && m_Text[m_Pos + 1] == '*') {
        SkipUntil("*/", "a comment");
      } else if (c == '(' && m_Pos + 1 < m_Text.size() && m_Text[m_Pos + 1] == '*' &&
                 (m_Pos + 2 >= m_Text.size() || m_Text[m_Pos + 2] != ')')) {
        SkipUntil("*)", "an attribute");
      } else if (c == '`') {
        Directive();
      } else {
        return;
      }
    }
  }

  void SkipUntil(std::string_view end, char const *what) {
    std::uint32_t const line = m_Line;
    std::uint32_t const column = Column();
    m_Pos += 2;
    while (m_Pos + 1 < m_Text.size() && m_Text.substr(m_Pos, 2) != end) {
      if (m_Text[m_Pos] == '\n') {
        ++m_Pos;
        NewLine();
      } else {
        ++m_Pos;
      }
    }
    if (m_Pos + 1 >= m_Text.size())
      Fail(line, column, std::string(what) + " is not closed");
    m_Pos += 2;
  }

  // Directives that change nothing in a netlist are skipped to the end of
  // their line; the others (macros, conditionals) are refused.
  void Directive() {
    std::size_t end = m_Pos + 1;
    while (end < m_Text.size() && IsNameChar(m_Text[end]))
      ++end;
    std::string_view const name = m_Text.substr(m_Pos + 1, end - m_Pos - 1);
    static std::unordered_set<std::string_view> const kHarmless = {
        "timescale", "celldefine", "endcelldefine", "default_nettype", "resetall"};
    if (!kHarmless.count(name))
      Fail(m_Line, Column(), "the directive `" + std::string(name) + " is not supported");
    while (m_Pos < m_Text.size() && m_Text[m_Pos] != '\n')
      ++m_Pos;
  }

  std::string_view m_Text;
  std::string const &m_Path;
  std::size_t m_Pos = 0;
  std::size_t m_LineStart = 0;
  std::uint32_t m_Line = 1;
};

// ---------------------------------------------------------------------------
// Constants

// A number token (and what follows a "'") as bits, MSB first, or an empty
// string when the text is no number.
struct Constant {
  std::string bits; // MSB first, of 0 1 x z
  bool sized = false;
};

bool ParseBasedDigits(std::string_view digits, std::uint64_t width, bool sized, Constant &out) {
  // digits: [s] base value
  std::size_t i = 0;
  if (digits[i] == 's' || digits[i] == 'S')
    ++i;
  char const base = static_cast<char>(std::tolower(static_cast<unsigned char>(digits[i++])));
  std::string value;
  for (; i < digits.size(); ++i)
    if (digits[i] != '_')
      value += static_cast<char>(std::tolower(static_cast<unsigned char>(digits[i])));
  if (value.empty())
    return false;
  std::string bits;
  if (base == 'd') {
    if (value.size() == 1 && (value[0] == 'x' || value[0] == 'z' || value[0] == '?')) {
      bits.assign(width, value[0] == 'x' ? 'x' : 'z');
    } else {
      std::uint64_t number = 0;
      for (char c : value) {
        if (c < '0' || c > '9' || number > (UINT64_MAX - 9) / 10)
          return false;
        number = number * 10 + static_cast<std::uint64_t>(c - '0');
      }
      for (int b = 63; b >= 0; --b)
        bits += ((number >> b) & 1U) ? '1' : '0';
    }
  } else {
    int const per = base == 'b' ? 1 : base == 'o' ? 3 : base == 'h' ? 4 : 0;
    if (per == 0)
      return false;
    bits.reserve(value.size() * static_cast<std::size_t>(per));
    for (char c : value) {
      if (c == 'x' || c == 'z' || c == '?') {
        bits.append(static_cast<std::size_t>(per), c == 'x' ? 'x' : 'z');
        continue;
      }
      int digit = c >= '0' && c <= '9' ? c - '0' : c >= 'a' && c <= 'f' ? c - 'a' + 10 : 99;
      if (digit >= (1 << per))
        return false;
      for (int b = per - 1; b >= 0; --b)
        bits += ((digit >> b) & 1) ? '1' : '0';
    }
  }
  // Extend to the width (with x or z when the leading digit is one) or cut.
  if (bits.size() < width) {
    char const fill = bits[0] == 'x' || bits[0] == 'z' ? bits[0] : '0';
    bits.insert(0, width - bits.size(), fill);
  } else if (bits.size() > width) {
    bits.erase(0, bits.size() - width);
  }
  out.bits = bits;
  out.sized = sized;
  return true;
}

// ---------------------------------------------------------------------------
// Parser

struct Wire {
  std::uint32_t first = 0; // first bit id
  std::uint32_t width = 1;
  std::int32_t offset = 0;
  bool upto = false;
  bool isSigned = false;
};

class Parser {
public:
  Parser(std::string_view text, std::string const &path) : m_Lexer(text, path) {
    m_Netlist.path = path;
    Advance();
  }

  Lum_Netlist Run() {
    while (m_Token.kind != TokenKind::End) {
      if (IsKeyword("module"))
        ParseModule();
      else
        Refuse("expected 'module'");
    }
    ResolvePositional();
    return std::move(m_Netlist);
  }

private:
  // ---- tokens

  void Advance() { m_Token = m_Lexer.Next(); }

  [[noreturn]] void Fail(Token const &at, std::string const &what) const {
    m_Lexer.Fail(at.line, at.column, what);
  }
  bool IsBehavioural() const {
    return m_Token.kind == TokenKind::Name && !m_Token.escaped && Behavioural().count(m_Token.text);
  }
  static std::unordered_set<std::string_view> const &Behavioural() {
    static std::unordered_set<std::string_view> const kBehavioural = {
        "always",   "always_ff", "always_comb", "always_latch", "initial",    "final",
        "function", "task",      "generate",    "genvar",       "integer",    "real",
        "if",       "else",      "case",        "casez",        "casex",      "for",
        "while",    "repeat",    "forever",     "begin",        "end",        "fork",
        "join",     "primitive", "specify",     "parameter",    "localparam", "defparam"};
    return kBehavioural;
  }
  [[noreturn]] void Refuse(std::string const &expected) const {
    if (m_Token.kind == TokenKind::End)
      Fail(m_Token, expected + ", found the end of the file");
    if (IsBehavioural())
      Fail(m_Token, "'" + std::string(m_Token.text) +
                        "' is not structural: only modules, ports, wires, assign between nets "
                        "and instances can be read");
    Fail(m_Token, expected + ", found '" + std::string(m_Token.text) + "'");
  }

  bool IsPunct(char c) const { return m_Token.kind == TokenKind::Punct && m_Token.text[0] == c; }
  bool IsKeyword(std::string_view word) const {
    return m_Token.kind == TokenKind::Name && !m_Token.escaped && m_Token.text == word;
  }
  void Expect(char c) {
    if (!IsPunct(c))
      Refuse(std::string("expected '") + c + "'");
    Advance();
  }
  bool Accept(char c) {
    if (!IsPunct(c))
      return false;
    Advance();
    return true;
  }
  std::string_view ExpectName(char const *what) {
    if (m_Token.kind != TokenKind::Name)
      Refuse(std::string("expected ") + what);
    std::string_view const name = TokenName();
    Advance();
    return name;
  }
  // The name of the current token. An escaped name that begins with "$" is
  // a user's name, not a generated one: it keeps a "\" before the "$", as
  // the JSON form writes it.
  std::string_view TokenName() {
    if (!m_Token.escaped || m_Token.text[0] != '$')
      return m_Token.text;
    m_Escaped = "\\";
    m_Escaped += m_Token.text;
    return m_Escaped;
  }
  bool IsDirection() const {
    return IsKeyword("input") || IsKeyword("output") || IsKeyword("inout");
  }
  bool IsNetKind() const {
    return IsKeyword("wire") || IsKeyword("tri") || IsKeyword("reg") || IsKeyword("supply0") ||
           IsKeyword("supply1") || IsKeyword("wand") || IsKeyword("wor");
  }

  // An integer for a range, a repetition or a select: decimal digits or a
  // based constant without x or z.
  std::int64_t Integer() {
    Token const at = m_Token;
    Constant constant;
    if (!ParseConstant(constant) || constant.bits.size() > 64 ||
        constant.bits.find_first_of("xz") != std::string::npos)
      Fail(at, "expected an integer");
    std::uint64_t value = 0;
    for (char c : constant.bits)
      value = value << 1 | (c == '1' ? 1U : 0U);
    if (value > (1U << 30))
      Fail(at, "an index or count above 2^30");
    return static_cast<std::int64_t>(value);
  }

  // A number at the current token; false (nothing consumed) when there is
  // none.
  bool ParseConstant(Constant &out) {
    Token const at = m_Token;
    // The lexer stands just after a "'" token: BasedAfterQuote reads on.
    if (IsPunct('\''))
      return BasedAfterQuote(at, 32, false, out);
    if (m_Token.kind != TokenKind::Number)
      return false;
    std::string digits;
    for (char c : m_Token.text)
      if (c != '_')
        digits += c;
    Advance();
    if (IsPunct('\'')) {
      std::uint64_t width = 0;
      for (char c : digits) {
        if (c < '0' || c > '9')
          Fail(at, "a constant's size is a decimal number");
        width = width * 10 + static_cast<std::uint64_t>(c - '0');
        if (width > kMaxWidth)
          Fail(at, "a constant wider than " + std::to_string(kMaxWidth) + " bits");
      }
      if (width == 0)
        Fail(at, "a constant of width 0");
      return BasedAfterQuote(at, width, true, out);
    }
    Constant decimal;
    if (!ParseBasedDigits("d" + digits, 32, false, decimal))
      Fail(at, "'" + digits + "' is not a number (reals are not supported)");
    out = decimal;
    return true;
  }

  bool BasedAfterQuote(Token const &at, std::uint64_t width, bool sized, Constant &out) {
    // The lexer stopped after "'": take the base and digits from the text.
    std::string_view const digits = m_Lexer.BasedDigits(at);
    if (!ParseBasedDigits(digits, width, sized, out))
      Fail(at, "'" + std::string(digits) + "' is not a valid based number");
    Advance();
    return true;
  }

  // ---- modules

  void ParseModule() {
    Token const at = m_Token;
    Advance();
    std::string_view const name = ExpectName("a module name");
    m_Module = m_Netlist.AddModule(m_Netlist.Intern(name));
    if (m_Module == Lum_Netlist::kNone)
      Fail(at, "a second module named " + std::string(name));
    Module().line = at.line;
    Module().column = at.column;
    m_Wires.clear();
    m_CellNames.clear();
    m_PortOrder.clear();
    m_Parent.assign(Lum_NetlistBits::kFirstNet, 0);
    for (Lum_NetlistBit b = 0; b < Lum_NetlistBits::kFirstNet; ++b)
      m_Parent[b] = b;
    if (IsPunct('#'))
      Fail(m_Token, "module parameters are not supported in a netlist");
    if (Accept('(')) {
      if (!IsPunct(')')) {
        if (IsDirection())
          ParseAnsiPorts();
        else
          do
            m_PortOrder.push_back({m_Netlist.Intern(ExpectName("a port name")), m_Token});
          while (Accept(','));
      }
      Expect(')');
    }
    Expect(';');
    while (!IsKeyword("endmodule")) {
      if (IsDirection() || IsNetKind())
        ParseDeclaration();
      else if (IsKeyword("assign"))
        ParseAssign();
      else if (m_Token.kind == TokenKind::Name && !IsKeyword("module") && !IsBehavioural())
        ParseInstances();
      else
        Refuse("expected a declaration, an assign, an instance or 'endmodule'");
    }
    Advance();
    FinishModule();
  }

  Lum_NetlistModule &Module() { return m_Netlist.modules[m_Module]; }

  void ParseAnsiPorts() {
    Lum_NetlistDirection direction = Lum_NetlistDirection::Unknown;
    Range range;
    do {
      if (IsDirection()) {
        direction = DirectionKeyword();
        Advance();
        if (IsNetKind())
          Advance();
        range = ParseRange();
      }
      Token const at = m_Token;
      Lum_NetlistName const name = m_Netlist.Intern(ExpectName("a port name"));
      m_PortOrder.push_back({name, at});
      Declare(name, range, at);
      m_Directions[name] = direction;
    } while (Accept(','));
  }

  Lum_NetlistDirection DirectionKeyword() const {
    return IsKeyword("input")    ? Lum_NetlistDirection::Input
           : IsKeyword("output") ? Lum_NetlistDirection::Output
                                 : Lum_NetlistDirection::Inout;
  }

  struct Range {
    bool present = false;
    bool isSigned = false;
    std::int64_t left = 0;
    std::int64_t right = 0;
  };

  Range ParseRange() {
    Range range;
    if (IsKeyword("signed")) {
      range.isSigned = true;
      Advance();
    }
    if (!Accept('['))
      return range;
    range.present = true;
    range.left = SignedInteger();
    Expect(':');
    range.right = SignedInteger();
    Expect(']');
    return range;
  }

  std::int64_t SignedInteger() {
    if (m_Token.kind == TokenKind::Name)
      Refuse("expected a number (ranges of parameters are not supported)");
    return Integer();
  }

  // Declares a wire, or checks a second declaration of it (a port declared
  // and then declared a wire) against the first.
  void Declare(Lum_NetlistName name, Range const &range, Token const &at) {
    std::uint64_t const width =
        range.present ? static_cast<std::uint64_t>(std::llabs(range.left - range.right)) + 1 : 1;
    auto const found = m_Wires.find(name);
    if (found != m_Wires.end()) {
      Wire &wire = found->second;
      if (wire.width != width ||
          (range.present && wire.offset != std::min(range.left, range.right)))
        Fail(at, "the second declaration of " + std::string(m_Netlist.Text(name)) +
                     " has another range");
      wire.isSigned = wire.isSigned || range.isSigned;
      return;
    }
    if (width > kMaxWidth || Module().numBits + width > Lum_Netlist::kNone / 2)
      Fail(at, "a wire wider than " + std::to_string(kMaxWidth) + " bits");
    Wire wire;
    wire.first = Module().numBits;
    wire.width = static_cast<std::uint32_t>(width);
    wire.offset = static_cast<std::int32_t>(std::min(range.left, range.right));
    wire.upto = range.present && range.left < range.right;
    wire.isSigned = range.isSigned;
    Module().numBits += wire.width;
    for (std::uint32_t i = 0; i < wire.width; ++i)
      m_Parent.push_back(wire.first + i);
    m_Wires.emplace(name, wire);
    m_WireOrder.push_back(name);
  }

  void ParseDeclaration() {
    bool const port = IsDirection();
    Lum_NetlistDirection const direction =
        port ? DirectionKeyword() : Lum_NetlistDirection::Unknown;
    Lum_NetlistBit tie = Lum_Netlist::kNone;
    if (IsKeyword("supply0"))
      tie = Lum_NetlistBits::kZero;
    if (IsKeyword("supply1"))
      tie = Lum_NetlistBits::kOne;
    Advance();
    if (port && IsNetKind())
      Advance();
    Range const range = ParseRange();
    do {
      Token const at = m_Token;
      Lum_NetlistName const name = m_Netlist.Intern(ExpectName("a name"));
      Declare(name, range, at);
      if (port)
        m_Directions[name] = direction;
      Wire const &wire = m_Wires[name];
      if (tie != Lum_Netlist::kNone)
        for (std::uint32_t i = 0; i < wire.width; ++i)
          Join(wire.first + i, tie, at);
      if (IsPunct('=')) {
        // wire w = expression; is an assign.
        Advance();
        std::vector<Lum_NetlistBit> right;
        ParseExpression(right, 0);
        std::vector<Lum_NetlistBit> left(wire.width);
        for (std::uint32_t i = 0; i < wire.width; ++i)
          left[i] = wire.first + i;
        JoinAll(left, right, at);
      }
    } while (Accept(','));
    Expect(';');
  }

  void ParseAssign() {
    Advance();
    do {
      Token const at = m_Token;
      std::vector<Lum_NetlistBit> left;
      std::vector<Lum_NetlistBit> right;
      ParseExpression(left, 0);
      Expect('=');
      ParseExpression(right, 0);
      JoinAll(left, right, at);
    } while (Accept(','));
    Expect(';');
  }

  void JoinAll(std::vector<Lum_NetlistBit> const &left, std::vector<Lum_NetlistBit> const &right,
               Token const &at) {
    if (left.size() != right.size())
      Fail(at, "the two sides of the assignment have " + std::to_string(left.size()) + " and " +
                   std::to_string(right.size()) + " bits");
    for (std::size_t i = 0; i < left.size(); ++i)
      Join(left[i], right[i], at);
  }

  Lum_NetlistBit Root(Lum_NetlistBit bit) {
    while (m_Parent[bit] != bit) {
      m_Parent[bit] = m_Parent[m_Parent[bit]];
      bit = m_Parent[bit];
    }
    return bit;
  }

  // The two bits become one net; a constant stays the root of its set.
  void Join(Lum_NetlistBit a, Lum_NetlistBit b, Token const &at) {
    a = Root(a);
    b = Root(b);
    if (a == b)
      return;
    if (Lum_NetlistBits::IsConstant(a) && Lum_NetlistBits::IsConstant(b))
      Fail(at, std::string("a net is tied to both ") + Lum_NetlistBits::ConstantChar(a) + " and " +
                   Lum_NetlistBits::ConstantChar(b));
    if (Lum_NetlistBits::IsConstant(b) || (!Lum_NetlistBits::IsConstant(a) && b < a))
      std::swap(a, b);
    m_Parent[b] = a;
  }

  // Appends the bits of an expression, LSB first.
  void ParseExpression(std::vector<Lum_NetlistBit> &bits, int depth) {
    Token const at = m_Token;
    if (IsPunct('{')) {
      if (depth >= kMaxNesting)
        Fail(at, "concatenations nested deeper than " + std::to_string(kMaxNesting));
      Advance();
      // {n{...}}: a repetition.
      if (m_Token.kind == TokenKind::Number && IsNextTokenPunct('{')) {
        std::int64_t const count = Integer();
        Expect('{');
        std::vector<Lum_NetlistBit> once;
        ParseConcatenation(once, depth + 1);
        Expect('}');
        Expect('}');
        if (static_cast<std::uint64_t>(count) * once.size() > kMaxWidth)
          Fail(at, "a repetition wider than " + std::to_string(kMaxWidth) + " bits");
        for (std::int64_t i = 0; i < count; ++i)
          bits.insert(bits.end(), once.begin(), once.end());
        return;
      }
      std::vector<Lum_NetlistBit> parts;
      ParseConcatenation(parts, depth + 1);
      Expect('}');
      bits.insert(bits.end(), parts.begin(), parts.end());
      return;
    }
    if (m_Token.kind == TokenKind::Number || IsPunct('\'')) {
      Constant constant;
      ParseConstant(constant);
      for (auto it = constant.bits.rbegin(); it != constant.bits.rend(); ++it)
        bits.push_back(*it == '0'   ? Lum_NetlistBits::kZero
                       : *it == '1' ? Lum_NetlistBits::kOne
                       : *it == 'x' ? Lum_NetlistBits::kUndefined
                                    : Lum_NetlistBits::kFloating);
      return;
    }
    if (m_Token.kind != TokenKind::Name)
      Refuse("expected a net, a constant or a concatenation (operators are not supported)");
    Lum_NetlistName const name = m_Netlist.Intern(TokenName());
    Advance();
    auto found = m_Wires.find(name);
    if (found == m_Wires.end()) {
      // An undeclared name is an implicit one-bit wire.
      Declare(name, Range(), at);
      found = m_Wires.find(name);
    }
    Wire const wire = found->second;
    if (!Accept('[')) {
      for (std::uint32_t i = 0; i < wire.width; ++i)
        bits.push_back(wire.first + i);
      return;
    }
    std::int64_t const left = SignedInteger();
    std::int64_t right = left;
    if (Accept(':'))
      right = SignedInteger();
    Expect(']');
    std::int64_t const from = std::min(left, right);
    std::int64_t const to = std::max(left, right);
    if (from < wire.offset || to >= wire.offset + std::int64_t(wire.width))
      Fail(at, "[" + std::to_string(left) + (left == right ? "" : ":" + std::to_string(right)) +
                   "] is outside the range of " + std::string(m_Netlist.Text(name)));
    // Positions LSB first of the selected indices, in the order the select
    // gives them from its right end.
    auto position = [&wire](std::int64_t index) {
      return wire.upto ? std::uint32_t(wire.offset + std::int64_t(wire.width) - 1 - index)
                       : std::uint32_t(index - wire.offset);
    };
    std::int64_t const step = left >= right ? 1 : -1;
    for (std::int64_t index = right;; index += step) {
      bits.push_back(wire.first + position(index));
      if (index == left)
        break;
    }
  }

  bool IsNextTokenPunct(char c) {
    // Lookahead of one token without consuming: copy the lexer.
    Lexer copy = m_Lexer;
    Token const next = copy.Next();
    return next.kind == TokenKind::Punct && next.text[0] == c;
  }

  // The items of a concatenation, the first written being the most
  // significant.
  void ParseConcatenation(std::vector<Lum_NetlistBit> &bits, int depth) {
    std::vector<std::vector<Lum_NetlistBit>> parts;
    do {
      parts.emplace_back();
      ParseExpression(parts.back(), depth);
    } while (Accept(','));
    for (auto it = parts.rbegin(); it != parts.rend(); ++it)
      bits.insert(bits.end(), it->begin(), it->end());
  }

  void ParseInstances() {
    Lum_NetlistName const type = m_Netlist.Intern(ExpectName("a cell type"));
    std::vector<Lum_NetlistParameter> parameters;
    if (Accept('#')) {
      Expect('(');
      if (!IsPunct(')'))
        do {
          if (!IsPunct('.'))
            Refuse("expected a named parameter '.NAME(value)'");
          Advance();
          Lum_NetlistParameter parameter;
          parameter.name = m_Netlist.Intern(ExpectName("a parameter name"));
          Expect('(');
          ParseParameterValue(parameter);
          Expect(')');
          parameters.push_back(parameter);
        } while (Accept(','));
      Expect(')');
    }
    do {
      Token const at = m_Token;
      if (m_Token.kind != TokenKind::Name)
        Refuse("expected an instance name");
      Lum_NetlistCell cell;
      cell.type = type;
      cell.name = m_Netlist.Intern(TokenName());
      cell.line = at.line;
      cell.column = at.column;
      Advance();
      if (IsPunct('['))
        Fail(m_Token, "arrays of instances are not supported");
      cell.firstParameter = static_cast<std::uint32_t>(Module().parameters.size());
      cell.numParameters = static_cast<std::uint32_t>(parameters.size());
      Module().parameters.insert(Module().parameters.end(), parameters.begin(), parameters.end());
      cell.firstConnection = static_cast<std::uint32_t>(Module().connections.size());
      Expect('(');
      if (!IsPunct(')')) {
        std::uint32_t position = 0;
        do {
          std::vector<Lum_NetlistBit> bits;
          Lum_NetlistConnection connection;
          if (Accept('.')) {
            connection.port = m_Netlist.Intern(ExpectName("a port name"));
            Expect('(');
            if (!IsPunct(')'))
              ParseExpression(bits, 0);
            Expect(')');
            for (std::uint32_t i = cell.firstConnection; i < Module().connections.size(); ++i)
              if (Module().connections[i].port == connection.port)
                Fail(at, "port " + std::string(m_Netlist.Text(connection.port)) +
                             " is connected twice");
          } else {
            // Positional: resolved against the type's port order later.
            connection.port = m_Netlist.Intern("$" + std::to_string(position));
            m_HasPositional = true;
            if (!IsPunct(',') && !IsPunct(')'))
              ParseExpression(bits, 0);
          }
          ++position;
          if (bits.empty())
            continue; // an unconnected port
          connection.bits = Module().AddBits(bits);
          Module().connections.push_back(connection);
        } while (Accept(','));
      }
      Expect(')');
      cell.numConnections =
          static_cast<std::uint32_t>(Module().connections.size()) - cell.firstConnection;
      if (!m_CellNames.insert(cell.name).second)
        Fail(at, "a second instance named " + std::string(m_Netlist.Text(cell.name)));
      Module().cells.push_back(cell);
    } while (Accept(','));
    Expect(';');
  }

  void ParseParameterValue(Lum_NetlistParameter &parameter) {
    if (m_Token.kind == TokenKind::String) {
      std::string value;
      std::string_view const text = m_Token.text;
      for (std::size_t i = 0; i < text.size(); ++i) {
        char c = text[i];
        if (c == '\\' && i + 1 < text.size()) {
          c = text[++i];
          c = c == 'n' ? '\n' : c == 't' ? '\t' : c;
        }
        value += c;
      }
      parameter.value = m_Netlist.Intern(value);
      parameter.isString = true;
      Advance();
      return;
    }
    Constant constant;
    if (!ParseConstant(constant))
      Refuse("expected a constant or a string");
    parameter.value = m_Netlist.Intern(constant.bits);
  }

  void FinishModule() {
    Lum_NetlistModule &module = Module();
    // Ports in the order of the header.
    for (auto const &[name, at] : m_PortOrder) {
      auto const wire = m_Wires.find(name);
      auto const direction = m_Directions.find(name);
      if (wire == m_Wires.end() || direction == m_Directions.end())
        Fail(at, "port " + std::string(m_Netlist.Text(name)) + " has no direction");
      module.ports.push_back(Vector(name, wire->second, direction->second));
    }
    std::unordered_set<Lum_NetlistName> listed;
    for (auto const &entry : m_PortOrder)
      listed.insert(entry.first);
    for (auto const &[name, direction] : m_Directions) {
      if (!listed.count(name))
        Fail(Token{TokenKind::End, {}, false, module.line, module.column},
             std::string(m_Netlist.Text(name)) + " is declared " +
                 (direction == Lum_NetlistDirection::Input ? "input" : "output or inout") +
                 " but is not in the port list of module " +
                 std::string(m_Netlist.Text(module.name)));
    }
    for (Lum_NetlistName const name : m_WireOrder)
      module.netNames.push_back(Vector(name, m_Wires[name], Lum_NetlistDirection::Unknown));
    // Every bit becomes the root of its set: joined nets are one.
    for (Lum_NetlistBit &bit : module.bits)
      bit = Root(bit);
    m_Directions.clear();
    m_WireOrder.clear();
  }

  Lum_NetlistVector Vector(Lum_NetlistName name, Wire const &wire, Lum_NetlistDirection direction) {
    Lum_NetlistVector vector;
    vector.name = name;
    vector.direction = direction;
    vector.offset = wire.offset;
    vector.upto = wire.upto;
    vector.isSigned = wire.isSigned;
    std::string_view const text = m_Netlist.Text(name);
    vector.hidden = !text.empty() && text[0] == '$';
    std::vector<Lum_NetlistBit> bits(wire.width);
    for (std::uint32_t i = 0; i < wire.width; ++i)
      bits[i] = wire.first + i;
    vector.bits = Module().AddBits(bits);
    return vector;
  }

  // Positional connections to modules of this file take the module's port
  // names; those to other cells keep "$<position>" for the importer.
  void ResolvePositional() {
    if (!m_HasPositional)
      return;
    for (Lum_NetlistModule &module : m_Netlist.modules)
      for (Lum_NetlistCell const &cell : module.cells) {
        std::uint32_t const child = m_Netlist.FindModule(cell.type);
        if (child == Lum_Netlist::kNone)
          continue;
        for (std::uint32_t c = 0; c < cell.numConnections; ++c) {
          Lum_NetlistConnection &connection = module.connections[cell.firstConnection + c];
          std::string_view const port = m_Netlist.Text(connection.port);
          if (port.size() < 2 || port[0] != '$')
            continue;
          std::size_t const position = std::stoul(std::string(port.substr(1)));
          auto const &ports = m_Netlist.modules[child].ports;
          if (position >= ports.size())
            throw Lum_ExceptionInvalidFormat(
                __FILE__, __LINE__, m_Netlist.path, cell.line, cell.column,
                "line " + std::to_string(cell.line) + ", column " + std::to_string(cell.column),
                "connection " + std::to_string(position + 1) + " of " +
                    std::string(m_Netlist.Text(cell.name)) + " but module " +
                    std::string(m_Netlist.Text(cell.type)) + " has " +
                    std::to_string(ports.size()) + " ports");
          connection.port = ports[position].name;
        }
      }
  }

  Lexer m_Lexer;
  Token m_Token;
  Lum_Netlist m_Netlist;
  std::uint32_t m_Module = 0;
  std::unordered_map<Lum_NetlistName, Wire> m_Wires;
  std::vector<Lum_NetlistName> m_WireOrder;
  std::unordered_set<Lum_NetlistName> m_CellNames;
  std::unordered_map<Lum_NetlistName, Lum_NetlistDirection> m_Directions;
  std::vector<std::pair<Lum_NetlistName, Token>> m_PortOrder;
  std::vector<Lum_NetlistBit> m_Parent; // union-find over the module's bits
  bool m_HasPositional = false;
  std::string m_Escaped;
};

} // namespace

Lum_Netlist Lum_NetlistVerilogReader::Read(std::string const &path) {
  // Mapped, not copied: the netlist keeps its own copies of the names.
  Lum_MappedFile const file(path);
  return ReadText(file.Text(), path);
}

Lum_Netlist Lum_NetlistVerilogReader::ReadText(std::string_view text, std::string const &path) {
  Parser parser(text, path);
  return parser.Run();
}

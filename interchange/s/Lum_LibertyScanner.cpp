#include "Lum_LibertyScanner.h"

#include "Lum_ExceptionInvalidFormat.h"

#include <array>
#include <cerrno>
#include <cstring>

namespace {

// Byte classes. A scanning loop runs over plain bytes with one table lookup
// each and stops only at the bytes its construct cares about.
enum Class : unsigned char {
  kPlain,
  kNewline,
  kBlank,
  kOpenBrace,
  kCloseBrace,
  kOpenParen,
  kCloseParen,
  kQuote,
  kSlash,
  kBackslash,
  kColon,
  kSemicolon,
  kComma,
  kNul,
};

constexpr std::array<Class, 256> MakeClasses() {
  std::array<Class, 256> table{};
  table['\n'] = kNewline;
  for (unsigned char c : {' ', '\t', '\r', '\f', '\v'})
    table[c] = kBlank;
  table['{'] = kOpenBrace;
  table['}'] = kCloseBrace;
  table['('] = kOpenParen;
  table[')'] = kCloseParen;
  table['"'] = kQuote;
  table['/'] = kSlash;
  table['\\'] = kBackslash;
  table[':'] = kColon;
  table[';'] = kSemicolon;
  table[','] = kComma;
  table[0] = kNul;
  return table;
}
constexpr std::array<Class, 256> kClass = MakeClasses();

// The bytes that end a run inside a skipped group and inside a string.
constexpr std::array<bool, 256> MakeStops(std::initializer_list<unsigned char> stops) {
  std::array<bool, 256> table{};
  for (unsigned char c : stops)
    table[c] = true;
  return table;
}
constexpr std::array<bool, 256> kGroupStops = MakeStops({'\n', '{', '}', '"', '/', 0});
constexpr std::array<bool, 256> kStringStops = MakeStops({'\n', '"', '\\', 0});

constexpr std::size_t kWindowSize = 1 << 20;

Class ClassOf(int c) { return c < 0 ? kPlain : kClass[static_cast<unsigned char>(c)]; }

} // namespace

Lum_LibertyScanner::Lum_LibertyScanner(std::string_view text, std::string path)
    : m_Path(std::move(path)), m_Begin(text.data()), m_Cur(text.data()),
      m_End(text.data() + text.size()) {}

Lum_LibertyScanner::Lum_LibertyScanner(std::FILE *file, std::string path)
    : m_Path(std::move(path)), m_File(file), m_Window(kWindowSize) {
  m_Begin = m_Cur = m_End = m_Window.data();
}

bool Lum_LibertyScanner::Refill() {
  if (!m_File)
    return false;
  char const *keep = m_Mark ? m_Mark : m_Cur;
  auto const kept = static_cast<std::size_t>(m_End - keep);
  if (m_Mark && kept >= kMaxToken)
    Fail(Where(), "a name or value longer than " + std::to_string(kMaxToken) + " bytes");
  std::memmove(m_Window.data(), keep, kept);
  auto const shift = static_cast<std::size_t>(keep - m_Begin);
  m_Base += shift;
  m_Cur -= shift;
  if (m_Mark)
    m_Mark -= shift;
  std::size_t const got = std::fread(m_Window.data() + kept, 1, m_Window.size() - kept, m_File);
  m_End = m_Window.data() + kept + got;
  if (got == 0 && std::ferror(m_File))
    Fail(Where(), std::string("cannot be read: ") + std::strerror(errno));
  return got > 0;
}

int Lum_LibertyScanner::PeekAt(std::size_t ahead) {
  while (static_cast<std::size_t>(m_End - m_Cur) <= ahead)
    if (!Refill())
      return -1;
  return static_cast<unsigned char>(m_Cur[ahead]);
}

void Lum_LibertyScanner::NewLine(char const *at) {
  ++m_Line;
  m_LineStart = Offset(at) + 1;
}

void Lum_LibertyScanner::Advance() {
  if (Peek() == '\n')
    NewLine(m_Cur);
  ++m_Cur;
}

Lum_LibertyScanner::Position Lum_LibertyScanner::Where() const {
  return Position{m_Line, Offset(m_Cur) - m_LineStart + 1};
}

void Lum_LibertyScanner::Fail(Position at, std::string const &what) const {
  std::string const where =
      "line " + std::to_string(at.line) + ", column " + std::to_string(at.column);
  throw Lum_ExceptionInvalidFormat(__FILE__, __LINE__, m_Path, at.line, at.column, where, what);
}

std::string Lum_LibertyScanner::Describe(int c) {
  if (c < 0)
    return "the end of the file";
  if (c == '\n')
    return "a newline";
  if (c < 0x20 || c >= 0x7f) {
    char text[16];
    std::snprintf(text, sizeof text, "byte 0x%02x", static_cast<unsigned>(c));
    return text;
  }
  return std::string("'") + static_cast<char>(c) + "'";
}

void Lum_LibertyScanner::SkipBlockComment() {
  Position const open = Where();
  m_Cur += 2;
  for (;;) {
    int const c = Peek();
    if (c < 0)
      Fail(open, "unterminated comment: expected '*/' before the end of the file");
    if (c == 0)
      Fail(Where(), "NUL byte in a comment");
    if (c == '*' && PeekAt(1) == '/') {
      m_Cur += 2;
      return;
    }
    Advance();
  }
}

void Lum_LibertyScanner::SkipLineComment() {
  for (int c = Peek(); c >= 0 && c != '\n'; c = Peek()) {
    if (c == 0)
      Fail(Where(), "NUL byte in a comment");
    ++m_Cur;
  }
}

bool Lum_LibertyScanner::SkipBlanks(bool stopAtNewline) {
  bool newline = false;
  for (;;) {
    int const c = Peek();
    switch (ClassOf(c)) {
    case kBlank:
      ++m_Cur;
      break;
    case kNewline:
      if (stopAtNewline)
        return true;
      Advance();
      newline = true;
      break;
    case kBackslash: {
      // A continuation joins lines: it is a blank, never an end of line.
      int const next = PeekAt(1);
      std::size_t const length = next == '\n' ? 2 : next == '\r' && PeekAt(2) == '\n' ? 3 : 0;
      if (length == 0)
        return newline;
      m_Cur += length - 1;
      NewLine(m_Cur);
      ++m_Cur;
      break;
    }
    case kSlash: {
      int const next = PeekAt(1);
      if (next == '*') {
        SkipBlockComment();
      } else if (next == '/') {
        SkipLineComment();
      } else {
        return newline;
      }
      break;
    }
    default:
      return newline;
    }
  }
}

std::string_view Lum_LibertyScanner::EndToken(Position at) {
  std::string_view const token(m_Mark, static_cast<std::size_t>(m_Cur - m_Mark));
  m_Mark = nullptr;
  if (token.size() > kMaxToken)
    Fail(at, "a name or value longer than " + std::to_string(kMaxToken) + " bytes");
  return token;
}

std::string_view Lum_LibertyScanner::Name(bool inArgs) {
  Position const at = Where();
  BeginToken();
  for (int c = Peek(); c >= 0; c = Peek()) {
    Class const k = kClass[static_cast<unsigned char>(c)];
    if (k == kSlash) {
      int const next = PeekAt(1);
      if (next == '*' || next == '/')
        break;
    } else if (k == kColon) {
      if (!inArgs)
        break;
    } else if (k != kPlain) {
      break;
    }
    ++m_Cur;
  }
  return EndToken(at);
}

std::string_view Lum_LibertyScanner::Quoted(bool keep) {
  Position const open = Where();
  ++m_Cur;
  if (keep)
    BeginToken();
  for (;;) {
    if (m_Cur == m_End && !Refill())
      Fail(open, "unterminated string: expected '\"' before the end of the file");
    char const *p = m_Cur;
    while (p < m_End && !kStringStops[static_cast<unsigned char>(*p)])
      ++p;
    m_Cur = p;
    if (p == m_End)
      continue;
    switch (*p) {
    case '"': {
      std::string_view const text = keep ? EndToken(open) : std::string_view();
      ++m_Cur;
      return text;
    }
    case '\\':
      // The next byte is taken as it is: an escaped quote or a continuation.
      ++m_Cur;
      if (Peek() < 0)
        Fail(open, "unterminated string: expected '\"' before the end of the file");
      if (Peek() == 0)
        Fail(Where(), "NUL byte in a string");
      Advance();
      break;
    case '\n':
      NewLine(p);
      ++m_Cur;
      break;
    default:
      Fail(Where(), "NUL byte in a string");
    }
  }
}

std::string_view Lum_LibertyScanner::BareValue() {
  Position const at = Where();
  BeginToken();
  // Counted from the mark, which a refill moves together with m_Cur.
  std::size_t length = 0; // up to the last byte that is not a blank
  for (int c = Peek(); c >= 0; c = Peek()) {
    Class const k = kClass[static_cast<unsigned char>(c)];
    if (k == kSemicolon || k == kNewline || k == kCloseBrace || k == kNul)
      break;
    if (k == kSlash) {
      int const next = PeekAt(1);
      if (next == '*' || next == '/')
        break;
    }
    if (k == kBackslash && (PeekAt(1) == '\n' || (PeekAt(1) == '\r' && PeekAt(2) == '\n'))) {
      m_Cur += PeekAt(1) == '\n' ? 1 : 2;
      NewLine(m_Cur);
      ++m_Cur;
      continue;
    }
    ++m_Cur;
    if (k != kBlank)
      length = static_cast<std::size_t>(m_Cur - m_Mark);
  }
  std::string_view token = EndToken(at);
  return token.substr(0, length);
}

void Lum_LibertyScanner::SkipArgs(Position open) {
  unsigned level = 1;
  for (;;) {
    int const c = Peek();
    switch (ClassOf(c)) {
    case kOpenParen:
      if (++level > kMaxDepth)
        Fail(Where(), "parentheses nested deeper than " + std::to_string(kMaxDepth));
      ++m_Cur;
      break;
    case kCloseParen:
      ++m_Cur;
      if (--level == 0)
        return;
      break;
    case kQuote:
      Quoted(false);
      break;
    case kOpenBrace:
    case kCloseBrace:
    case kSemicolon:
      Fail(Where(), "expected ')' to close the '(' at line " + std::to_string(open.line) +
                        ", column " + std::to_string(open.column) + ", found " + Describe(c));
    case kNul:
      Fail(Where(), "NUL byte");
    default:
      if (c < 0)
        Fail(open, "expected ')' to close this '(' before the end of the file");
      if (c == '/' && (PeekAt(1) == '*' || PeekAt(1) == '/'))
        SkipBlanks(false);
      else
        Advance();
    }
  }
}

void Lum_LibertyScanner::SkipGroup(Position open, unsigned depth) {
  unsigned level = 1;
  for (;;) {
    if (m_Cur == m_End && !Refill())
      Fail(open, "expected '}' to close this group before the end of the file");
    char const *p = m_Cur;
    while (p < m_End && !kGroupStops[static_cast<unsigned char>(*p)])
      ++p;
    m_Cur = p;
    if (p == m_End)
      continue;
    switch (kClass[static_cast<unsigned char>(*p)]) {
    case kNewline:
      NewLine(p);
      ++m_Cur;
      break;
    case kOpenBrace:
      if (depth + level >= kMaxDepth)
        Fail(Where(), "groups nested deeper than " + std::to_string(kMaxDepth));
      ++level;
      ++m_Cur;
      break;
    case kCloseBrace:
      ++m_Cur;
      if (--level == 0)
        return;
      break;
    case kQuote:
      Quoted(false);
      break;
    case kSlash: {
      int const next = PeekAt(1);
      if (next == '*')
        SkipBlockComment();
      else if (next == '/')
        SkipLineComment();
      else
        ++m_Cur;
      break;
    }
    default:
      Fail(Where(), "NUL byte");
    }
  }
}

void Lum_LibertyScanner::Assign(std::string &out, std::string_view token) {
  out.clear();
  for (std::size_t i = 0; i < token.size(); ++i) {
    if (token[i] == '\\' && i + 1 < token.size() && token[i + 1] == '\n') {
      ++i;
      continue;
    }
    if (token[i] == '\\' && i + 2 < token.size() && token[i + 1] == '\r' && token[i + 2] == '\n') {
      i += 2;
      continue;
    }
    out += token[i];
  }
}

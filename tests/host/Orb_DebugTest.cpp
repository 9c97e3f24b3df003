#include "host/HostTestSupport.h"

#include "Lum_Exception.h"
#include "Orb_Debug.h"
#include "Orb_Exception.h"
#include "Port_MsgManData.h"
#include "Port_Stream.h"
#include "Port_String.h"
#include "UT_TIMESTAMP.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <climits>
#include <cstdint>
#include <string>
#include <tuple>
#include <vector>

namespace {

// Restores the printer's output when a test ends.
class DebugOutputGuard {
public:
  explicit DebugOutputGuard(Port::Stream *stream) : m_pPrevious(Orb_Debug::SetOutput(stream)) {}
  ~DebugOutputGuard() { Orb_Debug::SetOutput(m_pPrevious); }

private:
  Port::Stream *m_pPrevious;
};

// ---------------------------------------------------------------------------
// Conversions, through every entry that formats

enum class Via { StreamPrinter, RedirectedPrinter, DoFormat };

template <class... Args> std::string Render(Via via, char const *format, Args... args) {
  switch (via) {
  case Via::StreamPrinter: {
    Port::StringStream out;
    Orb_Debug::Printf(&out, 0, format, args...);
    return out.GetText();
  }
  case Via::RedirectedPrinter: {
    Port::StringStream out;
    DebugOutputGuard guard(&out);
    Orb_Debug::Printf(format, args...);
    return out.GetText();
  }
  case Via::DoFormat: {
    Port::StringBase<char> text("stale");
    text.doFormat(format, args...);
    return text.c_str();
  }
  }
  return "";
}

struct FormatCase {
  char const *label;
  char const *expected;
  std::string (*render)(Via);
};

#define FORMAT_CASE(label, expected, ...)                                                          \
  FormatCase {                                                                                     \
    label, expected, [](Via via) { return Render(via, __VA_ARGS__); }                              \
  }

std::string FormatCaseName(::testing::TestParamInfo<std::tuple<FormatCase, Via>> const &info) {
  static char const *const vias[] = {"Stream", "Redirected", "DoFormat"};
  return std::string(std::get<0>(info.param).label) + "_" +
         vias[static_cast<int>(std::get<1>(info.param))];
}

class FormatTest : public ::testing::TestWithParam<std::tuple<FormatCase, Via>> {};

// Each conversion reads exactly its documented argument and prints it the
// same way in the printer and in doFormat.
TEST_P(FormatTest, Converts) {
  auto const &[c, via] = GetParam();
  EXPECT_EQ(c.render(via), c.expected) << c.label;
}

INSTANTIATE_TEST_SUITE_P(
    Conversions, FormatTest,
    ::testing::Combine(
        ::testing::Values(
            FORMAT_CASE("plain", "no conversion", "no conversion"),
            FORMAT_CASE("string", "<abc>", "<%s>", "abc"),
            FORMAT_CASE("nullString", "(null)", "%s", static_cast<char const *>(nullptr)),
            FORMAT_CASE("negative", "-42", "%d", -42),
            FORMAT_CASE("intMin", "-2147483648", "%d", INT_MIN),
            FORMAT_CASE("intMax", "2147483647 0", "%d %d", INT_MAX, 0),
            FORMAT_CASE("unsignedMax", "4294967295", "%u", UINT_MAX),
            FORMAT_CASE("char", "[A]", "[%c]", 'A'),
            FORMAT_CASE("pointerHex", "0xdeadbeefcafe", "0x%x",
                        static_cast<std::uintptr_t>(0xdeadbeefcafeULL)),
            FORMAT_CASE("hexZero", "0", "%x", static_cast<std::uintptr_t>(0)),
            FORMAT_CASE("uint64", "5000000000", "%lU", static_cast<std::uint64_t>(5000000000ULL)),
            FORMAT_CASE("uint64Max", "18446744073709551615 7", "%lU %d", UINT64_MAX, 7),
            FORMAT_CASE("percent", "100% done", "100%% done"),
            // Unknown conversions are copied and read no argument: the next
            // known conversion still gets the first argument.
            FORMAT_CASE("unknown", "%q 7", "%q %d", 7),
            FORMAT_CASE("widthIsUnknown", "%5d|3", "%5d|%d", 3),
            FORMAT_CASE("lowercaseLong", "%ld 9", "%ld %d", 9),
            FORMAT_CASE("trailingPercent", "50%", "50%"),
            FORMAT_CASE("mixed", "pin <p1> of 3 at 0xff", "pin <%s> of %u at 0x%x", "p1", 3u,
                        static_cast<std::uintptr_t>(255))),
        ::testing::Values(Via::StreamPrinter, Via::RedirectedPrinter, Via::DoFormat)),
    FormatCaseName);

// The stream form writes two blanks per indentation level before the text;
// a level below one writes none.
TEST(OrbDebugTest, StreamFormIndents) {
  Port::StringStream out;
  Orb_Debug::Printf(&out, 2, "a %d\n", 1);
  Orb_Debug::Printf(&out, 0, "b\n");
  Orb_Debug::Printf(&out, -1, "c\n");
  EXPECT_EQ(out.GetText(), "    a 1\nb\nc\n");
}

// SetOutput redirects the first form and hands back the previous output; a
// null stream in the second form follows the redirection too.
TEST(OrbDebugTest, SetOutputRedirects) {
  Port::StringStream first;
  Port::StringStream second;
  DebugOutputGuard guard(&first);
  Orb_Debug::Printf("one\n");
  EXPECT_EQ(Orb_Debug::SetOutput(&second), &first);
  Orb_Debug::Printf("two\n");
  Orb_Debug::Printf(nullptr, 1, "three\n");
  EXPECT_EQ(Orb_Debug::SetOutput(&first), &second);
  EXPECT_EQ(first.GetText(), "one\n");
  EXPECT_EQ(second.GetText(), "two\n  three\n");
}

// A host object's dump prints its kind, name and properties, then lets the
// client of every context add its lines; a client's Dbg prints the same
// host part to the debug output.
TEST(OrbDebugTest, DumpsIncludeClientLines) {
  HostTest::EventLog log;
  HostTest::RecModel model(&log);
  Orb_View *view = model.GetOrbModel()->CreateDesignMgr("dm")->CreateDesign("d")->CreateView("v");
  Orb_Block *top = view->CreateTopBlock("top");
  top->CreatePropertyString("K", "v 1");
  top->CreatePropertyStringList("L")->AppendString("x");

  Port::StringStream out;
  top->DebugDump(&out, 1);
  EXPECT_EQ(out.GetText(), "  block <top>\n    K = <v 1>\n    L (string list):\n      <x>\n"
                           "    rec client (created)\n");

  Port::StringStream dbg;
  DebugOutputGuard guard(&dbg);
  model.GetClient(top)->Dbg();
  EXPECT_EQ(dbg.GetText(), "block <top>\n  K = <v 1>\n  L (string list):\n    <x>\n");
}

// ---------------------------------------------------------------------------
// Messages

// Captured reports arrive in issue order with severity and origin; captures
// nest, the innermost collecting while it lives.
TEST(PortMsgTest, CapturesInOrderAndNests) {
  Port_MsgCapture outer;
  Port_MsgManData const record =
      Port_MsgManData::createObject("Lum", "../s/Lum_TdmView", 42, "$Revision: 1.7 $");
  record.issueError("view <%s> is %d.%d", "v", 3, 1);
  {
    Port_MsgCapture inner;
    Port_MsgManData::debugStub("inner %s", "warning");
    ASSERT_EQ(inner.GetReports().size(), 1u);
    EXPECT_EQ(inner.GetReports()[0].text, "inner warning");
  }
  Port_MsgManData::debugStub("library %s skipped", "gates");

  auto const &reports = outer.GetReports();
  ASSERT_EQ(reports.size(), 2u);
  EXPECT_EQ(reports[0].severity, Port_MsgReport::ERROR);
  EXPECT_EQ(reports[0].subsystem, "Lum");
  EXPECT_EQ(reports[0].path, "../s/Lum_TdmView");
  EXPECT_EQ(reports[0].line, 42);
  EXPECT_EQ(reports[0].revision, "$Revision: 1.7 $");
  EXPECT_EQ(reports[0].text, "view <v> is 3.1");
  EXPECT_EQ(reports[1].severity, Port_MsgReport::DEBUG_WARNING);
  EXPECT_EQ(reports[1].text, "library gates skipped");
}

// ---------------------------------------------------------------------------
// Strings

struct ReplaceCase {
  char const *text;
  char const *from;
  char const *to;
  char const *expected;
  std::size_t count;
};

class StringReplaceTest : public ::testing::TestWithParam<ReplaceCase> {};

// Replace works left to right on non-overlapping occurrences and never
// rescans what it inserted.
TEST_P(StringReplaceTest, Replaces) {
  ReplaceCase const &c = GetParam();
  Port::StringBase<char> text(c.text);
  EXPECT_EQ(text.Replace(c.from, c.to), c.count) << c.text;
  EXPECT_STREQ(text.c_str(), c.expected) << c.text;
}

INSTANTIATE_TEST_SUITE_P(Cases, StringReplaceTest,
                         ::testing::Values(ReplaceCase{"a.b.c", ".", "::", "a::b::c", 2},
                                           ReplaceCase{"aaa", "aa", "b", "ba", 1},
                                           ReplaceCase{"aa", "a", "aa", "aaaa", 2},
                                           ReplaceCase{"x-y-", "-", "", "xy", 2},
                                           ReplaceCase{"abc", "x", "y", "abc", 0},
                                           ReplaceCase{"abc", "", "y", "abc", 0},
                                           ReplaceCase{"", "a", "b", "", 0}));

std::vector<std::string> Tokens(char const *text, char const *delimiters) {
  Port::StringBase<char> const string(text);
  std::vector<std::string> tokens;
  std::size_t begin = 0;
  std::size_t end = 0;
  while (string.NextTokenRange(end, delimiters, begin, end))
    tokens.push_back(string.str().substr(begin, end - begin));
  return tokens;
}

// NextTokenRange skips runs of delimiters and finds nothing in an empty or
// all-delimiter string, or past the end.
TEST(PortStringTest, NextTokenRange) {
  EXPECT_EQ(Tokens(" a,b  ,,c ", " ,"), (std::vector<std::string>{"a", "b", "c"}));
  EXPECT_EQ(Tokens("lib:1.2 :x", ": "), (std::vector<std::string>{"lib", "1.2", "x"}));
  EXPECT_TRUE(Tokens("", ",").empty());
  EXPECT_TRUE(Tokens(",,,", ",").empty());
  std::size_t begin = 0;
  std::size_t end = 0;
  EXPECT_FALSE(Port::StringBase<char>("abc").NextTokenRange(10, ",", begin, end));
}

// Ordering takes bytes as unsigned, a prefix first; equality needs equal
// length and bytes, embedded NULs included.
TEST(PortStringTest, OrderingAndEquality) {
  using S = Port::StringBase<char>;
  std::vector<S> strings = {"z", "\xff", "ab", "a", "", "B", "\x80", "A"};
  std::sort(strings.begin(), strings.end());
  std::string order;
  for (S const &s : strings)
    order += "[" + s.str() + "]";
  EXPECT_EQ(order, "[][A][B][a][ab][z][\x80][\xff]");
  EXPECT_FALSE(S("a") < S("a"));

  EXPECT_EQ(S("a\0b", 3), S("a\0b", 3));
  EXPECT_NE(S("a\0b", 3), S("a"));
  EXPECT_NE(S("a"), S("A"));
  S text("lib");
  text += ":";
  text += S("gates");
  text += '!';
  EXPECT_EQ(text, S("lib:gates!"));
  EXPECT_EQ(text.length(), 10u);
}

// ---------------------------------------------------------------------------
// Time stamps and exceptions

// Time stamps print as ISO 8601 UTC.
TEST(UtTimestampTest, IsoUtcText) {
  EXPECT_EQ(UT_TIMESTAMP(0).getTimeStampString(), "1970-01-01T00:00:00Z");
  EXPECT_EQ(UT_TIMESTAMP(1769862896).getTimeStampString(), "2026-01-31T12:34:56Z");
  std::string const now = UT_TIMESTAMP().getTimeStampString();
  ASSERT_EQ(now.size(), 20u) << now;
  EXPECT_EQ(now[4], '-');
  EXPECT_EQ(now[10], 'T');
  EXPECT_EQ(now[19], 'Z');
}

// An exception keeps every field and names all of them in what().
TEST(PortExceptionTest, WhatCarriesAllFields) {
  Lum_ExceptionInvalidTypeBlock const e("Lum", "../s/Lum_TdmBlock", "$Revision: 1.22 $", 417,
                                        "adder", "No such type block.", false);
  EXPECT_EQ(e.GetSubsystem(), "Lum");
  EXPECT_EQ(e.GetFile(), "../s/Lum_TdmBlock");
  EXPECT_EQ(e.GetRevision(), "$Revision: 1.22 $");
  EXPECT_EQ(e.GetLine(), 417);
  EXPECT_EQ(e.GetObjectName(), "adder");
  EXPECT_EQ(e.GetMessage(), "No such type block.");
  EXPECT_FALSE(e.GetFlag());
  std::string const what = e.what();
  for (char const *part :
       {"Lum", "../s/Lum_TdmBlock", "$Revision: 1.22 $", "417", "adder", "No such type block."})
    EXPECT_NE(what.find(part), std::string::npos) << "missing " << part << " in " << what;
  EXPECT_EQ(what.find('\n'), std::string::npos) << what;

  Orb_Exception const host("host/Orb_Model", 12, "blk", "Duplicate.");
  EXPECT_EQ(host.GetSubsystem(), "Orb");
  EXPECT_EQ(host.GetRevision(), "");
  EXPECT_NE(std::string(host.what()).find("host/Orb_Model:12"), std::string::npos) << host.what();
}

} // namespace

#include "host/HostTestSupport.h"

#include "Orb_Debug.h"
#include "Port_MsgManData.h"
#include "Port_Stream.h"
#include "Port_String.h"

#include <gtest/gtest.h>

#include <climits>
#include <cstdint>
#include <string>
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

// Text of the stream printer, the redirected printer and doFormat (which replaces the string).
template <class... Args> std::vector<std::string> Render(char const *format, Args... args) {
  Port::StringStream stream;
  Port::StringStream redirected;
  Orb_Debug::Printf(&stream, 0, format, args...);
  {
    DebugOutputGuard guard(&redirected);
    Orb_Debug::Printf(format, args...);
  }
  Port::StringBase<char> text("stale");
  text.doFormat(format, args...);
  return {stream.GetText(), redirected.GetText(), text.c_str()};
}

// Each conversion reads exactly its argument and prints alike through every entry. Flags, width
// and precision apply to every conversion and consume no argument of their own. An unknown or
// unfinished conversion ends the formatting: the rest is text, and no argument is read.
TEST(OrbDebugTest, Conversions) {
  std::pair<std::vector<std::string>, char const *> const cases[] = {
      {Render("100%% done"), "100% done"},
      {Render("<%s> %s", "abc", static_cast<char const *>(nullptr)), "<abc> (null)"},
      {Render("%d %d %d %u", INT_MIN, INT_MAX, 0, UINT_MAX), "-2147483648 2147483647 0 4294967295"},
      {Render("[%c]", 'A'), "[A]"},
      {Render("0x%x %x", std::uintptr_t(0xdeadbeefcafeULL), std::uintptr_t(0)), "0xdeadbeefcafe 0"},
      {Render("%lU %lU %d", std::uint64_t(5000000000ULL), UINT64_MAX, 7),
       "5000000000 18446744073709551615 7"},
      {Render("%d %q %5d|%s", 1, 7, "x"), "1 %q %5d|%s"},
      {Render("%s %ld %d", "a", 7L, 8), "a %ld %d"},
      {Render("%U %d", 8), "%U %d"},
      {Render("50%"), "50%"},
      {Render("%5.", 1), "%5."},
      {Render("%99999d|%s", 1, "x"), "%99999d|%s"},
      {Render("%5d|%s", 42, "next"), "   42|next"},
      {Render("[%-5d][%05d][%+d][% d][%.3d][%-+6.2d]", 7, -42, 3, 3, 5, 9),
       "[7    ][-0042][+3][ 3][005][+09   ]"},
      {Render("[%08d][%3d][%.0d][%5.0d]", INT_MIN, -7, 0, 0), "[-2147483648][ -7][][     ]"},
      {Render("[%-8s][%8s][%.3s][%5.2s][%.0s][%.9s]", "ab", "ab", "abcdef", "xyz", "q",
              static_cast<char const *>(nullptr)),
       "[ab      ][      ab][abc][   xy][][(null)]"},
      {Render("[%3c][%-3c][%5%]", 'a', 'b'), "[  a][b  ][%]"},
      {Render("[%08x][%#x][%#x][%-6x][%+u][%010u]", std::uintptr_t(0xbeef), std::uintptr_t(0xbeef),
              std::uintptr_t(0), std::uintptr_t(0xa), 5u, UINT_MAX),
       "[0000beef][0xbeef][0][a     ][5][4294967295]"},
      {Render("[%22lU][%-3lU][%.4lU]", UINT64_MAX, std::uint64_t(1), std::uint64_t(7)),
       "[  18446744073709551615][1  ][0007]"}};
  for (auto const &[rendered, expected] : cases)
    EXPECT_EQ(rendered, std::vector<std::string>(3, expected));
}

// Each text converts as far as it can: a number out of range fails and stops the scan, and so
// does a conversion the scanner does not know, before it reads that argument. The targets start
// as 0; they are read as unsigned, so that a negative %d shows as its 32-bit value.
TEST(PortScanTest, ConvertsWithinRange) {
  struct {
    char const *text, *format;
    int result;
    unsigned first = 0, second = 0;
  } const cases[] = {{"3.1", "%d.%d", 2, 3, 1},
                     {"3", "%d.%d", 1, 3, 0},
                     {"", "%d.%d", EOF},
                     {"  ", "%d.%d", EOF},
                     {"abc", "%d.%d", 0},
                     {"3,1", "%d.%d", 1, 3, 0},
                     {" +7.-2x", "%d.%d", 2, 7, 0xFFFFFFFEu},
                     {"-1.0", "%d.%d", 2, 0xFFFFFFFFu, 0},
                     {"2147483647.-2147483648", "%d.%d", 2, 0x7FFFFFFFu, 0x80000000u},
                     {"2147483648.1", "%d.%d", 0},
                     {"4294967296.0", "%d.%d", 0},
                     {"99999999999999999999.1", "%d.%d", 0},
                     {"1.-2147483649", "%d.%d", 1, 1, 0},
                     {"-.5", "%d.%d", 0},
                     {"4294967295.0", "%u.%u", 2, 0xFFFFFFFFu, 0},
                     {"4294967296.0", "%u.%u", 0},
                     {"2.-1", "%u.%u", 2, 2, 0xFFFFFFFFu},
                     {"1.99999999999999999999999", "%u.%u", 1, 1, 0},
                     {" -5 %x9", " %d %% x%u", 2, 0xFFFFFFFBu, 9},
                     {"-5%x9", " %d %% x%u", 2, 0xFFFFFFFBu, 9},
                     {"-5 x9", " %d %% x%u", 1, 0xFFFFFFFBu, 0}};
  for (auto const &c : cases) {
    SCOPED_TRACE(std::string(c.text) + " with " + c.format);
    int a = 0, b = 0;
    unsigned first = 0, second = 0;
    int result = 0;
    if (std::string(c.format) == "%d.%d") {
      result = Port::sscanf(c.text, "%d.%d", &a, &b);
      first = static_cast<unsigned>(a);
      second = static_cast<unsigned>(b);
    } else if (std::string(c.format) == "%u.%u") {
      result = Port::sscanf(c.text, "%u.%u", &first, &second);
    } else {
      result = Port::sscanf(c.text, " %d %% x%u", &a, &second);
      first = static_cast<unsigned>(a);
    }
    EXPECT_EQ(result, c.result);
    EXPECT_EQ(first, c.first);
    EXPECT_EQ(second, c.second);
  }

  unsigned value = 0;
  char word[8] = "keep";
  EXPECT_EQ(Port::sscanf("8 word", "%u %7s", &value, word), 1);
  EXPECT_EQ(value, 8u);
  EXPECT_STREQ(word, "keep");
}

// Two blanks per indent level; SetOutput redirects (also a null stream) and returns the old one.
TEST(OrbDebugTest, IndentsAndRedirects) {
  Port::StringStream first;
  Port::StringStream second;
  Orb_Debug::Printf(&first, 2, "a %d\n", 1);
  Orb_Debug::Printf(&first, -1, "b\n");
  DebugOutputGuard guard(&first);
  Orb_Debug::Printf("one\n");
  EXPECT_EQ(Orb_Debug::SetOutput(&second), &first);
  Orb_Debug::Printf("two\n");
  Orb_Debug::Printf(nullptr, 1, "three\n");
  EXPECT_EQ(first.GetText(), "    a 1\nb\none\n");
  EXPECT_EQ(second.GetText(), "two\n  three\n");
}

// An object's dump adds every client's lines; a client's Dbg prints the host part.
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

// Captures get reports in order with severity and origin; the innermost capture collects.
TEST(PortMsgTest, CapturesInOrderAndNests) {
  Port_MsgCapture outer;
  Port_MsgManData::createObject("Lum", "../s/Lum_TdmView", 42, "$Revision: 1.7 $")
      .issueError("view <%s> is %d.%d", "v", 3, 1);
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
  EXPECT_EQ(reports[0].subsystem + reports[0].path + ":" + std::to_string(reports[0].line) +
                reports[0].revision + " " + reports[0].text,
            "Lum../s/Lum_TdmView:42$Revision: 1.7 $ view <v> is 3.1");
  EXPECT_EQ(reports[1].severity, Port_MsgReport::DEBUG_WARNING);
  EXPECT_EQ(reports[1].text, "library gates skipped");
}

} // namespace

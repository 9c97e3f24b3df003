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

// Each conversion reads exactly its argument and prints alike through every entry.
TEST(OrbDebugTest, Conversions) {
  auto everywhere = [](char const *text) { return std::vector<std::string>(3, text); };
  EXPECT_EQ(Render("100%% done"), everywhere("100% done"));
  EXPECT_EQ(Render("<%s> %s", "abc", static_cast<char const *>(nullptr)),
            everywhere("<abc> (null)"));
  EXPECT_EQ(Render("%d %d %d %u", INT_MIN, INT_MAX, 0, UINT_MAX),
            everywhere("-2147483648 2147483647 0 4294967295"));
  EXPECT_EQ(Render("[%c]", 'A'), everywhere("[A]"));
  EXPECT_EQ(Render("0x%x %x", static_cast<std::uintptr_t>(0xdeadbeefcafeULL),
                   static_cast<std::uintptr_t>(0)),
            everywhere("0xdeadbeefcafe 0"));
  EXPECT_EQ(Render("%lU %lU %d", static_cast<std::uint64_t>(5000000000ULL), UINT64_MAX, 7),
            everywhere("5000000000 18446744073709551615 7"));
  // Unknown conversions are copied and read no argument.
  EXPECT_EQ(Render("%q %5d|%ld %d 50%", 7), everywhere("%q %5d|%ld 7 50%"));
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

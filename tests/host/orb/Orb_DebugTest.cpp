#include "host/HostTestSupport.h"

#include "Orb_Debug.h"
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

} // namespace

#include "Port_MsgManData.h"

#include <gtest/gtest.h>

#include <string>

namespace {

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

// The design mark: written on creation and at commit, checked on load.

#include "Lum_TdmSchema.h"
#include "Lum_TdmTestSupport.h"

#include <gtest/gtest.h>

using namespace lumtest;

namespace {

class TdmDesignTest : public ::testing::Test {
protected:
  TempDir m_Dir;
};

// A new design is marked as a user design. A loaded design without a mark is
// a user design; loading writes nothing, the next commit of one of its views
// marks it, and the mark is stored.
TEST_F(TdmDesignTest, NewDesignIsMarkedAndUnmarkedOneMarkedByCommit) {
  TypedDesign design;
  EXPECT_EQ(PropertyValue(design.m_pDesign, Lum_TdmSchema::kDesignType),
            Lum_TdmSchema::kDesignTypeUser);
  EXPECT_TRUE(design.m_pDesign->IsUserDesign());
  design.m_pDesign->DeleteProperty(Lum_TdmSchema::kDesignType);
  auto reopened = SaveAndReopen(design.Model(), m_Dir.File("unmarked.odb"));
  Lum_TdmView *view = FirstView(*reopened);
  Lum_TdmDesign *loaded = view->GetParent();
  EXPECT_EQ(PropertyValue(loaded, Lum_TdmSchema::kDesignType), "<absent>")
      << "loading writes nothing";
  EXPECT_TRUE(loaded->IsUserDesign());
  view->CommitAll();
  EXPECT_EQ(PropertyValue(loaded, Lum_TdmSchema::kDesignType), Lum_TdmSchema::kDesignTypeUser);
  auto again = SaveAndReopen(*reopened, m_Dir.File("d2.odb"));
  EXPECT_EQ(PropertyValue(FirstView(*again)->GetParent(), Lum_TdmSchema::kDesignType),
            Lum_TdmSchema::kDesignTypeUser);
}

// A mark given before the library's creation event is kept, even a foreign
// one, and creating such a design reports nothing.
TEST_F(TdmDesignTest, ExistingMarkIsNeverOverwritten) {
  Orb_Model host("h", "h", "", false);
  EarlierSubscriber first(&host);
  first.m_OnDesign = [](Orb_Design *design) {
    design->CreatePropertyString(Lum_TdmSchema::kDesignType, Lum_TdmSchema::kDesignTypeLibrary);
  };
  Lum_TdmModel model(&host);
  Port_MsgCapture capture;
  Orb_Design *design = host.CreateDesignMgr("dm")->CreateDesign("d");
  ASSERT_NE(model.GetClient(design), nullptr);
  EXPECT_STREQ(design->GetPropertyByName(Lum_TdmSchema::kDesignType)->GetStringValue(),
               Lum_TdmSchema::kDesignTypeLibrary);
  EXPECT_TRUE(capture.GetReports().empty());
  EXPECT_FALSE(Lum_TdmDesign::IsUserDesign(*design));
}

// Any mark other than exactly Lum_TdmSchema::kDesignTypeUser is refused on load, and
// the refused open leaves no client and no host object behind.
TEST_F(TdmDesignTest, LoadRefusesForeignMarks) {
  for (char const *mark : {Lum_TdmSchema::kDesignTypeLibrary, "", "tds_design_type_user",
                           "TDS_DESIGN_TYPE_USER ", " TDS_DESIGN_TYPE_USER"}) {
    SCOPED_TRACE(std::string("mark <") + mark + ">");
    std::string const path = m_Dir.File("d.odb");
    {
      TypedDesign design;
      design.m_pView->CreateTopBlock("top")->CreatePin("p", Orb_Pin::PIN_INPUT);
      design.m_pDesign->CreatePropertyString(Lum_TdmSchema::kDesignType, mark);
      design.Model().Save(path.c_str());
    }
    Lum_TdmModel reopened("r", "r", "");
    try {
      reopened.Open(path.c_str());
      ADD_FAILURE() << "the design was accepted";
    } catch (Lum_ExceptionDesignLoad const &e) {
      EXPECT_EQ(e.GetMessage(), "Attempt to specialize non-Tdm design.");
      EXPECT_EQ(e.GetObjectName(), "top");
      EXPECT_EQ(e.GetFile(), "../s/Lum_TdmDesign");
    }
    EXPECT_EQ(reopened.GetClientCount(), 0u);
    EXPECT_TRUE(reopened.GetOrbModel()->GetDesignMgrs().empty());
  }
}

// The static tests read the host design directly and need no client; a type
// block's design, made by the type-library component, is a type block
// design and not a user design.
TEST_F(TdmDesignTest, StaticTestsNeedNoClient) {
  Orb_Model host("h", "h", "", false);
  Orb_Design *design = host.CreateDesignMgr("dm")->CreateDesign("d");
  for (char const *mark : {"", Lum_TdmSchema::kDesignTypeLibrary, Lum_TdmSchema::kDesignTypeUser}) {
    if (*mark)
      design->CreatePropertyString(Lum_TdmSchema::kDesignType, mark);
    bool const library = std::string(mark) == Lum_TdmSchema::kDesignTypeLibrary;
    EXPECT_EQ(Lum_TdmDesign::IsUserDesign(*design), !library) << mark;
    EXPECT_EQ(Lum_TdmDesign::IsTypeBlockDesign(*design), library) << mark;
  }

  TestLibrary typeLibrary("LIBD", 1, 0);
  Lum_TlmBlock *typeBlock = typeLibrary.AddTypeBlock("AND2", {"A", "B"});
  Orb_Design const &typeDesign = *typeBlock->GetView()->GetParent()->GetOrbDesign();
  EXPECT_TRUE(Lum_TdmDesign::IsTypeBlockDesign(typeDesign));
  EXPECT_FALSE(Lum_TdmDesign::IsUserDesign(typeDesign));
}

} // namespace

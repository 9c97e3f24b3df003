// The debug dumps: each class's own (Dbg), the callback dumps in the host's, the type pin map's.

#include "Lum_TdmTestSupport.h"

#include "Lum_TdmTypePinMap.h"

#include "Lum_TdmSchema.h"
#include "Orb_Debug.h"
#include "Port_Stream.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdint>
#include <regex>
#include <sstream>
#include <string>

using namespace lumtest;
using ::testing::AllOf;
using ::testing::EndsWith;
using ::testing::HasSubstr;

namespace {

std::string const R = "=======================================\n";
std::string const P = "+++++++++++++++++++++++++++++++++++++++\n";

// Collects what Orb_Debug prints while it lives.
struct Capture {
  Port::StringStream m_Out;
  Port::Stream *m_pPrevious = Orb_Debug::SetOutput(&m_Out);
  ~Capture() { Orb_Debug::SetOutput(m_pPrevious); }
  std::string Take() {
    std::string text = m_Out.GetText();
    m_Out.Clear();
    return text;
  }
};

std::string Hex(void const *pointer) {
  std::ostringstream text;
  text << "0x" << std::hex << reinterpret_cast<std::uintptr_t>(pointer);
  return text.str();
}

std::string HostDump(Orb_Persistent const *object) {
  Port::StringStream out;
  object->DebugDump(&out, 1);
  return out.GetText();
}

class NoisyBlock : public Lum_TdmBlock {
public:
  using Lum_TdmBlock::Lum_TdmBlock;

protected:
  void DbgImpl() const override {
    Lum_TdmBlock::DbgImpl();
    Orb_Debug::Printf("noisy\n");
  }
};

// Type libraries LIBD (AND2: A, B) and LIBE.
class TdmDbgTest : public ::testing::Test {
protected:
  TdmDbgTest() : m_Library("LIBD", 1, 0), m_Other("LIBE", 2, 3) {
    m_pAnd2 = m_Library.AddTypeBlock("AND2", {"A", "B"});
  }

  TempDir m_Dir;
  TestLibrary m_Library;
  TestLibrary m_Other;
  Lum_TlmBlock *m_pAnd2 = nullptr;
};

// Classes without fields show a class line only; an unmarked design reads as
// TDS_DESIGN_TYPE_USER, a foreign mark as it stands, and no dump writes the mark.
TEST_F(TdmDbgTest, ClassLinesAndTheDesignMark) {
  TypedDesign design;
  Lum_TdmSignal *signal = design.m_pView->CreateTopBlock("top")->CreateSignal("s");
  Capture capture;
  design.m_pDesignMgr->Dbg();
  EXPECT_EQ(capture.Take(), R + "Data for class <Lum_TdmDesignMgr>:\n" + R +
                                "Orb data:\ndesign manager <dm>\n" + R);
  design.Model().Dbg();
  EXPECT_THAT(capture.Take(), HasSubstr(R + "Data for class <Lum_TdmModel>:\n" + R));
  signal->Dbg();
  EXPECT_THAT(capture.Take(), HasSubstr(R + "Data for class <Lum_TdmSignal>:\n" + R));
  design.m_pView->CreateNetwork("n")->Dbg();
  EXPECT_THAT(capture.Take(), HasSubstr(R + "Data for class <Lum_TdmNetwork>:\n" + R));

  Lum_TdmDesign *d = design.m_pDesign;
  for (char const *mark : {Lum_TdmSchema::kDesignTypeUser, "", "FOREIGN"}) {
    std::string const shown = *mark ? mark : Lum_TdmSchema::kDesignTypeUser;
    d->DeleteProperty(Lum_TdmSchema::kDesignType);
    if (*mark)
      d->CreatePropertyString(Lum_TdmSchema::kDesignType, mark);
    d->Dbg();
    EXPECT_THAT(capture.Take(), HasSubstr("Design type = <" + shown + ">\n")) << mark;
    EXPECT_THAT(HostDump(d->GetOrbDesign()), HasSubstr("Design type = <" + shown + ">\n")) << mark;
    EXPECT_EQ(PropertyValue(d, Lum_TdmSchema::kDesignType), *mark ? mark : "<absent>");
  }
}

// The view's dump does not build its library list; after a commit it lists it in order.
TEST_F(TdmDbgTest, ViewShowsItsLibraryListOnceBuilt) {
  std::unique_ptr<Lum_TdmModel> model;
  {
    TypedDesign design;
    Orb_Property *libs = design.m_pView->CreatePropertyStringList(Lum_TdmSchema::kTypeLibraries);
    libs->AppendString("LIBE");
    libs->AppendString("LIBD");
    design.m_pView->CreatePropertyString(Lum_TdmSchema::kVersion, "2.5");
    model = SaveAndReopen(design.Model(), m_Dir.File("v.odb"));
  }
  Lum_TdmView *view = FirstView(*model);
  Capture capture;
  view->Dbg();
  EXPECT_THAT(capture.Take(), HasSubstr("m_pLibrary = <0x0> (# = 0):\n" + R));

  view->CommitAll();
  view->Dbg();
  std::string const after = std::regex_replace(
      capture.Take(), std::regex("m_pLibrary = <0x[1-9a-f][0-9a-f]*>"), "m_pLibrary = <ADDR>");
  EXPECT_EQ(after, R + "Data for class <Lum_TdmView>:\nm_Version = <2>, m_Revision = <5>\n" +
                       "(std::vector<const Lum_TlmLibrary *> *) m_pLibrary = <ADDR> (# = 2):\n" +
                       "  (Lum_TlmLibrary *) = <" + Hex(m_Other.Get()) + ">, (LIBE)\n" +
                       "  (Lum_TlmLibrary *) = <" + Hex(m_Library.Get()) + ">, (LIBD)\n" + R +
                       "Orb data:\nview <netlist>\n  TDS_TDM_VERSION = <3.1>\n" +
                       "  TDS_DEVICE_PM = <pm1>\n  TDS_DEVICE_PART = <part1>\n" +
                       "  TDS_VIEW_TYPE_LIBS (string list):\n    <LIBE 2.3>\n    <LIBD 1.0>\n" + R);
}

// A block and a pin show their types; callback dumps at the host's indentation: one exact
// dump, the others by their title.
TEST_F(TdmDbgTest, TypesAndCallbackDumps) {
  std::unique_ptr<Lum_TdmModel> model;
  {
    TypedDesign design;
    design.m_pView->CreatePropertyStringList(Lum_TdmSchema::kTypeLibraries)
        ->AppendString("LIBD 1.0");
    Lum_TdmBlock *u1 = design.m_pView->CreateTopBlock("top")->CreateBlock("u1", 0);
    u1->CreatePin("A", Orb_Pin::PIN_INPUT);
    u1->CreatePin("B", Orb_Pin::PIN_INPUT);
    u1->CreatePropertyString(Lum_TdmSchema::kBlockType, "LIBD:AND2");
    model = SaveAndReopen(design.Model(), m_Dir.File("typed.odb"));
  }
  Lum_TdmView *view = FirstView(*model);
  Lum_TdmBlock *u1 = view->GetBlock()->GetBlockByName("u1");
  Capture capture;
  u1->Dbg();
  EXPECT_THAT(capture.Take(), HasSubstr("<Lum_TdmBlock>:\n(Lum_TlmBlock *) m_pTypeBlock = <" +
                                        Hex(m_pAnd2) + ">, (AND2)\n" + R));
  u1->GetPinByName("B")->Dbg();
  EXPECT_THAT(capture.Take(), HasSubstr("<Lum_TdmPin>:\n(Lum_TlmPin *) m_TypePin = <" +
                                        Hex(m_pAnd2->GetPinByName("B")) + ">\n" + R));

  std::string const plus = "    " + P;
  EXPECT_EQ(HostDump(u1->GetOrbBlock()), "  block <u1>\n    TDS_BLOCK_TYPE = <LIBD:AND2>\n" + plus +
                                             "    Lum_TdmBlock Data\n" + plus);
  EXPECT_THAT(HostDump(u1->GetPinByName("A")->GetOrbPin()), HasSubstr("    Lum_TdmPin Data\n"));
  EXPECT_THAT(HostDump(view->CreateNetwork("n")->GetOrbNetwork()),
              HasSubstr("    Lum_TdmNetwork Data\n"));
  EXPECT_EQ(HostDump(view->GetParent()->GetParent()->GetOrbDesignMgr()), "  design manager <dm>\n");
  EXPECT_THAT(HostDump(view->GetOrbView()),
              HasSubstr("    Lum_TdmView Data\n    m_Version = <3>\n"));
}

// Dbg runs the most derived DbgImpl under the printing class's name; untyped shows null.
TEST_F(TdmDbgTest, ClassNameIsThatOfTheRunningDbgImpl) {
  TypedDesign design(std::make_unique<ClientModel<NoisyBlock>>());
  Lum_TdmBlock *top = design.m_pView->CreateTopBlock("top");
  Capture capture;
  top->Dbg();
  EXPECT_THAT(capture.Take(), AllOf(HasSubstr("<Lum_TdmBlock>:\n(Lum_TlmBlock *) m_pTypeBlock = "
                                              "<0x0>, ()\n"),
                                    EndsWith(R + "noisy\n")));
}

// A type pin map lists its entries in byte order of the names.
TEST_F(TdmDbgTest, TypePinMapListsEntriesInNameOrder) {
  std::string const head = "---------------------------------------\n"
                           "Data for class <Lum_TdmTypePinMap>:\n";
  Lum_TdmTypePinMap map;
  Capture capture;
  Lum_TlmPin const *a = m_pAnd2->GetPinByName("A");
  map.SetDefaultMap(true);
  map.SetPinMap("b", a);
  map.SetPinMap("B", nullptr);
  map.SetPinMap("a10", a);
  map.SetPinMap("a2", nullptr);
  map.Dbg();
  EXPECT_EQ(capture.Take(), head + "m_IsDefault = <true>\nm_PinMaps (# = 4:\n" +
                                "  design pin name = <B>, Lum_TlmPin * = <0x0> \n" +
                                "  design pin name = <a10>, Lum_TlmPin * = <" + Hex(a) + "> \n" +
                                "  design pin name = <a2>, Lum_TlmPin * = <0x0> \n" +
                                "  design pin name = <b>, Lum_TlmPin * = <" + Hex(a) + "> \n");
}

} // namespace

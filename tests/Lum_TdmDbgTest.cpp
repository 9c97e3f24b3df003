// The debug dumps of every class: each own dump (Dbg), each callback dump the
// host's dump of an object carries, and the type pin map's dump.

#include "Lum_TdmTestSupport.h"

#include "Lum_TdmTypePinMap.h"

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

// Collects what the printer's form without stream prints while it lives.
class Capture {
public:
  Capture() : m_pPrevious(Orb_Debug::SetOutput(&m_Out)) {}
  ~Capture() { Orb_Debug::SetOutput(m_pPrevious); }
  Capture(Capture const &) = delete;
  Capture &operator=(Capture const &) = delete;

  // What was printed since the last call.
  std::string Take() {
    std::string text = m_Out.GetText();
    m_Out.Clear();
    return text;
  }

private:
  Port::StringStream m_Out;
  Port::Stream *m_pPrevious;
};

// A pointer as the printer's %x shows it.
std::string Hex(void const *pointer) {
  std::ostringstream text;
  text << "0x" << std::hex << reinterpret_cast<std::uintptr_t>(pointer);
  return text.str();
}

// A host object's dump, client lines included, at indentation 1.
std::string HostDump(Orb_Persistent const *object) {
  Port::StringStream out;
  object->DebugDump(&out, 1);
  return out.GetText();
}

// A block whose own dump adds a line after the one it inherits.
class NoisyBlock : public Lum_TdmBlock {
public:
  using Lum_TdmBlock::Lum_TdmBlock;

protected:
  void DbgImpl() const override {
    Lum_TdmBlock::DbgImpl();
    Orb_Debug::Printf("noisy\n");
  }
};

// Type library LIBD (AND2 with pins A and B) and a design whose top block
// holds u1, stored as an instance of AND2.
class TdmDbgTest : public ::testing::Test {
protected:
  TdmDbgTest() : m_Library("LIBD", 1, 0), m_Other("LIBE", 2, 3) {
    m_pAnd2 = m_Library.AddTypeBlock("AND2", {"A", "B"});
  }

  std::unique_ptr<Lum_TdmModel> ReopenedTypedDesign() {
    TypedDesign design;
    design.m_pView->CreatePropertyStringList("TDS_VIEW_TYPE_LIBS")->AppendString("LIBD 1.0");
    Lum_TdmBlock *u1 = design.m_pView->CreateTopBlock("top")->CreateBlock("u1", 0);
    u1->CreatePin("A", Orb_Pin::PIN_INPUT);
    u1->CreatePin("B", Orb_Pin::PIN_INPUT);
    u1->CreatePropertyString("TDS_BLOCK_TYPE", "LIBD:AND2");
    return SaveAndReopen(design.Model(), m_Dir.File("typed.odb"));
  }

  TempDir m_Dir;
  TestLibrary m_Library;
  TestLibrary m_Other;
  Lum_TlmBlock *m_pAnd2 = nullptr;
};

// A block shows its type block's address and name, a pin its type pin's
// address; the frame around is checked once, with the design manager.
TEST_F(TdmDbgTest, BlockAndPinShowTheirTypes) {
  auto model = ReopenedTypedDesign();
  Lum_TdmBlock *u1 = FirstView(*model)->GetBlock()->GetBlockByName("u1");
  ASSERT_EQ(u1->GetTypeBlock(), m_pAnd2);
  Capture capture;
  u1->Dbg();
  EXPECT_THAT(capture.Take(), HasSubstr("<Lum_TdmBlock>:\n(Lum_TlmBlock *) m_pTypeBlock = <" +
                                        Hex(m_pAnd2) + ">, (AND2)\n" + R));
  u1->GetPinByName("B")->Dbg();
  EXPECT_THAT(capture.Take(), HasSubstr("<Lum_TdmPin>:\n(Lum_TlmPin *) m_TypePin = <" +
                                        Hex(m_pAnd2->GetPinByName("B")) + ">\n" + R));
}

// The model, design manager, signal and network print no lines of their own;
// they share one frame, so one exact dump and the others' class lines.
TEST_F(TdmDbgTest, ClassesWithoutFieldsShowTheHostPartOnly) {
  TypedDesign design;
  Lum_TdmSignal *signal = design.m_pView->CreateTopBlock("top")->CreateSignal("s");
  Lum_TdmNetwork *network = design.m_pView->CreateNetwork("n");
  Capture capture;
  design.m_pDesignMgr->Dbg();
  EXPECT_EQ(capture.Take(), R + "Data for class <Lum_TdmDesignMgr>:\n" + R +
                                "Orb data:\ndesign manager <dm>\n" + R);
  design.Model().Dbg();
  EXPECT_THAT(capture.Take(), HasSubstr(R + "Data for class <Lum_TdmModel>:\n" + R));
  signal->Dbg();
  EXPECT_THAT(capture.Take(), HasSubstr(R + "Data for class <Lum_TdmSignal>:\n" + R));
  network->Dbg();
  EXPECT_THAT(capture.Take(), HasSubstr(R + "Data for class <Lum_TdmNetwork>:\n" + R));
}

// The view's dump reads its library list without building it; after a commit
// it lists each library in list order. The version shown is the loaded one,
// while the commit restamps the host view.
TEST_F(TdmDbgTest, ViewShowsItsLibraryListOnceBuilt) {
  std::unique_ptr<Lum_TdmModel> model;
  {
    TypedDesign design;
    Orb_Property *libs = design.m_pView->CreatePropertyStringList("TDS_VIEW_TYPE_LIBS");
    libs->AppendString("LIBE");
    libs->AppendString("LIBD");
    design.m_pView->CreatePropertyString("TDS_TDM_VERSION", "2.5");
    model = SaveAndReopen(design.Model(), m_Dir.File("v.odb"));
  }
  Lum_TdmView *view = FirstView(*model);
  Capture capture;
  view->Dbg();
  EXPECT_THAT(capture.Take(), HasSubstr("m_pLibrary = <0x0> (# = 0):\n" + R));

  view->CommitAll();
  view->Dbg();
  // The vector's own address is not known outside the view.
  std::string const after = std::regex_replace(
      capture.Take(), std::regex("m_pLibrary = <0x[1-9a-f][0-9a-f]*>"), "m_pLibrary = <ADDR>");
  EXPECT_EQ(after, R + "Data for class <Lum_TdmView>:\nm_Version = <2>, m_Revision = <5>\n" +
                       "(std::vector<const Lum_TlmLibrary *> *) m_pLibrary = <ADDR> (# = 2):\n" +
                       "  (Lum_TlmLibrary *) = <" + Hex(m_Other.Get()) + ">, (LIBE)\n" +
                       "  (Lum_TlmLibrary *) = <" + Hex(m_Library.Get()) + ">, (LIBD)\n" + R +
                       "Orb data:\nview <netlist>\n  TDS_TDM_VERSION = <3.1>\n" +
                       "  TDS_DEVICE_PM = <pm1>\n  TDS_DEVICE_PART = <part1>\n" +
                       "  TDS_VIEW_TYPE_LIBS (string list):\n    <LIBE 2.3>\n    <LIBD 1.0>\n" + R);
  EXPECT_THAT(HostDump(view->GetOrbView()),
              HasSubstr("    " + P +
                        "    Lum_TdmView Data\n    m_Version = <2>\n    m_Revision = "
                        "<5>\n    " +
                        P));
}

// Both dumps of a design read "TDS_DESIGN_TYPE_USER" for a marked and for an
// unmarked design, and a foreign mark as it stands; none of them writes.
TEST_F(TdmDbgTest, DesignShowsItsMark) {
  TypedDesign design;
  Lum_TdmDesign *d = design.m_pDesign;
  Capture capture;
  d->Dbg();
  EXPECT_EQ(capture.Take(), R +
                                "Data for class <Lum_TdmDesign>:\nDesign type = "
                                "<TDS_DESIGN_TYPE_USER>\n" +
                                R + "Orb data:\ndesign <top>\n" +
                                "  TDS_DESIGN_TYPE = <TDS_DESIGN_TYPE_USER>\n" + R);
  EXPECT_EQ(HostDump(d->GetOrbDesign()),
            "  design <top>\n    TDS_DESIGN_TYPE = <TDS_DESIGN_TYPE_USER>\n    " + P +
                "    Lum_TdmDesign Data\n    Design type = <TDS_DESIGN_TYPE_USER>\n    " + P);

  for (char const *mark : {"", "FOREIGN"}) {
    std::string const shown = *mark ? mark : "TDS_DESIGN_TYPE_USER";
    d->DeleteProperty("TDS_DESIGN_TYPE");
    if (*mark)
      d->CreatePropertyString("TDS_DESIGN_TYPE", mark);
    d->Dbg();
    EXPECT_THAT(capture.Take(), HasSubstr("Design type = <" + shown + ">\n")) << mark;
    EXPECT_THAT(HostDump(d->GetOrbDesign()), HasSubstr("Design type = <" + shown + ">\n")) << mark;
    EXPECT_EQ(PropertyValue(d, "TDS_DESIGN_TYPE"), *mark ? mark : "<absent>");
  }
}

// The callback dumps share one frame at the indentation the host passes: one
// exact dump and the others' titles; the design manager adds nothing.
TEST_F(TdmDbgTest, CallbackDumpsCarryTheIndentation) {
  auto model = ReopenedTypedDesign();
  Lum_TdmView *view = FirstView(*model);
  Lum_TdmBlock *u1 = view->GetBlock()->GetBlockByName("u1");
  std::string const plus = "    " + P;
  EXPECT_EQ(HostDump(u1->GetOrbBlock()), "  block <u1>\n    TDS_BLOCK_TYPE = <LIBD:AND2>\n" + plus +
                                             "    Lum_TdmBlock Data\n" + plus);
  EXPECT_THAT(HostDump(u1->GetPinByName("A")->GetOrbPin()), HasSubstr("    Lum_TdmPin Data\n"));
  EXPECT_THAT(HostDump(u1->CreateSignal("s")->GetOrbSignal()),
              HasSubstr("    Lum_TdmSignal Data\n"));
  EXPECT_THAT(HostDump(view->CreateNetwork("n")->GetOrbNetwork()),
              HasSubstr("    Lum_TdmNetwork Data\n"));
  EXPECT_EQ(HostDump(view->GetParent()->GetParent()->GetOrbDesignMgr()), "  design manager <dm>\n");

  Port::StringStream out;
  view->DebugDumpCallback(&out, 3);
  EXPECT_THAT(out.GetText(), HasSubstr("      Lum_TdmView Data\n      m_Version = <3>\n"));
}

// Dbg runs the most derived DbgImpl; the class name is that of the DbgImpl
// printing it, not the object's. An untyped block shows null and nothing
// between the last parentheses.
TEST_F(TdmDbgTest, ClassNameIsThatOfTheRunningDbgImpl) {
  TypedDesign design(std::make_unique<ClientModel<NoisyBlock>>());
  Lum_TdmBlock *top = design.m_pView->CreateTopBlock("top");
  Capture capture;
  top->Dbg();
  EXPECT_THAT(capture.Take(), AllOf(HasSubstr("<Lum_TdmBlock>:\n(Lum_TlmBlock *) m_pTypeBlock = "
                                              "<0x0>, ()\n"),
                                    EndsWith(R + "noisy\n")));
}

// A type pin map prints its flag, its count and each entry in byte order of
// the names, with no closing line.
TEST_F(TdmDbgTest, TypePinMapListsEntriesInNameOrder) {
  std::string const head = "---------------------------------------\n"
                           "Data for class <Lum_TdmTypePinMap>:\n";
  Lum_TdmTypePinMap map;
  Capture capture;
  map.Dbg();
  EXPECT_THAT(capture.Take(), EndsWith("m_PinMaps (# = 0:\n"));
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

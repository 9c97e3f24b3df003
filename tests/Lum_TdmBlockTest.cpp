// Typed blocks: binding and pin reconciliation on load, pin order, commits;
// typed children, rebinding, typed queries and pin manifestation.

#include "Lum_TdmTestSupport.h"

#include "Lum_TdmPinAlpaSorter.h"

#include "Lum_TdmTypePinMap.h"
#include "Lum_TlmTypeID.h"
#include "Ora_GraftMgr.h"
#include "Orb_Exception.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cstring>
#include <map>
#include <optional>
#include <regex>
#include <utility>

using namespace lumtest;

namespace {

// The pins of a block in host order: each name, then ">type pin" when the
// type pin's name differs and "!" when the pin has none.
std::string PinText(Lum_TdmBlock const *block) {
  std::string text;
  for (std::size_t i = 0; i < block->GetPins().size(); ++i) {
    Lum_TdmPin const *pin = block->GetPin(i);
    text += (i ? "," : "") + std::string(pin->GetName());
    Lum_TlmPin const *typePin = pin->GetTypePin();
    if (!typePin)
      text += "!";
    else if (std::strcmp(typePin->GetName(), pin->GetName()) != 0)
      text += std::string(">") + typePin->GetName();
  }
  return text;
}

// The members of a list property as "name=value|...", or "<absent>".
std::string Members(Orb_ClientObject const *object, char const *name) {
  Orb_Property const *property = object->GetPropertyByName(name);
  if (!property)
    return "<absent>";
  std::string text;
  for (auto const &member : property->GetMembers())
    text += (text.empty() ? "" : "|") + std::string(member->GetName()) + "=" +
            std::string(member->GetValue());
  return text;
}

// The refusal of a type pin whose name a block's other pin already has.
std::string PatchUp(std::string const &block, std::string const &pin, std::string const &type) {
  return "While trying to patch up design block <" + block + "> with new type pin <" + pin +
         ">\nof type block <" + type +
         ">, found that the block already had a pin by that\nname.  This could have been due to "
         "an earlier and inappropriate\nclient call to pin->SetName().\n";
}

// What a test design's child block "u1" is stored with.
struct StoredBlock {
  char const *type;                                          // TDS_BLOCK_TYPE, or null for none
  std::vector<std::pair<char const *, bool>> pins;           // name, connected
  std::vector<std::pair<char const *, char const *>> pinMap; // TDS_BLOCK_PIN_MAP members
};

// Type library LIBT with REG (D0, D1, CLK inputs, Q output, EN bidirectional)
// and ABC (A, B inputs, C output), and designs that use it.
class TdmBlockTest : public ::testing::Test {
protected:
  TdmBlockTest() : m_Library("LIBT", 2, 1) {
    m_pReg = m_Library.AddTypeBlock("REG", {"D0", "D1", "CLK"});
    m_pReg->CreatePin("Q", Orb_Pin::PIN_OUTPUT);
    m_pReg->CreatePin("EN", Orb_Pin::PIN_BIDIRECTIONAL);
    m_pAbc = m_Library.AddTypeBlock("ABC", {"A", "B"});
    m_pAbc->CreatePin("C", Orb_Pin::PIN_OUTPUT);
  }

  // Saves a design "top" whose view lists LIBT (and, when asked, the local
  // library, saved with the database) and whose top block holds the child u1
  // as stored; returns the file.
  std::string WriteDesign(StoredBlock const &stored, bool dontCreatePins = false,
                          bool withLocalLibrary = false) {
    TypedDesign design;
    Orb_Property *libs = design.m_pView->CreatePropertyStringList("TDS_VIEW_TYPE_LIBS");
    libs->AppendString("LIBT 2.1");
    if (withLocalLibrary) {
      libs->AppendString(Lum_TlmLibrary::LOCAL_LIBRARY_NAME);
      Lum_TlmLibrary::GetLocalLibrary(design.Host(), PM_PIC("pm1", "part1", nullptr));
    }
    if (dontCreatePins)
      design.m_pView->CreatePropertyString("LUM_DONT_CREATE_UNUSED_PINS", "");
    Lum_TdmBlock *top = design.m_pView->CreateTopBlock("top");
    Lum_TdmSignal *signal = top->CreateSignal("s");
    Lum_TdmBlock *u1 = top->CreateBlock("u1", 0);
    for (auto const &[name, connected] : stored.pins) {
      Lum_TdmPin *pin = u1->CreatePin(name, Orb_Pin::PIN_INPUT);
      if (connected)
        pin->GetOrbPin()->Connect(signal->GetOrbSignal());
    }
    if (stored.type)
      u1->CreatePropertyString("TDS_BLOCK_TYPE", stored.type);
    if (!stored.pinMap.empty()) {
      Orb_Property *pinMap = u1->CreatePropertyList("TDS_BLOCK_PIN_MAP");
      for (auto const &[name, value] : stored.pinMap)
        pinMap->CreatePropertyString(name, value);
    }
    std::string path = m_Dir.File("d" + std::to_string(m_Files++) + ".odb");
    design.Model().Save(path.c_str());
    return path;
  }

  static Lum_TdmBlock *U1(Lum_TdmModel &model) {
    return FirstView(model)->GetBlock()->GetBlockByName("u1");
  }

  TempDir m_Dir;
  TestLibrary m_Library;
  Lum_TlmBlock *m_pReg = nullptr;
  Lum_TlmBlock *m_pAbc = nullptr;
  int m_Files = 0;
};

StoredBlock const kMappedReg{"LIBT:REG",
                             {{"DATA0", true}, {"CLK", false}, {"DATA1", true}},
                             {{"DATA0", "D0"}, {"DATA1", "D1"}}};

// ---------------------------------------------------------------------------
// Round trip

// A loaded block binds, maps, creates the pins it lacks and sorts; its commit
// writes its type and mapped pins, once. LUM_DONT_CREATE_UNUSED_PINS keeps
// the stored pins as they are.
TEST_F(TdmBlockTest, TypedDesignSurvivesSaveAndReopen) {
  auto model = OpenModel(WriteDesign(kMappedReg));
  Lum_TdmBlock *u1 = U1(*model);
  EXPECT_EQ(u1->GetTypeBlock(), m_pReg);
  EXPECT_EQ(PinText(u1), "CLK,DATA0>D0,DATA1>D1,EN,Q");
  EXPECT_EQ(u1->GetPinByName("EN")->GetDirection(), Orb_Pin::PIN_BIDIRECTIONAL);
  EXPECT_EQ(u1->GetParent()->GetTypeBlock(), nullptr);

  Lum_TdmView *view = FirstView(*model);
  view->CommitAll();
  EXPECT_EQ(PropertyValue(u1, "TDS_BLOCK_TYPE"), "LIBT:REG");
  EXPECT_EQ(Members(u1, "TDS_BLOCK_PIN_MAP"), "DATA0=D0|DATA1=D1");
  EXPECT_EQ(PropertyValue(u1->GetParent(), "TDS_BLOCK_TYPE"), "<absent>");

  std::string const once = m_Dir.File("once.odb");
  std::string const twice = m_Dir.File("twice.odb");
  model->Save(once.c_str());
  view->CommitAll();
  model->Save(twice.c_str());
  EXPECT_EQ(FileBytes(once), FileBytes(twice)) << "a second commit changed the database";
  EXPECT_EQ(PinText(U1(*OpenModel(twice))), "CLK,DATA0>D0,DATA1>D1,EN,Q");
  EXPECT_EQ(PinText(U1(*OpenModel(WriteDesign(kMappedReg, true)))), "DATA0>D0,CLK,DATA1>D1");
}

// A created block drops stored typing but keeps TDS_LIBRARY_ASSOC; a loaded
// block without TDS_BLOCK_TYPE ignores TDS_BLOCK_PIN_MAP, stays untyped and
// loses the map at its commit.
TEST_F(TdmBlockTest, UntypedBlocksCarryNoTyping) {
  Orb_Model host("h", "h", "", false);
  Orb_View *hostView = host.CreateDesignMgr("dm")->CreateDesign("d")->CreateView("v");
  Orb_Block *hostTop = hostView->CreateTopBlock("top");
  Lum_TdmModel model(&host);
  // A block the library sees for the first time through its creation event.
  Orb_Block *hostChild = hostTop->CreateBlock("c", 0);
  for (char const *name : {"TDS_BLOCK_TYPE", "TDS_LIBRARY_ASSOC"})
    hostChild->CreatePropertyString(name, "LIBT:REG");
  hostChild->CreatePropertyList("TDS_BLOCK_PIN_MAP")->CreatePropertyString("P", "D0");
  hostChild->CreatePin("P", Orb_Pin::PIN_INPUT);
  delete model.GetClient(hostChild);
  model.FireSpecialize(hostChild, true);
  auto *child = static_cast<Lum_TdmBlock *>(model.GetClient(hostChild));
  EXPECT_EQ(PropertyValue(child, "TDS_BLOCK_TYPE"), "<absent>");
  EXPECT_EQ(Members(child, "TDS_BLOCK_PIN_MAP"), "<absent>");
  EXPECT_EQ(PropertyValue(child, "TDS_LIBRARY_ASSOC"), "LIBT:REG");

  auto loaded = OpenModel(WriteDesign({nullptr, {{"P", true}}, {{"P", "D0"}}}));
  Lum_TdmBlock *u1 = U1(*loaded);
  EXPECT_EQ(u1->GetTypeBlock(), nullptr);
  EXPECT_EQ(PinText(u1), "P!");
  FirstView(*loaded)->CommitAll();
  EXPECT_EQ(Members(u1, "TDS_BLOCK_PIN_MAP"), "<absent>");
  u1->CreatePropertyString("TDS_BLOCK_TYPE", "LIBT:REG");
  FirstView(*loaded)->CommitAll();
  EXPECT_EQ(PropertyValue(u1, "TDS_BLOCK_TYPE"), "<absent>") << "an untyped block drops it";
}

// Each stored ABC block ends with the pins, type pins and order given; a
// created C takes the type pin's direction; the commit records exactly the
// pins whose names differ from their type pins'.
TEST_F(TdmBlockTest, ReconciledPinsEndAsExpected) {
  struct Case {
    StoredBlock stored;  // always of type LIBT:ABC
    char const *pins;    // PinText after the load
    char const *members; // TDS_BLOCK_PIN_MAP after a commit
  } const cases[] = {
      // Fewer pins get the rest, X stays untyped; equal counts create nothing.
      {{nullptr, {{"A", true}, {"X", false}}, {}}, "A,B,C,X!", "<absent>"},
      {{nullptr, {{"X", false}, {"A", true}, {"B", true}}, {}}, "X!,A,B", "<absent>"},
      // The last member of a name wins, a member for a missing pin is ignored.
      {{nullptr, {{"P", true}, {"A", true}, {"C", true}}, {{"P", "C"}, {"Z", "A"}, {"P", "B"}}},
       "P>B,A,C",
       "P=B"},
      // Two pins share a type pin; names differing in case map.
      {{nullptr, {{"P", true}, {"Q", true}, {"C", true}}, {{"P", "A"}, {"Q", "A"}}},
       "P>A,Q>A,C",
       "P=A|Q=A"},
      {{nullptr, {{"a", true}, {"B", true}, {"C", true}}, {{"a", "A"}}}, "a>A,B,C", "a=A"},
      // An unconnected pin mapped to an unknown name stays untyped.
      {{nullptr, {{"P", false}, {"A", true}, {"B", true}}, {{"P", "NOPE"}}}, "P!,A,B", "<absent>"},
  };
  for (Case const &c : cases) {
    SCOPED_TRACE(c.pins);
    StoredBlock stored = c.stored;
    stored.type = "LIBT:ABC";
    auto model = OpenModel(WriteDesign(stored));
    Lum_TdmBlock *u1 = U1(*model);
    EXPECT_EQ(u1->GetTypeBlock(), m_pAbc);
    EXPECT_EQ(PinText(u1), c.pins);
    FirstView(*model)->CommitAll();
    EXPECT_EQ(PropertyValue(u1, "TDS_BLOCK_TYPE"), "LIBT:ABC");
    EXPECT_EQ(Members(u1, "TDS_BLOCK_PIN_MAP"), c.members);
  }
}

// Each failure on load names its object with the exact message, and the open
// leaves no host object, no client, no library reference and no companion.
TEST_F(TdmBlockTest, LoadFailuresLeaveNothing) {
  std::pair<StoredBlock, std::string> const cases[] = {
      {{"NOLIB:REG", {}, {}}, "NOLIB|Could not locate the specified library."},
      {{"LIBT:NOPE", {}, {}}, "NOPE|\nCouldn't find type block <NOPE> in library <LIBT>.\n"},
      // Without ":" the whole value names the library.
      {{"LIBT", {}, {}}, "|\nCouldn't find type block <> in library <LIBT>.\n"},
      {{"LIBT:ABC", {{"A", true}, {"X", true}}, {}}, "X|Could not locate the specified pin."},
      {{"LIBT:ABC", {{"P", true}}, {{"P", "NOPE"}}}, "P|Could not locate the specified pin."},
      // A takes B through the map; the untaken type pin A then meets the
      // block's pin A.
      {{"LIBT:ABC", {{"A", true}}, {{"A", "B"}}}, "top|" + PatchUp("u1", "A", "ABC")},
  };
  for (auto const &[stored, failure] : cases) {
    SCOPED_TRACE(failure);
    std::string const path = WriteDesign(stored, false, true);
    Lum_TdmModel model("r", "r", "");
    try {
      model.Open(path.c_str());
      ADD_FAILURE() << "the design loaded";
    } catch (Lum_ExceptionCorruptDatabase const &e) {
      EXPECT_EQ(e.GetObjectName() + "|" + e.GetMessage(), failure);
      EXPECT_EQ(e.GetFile(), "../s/Lum_TdmBlock");
      EXPECT_EQ(e.GetSubsystem(), "Lum");
    }
    Orb_Model *host = model.GetOrbModel();
    EXPECT_EQ(HostObjectCount(host), 0u);
    EXPECT_EQ(model.GetClientCount(), 0u);
    EXPECT_EQ(Lum_TlmCatalog::GetReferenceCount("LIBT"), 0u);
    EXPECT_EQ(host->GetCompanion(Lum_TlmNames::kLocalLibraryCompanion), nullptr);
    EXPECT_EQ(host->TakeLoadedCompanion(Lum_TlmNames::kLocalLibraryCompanion), nullptr);
  }
}

// ---------------------------------------------------------------------------
// Several client models, and the load walk

class RecordingModel;

// A client class that logs its commits in its model.
template <class Base> class Recording : public Base {
public:
  using Base::Base;

protected:
  void CommitToOrb() override;
};

// Builds recording clients, and counts the pin clients it builds per pin.
class RecordingModel : public Lum_TdmModel {
public:
  using Lum_TdmModel::Lum_TdmModel;
#define LUM_RECORDING(Kind)                                                                        \
  void SyncEventSpecialize##Kind##OnCreate(Orb_##Kind *o) override {                               \
    Made(o);                                                                                       \
    new Recording<Lum_Tdm##Kind>(this, o, true);                                                   \
  }                                                                                                \
  void SyncEventSpecialize##Kind##OnLoad(Orb_##Kind *o) override {                                 \
    Made(o);                                                                                       \
    new Recording<Lum_Tdm##Kind>(this, o, false);                                                  \
  }
  LUM_RECORDING(Design)
  LUM_RECORDING(View)
  LUM_RECORDING(Block)
  LUM_RECORDING(Pin)
  LUM_RECORDING(Signal)
#undef LUM_RECORDING
  void SyncEventSpecializeNetworkOnLoad(Orb_Network *o) override {
    new Recording<Lum_TdmNetwork>(this, o);
  }

  std::string m_Commits;
  std::map<std::string, int> m_PinsMade;

private:
  void Made(Orb_Persistent const *) {}
  void Made(Orb_Pin const *pin) { ++m_PinsMade[pin->GetName()]; }
};

template <class Base> void Recording<Base>::CommitToOrb() {
  std::string &log = static_cast<RecordingModel *>(this->GetClientOrbModel())->m_Commits;
  log += (log.empty() ? "" : ",") + std::string(this->GetName());
  Base::CommitToOrb();
}

// A second client model on the same host model binds its own blocks; pins
// that the first model's blocks create reach it through their creation
// events. The load walk skips pins that reconciliation already gave a
// client: each pin client is built once.
TEST_F(TdmBlockTest, SecondClientModelBindsToo) {
  std::string const path = WriteDesign(kMappedReg);
  Orb_Model host("h", "h", "", false);
  {
    RecordingModel first(&host);
    Lum_TdmModel second(&host);
    host.Open(path.c_str());
    for (Lum_TdmModel *model : std::vector<Lum_TdmModel *>{&first, &second}) {
      EXPECT_EQ(PinText(U1(*model)), "CLK,DATA0>D0,DATA1>D1,EN,Q");
      EXPECT_EQ(model->GetClientCount(), HostObjectCount(&host)) << "one client per host object";
    }
    EXPECT_EQ(Lum_TlmCatalog::GetReferenceCount("LIBT"), 2u) << "one list per view client";
    std::string made;
    for (auto const &[name, count] : first.m_PinsMade)
      made += name + "=" + std::to_string(count) + " ";
    EXPECT_EQ(made, "CLK=1 DATA0=1 DATA1=1 EN=1 Q=1 ");
  }
  EXPECT_EQ(Lum_TlmCatalog::GetReferenceCount("LIBT"), 0u);
}

// The view, its networks, its block tree depth first (pins, signals, then
// children), then its user design; discarded clients are rebuilt in place. A
// design with a foreign mark is not committed, and keeps its mark.
TEST(TdmCommitOrderTest, CommitWalksInOrderRebuildingDiscardedClients) {
  TypedDesign design(std::make_unique<RecordingModel>("m", "db", ""));
  auto &model = static_cast<RecordingModel &>(design.Model());
  Lum_TdmView *view = design.m_pView;
  view->CreateNetwork("N1");
  view->CreateNetwork("N2");
  Lum_TdmBlock *top = view->CreateTopBlock("T");
  top->CreatePin("P1", Orb_Pin::PIN_INPUT);
  top->CreatePin("P2", Orb_Pin::PIN_OUTPUT);
  top->CreateSignal("S1");
  Orb_Block *c1 = top->CreateBlock("C1", 0)->GetOrbBlock();
  c1->CreatePin("Q1", Orb_Pin::PIN_INPUT);
  top->CreateBlock("C2", 0);

  view->CommitAll();
  EXPECT_EQ(model.m_Commits, "netlist,N1,N2,T,P1,P2,S1,C1,Q1,C2,top");
  model.m_Commits.clear();
  for (Orb_Persistent *object : std::vector<Orb_Persistent *>{
           c1->GetPins().front(), c1, top->GetOrbBlock()->GetSignals().front(),
           view->GetOrbView()->GetNetworks().back()})
    delete model.GetClient(object);
  view->CommitAll();
  EXPECT_EQ(model.m_Commits, "netlist,N1,N2,T,P1,P2,S1,C1,Q1,C2,top");
  EXPECT_NE(dynamic_cast<Recording<Lum_TdmBlock> *>(model.GetClient(c1)), nullptr);

  model.m_Commits.clear();
  design.m_pDesign->CreatePropertyString("TDS_DESIGN_TYPE", "OTHER");
  view->CommitAll();
  EXPECT_EQ(model.m_Commits, "netlist,N1,N2,T,P1,P2,S1,C1,Q1,C2");
  EXPECT_EQ(PropertyValue(design.m_pDesign, "TDS_DESIGN_TYPE"), "OTHER");
}

// ---------------------------------------------------------------------------
// Pin name order

// A block bound to a type block whose pins it lacks gets them all, in name
// byte order: capitals first, a prefix before its extensions, digits by
// bytes, bytes above 0x7f last.
TEST(TdmPinOrderTest, CreatedPinsAreSortedByBytes) {
  TestLibrary library("LIBS", 1, 0);
  library.AddTypeBlock(
      "T", {"b", "B", "a10", "a2", "AB", "A", "z", "\xC3\xA9", "Z", "0", "P10", "P2", "P1"});
  TypedDesign design;
  design.m_pView->CreatePropertyStringList("TDS_VIEW_TYPE_LIBS")->AppendString("LIBS");
  Orb_Block *host = design.m_pView->CreateTopBlock("top")->GetOrbBlock();
  // Loading the block again binds it from the stored type.
  host->CreatePropertyString("TDS_BLOCK_TYPE", "LIBS:T");
  delete design.Model().GetClient(host);
  EXPECT_EQ(PinText(static_cast<Lum_TdmBlock *>(design.Model().Specialize(host))),
            "0,A,AB,B,P1,P10,P2,Z,a10,a2,b,z,\xC3\xA9");
}

// Equal names compare false both ways, so a stable sort keeps their order.
TEST(TdmPinAlpaSorterTest, EqualNamesAreNotOrdered) {
  Orb_Model host("h", "h", "", false);
  Orb_Block *top =
      host.CreateDesignMgr("dm")->CreateDesign("d")->CreateView("v")->CreateTopBlock("t");
  Orb_Pin *first = top->CreatePin("X", Orb_Pin::PIN_INPUT);
  Orb_Pin *second = top->CreateBlock("c")->CreatePin("X", Orb_Pin::PIN_INPUT);
  PinAlpaSorter const sorter;
  EXPECT_FALSE(sorter(first, second));
  EXPECT_FALSE(sorter(second, first));
}

// ---------------------------------------------------------------------------
// Caller operations

class CallerModel;

// A block that counts its InitTypeBlock calls in its model.
class CallerBlock : public Lum_TdmBlock {
public:
  using Lum_TdmBlock::Lum_TdmBlock;

protected:
  void InitTypeBlock() override;
};

// A model that logs its graft hooks and makes CallerBlocks.
class CallerModel : public ClientModel<CallerBlock> {
public:
  void RegisterGraftEventHandlers() override { m_Hooks += "register,"; }
  void CleanupGraftProps() override { m_Hooks += "cleanup,"; }
  void UnregisterGraftEventHandlers() override { m_Hooks += "unregister,"; }

  std::string m_Hooks;
  int m_Inits = 0;
  std::string m_SignalOnInit; // a signal InitTypeBlock makes, when not empty
};

void CallerBlock::InitTypeBlock() {
  CallerModel *model = static_cast<CallerModel *>(GetClientOrbModel());
  ++model->m_Inits;
  if (!model->m_SignalOnInit.empty())
    CreateSignal(model->m_SignalOnInit.c_str());
}

// Library LIBC, listed by the design's view: REG (D0, D1, CLK in, Q out; D0
// carries LOC=P1) with a hierarchy for "netlist" (a child a1 of type AND on
// signal n1 of network VCC, n1 also inside D0), AND (A, B in, Y out), EMPTY
// (no pins). Library LIBO, not listed, with AND.
class TdmCallerTest : public ::testing::Test {
protected:
  TdmCallerTest() : m_Library("LIBC", 1, 0), m_Unlisted("LIBO", 1, 0) {
    m_pReg = m_Library.AddTypeBlock("REG", {"D0", "D1", "CLK"});
    m_pReg->CreatePin("Q", Orb_Pin::PIN_OUTPUT);
    m_pReg->GetPinByName("D0")->CreatePropertyString("LOC", "P1");
    m_pAnd = m_Library.AddTypeBlock("AND", {"A", "B"});
    m_pAnd->CreatePin("Y", Orb_Pin::PIN_OUTPUT);
    m_pEmpty = m_Library.AddTypeBlock("EMPTY");
    m_pForeign = m_Unlisted.AddTypeBlock("AND", {"A", "B"});

    Lum_TlmBlock *hier = m_pReg->CreateHier("netlist");
    Lum_TlmSignal *n1 = hier->CreateSignal("n1");
    hier->GetView()->CreateNetwork("VCC")->GetOrbNetwork()->AddSignal(n1->GetOrbSignal());
    hier->CreatePin("D0", Orb_Pin::PIN_INPUT)->GetOrbPin()->ConnectInner(n1->GetOrbSignal());
    Lum_TlmBlock *a1 = hier->CreateBlock("a1", 0);
    a1->CreatePin("A", Orb_Pin::PIN_INPUT)->GetOrbPin()->Connect(n1->GetOrbSignal());
    a1->CreatePropertyString("TDS_BLOCK_TYPE", "LIBC:AND");

    m_Design.m_pView->CreatePropertyStringList("TDS_VIEW_TYPE_LIBS")->AppendString("LIBC 1.0");
    m_pTop = m_Design.m_pView->CreateTopBlock("top");
  }

  CallerModel &Model() { return static_cast<CallerModel &>(m_Design.Model()); }

  // The block's type block, then each pin as name=typeblock.typepin (or
  // name=- without one), in host order.
  static std::string State(Lum_TdmBlock const *block) {
    Lum_TlmBlock const *type = block->GetTypeBlock();
    std::string text = type ? type->GetName() : "-";
    for (std::size_t i = 0; i < block->GetPins().size(); ++i) {
      Lum_TdmPin const *pin = block->GetPin(i);
      Lum_TlmPin const *typePin = pin->GetTypePin();
      text +=
          std::string(" ") + pin->GetName() + "=" +
          (typePin ? std::string(typePin->GetParent()->GetName()) + "." + typePin->GetName() : "-");
    }
    return text;
  }

  TempDir m_Dir;
  TestLibrary m_Library;
  TestLibrary m_Unlisted;
  Lum_TlmBlock *m_pReg = nullptr;
  Lum_TlmBlock *m_pAnd = nullptr;
  Lum_TlmBlock *m_pEmpty = nullptr;
  Lum_TlmBlock *m_pForeign = nullptr;
  TypedDesign m_Design{std::make_unique<CallerModel>()};
  Lum_TdmBlock *m_pTop = nullptr;
};

// Refused creations name the right object and create no child. The pins
// flag gives one bound pin per type pin in type order, or none; the child is
// typed either way and InitTypeBlock ran once per child.
TEST_F(TdmCallerTest, TypedChildPinsAndRefusals) {
  EXPECT_EQ(Failure([&] { m_pTop->CreateTypedBlock("u", nullptr, true, true); }),
            "InvalidTypeBlock|top|Null type block specified in CreateTypedBlock.");
  EXPECT_EQ(Failure([&] { m_pTop->CreateUntypedBlock("u", nullptr); }),
            "InvalidTypeBlock|top|Null type block specified in CreateUntypedBlock.");
  EXPECT_EQ(Failure([&] { m_pTop->CreateTypedBlock("u", m_pForeign, true, true); }),
            "CorruptDatabase|AND|Could not locate the specified library.");
  EXPECT_TRUE(m_pTop->GetBlocks().empty());

  Lum_TdmBlock *with = m_pTop->CreateTypedBlock("with", m_pReg, false, true);
  EXPECT_EQ(State(with), "REG D0=REG.D0 D1=REG.D1 CLK=REG.CLK Q=REG.Q");
  EXPECT_EQ(with->GetPinByName("Q")->GetDirection(), Orb_Pin::PIN_OUTPUT);
  EXPECT_EQ(State(m_pTop->CreateTypedBlock("without", m_pReg, false, false)), "REG");
  EXPECT_EQ(State(m_pTop->CreateTypedBlock("empty", m_pEmpty, true, true)), "EMPTY");
  EXPECT_EQ(State(m_pTop->CreateUntypedBlock("uempty", m_pEmpty)), "-");
  EXPECT_EQ(Model().m_Inits, 3);
  EXPECT_EQ(Model().m_Hooks, "") << "no hierarchy grafted";
}

// The hooks run around a graft only: typed register, cleanup, unregister;
// untyped (always grafting) register, unregister.
TEST_F(TdmCallerTest, GraftHooksInOrder) {
  struct Case {
    Lum_TlmBlock const *type;
    bool typed, graft, pins;
    char const *hooks;
  } const cases[] = {
      {m_pReg, true, true, false, "register,cleanup,unregister,"},
      {m_pReg, true, false, true, ""},
      {m_pAnd, true, true, true, ""}, // no hierarchy
      {m_pReg, false, true, true, "register,unregister,"},
      {m_pAnd, false, true, true, ""},
  };
  for (Case const &c : cases) {
    SCOPED_TRACE(std::string(c.type->GetName()) + (c.typed ? " typed" : " untyped") +
                 (c.graft ? ", graft" : ""));
    Model().m_Hooks.clear();
    if (c.typed)
      m_pTop->CreateTypedBlock("u", c.type, c.graft, c.pins);
    else
      m_pTop->CreateUntypedBlock("u", c.type);
    EXPECT_EQ(Model().m_Hooks, c.hooks);
    m_pTop->DeleteBlock(m_pTop->GetBlocks().front());
  }
}

// A graft that fails part way (a name already taken under the child) lets
// the host's exception out, unregistered, and the child stays.
TEST_F(TdmCallerTest, FailedGraftUnregisters) {
  Model().m_SignalOnInit = "n1";
  EXPECT_THROW(m_pTop->CreateTypedBlock("u", m_pReg, true, true), Orb_Exception);
  EXPECT_EQ(Model().m_Hooks, "register,unregister,");
  ASSERT_EQ(m_pTop->GetBlocks().size(), 1u);
  EXPECT_EQ(PinText(m_pTop->GetBlock(0)), "D0,D1,CLK,Q");
}

// After a typed graft nothing under the child has a client until reached;
// a1 then binds from its copied type. Wiring and binding survive a reopen,
// and two children of one type block get separate inner networks.
TEST_F(TdmCallerTest, GraftedChildrenBindAfreshAndSurviveReopen) {
  Lum_TdmBlock *u = m_pTop->CreateTypedBlock("u1", m_pReg, true, true);
  Lum_TdmModel &model = Model();
  for (Orb_Pin const *pin : u->GetPins())
    EXPECT_NE(model.GetClient(pin), nullptr) << "the child's own pin " << pin->GetName();
  Orb_Signal const *n1 = u->GetSignals().front();
  Orb_Block const *a1 = u->GetOrbBlock()->GetBlocks().front();
  for (Orb_Persistent const *inner :
       std::vector<Orb_Persistent const *>{n1, n1->GetNetwork(), a1, a1->GetPins().front()})
    EXPECT_EQ(model.GetClient(inner), nullptr) << inner->GetName();
  EXPECT_EQ(PinText(u->GetBlockByName("a1")), "A,B,Y") << "bound, with the missing pins";

  Lum_TdmBlock *u2 = m_pTop->CreateTypedBlock("u2", m_pReg, true, true);
  Orb_Signal *wire = m_pTop->CreateSignal("w")->GetOrbSignal();
  u->GetPinByName("D0")->GetOrbPin()->Connect(wire);
  u2->GetPinByName("D0")->GetOrbPin()->Connect(wire);
  m_Design.m_pView->CommitAll();

  auto reopened = SaveAndReopen(Model(), m_Dir.File("wired.odb"));
  Lum_TdmBlock *top = FirstView(*reopened)->GetBlock();
  std::vector<Orb_Network const *> inner;
  for (char const *name : {"u1", "u2"}) {
    Lum_TdmBlock *child = top->GetBlockByName(name);
    EXPECT_EQ(PinText(child), "D0,D1,CLK,Q") << name;
    Orb_Pin const *d0 = child->GetPinByName("D0")->GetOrbPin();
    EXPECT_EQ(d0->GetSignal()->GetName() + std::string("|") + d0->GetInnerSignal()->GetName(),
              "w|n1")
        << name;
    inner.push_back(d0->GetInnerSignal()->GetNetwork());
    EXPECT_EQ(child->GetBlockByName("a1")->GetTypeBlock(), m_pAnd) << name;
  }
  ASSERT_NE(inner[0], nullptr);
  EXPECT_NE(inner[0], inner[1]);
}

// An untyped copy: the type's pins with their properties but no type pins,
// the hierarchy, and where it came from, which a commit keeps.
TEST_F(TdmCallerTest, UntypedCopy) {
  Lum_TdmBlock *u = m_pTop->CreateUntypedBlock("u", m_pReg);
  EXPECT_EQ(u->GetTypeBlock(), nullptr);
  EXPECT_EQ(PinText(u), "D0!,D1!,CLK!,Q!");
  EXPECT_EQ(u->GetPinByName("Q")->GetDirection(), Orb_Pin::PIN_OUTPUT);
  EXPECT_EQ(PropertyValue(u->GetPinByName("D0"), "LOC"), "P1");
  EXPECT_NE(u->GetBlockByName("a1"), nullptr);
  std::string const association = PropertyValue(u, "TDS_LIBRARY_ASSOC");
  EXPECT_TRUE(std::regex_match(association,
                               std::regex("LIBC:REG \\d{4}-\\d\\d-\\d\\dT\\d\\d:\\d\\d:\\d\\dZ")))
      << association;
  EXPECT_EQ(Model().m_Inits, 0);
  m_Design.m_pView->CommitAll();
  EXPECT_EQ(PropertyValue(u, "TDS_LIBRARY_ASSOC"), association);
}

// Rebinding. Besides the fixture's: OLD (B, A), OLD2 (R), MAPT (P, Q, R),
// AND2 (A, B, Y, Z) and TGT (A, BB, Y), all in LIBC.
class TdmRebindTest : public TdmCallerTest {
protected:
  TdmRebindTest() {
    m_pOld = m_Library.AddTypeBlock("OLD", {"B", "A"});
    m_pOld2 = m_Library.AddTypeBlock("OLD2", {"R"});
    m_pMapt = m_Library.AddTypeBlock("MAPT", {"P", "Q", "R"});
    m_pAnd2 = m_Library.AddTypeBlock("AND2", {"A", "B", "Y", "Z"});
    m_pTgt = m_Library.AddTypeBlock("TGT", {"A", "BB", "Y"});
    m_pWire = m_pTop->CreateSignal("s")->GetOrbSignal();
  }

  // A child of AND with its pins, A connected.
  Lum_TdmBlock *AndChild(char const *name = "v") {
    Lum_TdmBlock *child = m_pTop->CreateTypedBlock(name, m_pAnd, false, true);
    child->GetPinByName("A")->GetOrbPin()->Connect(m_pWire);
    return child;
  }

  static Lum_TdmTypePinMap Map(std::vector<std::pair<char const *, Lum_TlmPin const *>> const &e) {
    Lum_TdmTypePinMap map;
    for (auto const &[name, typePin] : e)
      map.SetPinMap(Port::StringBase<char>(name), typePin);
    return map;
  }

  Lum_TlmBlock *m_pOld = nullptr;
  Lum_TlmBlock *m_pOld2 = nullptr;
  Lum_TlmBlock *m_pMapt = nullptr;
  Lum_TlmBlock *m_pAnd2 = nullptr;
  Lum_TlmBlock *m_pTgt = nullptr;
  Orb_Signal *m_pWire = nullptr;
};

// The current type block again, or null on an untyped block, does nothing,
// even when the pins would not match. Null on a typed block clears the block
// and every pin, calls InitTypeBlock once, and the next commit drops the
// stored typing. Both forms forward to one implementation.
TEST_F(TdmRebindTest, SameBindingDoesNothingAndNullUnbinds) {
  Lum_TdmBlock *v = AndChild();
  v->CreatePin("X", Orb_Pin::PIN_INPUT)->GetOrbPin()->Connect(m_pWire);
  Lum_TdmBlock *plain = m_pTop->CreateBlock("plain", 0);
  plain->CreatePin("Q", Orb_Pin::PIN_INPUT);
  std::string const before = State(v);
  int const inits = Model().m_Inits;
  v->SetTypeBlock(m_pAnd);
  v->SetTypeBlock(m_pAnd, Lum_TdmTypePinMap());
  plain->SetTypeBlock(nullptr);
  EXPECT_EQ(State(v), before);
  EXPECT_EQ(State(plain), "- Q=-");
  EXPECT_EQ(Model().m_Inits, inits);

  Lum_TdmBlock *u = AndChild("u");
  m_Design.m_pView->CommitAll();
  ASSERT_EQ(PropertyValue(u, "TDS_BLOCK_TYPE"), "LIBC:AND");
  int const initsBefore = Model().m_Inits;
  u->SetTypeBlock(nullptr, Lum_TdmTypePinMap());
  EXPECT_EQ(State(u), "- A=- B=- Y=-");
  EXPECT_EQ(Model().m_Inits, initsBefore + 1);
  m_Design.m_pView->CommitAll();
  EXPECT_EQ(PropertyValue(u, "TDS_BLOCK_TYPE"), "<absent>");
}

// Each refusal names its object and leaves the block exactly as it was: its
// type block, every pin's type pin, no pin created by the call, no
// InitTypeBlock.
TEST_F(TdmRebindTest, FailuresChangeNothing) {
  auto const and2 = [&](char const *name) { return m_pAnd2->GetPinByName(name); };
  Lum_TdmTypePinMap const none;
  Lum_TdmTypePinMap const extra =
      Map({{"A", and2("A")}, {"B", and2("B")}, {"Y", and2("Y")}, {"Z", and2("Z")}});
  Lum_TdmTypePinMap const alien =
      Map({{"A", and2("A")}, {"B", m_pAnd->GetPinByName("B")}, {"Y", and2("Y")}});
  Lum_TdmTypePinMap const unmapped = Map({{"A", and2("A")}, {"Y", and2("Y")}});
  std::string const unresolved = "|Could not resolve the Type Block.";
  std::string const noLibrary = "|Could not locate the specified library.";
  std::string const badPin = "|Invalid type pin specified in type pin map.";
  struct Case {
    Lum_TlmBlock const *from; // the child's type block; its pin A, if any, is connected
    std::pair<char const *, char const *> stored; // a TDS_BLOCK_PIN_MAP member, if any
    Lum_TlmBlock const *to;
    std::optional<Lum_TdmTypePinMap> map; // none: the form without a map
    std::string failure;
  } const cases[] = {
      // Unlisted library, then a connected pin the type block lacks.
      {m_pAnd, {}, m_pForeign, {}, "InvalidTypeBlock|AND" + unresolved},
      {m_pAnd, {}, m_pReg, {}, "InvalidTypeBlock|REG" + unresolved},
      {m_pAnd, {}, m_pForeign, none, "CorruptDatabase|AND" + noLibrary},
      {m_pAnd, {}, m_pReg, none, "CorruptDatabase|REG" + noLibrary},
      // More entries than pins, a pin of another type block, a pin unmapped.
      {m_pAnd,
       {},
       m_pAnd2,
       extra,
       "CorruptDatabase|AND2|The specified pin map has more pins then the library block."},
      {m_pAnd, {}, m_pAnd2, alien, "CorruptDatabase|B" + badPin},
      {m_pAnd, {}, m_pAnd2, unmapped, "CorruptDatabase|B" + badPin},
      // Matching fails after a pin was rebound, and after a pin was created.
      {m_pOld, {"A", "ZZ"}, m_pAnd, {}, "CorruptDatabase|A|Could not locate the specified pin."},
      {m_pOld2, {"R", "P"}, m_pMapt, {}, "CorruptDatabase|top|" + PatchUp("v", "R", "MAPT")},
  };
  for (Case const &c : cases) {
    SCOPED_TRACE(std::string(c.from->GetName()) + " to " + c.to->GetName() +
                 (c.map ? " with a map" : ""));
    Lum_TdmBlock *v = m_pTop->CreateTypedBlock("v", c.from, false, true);
    if (Lum_TdmPin *a = v->GetPinByName("A"))
      a->GetOrbPin()->Connect(m_pWire);
    if (c.stored.first)
      v->CreatePropertyList("TDS_BLOCK_PIN_MAP")
          ->CreatePropertyString(c.stored.first, c.stored.second);
    std::string const before = State(v);
    int const inits = Model().m_Inits;
    EXPECT_EQ(Failure([&] { c.map ? v->SetTypeBlock(c.to, *c.map) : v->SetTypeBlock(c.to); }),
              c.failure);
    EXPECT_EQ(State(v), before);
    EXPECT_EQ(Model().m_Inits, inits);
    m_pTop->DeleteBlock(v->GetOrbBlock());
  }
}

// Rebindings, with a map or without, survive commit and reopen; an
// unconnected pin that the type block lacks ends without a type pin.
TEST_F(TdmRebindTest, RebindingSurvivesReopen) {
  Lum_TdmBlock *v = AndChild("v");
  v->SetTypeBlock(m_pTgt, Map({{"A", m_pTgt->GetPinByName("A")},
                               {"B", m_pTgt->GetPinByName("BB")},
                               {"Y", m_pTgt->GetPinByName("Y")}}));
  Lum_TdmBlock *w = AndChild("w");
  w->SetTypeBlock(m_pAnd2);
  Lum_TdmBlock *x = AndChild("x");
  x->CreatePin("X", Orb_Pin::PIN_INPUT);
  x->SetTypeBlock(m_pAnd2);
  EXPECT_EQ(State(x), "AND2 A=AND2.A B=AND2.B Y=AND2.Y X=-");
  Lum_TdmBlock *empty = m_pTop->CreateBlock("empty", 0);
  int const inits = Model().m_Inits;
  empty->SetTypeBlock(m_pEmpty, Lum_TdmTypePinMap());
  EXPECT_EQ(Model().m_Inits, inits + 1);
  m_Design.m_pView->CommitAll();
  auto reopened = SaveAndReopen(Model(), m_Dir.File("rebound.odb"));
  Lum_TdmBlock *top = FirstView(*reopened)->GetBlock();
  EXPECT_EQ(State(top->GetBlockByName("v")), "TGT A=TGT.A B=TGT.BB Y=TGT.Y");
  EXPECT_EQ(State(top->GetBlockByName("w")), "AND2 A=AND2.A B=AND2.B Y=AND2.Y Z=AND2.Z");
  EXPECT_EQ(State(top->GetBlockByName("x")), "AND2 A=AND2.A B=AND2.B Y=AND2.Y X=-");
  EXPECT_EQ(State(top->GetBlockByName("empty")), "EMPTY");
}

// Queries over children u1 (REG), u2 (AND), u3 (untyped), u4 (REG), and REG
// as a second client model of the library's host model sees it.
class TdmQueryTest : public TdmCallerTest {
protected:
  TdmQueryTest() : m_Second(m_pReg->GetClientOrbModel()->GetOrbModel()) {
    m_pU1 = m_pTop->CreateTypedBlock("u1", m_pReg, false, true);
    m_pTop->CreateTypedBlock("u2", m_pAnd, false, true);
    m_pTop->CreateBlock("u3", 0);
    m_pTop->CreateTypedBlock("u4", m_pReg, false, false);
    m_pSecondReg = m_Second.GetLibrary()->GetTypeBlock(Port::StringBase<char>("REG"));
  }

  Lum_TlmModel m_Second;
  Lum_TlmBlock const *m_pSecondReg = nullptr;
  Lum_TdmBlock *m_pU1 = nullptr;
};

// Children by type block and by identifier. The returning form matches by
// host block, so another model's REG too; the filling forms (separate const
// and non-const code) match the very object and append.
TEST_F(TdmQueryTest, ChildBlocksOfType) {
  Lum_TdmBlock const *top = m_pTop;
  ASSERT_NE(m_pSecondReg, m_pReg);
  EXPECT_EQ(Names(m_pTop->GetChildBlocksOfType(m_pSecondReg)), "u1,u4");
  EXPECT_EQ(Names(top->GetChildBlocksOfType(m_pSecondReg)), "u1,u4");
  EXPECT_EQ(Names(top->GetChildBlocksOfType(nullptr)), "u3");
  EXPECT_TRUE(m_pU1->GetChildBlocksOfType(m_pReg).empty());

  std::vector<Lum_TdmBlock *> blocks{m_pU1};
  m_pTop->GetChildBlocksOfType(m_pSecondReg, blocks);
  m_pTop->GetChildBlocksOfType(m_pReg, blocks);
  m_pTop->GetChildBlocksOfType(nullptr, blocks);
  m_pTop->GetChildBlocksOfType(Lum_TlmBlockTypeID("LIBC", "AND"), blocks);
  EXPECT_EQ(Names(blocks), "u1,u1,u4,u3,u2");
  std::vector<Lum_TdmBlock const *> constBlocks;
  top->GetChildBlocksOfType(m_pReg, constBlocks);
  top->GetChildBlocksOfType(Lum_TlmBlockTypeID(), constBlocks);
  top->GetChildBlocksOfType(m_pSecondReg, constBlocks);
  EXPECT_EQ(Names(constBlocks), "u1,u4,u3");

  Lum_TlmBlockTypeID const reg("LIBC", "REG");
  EXPECT_EQ(m_pTop->GetChildBlockOfType(reg), m_pU1);
  EXPECT_EQ(top->GetFirstChildBlockOfType(Lum_TlmBlockTypeID())->GetName(), std::string("u3"));
  EXPECT_EQ(m_pTop->GetChildBlockOfType(Lum_TlmBlockTypeID("LIBC", "EMPTY")), nullptr);
}

// Pins by type pin (null: the first untyped one) and by identifier; the
// block's own type: as resolved in a context, as a host block, by
// identifier.
TEST_F(TdmQueryTest, PinOfTypeAndOwnType) {
  Lum_TdmPin *extra = m_pU1->CreatePin("X", Orb_Pin::PIN_INPUT);
  Lum_TdmBlock const *u1 = m_pU1;
  EXPECT_EQ(u1->GetPinOfType(static_cast<Lum_TlmPin const *>(nullptr)), extra);
  EXPECT_EQ(m_pU1->GetPinOfType(m_pReg->GetPinByName("CLK")), m_pU1->GetPinByName("CLK"));
  EXPECT_EQ(m_pU1->GetPinOfType(Lum_TlmPinTypeID("LIBC", "REG", "Q")), m_pU1->GetPinByName("Q"));
  EXPECT_EQ(m_pU1->GetPinOfType(Lum_TlmPinTypeID("LIBC", "AND", "A")), nullptr);
  EXPECT_EQ(m_pTop->GetBlockByName("u2")->GetPinOfType(static_cast<Lum_TlmPin const *>(nullptr)),
            nullptr)
      << "all typed";

  Lum_TdmBlock const *u3 = m_pTop->GetBlockByName("u3");
  EXPECT_EQ(m_pU1->GetTypeBlock(m_pReg->GetContext()), m_pReg);
  EXPECT_EQ(m_pU1->GetTypeBlock(&m_Second), m_pSecondReg);
  Lum_TdmModel designClients(m_pReg->GetClientOrbModel()->GetOrbModel());
  ASSERT_NE(designClients.Specialize(m_pReg->GetOrbBlock()), nullptr);
  // Unresolved: another model's REG whose client there is no type block, and
  // no context at all.
  for (Orb_Context const *context :
       std::vector<Orb_Context const *>{&Model(), &designClients, nullptr})
    EXPECT_EQ(Failure([&] { m_pU1->GetTypeBlock(context); }),
              "InvalidTypeBlock|u1|Could not resolve the Type Block.");
  EXPECT_EQ(u3->GetTypeBlock(&Model()), nullptr) << "untyped: nothing to resolve";
  EXPECT_EQ(m_pU1->GetNativeTypeBlock(), m_pReg->GetOrbBlock());
  EXPECT_TRUE(m_pU1->IsTypeOf(Lum_TlmBlockTypeID("LIBC", "REG")));
  EXPECT_FALSE(m_pU1->IsTypeOf(Lum_TlmBlockTypeID()));
  EXPECT_TRUE(u3->IsTypeOf(Lum_TlmBlockTypeID()));
}

// Manifestation creates the missing typed pins and sorts, only for a typed
// block with fewer pins than its type; NormalizePins only sorts.
TEST_F(TdmCallerTest, ManifestAllTypedPins) {
  struct Case {
    char const *what;
    Lum_TlmBlock const *type;
    std::vector<char const *> pins; // a pin named like a REG pin gets that type pin
    bool manifested;
    char const *after;
  };
  std::vector<Case> const cases{
      {"untyped", nullptr, {"Z", "A"}, false, "Z!,A!"},
      {"as many pins, other names", m_pReg, {"Z", "Y", "X", "W"}, false, "Z!,Y!,X!,W!"},
      {"fewer pins", m_pReg, {"X", "Q"}, true, "CLK,D0,D1,Q,X!"},
  };
  for (Case const &c : cases) {
    Lum_TdmBlock *u =
        c.type ? m_pTop->CreateTypedBlock("u", c.type, false, false) : m_pTop->CreateBlock("u", 0);
    for (char const *name : c.pins)
      u->CreatePin(name, Orb_Pin::PIN_OUTPUT)->SetTypePin(m_pReg->GetPinByName(name));
    EXPECT_EQ(u->ManifestAllTypedPins(), c.manifested) << c.what;
    EXPECT_EQ(PinText(u), c.after) << c.what;
    if (c.manifested) {
      EXPECT_EQ(u->GetPinByName("CLK")->GetTypePin(), m_pReg->GetPinByName("CLK")) << c.what;
      EXPECT_EQ(u->GetPinByName("D0")->GetDirection(), Orb_Pin::PIN_INPUT) << c.what;
    }
    m_pTop->DeleteBlock(u->GetOrbBlock());
  }

  m_pTop->NormalizePins();
  EXPECT_EQ(PinText(m_pTop), "");
  for (char const *name : {"b", "B", "a"})
    m_pTop->CreatePin(name, Orb_Pin::PIN_INPUT);
  m_pTop->NormalizePins();
  EXPECT_EQ(PinText(m_pTop), "B!,a!,b!");
}

} // namespace

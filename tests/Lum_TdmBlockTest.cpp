// Typed blocks: binding and pin reconciliation on load, pin order, commits.

#include "Lum_TdmTestSupport.h"

#include "Lum_TdmSchema.h"
#include "Lum_TdmTypePinMap.h"
#include "Lum_TlmTypeID.h"
#include "Ora_GraftMgr.h"
#include "Orb_Exception.h"

#include <gtest/gtest.h>

#include <cstring>
#include <functional>
#include <map>
#include <optional>
#include <regex>
#include <utility>

using namespace lumtest;

namespace {

// Pins in host order: name, ">type pin" when names differ, "!" without a type pin.
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

// LIBT with REG (D0, D1, CLK in, Q out, EN bidirectional) and ABC (A, B in, C out).
class TdmBlockTest : public ::testing::Test {
protected:
  TdmBlockTest() : m_Library("LIBT", 2, 1) {
    m_pReg = m_Library.AddTypeBlock("REG", {"D0", "D1", "CLK"});
    m_pReg->CreatePin("Q", Orb_Pin::PIN_OUTPUT);
    m_pReg->CreatePin("EN", Orb_Pin::PIN_BIDIRECTIONAL);
    m_pAbc = m_Library.AddTypeBlock("ABC", {"A", "B"});
    m_pAbc->CreatePin("C", Orb_Pin::PIN_OUTPUT);
  }

  // Saves a design listing LIBT (and the local library) whose top holds u1 as stored.
  std::string WriteDesign(StoredBlock const &stored, bool dontCreatePins = false,
                          bool withLocalLibrary = false) {
    TypedDesign design;
    Orb_Property *libs = design.m_pView->CreatePropertyStringList(Lum_TdmSchema::kTypeLibraries);
    libs->AppendString("LIBT 2.1");
    if (withLocalLibrary) {
      libs->AppendString(Lum_TlmLibrary::LOCAL_LIBRARY_NAME);
      Lum_TlmLibrary::GetLocalLibrary(design.Host(), PM_PIC("pm1", "part1", nullptr));
    }
    if (dontCreatePins)
      design.m_pView->CreatePropertyString(Lum_TdmSchema::kDontCreateUnusedPins, "");
    Lum_TdmBlock *top = design.m_pView->CreateTopBlock("top");
    Lum_TdmSignal *signal = top->CreateSignal("s");
    Lum_TdmBlock *u1 = top->CreateBlock("u1", 0);
    for (auto const &[name, connected] : stored.pins) {
      Lum_TdmPin *pin = u1->CreatePin(name, Orb_Pin::PIN_INPUT);
      if (connected)
        pin->GetOrbPin()->Connect(signal->GetOrbSignal());
    }
    if (stored.type)
      u1->CreatePropertyString(Lum_TdmSchema::kBlockType, stored.type);
    if (!stored.pinMap.empty()) {
      Orb_Property *pinMap = u1->CreatePropertyList(Lum_TdmSchema::kBlockPinMap);
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

// A loaded block binds, maps, creates missing pins and sorts; a second commit changes nothing.
TEST_F(TdmBlockTest, TypedDesignSurvivesSaveAndReopen) {
  auto model = OpenModel(WriteDesign(kMappedReg));
  Lum_TdmBlock *u1 = U1(*model);
  EXPECT_EQ(PinText(u1), "CLK,DATA0>D0,DATA1>D1,EN,Q");
  EXPECT_EQ(u1->GetPinByName("EN")->GetDirection(), Orb_Pin::PIN_BIDIRECTIONAL);
  Lum_TdmView *view = FirstView(*model);
  view->CommitAll();
  EXPECT_EQ(PropertyValue(u1, Lum_TdmSchema::kBlockType), "LIBT:REG");
  EXPECT_EQ(Members(u1, Lum_TdmSchema::kBlockPinMap), "DATA0=D0|DATA1=D1");
  std::string const once = m_Dir.File("once.odb"), twice = m_Dir.File("twice.odb");
  model->Save(once.c_str());
  view->CommitAll();
  model->Save(twice.c_str());
  EXPECT_EQ(FileBytes(once), FileBytes(twice)) << "a second commit changed the database";
  EXPECT_EQ(PinText(U1(*OpenModel(twice))), "CLK,DATA0>D0,DATA1>D1,EN,Q");
  EXPECT_EQ(PinText(U1(*OpenModel(WriteDesign(kMappedReg, true)))), "DATA0>D0,CLK,DATA1>D1");
}

// Created or untyped blocks carry no typing properties, only TDS_LIBRARY_ASSOC.
TEST_F(TdmBlockTest, UntypedBlocksCarryNoTyping) {
  TypedDesign design;
  Lum_TdmModel &model = design.Model();
  Orb_Block *hostChild = design.m_pView->CreateTopBlock("top")->GetOrbBlock()->CreateBlock("c", 0);
  for (char const *name : {Lum_TdmSchema::kBlockType, Lum_TdmSchema::kLibraryAssociation})
    hostChild->CreatePropertyString(name, "LIBT:REG");
  hostChild->CreatePropertyList(Lum_TdmSchema::kBlockPinMap)->CreatePropertyString("P", "D0");
  hostChild->CreatePin("P", Orb_Pin::PIN_INPUT);
  delete model.GetClient(hostChild);
  model.FireSpecialize(hostChild, true);
  auto *child = static_cast<Lum_TdmBlock *>(model.GetClient(hostChild));
  EXPECT_EQ(PropertyValue(child, Lum_TdmSchema::kBlockType), "<absent>");
  EXPECT_EQ(Members(child, Lum_TdmSchema::kBlockPinMap), "<absent>");
  EXPECT_EQ(PropertyValue(child, Lum_TdmSchema::kLibraryAssociation), "LIBT:REG");
  auto loaded = OpenModel(WriteDesign({nullptr, {{"P", true}}, {{"P", "D0"}}}));
  Lum_TdmBlock *u1 = U1(*loaded);
  EXPECT_EQ(PinText(u1), "P!");
  u1->CreatePropertyString(Lum_TdmSchema::kBlockType, "LIBT:REG");
  FirstView(*loaded)->CommitAll();
  EXPECT_EQ(Members(u1, Lum_TdmSchema::kBlockPinMap) + PropertyValue(u1, Lum_TdmSchema::kBlockType),
            "<absent><absent>");
}

// Stored ABC blocks reconcile to these pins; the commit maps only renamed pins.
TEST_F(TdmBlockTest, ReconciledPinsEndAsExpected) {
  struct Case {
    StoredBlock stored; // typed LIBT:ABC below
    char const *pins, *members;
  } const cases[] = {
      {{nullptr, {{"A", true}, {"X", false}}, {}}, "A,B,C,X!", "<absent>"},
      {{nullptr, {{"X", false}, {"A", true}, {"B", true}}, {}}, "X!,A,B", "<absent>"},
      // The last member of a name wins; a member for a missing pin is ignored.
      {{nullptr, {{"P", true}, {"A", true}, {"C", true}}, {{"P", "C"}, {"Z", "A"}, {"P", "B"}}},
       "P>B,A,C",
       "P=B"},
      {{nullptr, {{"P", true}, {"Q", true}, {"C", true}}, {{"P", "A"}, {"Q", "A"}}},
       "P>A,Q>A,C",
       "P=A|Q=A"},
      {{nullptr, {{"P", false}, {"A", true}, {"B", true}}, {{"P", "NOPE"}}}, "P!,A,B", "<absent>"},
      // Pins in the type block's order, where a map sends one elsewhere or
      // renames one to the type pin at its place; pins out of that order,
      // one missing, one beyond the type block's pins.
      {{nullptr, {{"A", true}, {"B", true}, {"C", true}}, {{"B", "C"}}}, "A,B>C,C", "B=C"},
      {{nullptr, {{"P", true}, {"B", true}, {"C", true}}, {{"P", "A"}}}, "P>A,B,C", "P=A"},
      {{nullptr, {{"C", true}, {"B", true}, {"A", true}}, {}}, "C,B,A", "<absent>"},
      {{nullptr, {{"A", true}, {"C", true}}, {}}, "A,B,C", "<absent>"},
      {{nullptr, {{"A", true}, {"B", true}, {"C", true}, {"X", false}}, {}},
       "A,B,C,X!",
       "<absent>"},
  };
  for (Case const &c : cases) {
    SCOPED_TRACE(c.pins);
    StoredBlock stored = c.stored;
    stored.type = "LIBT:ABC";
    auto model = OpenModel(WriteDesign(stored));
    Lum_TdmBlock *u1 = U1(*model);
    EXPECT_EQ(PinText(u1), c.pins);
    FirstView(*model)->CommitAll();
    EXPECT_EQ(Members(u1, Lum_TdmSchema::kBlockPinMap), c.members);
  }
}

// Each load failure names its object, and the failed open leaves nothing behind.
TEST_F(TdmBlockTest, LoadFailuresLeaveNothing) {
  std::pair<StoredBlock, std::string> const cases[] = {
      {{"NOLIB:REG", {}, {}}, "NOLIB|Could not locate the specified library."},
      {{"LIBT:NOPE", {}, {}}, "NOPE|\nCouldn't find type block <NOPE> in library <LIBT>.\n"},
      {{"LIBT", {}, {}}, "|\nCouldn't find type block <> in library <LIBT>.\n"},
      {{"LIBT:ABC", {{"A", true}, {"X", true}}, {}}, "X|Could not locate the specified pin."},
      {{"LIBT:ABC", {{"P", true}}, {{"P", "NOPE"}}}, "P|Could not locate the specified pin."},
      // A takes B through the map, so type pin A meets the block's pin A.
      {{"LIBT:ABC", {{"A", true}}, {{"A", "B"}}}, "top|" + PatchUp("u1", "A", "ABC")},
  };
  for (auto const &[stored, failure] : cases) {
    SCOPED_TRACE(failure);
    std::string const path = WriteDesign(stored, false, true);
    Lum_TdmModel model("r", "r", "");
    EXPECT_EQ(Failure([&] { model.Open(path.c_str()); }), "CorruptDatabase|" + failure);
    Orb_Model *host = model.GetOrbModel();
    EXPECT_EQ(HostObjectCount(host) + model.GetClientCount(), 0u);
    EXPECT_EQ(Lum_TlmCatalog::GetReferenceCount("LIBT"), 0u);
    EXPECT_EQ(host->GetCompanion(Lum_TlmNames::kLocalLibraryCompanion), nullptr);
    EXPECT_EQ(host->TakeLoadedCompanion(Lum_TlmNames::kLocalLibraryCompanion), nullptr);
  }
}

std::string g_Commits;
std::map<std::string, int> g_PinsMade;

// A client that logs its commits.
template <class Base> class Recording : public Base {
public:
  using Base::Base;

protected:
  void CommitToOrb() override {
    g_Commits += (g_Commits.empty() ? "" : ",") + std::string(this->GetName());
    Base::CommitToOrb();
  }
};

// Builds recording clients and counts pin clients per pin.
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

private:
  void Made(Orb_Persistent const *) {}
  void Made(Orb_Pin const *pin) { ++g_PinsMade[pin->GetName()]; }
};

// A second client model binds too; each pin client is built once.
TEST_F(TdmBlockTest, SecondClientModelBindsToo) {
  std::string const path = WriteDesign(kMappedReg);
  Orb_Model host("h", "h", "", false);
  g_PinsMade.clear();
  {
    RecordingModel first(&host);
    Lum_TdmModel second(&host);
    host.Open(path.c_str());
    for (Lum_TdmModel *model : std::vector<Lum_TdmModel *>{&first, &second}) {
      EXPECT_EQ(PinText(U1(*model)), "CLK,DATA0>D0,DATA1>D1,EN,Q");
      EXPECT_EQ(model->GetClientCount(), HostObjectCount(&host)) << "one client per host object";
    }
    EXPECT_EQ(Lum_TlmCatalog::GetReferenceCount("LIBT"), 2u) << "one list per view client";
    for (auto const &[name, count] : g_PinsMade)
      EXPECT_EQ(count, 1) << name;
  }
  EXPECT_EQ(Lum_TlmCatalog::GetReferenceCount("LIBT"), 0u);
}

// Commit order: view, networks, blocks depth first, design; discarded clients are rebuilt.
TEST(TdmCommitOrderTest, CommitWalksInOrderRebuildingDiscardedClients) {
  TypedDesign design(std::make_unique<RecordingModel>("m", "db", ""));
  Lum_TdmModel &model = design.Model();
  Lum_TdmView *view = design.m_pView;
  view->CreateNetwork("N1");
  view->CreateNetwork("N2");
  Lum_TdmBlock *top = view->CreateTopBlock("T");
  top->CreatePin("P1", Orb_Pin::PIN_INPUT);
  top->CreateSignal("S1");
  Orb_Block *c1 = top->CreateBlock("C1", 0)->GetOrbBlock();
  c1->CreatePin("Q1", Orb_Pin::PIN_INPUT);
  top->CreateBlock("C2", 0);
  for (Orb_Persistent *object : std::vector<Orb_Persistent *>{
           c1->GetPins().front(), c1, top->GetOrbBlock()->GetSignals().front(),
           view->GetOrbView()->GetNetworks().back()})
    delete model.GetClient(object);
  g_Commits.clear();
  view->CommitAll();
  EXPECT_EQ(g_Commits, "netlist,N1,N2,T,P1,S1,C1,Q1,C2,top");
  EXPECT_NE(dynamic_cast<Recording<Lum_TdmBlock> *>(model.GetClient(c1)), nullptr);
  g_Commits.clear();
  design.m_pDesign->CreatePropertyString(Lum_TdmSchema::kDesignType, "OTHER");
  view->CommitAll();
  EXPECT_EQ(g_Commits, "netlist,N1,N2,T,P1,S1,C1,Q1,C2") << "a foreign design is not committed";
  EXPECT_EQ(PropertyValue(design.m_pDesign, Lum_TdmSchema::kDesignType), "OTHER");
}

int g_Inits = 0;
std::string g_Hooks;
std::string g_SignalOnInit; // a signal InitTypeBlock makes, when not empty

// A block that counts its InitTypeBlock calls.
class CallerBlock : public Lum_TdmBlock {
public:
  using Lum_TdmBlock::Lum_TdmBlock;

protected:
  void InitTypeBlock() override {
    ++g_Inits;
    if (!g_SignalOnInit.empty())
      CreateSignal(g_SignalOnInit.c_str());
  }
};

// A model that logs its graft hooks and makes CallerBlocks.
class CallerModel : public ClientModel<CallerBlock> {
public:
  void RegisterGraftEventHandlers() override { g_Hooks += "register,"; }
  void CleanupGraftProps() override { g_Hooks += "cleanup,"; }
  void UnregisterGraftEventHandlers() override { g_Hooks += "unregister,"; }
};

// Listed LIBC: REG (D0 with LOC, D1, CLK, Q; hierarchy a1:AND on n1), AND, EMPTY; unlisted LIBO.
class TdmCallerTest : public ::testing::Test {
protected:
  TdmCallerTest() : m_Library("LIBC", 1, 0), m_Unlisted("LIBO", 1, 0) {
    g_Inits = 0;
    g_Hooks.clear();
    g_SignalOnInit.clear();
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
    a1->CreatePropertyString(Lum_TdmSchema::kBlockType, "LIBC:AND");

    m_Design.m_pView->CreatePropertyStringList(Lum_TdmSchema::kTypeLibraries)
        ->AppendString("LIBC 1.0");
    m_pTop = m_Design.m_pView->CreateTopBlock("top");
  }

  CallerModel &Model() { return static_cast<CallerModel &>(m_Design.Model()); }

  // "TYPE pin=TYPE.typepin ...", "-" for none.
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

// Refused creations create no child; pins are bound in type order, or absent; grafts hook.
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
  EXPECT_EQ(State(m_pTop->CreateTypedBlock("without", m_pReg, false, false)), "REG");
  EXPECT_EQ(State(m_pTop->CreateTypedBlock("empty", m_pEmpty, true, true)), "EMPTY");
  EXPECT_EQ(State(m_pTop->CreateUntypedBlock("uempty", m_pEmpty)), "-");
  EXPECT_EQ(g_Inits, 3);
  EXPECT_EQ(g_Hooks, "") << "no hierarchy grafted";
  // A graft failing part way lets the host's exception out, unregistered; the child stays.
  g_SignalOnInit = "n1";
  EXPECT_THROW(m_pTop->CreateTypedBlock("u", m_pReg, true, true), Orb_Exception);
  EXPECT_EQ(g_Hooks, "register,unregister,");
  EXPECT_EQ(PinText(m_pTop->GetBlockByName("u")), "D0,D1,CLK,Q");
}

// A typed graft leaves inner objects without clients; wiring and binding survive reopen.
TEST_F(TdmCallerTest, GraftedChildrenBindAfreshAndSurviveReopen) {
  Lum_TdmBlock *u = m_pTop->CreateTypedBlock("u1", m_pReg, true, true);
  EXPECT_EQ(g_Hooks, "register,cleanup,unregister,");
  Orb_Signal const *n1 = u->GetSignals().front();
  Orb_Block const *a1 = u->GetOrbBlock()->GetBlocks().front();
  for (Orb_Persistent const *inner :
       std::vector<Orb_Persistent const *>{n1, n1->GetNetwork(), a1, a1->GetPins().front()})
    EXPECT_EQ(Model().GetClient(inner), nullptr) << inner->GetName();
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
    Orb_Pin const *d0 = child->GetPinByName("D0")->GetOrbPin();
    EXPECT_STREQ(d0->GetSignal()->GetName(), "w");
    EXPECT_STREQ(d0->GetInnerSignal()->GetName(), "n1");
    inner.push_back(d0->GetInnerSignal()->GetNetwork());
    EXPECT_EQ(child->GetBlockByName("a1")->GetTypeBlock(), m_pAnd) << name;
  }
  ASSERT_NE(inner[0], nullptr);
  EXPECT_NE(inner[0], inner[1]);
}

// An untyped copy keeps pins, pin properties, hierarchy and its origin, but no typing.
TEST_F(TdmCallerTest, UntypedCopy) {
  Lum_TdmBlock *u = m_pTop->CreateUntypedBlock("u", m_pReg);
  EXPECT_EQ(g_Hooks, "register,unregister,");
  EXPECT_EQ(PinText(u), "D0!,D1!,CLK!,Q!");
  EXPECT_EQ(PropertyValue(u->GetPinByName("D0"), "LOC"), "P1");
  EXPECT_NE(u->GetBlockByName("a1"), nullptr);
  std::string const association = PropertyValue(u, Lum_TdmSchema::kLibraryAssociation);
  EXPECT_TRUE(std::regex_match(association,
                               std::regex("LIBC:REG \\d{4}-\\d\\d-\\d\\dT\\d\\d:\\d\\d:\\d\\dZ")))
      << association;
  EXPECT_EQ(g_Inits, 0);
  m_Design.m_pView->CommitAll();
  EXPECT_EQ(PropertyValue(u, Lum_TdmSchema::kLibraryAssociation), association);
}

// Adds AND2 (A, B, Y, Z) and a wire.
class TdmRebindTest : public TdmCallerTest {
protected:
  TdmRebindTest() {
    m_pAnd2 = m_Library.AddTypeBlock("AND2", {"A", "B", "Y", "Z"});
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

  Lum_TlmBlock *m_pAnd2 = nullptr;
  Orb_Signal *m_pWire = nullptr;
};

// Each refusal names its object and rolls the block back exactly, with no InitTypeBlock.
TEST_F(TdmRebindTest, FailuresChangeNothing) {
  Lum_TlmBlock *old = m_Library.AddTypeBlock("OLD", {"B", "A"});
  Lum_TlmBlock *old2 = m_Library.AddTypeBlock("OLD2", {"R"});
  Lum_TlmBlock *mapt = m_Library.AddTypeBlock("MAPT", {"P", "Q", "R"});
  auto const and2 = [&](char const *name) { return m_pAnd2->GetPinByName(name); };
  Lum_TdmTypePinMap const none;
  Lum_TdmTypePinMap const extra =
      Map({{"A", and2("A")}, {"B", and2("B")}, {"Y", and2("Y")}, {"Z", and2("Z")}});
  Lum_TdmTypePinMap const alien =
      Map({{"A", and2("A")}, {"B", m_pAnd->GetPinByName("B")}, {"Y", and2("Y")}});
  std::string const unresolved = "|Could not resolve the Type Block.";
  std::string const noLibrary = "|Could not locate the specified library.";
  std::string const tooMany = "The specified pin map has more pins then the library block.";
  std::string const badPin = "|Invalid type pin specified in type pin map.";
  struct Case {
    Lum_TlmBlock const *from; // the child's type block; its pin A, if any, is connected
    std::pair<char const *, char const *> stored; // a TDS_BLOCK_PIN_MAP member, if any
    Lum_TlmBlock const *to;
    std::optional<Lum_TdmTypePinMap> map; // none: the form without a map
    std::string failure;
  } const cases[] = {
      {m_pAnd, {}, m_pForeign, {}, "InvalidTypeBlock|AND" + unresolved},
      {m_pAnd, {}, m_pReg, {}, "InvalidTypeBlock|REG" + unresolved},
      {m_pAnd, {}, m_pForeign, none, "CorruptDatabase|AND" + noLibrary},
      {m_pAnd, {}, m_pAnd2, extra, "CorruptDatabase|AND2|" + tooMany},
      {m_pAnd, {}, m_pAnd2, alien, "CorruptDatabase|B" + badPin},
      // Matching fails after a pin was rebound / created.
      {old, {"A", "ZZ"}, m_pAnd, {}, "CorruptDatabase|A|Could not locate the specified pin."},
      {old2, {"R", "P"}, mapt, {}, "CorruptDatabase|top|" + PatchUp("v", "R", "MAPT")},
  };
  for (Case const &c : cases) {
    SCOPED_TRACE(std::string(c.from->GetName()) + " to " + c.to->GetName() +
                 (c.map ? " with a map" : ""));
    Lum_TdmBlock *v = m_pTop->CreateTypedBlock("v", c.from, false, true);
    if (Lum_TdmPin *a = v->GetPinByName("A"))
      a->GetOrbPin()->Connect(m_pWire);
    if (c.stored.first)
      v->CreatePropertyList(Lum_TdmSchema::kBlockPinMap)
          ->CreatePropertyString(c.stored.first, c.stored.second);
    std::string const before = State(v);
    int const inits = g_Inits;
    EXPECT_EQ(Failure([&] { c.map ? v->SetTypeBlock(c.to, *c.map) : v->SetTypeBlock(c.to); }),
              c.failure);
    EXPECT_EQ(State(v), before);
    EXPECT_EQ(g_Inits, inits);
    m_pTop->DeleteBlock(v->GetOrbBlock());
  }
}

// The same type again, or null on an untyped block, is a no-op; null unbinds; rebindings, with
// a map or without, survive commit and reopen.
TEST_F(TdmRebindTest, RebindingSurvivesReopen) {
  Lum_TdmBlock *same = AndChild("same");
  same->CreatePin("X", Orb_Pin::PIN_INPUT)->GetOrbPin()->Connect(m_pWire);
  std::string const before = State(same);
  same->SetTypeBlock(m_pAnd, Lum_TdmTypePinMap());
  m_pTop->CreateBlock("plain", 0)->SetTypeBlock(nullptr);
  EXPECT_EQ(State(same), before);
  m_pTop->DeleteBlock(same->GetOrbBlock()); // its unmatched connected pin would not load
  EXPECT_EQ(g_Inits, 1);
  Lum_TdmBlock *u = AndChild("u");
  m_Design.m_pView->CommitAll();
  ASSERT_EQ(PropertyValue(u, Lum_TdmSchema::kBlockType), "LIBC:AND");
  u->SetTypeBlock(nullptr, Lum_TdmTypePinMap());
  EXPECT_EQ(State(u), "- A=- B=- Y=-");
  EXPECT_EQ(g_Inits, 3);
  Lum_TlmBlock *tgt = m_Library.AddTypeBlock("TGT", {"A", "BB", "Y"});
  Lum_TdmBlock *v = AndChild("v");
  v->SetTypeBlock(tgt, Map({{"A", tgt->GetPinByName("A")},
                            {"B", tgt->GetPinByName("BB")},
                            {"Y", tgt->GetPinByName("Y")}}));
  Lum_TdmBlock *w = AndChild("w");
  w->SetTypeBlock(m_pAnd2);
  Lum_TdmBlock *x = AndChild("x");
  x->CreatePin("X", Orb_Pin::PIN_INPUT);
  x->SetTypeBlock(m_pAnd2);
  Lum_TdmBlock *empty = m_pTop->CreateBlock("empty", 0);
  int const inits = g_Inits;
  empty->SetTypeBlock(m_pEmpty, Lum_TdmTypePinMap());
  EXPECT_EQ(g_Inits, inits + 1);
  m_Design.m_pView->CommitAll();
  auto reopened = SaveAndReopen(Model(), m_Dir.File("rebound.odb"));
  Lum_TdmBlock *top = FirstView(*reopened)->GetBlock();
  EXPECT_EQ(State(top->GetBlockByName("v")), "TGT A=TGT.A B=TGT.BB Y=TGT.Y");
  EXPECT_EQ(State(top->GetBlockByName("w")), "AND2 A=AND2.A B=AND2.B Y=AND2.Y Z=AND2.Z");
  EXPECT_EQ(State(top->GetBlockByName("x")), "AND2 A=AND2.A B=AND2.B Y=AND2.Y X=-");
  EXPECT_EQ(State(top->GetBlockByName("empty")), "EMPTY");
  EXPECT_EQ(State(top->GetBlockByName("u")), "- A=- B=- Y=-");
  EXPECT_EQ(PropertyValue(top->GetBlockByName("u"), Lum_TdmSchema::kBlockType), "<absent>");
}

// What would make the next open refuse a saved design is refused before anything changes: a
// rebind through a map (at the call), a pin connected or deleted after the binding (at the
// commit, of the view or of the block alone, which then writes nothing: not even the rebinding
// of the sibling it reaches first). Once mended, the design commits and reopens.
TEST_F(TdmRebindTest, NothingSavedIsRefusedByTheNextOpen) {
  Lum_TlmBlock *ab = m_Library.AddTypeBlock("AB", {"A", "B"});
  Lum_TlmBlock *abc = m_Library.AddTypeBlock("ABC3", {"A", "B", "C"});
  auto const to = [abc](char const *name) { return abc->GetPinByName(name); };
  auto const and2 = [this](char const *name) { return m_pAnd2->GetPinByName(name); };
  auto const collision = [](char const *kind, char const *type) {
    return std::string(kind) +
           "|A|Pin <A> of block <c> holds the name of type pin <A> of type block <" + type +
           ">, which no pin is bound to: the next open would have to create that type pin and "
           "could not. Bind a pin to <A>, rename pin <A>, or give the block every pin of its type "
           "block.";
  };
  std::string const unmatched =
      "InvalidTypeBlock|X|Pin <X> of block <c> is connected but has no type pin of type block "
      "<AND>: the next open would refuse it. Bind it to a type pin (SetTypeBlock with a pin map), "
      "rename it after a type pin, or leave it unconnected.";
  auto const connectX = [this](Lum_TdmBlock *c) {
    c->CreatePin("X", Orb_Pin::PIN_INPUT)->GetOrbPin()->Connect(m_pWire);
  };
  auto const deleteX = [](Lum_TdmBlock *c) { c->DeletePin(c->GetPinByName("X")->GetOrbPin()); };
  auto const commitView = [this](Lum_TdmBlock *) { m_Design.m_pView->CommitAll(); };
  struct Case {
    char const *what;
    std::function<void(Lum_TdmBlock *)> prepare, refused, mend;
    std::string failure;
  } const cases[] = {
      {"rebind A>B, B>C leaves A untaken",
       [&](Lum_TdmBlock *c) {
         c->SetTypeBlock(nullptr);
         c->DeletePin(c->GetPinByName("Y")->GetOrbPin());
         c->SetTypeBlock(ab);
       },
       [&](Lum_TdmBlock *c) {
         c->SetTypeBlock(abc, Map({{"A", to("B")}, {"B", to("C")}}));
       },
       [&](Lum_TdmBlock *c) {
         c->SetTypeBlock(abc, Map({{"A", to("A")}, {"B", to("B")}}));
       },
       collision("CorruptDatabase", "ABC3")},
      {"pin added and connected after binding", connectX, commitView, deleteX, unmatched},
      {"the same, committing the block alone", connectX,
       [this](Lum_TdmBlock *) { m_pTop->TraverseAndCommitToOrb(); }, deleteX, unmatched},
      {"pin deleted after a rebind A>B, B>Y, Y>A",
       [&](Lum_TdmBlock *c) {
         c->CreatePin("Z", Orb_Pin::PIN_INPUT);
         c->SetTypeBlock(
             m_pAnd2,
             Map({{"A", and2("B")}, {"B", and2("Y")}, {"Y", and2("A")}, {"Z", and2("Z")}}));
         m_Design.m_pView->CommitAll();
         c->DeletePin(c->GetPinByName("Y")->GetOrbPin());
       },
       commitView,
       [&](Lum_TdmBlock *c) {
         c->CreatePin("Y", Orb_Pin::PIN_INPUT);
         c->SetTypeBlock(nullptr);
         c->SetTypeBlock(
             m_pAnd2,
             Map({{"A", and2("B")}, {"B", and2("Y")}, {"Y", and2("A")}, {"Z", and2("Z")}}));
       },
       collision("InvalidTypeBlock", "AND2")},
  };
  for (Case const &test : cases) {
    SCOPED_TRACE(test.what);
    Lum_TdmBlock *d = AndChild("d");
    Lum_TdmBlock *c = AndChild("c");
    m_Design.m_pView->CommitAll();
    test.prepare(c);
    d->SetTypeBlock(m_pAnd2);
    std::string const state = State(c);
    EXPECT_EQ(Failure([&] { test.refused(c); }), test.failure);
    EXPECT_EQ(State(c), state);
    EXPECT_EQ(PropertyValue(d, Lum_TdmSchema::kBlockType), "LIBC:AND");
    test.mend(c);
    m_Design.m_pView->CommitAll();
    auto reopened = SaveAndReopen(Model(), m_Dir.File("mended.odb"));
    Lum_TdmBlock *top = FirstView(*reopened)->GetBlock();
    EXPECT_EQ(State(top->GetBlockByName("d")), "AND2 A=AND2.A B=AND2.B Y=AND2.Y Z=AND2.Z");
    EXPECT_STREQ(top->GetBlockByName("c")->GetTypeBlock()->GetName(), c->GetTypeBlock()->GetName());
    m_pTop->DeleteBlock(d->GetOrbBlock());
    m_pTop->DeleteBlock(c->GetOrbBlock());
  }
}

// Children and pins by type and by identifier; the block's own type, resolved per context.
TEST_F(TdmCallerTest, TypedQueries) {
  Lum_TlmModel second(m_pReg->GetClientOrbModel()->GetOrbModel());
  Lum_TlmBlock const *secondReg = second.GetLibrary()->GetTypeBlock(Port::StringBase<char>("REG"));
  Lum_TdmBlock *u1 = m_pTop->CreateTypedBlock("u1", m_pReg, false, true);
  m_pTop->CreateTypedBlock("u2", m_pAnd, false, true);
  Lum_TdmBlock *u3 = m_pTop->CreateBlock("u3", 0);
  m_pTop->CreateTypedBlock("u4", m_pReg, false, false);
  Lum_TdmBlock const *top = m_pTop;
  // The returning form matches by host block, the filling forms the very object, appending.
  EXPECT_EQ(Names(top->GetChildBlocksOfType(secondReg)), "u1,u4");
  EXPECT_EQ(Names(top->GetChildBlocksOfType(nullptr)), "u3");
  std::vector<Lum_TdmBlock *> blocks{u1};
  m_pTop->GetChildBlocksOfType(secondReg, blocks);
  m_pTop->GetChildBlocksOfType(m_pReg, blocks);
  m_pTop->GetChildBlocksOfType(Lum_TlmBlockTypeID("LIBC", "AND"), blocks);
  EXPECT_EQ(Names(blocks), "u1,u1,u4,u2");
  std::vector<Lum_TdmBlock const *> constBlocks;
  top->GetChildBlocksOfType(Lum_TlmBlockTypeID(), constBlocks);
  EXPECT_EQ(Names(constBlocks), "u3");
  EXPECT_EQ(m_pTop->GetChildBlockOfType(Lum_TlmBlockTypeID("LIBC", "REG")), u1);

  Lum_TdmPin *extra = u1->CreatePin("X", Orb_Pin::PIN_INPUT);
  EXPECT_EQ(u1->GetPinOfType(static_cast<Lum_TlmPin const *>(nullptr)), extra);
  EXPECT_EQ(u1->GetPinOfType(Lum_TlmPinTypeID("LIBC", "REG", "Q")), u1->GetPinByName("Q"));
  EXPECT_EQ(u1->GetPinOfType(Lum_TlmPinTypeID("LIBC", "AND", "A")), nullptr);
  EXPECT_EQ(u1->GetTypeBlock(&second), secondReg);
  Lum_TdmModel designClients(m_pReg->GetClientOrbModel()->GetOrbModel());
  ASSERT_NE(designClients.Specialize(m_pReg->GetOrbBlock()), nullptr);
  for (Orb_Context const *context :
       std::vector<Orb_Context const *>{&Model(), &designClients, nullptr})
    EXPECT_EQ(Failure([&] { u1->GetTypeBlock(context); }),
              "InvalidTypeBlock|u1|Could not resolve the Type Block.");
  EXPECT_EQ(u3->GetTypeBlock(&Model()), nullptr) << "untyped: nothing to resolve";
  EXPECT_TRUE(u3->IsTypeOf(Lum_TlmBlockTypeID()));
}

// Manifestation adds missing typed pins and sorts only when a typed block lacks some.
TEST_F(TdmCallerTest, ManifestAllTypedPins) {
  struct Case {
    Lum_TlmBlock const *type;
    std::vector<char const *> pins; // a pin named like a REG pin gets that type pin
    bool manifested;
    char const *after;
  };
  for (Case const &c : std::vector<Case>{{nullptr, {"Z", "A"}, false, "Z!,A!"},
                                         {m_pReg, {"Z", "Y", "X", "W"}, false, "Z!,Y!,X!,W!"},
                                         {m_pReg, {"X", "Q"}, true, "CLK,D0,D1,Q,X!"}}) {
    SCOPED_TRACE(c.after);
    Lum_TdmBlock *u =
        c.type ? m_pTop->CreateTypedBlock("u", c.type, false, false) : m_pTop->CreateBlock("u", 0);
    for (char const *name : c.pins)
      u->CreatePin(name, Orb_Pin::PIN_OUTPUT)->SetTypePin(m_pReg->GetPinByName(name));
    EXPECT_EQ(u->ManifestAllTypedPins(), c.manifested);
    EXPECT_EQ(PinText(u), c.after);
    m_pTop->DeleteBlock(u->GetOrbBlock());
  }
  // Name byte order: capitals first, a prefix before its extensions, bytes above 0x7f last.
  for (char const *name : {"b", "B", "a10", "a2", "AB", "A", "\xC3\xA9", "0", "P10", "P1"})
    m_pTop->CreatePin(name, Orb_Pin::PIN_INPUT);
  m_pTop->NormalizePins();
  EXPECT_EQ(PinText(m_pTop), "0!,A!,AB!,B!,P1!,P10!,a10!,a2!,b!,\xC3\xA9!");
}

} // namespace

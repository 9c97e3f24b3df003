#include "host/HostTestSupport.h"

#include "Ora_GraftMgr.h"
#include "Orb_Exception.h"

#include <gtest/gtest.h>

#include <cstdio>
#include <string>
#include <tuple>
#include <vector>

namespace {

using namespace HostTest;

std::string Props(Orb_PropertyHolder const &holder) {
  std::string const text = PropertiesOf(holder);
  return text.empty() ? "" : "<" + text + ">";
}

// A block's contents: its signals, then each child block with its
// properties, its pins (direction, properties) and, recursively, its contents.
std::string Contents(Orb_Block const *block) {
  std::string text;
  auto add = [&text](std::string const &item) { text += (text.empty() ? "" : " ") + item; };
  for (Orb_Signal const *signal : block->GetSignals())
    add(signal->GetName() + Props(*signal));
  for (Orb_Block const *child : block->GetBlocks()) {
    std::string pins;
    for (Orb_Pin const *pin : child->GetPins())
      pins += (pins.empty() ? "" : " ") + pin->GetNameString() + ":" +
              Orb_PinDirectionName(pin->GetDirection()) + Props(*pin);
    add(child->GetName() + Props(*child) + "(" + pins + "){" + Contents(child) + "}");
  }
  return text;
}

// Path of `block` below `root`, as "u1/leaf".
std::string PathBelow(Orb_Block const *root, Orb_Block const *block) {
  std::string path;
  for (; block && block != root; block = block->GetParent()) {
    if (!path.empty())
      path.insert(0, "/");
    path.insert(0, block->GetNameString());
  }
  return path;
}

// Every signal below `root` (pre-order) as "path:pins", its pins in
// connection order; a pin of `root` itself shows its bare name.
std::string Connections(Orb_Block const *root, Orb_Block const *block = nullptr) {
  block = block ? block : root;
  std::string text;
  std::string const prefix = block == root ? "" : PathBelow(root, block) + "/";
  for (Orb_Signal const *signal : block->GetSignals()) {
    text += (text.empty() ? "" : " ") + prefix + signal->GetName() + ":";
    char const *separator = "";
    for (Orb_Pin const *pin : signal->GetPins()) {
      text += separator;
      separator = ",";
      if (pin->GetParent() != root)
        text += PathBelow(root, pin->GetParent()) + ".";
      text += pin->GetName();
    }
  }
  for (Orb_Block const *child : block->GetBlocks()) {
    std::string const more = Connections(root, child);
    text += more.empty() || text.empty() ? more : " " + more;
  }
  return text;
}

// Source: a type library's hierarchy H (pins A, B, C; signals sa, sb, mid;
// child u1 with a leaf, child u2) in its own host model. Destination: block
// "inst" (pins A, B) of a design whose view already has a network VCC.
class GraftTest : public ::testing::Test {
protected:
  void SetUp() override {
    Orb_View *libView = lib.CreateDesignMgr("lib")->CreateDesign("cell")->CreateView("hier");
    h = libView->CreateTopBlock("H");
    Orb_Pin *a = h->CreatePin("A", Orb_Pin::PIN_INPUT);
    Orb_Pin *b = h->CreatePin("B", Orb_Pin::PIN_OUTPUT);
    Orb_Pin *c = h->CreatePin("C", Orb_Pin::PIN_INPUT);
    Orb_Signal *sa = h->CreateSignal("sa");
    sa->CreatePropertyString("W", "1");
    Orb_Signal *sb = h->CreateSignal("sb");
    Orb_Signal *mid = h->CreateSignal("mid");

    u1 = h->CreateBlock("u1", 0);
    u1->CreatePropertyString("KIND", "and");
    u1->CreatePropertyStringList("TAGS")->AppendString("a");
    Orb_Property *attr = u1->CreatePropertyList("ATTR");
    attr->CreatePropertyString("k", "1");
    attr->CreatePropertyString("k", "2");
    Orb_Pin *u1i = u1->CreatePin("i", Orb_Pin::PIN_INPUT);
    u1i->CreatePropertyString("CAP", "3");
    Orb_Pin *u1o = u1->CreatePin("o", Orb_Pin::PIN_OUTPUT);
    Orb_Signal *inner = u1->CreateSignal("inner");
    leaf = u1->CreateBlock("leaf", 0);
    Orb_Pin *x = leaf->CreatePin("x", Orb_Pin::PIN_BIDIRECTIONAL);
    Orb_Block *u2 = h->CreateBlock("u2", 0);
    Orb_Pin *u2i = u2->CreatePin("i", Orb_Pin::PIN_INPUT);
    Orb_Pin *u2o = u2->CreatePin("o", Orb_Pin::PIN_OUTPUT);

    for (auto [pin, signal] : std::vector<std::pair<Orb_Pin *, Orb_Signal *>>{
             {a, sa}, {u1i, sa}, {c, sa}, {b, sb}, {u2o, sb}, {u1o, mid}, {u2i, mid}, {x, inner}})
      pin->Connect(signal);
    libView->CreateNetwork("VCC")->AddSignal(sb);
    gnd = libView->CreateNetwork("GND");
    gnd->CreatePropertyString("ROLE", "ground");
    gnd->AddSignal(inner);

    view = design.GetOrbModel()->CreateDesignMgr("dm")->CreateDesign("chip")->CreateView("hier");
    top = view->CreateTopBlock("top");
    inst = AddInstance("inst");
    vcc = view->CreateNetwork("VCC");
    vcc->CreatePropertyString("ROLE", "supply");
    log.Clear();
  }

  Orb_Block *AddInstance(char const *name) {
    Orb_Block *block = top->CreateBlock(name, 0);
    block->CreatePin("A", Orb_Pin::PIN_INPUT);
    block->CreatePin("B", Orb_Pin::PIN_OUTPUT);
    return block;
  }

  Orb_Model lib{"lib", "libdb", "", true};
  Orb_Block *h = nullptr;
  Orb_Block *u1 = nullptr;
  Orb_Block *leaf = nullptr;
  Orb_Network *gnd = nullptr;

  EventLog log;
  RecModel design{&log};
  Orb_View *view = nullptr;
  Orb_Block *top = nullptr;
  Orb_Block *inst = nullptr;
  Orb_Network *vcc = nullptr;
};

char const *const kCopiedContents =
    "sa<W=1> sb mid u1<KIND=and TAGS[a] ATTR{k:1,k:2}>(i:input<CAP=3> o:output)"
    "{inner leaf(x:bidirectional){}} u2(i:input o:output){}";

// Across host models: signals, child blocks, pins with directions and every
// kind of property are copied; the source stays as it was.
TEST_F(GraftTest, CopiesStructurePinsAndProperties) {
  std::string const sourceBefore = Contents(h);
  EXPECT_TRUE(Ora_GraftMgr(false, false).Graft(h, inst));
  EXPECT_EQ(Contents(inst), kCopiedContents);
  EXPECT_EQ(Contents(h), sourceBefore);
  EXPECT_EQ(Names(inst->GetPins()), "A B");
  EXPECT_TRUE(inst->GetProperties().empty());
}

// Connections among copies are reproduced in order; the source block's own
// pins stand for the destination's pins of the same name (C has none).
TEST_F(GraftTest, ReproducesConnectionsAndMapsOwnPins) {
  EXPECT_EQ(Connections(h), "sa:A,u1.i,C sb:B,u2.o mid:u1.o,u2.i u1/inner:u1/leaf.x");
  Ora_GraftMgr(false, false).Graft(h, inst);
  EXPECT_EQ(Connections(inst), "sa:A,u1.i sb:B,u2.o mid:u1.o,u2.i u1/inner:u1/leaf.x");
}

// A copied signal joins the destination view's network of its network's
// name, which is created (with the source network's properties) when absent
// and found again by a later graft; an existing network keeps its own.
TEST_F(GraftTest, JoinsOrCreatesNetworks) {
  Ora_GraftMgr(false, false).Graft(h, inst);
  Orb_Block *second = AddInstance("inst2");
  Ora_GraftMgr(false, false).Graft(h, second);

  EXPECT_EQ(Names(view->GetNetworks()), "VCC GND");
  Orb_Network *copiedGnd = view->GetNetworkByName("GND");
  ASSERT_NE(copiedGnd, nullptr);
  EXPECT_EQ(PropertiesOf(*copiedGnd), "ROLE=ground");
  EXPECT_EQ(PropertiesOf(*vcc), "ROLE=supply");
  EXPECT_EQ(Names(vcc->GetSignals()), "sb sb");
  EXPECT_EQ(vcc->GetSignals()[1], second->GetSignalByName("sb"));
  EXPECT_EQ(copiedGnd->GetSignals().at(0)->GetParent(), inst->GetBlockByName("u1"));
  EXPECT_EQ(inst->GetSignalByName("sa")->GetNetwork(), nullptr);
}

// What the graft made is stored: a saved and reopened design shows the same
// copies, connections and network memberships.
TEST_F(GraftTest, SurvivesSaveAndReopen) {
  Ora_GraftMgr(false, false).Graft(h, inst);
  std::string const path = ::testing::TempDir() + "Ora_GraftMgrTest_roundtrip.db";
  design.Save(path.c_str());
  Orb_Model reopened("reopened", "db", "", false);
  reopened.Open(path.c_str());
  std::remove(path.c_str());

  Orb_View *again =
      reopened.GetDesignMgrByName("dm")->GetDesignByName("chip")->GetViewByName("hier");
  Orb_Block *instAgain = again->GetBlock()->GetBlockByName("inst");
  ASSERT_NE(instAgain, nullptr);
  EXPECT_EQ(Contents(instAgain), kCopiedContents);
  EXPECT_EQ(Connections(instAgain), Connections(inst));
  EXPECT_EQ(Names(again->GetNetworks()), "VCC GND");
  EXPECT_EQ(again->GetNetworkByName("GND")->GetSignals().at(0)->GetParent()->GetName(),
            std::string("u1"));
  EXPECT_EQ(again->GetNetworkByName("VCC")->GetSignals().at(0)->GetParent(), instAgain);
}

// Each copy is created (OnCreate fires, pre-order) before it gets the
// source's properties: it has none at creation, and what a creation
// handler deletes is there afterwards.
TEST_F(GraftTest, CopiesAreCreatedBeforeTheyGetProperties) {
  design.onSpecialize = [](Orb_Persistent *object, bool) {
    for (char const *name : {"KIND", "CAP", "W", "ROLE"})
      object->DeleteProperty(name);
  };
  Ora_GraftMgr(false, false).Graft(h, inst);
  EXPECT_EQ(log.Joined(), "create signal sa; create signal sb; create signal mid; "
                          "create block u1; create pin i; create pin o; create signal inner; "
                          "create network GND; create block leaf; create pin x; "
                          "create block u2; create pin i; create pin o");
  EXPECT_EQ(Contents(inst), kCopiedContents);

  Orb_Block *u1Copy = inst->GetBlockByName("u1");
  auto *blockClient = static_cast<RecBlock *>(design.GetClient(u1Copy));
  auto *pinClient = static_cast<RecPin *>(design.GetClient(u1Copy->GetPinByName("i")));
  auto *signalClient = static_cast<RecSignal *>(design.GetClient(inst->GetSignalByName("sa")));
  auto *networkClient = static_cast<RecNetwork *>(design.GetClient(view->GetNetworkByName("GND")));
  ASSERT_TRUE(blockClient && pinClient && signalClient && networkClient);
  EXPECT_EQ(blockClient->GetPropertiesAtBirth(), 0u);
  EXPECT_EQ(pinClient->GetPropertiesAtBirth(), 0u);
  EXPECT_EQ(signalClient->GetPropertiesAtBirth(), 0u);
  EXPECT_EQ(networkClient->GetPropertiesAtBirth(), 0u);
  EXPECT_EQ(PropertiesOf(*view->GetNetworkByName("GND")), "ROLE=ground");
}

class GraftBackReferenceTest : public GraftTest,
                               public ::testing::WithParamInterface<std::tuple<bool, bool>> {};

// With back references on, copied blocks and the networks the graft created
// tell their sources; with them off, or for objects not copied, nothing.
TEST_P(GraftBackReferenceTest, TellSourcesOnlyWhenOn) {
  auto const [blocks, networks] = GetParam();
  Ora_GraftMgr manager(false, false);
  manager.SetBlockBackReferences(blocks);
  manager.SetNetworkBackReferences(networks);
  manager.Graft(h, inst);

  Orb_Block const *u1Copy = inst->GetBlockByName("u1");
  EXPECT_EQ(manager.GetBlockSource(u1Copy), blocks ? u1 : nullptr);
  EXPECT_EQ(manager.GetBlockSource(u1Copy->GetBlockByName("leaf")), blocks ? leaf : nullptr);
  EXPECT_EQ(manager.GetBlockSource(inst), nullptr);
  EXPECT_EQ(manager.GetNetworkSource(view->GetNetworkByName("GND")), networks ? gnd : nullptr);
  EXPECT_EQ(manager.GetNetworkSource(vcc), nullptr);
}

INSTANTIATE_TEST_SUITE_P(OnOff, GraftBackReferenceTest,
                         ::testing::Combine(::testing::Bool(), ::testing::Bool()));

// The constructor's flags switch back references on as the setters do.
TEST_F(GraftTest, ConstructorTurnsBackReferencesOn) {
  Ora_GraftMgr manager(true, true);
  manager.Graft(h, inst);
  EXPECT_EQ(manager.GetBlockSource(inst->GetBlockByName("u1")), u1);
  EXPECT_EQ(manager.GetNetworkSource(view->GetNetworkByName("GND")), gnd);
}

// Records each pin property copy and writes a marker instead of copying.
class MarkingGraftMgr : public Ora_GraftMgr {
public:
  MarkingGraftMgr() : Ora_GraftMgr(false, false) {}
  void CopyPinProperties(Orb_Pin const *source, Orb_Pin *destination) override {
    std::string const from = source->GetParent()->GetNameString() + "." + source->GetName();
    calls.push_back(from + ">" + destination->GetParent()->GetName() + "." +
                    destination->GetName());
    destination->CreatePropertyString("FROM", from.c_str());
  }
  std::vector<std::string> calls;
};

// Copied pins get their properties through the virtual CopyPinProperties,
// once each; the destination's own pins are not touched.
TEST_F(GraftTest, CopyPinPropertiesOverrideIsUsed) {
  MarkingGraftMgr manager;
  manager.Graft(h, inst);
  EXPECT_EQ(manager.calls, (std::vector<std::string>{"u1.i>u1.i", "u1.o>u1.o", "leaf.x>leaf.x",
                                                     "u2.i>u2.i", "u2.o>u2.o"}));
  EXPECT_EQ(PropertiesOf(*inst->GetBlockByName("u1")->GetPinByName("i")), "FROM=u1.i");
  EXPECT_TRUE(inst->GetPinByName("A")->GetProperties().empty());
}

// Onto itself or into its own subtree a graft is refused and copies nothing.
TEST_F(GraftTest, RefusesSelfAndOwnSubtree) {
  std::string const before = Contents(h);
  for (Orb_Block *destination : {h, u1, leaf}) {
    EXPECT_THROW(Ora_GraftMgr(false, false).Graft(h, destination), Orb_Exception)
        << destination->GetName();
  }
  EXPECT_THROW(Ora_GraftMgr(false, false).Graft(nullptr, inst), Orb_Exception);
  EXPECT_EQ(Contents(h), before);

  // Into the same model outside the subtree is fine; the copy joins the
  // source's own network.
  Orb_Block *u2 = h->GetBlockByName("u2");
  EXPECT_TRUE(Ora_GraftMgr(false, false).Graft(u1, u2));
  EXPECT_EQ(Connections(u2), "inner:leaf.x");
  EXPECT_EQ(gnd->GetSignals().size(), 2u);
}

// A name clash throws from the host; what was copied before stays.
TEST_F(GraftTest, NameClashThrowsAndKeepsEarlierCopies) {
  inst->CreateBlock("u2", 0);
  try {
    Ora_GraftMgr(false, false).Graft(h, inst);
    FAIL() << "grafting over an existing u2 did not throw";
  } catch (Orb_Exception const &e) {
    EXPECT_EQ(e.GetObjectName(), "u2") << e.what();
  }
  EXPECT_EQ(Names(inst->GetBlocks()), "u2 u1");
  EXPECT_EQ(Names(inst->GetSignals()), "sa sb mid");
}

} // namespace

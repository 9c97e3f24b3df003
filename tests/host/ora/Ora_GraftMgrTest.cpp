#include "host/HostTestSupport.h"

#include "Ora_GraftMgr.h"
#include "Orb_Exception.h"

#include <gtest/gtest.h>

#include <memory>
#include <string>

namespace {

using namespace HostTest;

// Source: hierarchy H (pins A, B, C; children u1 with leaf, u2; networks VCC, GND) in a
// library model. Destination: block "inst" (pins A, B) in a view that has a network VCC.
class GraftTest : public ::testing::Test {
protected:
  void SetUp() override {
    Orb_View *libView = lib.CreateDesignMgr("lib")->CreateDesign("cell")->CreateView("hier");
    h = libView->CreateTopBlock("H");
    Orb_Signal *sa = h->CreateSignal("sa");
    sa->CreatePropertyString("W", "1");
    Orb_Signal *sb = h->CreateSignal("sb");
    Orb_Signal *mid = h->CreateSignal("mid");
    Connected(h, "A", Orb_Pin::PIN_INPUT, sa);
    Connected(h, "B", Orb_Pin::PIN_OUTPUT, sb);
    u1 = h->CreateBlock("u1");
    u1->CreatePropertyString("KIND", "and");
    u1->CreatePropertyStringList("TAGS")->AppendString("a");
    Orb_Property *attr = u1->CreatePropertyList("ATTR");
    attr->CreatePropertyString("k", "1");
    attr->CreatePropertyString("k", "2");
    Connected(u1, "i", Orb_Pin::PIN_INPUT, sa)->CreatePropertyString("CAP", "3");
    Connected(u1, "o", Orb_Pin::PIN_OUTPUT, mid);
    Connected(h, "C", Orb_Pin::PIN_INPUT, sa);
    leaf = u1->CreateBlock("leaf");
    Connected(leaf, "x", Orb_Pin::PIN_BIDIRECTIONAL, u1->CreateSignal("inner"));
    Orb_Block *u2 = h->CreateBlock("u2");
    Connected(u2, "i", Orb_Pin::PIN_INPUT, mid);
    Connected(u2, "o", Orb_Pin::PIN_OUTPUT, sb);
    libView->CreateNetwork("VCC")->AddSignal(sb);
    gnd = libView->CreateNetwork("GND");
    gnd->CreatePropertyString("ROLE", "ground");
    gnd->AddSignal(u1->GetSignalByName("inner"));

    view = design.GetOrbModel()->CreateDesignMgr("dm")->CreateDesign("chip")->CreateView("hier");
    top = view->CreateTopBlock("top");
    inst = AddInstance("inst");
    vcc = view->CreateNetwork("VCC");
    vcc->CreatePropertyString("ROLE", "supply");
    log.clear();
  }

  static Orb_Pin *Connected(Orb_Block *block, char const *name, Orb_Pin::PIN_DIRECTION direction,
                            Orb_Signal *signal) {
    Orb_Pin *pin = block->CreatePin(name, direction);
    if (signal->GetParent() == block)
      pin->ConnectInner(signal);
    else
      pin->Connect(signal);
    return pin;
  }
  Orb_Block *AddInstance(char const *name) {
    Orb_Block *block = top->CreateBlock(name);
    block->CreatePin("A", Orb_Pin::PIN_INPUT);
    block->CreatePin("B", Orb_Pin::PIN_OUTPUT);
    return block;
  }

  Orb_Model lib{"lib", "libdb", "", true};
  Orb_Block *h = nullptr, *u1 = nullptr, *leaf = nullptr;
  EventLog log;
  RecModel design{&log};
  Orb_View *view = nullptr;
  Orb_Block *top = nullptr, *inst = nullptr;
  Orb_Network *gnd = nullptr, *vcc = nullptr;
};

// H onto inst: H's pins map to inst's of the same name, whose inner sides take the copies; sa
// loses C, which inst lacks.
char const *const kGrafted = "block inst\n"
                             " pin A input => top/inst/sa\n"
                             " pin B output => top/inst/sb\n"
                             " signal sa <W=1> <- top/inst/A <- top/inst/u1/i\n"
                             " signal sb <- top/inst/B <- top/inst/u2/o\n"
                             " signal mid <- top/inst/u1/o <- top/inst/u2/i\n"
                             " block u1 <KIND=and TAGS[a] ATTR{k:1,k:2}>\n"
                             "  pin i <CAP=3> input -> top/inst/sa\n"
                             "  pin o output -> top/inst/mid\n"
                             "  signal inner <- top/inst/u1/leaf/x\n"
                             "  block leaf\n"
                             "   pin x bidirectional -> top/inst/u1/inner\n"
                             " block u2\n"
                             "  pin i input -> top/inst/mid\n"
                             "  pin o output -> top/inst/sb\n";

// Structure, properties and connections are copied across models and survive save/reopen; each
// copy is created (OnCreate, pre-order) before it gets the source's properties.
TEST_F(GraftTest, CopiesStructureAndConnectionsAndSurvivesReopen) {
  std::string const sourceBefore = Dump(h);
  EXPECT_TRUE(Ora_GraftMgr(false, false).Graft(h, inst));
  EXPECT_EQ(Dump(inst), kGrafted);
  EXPECT_EQ(Dump(h), sourceBefore);
  EXPECT_EQ(Joined(log), "create signal sa; create signal sb; create network top/inst/VCC; "
                         "create signal mid; create block u1; create pin i; create pin o; "
                         "create signal inner; create network top/inst/GND; create block leaf; "
                         "create pin x; create block u2; create pin i; create pin o");
  EXPECT_EQ(Dump(*Reopened(*design.GetOrbModel())), Dump(*design.GetOrbModel()));
}

// The graft sets only inner sides: outer wiring made before or after it stays, also on reopen.
TEST_F(GraftTest, GraftAndOuterWiringKeepBothSidesInEitherOrder) {
  Orb_Signal *a = top->CreateSignal("a");
  Orb_Signal *b = top->CreateSignal("b");
  Orb_Block *wiredFirst = AddInstance("wiredFirst");
  wiredFirst->GetPinByName("A")->Connect(a);
  wiredFirst->GetPinByName("B")->Connect(b);
  Ora_GraftMgr(false, false).Graft(h, wiredFirst);
  Ora_GraftMgr(false, false).Graft(h, inst);
  inst->GetPinByName("A")->Connect(a);
  inst->GetPinByName("B")->Connect(b);

  auto pinsOf = [](Orb_Block const *block) {
    return Dump(block->GetPinByName("A")) + Dump(block->GetPinByName("B"));
  };
  EXPECT_EQ(pinsOf(wiredFirst), "pin A input -> top/a => top/wiredFirst/sa\n"
                                "pin B output -> top/b => top/wiredFirst/sb\n");
  EXPECT_EQ(pinsOf(inst), "pin A input -> top/a => top/inst/sa\n"
                          "pin B output -> top/b => top/inst/sb\n");
  EXPECT_EQ(Dump(a), "signal a <- top/wiredFirst/A <- top/inst/A\n");

  std::unique_ptr<Orb_Model> reopened = Reopened(*design.GetOrbModel());
  EXPECT_EQ(Dump(*reopened), Dump(*design.GetOrbModel()));
  Orb_Block const *top2 = reopened->GetDesignMgrs()[0]->GetDesigns()[0]->GetViews()[0]->GetBlock();
  EXPECT_EQ(pinsOf(top2->GetBlockByName("wiredFirst")) + pinsOf(top2->GetBlockByName("inst")),
            pinsOf(wiredFirst) + pinsOf(inst));
}

// Two grafts of one hierarchy make two sets of networks, named uniquely, each with its source.
TEST_F(GraftTest, EachGraftMakesItsOwnNetworks) {
  Orb_Block *second = AddInstance("inst2");
  view->CreateNetwork("top/inst2/GND");
  Ora_GraftMgr networksOnly(false, false);
  networksOnly.SetNetworkBackReferences(true);
  networksOnly.Graft(h, inst);
  Ora_GraftMgr blocksOnly(true, false);
  blocksOnly.Graft(h, second);

  EXPECT_EQ(Names(view->GetNetworks()), "VCC top/inst2/GND top/inst/VCC top/inst/GND "
                                        "top/inst2/VCC top/inst2/GND_1");
  EXPECT_EQ(Dump(vcc), "network VCC <ROLE=supply>\n") << "a network of the view is never joined";
  Orb_Network const *firstGnd = view->GetNetworkByName("top/inst/GND");
  EXPECT_EQ(Dump(firstGnd), "network top/inst/GND <ROLE=ground> top/inst/u1/inner\n");
  EXPECT_EQ(Dump(view->GetNetworkByName("top/inst2/GND_1")),
            "network top/inst2/GND_1 <ROLE=ground> top/inst2/u1/inner\n");
  EXPECT_EQ(Dump(view->GetNetworkByName("top/inst2/VCC")), "network top/inst2/VCC top/inst2/sb\n");

  EXPECT_EQ(networksOnly.GetNetworkSource(firstGnd), gnd);
  EXPECT_EQ(networksOnly.GetNetworkSource(view->GetNetworkByName("top/inst/VCC")),
            h->GetSignalByName("sb")->GetNetwork());
  EXPECT_EQ(networksOnly.GetNetworkSource(vcc), nullptr);
  EXPECT_EQ(networksOnly.GetBlockSource(inst->GetBlockByName("u1")), nullptr);
  Orb_Block const *u1Copy = second->GetBlockByName("u1");
  EXPECT_EQ(blocksOnly.GetBlockSource(u1Copy), u1);
  EXPECT_EQ(blocksOnly.GetBlockSource(u1Copy->GetBlockByName("leaf")), leaf);
  EXPECT_EQ(blocksOnly.GetBlockSource(second), nullptr);
  EXPECT_EQ(blocksOnly.GetNetworkSource(view->GetNetworkByName("top/inst2/GND_1")), nullptr);
}

// Grafts into the own subtree are refused; a name clash throws and keeps earlier copies.
TEST_F(GraftTest, RefusesOwnSubtreeAndNameClashes) {
  std::string const before = Dump(h);
  for (Orb_Block *destination : {h, u1, leaf})
    EXPECT_THROW(Ora_GraftMgr(false, false).Graft(h, destination), Orb_Exception)
        << destination->GetName();
  EXPECT_THROW(Ora_GraftMgr(false, false).Graft(nullptr, inst), Orb_Exception);
  EXPECT_EQ(Dump(h), before);

  Orb_Block *u2 = h->GetBlockByName("u2");
  EXPECT_TRUE(Ora_GraftMgr(false, false).Graft(u1, u2));
  EXPECT_EQ(Names(gnd->GetSignals()), "inner");
  EXPECT_EQ(Dump(h->GetView()->GetNetworkByName("H/u2/GND")),
            "network H/u2/GND <ROLE=ground> H/u2/inner\n");

  inst->CreateBlock("u1");
  EXPECT_EQ(ThrownBy([&] { Ora_GraftMgr(false, false).Graft(h, inst); }).object, "u1");
  EXPECT_EQ(Names(inst->GetSignals()), "sa sb mid");
}

} // namespace

#include "host/HostTestSupport.h"

#include "Ora_GraftMgr.h"
#include "Orb_Exception.h"
#include "Orb_SortFtor.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <functional>
#include <memory>
#include <stdexcept>
#include <utility>

namespace {

using namespace HostTest;
using ::testing::HasSubstr;
using ::testing::StrEq;
using ::testing::ThrowsMessage;

// dm/d/v, top block "top" (pin p => s, signal s, block c with pin cp -> s), network n holding s.
class HostModelTest : public ::testing::Test {
protected:
  void SetUp() override {
    n->AddSignal(s);
    p->ConnectInner(s);
    cp->Connect(s);
  }

  EventLog log;
  std::unique_ptr<RecModel> model = std::make_unique<RecModel>(&log);
  Orb_Model *host = model->GetOrbModel();
  Orb_DesignMgr *dm = host->CreateDesignMgr("dm");
  Orb_Design *d = dm->CreateDesign("d");
  Orb_View *v = d->CreateView("v");
  Orb_Block *top = v->CreateTopBlock("top");
  Orb_Pin *p = top->CreatePin("p", Orb_Pin::PIN_INPUT);
  Orb_Signal *s = top->CreateSignal("s");
  Orb_Block *c = top->CreateBlock("c");
  Orb_Pin *cp = c->CreatePin("cp", Orb_Pin::PIN_OUTPUT);
  Orb_Network *n = v->CreateNetwork("n");
};

// One OnCreate per object; dropping the model destroys clients children first, then companions.
TEST_F(HostModelTest, ClientsComeWithCreationAndGoChildrenFirst) {
  EXPECT_EQ(Joined(log), "create design manager dm; create design d; create view v; "
                         "create block top; create pin p; create signal s; "
                         "create block c; create pin cp; create network n");
  bool freed = false;
  host->SetCompanion("flag", std::make_unique<TestCompanion>(nullptr, &freed));
  log.clear();
  model.reset();
  EXPECT_EQ(Joined(log), "~network n; ~pin p; ~signal s; ~pin cp; ~block c; ~block top; "
                         "~view v; ~design d; ~design manager dm");
  EXPECT_TRUE(freed);
}

// An attached model destroys only its clients; an unsubscribed one loads a client once, on demand.
TEST_F(HostModelTest, AttachedModelsKeepTheirOwnClients) {
  EventLog attachedLog;
  auto attached = std::make_unique<RecModel>(&attachedLog, host);
  c->CreateBlock("late");
  attached.reset();
  EXPECT_EQ(Joined(attachedLog), "create block late; ~block late");

  attachedLog.clear();
  RecModel viewer(&attachedLog, host, false);
  top->CreateSignal("late");
  EXPECT_EQ(viewer.GetClient(top), nullptr);
  auto *first = static_cast<RecTraits::Block *>(viewer.Specialize(top));
  EXPECT_EQ(viewer.Specialize(top), first);
  EXPECT_EQ(Joined(attachedLog), "load block top");

  delete first;
  EXPECT_EQ(viewer.GetBridgeHandle(Orb_Kind::Block)[top->GetBridgeId()], nullptr);
  viewer.Specialize(top);
  attachedLog.clear();
  v->DeleteTopBlock();
  EXPECT_EQ(Joined(attachedLog), "~block top");
  EXPECT_EQ(viewer.GetClientCount(), 0u);
}

// A throwing client constructor undoes the creation in every context; contexts keep own clients.
TEST_F(HostModelTest, ThrowingClientConstructorUndoesCreation) {
  EventLog otherLog;
  RecModel other(&otherLog, host);
  other.refuse = "bad";
  log.clear();
  auto *topClient = static_cast<RecTraits::Block *>(model->GetClient(top));
  EXPECT_THAT([&] { topClient->CreateBlock("bad", 0); },
              ThrowsMessage<std::runtime_error>(StrEq("refused bad")));
  EXPECT_EQ(top->GetBlockByName("bad"), nullptr);
  EXPECT_EQ(model->GetClientCount(), ObjectCount(*host));
  EXPECT_EQ(other.GetClientCount(), 0u);
  EXPECT_EQ(Joined(log), "create block bad; delete block bad; ~block bad");
  EXPECT_EQ(Joined(otherLog), "create block bad; delete block bad");
}

// A pin connects outside to its parent block's signals, inside to its own; others are refused.
TEST_F(HostModelTest, PinSidesTakeOnlyTheirOwnBlocksSignals) {
  Orb_Signal *cs = c->CreateSignal("cs");
  cp->ConnectInner(cs);
  Orb_Signal *elsewhere = d->CreateView("v2")->CreateTopBlock("t2")->CreateSignal("x");
  std::string const before = Dump(top);
  struct {
    Orb_Pin *pin;
    Orb_Signal *signal;
    bool inner;
  } const refused[] = {
      {p, s, false},          // a top block's pin has no outer side
      {cp, cs, false},        // the own block's signal, outside
      {cp, s, true},          // the parent's signal, inside
      {cp, elsewhere, false}, // another view
  };
  for (auto const &r : refused) {
    SCOPED_TRACE(std::string(r.pin->GetName()) + (r.inner ? " => " : " -> ") + r.signal->GetName());
    Thrown const e =
        ThrownBy([&] { r.inner ? r.pin->ConnectInner(r.signal) : r.pin->Connect(r.signal); });
    EXPECT_EQ(e.object, r.pin->GetName());
    EXPECT_THAT(e.message, HasSubstr(r.signal->GetName()));
  }
  EXPECT_EQ(Dump(top), before);
  c->DeleteSignal(cs); // undoes the inner side only
  EXPECT_EQ(Dump(cp), "pin cp output -> top/s\n");
  cp->Connect(nullptr);
  p->ConnectInner(nullptr);
  EXPECT_TRUE(s->GetPins().empty());
}

// A delete handler may delete a sibling or an ancestor, or fail: one delete event per object.
TEST_F(HostModelTest, DeleteHandlerMayDeleteSiblingsAndAncestors) {
  auto addSiblings = [this] {
    for (char const *name : {"a", "b"})
      top->CreateBlock(name)->CreatePin("x", Orb_Pin::PIN_INPUT);
  };
  auto deleteOnEvent = [this](char const *trigger, std::function<void()> const &action) {
    model->onDelete = [trigger, action](Orb_Persistent *object) {
      if (object->GetNameString() == trigger)
        action();
    };
  };
  auto block = [this](char const *name) { return top->GetBlockByName(name); };

  addSiblings();
  deleteOnEvent("a", [&] { top->DeleteBlock(block("b")); });
  log.clear();
  top->DeleteBlock(block("a"));
  EXPECT_EQ(Joined(log), "delete pin x; ~pin x; delete block a; ~block a; "
                         "delete pin x; ~pin x; delete block b; ~block b");
  EXPECT_EQ(Names(top->GetBlocks()), "c");

  addSiblings();
  log.clear();
  v->DeleteTopBlock();
  EXPECT_EQ(Joined(log),
            "delete pin p; ~pin p; delete signal s; ~signal s; delete pin cp; ~pin cp; "
            "delete block c; ~block c; delete pin x; ~pin x; delete block a; ~block a; "
            "delete pin x; ~pin x; delete block b; ~block b; "
            "delete block top; ~block top");
  EXPECT_EQ(v->GetBlock(), nullptr);

  top = v->CreateTopBlock("top");
  addSiblings();
  Orb_Pin *ax = block("a")->GetPinByName("x");
  model->onDelete = [this, ax](Orb_Persistent *object) {
    if (object == ax)
      v->DeleteTopBlock();
  };
  log.clear();
  top->DeleteBlock(block("a"));
  EXPECT_EQ(Joined(log), "delete pin x; ~pin x; delete block a; ~block a; "
                         "delete pin x; ~pin x; delete block b; ~block b; "
                         "delete block top; ~block top");
  EXPECT_EQ(v->GetBlock(), nullptr);

  // A handler that fails stops nothing.
  top = v->CreateTopBlock("top");
  addSiblings();
  deleteOnEvent("x", [&] { block("a")->CreatePin("late", Orb_Pin::PIN_INPUT); });
  EXPECT_THROW(top->DeleteBlock(block("a")), Orb_Exception);
  EXPECT_EQ(Names(top->GetBlocks()), "b");

  EXPECT_EQ(model->GetClientCount(), ObjectCount(*host));
}

// Duplicate names and too deep blocks or grafts are refused, creating nothing; the deepest
// chain reopens.
TEST_F(HostModelTest, DuplicatesAndDepthRefused) {
  Orb_Block *source = top->CreateBlock("source");
  source->CreateBlock("x");
  Orb_Block *deepest = c;
  while (deepest->GetDepth() < Orb_MaxBlockDepth)
    deepest = deepest->CreateBlock("b");
  log.clear();
  std::size_t const before = ObjectCount(*host);
  std::pair<char const *, std::function<void()>> const cases[] = {
      {"dm", [&] { host->CreateDesignMgr("dm"); }},
      {"c", [&] { top->CreateBlock("c"); }},
      {"v", [&] { v->CreateTopBlock("top2"); }}, // a view has one top block
      {"p", [&] { top->CreatePin("p", Orb_Pin::PIN_OUTPUT); }},
      {"s", [&] { top->CreateSignal("s"); }},
      {"b", [&] { deepest->CreateBlock("b"); }}, // deeper than Orb_MaxBlockDepth
  };
  for (auto const &[objectName, create] : cases)
    EXPECT_EQ(ThrownBy(create).object, objectName);
  EXPECT_THAT(ThrownBy([&] { deepest->CreateBlock("b"); }).message,
              HasSubstr("deeper than 1000 levels"));
  EXPECT_THROW(Ora_GraftMgr(false, false).Graft(source, deepest), Orb_Exception);
  EXPECT_EQ(ObjectCount(*host), before);
  EXPECT_TRUE(log.empty()) << Joined(log);
  EXPECT_EQ(top->GetSignalByName("p"), top->CreateSignal("p"));
  EXPECT_EQ(top->GetPinByName("p"), p);
  EXPECT_TRUE(Ora_GraftMgr(false, false).Graft(source, deepest->GetParent()));
  EXPECT_EQ(Dump(*Reopened(*host)), Dump(*host));
}

struct ByDirection : Orb_SortFtor<Orb_Pin> {
  bool operator()(Orb_Pin const *a, Orb_Pin const *b) const override {
    return a->GetDirection() < b->GetDirection();
  }
};

// SortPins is stable through a copied delegating functor; a self-delegate orders by address.
TEST_F(HostModelTest, SortPinsStableThroughDelegate) {
  c->DeletePin(cp);
  std::string expected[3];
  for (int i = 0; i < 48; ++i) {
    std::string const name = std::string(1, "iob"[i % 3]) + std::to_string(i);
    c->CreatePin(name.c_str(), static_cast<Orb_Pin::PIN_DIRECTION>(i % 3));
    expected[i % 3] += (i < 3 ? "" : " ") + name;
  }
  ByDirection byDirection;
  Orb_SortFtor<Orb_Pin> delegating(&byDirection);
  Orb_SortFtor<Orb_Pin> copy(delegating); // NOLINT(performance-unnecessary-copy-initialization)
  c->SortPins(copy);
  EXPECT_EQ(Names(c->GetPins()), expected[0] + " " + expected[1] + " " + expected[2]);

  Orb_SortFtor<Orb_Pin> plain;
  Orb_SortFtor<Orb_Pin> self(plain); // NOLINT(performance-unnecessary-copy-initialization)
  std::vector<Orb_Pin *> byAddress = c->GetPins();
  std::sort(byAddress.begin(), byAddress.end(), std::less<Orb_Pin *>());
  c->SortPins(self);
  EXPECT_EQ(c->GetPins(), byAddress);
}

// Deletions in callers' patterns keep order and lookups, above and below the name-index size.
TEST_F(HostModelTest, DeletionsKeepOrderAndLookups) {
  top->DeleteBlock(c);
  std::vector<std::string> expected;
  for (int i = 0; i < 60; ++i) {
    expected.push_back("b" + std::to_string(i));
    top->CreateBlock(expected.back().c_str());
  }
  auto const check = [&](char const *when) {
    SCOPED_TRACE(when);
    EXPECT_EQ(Names(top->GetBlocks()), Joined(expected, " "));
    for (int i = 0; i < 60; ++i) {
      std::string const name = "b" + std::to_string(i);
      bool const live = std::find(expected.begin(), expected.end(), name) != expected.end();
      Orb_Block *found = top->GetBlockByName(name.c_str());
      EXPECT_EQ(found ? found->GetNameString() : "", live ? name : "");
    }
  };
  auto const erase = [&](Orb_Block *block) {
    expected.erase(std::find(expected.begin(), expected.end(), block->GetNameString()));
    top->DeleteBlock(block);
  };
  std::vector<Orb_Block *> snapshot;
  for (std::size_t i = 0; i < top->GetBlocks().size(); i += 10)
    snapshot.push_back(top->GetBlocks()[i]);
  for (Orb_Block *block : snapshot)
    erase(block);
  check("snapshot");
  for (int k = 0; k < 5; ++k)
    erase(top->GetBlocks().front());
  check("front");
  for (std::size_t i = 0; i < top->GetBlocks().size(); ++i)
    if (i % 3 == 0)
      erase(top->GetBlocks()[i--]);
  check("index walk");
  while (top->GetBlocks().size() > 10)
    erase(top->GetBlocks().back());
  check("back, below the index size");
  top->CreateBlock("b0");
  expected.push_back("b0");
  check("a deleted name again");
  EXPECT_THROW(top->CreateBlock(expected.front().c_str()), Orb_Exception);
}

// Pin and network lists keep order as members leave; moved or dropped memberships leave no trace.
TEST_F(HostModelTest, ConnectionsLeaveInOrder) {
  std::vector<Orb_Pin *> pins;
  for (int i = 0; i < 6; ++i) {
    Orb_Block *block = top->CreateBlock(("k" + std::to_string(i)).c_str());
    pins.push_back(block->CreatePin("x", Orb_Pin::PIN_INPUT));
    pins.back()->Connect(s);
  }
  Orb_Pin *q = top->CreatePin("q", Orb_Pin::PIN_OUTPUT);
  q->ConnectInner(s);
  pins[1]->Connect(nullptr);
  p->ConnectInner(nullptr);
  top->DeleteBlock(pins[3]->GetParent());
  c->DeletePin(cp);
  EXPECT_EQ(Dump(s), "signal s <- top/k0/x <- top/k2/x <- top/k4/x <- top/k5/x <- top/q\n");
  pins[1]->Connect(s);
  EXPECT_EQ(s->GetPins().back(), pins[1]);

  for (int i = 0; i < 5; ++i)
    n->AddSignal(top->CreateSignal(("t" + std::to_string(i)).c_str()));
  n->RemoveSignal(top->GetSignalByName("t1"));
  top->DeleteSignal(top->GetSignalByName("t3"));
  EXPECT_EQ(Names(n->GetSignals()), "s t0 t2 t4");
  top->DeleteSignal(s);
  EXPECT_EQ(Names(n->GetSignals()), "t0 t2 t4");
  EXPECT_EQ(q->GetInnerSignal(), nullptr);
  EXPECT_EQ(pins[0]->GetSignal(), nullptr);
  Orb_Network *n2 = v->CreateNetwork("n2");
  n2->AddSignal(top->GetSignalByName("t0"));
  EXPECT_EQ(top->GetSignalByName("t0")->GetNetwork(), n2);
  EXPECT_EQ(Names(n->GetSignals()), "t2 t4");
  v->DeleteNetwork(n);
  EXPECT_EQ(top->GetSignalByName("t2")->GetNetwork(), nullptr);
  EXPECT_EQ(top->CreateSignal("fresh")->GetNetwork(), nullptr);
  n2->AddSignal(top->GetSignalByName("t2"));
  EXPECT_EQ(Names(n2->GetSignals()), "t0 t2");
  q->ConnectInner(top->GetSignalByName("t0"));
  q->ConnectInner(top->GetSignalByName("t2"));
  EXPECT_EQ(Names(top->GetSignalByName("t0")->GetPins()), "");
  EXPECT_EQ(Names(top->GetSignalByName("t2")->GetPins()), "q");
  top->DeletePin(q);
  EXPECT_EQ(Names(top->GetSignalByName("t2")->GetPins()), "");
  EXPECT_EQ(top->CreatePin("q2", Orb_Pin::PIN_INPUT)->GetInnerSignal(), nullptr);
}

// Pin and signal properties round trip and go with their object, not passing to its slot.
TEST_F(HostModelTest, PinAndSignalPropertiesComeAndGo) {
  cp->DeleteProperty("k");
  cp->CreatePropertyString("k", "v");
  s->CreatePropertyStringList("l")->AppendString("x");
  std::unique_ptr<Orb_Model> reopened = Reopened(*host);
  Orb_Block *top2 = TopBlockOf(*reopened, "dm", "d", "v");
  EXPECT_EQ(PropertiesOf(*top2->GetBlockByName("c")->GetPinByName("cp")), PropertiesOf(*cp));
  EXPECT_EQ(PropertiesOf(*top2->GetSignalByName("s")), PropertiesOf(*s));
  EXPECT_NE(PropertiesOf(*s), "");
  c->DeletePin(cp);
  EXPECT_TRUE(c->CreatePin("cp2", Orb_Pin::PIN_INPUT)->GetProperties().empty());
}

// Long names are stored once per model, survive a save, and go with their last holder.
TEST_F(HostModelTest, LongNamesAreSharedAndGoWithTheirLastHolder) {
  std::size_t const before = host->GetSharedNameCount();
  std::string const longest(300, 'q');
  Orb_Block *a = top->CreateBlock("seven77");
  Orb_Block *b = top->CreateBlock(longest.c_str());
  Orb_Pin *pa = a->CreatePin("DATA_IN_0", Orb_Pin::PIN_INPUT);
  Orb_Pin *pb = b->CreatePin("DATA_IN_0", Orb_Pin::PIN_INPUT);
  EXPECT_EQ(pa->GetName(), pb->GetName());
  EXPECT_EQ(top->GetBlockByName(longest.c_str()), b);
  EXPECT_EQ(b->GetPinByName("DATA_IN_"), nullptr);

  std::unique_ptr<Orb_Model> reopened = Reopened(*host);
  Orb_Block *top2 = TopBlockOf(*reopened, "dm", "d", "v");
  ASSERT_NE(top2->GetBlockByName(longest.c_str()), nullptr);
  EXPECT_EQ(top2->GetBlockByName(longest.c_str())->GetPinByName("DATA_IN_0")->GetName(),
            top2->GetBlockByName("seven77")->GetPinByName("DATA_IN_0")->GetName());

  top->DeleteBlock(a);
  EXPECT_EQ(pb->GetNameString(), "DATA_IN_0");
  EXPECT_EQ(host->GetSharedNameCount(), before + 1);
  top->DeleteBlock(b);
  EXPECT_EQ(host->GetSharedNameCount(), before);
}

// Churn reuses freed slots: bridge ids stay few and the shared name table does not grow.
TEST_F(HostModelTest, ChurnReusesSlots) {
  std::size_t const names = host->GetSharedNameCount();
  unsigned highestBlock = 0;
  unsigned highestPin = 0;
  for (int round = 0; round < 40; ++round) {
    std::vector<Orb_Block *> blocks;
    for (int i = 0; i < 25; ++i) {
      std::string const name = "round" + std::to_string(round) + "_block" + std::to_string(i);
      Orb_Block *block = top->CreateBlock(name.c_str());
      Orb_Pin *pin = block->CreatePin("x", Orb_Pin::PIN_INPUT);
      pin->Connect(s);
      highestBlock = std::max(highestBlock, block->GetBridgeId());
      highestPin = std::max(highestPin, pin->GetBridgeId());
      blocks.push_back(block);
    }
    for (std::size_t i = blocks.size(); i-- > 0;)
      top->DeleteBlock(blocks[i]);
  }
  EXPECT_LT(highestBlock, 27u);
  EXPECT_LT(highestPin, 27u);
  EXPECT_EQ(Names(s->GetPins()), "p cp");
  EXPECT_EQ(model->GetClientCount(), ObjectCount(*host));
  EXPECT_EQ(host->GetSharedNameCount(), names);
}

} // namespace

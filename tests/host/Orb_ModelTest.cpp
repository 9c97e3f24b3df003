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

// dm / d / v with top block "top" (pin p, signal s, child block c with pin
// cp) and network n holding s; p connects to s inside, cp outside.
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

// OnCreate fires once per object, and its client is what the client bases return; dropping the
// model destroys the clients children first, then the host model with its companions.
TEST_F(HostModelTest, ClientsComeWithCreationAndGoChildrenFirst) {
  EXPECT_EQ(Joined(log), "create design manager dm; create design d; create view v; "
                         "create block top; create pin p; create signal s; "
                         "create block c; create pin cp; create network n");
  auto *topClient = static_cast<RecTraits::Block *>(model->GetClient(top));
  log.clear();
  auto *child = topClient->CreateBlock("viaClient", 0);
  EXPECT_EQ(child, model->GetClient(top->GetBlockByName("viaClient")));
  EXPECT_EQ(child->GetParent(), topClient);
  EXPECT_EQ(Joined(log), "create block viaClient");

  bool freed = false;
  host->SetCompanion("flag", std::make_unique<TestCompanion>(nullptr, &freed));
  log.clear();
  model.reset();
  EXPECT_EQ(Joined(log), "~network n; ~pin p; ~signal s; ~pin cp; ~block c; ~block viaClient; "
                         "~block top; ~view v; ~design d; ~design manager dm");
  EXPECT_TRUE(freed);
}

// An attached model destroys only its clients. An unsubscribed one gets no clients from events:
// GetClient never creates, Specialize loads once, and deletion empties the bridge.
TEST_F(HostModelTest, AttachedModelsKeepTheirOwnClients) {
  EventLog attachedLog;
  auto attached = std::make_unique<RecModel>(&attachedLog, host);
  EXPECT_FALSE(attached->OwnsOrbModel());
  c->CreateBlock("late");
  attached.reset();
  EXPECT_EQ(Joined(attachedLog), "create block late; ~block late");
  EXPECT_EQ(host->GetContexts().size(), 1u);
  EXPECT_EQ(cp->GetSignal(), s);

  attachedLog.clear();
  RecModel viewer(&attachedLog, host, false);
  top->CreateSignal("late");
  EXPECT_EQ(viewer.GetClient(top), nullptr);
  EXPECT_EQ(viewer.Specialize(static_cast<Orb_Block *>(nullptr)), nullptr);
  auto *first = static_cast<RecTraits::Block *>(viewer.Specialize(top));
  EXPECT_EQ(viewer.Specialize(top), first);
  EXPECT_EQ(viewer.GetClient(top), first);
  EXPECT_NE(model->GetClient(top), first);
  EXPECT_EQ(Joined(attachedLog), "load block top");

  delete first;
  EXPECT_EQ(viewer.GetBridgeHandle(Orb_Kind::Block)[top->GetBridgeId()], nullptr);
  auto *second = viewer.Specialize(top);
  EXPECT_EQ(viewer.GetBridgeHandle(Orb_Kind::Block)[top->GetBridgeId()], second);
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
  EXPECT_EQ(host->GetObjectCount(Orb_Kind::Block), 2u);
  EXPECT_EQ(model->GetClientCount(), 9u);
  EXPECT_EQ(other.GetClientCount(), 0u);
  EXPECT_EQ(Joined(log), "create block bad; delete block bad; ~block bad");
  EXPECT_EQ(Joined(otherLog), "create block bad; delete block bad");

  other.refuse.clear();
  Orb_Block *good = top->CreateBlock("bad");
  ASSERT_NE(other.GetClient(good), nullptr);
  EXPECT_NE(static_cast<Orb_ClientObject *>(model->GetClient(good)), other.GetClient(good));
  EXPECT_EQ(other.GetClient(good)->GetClientOrbModel(), &other);
}

// Deletion fires events children first and frees everything.
TEST_F(HostModelTest, DeleteFiresEventsChildrenFirst) {
  log.clear();
  dm->DeleteDesign(d);
  EXPECT_EQ(Joined(log), "delete network n; ~network n; delete pin p; ~pin p; "
                         "delete signal s; ~signal s; delete pin cp; ~pin cp; "
                         "delete block c; ~block c; delete block top; ~block top; "
                         "delete view v; ~view v; delete design d; ~design d");
  EXPECT_EQ(model->GetClientCount(), 1u);
  EXPECT_EQ(ObjectCount(*host), 1u);
}

// A pin takes its parent block's signals outside and its own block's inside, listed by each signal;
// a signal of any other block is refused naming pin and signal, changing nothing.
TEST_F(HostModelTest, PinSidesTakeOnlyTheirOwnBlocksSignals) {
  Orb_Signal *cs = c->CreateSignal("cs");
  cp->ConnectInner(cs);
  Orb_Signal *elsewhere = d->CreateView("v2")->CreateTopBlock("t2")->CreateSignal("x");
  EXPECT_EQ(Dump(cp), "pin cp output -> top/s => top/c/cs\n");
  EXPECT_EQ(Names(s->GetPins()) + " | " + Names(cs->GetPins()), "p cp | cp");

  std::string const before = Dump(top);
  struct {
    Orb_Pin *pin;
    Orb_Signal *signal;
    bool inner;
  } const refused[] = {
      {p, s, false},          // a top block's pin has no outer side
      {p, cs, true},          // a child's signal, inside
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

  // Null and deletion undo one side only.
  c->DeleteSignal(cs);
  EXPECT_EQ(Dump(cp), "pin cp output -> top/s\n");
  cp->Connect(nullptr);
  p->ConnectInner(nullptr);
  EXPECT_TRUE(s->GetPins().empty());
}

// A delete handler may delete a sibling or an ancestor, or fail: each object gets one delete
// event, its client goes, and the host frees everything once.
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

  // Deleting a alone: its handler deletes b, which goes at once.
  addSiblings();
  deleteOnEvent("a", [&] { top->DeleteBlock(block("b")); });
  log.clear();
  top->DeleteBlock(block("a"));
  EXPECT_EQ(Joined(log), "delete pin x; ~pin x; delete block a; ~block a; "
                         "delete pin x; ~pin x; delete block b; ~block b");
  EXPECT_EQ(Names(top->GetBlocks()), "c");

  // Deleting their parent: b is already going, and gets its events in turn.
  addSiblings();
  log.clear();
  v->DeleteTopBlock();
  EXPECT_EQ(Joined(log),
            "delete pin p; ~pin p; delete signal s; ~signal s; delete pin cp; ~pin cp; "
            "delete block c; ~block c; delete pin x; ~pin x; delete block a; ~block a; "
            "delete pin x; ~pin x; delete block b; ~block b; "
            "delete block top; ~block top");
  EXPECT_EQ(v->GetBlock(), nullptr);

  // Deleting a, whose pin's handler deletes the whole tree above it.
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

  // A handler that fails (here: creating in a block being deleted) stops nothing.
  top = v->CreateTopBlock("top");
  addSiblings();
  deleteOnEvent("x", [&] { block("a")->CreatePin("late", Orb_Pin::PIN_INPUT); });
  EXPECT_THROW(top->DeleteBlock(block("a")), Orb_Exception);
  EXPECT_EQ(Names(top->GetBlocks()), "b");

  model->onDelete = nullptr;
  EXPECT_EQ(host->GetObjectCount(Orb_Kind::Block), 2u);
  EXPECT_EQ(host->GetObjectCount(Orb_Kind::Pin), 1u);
  EXPECT_EQ(model->GetClientCount(), ObjectCount(*host));
}

// A duplicate sibling name is refused per kind, naming the object, and creates nothing; pins and
// signals have names of their own.
TEST_F(HostModelTest, DuplicateNamesRefused) {
  log.clear();
  std::size_t const before = ObjectCount(*host);
  std::pair<char const *, std::function<void()>> const cases[] = {
      {"dm", [&] { host->CreateDesignMgr("dm"); }},
      {"d", [&] { dm->CreateDesign("d"); }},
      {"v", [&] { d->CreateView("v"); }},
      {"c", [&] { top->CreateBlock("c"); }},
      {"v", [&] { v->CreateTopBlock("top2"); }}, // a view has one top block
      {"p", [&] { top->CreatePin("p", Orb_Pin::PIN_OUTPUT); }},
      {"s", [&] { top->CreateSignal("s"); }},
      {"n", [&] { v->CreateNetwork("n"); }},
  };
  for (auto const &[objectName, create] : cases)
    EXPECT_EQ(ThrownBy(create).object, objectName);
  EXPECT_EQ(ObjectCount(*host), before);
  EXPECT_TRUE(log.empty()) << Joined(log);
  EXPECT_EQ(top->GetSignalByName("p"), top->CreateSignal("p"));
  EXPECT_EQ(top->GetPinByName("p"), p);
}

// Blocks nest at most Orb_MaxBlockDepth deep: a deeper block or graft creates nothing, and the
// deepest chain saves and reopens.
TEST_F(HostModelTest, BlockDepthIsBounded) {
  Orb_Block *source = top->CreateBlock("source");
  source->CreateBlock("x");
  Orb_Block *deepest = c;
  while (deepest->GetDepth() < Orb_MaxBlockDepth)
    deepest = deepest->CreateBlock("b");
  log.clear();
  std::size_t const before = ObjectCount(*host);
  Thrown const e = ThrownBy([&] { deepest->CreateBlock("b"); });
  EXPECT_EQ(e.object, "b");
  EXPECT_THAT(e.message, HasSubstr("deeper than 1000 levels"));
  // A copy of x would land one level too deep: the graft copies nothing at all.
  EXPECT_THROW(Ora_GraftMgr(false, false).Graft(source, deepest), Orb_Exception);
  EXPECT_EQ(ObjectCount(*host), before);
  EXPECT_TRUE(log.empty()) << Joined(log);
  EXPECT_TRUE(Ora_GraftMgr(false, false).Graft(source, deepest->GetParent()));
  EXPECT_EQ(deepest->GetParent()->GetBlockByName("x")->GetDepth(), Orb_MaxBlockDepth);
  EXPECT_EQ(Dump(*Reopened(*host)), Dump(*host));
}

// Orders pins by direction only, so pins of one direction compare equal.
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
  // The host may sort with a copy of the functor.
  Orb_SortFtor<Orb_Pin> copy(delegating); // NOLINT(performance-unnecessary-copy-initialization)
  EXPECT_EQ(copy.GetDelegate(), &byDirection);
  c->SortPins(copy);
  EXPECT_EQ(Names(c->GetPins()), expected[0] + " " + expected[1] + " " + expected[2]);

  Orb_SortFtor<Orb_Pin> plain;
  Orb_SortFtor<Orb_Pin> self(plain); // NOLINT(performance-unnecessary-copy-initialization)
  EXPECT_EQ(self.GetDelegate(), &self);
  std::vector<Orb_Pin *> byAddress = c->GetPins();
  std::sort(byAddress.begin(), byAddress.end(), std::less<Orb_Pin *>());
  c->SortPins(self);
  EXPECT_EQ(c->GetPins(), byAddress);
}

// Deleting children in the patterns callers use keeps host order and the name lookups right, on
// either side of the size where a block starts indexing names; a deleted name can be used again.
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
  // A snapshot of every tenth, then the front, then by index walk.
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

// A signal's pin list keeps connection order when pins leave it from either side, one by one or
// with their block; so does a network's signal list. A deleted signal leaves both.
TEST_F(HostModelTest, ConnectionsLeaveInOrder) {
  std::vector<Orb_Pin *> pins;
  for (int i = 0; i < 6; ++i) {
    Orb_Block *block = top->CreateBlock(("k" + std::to_string(i)).c_str());
    pins.push_back(block->CreatePin("x", Orb_Pin::PIN_INPUT));
    pins.back()->Connect(s);
  }
  Orb_Pin *q = top->CreatePin("q", Orb_Pin::PIN_OUTPUT);
  q->ConnectInner(s);
  EXPECT_EQ(Names(s->GetPins()), "p cp x x x x x x q");
  pins[1]->Connect(nullptr);
  p->ConnectInner(nullptr);
  top->DeleteBlock(pins[3]->GetParent());
  c->DeletePin(cp);
  std::vector<std::string> parents;
  for (Orb_Pin *pin : s->GetPins())
    parents.push_back(std::string(pin->GetParent()->GetName()) + "." + pin->GetName());
  EXPECT_EQ(Joined(parents, " "), "k0.x k2.x k4.x k5.x top.q");
  pins[1]->Connect(s);
  EXPECT_EQ(s->GetPins().back(), pins[1]) << "a reconnected pin goes last";

  for (int i = 0; i < 5; ++i)
    n->AddSignal(top->CreateSignal(("t" + std::to_string(i)).c_str()));
  n->RemoveSignal(top->GetSignalByName("t1"));
  top->DeleteSignal(top->GetSignalByName("t3"));
  EXPECT_EQ(Names(n->GetSignals()), "s t0 t2 t4");
  top->DeleteSignal(s);
  EXPECT_EQ(Names(n->GetSignals()), "t0 t2 t4");
  EXPECT_EQ(q->GetInnerSignal(), nullptr);
  EXPECT_EQ(pins[0]->GetSignal(), nullptr);
  // Moving a signal to another network, deleting a network and reusing a
  // deleted signal's slot leave no membership behind.
  Orb_Network *n2 = v->CreateNetwork("n2");
  n2->AddSignal(top->GetSignalByName("t0"));
  EXPECT_EQ(top->GetSignalByName("t0")->GetNetwork(), n2);
  EXPECT_EQ(Names(n->GetSignals()), "t2 t4");
  v->DeleteNetwork(n);
  EXPECT_EQ(top->GetSignalByName("t2")->GetNetwork(), nullptr);
  EXPECT_EQ(top->CreateSignal("fresh")->GetNetwork(), nullptr);
  n2->AddSignal(top->GetSignalByName("t2"));
  EXPECT_EQ(Names(n2->GetSignals()), "t0 t2");
  // An inner connection moved from one signal to another, and a pin made in
  // a deleted pin's slot, which starts unconnected.
  q->ConnectInner(top->GetSignalByName("t0"));
  q->ConnectInner(top->GetSignalByName("t2"));
  EXPECT_EQ(Names(top->GetSignalByName("t0")->GetPins()), "");
  EXPECT_EQ(Names(top->GetSignalByName("t2")->GetPins()), "q");
  top->DeletePin(q);
  EXPECT_EQ(Names(top->GetSignalByName("t2")->GetPins()), "");
  EXPECT_EQ(top->CreatePin("q2", Orb_Pin::PIN_INPUT)->GetInnerSignal(), nullptr);
}

// Pins and signals keep their properties beside them in the model: made by
// the first property, saved and reopened, and gone with their object, so a
// pin made in the same slot starts with none.
TEST_F(HostModelTest, PinAndSignalPropertiesComeAndGo) {
  EXPECT_TRUE(cp->GetProperties().empty());
  EXPECT_EQ(cp->GetPropertyByName("k"), nullptr);
  cp->DeleteProperty("k");
  cp->CreatePropertyString("k", "v");
  s->CreatePropertyStringList("l")->AppendString("x");
  std::unique_ptr<Orb_Model> reopened = Reopened(*host);
  Orb_Block *top2 =
      reopened->GetDesignMgrByName("dm")->GetDesignByName("d")->GetViewByName("v")->GetBlock();
  EXPECT_EQ(PropertiesOf(*top2->GetBlockByName("c")->GetPinByName("cp")), PropertiesOf(*cp));
  EXPECT_EQ(PropertiesOf(*top2->GetSignalByName("s")), PropertiesOf(*s));
  EXPECT_NE(PropertiesOf(*s), "");
  c->DeletePin(cp);
  EXPECT_TRUE(c->CreatePin("cp2", Orb_Pin::PIN_INPUT)->GetProperties().empty());
}

// Pin names over 7 bytes are stored once per model: two pins of that name share it, lookups and
// saves see each whole, and a name goes with the last object holding it.
TEST_F(HostModelTest, LongNamesAreSharedAndGoWithTheirLastHolder) {
  std::size_t const before = host->GetSharedNameCount();
  std::string const longest(300, 'q');
  Orb_Block *a = top->CreateBlock("seven77");
  Orb_Block *b = top->CreateBlock(longest.c_str());
  Orb_Pin *pa = a->CreatePin("DATA_IN_0", Orb_Pin::PIN_INPUT);
  Orb_Pin *pb = b->CreatePin("DATA_IN_0", Orb_Pin::PIN_INPUT);
  EXPECT_EQ(pa->GetName(), pb->GetName()); // one copy
  EXPECT_EQ(host->GetSharedNameCount(), before + 1);
  EXPECT_EQ(b->GetNameString(), longest);
  EXPECT_EQ(top->GetBlockByName(longest.c_str()), b);
  EXPECT_EQ(b->GetPinByName("DATA_IN_0"), pb);
  EXPECT_EQ(b->GetPinByName("DATA_IN_"), nullptr);

  std::unique_ptr<Orb_Model> reopened = Reopened(*host);
  Orb_Block *top2 =
      reopened->GetDesignMgrByName("dm")->GetDesignByName("d")->GetViewByName("v")->GetBlock();
  ASSERT_NE(top2->GetBlockByName(longest.c_str()), nullptr);
  EXPECT_EQ(top2->GetBlockByName(longest.c_str())->GetPinByName("DATA_IN_0")->GetName(),
            top2->GetBlockByName("seven77")->GetPinByName("DATA_IN_0")->GetName());

  top->DeleteBlock(a);
  EXPECT_EQ(pb->GetNameString(), "DATA_IN_0");
  EXPECT_EQ(host->GetSharedNameCount(), before + 1);
  top->DeleteBlock(b);
  EXPECT_EQ(host->GetSharedNameCount(), before);
}

// Creating and deleting blocks over and over reuses the freed slots of each kind: bridge ids
// stay as few as the objects alive at once, and the shared name table does not grow.
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
  // Top, c and the 25 of a round; the fixture's pins p, cp and the 25.
  EXPECT_LT(highestBlock, 27u);
  EXPECT_LT(highestPin, 27u);
  EXPECT_EQ(Names(s->GetPins()), "p cp");
  EXPECT_EQ(model->GetClientCount(), ObjectCount(*host));
  EXPECT_EQ(host->GetSharedNameCount(), names);
}

} // namespace

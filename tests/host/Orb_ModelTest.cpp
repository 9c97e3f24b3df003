#include "host/HostTestSupport.h"

#include "Orb_Exception.h"
#include "Orb_SortFtor.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <functional>
#include <memory>
#include <stdexcept>

namespace {

using namespace HostTest;

// A small design: dm / d / v with top block "top" (pin p, signal s, child
// block c with pin cp) and network n holding s; p and cp connect to s.
struct Tree {
  Orb_DesignMgr *dm;
  Orb_Design *d;
  Orb_View *v;
  Orb_Block *top;
  Orb_Pin *p;
  Orb_Signal *s;
  Orb_Block *c;
  Orb_Pin *cp;
  Orb_Network *n;
};

Tree Build(Orb_Model *host) {
  Tree t{};
  t.dm = host->CreateDesignMgr("dm");
  t.d = t.dm->CreateDesign("d");
  t.v = t.d->CreateView("v");
  t.top = t.v->CreateTopBlock("top");
  t.p = t.top->CreatePin("p", Orb_Pin::PIN_INPUT);
  t.s = t.top->CreateSignal("s");
  t.c = t.top->CreateBlock("c", 0);
  t.cp = t.c->CreatePin("cp", Orb_Pin::PIN_OUTPUT);
  t.n = t.v->CreateNetwork("n");
  t.n->AddSignal(t.s);
  t.p->Connect(t.s);
  t.cp->Connect(t.s);
  return t;
}

char const *const kBuildEvents = "create design manager dm; create design d; create view v; "
                                 "create block top; create pin p; create signal s; "
                                 "create block c; create pin cp; create network n";

// Sets a flag when the host model that owns it is destroyed.
class FreedFlag : public Orb_ModelCompanion {
public:
  explicit FreedFlag(bool *freed) : m_pFreed(freed) {}
  ~FreedFlag() override { *m_pFreed = true; }
  Orb_Model const *GetModelToSave() const override { return nullptr; }

private:
  bool *m_pFreed;
};

class HostModelTest : public ::testing::Test {
protected:
  EventLog log;
  std::unique_ptr<RecModel> model = std::make_unique<RecModel>(&log);
  Orb_Model *host = model->GetOrbModel();
};

// ---------------------------------------------------------------------------
// Lifetime of client models

// Dropping a model destroys its clients, children before parents, while the
// host objects still exist (the client destructors read their names).
TEST_F(HostModelTest, DroppingModelDestroysClientsChildrenFirst) {
  Build(host);
  log.Clear();
  model.reset();
  EXPECT_EQ(log.Joined(), "~network n; ~pin p; ~signal s; ~pin cp; ~block c; ~block top; "
                          "~view v; ~design d; ~design manager dm");
}

// A model that made its host model frees it with everything in it.
TEST_F(HostModelTest, ModelFreesTheHostModelItMade) {
  bool freed = false;
  Build(host);
  host->SetCompanion("flag", std::make_unique<FreedFlag>(&freed));
  ASSERT_TRUE(model->OwnsOrbModel());
  model.reset();
  EXPECT_TRUE(freed);
}

// A model attached to a caller's host model destroys only its clients.
TEST(HostModelLifetimeTest, AttachedModelLeavesHostModelIntact) {
  Orb_Model host("m", "db", "", false);
  EventLog log;
  bool freed = false;
  host.SetCompanion("flag", std::make_unique<FreedFlag>(&freed));
  Tree t{};
  {
    RecModel model(&log, &host);
    EXPECT_FALSE(model.OwnsOrbModel());
    t = Build(&host);
    log.Clear();
  }
  EXPECT_EQ(log.lines.size(), 9u) << log.Joined();
  EXPECT_FALSE(freed);
  EXPECT_TRUE(host.GetContexts().empty());
  EXPECT_EQ(host.GetObjectCount(Orb_Kind::Block), 2u);
  EXPECT_EQ(t.cp->GetSignal(), t.s);

  // A later model finds the objects and specializes them afresh.
  log.Clear();
  RecModel again(&log, &host);
  EXPECT_EQ(again.GetClientCount(), 0u);
  auto *top = static_cast<RecBlock *>(again.Specialize(t.top));
  ASSERT_NE(top, nullptr);
  EXPECT_FALSE(top->WasCreated());
  EXPECT_EQ(log.Joined(), "load block top");
}

// ---------------------------------------------------------------------------
// Events and the bridge

// Creation fires OnCreate exactly once per object, and the client that the
// event made is the one the bridge and the client bases return.
TEST_F(HostModelTest, CreationFiresOnCreateOnce) {
  Tree t = Build(host);
  EXPECT_EQ(log.Joined(), kBuildEvents);
  EXPECT_EQ(model->GetClientCount(), 9u);
  auto *top = static_cast<RecBlock *>(model->GetClient(t.top));
  ASSERT_NE(top, nullptr);
  EXPECT_TRUE(top->WasCreated());
  EXPECT_EQ(top->GetClientOrbModel(), model.get());

  log.Clear();
  RecBlock *child = top->CreateBlock("viaClient", 0);
  ASSERT_NE(child, nullptr);
  EXPECT_TRUE(child->WasCreated());
  EXPECT_EQ(child, model->GetClient(t.top->GetBlockByName("viaClient")));
  EXPECT_EQ(child->GetParent(), top);
  EXPECT_EQ(log.Joined(), "create block viaClient");
}

// An attached, unsubscribed context gets no events: GetClient stays null,
// Specialize makes the client through OnLoad once, a destroyed client is
// made afresh, and deleting the host object still destroys the client.
TEST_F(HostModelTest, UnsubscribedContextSpecializesOnDemand) {
  Tree t = Build(host);
  EventLog viewerLog;
  RecModel viewer(&viewerLog, host, false);
  t.top->CreateSignal("late");
  EXPECT_TRUE(viewerLog.lines.empty()) << viewerLog.Joined();
  EXPECT_EQ(viewer.GetClient(t.top), nullptr);
  EXPECT_EQ(viewer.GetClient(static_cast<Orb_Block *>(nullptr)), nullptr);
  EXPECT_EQ(viewer.Specialize(static_cast<Orb_Block *>(nullptr)), nullptr);

  auto *first = static_cast<RecBlock *>(viewer.Specialize(t.top));
  ASSERT_NE(first, nullptr);
  EXPECT_FALSE(first->WasCreated());
  EXPECT_EQ(viewer.Specialize(t.top), first);
  EXPECT_EQ(viewer.GetClient(t.top), first);
  EXPECT_NE(model->GetClient(t.top), first);
  EXPECT_EQ(viewerLog.Joined(), "load block top");

  delete first;
  EXPECT_EQ(viewer.GetClient(t.top), nullptr);
  EXPECT_EQ(viewer.GetBridgeHandle(Orb_Kind::Block)[t.top->GetBridgeId()], nullptr);
  RecBlock *second = static_cast<RecBlock *>(viewer.Specialize(t.top));
  ASSERT_NE(second, nullptr);
  EXPECT_EQ(viewer.GetBridgeHandle(Orb_Kind::Block)[t.top->GetBridgeId()], second);

  viewerLog.Clear();
  t.v->DeleteTopBlock();
  EXPECT_EQ(viewerLog.Joined(), "~block top");
  EXPECT_EQ(viewer.GetClientCount(), 0u);
}

// Two subscribed contexts on one host model each get every event and keep
// clients of their own.
TEST_F(HostModelTest, SeveralContextsGetTheirOwnClientsAndEvents) {
  Tree t = Build(host);
  EventLog otherLog;
  RecModel other(&otherLog, host);
  log.Clear();

  Orb_Block *b = t.top->CreateBlock("b", 0);
  EXPECT_EQ(log.Joined(), "create block b");
  EXPECT_EQ(otherLog.Joined(), "create block b");
  ASSERT_NE(model->GetClient(b), nullptr);
  ASSERT_NE(other.GetClient(b), nullptr);
  EXPECT_NE(static_cast<Orb_ClientObject *>(model->GetClient(b)), other.GetClient(b));
  EXPECT_EQ(other.GetClient(b)->GetClientOrbModel(), &other);

  t.top->DeleteBlock(b);
  EXPECT_EQ(log.Joined(), "create block b; delete block b; ~block b");
  EXPECT_EQ(otherLog.Joined(), "create block b; delete block b; ~block b");
}

// Deleting an object fires delete events for all it owns, children before
// parents, each client destroyed inside its event, then frees the objects.
TEST_F(HostModelTest, DeleteFiresEventsChildrenFirst) {
  Tree t = Build(host);
  log.Clear();
  t.dm->DeleteDesign(t.d);
  EXPECT_EQ(log.Joined(), "delete network n; ~network n; delete pin p; ~pin p; "
                          "delete signal s; ~signal s; delete pin cp; ~pin cp; "
                          "delete block c; ~block c; delete block top; ~block top; "
                          "delete view v; ~view v; delete design d; ~design d");
  EXPECT_EQ(model->GetClientCount(), 1u);
  for (Orb_Kind kind : {Orb_Kind::Design, Orb_Kind::View, Orb_Kind::Block, Orb_Kind::Pin,
                        Orb_Kind::Signal, Orb_Kind::Network})
    EXPECT_EQ(host->GetObjectCount(kind), 0u) << Orb_KindName(kind);
}

// Deleting a pin or a signal undoes its connections on the other side.
TEST_F(HostModelTest, DeleteUndoesConnections) {
  Tree t = Build(host);
  t.c->DeletePin(t.cp);
  EXPECT_EQ(Names(t.s->GetPins()), "p");
  t.top->DeleteSignal(t.s);
  EXPECT_EQ(t.p->GetSignal(), nullptr);
  EXPECT_TRUE(t.n->GetSignals().empty());
}

struct ConstructorFailure : std::runtime_error {
  using std::runtime_error::runtime_error;
};

// A client constructor that throws inside OnCreate: the host deletes the new
// object again (other contexts lose their client of it too), and the
// exception arrives unchanged.
TEST_F(HostModelTest, ThrowingClientConstructorUndoesCreation) {
  Tree t = Build(host);
  EventLog otherLog;
  RecModel other(&otherLog, host);
  other.inClientConstructor = [](Orb_Persistent *object) {
    if (object->GetNameString() == "bad")
      throw ConstructorFailure("refused bad");
  };
  log.Clear();
  std::size_t const blocks = host->GetObjectCount(Orb_Kind::Block);
  std::size_t const clients = model->GetClientCount();

  auto *top = static_cast<RecBlock *>(model->GetClient(t.top));
  try {
    top->CreateBlock("bad", 0);
    FAIL() << "creating <bad> did not throw";
  } catch (ConstructorFailure const &e) {
    EXPECT_STREQ(e.what(), "refused bad");
  }
  EXPECT_EQ(t.top->GetBlockByName("bad"), nullptr);
  EXPECT_EQ(host->GetObjectCount(Orb_Kind::Block), blocks);
  EXPECT_EQ(model->GetClientCount(), clients);
  EXPECT_EQ(other.GetClientCount(), 0u);
  EXPECT_EQ(log.Joined(), "create block bad; delete block bad; ~block bad");
  EXPECT_EQ(otherLog.Joined(), "create block bad; delete block bad");

  // The name is free again.
  EXPECT_NE(t.top->CreateBlock("good", 0), nullptr);
}

// ---------------------------------------------------------------------------
// Names

struct DuplicateCase {
  char const *label;
  Orb_Kind kind;
  char const *objectName; // as the exception names it
  void (*create)(Orb_Model *, Tree const &);
};

class DuplicateNameTest : public HostModelTest,
                          public ::testing::WithParamInterface<DuplicateCase> {};

// A second sibling of one kind and name is refused and nothing is created.
TEST_P(DuplicateNameTest, RefusedAndNothingCreated) {
  DuplicateCase const &c = GetParam();
  Tree t = Build(host);
  log.Clear();
  std::size_t const before = host->GetObjectCount(c.kind);
  try {
    c.create(host, t);
    FAIL() << c.label << " duplicate accepted";
  } catch (Orb_Exception const &e) {
    EXPECT_EQ(e.GetObjectName(), c.objectName) << e.what();
  }
  EXPECT_EQ(host->GetObjectCount(c.kind), before);
  EXPECT_TRUE(log.lines.empty()) << log.Joined();
}

INSTANTIATE_TEST_SUITE_P(
    EveryKind, DuplicateNameTest,
    ::testing::Values(
        DuplicateCase{"designMgr", Orb_Kind::DesignMgr, "dm",
                      [](Orb_Model *h, Tree const &) { h->CreateDesignMgr("dm"); }},
        DuplicateCase{"design", Orb_Kind::Design, "d",
                      [](Orb_Model *, Tree const &tree) { tree.dm->CreateDesign("d"); }},
        DuplicateCase{"view", Orb_Kind::View, "v",
                      [](Orb_Model *, Tree const &tree) { tree.d->CreateView("v"); }},
        DuplicateCase{"block", Orb_Kind::Block, "c",
                      [](Orb_Model *, Tree const &tree) { tree.top->CreateBlock("c", 0); }},
        DuplicateCase{"topBlock", Orb_Kind::Block, "v",
                      [](Orb_Model *, Tree const &tree) { tree.v->CreateTopBlock("top2"); }},
        DuplicateCase{
            "pin", Orb_Kind::Pin, "p",
            [](Orb_Model *, Tree const &tree) { tree.top->CreatePin("p", Orb_Pin::PIN_OUTPUT); }},
        DuplicateCase{"signal", Orb_Kind::Signal, "s",
                      [](Orb_Model *, Tree const &tree) { tree.top->CreateSignal("s"); }},
        DuplicateCase{"network", Orb_Kind::Network, "n",
                      [](Orb_Model *, Tree const &tree) { tree.v->CreateNetwork("n"); }}),
    [](auto const &paramInfo) { return std::string(paramInfo.param.label); });

// Names are unique per kind only, lookups find each kind's own object, and a
// deleted object's name can be used again.
TEST_F(HostModelTest, NamesAreUniquePerKindAndReusableAfterDelete) {
  Tree t = Build(host);
  Orb_Signal *p = t.top->CreateSignal("p");
  Orb_Block *s = t.top->CreateBlock("s", 0);
  EXPECT_EQ(t.top->GetPinByName("p"), t.p);
  EXPECT_EQ(t.top->GetSignalByName("p"), p);
  EXPECT_EQ(t.top->GetBlockByName("s"), s);
  EXPECT_EQ(t.top->GetPinByName("absent"), nullptr);

  t.top->DeleteBlock(t.c);
  Orb_Block *again = t.top->CreateBlock("c", 0);
  EXPECT_EQ(t.top->GetBlockByName("c"), again);
  EXPECT_EQ(Names(t.top->GetBlocks()), "s c");
}

// ---------------------------------------------------------------------------
// Pin sorting

// Orders pins by direction only, so pins of one direction compare equal.
class ByDirection : public Orb_SortFtor<Orb_Pin> {
public:
  bool operator()(Orb_Pin const *a, Orb_Pin const *b) const override {
    ++m_Calls;
    return a->GetDirection() < b->GetDirection();
  }
  int GetCalls() const { return m_Calls; }

private:
  mutable int m_Calls = 0;
};

// A block with enough pins that an unstable sort would show, created with
// directions input, output, bidirectional in turn.
class SortPinsTest : public HostModelTest {
protected:
  void SetUp() override {
    block = Build(host).c;
    block->DeletePin(block->GetPinByName("cp"));
    for (int i = 0; i < 48; ++i) {
      std::string const name = std::string(1, "iob"[i % 3]) + std::to_string(i);
      block->CreatePin(name.c_str(), static_cast<Orb_Pin::PIN_DIRECTION>(i % 3));
    }
  }
  // Pin names of one direction in host order, for the expected result.
  std::string NamesOf(char prefix) const {
    std::string text;
    for (Orb_Pin const *pin : block->GetPins())
      if (pin->GetName()[0] == prefix)
        text += (text.empty() ? "" : " ") + pin->GetNameString();
    return text;
  }
  Orb_Block *block = nullptr;
};

// Equal keys keep host order, and a functor delegating to another compares
// through it (also after being copied).
TEST_F(SortPinsTest, StableThroughDelegate) {
  std::string const expected = NamesOf('i') + " " + NamesOf('o') + " " + NamesOf('b');
  ByDirection byDirection;
  Orb_SortFtor<Orb_Pin> delegating(&byDirection);
  // The copy is the point: the host may sort with a copy of the functor.
  Orb_SortFtor<Orb_Pin> copy(delegating); // NOLINT(performance-unnecessary-copy-initialization)
  EXPECT_EQ(copy.GetDelegate(), &byDirection);

  block->SortPins(copy);
  EXPECT_EQ(Names(block->GetPins()), expected);
  EXPECT_GT(byDirection.GetCalls(), 0);
  EXPECT_EQ(block->GetPinByName("o4")->GetName(), std::string("o4"));

  // Sorting again changes nothing; a new pin goes at the end.
  block->SortPins(byDirection);
  block->CreatePin("i99", Orb_Pin::PIN_INPUT);
  EXPECT_EQ(Names(block->GetPins()), expected + " i99");
}

// A functor that is its own delegate orders by address, also as a copy.
TEST_F(SortPinsTest, SelfDelegateOrdersByAddress) {
  Orb_SortFtor<Orb_Pin> plain;
  Orb_SortFtor<Orb_Pin> copy(plain);
  EXPECT_EQ(copy.GetDelegate(), &copy);
  std::vector<Orb_Pin *> expected = block->GetPins();
  std::sort(expected.begin(), expected.end(), std::less<Orb_Pin *>());
  block->SortPins(copy);
  EXPECT_EQ(block->GetPins(), expected);
}

// ---------------------------------------------------------------------------
// Properties

class PropertyTest : public ::testing::Test {
protected:
  void SetUp() override {
    holder.CreatePropertyString("A", "1");
    holder.CreatePropertyString("B", "2");
    holder.CreatePropertyString("C", "3");
  }
  Orb_PropertyHolder holder;
};

// Creating an existing name replaces that property at its place, whatever
// its kind; a string takes a new value in place.
TEST_F(PropertyTest, CreateReplacesInPlace) {
  holder.CreatePropertyString("B", "9");
  EXPECT_EQ(PropertiesOf(holder), "A=1 B=9 C=3");
  holder.CreatePropertyStringList("A");
  EXPECT_EQ(PropertiesOf(holder), "A[] B=9 C=3");

  Orb_Property *c = holder.GetPropertyByName("C");
  c->SetStringValue("x y:z\n\xff");
  EXPECT_EQ(holder.GetPropertyByName("C"), c);
  EXPECT_EQ(c->GetValue(), "x y:z\n\xff");
  EXPECT_EQ(holder.GetPropertyByName("absent"), nullptr);
  EXPECT_EQ(holder.GetPropertyByName(nullptr), nullptr);
}

// A string list is cleared and appended to in order; a list keeps members
// with repeated names in order.
TEST_F(PropertyTest, ListsKeepOrder) {
  Orb_Property *strings = holder.CreatePropertyStringList("L");
  strings->AppendString("x");
  strings->AppendString("y");
  EXPECT_EQ(PropertiesOf(holder), "A=1 B=2 C=3 L[x,y]");
  strings->ClearStrings();
  strings->AppendString("z");
  EXPECT_EQ(PropertiesOf(holder), "A=1 B=2 C=3 L[z]");

  Orb_PropertyHolder other;
  Orb_Property *list = other.CreatePropertyList("M");
  list->CreatePropertyString("n", "1");
  list->CreatePropertyString("n", "2");
  list->CreatePropertyString("m", "3");
  EXPECT_EQ(PropertiesOf(other), "M{n:1,n:2,m:3}");
}

// Deleting by name or by pointer removes just that property; an absent name
// or another holder's property changes nothing.
TEST_F(PropertyTest, DeleteByNameAndByPointer) {
  holder.DeleteProperty("B");
  EXPECT_EQ(PropertiesOf(holder), "A=1 C=3");
  holder.DeleteProperty("B");
  holder.DeleteProperty(static_cast<char const *>(nullptr));
  Orb_PropertyHolder other;
  holder.DeleteProperty(other.CreatePropertyString("A", "other"));
  EXPECT_EQ(PropertiesOf(holder), "A=1 C=3");
  holder.DeleteProperty(holder.GetPropertyByName("C"));
  EXPECT_EQ(PropertiesOf(holder), "A=1");
}

// Copying properties copies every kind, replaces same-named ones in place,
// and copying a holder onto itself changes nothing.
TEST_F(PropertyTest, CopyPropertiesFrom) {
  Orb_PropertyHolder source;
  source.CreatePropertyString("B", "b");
  source.CreatePropertyStringList("L")->AppendString("x");
  Orb_Property *list = source.CreatePropertyList("M");
  list->CreatePropertyString("n", "1");
  list->CreatePropertyString("n", "2");

  holder.CopyPropertiesFrom(source);
  EXPECT_EQ(PropertiesOf(holder), "A=1 B=b C=3 L[x] M{n:1,n:2}");
  holder.CopyPropertiesFrom(holder);
  EXPECT_EQ(PropertiesOf(holder), "A=1 B=b C=3 L[x] M{n:1,n:2}");
}

} // namespace

// Allocation failure at every k-th allocation; a program of its own, as it replaces operator new.

#include "Lum_TdmFaultSupport.h"

#include "Lum_TdmTypePinMap.h"
#include "Orb_Exception.h"
#include "Orb_FileOps.h"
#include "Port_Exception.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <new>
#include <string>

namespace {

// While armed, allocation number g_FailAt (from 1) throws std::bad_alloc.
unsigned long g_Allocations = 0;
unsigned long g_FailAt = 0;
bool g_Armed = false;
// Blocks from operator new not yet deleted.
long g_Live = 0;

void *Allocate(std::size_t size) {
  if (g_Armed && ++g_Allocations == g_FailAt)
    throw std::bad_alloc();
  if (void *memory = std::malloc(size ? size : 1)) {
    ++g_Live;
    return memory;
  }
  throw std::bad_alloc();
}

void Free(void *memory) noexcept {
  if (memory)
    --g_Live;
  std::free(memory);
}

enum Outcome { DONE, FAILED, BAD_EXCEPTION };

// The action must succeed or throw std::bad_alloc or a Port::Exception with a message.
template <class Action> Outcome FailAt(unsigned long k, Action const &action) {
  struct Disarm {
    ~Disarm() { g_Armed = false; }
  } const disarm{};
  g_Allocations = 0;
  g_FailAt = k;
  g_Armed = true;
  try {
    action();
    return DONE;
  } catch (std::bad_alloc const &) {
    return FAILED;
  } catch (Port::Exception const &e) {
    return e.GetMessage().empty() ? BAD_EXCEPTION : FAILED;
  } catch (...) {
    return BAD_EXCEPTION;
  }
}

// A memory checker such as valgrind puts its own operator new in place.
bool ReplacementInUse() {
  return FailAt(1, [] { delete new int(0); }) == FAILED;
}

} // namespace

// Visible to the shared libraries, built with hidden visibility. Every form is replaced, so that
// a memory checker never sees one form's memory freed by another.
#define LUM_REPLACE __attribute__((visibility("default")))
void *TryAllocate(std::size_t size) noexcept {
  try {
    return Allocate(size);
  } catch (std::bad_alloc const &) {
    return nullptr;
  }
}
LUM_REPLACE void *operator new(std::size_t size) { return Allocate(size); }
LUM_REPLACE void *operator new[](std::size_t size) { return Allocate(size); }
LUM_REPLACE void *operator new(std::size_t size, std::nothrow_t const &) noexcept {
  return TryAllocate(size);
}
LUM_REPLACE void *operator new[](std::size_t size, std::nothrow_t const &) noexcept {
  return TryAllocate(size);
}
LUM_REPLACE void operator delete(void *memory) noexcept { Free(memory); }
LUM_REPLACE void operator delete[](void *memory) noexcept { Free(memory); }
LUM_REPLACE void operator delete(void *memory, std::size_t) noexcept { Free(memory); }
LUM_REPLACE void operator delete[](void *memory, std::size_t) noexcept { Free(memory); }
LUM_REPLACE void operator delete(void *memory, std::nothrow_t const &) noexcept { Free(memory); }
LUM_REPLACE void operator delete[](void *memory, std::nothrow_t const &) noexcept { Free(memory); }

using namespace lumtest;

namespace {

class TdmAllocFaultTest : public ::testing::Test {
protected:
  void SetUp() override {
    if (!ReplacementInUse())
      GTEST_SKIP() << "operator new is not this program's (a memory checker replaced it)";
  }
};

std::size_t Reachable(Orb_Block const *block) {
  std::size_t count = 1 + block->GetPins().size() + block->GetSignals().size();
  for (Orb_Block const *child : block->GetBlocks())
    count += Reachable(child);
  return count;
}

std::size_t Reachable(Orb_Model const &model) {
  std::size_t count = 0;
  for (Orb_DesignMgr const *designMgr : model.GetDesignMgrs()) {
    ++count;
    for (Orb_Design const *design : designMgr->GetDesigns()) {
      ++count;
      for (Orb_View const *view : design->GetViews())
        count +=
            1 + view->GetNetworks().size() + (view->GetBlock() ? Reachable(view->GetBlock()) : 0);
    }
  }
  return count;
}

// Host objects the model counts but cannot reach: made, not filed away, not freed.
std::size_t Strays(Lum_TdmModel const &model) {
  return HostObjectCount(model.GetOrbModel()) - Reachable(*model.GetOrbModel());
}

// A failed open leaves the model as it was and it then opens the design in full.
TEST_F(TdmAllocFaultTest, FailedAllocationAtEveryStepOfAnOpenLeavesTheModelAsItWas) {
  FaultDesign design;
  unsigned long k = 1;
  for (;; ++k) {
    SCOPED_TRACE("allocation " + std::to_string(k));
    Lum_TdmModel model("alloc", "allocdb", "");
    FaultDesign::AddOwnContent(model);
    ModelState const before = StateOf(model, design.Scratch("before.odb"));
    Outcome const outcome = FailAt(k, [&] { model.Open(design.Path().c_str()); });
    ASSERT_NE(outcome, BAD_EXCEPTION);
    if (outcome == DONE) {
      EXPECT_EQ(FaultDesign::Typing(model), FaultDesign::kTyping);
      break;
    }
    ASSERT_EQ(StateOf(model, design.Scratch("after.odb")), before);
    EXPECT_FALSE(Lum_TlmCatalog::IsLoaded("CELLS")) << "the library file stays loaded";
    model.Open(design.Path().c_str());
    ASSERT_EQ(FaultDesign::Typing(model), FaultDesign::kTyping);
  }
  EXPECT_GT(k, 100u) << "the open made fewer allocations than expected";
}

// A failed save leaves the previous database byte for byte and no temporary file.
TEST_F(TdmAllocFaultTest, FailedAllocationWhileSavingKeepsThePreviousDatabase) {
  TempDir dir;
  std::string const path = dir.File("d.odb");
  TypedDesign design;
  Lum_TdmBlock *top = design.m_pView->CreateTopBlock("top");
  design.Model().Save(path.c_str());
  std::string const previous = FileBytes(path);
  top->CreateBlock("u1", 0)->CreatePin("a", Orb_Pin::PIN_INPUT);

  for (unsigned long k = 1;; ++k) {
    SCOPED_TRACE("allocation " + std::to_string(k));
    Outcome const outcome = FailAt(k, [&] { design.Model().Save(path.c_str()); });
    ASSERT_NE(outcome, BAD_EXCEPTION);
    ASSERT_EQ(Listing(dir.Path()), "d.odb") << "a temporary file stays";
    if (outcome == DONE)
      break;
    ASSERT_EQ(FileBytes(path), previous);
  }
  EXPECT_NE(FirstView(*OpenModel(path))->GetBlock()->GetBlockByName("u1"), nullptr);
}

// Long names (a pin's, shared in the model's name table, and a block's and a signal's of their
// own, over the table's size classes): a failure at any allocation leaks nothing.
TEST_F(TdmAllocFaultTest, FailedAllocationWhileNamingLeaksNothing) {
  std::string const pin(40, 'p'), block(300, 'b'), signal(300, 's');
  auto const name = [&](unsigned long k) {
    Orb_Model model("m", "db", "", false);
    Orb_Block *top =
        model.CreateDesignMgr("dm")->CreateDesign("d")->CreateView("v")->CreateTopBlock("t");
    return FailAt(k, [&] {
      top->CreateBlock(block.c_str())->CreatePin(pin.c_str(), Orb_Pin::PIN_INPUT);
      top->CreateSignal(signal.c_str());
    });
  };
  // Once through, for the process-wide pools.
  ASSERT_EQ(name(0), DONE);
  for (unsigned long k = 1;; ++k) {
    SCOPED_TRACE("allocation " + std::to_string(k));
    long const live = g_Live;
    Outcome const outcome = name(k);
    ASSERT_NE(outcome, BAD_EXCEPTION);
    EXPECT_EQ(g_Live, live) << "blocks leaked";
    if (outcome == DONE)
      break;
  }
}

int NoSync(int) { return 0; }

// Rebinding (with and without pin map), creating a typed child and building through the API: a
// failure keeps the binding, leaves no stray object, and the design still saves and reopens.
TEST_F(TdmAllocFaultTest, FailedAllocationInCallerOperationsKeepsTheDesignWhole) {
  FaultDesign design;
  // Thousands of saves: skip the sync.
  Orb_FileOps fast = Orb_FileOps::Get();
  fast.fsync = &NoSync;
  Orb_FileOps const saved = Orb_FileOps::Set(fast);
  for (int operation = 0; operation < 4; ++operation) {
    for (unsigned long k = 1;; ++k) {
      ASSERT_LT(k, 20000u) << "operation " << operation << " never succeeds";
      SCOPED_TRACE("operation " + std::to_string(operation) + ", allocation " + std::to_string(k));
      Lum_TdmModel model("alloc", "allocdb", "");
      model.Open(design.Path().c_str());
      Lum_TdmView *view = FirstView(model);
      Lum_TdmBlock *top = view->GetBlock();
      Lum_TdmBlock *u2 = top->GetBlockByName("u2");
      Lum_TdmBlock *u4 = top->GetBlockByName("u4");
      Lum_TlmBlock const *nand = u2->GetTypeBlock();
      Lum_TlmBlock const *reg = u4->GetTypeBlock();
      u2->SetTypeBlock(nullptr);
      u4->SetTypeBlock(nullptr);
      Lum_TdmTypePinMap map;
      for (std::size_t i = 0; i < u4->GetPins().size(); ++i)
        map.SetPinMap(u4->GetPin(i), reg->GetPinByName(u4->GetPin(i)->GetName()));
      Lum_TdmBlock *rebound = operation == 0 ? u2 : u4;
      std::string const before = FaultDesign::Binding(rebound);
      Outcome const outcome = FailAt(k, [&] {
        if (operation == 0)
          u2->SetTypeBlock(nand);
        else if (operation == 1)
          u4->SetTypeBlock(reg, map);
        else if (operation == 2)
          top->CreateTypedBlock("u9", reg, true, true);
        else {
          Lum_TdmView *v = model.CreateDesignMgr("dm2")->CreateDesign("d")->CreateView("v");
          Lum_TdmSignal *signal = v->CreateTopBlock("t")->CreateSignal("s");
          v->CreateNetwork("n")->GetOrbNetwork()->AddSignal(signal->GetOrbSignal());
          v->GetBlock()->CreateBlock("u1", 0)->CreatePin("a", Orb_Pin::PIN_INPUT);
        }
      });
      ASSERT_NE(outcome, BAD_EXCEPTION);
      EXPECT_TRUE(outcome != FAILED || operation >= 2 || FaultDesign::Binding(rebound) == before)
          << "a failed rebinding changed the block";
      ASSERT_EQ(Strays(model), 0u);
      view->CommitAll();
      model.Save(design.Scratch("caller.odb").c_str());
      OpenModel(design.Scratch("caller.odb"));
      if (outcome == DONE)
        break;
    }
  }
  Orb_FileOps::Set(saved);
}

} // namespace

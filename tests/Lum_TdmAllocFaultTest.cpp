// Allocation failure: an open in which the k-th allocation fails, for every
// k, throws std::bad_alloc or one of the library's exceptions and leaves the
// model as it was. A program of its own, since it replaces the global
// operator new.

#include "Lum_TdmFaultSupport.h"

#include "Lum_TdmTypePinMap.h"
#include "Orb_Exception.h"
#include "Orb_FileOps.h"
#include "Port_Exception.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <iterator>
#include <new>
#include <string>

namespace {

// Counts allocations while armed; the allocation numbered g_FailAt (from 1)
// throws std::bad_alloc, once.
unsigned long g_Allocations = 0;
unsigned long g_FailAt = 0;
bool g_Armed = false;

void *Allocate(std::size_t size) {
  if (g_Armed && ++g_Allocations == g_FailAt)
    throw std::bad_alloc();
  if (void *memory = std::malloc(size ? size : 1))
    return memory;
  throw std::bad_alloc();
}

// Arms the counter for one scope.
class FailingAllocation {
public:
  explicit FailingAllocation(unsigned long failAt) {
    g_Allocations = 0;
    g_FailAt = failAt;
    g_Armed = true;
  }
  ~FailingAllocation() { g_Armed = false; }
  FailingAllocation(FailingAllocation const &) = delete;
  FailingAllocation &operator=(FailingAllocation const &) = delete;
};

void *TryAllocate(std::size_t size) noexcept {
  try {
    return Allocate(size);
  } catch (std::bad_alloc const &) {
    return nullptr;
  }
}

enum Outcome { DONE, FAILED, BAD_EXCEPTION };

// Runs the action with its k-th allocation failing. It must succeed, or throw
// std::bad_alloc or a Port::Exception with a message.
template <class Action> Outcome FailAt(unsigned long k, Action const &action) {
  FailingAllocation failing(k);
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

// Whether this program's operator new is the one in use: a memory checker
// such as valgrind puts its own in place, and nothing can fail then.
bool ReplacementInUse() {
  return FailAt(1, [] { delete new int(0); }) == FAILED;
}

} // namespace

// The replacements must be visible to the shared libraries, which the
// project builds with hidden visibility by default.
#define LUM_REPLACE __attribute__((visibility("default")))
LUM_REPLACE void *operator new(std::size_t size) { return Allocate(size); }
LUM_REPLACE void *operator new[](std::size_t size) { return Allocate(size); }
LUM_REPLACE void *operator new(std::size_t size, std::nothrow_t const &) noexcept {
  return TryAllocate(size);
}
LUM_REPLACE void *operator new[](std::size_t size, std::nothrow_t const &) noexcept {
  return TryAllocate(size);
}
LUM_REPLACE void operator delete(void *memory) noexcept { std::free(memory); }
LUM_REPLACE void operator delete[](void *memory) noexcept { std::free(memory); }
LUM_REPLACE void operator delete(void *memory, std::size_t) noexcept { std::free(memory); }
LUM_REPLACE void operator delete[](void *memory, std::size_t) noexcept { std::free(memory); }
LUM_REPLACE void operator delete(void *memory, std::nothrow_t const &) noexcept {
  std::free(memory);
}
LUM_REPLACE void operator delete[](void *memory, std::nothrow_t const &) noexcept {
  std::free(memory);
}

using namespace lumtest;

namespace {

class TdmAllocFaultTest : public ::testing::Test {
protected:
  void SetUp() override {
    if (!ReplacementInUse())
      GTEST_SKIP() << "operator new is not this program's (a memory checker replaced it)";
  }
};

// Host objects reachable from a block, and from the model's design managers.
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

// Host objects the model counts but cannot reach: ones the host made but
// could not file away, and did not free.
std::size_t Strays(Lum_TdmModel const &model) {
  return HostObjectCount(model.GetOrbModel()) - Reachable(*model.GetOrbModel());
}

// Every allocation of an open, in turn, fails: the open throws, and the model
// keeps exactly its own objects, clients, companions and saved bytes, and
// then opens the design in full. The last k is the first that the open
// survives.
TEST_F(TdmAllocFaultTest, FailedAllocationAtEveryStepOfAnOpenLeavesTheModelAsItWas) {
  FaultDesign design;
  std::string expected;
  {
    Lum_TdmModel model("alloc", "allocdb", "");
    model.Open(design.Path().c_str());
    expected = FaultDesign::Typing(model);
  }
  unsigned long k = 1;
  for (;; ++k) {
    SCOPED_TRACE("allocation " + std::to_string(k));
    Lum_TdmModel model("alloc", "allocdb", "");
    FaultDesign::AddOwnContent(model);
    ModelState const before = StateOf(model, design.Scratch("before.odb"));
    Outcome const outcome = FailAt(k, [&] { model.Open(design.Path().c_str()); });
    ASSERT_NE(outcome, BAD_EXCEPTION);
    if (outcome == DONE) {
      EXPECT_EQ(FaultDesign::Typing(model), expected);
      break;
    }
    ASSERT_EQ(StateOf(model, design.Scratch("after.odb")), before);
    EXPECT_FALSE(Lum_TlmCatalog::IsLoaded("CELLS")) << "the library file stays loaded";
    model.Open(design.Path().c_str());
    ASSERT_EQ(FaultDesign::Typing(model), expected);
  }
  EXPECT_GT(k, 100u) << "the open made fewer allocations than expected";
}

// Building a design through the API with the k-th allocation failing leaves
// no stray object.
TEST_F(TdmAllocFaultTest, FailedAllocationWhileCreatingLeavesNoStrayObject) {
  for (unsigned long k = 1;; ++k) {
    SCOPED_TRACE("allocation " + std::to_string(k));
    Lum_TdmModel model("alloc", "allocdb", "");
    Outcome const outcome = FailAt(k, [&] {
      Lum_TdmView *view = model.CreateDesignMgr("dm")->CreateDesign("d")->CreateView("v");
      Lum_TdmBlock *top = view->CreateTopBlock("top");
      Lum_TdmSignal *signal = top->CreateSignal("s");
      view->CreateNetwork("n")->GetOrbNetwork()->AddSignal(signal->GetOrbSignal());
      top->CreateBlock("u1", 0)->CreatePin("a", Orb_Pin::PIN_INPUT);
    });
    ASSERT_NE(outcome, BAD_EXCEPTION);
    ASSERT_EQ(Strays(model), 0u);
    if (outcome == DONE)
      break;
  }
}

// A save whose k-th allocation fails, for every k, leaves the previous
// database byte for byte, with no temporary file beside it.
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
    auto const files = std::distance(std::filesystem::directory_iterator(dir.Path()),
                                     std::filesystem::directory_iterator());
    ASSERT_EQ(files, 1) << "a temporary file stays";
    if (outcome == DONE)
      break;
    ASSERT_EQ(FileBytes(path), previous);
  }
  EXPECT_NE(FirstView(*OpenModel(path))->GetBlock()->GetBlockByName("u1"), nullptr);
}

int NoSync(int) { return 0; }

// Rebinding with and without a pin map, and a typed child with its pins and
// its grafted hierarchy, each with the k-th allocation failing, for every k:
// a failed rebinding leaves the block's binding as it was, no stray object is
// left, and the design still saves and reopens.
TEST_F(TdmAllocFaultTest, FailedAllocationInCallerOperationsKeepsTheDesignWhole) {
  FaultDesign design;
  // Thousands of saves: durability is not what this test is about.
  Orb_FileOps fast = Orb_FileOps::Get();
  fast.fsync = &NoSync;
  Orb_FileOps const saved = Orb_FileOps::Set(fast);
  for (int operation = 0; operation < 3; ++operation) {
    for (unsigned long k = 1;; ++k) {
      ASSERT_LT(k, 20000u) << "operation " << operation << " never succeeds";
      SCOPED_TRACE("operation " + std::to_string(operation) + ", allocation " + std::to_string(k));
      Lum_TdmModel model("alloc", "allocdb", "");
      model.Open(design.Path().c_str());
      Lum_TdmView *view = FirstView(model);
      Lum_TdmBlock *top = view->GetBlock();
      // u2 (A connected, Y) and u4 (CLK, D0, D1, Q) are unbound, to be bound
      // again.
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
        else
          top->CreateTypedBlock("u9", reg, true, true);
      });
      ASSERT_NE(outcome, BAD_EXCEPTION);
      if (outcome == FAILED && operation < 2) {
        EXPECT_EQ(FaultDesign::Binding(rebound), before) << "a failed rebinding changed the block";
      }
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

// Fault injection: an open whose event handler throws at every possible
// event, and saves whose write, sync, close or rename fails.

#include "Lum_TdmFaultSupport.h"

#include "Orb_Exception.h"
#include "Orb_FileOps.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cerrno>
#include <filesystem>
#include <string>
#include <unistd.h>

using namespace lumtest;

namespace {

// The exception a handler throws; the caller must receive this very one.
struct InjectedFault {
  unsigned event;
};

// A client model whose k-th specialization event (creation or load, of any
// kind, counted from 1 while armed) throws InjectedFault, either before the
// client is made or right after.
class FaultModel : public Lum_TdmModel {
public:
  FaultModel() : Lum_TdmModel("fault", "faultdb", "") {}

  void Arm(unsigned failAt, bool afterClient) {
    m_Count = 0;
    m_FailAt = failAt;
    m_AfterClient = afterClient;
  }
  void Disarm() { m_FailAt = 0; }
  unsigned Count() const { return m_Count; }

#define LUM_FAULT_EVENT(Event, Kind)                                                               \
  void Event(Orb_##Kind *object) override {                                                        \
    unsigned const number = m_FailAt ? ++m_Count : 0;                                              \
    bool const fail = m_FailAt && number == m_FailAt;                                              \
    if (fail && !m_AfterClient)                                                                    \
      throw InjectedFault{number};                                                                 \
    Lum_TdmModel::Event(object);                                                                   \
    if (fail)                                                                                      \
      throw InjectedFault{number};                                                                 \
  }
  LUM_FAULT_EVENT(SyncEventSpecializeDesignMgrOnLoad, DesignMgr)
  LUM_FAULT_EVENT(SyncEventSpecializeDesignOnCreate, Design)
  LUM_FAULT_EVENT(SyncEventSpecializeDesignOnLoad, Design)
  LUM_FAULT_EVENT(SyncEventSpecializeViewOnCreate, View)
  LUM_FAULT_EVENT(SyncEventSpecializeViewOnLoad, View)
  LUM_FAULT_EVENT(SyncEventSpecializeBlockOnCreate, Block)
  LUM_FAULT_EVENT(SyncEventSpecializeBlockOnLoad, Block)
  LUM_FAULT_EVENT(SyncEventSpecializePinOnCreate, Pin)
  LUM_FAULT_EVENT(SyncEventSpecializePinOnLoad, Pin)
  LUM_FAULT_EVENT(SyncEventSpecializeSignalOnCreate, Signal)
  LUM_FAULT_EVENT(SyncEventSpecializeSignalOnLoad, Signal)
  LUM_FAULT_EVENT(SyncEventSpecializeNetworkOnLoad, Network)
#undef LUM_FAULT_EVENT

private:
  unsigned m_Count = 0;
  unsigned m_FailAt = 0;
  bool m_AfterClient = false;
};

class TdmFaultTest : public ::testing::Test {
protected:
  FaultDesign m_Design;
};

// A throw at any event of the open, before or after the event's client is
// made (binding, reconciliation's new pins and the library loads included),
// reaches the caller unchanged and leaves the model with exactly its own
// objects, clients, companions and saved bytes; the library file is given
// back; the same model then opens the design in full.
TEST_F(TdmFaultTest, ThrowAtEveryOpenEventLeavesTheModelAsItWas) {
  std::string expected;
  unsigned events = 0;
  {
    FaultModel model;
    model.Arm(~0u, false);
    model.Open(m_Design.Path().c_str());
    events = model.Count();
    expected = FaultDesign::Typing(model);
  }
  ASSERT_GT(events, 20u) << "the design is too small to exercise the open";
  EXPECT_EQ(expected, "u1=LIBT:REG(CLK>CLK,D1>D1,DATA0>D0,Q>Q) u2=CELLS:NAND(A>A,Y>Y) "
                      "u3=Lum_LocalLibrary:LOC(L>L) u4=LIBT:REG(CLK>CLK,D0>D0,D1>D1,Q>Q) ");

  for (bool const afterClient : {false, true}) {
    for (unsigned k = 1; k <= events; ++k) {
      SCOPED_TRACE("event " + std::to_string(k) + (afterClient ? ", after" : ", before") +
                   " its client");
      FaultModel model;
      FaultDesign::AddOwnContent(model);
      ModelState const before = StateOf(model, m_Design.Scratch("before.odb"));
      model.Arm(k, afterClient);
      try {
        model.Open(m_Design.Path().c_str());
        ADD_FAILURE() << "the open did not throw";
      } catch (InjectedFault const &fault) {
        EXPECT_EQ(fault.event, k);
      }
      model.Disarm();
      EXPECT_EQ(StateOf(model, m_Design.Scratch("after.odb")), before);
      EXPECT_FALSE(Lum_TlmCatalog::IsLoaded("CELLS")) << "the library file stays loaded";
      model.Open(m_Design.Path().c_str());
      EXPECT_EQ(FaultDesign::Typing(model), expected);
    }
  }
}

// ---------------------------------------------------------------------------
// Saves that fail

// Which call of which operation fails, and how often each ran.
struct SaveFault {
  int failWrite = 0; // the n-th write fails, 0 for none
  bool failSync = false;
  bool failClose = false;
  bool failRename = false;
  std::size_t maxChunk = 0; // writes take at most this many bytes, 0 for all
  int writes = 0;
};
SaveFault g_Fault;

int Fail(int error) {
  errno = error;
  return -1;
}
ssize_t FaultyWrite(int fd, void const *data, std::size_t size) {
  if (++g_Fault.writes == g_Fault.failWrite)
    return Fail(ENOSPC);
  return ::write(fd, data, g_Fault.maxChunk ? std::min(size, g_Fault.maxChunk) : size);
}
int FaultySync(int fd) { return g_Fault.failSync ? Fail(EIO) : ::fsync(fd); }
int FaultyClose(int fd) {
  int const result = ::close(fd);
  return g_Fault.failClose ? Fail(EIO) : result;
}
int FaultyRename(char const *from, char const *to) {
  return g_Fault.failRename ? Fail(EXDEV) : ::rename(from, to);
}

// Puts the faulty operations in place for one scope.
class FaultyFileOps {
public:
  explicit FaultyFileOps(SaveFault const &fault)
      : m_Saved(Orb_FileOps::Set({&FaultyWrite, &FaultySync, &FaultyClose, &FaultyRename})) {
    g_Fault = fault;
  }
  ~FaultyFileOps() { Orb_FileOps::Set(m_Saved); }
  FaultyFileOps(FaultyFileOps const &) = delete;
  FaultyFileOps &operator=(FaultyFileOps const &) = delete;

private:
  Orb_FileOps m_Saved;
};

// The names in the directory.
std::string Listing(std::string const &directory) {
  std::string names;
  for (auto const &entry : std::filesystem::directory_iterator(directory))
    names += (names.empty() ? "" : " ") + entry.path().filename().string();
  return names;
}

// Every write of a multi-buffer save, the sync, the close and the rename:
// each failure throws Orb_Exception naming the file and the failed step,
// leaves the previous database byte for byte and no temporary file; the
// next save without faults succeeds, and so does one whose writes take only
// part of what they are given.
TEST(TdmSaveFaultTest, FailedWriteSyncCloseOrRenameKeepsThePreviousDatabase) {
  TempDir dir;
  std::string const path = dir.File("d.odb");
  TypedDesign design;
  design.m_pView->CreateTopBlock("top");
  design.Model().Save(path.c_str());
  std::string const previous = FileBytes(path);
  // Large enough for several buffer writes.
  Lum_TdmBlock *wide = design.m_pView->GetBlock()->CreateBlock("wide", 0);
  for (int i = 0; i < 4000; ++i)
    wide->CreatePin(("pin_with_a_long_name_" + std::to_string(i)).c_str(), Orb_Pin::PIN_INPUT);

  int writes = 0;
  {
    FaultyFileOps counting(SaveFault{});
    design.Model().Save(dir.File("count.odb").c_str());
    writes = g_Fault.writes;
  }
  ASSERT_GE(writes, 3) << "the save fits one buffer";
  std::filesystem::remove(dir.File("count.odb"));

  std::vector<std::pair<std::string, SaveFault>> cases{
      {"cannot flush", SaveFault{0, true}},
      {"cannot close", SaveFault{0, false, true}},
      {"cannot rename", SaveFault{0, false, false, true}}};
  for (int n = 1; n <= writes; ++n)
    cases.emplace_back("cannot write", SaveFault{n});

  for (auto const &[step, fault] : cases) {
    SCOPED_TRACE(step + " (write " + std::to_string(fault.failWrite) + ")");
    FaultyFileOps faulty(fault);
    try {
      design.Model().Save(path.c_str());
      ADD_FAILURE() << "the save did not fail";
    } catch (Orb_Exception const &e) {
      EXPECT_EQ(e.GetObjectName(), path);
      EXPECT_NE(e.GetMessage().find(step), std::string::npos) << e.GetMessage();
      EXPECT_NE(e.GetMessage().find(path), std::string::npos) << e.GetMessage();
    }
    EXPECT_EQ(FileBytes(path), previous) << "the previous database changed";
    EXPECT_EQ(Listing(dir.Path()), "d.odb") << "a temporary file stays";
  }

  design.Model().Save(path.c_str());
  EXPECT_EQ(FirstView(*OpenModel(path))->GetBlock()->GetBlockByName("wide")->GetPins().size(),
            4000u);
  SaveFault shortWrites;
  shortWrites.maxChunk = 7;
  {
    FaultyFileOps faulty(shortWrites);
    design.Model().Save(dir.File("short.odb").c_str());
  }
  EXPECT_EQ(FileBytes(dir.File("short.odb")), FileBytes(path));
}

} // namespace

// Faults found by review and hostile input: each test shows the sound behaviour.

#include "host/HostTestSupport.h"

#include "Orb_SortFtor.h"
#include "Port_MsgManData.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <future>
#include <set>
#include <stdexcept>
#include <thread>

namespace {

using namespace HostTest;
using ::testing::AnyOf;
using ::testing::HasSubstr;

// A standalone model with view dm/d/v and its top block.
struct Standalone {
  Orb_Model model{"m", "db", "", false};
  Orb_View *view = model.CreateDesignMgr("dm")->CreateDesign("d")->CreateView("v");
  Orb_Block *top = view->CreateTopBlock("top");
};

// Orders pins by name and throws at the given call.
class ThrowingOrder : public Orb_SortFtor<Orb_Pin> {
public:
  explicit ThrowingOrder(int throwAt) : m_ThrowAt(throwAt) {}
  bool operator()(Orb_Pin const *a, Orb_Pin const *b) const override {
    if (++m_Calls == m_ThrowAt)
      throw std::runtime_error("comparison failed");
    return std::string(a->GetNameString()) < std::string(b->GetNameString());
  }

private:
  int m_ThrowAt;
  mutable int m_Calls = 0;
};

// A comparison that throws part way leaves the pins as they were; one that does not sorts them.
TEST(HostFaultTest, SortPinsWhoseComparisonThrowsKeepsThePinList) {
  for (int throwAt : {1, 150, 1000, -1}) {
    SCOPED_TRACE(throwAt);
    Standalone s;
    Orb_Block *block = s.top->CreateBlock("b");
    std::vector<std::string> names;
    for (int i = 0; i < 200; ++i) {
      names.push_back("p" + std::to_string((i * 7919) % 200));
      block->CreatePin(names.back().c_str(), Orb_Pin::PIN_INPUT);
    }
    block->DeletePin(block->GetPinByName("p3"));
    names.erase(std::find(names.begin(), names.end(), "p3"));
    std::string const before = Joined(names, " ");
    std::sort(names.begin(), names.end());
    std::string const sorted = Joined(names, " ");
    try {
      block->SortPins(ThrowingOrder(throwAt));
    } catch (std::runtime_error const &) {
    }
    EXPECT_THAT(Names(block->GetPins()), AnyOf(before, sorted));
    if (throwAt < 0) {
      EXPECT_EQ(Names(block->GetPins()), sorted);
    }
    for (Orb_Pin *pin : block->GetPins())
      EXPECT_EQ(block->GetPinByName(pin->GetName()), pin);
    // Each pin once: deleting the block frees each slot once.
    std::vector<Orb_Pin *> const pins = block->GetPins();
    EXPECT_EQ(std::set<Orb_Pin *>(pins.begin(), pins.end()).size(), 199u);
    s.top->DeleteBlock(block);
    EXPECT_EQ(s.model.GetObjectCount(Orb_Kind::Pin), 0u);
  }
}

// A save from inside a delete or load event writes only the objects still in the tree.
TEST(HostFaultTest, SaveWhileADeletionIsHeldWritesOnlyLiveObjects) {
  std::string const path = ::testing::TempDir() + "HostFault." + std::to_string(::getpid());
  for (bool fromLoad : {false, true}) {
    SCOPED_TRACE(fromLoad ? "load event" : "delete event");
    EventLog log;
    RecModel model(&log);
    Orb_Model *host = model.GetOrbModel();
    Orb_View *v = host->CreateDesignMgr("dm")->CreateDesign("d")->CreateView("v");
    Orb_Block *top = v->CreateTopBlock("top");
    Orb_Signal *s = top->CreateSignal("s");
    Orb_Signal *t = top->CreateSignal("t");
    Orb_Network *n = v->CreateNetwork("n");
    n->AddSignal(s);
    n->AddSignal(t);
    for (char const *name : {"a", "b", "c"}) {
      Orb_Block *child = top->CreateBlock(name);
      child->CreatePin("i", Orb_Pin::PIN_INPUT)->Connect(s);
      child->CreatePin("o", Orb_Pin::PIN_OUTPUT)->Connect(t);
    }
    Orb_Block *trigger = top->CreateBlock("trigger");
    if (fromLoad) {
      host->Save(path.c_str());
      host->DeleteDesignMgr(host->GetDesignMgrByName("dm"));
    }
    // The handler deletes a pin, a block with pins on both signals and a networked signal,
    // then saves while those deletions are held.
    auto const act = [&](Orb_Persistent *object) {
      if (object->GetName() != std::string("trigger"))
        return;
      Orb_Block *at = TopBlockOf(*host, "dm", "d", "v");
      host->Delete(at->GetBlockByName("a")->GetPinByName("i"));
      host->Delete(at->GetBlockByName("b"));
      host->Delete(at->GetSignalByName("t"));
      host->Save(path.c_str());
    };
    (fromLoad ? model.onLoad : model.onDelete) = act;
    if (fromLoad)
      host->Open(path.c_str());
    else
      top->DeleteBlock(trigger);
    model.onLoad = model.onDelete = nullptr;
    std::string const expected = Dump(*host);
    EXPECT_THAT(expected, HasSubstr("signal s <- top/c/i\n"));
    Orb_Model reopened("r", "db", "", false);
    reopened.Open(path.c_str());
    // The block whose delete event saved was still in the tree then.
    if (!fromLoad)
      TopBlockOf(reopened, "dm", "d", "v")
          ->DeleteBlock(TopBlockOf(reopened, "dm", "d", "v")->GetBlockByName("trigger"));
    EXPECT_EQ(Dump(reopened), expected);
  }
  std::remove(path.c_str());
}

// Captures in two threads at once each collect their own thread's reports only.
TEST(HostFaultTest, MessageCaptureIsPerThread) {
  Port_MsgCapture mine;
  std::promise<void> captured, reported;
  std::thread other([&] {
    Port_MsgCapture theirs;
    captured.set_value();
    reported.get_future().wait();
    EXPECT_TRUE(theirs.GetReports().empty()) << "another thread's report was captured here";
    Port_MsgManData::createObject("Test", "other.cpp", 2, "").issueError("from the other thread");
    ASSERT_EQ(theirs.GetReports().size(), 1u);
    EXPECT_EQ(theirs.GetReports()[0].text, "from the other thread");
  });
  captured.get_future().wait();
  Port_MsgManData::createObject("Test", "mine.cpp", 1, "").issueError("from this thread");
  reported.set_value();
  other.join();
  ASSERT_EQ(mine.GetReports().size(), 1u);
  EXPECT_EQ(mine.GetReports()[0].text, "from this thread");
}

// A database whose string claims more than the 1 GiB limit is refused as corrupt before anything
// is allocated for it, whether the file is smaller or holds that many bytes (sparse here).
TEST(HostFaultTest, OversizedStringIsRefusedBeforeItIsRead) {
  std::string const path = ::testing::TempDir() + "HostFault." + std::to_string(::getpid());
  Standalone s;
  s.top->CreatePropertyString("k", "value");
  s.model.Save(path.c_str());
  std::string const bytes = ReadBytes(path);
  std::size_t const at = bytes.find(" 5:value");
  ASSERT_NE(at, std::string::npos);
  struct Case {
    std::uint64_t length, fileBytes;
  } const cases[] = {{std::uint64_t(1) << 40, 0},
                     {(std::uint64_t(1) << 30) + 1, (std::uint64_t(1) << 30) + 4096}};
  for (Case const &c : cases) {
    SCOPED_TRACE(c.length);
    {
      std::ofstream out(path, std::ios::binary | std::ios::trunc);
      out << bytes.substr(0, at) << " " << c.length << ":" << bytes.substr(at + 8);
    }
    if (c.fileBytes > 0) {
      ASSERT_EQ(::truncate(path.c_str(), static_cast<off_t>(c.fileBytes)), 0);
    }
    Orb_Model model("m", "db", "", false);
    Thrown const thrown = ThrownBy([&] { model.Open(path.c_str()); });
    EXPECT_THAT(thrown.message, HasSubstr("is corrupt at byte"));
    EXPECT_THAT(thrown.message, HasSubstr(std::to_string(c.length) + "-byte string"));
    EXPECT_TRUE(model.GetDesignMgrs().empty());
  }
  std::remove(path.c_str());
}

} // namespace

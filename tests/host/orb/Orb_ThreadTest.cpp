// Independent models in separate threads: what the README says may run concurrently. The
// threads share the process-wide property names, small-block pools and name hash key.

#include "host/HostTestSupport.h"

#include "Port_MsgManData.h"

#include <gtest/gtest.h>

#include <thread>

namespace {

using namespace HostTest;

// Each thread builds, saves, reopens, checks and deletes a model of its own, capturing its
// own reports; every thread ends with the same dump.
TEST(HostThreadTest, IndependentModelsInFourThreads) {
  std::string const base = ::testing::TempDir() + "HostThread." + std::to_string(::getpid());
  std::vector<std::string> dumps(4);
  std::vector<std::size_t> reports(4);
  std::vector<std::thread> threads;
  for (std::size_t t = 0; t < 4; ++t) {
    threads.emplace_back([&, t] {
      Port_MsgCapture capture;
      std::string const path = base + "." + std::to_string(t);
      Orb_Model model("m", "db", "", false);
      Orb_Block *top =
          model.CreateDesignMgr("dm")->CreateDesign("d")->CreateView("v")->CreateTopBlock("top");
      Orb_Signal *net = top->CreateSignal("a_long_signal_name");
      for (int i = 0; i < 200; ++i) {
        Orb_Block *cell = top->CreateBlock(("cell" + std::to_string(i)).c_str());
        cell->CreatePropertyString("cell_type", i % 2 ? "NAND2" : "a_long_type_name_INV");
        cell->CreatePin("a_long_input_pin", Orb_Pin::PIN_INPUT)->Connect(net);
        cell->CreatePin("Y", Orb_Pin::PIN_OUTPUT);
      }
      model.Save(path.c_str());
      Orb_Model reopened("r", "db", "", false);
      reopened.Open(path.c_str());
      std::remove(path.c_str());
      Port_MsgManData::createObject("Test", "thread", 1, "").issueError("thread %zu", t);
      Orb_Block *again = TopBlockOf(reopened, "dm", "d", "v");
      for (int i = 0; i < 200; i += 2)
        again->DeleteBlock(again->GetBlockByName(("cell" + std::to_string(i)).c_str()));
      dumps[t] = Dump(reopened);
      reports[t] = capture.GetReports().size();
    });
  }
  for (std::thread &thread : threads)
    thread.join();
  for (std::size_t t = 0; t < 4; ++t) {
    EXPECT_EQ(reports[t], 1u) << "thread " << t;
    EXPECT_EQ(dumps[t], dumps[0]) << "thread " << t;
  }
  EXPECT_NE(dumps[0].find("block cell1 <cell_type=NAND2>"), std::string::npos);
  EXPECT_EQ(dumps[0].find("block cell0 "), std::string::npos);
}

} // namespace

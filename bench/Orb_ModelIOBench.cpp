// Saving and opening a generated design database: one view whose top block
// holds groups of blocks, each block with pins, a signal, connections and a
// property, grouped into networks.

#include "Orb_Model.h"

#include <benchmark/benchmark.h>

#include <cstdint>
#include <filesystem>
#include <memory>
#include <string>
#include <unistd.h>

namespace {

constexpr std::int64_t kBlocksPerGroup = 1000;

std::string BenchPath() {
  return (std::filesystem::temp_directory_path() /
          ("Orb_ModelIOBench." + std::to_string(::getpid()) + ".db"))
      .string();
}

std::unique_ptr<Orb_Model> MakeDesign(std::int64_t blocks) {
  auto model = std::make_unique<Orb_Model>("bench", "bench", "", false);
  Orb_View *view = model->CreateDesignMgr("dm")->CreateDesign("chip")->CreateView("netlist");
  Orb_Block *top = view->CreateTopBlock("top");
  Orb_Block *group = nullptr;
  Orb_Network *network = nullptr;
  for (std::int64_t i = 0; i < blocks; ++i) {
    if (i % kBlocksPerGroup == 0) {
      std::string const name = "g" + std::to_string(i / kBlocksPerGroup);
      group = top->CreateBlock(name.c_str());
      network = view->CreateNetwork(name.c_str());
    }
    Orb_Block *block = group->CreateBlock(("b" + std::to_string(i)).c_str());
    block->CreatePropertyString("cell", "NAND2 x1");
    Orb_Signal *signal = block->CreateSignal("n");
    network->AddSignal(signal);
    block->CreatePin("a", Orb_Pin::PIN_INPUT)->ConnectInner(signal);
    block->CreatePin("b", Orb_Pin::PIN_INPUT)->ConnectInner(signal);
    block->CreatePin("y", Orb_Pin::PIN_OUTPUT);
  }
  return model;
}

void BM_Save(benchmark::State &state) {
  std::unique_ptr<Orb_Model> const model = MakeDesign(state.range(0));
  std::string const path = BenchPath();
  for (auto _ : state)
    model->Save(path.c_str());
  state.SetItemsProcessed(state.iterations() * state.range(0));
  state.counters["bytes"] = static_cast<double>(std::filesystem::file_size(path));
  std::filesystem::remove(path);
}

void BM_Open(benchmark::State &state) {
  std::string const path = BenchPath();
  MakeDesign(state.range(0))->Save(path.c_str());
  for (auto _ : state) {
    auto model = std::make_unique<Orb_Model>("bench", "bench", "", false);
    model->Open(path.c_str());
    state.PauseTiming();
    model.reset();
    state.ResumeTiming();
  }
  state.SetItemsProcessed(state.iterations() * state.range(0));
  std::filesystem::remove(path);
}

} // namespace

BENCHMARK(BM_Save)->Arg(10000)->Arg(100000)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_Open)->Arg(10000)->Arg(100000)->Unit(benchmark::kMillisecond);

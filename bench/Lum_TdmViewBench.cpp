// Opening a typed design: every object gets its client, every view checks its
// stamp and builds its library list; then a whole-view commit.

#include "Lum_TdmBlock.h"
#include "Lum_TdmDesign.h"
#include "Lum_TdmDesignMgr.h"
#include "Lum_TdmModel.h"
#include "Lum_TdmPin.h"
#include "Lum_TdmView.h"

#include "Lum_TdmSchema.h"
#include "Lum_Tlm.h"

#include <benchmark/benchmark.h>

#include <cstdint>
#include <filesystem>
#include <string>
#include <unistd.h>

namespace {

std::string BenchPath() {
  return (std::filesystem::temp_directory_path() /
          ("Lum_TdmViewBench." + std::to_string(::getpid()) + ".db"))
      .string();
}

// A view listing one in-memory library, with `blocks` child blocks of four
// pins each under its top block.
void WriteDesign(std::int64_t blocks, std::string const &path) {
  Lum_TdmModel model("bench", "bench", path.c_str());
  Lum_TdmView *view = model.CreateDesignMgr("dm")->CreateDesign("chip")->CreateView("netlist");
  view->CreatePropertyString(Lum_TdmSchema::kDevicePm, "pm");
  view->CreatePropertyString(Lum_TdmSchema::kDevicePart, "part");
  view->CreatePropertyStringList(Lum_TdmSchema::kTypeLibraries)->AppendString("BENCHLIB");
  Lum_TdmBlock *top = view->CreateTopBlock("top");
  for (std::int64_t i = 0; i < blocks; ++i) {
    Lum_TdmBlock *block = top->CreateBlock(("b" + std::to_string(i)).c_str(), 0);
    for (char const *pin : {"A", "B", "C", "Y"})
      block->CreatePin(pin, Orb_Pin::PIN_INPUT);
  }
  view->CommitAll();
  model.Save(path.c_str());
}

void BM_OpenAndCommit(benchmark::State &state) {
  Lum_TlmModel libraryModel("BENCHLIB", "BENCHLIB", "", false);
  Lum_TlmLibrary *library = libraryModel.CreateLibrary("BENCHLIB", 1, 0);
  Lum_TlmCatalog::Register(library);
  std::string const path = BenchPath();
  WriteDesign(state.range(0), path);
  for (auto _ : state) {
    Lum_TdmModel model("reader", "bench", path.c_str());
    model.Open(path.c_str());
    Lum_TdmView *view =
        model.GetDesignMgrByName("dm")->GetDesignByName("chip")->GetViewByName("netlist");
    view->CommitAll();
    benchmark::DoNotOptimize(view);
  }
  state.SetItemsProcessed(state.iterations() * state.range(0));
  std::filesystem::remove(path);
  Lum_TlmCatalog::Unregister(library);
}

} // namespace

BENCHMARK(BM_OpenAndCommit)->Arg(1000)->Arg(100000)->Unit(benchmark::kMillisecond);

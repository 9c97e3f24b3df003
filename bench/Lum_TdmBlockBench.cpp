// Opening a typed design: what binding every block to its type block and
// reconciling its pins adds to an open through the client model. A top
// block holds N children of 8 pins each, typed by 16 type blocks; two pins
// of each child carry other names through TDS_BLOCK_PIN_MAP and one is
// connected. Two designs are opened in the same run for comparison: the same
// one with its typing stored under names the library does not read (the
// same file size, nothing bound), and one without typing properties.

#include "Lum_TdmBlock.h"
#include "Lum_TdmDesign.h"
#include "Lum_TdmDesignMgr.h"
#include "Lum_TdmModel.h"
#include "Lum_TdmPin.h"
#include "Lum_TdmSignal.h"
#include "Lum_TdmView.h"

#include "Lum_TdmSchema.h"
#include "Lum_Tlm.h"

#include <benchmark/benchmark.h>

#include <chrono>
#include <cstdint>
#include <filesystem>
#include <memory>
#include <string>
#include <unistd.h>

namespace {

constexpr int kTypeBlocks = 16;
constexpr int kPinsPerBlock = 8;

std::string BenchPath(char const *what) {
  return (std::filesystem::temp_directory_path() /
          ("Lum_TdmBlockBench." + std::to_string(::getpid()) + "." + what + ".db"))
      .string();
}

enum class Typing { None, Inert, Bound };

void WriteDesign(std::int64_t blocks, Typing typing, std::string const &path) {
  bool const inert = typing == Typing::Inert;
  Lum_TdmModel model("bench", "bench", path.c_str());
  Lum_TdmView *view = model.CreateDesignMgr("dm")->CreateDesign("chip")->CreateView("netlist");
  view->CreatePropertyString(Lum_TdmSchema::kDevicePm, "pm");
  view->CreatePropertyString(Lum_TdmSchema::kDevicePart, "part");
  view->CreatePropertyStringList(Lum_TdmSchema::kTypeLibraries)->AppendString("BENCHT 1.0");
  Lum_TdmBlock *top = view->CreateTopBlock("top");
  Orb_Signal *clock = top->CreateSignal("clk")->GetOrbSignal();
  for (std::int64_t i = 0; i < blocks; ++i) {
    Lum_TdmBlock *block = top->CreateBlock(("u" + std::to_string(i)).c_str(), 0);
    for (int p = 0; p < kPinsPerBlock; ++p) {
      // The last two pins stand for type pins of other names.
      std::string const name = (p < kPinsPerBlock - 2 ? "P" : "X") + std::to_string(p);
      Lum_TdmPin *pin = block->CreatePin(name.c_str(), Orb_Pin::PIN_INPUT);
      if (p == 0)
        pin->GetOrbPin()->Connect(clock);
    }
    if (typing == Typing::None)
      continue;
    block->CreatePropertyString(inert ? "XDS_BLOCK_TYPE" : Lum_TdmSchema::kBlockType,
                                ("BENCHT:T" + std::to_string(i % kTypeBlocks)).c_str());
    Orb_Property *pinMap =
        block->CreatePropertyList(inert ? "XDS_BLOCK_PIN_MAP" : Lum_TdmSchema::kBlockPinMap);
    for (int p = kPinsPerBlock - 2; p < kPinsPerBlock; ++p)
      pinMap->CreatePropertyString(("X" + std::to_string(p)).c_str(),
                                   ("P" + std::to_string(p)).c_str());
  }
  model.Save(path.c_str());
}

// Seconds to open the file through a fresh client model; the teardown is not
// counted.
double TimedOpen(std::string const &path) {
  auto model = std::make_unique<Lum_TdmModel>("reader", "bench", path.c_str());
  auto const start = std::chrono::steady_clock::now();
  model->Open(path.c_str());
  double const seconds =
      std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
  benchmark::DoNotOptimize(model.get());
  return seconds;
}

// Iteration time: the typed open. Counters: the three opens in
// milliseconds; binding_share, what binding adds to the open of the same
// file through the client model alone; typing_share, what the typed design
// costs over one without typing properties.
void BM_TypedOpenWithBinding(benchmark::State &state) {
  Lum_TlmModel libraryModel("BENCHT", "BENCHT", "", false);
  Lum_TlmLibrary *library = libraryModel.CreateLibrary("BENCHT", 1, 0);
  for (int t = 0; t < kTypeBlocks; ++t) {
    Lum_TlmBlock *typeBlock = library->CreateTypeBlock(("T" + std::to_string(t)).c_str());
    for (int p = 0; p < kPinsPerBlock; ++p)
      typeBlock->CreatePin(("P" + std::to_string(p)).c_str(),
                           p + 1 < kPinsPerBlock ? Orb_Pin::PIN_INPUT : Orb_Pin::PIN_OUTPUT);
  }
  Lum_TlmCatalog::Register(library);
  std::string const typedPath = BenchPath("typed");
  std::string const inertPath = BenchPath("inert");
  std::string const plainPath = BenchPath("plain");
  WriteDesign(state.range(0), Typing::Bound, typedPath);
  WriteDesign(state.range(0), Typing::Inert, inertPath);
  WriteDesign(state.range(0), Typing::None, plainPath);

  double typedTotal = 0;
  double inertTotal = 0;
  double plainTotal = 0;
  for (auto _ : state) {
    plainTotal += TimedOpen(plainPath);
    inertTotal += TimedOpen(inertPath);
    double const typed = TimedOpen(typedPath);
    typedTotal += typed;
    state.SetIterationTime(typed);
  }
  auto const iterations = static_cast<double>(state.iterations());
  state.counters["plain_ms"] = plainTotal * 1000 / iterations;
  state.counters["inert_ms"] = inertTotal * 1000 / iterations;
  state.counters["typed_ms"] = typedTotal * 1000 / iterations;
  state.counters["binding_share"] = (typedTotal - inertTotal) / inertTotal;
  state.counters["typing_share"] = (typedTotal - plainTotal) / plainTotal;
  state.SetItemsProcessed(state.iterations() * state.range(0));
  for (std::string const &path : {typedPath, inertPath, plainPath})
    std::filesystem::remove(path);
  Lum_TlmCatalog::Unregister(library);
}

} // namespace

BENCHMARK(BM_TypedOpenWithBinding)
    ->Arg(1000)
    ->Arg(10000)
    ->Arg(100000)
    ->UseManualTime()
    ->Unit(benchmark::kMillisecond);

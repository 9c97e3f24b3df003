// The typed road at scale: every caller-facing phase of the library over the
// workload of Lum_TdmWorkload.h at 10^4, 10^5 and 10^6 blocks, each reported
// per block.
//
//   create        CreateTypedBlock with pins for every child, then wiring
//                 (create_typed_us and wire_us split it, per block)
//   commit        CommitAll on the view, the first after the creation
//   save          saving the committed model
//   open_host     opening the file into a bare host model (no client model)
//   open_clients  opening the file into a client model that only specializes
//   open_typed    opening it into a fresh Lum_TdmModel (binding, pin
//                 reconciliation and sorting of every block)
//   query         GetChildBlocksOfType(type block) on the top block for each
//                 of the 16 type blocks
//   query_id      the same through a Lum_TlmBlockTypeID per type block
//   measure       DbgGetSize of the view
//   rebind        SetTypeBlock with the next type block and its shared pin
//                 map from a Lum_TdmTypePinMapMgr, on every child
//   delete        deleting every child, one by one, in host order
//
// Counters: us_per_block, the process's CPU time per block (the lowest over
// the iterations), and wall_us_per_block, its wall-clock time: on a shared
// machine the wall clock mostly measures the other processes. Then
// allocs_per_block (operator new calls, counted by this program), and for
// the opens heap_B_per_block (growth of what malloc hands out) and
// rss_B_per_block (growth of the resident set), both of the first
// iteration. The queries also give us_per_child_per_type. bench/run prints
// them as one table.
//
// Phases share their models and file per size, so a run in registration
// order builds everything once; a phase run alone (a filter) makes what it
// needs first, untimed.

#include "Lum_TdmWorkload.h"

#include "Lum_BenchCounters.h"

#include "Lum_TdmBlock.h"
#include "Lum_TdmModel.h"
#include "Lum_TdmPin.h"
#include "Lum_TdmTypePinMap.h"
#include "Lum_TdmTypePinMapMgr.h"
#include "Lum_TdmView.h"

#include "Lum_Tlm.h"
#include "Lum_TlmTypeID.h"

#include <benchmark/benchmark.h>

#include <algorithm>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <limits>
#include <malloc.h>
#include <map>
#include <memory>
#include <new>
#include <string>
#include <time.h>
#include <unistd.h>
#include <vector>

namespace {

using Clock = std::chrono::steady_clock;
using Lum_BenchCounters::CpuSeconds;
using Lum_BenchCounters::g_Allocations;
using Lum_BenchCounters::HeapBytes;
using Lum_BenchCounters::ResidentBytes;
using Lum_TdmWorkload::Library;

// What one run of a phase costs: CPU and wall time, allocations, heap and
// resident growth.
struct Cost {
  double cpuSeconds = 0;
  double seconds = 0;
  std::uint64_t allocations = 0;
  std::int64_t heap = 0;
  std::int64_t rss = 0;
};

template <class Phase> Cost Measure(Phase const &phase) {
  // Memory freed by earlier phases goes back first, so that growth shows.
  ::malloc_trim(0);
  Cost cost;
  cost.rss = ResidentBytes();
  cost.heap = HeapBytes();
  cost.allocations = g_Allocations;
  double const cpuStart = CpuSeconds();
  auto const start = Clock::now();
  phase();
  cost.seconds = std::chrono::duration<double>(Clock::now() - start).count();
  cost.cpuSeconds = CpuSeconds() - cpuStart;
  cost.allocations = g_Allocations - cost.allocations;
  cost.heap = HeapBytes() - cost.heap;
  cost.rss = ResidentBytes() - cost.rss;
  return cost;
}

Library &TheLibrary() {
  static Library library;
  return library;
}

// The models and the file of one size, shared by the phases.
struct Workload {
  std::int64_t blocks = 0;
  std::string path;
  std::unique_ptr<Lum_TdmModel> created;
  bool committed = false;
  std::unique_ptr<Lum_TdmModel> opened;
  // Children of `opened` were deleted.
  bool openedPartly = false;
  // How often `opened` was rebound: each rebinding moves every child on to
  // the next type block.
  std::int64_t rebinds = 0;
  // Children deleted by the last delete phase (it may stop at its budget).
  std::int64_t deleted = 0;
  // CPU seconds of the last creation's two steps.
  double typedSeconds = 0;
  double wireSeconds = 0;

  // A file kept for later processes (LUM_BENCH_DIR) stays.
  bool keepFile = false;

  ~Workload() {
    if (!path.empty() && !keepFile)
      std::filesystem::remove(path);
  }
};

Workload &WorkloadOf(std::int64_t blocks) {
  return Lum_BenchCounters::WorkloadOf<Workload>(blocks);
}

std::unique_ptr<Lum_TdmModel> NewModel() {
  return std::make_unique<Lum_TdmModel>("bench", "bench", "");
}

void Build(Workload &w) {
  double const start = CpuSeconds();
  Lum_TdmBlock *top = Lum_TdmWorkload::CreateBlocks(*w.created, TheLibrary(), w.blocks);
  double const typed = CpuSeconds();
  Lum_TdmWorkload::Wire(top->GetOrbBlock());
  w.typedSeconds = typed - start;
  w.wireSeconds = CpuSeconds() - typed;
}

void EnsureCreated(Workload &w) {
  if (w.created)
    return;
  w.opened.reset();
  w.created = NewModel();
  w.committed = false;
  Build(w);
}

void EnsureCommitted(Workload &w) {
  EnsureCreated(w);
  if (!w.committed)
    Lum_TdmWorkload::ViewOf(*w.created)->CommitAll();
  w.committed = true;
}

// The file of a size. With LUM_BENCH_DIR set, the file is
// <dir>/Lum_TdmRoadBench.<size>.db and outlives the process: a later process
// finds it there and opens it without building anything first, so that the
// memory of an open is measured in a process that held nothing else (the
// host may keep freed memory for reuse). Without it, a file of this process
// in the temporary directory, removed at the end.
void EnsureFile(Workload &w) {
  if (!w.path.empty())
    return;
  std::string const size = std::to_string(w.blocks);
  if (char const *dir = std::getenv("LUM_BENCH_DIR")) {
    std::string const path =
        (std::filesystem::path(dir) / ("Lum_TdmRoadBench." + size + ".db")).string();
    w.keepFile = true;
    if (!w.created && std::filesystem::exists(path)) {
      w.path = path;
      return;
    }
    EnsureCommitted(w);
    w.created->Save(path.c_str());
    w.path = path;
    return;
  }
  EnsureCommitted(w);
  std::string const path = (std::filesystem::temp_directory_path() /
                            ("Lum_TdmRoadBench." + std::to_string(::getpid()) + "." + size + ".db"))
                               .string();
  w.created->Save(path.c_str());
  w.path = path;
}

// A fresh typed open of the file, unless the one there is still whole.
void EnsureOpened(Workload &w) {
  if (w.opened && !w.openedPartly)
    return;
  EnsureFile(w);
  w.created.reset();
  w.opened.reset();
  w.opened = NewModel();
  w.opened->Open(w.path.c_str());
  w.openedPartly = false;
  w.rebinds = 0;
}

Lum_TdmBlock *TopOf(Lum_TdmModel &model) { return Lum_TdmWorkload::ViewOf(model)->GetBlock(); }

// Runs one phase per iteration: `setup` untimed, then `phase` measured.
// `units(w)` is the number of blocks the phase's time is divided by.
// Counters keep the lowest time per block over the iterations, with the
// allocations of that iteration, and the memory growth of the first: later
// iterations may reuse what the host kept of the one before.
template <class Setup, class Phase, class Units>
void RunPhase(benchmark::State &state, Setup const &setup, Phase const &phase, Units const &units,
              bool memory, double queriesPerBlock = 0) {
  // The library is registered before anything is opened: a process that
  // opens a kept file builds nothing else.
  TheLibrary();
  Workload &w = WorkloadOf(state.range(0));
  double best = std::numeric_limits<double>::infinity();
  Cost bestCost;
  double bestUnits = 1;
  Cost firstCost;
  double firstUnits = 0;
  for (auto _ : state) {
    setup(w);
    Cost const cost = Measure([&] { phase(w); });
    state.SetIterationTime(cost.cpuSeconds);
    auto const n = static_cast<double>(std::max<std::int64_t>(units(w), 1));
    if (firstUnits == 0) {
      firstCost = cost;
      firstUnits = n;
    }
    if (cost.cpuSeconds / n < best) {
      best = cost.cpuSeconds / n;
      bestCost = cost;
      bestUnits = n;
    }
  }
  state.counters["us_per_block"] = best * 1e6;
  state.counters["wall_us_per_block"] = bestCost.seconds * 1e6 / bestUnits;
  state.counters["allocs_per_block"] = static_cast<double>(bestCost.allocations) / bestUnits;
  state.counters["blocks"] = bestUnits;
  if (memory) {
    state.counters["heap_B_per_block"] = static_cast<double>(firstCost.heap) / firstUnits;
    state.counters["rss_B_per_block"] = static_cast<double>(firstCost.rss) / firstUnits;
  }
  if (queriesPerBlock > 0)
    state.counters["us_per_child_per_type"] = best * 1e6 / queriesPerBlock;
}

std::int64_t AllBlocks(Workload const &w) { return w.blocks; }

void BM_Create(benchmark::State &state) {
  RunPhase(
      state,
      [](Workload &w) {
        w.opened.reset();
        w.created.reset();
        w.created = NewModel();
        w.committed = false;
      },
      [](Workload &w) { Build(w); }, AllBlocks, true);
  Workload const &w = WorkloadOf(state.range(0));
  auto const n = static_cast<double>(w.blocks);
  state.counters["create_typed_us"] = w.typedSeconds * 1e6 / n;
  state.counters["wire_us"] = w.wireSeconds * 1e6 / n;
}

void BM_Commit(benchmark::State &state) {
  RunPhase(
      state,
      [](Workload &w) {
        // Each iteration commits a model that was never committed.
        if (w.committed)
          w.created.reset();
        EnsureCreated(w);
      },
      [](Workload &w) {
        Lum_TdmWorkload::ViewOf(*w.created)->CommitAll();
        w.committed = true;
      },
      AllBlocks, false);
}

void BM_Save(benchmark::State &state) {
  RunPhase(
      state,
      [](Workload &w) {
        EnsureCommitted(w);
        EnsureFile(w);
      },
      [](Workload &w) { w.created->Save(w.path.c_str()); }, AllBlocks, false);
}

void BM_OpenHost(benchmark::State &state) {
  std::unique_ptr<Orb_Model> host;
  RunPhase(
      state,
      [&host](Workload &w) {
        EnsureFile(w);
        w.created.reset();
        w.opened.reset();
        host.reset();
        host = std::make_unique<Orb_Model>("host", "host", "", false);
      },
      [&host](Workload &w) { host->Open(w.path.c_str()); }, AllBlocks, true);
}

void BM_OpenClients(benchmark::State &state) {
  std::unique_ptr<Lum_TdmWorkload::PlainModel> plain;
  RunPhase(
      state,
      [&plain](Workload &w) {
        EnsureFile(w);
        w.created.reset();
        w.opened.reset();
        plain.reset();
        plain = std::make_unique<Lum_TdmWorkload::PlainModel>();
      },
      [&plain](Workload &w) { plain->Open(w.path.c_str()); }, AllBlocks, true);
}

void BM_OpenTyped(benchmark::State &state) {
  RunPhase(
      state,
      [](Workload &w) {
        EnsureFile(w);
        w.created.reset();
        w.opened.reset();
        w.opened = NewModel();
      },
      [](Workload &w) {
        w.opened->Open(w.path.c_str());
        w.openedPartly = false;
        w.rebinds = 0;
      },
      AllBlocks, true);
}

void BM_Query(benchmark::State &state) {
  std::vector<Lum_TdmBlock *> found;
  RunPhase(
      state, [](Workload &w) { EnsureOpened(w); },
      [&found](Workload &w) {
        Lum_TdmBlock *top = TopOf(*w.opened);
        std::size_t total = 0;
        for (Lum_TlmBlock const *typeBlock : TheLibrary().TypeBlocks()) {
          found.clear();
          top->GetChildBlocksOfType(typeBlock, found);
          total += found.size();
        }
        benchmark::DoNotOptimize(total);
      },
      AllBlocks, false, Lum_TdmWorkload::kTypeBlocks);
}

void BM_QueryId(benchmark::State &state) {
  std::vector<Lum_TlmBlockTypeID> ids;
  for (Lum_TlmBlock const *typeBlock : TheLibrary().TypeBlocks())
    ids.emplace_back(Lum_TdmWorkload::kLibrary, typeBlock->GetName());
  std::vector<Lum_TdmBlock *> found;
  RunPhase(
      state, [](Workload &w) { EnsureOpened(w); },
      [&found, &ids](Workload &w) {
        Lum_TdmBlock *top = TopOf(*w.opened);
        std::size_t total = 0;
        for (Lum_TlmBlockTypeID const &id : ids) {
          found.clear();
          top->GetChildBlocksOfType(id, found);
          total += found.size();
        }
        benchmark::DoNotOptimize(total);
      },
      AllBlocks, false, Lum_TdmWorkload::kTypeBlocks);
}

void BM_Measure(benchmark::State &state) {
  RunPhase(
      state, [](Workload &w) { EnsureOpened(w); },
      [](Workload &w) {
        std::uint64_t counts[8] = {};
        std::uint64_t const total = Lum_TdmWorkload::ViewOf(*w.opened)->DbgGetSize(
            counts[0], counts[1], counts[2], counts[3], counts[4], counts[5], counts[6], counts[7]);
        benchmark::DoNotOptimize(total);
      },
      AllBlocks, false);
}

void BM_Rebind(benchmark::State &state) {
  // One shared map per type block, from the manager, mapping every pin name
  // to that type block's pin of the same name.
  Lum_TdmTypePinMapMgr manager;
  std::vector<Lum_TdmTypePinMap const *> maps;
  for (Lum_TlmBlock const *typeBlock : TheLibrary().TypeBlocks()) {
    Lum_TdmTypePinMap map;
    for (std::size_t p = 0; p < typeBlock->GetPins().size(); ++p) {
      Lum_TlmPin const *typePin = typeBlock->GetPin(p);
      map.SetPinMap(Port::StringBase<char>(typePin->GetName()), typePin);
    }
    maps.push_back(manager.GetTypePinMap(Port::StringBase<char>(typeBlock->GetName()), &map));
  }
  RunPhase(
      state, [](Workload &w) { EnsureOpened(w); },
      [&maps](Workload &w) {
        Library const &library = TheLibrary();
        auto const &children = TopOf(*w.opened)->GetOrbBlock()->GetBlocks();
        Orb_Context *context = w.opened.get();
        std::int64_t const shift = ++w.rebinds;
        for (std::size_t i = 0; i < children.size(); ++i) {
          auto *child = static_cast<Lum_TdmBlock *>(context->GetClient(children[i]));
          auto const t = (static_cast<std::int64_t>(i) + shift) % Lum_TdmWorkload::kTypeBlocks;
          child->SetTypeBlock(library.TypeBlock(t), *maps[static_cast<std::size_t>(t)]);
        }
      },
      AllBlocks, false);
}

// Deleting stops after this many seconds (LUM_BENCH_DELETE_BUDGET), so that a
// host whose removal is linear in the siblings does not hold the run for
// hours; the counter "blocks" then says how many were deleted.
double DeleteBudget() {
  char const *text = std::getenv("LUM_BENCH_DELETE_BUDGET");
  double const budget = text ? std::atof(text) : 0;
  return budget > 0 ? budget : 120;
}

void BM_Delete(benchmark::State &state) {
  RunPhase(
      state, [](Workload &w) { EnsureOpened(w); },
      [](Workload &w) {
        Lum_TdmBlock *top = TopOf(*w.opened);
        std::vector<Orb_Block *> const doomed = top->GetBlocks();
        w.openedPartly = true;
        auto const start = Clock::now();
        double const budget = DeleteBudget();
        w.deleted = 0;
        for (Orb_Block *block : doomed) {
          top->DeleteBlock(block);
          if (++w.deleted % 1024 == 0 &&
              std::chrono::duration<double>(Clock::now() - start).count() > budget)
            break;
        }
      },
      [](Workload const &w) { return w.deleted; }, false);
}

// Small sizes run more often: their times are short and noisy.
void Register(char const *name, void (*phase)(benchmark::State &)) {
  for (std::int64_t const blocks : {10000, 100000, 1000000})
    benchmark::RegisterBenchmark(name, phase)
        ->Arg(blocks)
        ->Iterations(blocks >= 1000000  ? 1
                     : blocks >= 100000 ? 5
                                        : 40)
        ->UseManualTime()
        ->Unit(benchmark::kMillisecond);
}

// Registration order is run order: each phase finds what the one before it
// left. Google Benchmark runs all sizes of one phase before the next phase,
// so each size's models are rebuilt where a phase needs them.
int const g_Registered = [] {
  Register("Tdm/create", BM_Create);
  Register("Tdm/commit", BM_Commit);
  Register("Tdm/save", BM_Save);
  Register("Tdm/open_host", BM_OpenHost);
  Register("Tdm/open_clients", BM_OpenClients);
  Register("Tdm/open_typed", BM_OpenTyped);
  Register("Tdm/query", BM_Query);
  Register("Tdm/query_id", BM_QueryId);
  Register("Tdm/measure", BM_Measure);
  Register("Tdm/rebind", BM_Rebind);
  Register("Tdm/delete", BM_Delete);
  return 0;
}();

} // namespace

// The host at scale: every phase of the host road over the workload of
// Orb_HostWorkload.h at 10^4, 10^5 and 10^6 blocks, each reported per block.
//
//   create        building the workload through the host API
//   save          saving it
//   open          opening the file into a bare host model
//   delete        deleting every tenth child block, one by one (per deleted block)
//   teardown      destroying the opened host model
//   open_tdm      opening the file into a Lum_TdmModel (it only specializes)
//   teardown_tdm  destroying that Lum_TdmModel with its host model
//
// Counters: us_per_block (process CPU time, which other load on a shared
// machine disturbs less than wall time; the benchmark's own time is the same),
// wall_us_per_block, allocs_per_block (operator new calls, counted by this
// program), and for the phases that build, heap_B_per_block (bytes malloc
// hands out) and rss_B_per_block (growth of the resident set).
// bench/run-host prints them as one table.
//
// Phases share their models and files per size, so a run in registration
// order builds everything once; a phase run alone (a filter) makes what it
// needs first, untimed. Times are averages over the runs of a phase; memory
// and allocations are those of its first run. bench/run-host runs each size
// in a process of its own, so that no size inherits memory another freed.

#include "Orb_HostWorkload.h"

#include "Lum_BenchCounters.h"

#include "Lum_TdmModel.h"
#include "Orb_Model.h"

#include <benchmark/benchmark.h>

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <filesystem>
#include <malloc.h>
#include <map>
#include <memory>
#include <new>
#include <stdexcept>
#include <string>
#include <sys/wait.h>
#include <unistd.h>
#include <vector>

namespace {

using Clock = std::chrono::steady_clock;
using Lum_BenchCounters::CpuSeconds;
using Lum_BenchCounters::g_Allocations;
using Lum_BenchCounters::HeapBytes;
using Lum_BenchCounters::ResidentBytes;

// What a phase costs: time, allocations, heap and resident growth.
class Probe {
public:
  Probe() {
    // Memory freed by earlier phases goes back first, so that growth shows.
    ::malloc_trim(0);
    m_Rss = ResidentBytes();
    m_Heap = HeapBytes();
    m_Allocations = g_Allocations;
    m_Start = Clock::now();
    m_Cpu = CpuSeconds();
  }
  void Stop() {
    m_Cpu = CpuSeconds() - m_Cpu;
    m_Wall = std::chrono::duration<double>(Clock::now() - m_Start).count();
    m_Allocations = g_Allocations - m_Allocations;
    m_Heap = HeapBytes() - m_Heap;
    m_Rss = ResidentBytes() - m_Rss;
  }
  double Seconds() const { return m_Cpu; }
  // Per unit counters into the state; memory only when the phase builds.
  void Report(benchmark::State &state, std::int64_t units, bool memory) const {
    auto const n = static_cast<double>(units);
    state.counters["us_per_block"] = m_Cpu * 1e6 / n;
    state.counters["wall_us_per_block"] = m_Wall * 1e6 / n;
    state.counters["allocs_per_block"] = static_cast<double>(m_Allocations) / n;
    if (memory) {
      state.counters["heap_B_per_block"] = static_cast<double>(m_Heap) / n;
      state.counters["rss_B_per_block"] = static_cast<double>(m_Rss) / n;
    }
  }

private:
  Clock::time_point m_Start;
  double m_Cpu = 0;
  double m_Wall = 0;
  std::uint64_t m_Allocations = 0;
  std::int64_t m_Heap = 0;
  std::int64_t m_Rss = 0;
};

// The models and the file of one size, shared by the phases.
struct Workload {
  std::int64_t blocks = 0;
  std::string path;
  // The file is this process's own (removed at exit), not a shared one.
  bool ownFile = false;
  std::unique_ptr<Orb_Model> created;
  std::unique_ptr<Orb_Model> opened;
  std::unique_ptr<Lum_TdmModel> openedTdm;
  // The delete phase left `opened` without some of its blocks.
  bool openedPartly = false;

  ~Workload() {
    if (ownFile)
      std::filesystem::remove(path);
  }
};

Workload &WorkloadOf(std::int64_t blocks) {
  return Lum_BenchCounters::WorkloadOf<Workload>(blocks);
}

std::unique_ptr<Orb_Model> NewModel() {
  return std::make_unique<Orb_Model>("bench", "bench", "", false);
}

void EnsureCreated(Workload &w) {
  if (w.created)
    return;
  w.created = NewModel();
  Orb_HostWorkload::Build(*w.created, w.blocks);
}

// The database file of the workload: in $ORB_HOST_BENCH_DIR when set, where
// it is kept for later processes (bench/run-host), else a temporary file of
// this process.
std::string const &PathOf(Workload &w) {
  if (w.path.empty()) {
    std::string const name = "Orb_HostBench." + std::to_string(w.blocks) + ".db";
    if (char const *dir = std::getenv("ORB_HOST_BENCH_DIR")) {
      w.path = (std::filesystem::path(dir) / name).string();
    } else {
      w.path = (std::filesystem::temp_directory_path() / (std::to_string(::getpid()) + "." + name))
                   .string();
      w.ownFile = true;
    }
  }
  return w.path;
}

// Makes the file in a child process, so that this process's heap holds
// nothing freed by the building (pooled small blocks stay for reuse): the
// phases that build then show what they really take.
void EnsureFile(Workload &w) {
  std::string const &path = PathOf(w);
  if (std::filesystem::exists(path))
    return;
  pid_t const child = ::fork();
  if (child == 0) {
    int status = 1;
    try {
      Orb_Model model("bench", "bench", "", false);
      Orb_HostWorkload::Build(model, w.blocks);
      model.Save(path.c_str());
      status = 0;
    } catch (std::exception const &e) {
      std::fprintf(stderr, "building %s: %s\n", path.c_str(), e.what());
    }
    std::_Exit(status);
  }
  int status = 0;
  if (child < 0 || ::waitpid(child, &status, 0) != child || !WIFEXITED(status) ||
      WEXITSTATUS(status) != 0)
    throw std::runtime_error("cannot build the workload file " + path);
}

void EnsureOpened(Workload &w) {
  if (w.opened && !w.openedPartly)
    return;
  w.opened.reset();
  w.openedPartly = false;
  EnsureFile(w);
  w.created.reset();
  w.opened = NewModel();
  w.opened->Open(w.path.c_str());
}

void EnsureOpenedTdm(Workload &w) {
  if (w.openedTdm)
    return;
  EnsureFile(w);
  w.created.reset();
  w.openedTdm = std::make_unique<Lum_TdmModel>("bench", "bench", "");
  w.openedTdm->Open(w.path.c_str());
}

// Runs one phase per iteration: `setup` untimed, then `phase` measured.
template <class Setup, class Phase>
void RunPhase(benchmark::State &state, Setup const &setup, Phase const &phase, std::int64_t divisor,
              bool memory) {
  Workload &w = WorkloadOf(state.range(0));
  double seconds = 0;
  bool first = true;
  for (auto _ : state) {
    setup(w);
    Probe probe;
    phase(w);
    probe.Stop();
    state.SetIterationTime(probe.Seconds());
    seconds += probe.Seconds();
    // Memory as the first run finds it: later runs reuse what the earlier
    // ones freed (client objects' free lists, for one).
    if (first)
      probe.Report(state, w.blocks / divisor, memory);
    first = false;
  }
  auto const units = static_cast<double>(state.iterations() * (w.blocks / divisor));
  state.counters["us_per_block"] = seconds * 1e6 / units;
}

void BM_HostCreate(benchmark::State &state) {
  RunPhase(
      state,
      [](Workload &w) {
        w.opened.reset();
        w.openedTdm.reset();
        w.created.reset();
        w.created = NewModel();
      },
      [](Workload &w) { Orb_HostWorkload::Build(*w.created, w.blocks); }, 1, true);
}

void BM_HostSave(benchmark::State &state) {
  RunPhase(
      state, [](Workload &w) { EnsureCreated(w); },
      [](Workload &w) { w.created->Save(PathOf(w).c_str()); }, 1, false);
}

void BM_HostOpen(benchmark::State &state) {
  RunPhase(
      state,
      [](Workload &w) {
        EnsureFile(w);
        w.created.reset();
        w.opened.reset();
        w.opened = NewModel();
      },
      [](Workload &w) { w.opened->Open(w.path.c_str()); }, 1, true);
}

void BM_HostDelete(benchmark::State &state) {
  RunPhase(
      state,
      [](Workload &w) {
        w.opened.reset();
        EnsureOpened(w);
      },
      [](Workload &w) {
        Orb_Block *top = Orb_HostWorkload::TopBlock(*w.opened);
        std::vector<Orb_Block *> doomed;
        doomed.reserve(static_cast<std::size_t>(w.blocks / 10));
        for (std::size_t i = 0; i < top->GetBlocks().size(); i += 10)
          doomed.push_back(top->GetBlocks()[i]);
        for (Orb_Block *block : doomed)
          top->DeleteBlock(block);
        w.openedPartly = true;
      },
      10, false);
}

void BM_HostTeardown(benchmark::State &state) {
  RunPhase(
      state, [](Workload &w) { EnsureOpened(w); }, [](Workload &w) { w.opened.reset(); }, 1, false);
}

void BM_HostOpenTdm(benchmark::State &state) {
  RunPhase(
      state,
      [](Workload &w) {
        EnsureFile(w);
        w.created.reset();
        w.opened.reset();
        w.openedTdm.reset();
        w.openedTdm = std::make_unique<Lum_TdmModel>("bench", "bench", "");
      },
      [](Workload &w) { w.openedTdm->Open(w.path.c_str()); }, 1, true);
}

void BM_HostTeardownTdm(benchmark::State &state) {
  RunPhase(
      state, [](Workload &w) { EnsureOpenedTdm(w); }, [](Workload &w) { w.openedTdm.reset(); }, 1,
      false);
}

// Small sizes run more often: their times are short and noisy.
void Register(char const *name, void (*phase)(benchmark::State &)) {
  for (std::int64_t const blocks : {10000, 100000, 1000000})
    benchmark::RegisterBenchmark(name, phase)
        ->Arg(blocks)
        ->Iterations(blocks >= 1000000 ? 1 : 300000 / blocks)
        ->UseManualTime()
        ->Unit(benchmark::kMillisecond);
}

// Registration order is run order: each phase finds what the one before it
// left.
int const g_Registered = [] {
  Register("Host/create", BM_HostCreate);
  Register("Host/save", BM_HostSave);
  Register("Host/open", BM_HostOpen);
  Register("Host/delete", BM_HostDelete);
  Register("Host/teardown", BM_HostTeardown);
  Register("Host/open_tdm", BM_HostOpenTdm);
  Register("Host/teardown_tdm", BM_HostTeardownTdm);
  return 0;
}();

} // namespace

#pragma once

// Tests of how a cost grows: the time for 2n items against the time for n,
// each the least of several runs on a steady clock, so that a busy machine
// can slow a run but not make the growth look worse than it is. No absolute
// timings.

#include <algorithm>
#include <chrono>
#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <limits>

namespace HostTest {

// Seconds on a steady clock that `action` takes.
template <class Action> double SecondsOf(Action const &action) {
  auto const start = std::chrono::steady_clock::now();
  action();
  return std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
}

// The bound tests put on GrowthOfDoubling for linear work: generous, for
// caches and a shared machine, yet below the 4 of quadratic work.
constexpr double kLinearGrowth = 3.0;

// The least of run(2n) over `repetitions` runs, over the least of run(n),
// where run(n) returns the seconds its measured part took for n items:
// about 2 for linear work, 4 for quadratic. A ratio above kLinearGrowth is
// measured again, up to three times in all, as other processes can slow
// every run of one measurement; the least ratio is returned.
template <class Run> double GrowthOfDoubling(Run const &run, std::size_t n, int repetitions = 5) {
  double least = std::numeric_limits<double>::infinity();
  for (int attempt = 0; attempt < 3 && least > kLinearGrowth; ++attempt) {
    double once = std::numeric_limits<double>::infinity(), twice = once;
    for (int i = 0; i < repetitions; ++i) {
      once = std::min(once, run(n));
      twice = std::min(twice, run(2 * n));
    }
    least = std::min(least, twice / once);
  }
  return least;
}

// Under valgrind, which checks memory and serialises threads: growth tests
// say nothing there and take minutes.
inline bool UnderMemoryChecker() {
  char const *preload = std::getenv("LD_PRELOAD");
  return preload && std::strstr(preload, "vgpreload") != nullptr;
}

} // namespace HostTest

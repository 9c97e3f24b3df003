#pragma once

// What a benchmark program counts besides time: heap allocations (by
// replacing the global operator new, so the libraries' allocations come here
// too), the process's CPU time, its resident set and malloc's bytes in use.
//
// Include it in exactly one source of a program: it defines the replacement
// operators.

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <malloc.h>
#include <map>
#include <memory>
#include <new>
#include <time.h>
#include <unistd.h>

namespace Lum_BenchCounters {

// Calls of operator new so far.
inline std::uint64_t g_Allocations = 0;

inline void *CountedAlloc(std::size_t size) {
  ++g_Allocations;
  if (void *p = std::malloc(size ? size : 1))
    return p;
  throw std::bad_alloc();
}

inline void *CountedAlignedAlloc(std::size_t size, std::align_val_t align) {
  ++g_Allocations;
  auto const alignment = static_cast<std::size_t>(align);
  void *p = nullptr;
  if (::posix_memalign(&p, alignment < sizeof(void *) ? sizeof(void *) : alignment,
                       size ? size : 1) == 0)
    return p;
  throw std::bad_alloc();
}

// CPU time of the process (every thread; the libraries start none).
inline double CpuSeconds() {
  timespec now{};
  ::clock_gettime(CLOCK_PROCESS_CPUTIME_ID, &now);
  return static_cast<double>(now.tv_sec) + static_cast<double>(now.tv_nsec) * 1e-9;
}

inline std::int64_t ResidentBytes() {
  long pages = 0;
  long resident = 0;
  if (FILE *statm = std::fopen("/proc/self/statm", "r")) {
    if (std::fscanf(statm, "%ld %ld", &pages, &resident) != 2)
      resident = 0;
    std::fclose(statm);
  }
  return static_cast<std::int64_t>(resident) * ::sysconf(_SC_PAGESIZE);
}

inline std::int64_t HeapBytes() {
  struct mallinfo2 const info = ::mallinfo2();
  return static_cast<std::int64_t>(info.uordblks + info.hblkhd);
}

// The workload of one size, made on first use and kept for the later
// phases of the same process (W has a `blocks` member).
template <class W> W &WorkloadOf(std::int64_t blocks) {
  static std::map<std::int64_t, std::unique_ptr<W>> workloads;
  std::unique_ptr<W> &slot = workloads[blocks];
  if (!slot) {
    slot = std::make_unique<W>();
    slot->blocks = blocks;
  }
  return *slot;
}

} // namespace Lum_BenchCounters

void *operator new(std::size_t size) { return Lum_BenchCounters::CountedAlloc(size); }
void *operator new[](std::size_t size) { return Lum_BenchCounters::CountedAlloc(size); }
void *operator new(std::size_t size, std::nothrow_t const & /*tag*/) noexcept {
  ++Lum_BenchCounters::g_Allocations;
  return std::malloc(size ? size : 1);
}
void *operator new[](std::size_t size, std::nothrow_t const & /*tag*/) noexcept {
  ++Lum_BenchCounters::g_Allocations;
  return std::malloc(size ? size : 1);
}
void *operator new(std::size_t size, std::align_val_t align) {
  return Lum_BenchCounters::CountedAlignedAlloc(size, align);
}
void *operator new[](std::size_t size, std::align_val_t align) {
  return Lum_BenchCounters::CountedAlignedAlloc(size, align);
}
void operator delete(void *p) noexcept { std::free(p); }
void operator delete[](void *p) noexcept { std::free(p); }
void operator delete(void *p, std::size_t /*size*/) noexcept { std::free(p); }
void operator delete[](void *p, std::size_t /*size*/) noexcept { std::free(p); }
void operator delete(void *p, std::align_val_t /*align*/) noexcept { std::free(p); }
void operator delete[](void *p, std::align_val_t /*align*/) noexcept { std::free(p); }
void operator delete(void *p, std::size_t /*size*/, std::align_val_t /*align*/) noexcept {
  std::free(p);
}
void operator delete[](void *p, std::size_t /*size*/, std::align_val_t /*align*/) noexcept {
  std::free(p);
}

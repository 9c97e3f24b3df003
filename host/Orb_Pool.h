#pragma once

// Storage of one kind of host object in one model: slots of one size carved
// from chunks that grow geometrically, freed slots reused first, every chunk
// freed at once with the pool. Each slot has a number, its bridge id, which
// goes with the slot when it is reused, so that bridge ids stay dense under
// create/delete churn and deleting needs no bookkeeping beyond one link.

#include "Lum_PlatformApi.h"

#include <cstddef>
#include <cstdint>
#include <vector>

class LUM_PLATFORM_API Orb_ObjectPool {
public:
  Orb_ObjectPool() = default;
  Orb_ObjectPool(Orb_ObjectPool const &) = delete;
  Orb_ObjectPool &operator=(Orb_ObjectPool const &) = delete;
  ~Orb_ObjectPool();

  // Sets the slot size, before the first Allocate.
  void SetSlotSize(std::size_t size);
  // Memory for one object and its number. Throws std::bad_alloc.
  void *Allocate(unsigned &id);
  // Gives a slot back for reuse; its object must be destroyed already.
  void Release(void *slot, unsigned id) noexcept;
  // Every number handed out so far is below this.
  unsigned IdLimit() const { return m_NextId; }
  // Bytes held in chunks.
  std::size_t Bytes() const { return m_Bytes; }

private:
  // A released slot holds the next released slot and its own number.
  struct FreeSlot {
    FreeSlot *next;
    unsigned id;
  };

  std::size_t m_SlotSize = sizeof(FreeSlot);
  std::vector<void *> m_Chunks;
  unsigned char *m_pNext = nullptr;
  unsigned char *m_pEnd = nullptr;
  FreeSlot *m_pFree = nullptr;
  unsigned m_NextId = 0;
  std::size_t m_NextChunkSlots = 8;
  std::size_t m_Bytes = 0;
};

// Small blocks (up to Orb_SmallLimit bytes) from process-wide free lists by
// size class, carved from 64 KiB chunks: no heap block and no heap header of
// their own. Freed blocks are kept for reuse by any later small allocation
// of their class; the chunks are never returned. Thread-safe. Larger sizes
// go to the global operator new. Under AddressSanitizer everything goes to
// the global operator new, so that leaks and use after free are caught.
// Throws std::bad_alloc.
constexpr std::size_t Orb_SmallLimit = 256;
LUM_PLATFORM_API void *Orb_SmallAllocate(std::size_t size);
// `size` must be the size given to Orb_SmallAllocate. Null does nothing.
LUM_PLATFORM_API void Orb_SmallRelease(void *pointer, std::size_t size) noexcept;

// A standard allocator over Orb_SmallAllocate, for the host's small arrays.
template <class T> struct Orb_SmallAllocator {
  using value_type = T;
  Orb_SmallAllocator() = default;
  template <class U> explicit Orb_SmallAllocator(Orb_SmallAllocator<U> const & /*other*/) {}
  // T is a pointer type for the host's arrays: its size is what is meant.
  static constexpr std::size_t kSize = sizeof(T); // NOLINT(bugprone-sizeof-expression)
  T *allocate(std::size_t n) { return static_cast<T *>(Orb_SmallAllocate(n * kSize)); }
  void deallocate(T *pointer, std::size_t n) noexcept { Orb_SmallRelease(pointer, n * kSize); }
  friend bool operator==(Orb_SmallAllocator const & /*a*/, Orb_SmallAllocator const & /*b*/) {
    return true;
  }
  friend bool operator!=(Orb_SmallAllocator const & /*a*/, Orb_SmallAllocator const & /*b*/) {
    return false;
  }
};

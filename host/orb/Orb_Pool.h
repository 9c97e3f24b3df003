#pragma once

// Storage of one kind of host object in one model: slots of one size carved
// from chunks that grow geometrically, freed slots reused first, every chunk
// freed at once with the pool. Each slot has a number, its bridge id, which
// goes with the slot when it is reused, so that bridge ids stay dense under
// create/delete churn and deleting needs no bookkeeping beyond one link.
//
// Chunks are made of aligned pages, and each page starts with its pool's
// owner (the model) and the number of its first slot: an object finds its
// model and its own number from its address, so no object spends bytes on
// them.

#include "Lum_PlatformApi.h"

#include <cstddef>
#include <cstdint>
#include <vector>

class LUM_PLATFORM_API Orb_ObjectPool {
public:
  static constexpr std::size_t kPageBytes = 4096;
  // The owner, the first slot's number and the reciprocal of the slot size.
  struct PageHeader {
    void *owner;
    std::uint32_t firstId;
    std::uint32_t reciprocal;
  };
  static constexpr std::size_t kPageHeader = sizeof(PageHeader);
  static constexpr std::size_t kMaxSlotSize = kPageBytes - kPageHeader;

  Orb_ObjectPool() = default;
  Orb_ObjectPool(Orb_ObjectPool const &) = delete;
  Orb_ObjectPool &operator=(Orb_ObjectPool const &) = delete;
  ~Orb_ObjectPool();

  // Sets the slot size (at most kMaxSlotSize) and the owner that every slot
  // reports, before the first Allocate.
  void SetSlotSize(std::size_t size, void *owner);
  // Memory for one object. Throws std::bad_alloc.
  void *Allocate();
  // Gives a slot back for reuse; its object must be destroyed already.
  void Release(void *slot) noexcept;
  // Every slot number handed out so far is below this.
  unsigned IdLimit() const { return m_NextId; }
  // The slot of number `id` (< IdLimit()), so that links between objects of
  // one model can be kept as 32-bit numbers.
  void *At(unsigned id) const {
    return m_Pages[id / m_SlotsPerPage] + kPageHeader +
           std::size_t(id % m_SlotsPerPage) * m_SlotSize;
  }
  // Bytes held in chunks.
  std::size_t Bytes() const { return m_Bytes; }

  // The owner of the pool that holds the object at `slot`.
  template <class Owner> static Owner *ModelOf(void const *slot) {
    return static_cast<Owner *>(Header(slot).owner);
  }
  // The number of the slot at `slot` in its pool: dense from 0, and the same
  // for the next object that reuses the slot.
  static unsigned IdOf(void const *slot) {
    PageHeader const &header = Header(slot);
    auto const offset = reinterpret_cast<std::uintptr_t>(slot) % kPageBytes - kPageHeader;
    // offset is a multiple of the slot size below a page: exact.
    return header.firstId +
           static_cast<unsigned>((std::uint64_t(offset) * header.reciprocal) >> 32);
  }

private:
  static PageHeader const &Header(void const *slot) {
    auto const page = reinterpret_cast<std::uintptr_t>(slot) & ~(kPageBytes - 1);
    return *reinterpret_cast<PageHeader const *>(page); // NOLINT(performance-no-int-to-ptr)
  }
  // A released slot holds the next released slot.
  struct FreeSlot {
    FreeSlot *next;
  };
  // Starts the next page, taking a new chunk when the current one is used up.
  void NextPage();

  std::size_t m_SlotSize = sizeof(FreeSlot);
  std::uint32_t m_Reciprocal = 0;
  void *m_pOwner = nullptr;
  unsigned m_SlotsPerPage = 1;
  std::vector<void *> m_Chunks;
  // Every page in slot number order.
  std::vector<unsigned char *> m_Pages;
  unsigned char *m_pNext = nullptr;
  unsigned char *m_pPageEnd = nullptr;
  unsigned char *m_pChunkEnd = nullptr;
  FreeSlot *m_pFree = nullptr;
  unsigned m_NextId = 0;
  std::size_t m_NextChunkPages = 1;
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

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

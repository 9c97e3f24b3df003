// The model's object pools and the small-block allocator of client objects
// and property values.

#include "Orb_Pool.h"
#include "Orb_Sanitizer.h"

#include <algorithm>
#include <cassert>
#include <cstdint>
#include <mutex>
#include <new>

Orb_ObjectPool::~Orb_ObjectPool() {
  for (void *chunk : m_Chunks)
    ::operator delete(chunk, std::align_val_t(kPageBytes));
}

void Orb_ObjectPool::SetSlotSize(std::size_t size, void *owner) {
  assert(m_Chunks.empty() && "Orb_ObjectPool::SetSlotSize after the first allocation");
  assert(size <= kMaxSlotSize && "Orb_ObjectPool: slot larger than a page");
  // Host objects hold pointers and integers: pointer alignment is enough.
  std::size_t const align = alignof(void *);
  m_SlotSize = (std::max(size, sizeof(FreeSlot)) + align - 1) / align * align;
  m_Reciprocal =
      static_cast<std::uint32_t>(((std::uint64_t(1) << 32) + m_SlotSize - 1) / m_SlotSize);
  m_SlotsPerPage = static_cast<unsigned>((kPageBytes - kPageHeader) / m_SlotSize);
  m_pOwner = owner;
}

void Orb_ObjectPool::NextPage() {
  if (m_Pages.size() == m_Pages.capacity())
    m_Pages.reserve(2 * m_Pages.size() + 8);
  if (m_pPageEnd == m_pChunkEnd) {
    std::size_t const bytes = m_NextChunkPages * kPageBytes;
    m_Chunks.reserve(m_Chunks.size() + 1);
    auto *chunk = static_cast<unsigned char *>(::operator new(bytes, std::align_val_t(kPageBytes)));
    m_Chunks.push_back(chunk);
    m_pPageEnd = chunk;
    m_pChunkEnd = chunk + bytes;
    m_Bytes += bytes;
    // Chunks double up to a megabyte: small models stay small.
    if (bytes < (std::size_t(1) << 20))
      m_NextChunkPages *= 2;
  }
  unsigned char *page = m_pPageEnd;
  new (page) PageHeader{m_pOwner, m_NextId, m_Reciprocal};
  m_Pages.push_back(page);
  m_pNext = page + kPageHeader;
  m_pPageEnd = page + kPageBytes;
}

void *Orb_ObjectPool::Allocate() {
  if (m_pFree) {
    FreeSlot *slot = m_pFree;
    Orb_Unpoison(slot, m_SlotSize);
    m_pFree = slot->next;
    return slot;
  }
  if (static_cast<std::size_t>(m_pPageEnd - m_pNext) < m_SlotSize)
    NextPage();
  void *slot = m_pNext;
  m_pNext += m_SlotSize;
  ++m_NextId;
  return slot;
}

void Orb_ObjectPool::Release(void *slot) noexcept {
  m_pFree = new (slot) FreeSlot{m_pFree};
  Orb_Poison(slot, m_SlotSize);
}

namespace {

// Free lists by size class (multiples of 8 bytes up to Orb_SmallLimit),
// carved from 64 KiB chunks.
class SmallPool {
public:
  static constexpr std::size_t kGrain = 8;

  void *Allocate(std::size_t size) {
    std::size_t const cls = (size + kGrain - 1) / kGrain;
    std::lock_guard<std::mutex> const lock(m_Mutex);
    if (Free *block = m_Free[cls]) {
      m_Free[cls] = block->next;
      return block;
    }
    std::size_t const bytes = cls * kGrain;
    if (static_cast<std::size_t>(m_pEnd - m_pNext) < bytes) {
      // What is left of the chunk goes to the free lists of smaller classes.
      for (std::size_t left = static_cast<std::size_t>(m_pEnd - m_pNext) / kGrain; left > 0;) {
        std::size_t const piece = std::min(left, Orb_SmallLimit / kGrain);
        m_Free[piece] = new (m_pNext) Free{m_Free[piece]};
        m_pNext += piece * kGrain;
        left -= piece;
      }
      m_pNext = static_cast<unsigned char *>(::operator new(kChunk));
      m_pEnd = m_pNext + kChunk;
    }
    void *block = m_pNext;
    m_pNext += bytes;
    return block;
  }
  void Release(void *pointer, std::size_t size) noexcept {
    std::size_t const cls = (size + kGrain - 1) / kGrain;
    std::lock_guard<std::mutex> const lock(m_Mutex);
    m_Free[cls] = new (pointer) Free{m_Free[cls]};
  }

private:
  struct Free {
    Free *next;
  };
  static constexpr std::size_t kChunk = std::size_t(1) << 16;
  std::mutex m_Mutex;
  Free *m_Free[Orb_SmallLimit / kGrain + 1] = {};
  unsigned char *m_pNext = nullptr;
  unsigned char *m_pEnd = nullptr;
};

// Never destroyed: small blocks of static models may outlive any static
// here. Its chunks stay reachable through it.
SmallPool &TheSmallPool() {
  static auto *pool = new SmallPool;
  return *pool;
}

constexpr bool kPooled = !ORB_ADDRESS_SANITIZER;

} // namespace

void *Orb_SmallAllocate(std::size_t size) {
  if (!kPooled || size == 0 || size > Orb_SmallLimit)
    return ::operator new(size);
  return TheSmallPool().Allocate(size);
}

void Orb_SmallRelease(void *pointer, std::size_t size) noexcept {
  if (!pointer)
    return;
  if (!kPooled || size == 0 || size > Orb_SmallLimit)
    ::operator delete(pointer);
  else
    TheSmallPool().Release(pointer, size);
}

// The name table of a host model.

#include "Orb_Name.h"

#include <algorithm>
#include <limits>
#include <new>
#include <stdexcept>

Orb_NameTable::~Orb_NameTable() {
  for (void *chunk : m_Chunks)
    ::operator delete(chunk);
  for (void *entry : m_Large)
    ::operator delete(entry);
}

void *Orb_NameTable::Allocate(std::size_t bytes) {
  if (bytes > kClassLimit) {
    // Reserving room does not make the set's node: the insertion itself
    // may fail, and must not lose the entry.
    void *entry = ::operator new(bytes);
    try {
      m_Large.insert(entry);
    } catch (...) {
      ::operator delete(entry);
      throw;
    }
    return entry;
  }
  void *&free = m_Free[bytes / kGrain];
  if (free) {
    void *entry = free;
    free = *static_cast<void **>(entry);
    return entry;
  }
  if (static_cast<std::size_t>(m_pEnd - m_pNext) < bytes) {
    m_Chunks.reserve(m_Chunks.size() + 1);
    auto *chunk = static_cast<unsigned char *>(::operator new(kChunkBytes));
    m_Chunks.push_back(chunk);
    // What is left of the old chunk serves its size class.
    if (std::size_t const left = static_cast<std::size_t>(m_pEnd - m_pNext); left >= kGrain)
      Free(m_pNext, left);
    m_pNext = chunk;
    m_pEnd = chunk + kChunkBytes;
  }
  void *entry = m_pNext;
  m_pNext += bytes;
  return entry;
}

void Orb_NameTable::Free(void *entry, std::size_t bytes) noexcept {
  if (bytes > kClassLimit) {
    m_Large.erase(entry);
    ::operator delete(entry);
    return;
  }
  void *&free = m_Free[bytes / kGrain];
  *static_cast<void **>(entry) = free;
  free = entry;
}

Orb_NameEntry *Orb_NameTable::Acquire(std::string_view name, bool share) {
  if (share) {
    auto const found = m_Shared.find(name);
    if (found != m_Shared.end()) {
      ++found->second.holders;
      return found->second.entry;
    }
  }
  if (name.size() >= (std::size_t(1) << 31))
    throw std::length_error("Orb_NameTable: name of 2 GiB or more");
  std::size_t const bytes = EntryBytes(name.size());
  auto *entry = static_cast<Orb_NameEntry *>(Allocate(bytes));
  entry->size = static_cast<std::uint32_t>(name.size());
  entry->shared = share ? 1 : 0;
  std::memcpy(entry->text, name.data(), name.size());
  entry->text[name.size()] = '\0';
  if (share) {
    try {
      m_Shared.emplace(entry->GetNameString(), Shared{entry, 1});
    } catch (...) {
      Free(entry, bytes);
      throw;
    }
  }
  return entry;
}

void Orb_NameTable::Release(Orb_NameEntry *entry) noexcept {
  if (entry->shared) {
    auto const found = m_Shared.find(entry->GetNameString());
    if (--found->second.holders > 0)
      return;
    m_Shared.erase(found);
  }
  Free(entry, EntryBytes(entry->size));
}

// The name table of a host model.

#include "Orb_Name.h"

#include "Orb_Pool.h"

#include <limits>
#include <new>
#include <stdexcept>

Orb_NameTable::~Orb_NameTable() {
  m_Index.ForEach([](Orb_NameEntry *entry) { Orb_SmallRelease(entry, EntryBytes(entry->size)); });
}

Orb_NameEntry *Orb_NameTable::Acquire(std::string_view name) {
  if (Orb_NameEntry *found = m_Index.Find(name)) {
    ++found->refs;
    return found;
  }
  if (name.size() > std::numeric_limits<std::uint32_t>::max())
    throw std::length_error("Orb_NameTable: name too long");
  std::size_t const bytes = EntryBytes(name.size());
  auto *entry = static_cast<Orb_NameEntry *>(Orb_SmallAllocate(bytes));
  entry->refs = 1;
  entry->size = static_cast<std::uint32_t>(name.size());
  std::memcpy(entry->text, name.data(), name.size());
  entry->text[name.size()] = '\0';
  try {
    m_Index.Insert(entry);
  } catch (...) {
    Orb_SmallRelease(entry, bytes);
    throw;
  }
  ++m_Count;
  m_EntryBytes += bytes;
  return entry;
}

void Orb_NameTable::Release(Orb_NameEntry *entry) noexcept {
  if (--entry->refs > 0)
    return;
  m_Index.Erase(entry);
  --m_Count;
  m_EntryBytes -= EntryBytes(entry->size);
  Orb_SmallRelease(entry, EntryBytes(entry->size));
}

std::size_t Orb_NameTable::Bytes() const { return m_EntryBytes + m_Index.Bytes(); }

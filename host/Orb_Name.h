#pragma once

// Names of host objects, kept small: a name of up to 7 bytes sits in the
// object's own 8 bytes; a longer one is an entry of its model's name table,
// stored once and shared by every object of that name (the pins of one cell
// type across a million blocks hold one copy of each pin name).

#include "Lum_PlatformApi.h"
#include "Orb_List.h"

#include <cstddef>
#include <cstdint>
#include <cstring>
#include <string_view>

// One stored name: a count of the objects holding it, its length and its
// bytes with a terminating NUL.
struct Orb_NameEntry {
  std::uint32_t refs;
  std::uint32_t size;
  char text[1]; // NOLINT(modernize-avoid-c-arrays): the bytes run on past the struct

  std::string_view GetNameString() const { return {text, size}; }
};

// The long names of one host model, each stored once. Entries go when the
// last object holding them releases them, so creating and deleting objects
// does not make the table grow; the table frees whatever is left when it goes.
class LUM_PLATFORM_API Orb_NameTable {
public:
  Orb_NameTable() = default;
  Orb_NameTable(Orb_NameTable const &) = delete;
  Orb_NameTable &operator=(Orb_NameTable const &) = delete;
  ~Orb_NameTable();

  // The entry for `name`, made if needed, with one more holder. Throws
  // std::bad_alloc and then changes nothing.
  Orb_NameEntry *Acquire(std::string_view name);
  void Release(Orb_NameEntry *entry) noexcept;
  // Names held, and bytes taken by the entries and the index.
  std::size_t Size() const { return m_Count; }
  std::size_t Bytes() const;

private:
  static std::size_t EntryBytes(std::size_t size) {
    return offsetof(Orb_NameEntry, text) + size + 1;
  }
  Orb_NameIndex<Orb_NameEntry> m_Index;
  std::size_t m_Count = 0;
  std::size_t m_EntryBytes = 0;
};

// An object's name in 8 bytes. Which of the two forms it holds is kept by
// the object (one bit beside its other flags), so that all 8 bytes serve
// the name.
union Orb_Name {
  static constexpr std::size_t kShortLimit = 7;

  char shortName[8]; // NOLINT(modernize-avoid-c-arrays)
  Orb_NameEntry *entry;

  // Fills the name in; returns whether it took an entry of `table`.
  bool Set(Orb_NameTable &table, std::string_view name) {
    if (name.size() <= kShortLimit) {
      std::memset(shortName, 0, sizeof shortName);
      std::memcpy(shortName, name.data(), name.size());
      return false;
    }
    entry = table.Acquire(name);
    return true;
  }
  char const *CStr(bool isLong) const { return isLong ? entry->text : shortName; }
  std::string_view View(bool isLong) const {
    return isLong ? entry->GetNameString()
                  : std::string_view(shortName, ::strnlen(shortName, sizeof shortName));
  }
};

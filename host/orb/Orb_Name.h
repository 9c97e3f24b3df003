#pragma once

// Names of host objects, kept small: a name of up to 7 bytes sits in the
// object's own 8 bytes; a longer one is an entry of its model's name table.
// Pin names repeat across every block of a cell type, so a long pin name is
// stored once per model and shared; other long names (signals, blocks),
// mostly unique in a netlist, get an entry of their own: sharing them would
// cost a hash lookup per name (a quarter of opening a million-block design)
// and save nothing. Distinct pin names are few, so
// their index is a plain hash map.

#include "Lum_PlatformApi.h"
#include "Orb_Hash.h"

#include <cstddef>
#include <cstdint>
#include <cstring>
#include <string_view>
#include <unordered_map>
#include <unordered_set>
#include <vector>

// One stored name: its length, whether it is shared, and its bytes with a
// terminating NUL. A shared entry's holders are counted in the table.
struct Orb_NameEntry {
  std::uint32_t size : 31;
  std::uint32_t shared : 1;
  char text[1]; // NOLINT(modernize-avoid-c-arrays): the bytes run on past the struct

  std::string_view GetNameString() const { return {text, size}; }
};

// The long names of one host model. Entries come from the table's own
// chunks, by size class, and are reused when their holders go, so creating
// and deleting objects does not make the table grow; the chunks are freed
// whole with the table, without visiting the entries.
class LUM_PLATFORM_API Orb_NameTable {
public:
  Orb_NameTable() = default;
  Orb_NameTable(Orb_NameTable const &) = delete;
  Orb_NameTable &operator=(Orb_NameTable const &) = delete;
  ~Orb_NameTable();

  // An entry for `name` with one more holder: the shared one if `share`,
  // else a new one of its own. Throws std::bad_alloc (std::length_error for
  // a name of 2 GiB or more) and then changes nothing.
  Orb_NameEntry *Acquire(std::string_view name, bool share);
  void Release(Orb_NameEntry *entry) noexcept;
  // Shared names held (for tests and reports).
  std::size_t SharedCount() const { return m_Shared.size(); }

private:
  static constexpr std::size_t kGrain = 8;
  static constexpr std::size_t kClassLimit = 256;
  static constexpr std::size_t kChunkBytes = std::size_t(64) << 10;
  static std::size_t EntryBytes(std::size_t size) {
    return (offsetof(Orb_NameEntry, text) + size + 1 + kGrain - 1) / kGrain * kGrain;
  }
  void *Allocate(std::size_t bytes);
  void Free(void *entry, std::size_t bytes) noexcept;

  // The shared entries and their holder counts, by their text (which the
  // key views; entries never move).
  struct Shared {
    Orb_NameEntry *entry;
    std::size_t holders;
  };
  std::unordered_map<std::string_view, Shared, Orb_NameHash> m_Shared;
  // Free entries by size class (bytes / kGrain), each holding the next.
  std::vector<void *> m_Free = std::vector<void *>(kClassLimit / kGrain + 1, nullptr);
  std::vector<void *> m_Chunks;
  unsigned char *m_pNext = nullptr;
  unsigned char *m_pEnd = nullptr;
  // Entries too large for a class, each from the global heap.
  std::unordered_set<void *> m_Large;
};

// An object's name in 8 bytes. Which of the two forms it holds is kept by
// the object (one bit beside its other flags), so that all 8 bytes serve
// the name.
union Orb_Name {
  static constexpr std::size_t kShortLimit = 7;

  char shortName[8]; // NOLINT(modernize-avoid-c-arrays)
  Orb_NameEntry *entry;

  // Fills the name in; returns whether it took an entry of `table`
  // (shared with other holders of the name if `share`).
  bool Set(Orb_NameTable &table, std::string_view name, bool share) {
    if (name.size() <= kShortLimit) {
      std::memset(shortName, 0, sizeof shortName);
      std::memcpy(shortName, name.data(), name.size());
      return false;
    }
    entry = table.Acquire(name, share);
    return true;
  }
  char const *CStr(bool isLong) const { return isLong ? entry->text : shortName; }
  std::string_view View(bool isLong) const {
    return isLong ? entry->GetNameString()
                  : std::string_view(shortName, ::strnlen(shortName, sizeof shortName));
  }
};

#pragma once

// The host's ordered containers: children of one kind in host order, a
// signal's connected pins, a network's signals.
//
// Removal is O(1) amortised and keeps the order: each element knows its slot
// in the list (SlotOf gives it), removal leaves a hole, and the holes are
// squeezed out lazily, by the reads that need it, each element moving at most
// once per read pass. Reads by index are O(1) while no hole lies before the
// index read; begin()/end() squeeze out every hole first (O(n) once, then
// O(1) until the next removal). So these walks are linear overall:
//   - deleting from the front (`while (!l.empty()) Delete(l[0])`) or the back;
//   - deleting a snapshot of elements, in host order or in reverse;
//   - walking by index and deleting as one goes (`Delete(l[i]); --i`).
// Only deleting elements far apart in random order while reading between the
// deletions costs, like a vector's erase, the distance between them.

#include "Lum_PlatformApi.h"
#include "Orb_Hash.h"
#include "Orb_Pool.h"

#include <algorithm>
#include <cassert>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <memory>
#include <new>
#include <string_view>
#include <utility>
#include <vector>

struct Orb_ChildSlot;
template <class T, class SlotOf> class Orb_List;

// A read-only view of an Orb_List, as the host's accessors return it:
// size(), empty(), operator[], front(), back(), begin() and end() as a
// vector's. It reads the list it was made from; iterators from begin() are
// invalidated by any change of the list, as a vector's are.
template <class T, class SlotOf = Orb_ChildSlot> class Orb_Range {
public:
  using value_type = T *;
  using size_type = std::size_t;
  using const_iterator = T *const *;
  using iterator = const_iterator;

  explicit Orb_Range(Orb_List<T, SlotOf> const &list) : m_pList(&list) {}

  std::size_t size() const { return m_pList->Size(); }
  bool empty() const { return size() == 0; }
  T *operator[](std::size_t i) const { return m_pList->At(i); }
  T *front() const { return (*this)[0]; }
  T *back() const { return (*this)[size() - 1]; }
  const_iterator begin() const { return m_pList->Data(); }
  const_iterator end() const { return begin() + size(); }
  // A copy of the elements, for a caller that changes the list while it
  // walks them. Implicit too, so that code written against vectors
  // (`std::vector<Orb_Pin *> pins = block->GetPins();`) still compiles.
  std::vector<T *> ToVector() const { return std::vector<T *>(begin(), end()); }
  operator std::vector<T *>() const { return ToVector(); } // NOLINT(google-explicit-constructor)

  friend bool operator==(Orb_Range const &a, std::vector<T *> const &b) {
    return a.size() == b.size() && std::equal(b.begin(), b.end(), a.begin());
  }
  friend bool operator==(std::vector<T *> const &a, Orb_Range const &b) { return b == a; }
  friend bool operator!=(Orb_Range const &a, std::vector<T *> const &b) { return !(a == b); }
  friend bool operator!=(std::vector<T *> const &a, Orb_Range const &b) { return !(b == a); }

private:
  Orb_List<T, SlotOf> const *m_pList;
};

// SlotOf: a stateless functor, `std::uint32_t &operator()(T *, void const
// *list) const`, giving the element's slot in that list.
//
// Two pointers: up to two elements sit in the list itself (most signals
// connect one or two pins, most lists of a netlist are that short); a longer
// list keeps its counts in a header before its array, and both pointers then
// point at that header (two equal elements never share a list).
template <class T, class SlotOf> class Orb_List {
public:
  Orb_List() = default;
  Orb_List(Orb_List const &) = delete;
  Orb_List &operator=(Orb_List const &) = delete;
  ~Orb_List() { ReleaseRaw(); }

  std::size_t Size() const {
    if (OnHeap())
      return Head()->count;
    return (m_Items[0] != nullptr) + (m_Items[1] != nullptr);
  }
  // The element at index `i` (< Size()) in host order.
  T *At(std::size_t i) const {
    if (!OnHeap())
      return i == 0 ? m_Items[0] : m_Items[1];
    Header const &h = *Head();
    if (h.start + i >= h.clean)
      Squeeze(h.start + i + 1);
    // Squeezing may have moved the front.
    return Raw()[h.start + i];
  }
  // The Size() elements in host order, holes squeezed out.
  T *const *Data() const {
    if (!OnHeap())
      return m_Items;
    Squeeze(Head()->size);
    return Raw() + Head()->start;
  }
  Orb_Range<T, SlotOf> Range() const { return Orb_Range<T, SlotOf>(*this); }

  // Room for `more` elements beyond what the list holds, growing
  // geometrically so that adding one at a time stays linear.
  void Reserve(std::size_t more) {
    if (RawSize() + more > Capacity())
      Reallocate(std::max(RawSize() + more, 2 * Capacity()));
  }
  // Room for exactly `more` elements beyond what the list holds, for a
  // reader that knows how many follow.
  void ReserveExact(std::size_t more) {
    if (RawSize() + more > Capacity())
      Reallocate(RawSize() + more);
  }
  // Appends. Throws std::bad_alloc and changes nothing when out of memory.
  void Add(T *item) {
    if (!OnHeap()) {
      std::uint32_t const slot = m_Items[0] ? 1 : 0;
      if (!m_Items[slot]) {
        m_Items[slot] = item;
        SlotOf()(item, this) = slot;
        return;
      }
      // A first array of four saves the step through three.
      Reallocate(4);
    }
    if (Head()->size == Head()->capacity)
      Reallocate(2 * std::size_t(Head()->capacity));
    Header &h = *Head();
    std::uint32_t const slot = h.size++;
    Raw()[slot] = item;
    SlotOf()(item, this) = slot;
    if (h.clean == slot && h.scan == slot)
      h.clean = h.scan = slot + 1;
    ++h.count;
  }
  // Removes an element of the list; O(1) amortised (see above). Never throws.
  void Remove(T *item) noexcept;
  // Forgets every element without touching them; keeps the room.
  void Clear() noexcept {
    if (OnHeap())
      Head()->size = Head()->start = Head()->clean = Head()->scan = Head()->count = 0;
    else
      m_Items[0] = m_Items[1] = nullptr;
  }
  // Sorts the elements with `less`, stably. A copy is sorted and put in
  // place only when the sort is done: a `less` that throws leaves the list
  // as it was.
  template <class Less> void StableSort(Less const &less) {
    if (!OnHeap()) {
      if (m_Items[1] && less(m_Items[1], m_Items[0])) {
        std::swap(m_Items[0], m_Items[1]);
        Renumber(0);
      }
      return;
    }
    Squeeze(Head()->size);
    std::vector<T *> sorted(Raw() + Head()->start, Raw() + Head()->size);
    std::stable_sort(sorted.begin(), sorted.end(), less);
    std::copy(sorted.begin(), sorted.end(), Raw() + Head()->start);
    Renumber(Head()->start);
  }
  // Approximate heap bytes the list holds.
  std::size_t Bytes() const { return OnHeap() ? ArrayBytes(Head()->capacity) : 0; }

private:
  // The counts of a list whose elements are in an array: the array has
  // `capacity` slots and follows the header. Slots [0, size): [0, start)
  // holes, [start, clean) elements, no holes, [clean, scan) holes, [scan,
  // size) elements and holes not yet squeezed. Holes are null.
  struct alignas(T *) Header {
    std::uint32_t capacity;
    std::uint32_t size;
    std::uint32_t start;
    std::uint32_t clean;
    std::uint32_t scan;
    std::uint32_t count;
  };
  static std::size_t ArrayBytes(std::size_t capacity) {
    return sizeof(Header) + capacity * sizeof(T *);
  }
  bool OnHeap() const { return m_Items[0] == m_Items[1] && m_Items[0]; }
  Header *Head() const { return reinterpret_cast<Header *>(m_Items[0]); }
  T **Raw() const { return reinterpret_cast<T **>(Head() + 1); }
  // Slots in use, holes included: in the list itself there are none.
  std::size_t RawSize() const { return OnHeap() ? Head()->size : Size(); }
  std::size_t Capacity() const { return OnHeap() ? Head()->capacity : 2; }
  void ReleaseRaw() noexcept {
    if (OnHeap())
      Orb_SmallRelease(Head(), ArrayBytes(Head()->capacity));
  }
  // Moves the slots to room for `capacity` (>= RawSize()) slots; the slots
  // keep their numbers. Room for two is the list itself.
  void Reallocate(std::size_t capacity) {
    if (capacity > UINT32_MAX)
      throw std::bad_alloc();
    if (capacity <= 2 && !OnHeap())
      return;
    auto *head = static_cast<Header *>(Orb_SmallAllocate(ArrayBytes(capacity)));
    auto **raw = reinterpret_cast<T **>(head + 1);
    if (OnHeap()) {
      *head = *Head();
      std::copy(Raw(), Raw() + head->size, raw);
      ReleaseRaw();
    } else {
      auto const n = static_cast<std::uint32_t>(Size());
      *head = Header{0, n, 0, n, n, n};
      std::copy(m_Items, m_Items + n, raw);
    }
    head->capacity = static_cast<std::uint32_t>(capacity);
    m_Items[0] = m_Items[1] = reinterpret_cast<T *>(head);
  }
  // Moves elements down over the holes until raw index `upTo` is clean.
  void Squeeze(std::size_t upTo) const noexcept;
  void Renumber(std::uint32_t from) const noexcept {
    T *const *items = OnHeap() ? Raw() : m_Items;
    for (std::uint32_t i = from, n = static_cast<std::uint32_t>(RawSize()); i < n; ++i)
      SlotOf()(items[i], this) = i;
  }

  // The elements (null where none), or twice the header of the array.
  T *m_Items[2] = {nullptr, nullptr};
};

template <class T, class SlotOf> void Orb_List<T, SlotOf>::Remove(T *item) noexcept {
  if (!OnHeap()) {
    assert((m_Items[0] == item || m_Items[1] == item) && "Orb_List::Remove: not an element");
    if (m_Items[0] == item) {
      m_Items[0] = m_Items[1];
      if (m_Items[0])
        SlotOf()(m_Items[0], this) = 0;
    }
    m_Items[1] = nullptr;
    return;
  }
  Header &h = *Head();
  std::uint32_t const p = SlotOf()(item, this);
  T **const raw = Raw();
  assert(p < h.size && raw[p] == item && "Orb_List::Remove: not an element");
  --h.count;
  raw[p] = nullptr;
  if (h.count == 0) {
    Clear();
    return;
  }
  if (p >= h.scan) {
    // In the part not yet squeezed: a hole is all it takes.
  } else if (p == h.start) {
    ++h.start;
  } else {
    // Inside the clean part: the clean elements after it move up against
    // the holes already gathered, so that holes stay in one run.
    std::uint32_t const gap = h.scan - h.clean;
    if (gap > 0) {
      for (std::uint32_t j = h.clean; j-- > p + 1;) {
        T *moved = raw[j];
        raw[j + gap] = moved;
        SlotOf()(moved, this) = j + gap;
      }
      std::fill(raw + p + 1, raw + std::min(h.clean, p + 1 + gap), nullptr);
    }
    h.clean = p;
    h.scan = p + 1 + gap;
  }
  // Trailing holes go.
  while (h.size > h.scan && !raw[h.size - 1])
    --h.size;
  if (h.scan == h.size)
    h.size = h.scan = h.clean;
}

template <class T, class SlotOf>
void Orb_List<T, SlotOf>::Squeeze(std::size_t upTo) const noexcept {
  Header &h = *Head();
  T **const raw = Raw();
  while (h.clean < upTo && h.scan < h.size) {
    T *item = raw[h.scan];
    if (item) {
      if (h.scan != h.clean) {
        raw[h.clean] = item;
        raw[h.scan] = nullptr;
        SlotOf()(item, this) = h.clean;
      }
      ++h.clean;
    }
    ++h.scan;
  }
  if (h.scan == h.size && h.size != h.clean)
    h.size = h.scan = h.clean;
  // Holes gathered at the front go once they are half the list.
  if (h.start > 0 && h.clean == h.size && h.start >= h.size / 2) {
    std::copy(raw + h.start, raw + h.size, raw);
    h.size -= h.start;
    h.start = 0;
    h.clean = h.scan = h.size;
    Renumber(0);
  }
}

// A name index over a named list: none while the list is small (a scan is
// cheaper), built when a lookup or an insertion finds the list large, kept
// up to date from then on. Open addressing with linear probing, up to 7/8
// full. Slots come seven to a 64-byte line: one byte of each slot's name hash
// (its tag), then the seven element pointers. A probe reads tags only, and
// the element (a likely cache miss in a large index) only when its tag
// matches: 1 in 254 for another name. Erasure leaves a tombstone tag, which
// probes pass over and insertions reuse; the next rebuild drops them.
template <class T> class Orb_NameIndex {
public:
  static constexpr std::size_t kScanLimit = 16;
  // From this many items on, Build sorts them before filling the table.
  static constexpr std::size_t kSortedFill = 4096;

  Orb_NameIndex() = default;
  Orb_NameIndex(Orb_NameIndex const &) = delete;
  Orb_NameIndex &operator=(Orb_NameIndex const &) = delete;
  ~Orb_NameIndex() { Free(m_pTable); }

  bool Built() const { return m_pTable != nullptr; }
  T *Find(std::string_view name) const;
  // Whether `more` insertions fit without a rebuild.
  bool HasRoom(std::size_t more) const {
    return m_pTable && m_pTable->used + more <= m_pTable->limit;
  }
  // Inserts unless an element of that name is there; returns that element,
  // or null when inserted. Needs HasRoom(1).
  T *Insert(T *item);
  void Erase(T *item) noexcept;
  // Indexes exactly `items` (of distinct names), with room for `count` names
  // in all. Throws std::bad_alloc and changes nothing when out of memory.
  template <class Items> void Rebuild(std::size_t count, Items const &items) {
    Build(count, items, false);
  }
  // Rebuild for items whose names are not known to differ: returns an item
  // whose name an earlier item has, and then changes nothing; else indexes
  // them and returns null.
  template <class Items> T *RebuildChecked(std::size_t count, Items const &items) {
    return Build(count, items, true);
  }
  // For kSortedFill items or more: an item whose name an earlier item has,
  // or null, building no index (one sorted pass over their hashes).
  template <class Items> static T *FindRepeated(Items const &items);
  void Clear() noexcept {
    Free(m_pTable);
    m_pTable = nullptr;
  }
  std::size_t Bytes() const {
    return m_pTable ? sizeof(Table) + m_pTable->slots / kGroupSlots * sizeof(Group) : 0;
  }

private:
  static constexpr std::size_t kGroupSlots = 7;
  static constexpr std::uint8_t kEmpty = 0;
  static constexpr std::uint8_t kTombstone = 1;
  struct alignas(64) Group {
    std::uint8_t tags[kGroupSlots + 1]; // The last is padding.
    T *items[kGroupSlots];
  };
  // One allocation: this header line, then the groups.
  struct alignas(64) Table {
    std::size_t slots;
    std::size_t limit; // Most slots used (elements and tombstones).
    std::size_t used;
    std::size_t count;
    Group *Groups() { return reinterpret_cast<Group *>(this + 1); }
    std::uint8_t &TagAt(std::size_t i) { return Groups()[i / kGroupSlots].tags[i % kGroupSlots]; }
    T *&ItemAt(std::size_t i) { return Groups()[i / kGroupSlots].items[i % kGroupSlots]; }
    std::size_t Next(std::size_t i) const { return i + 1 == slots ? 0 : i + 1; }
    // The home slot: the hash's low 32 bits scaled to the table.
    std::size_t Home(std::size_t hash) const {
      return static_cast<std::size_t>((std::uint64_t(std::uint32_t(hash)) * slots) >> 32);
    }
  };
  static_assert(sizeof(Group) == 64 && sizeof(Table) == 64, "one cache line each");

  static std::size_t Hash(std::string_view name) { return Orb_NameHash()(name); }
  // The top byte of the hash, kept clear of kEmpty and kTombstone.
  static std::uint8_t Tag(std::size_t hash) {
    auto const top = static_cast<std::uint8_t>(hash >> (8 * sizeof(std::size_t) - 8));
    return top > kTombstone ? top : static_cast<std::uint8_t>(top + 2);
  }
  template <class Items> T *Build(std::size_t count, Items const &items, bool check);
  // Fills a fresh table with `n` items whose hashes are known, in the order
  // given; returns a duplicate if `check` finds one.
  struct Hashed {
    std::size_t hash;
    T *item;
  };
  static T *Fill(Table &table, Hashed const *hashed, std::size_t n, bool sorted, bool check);
  // The items' hashes, sorted by home slot when they are many.
  template <class Items> static std::vector<Hashed> HashAll(Items const &items);
  // Whether item `k` of items sorted by home slot has the name of one
  // before it.
  static bool RepeatsEarlier(Hashed const *hashed, std::size_t k);
  static void Free(Table *table) noexcept {
    if (table)
      ::operator delete(table, std::align_val_t(alignof(Table)));
  }

  Table *m_pTable = nullptr;
};

template <class T> T *Orb_NameIndex<T>::Find(std::string_view name) const {
  if (!m_pTable)
    return nullptr;
  std::size_t const hash = Hash(name);
  std::uint8_t const tag = Tag(hash);
  Table &table = *m_pTable;
  for (std::size_t i = table.Home(hash);; i = table.Next(i)) {
    std::uint8_t const seen = table.TagAt(i);
    if (seen == kEmpty)
      return nullptr;
    if (seen == tag && table.ItemAt(i)->GetNameString() == name)
      return table.ItemAt(i);
  }
}

template <class T> T *Orb_NameIndex<T>::Insert(T *item) {
  assert(HasRoom(1) && "Orb_NameIndex::Insert: no room");
  std::string_view const name = item->GetNameString();
  std::size_t const hash = Hash(name);
  std::uint8_t const tag = Tag(hash);
  Table &table = *m_pTable;
  std::size_t to = table.slots;
  std::size_t i = table.Home(hash);
  for (;; i = table.Next(i)) {
    std::uint8_t const seen = table.TagAt(i);
    if (seen == kEmpty)
      break;
    if (seen == kTombstone) {
      if (to == table.slots)
        to = i;
    } else if (seen == tag && table.ItemAt(i)->GetNameString() == name) {
      return table.ItemAt(i);
    }
  }
  if (to == table.slots) {
    to = i;
    ++table.used;
  }
  table.TagAt(to) = tag;
  table.ItemAt(to) = item;
  ++table.count;
  return nullptr;
}

template <class T> void Orb_NameIndex<T>::Erase(T *item) noexcept {
  Table &table = *m_pTable;
  std::size_t i = table.Home(Hash(item->GetNameString()));
  while (table.ItemAt(i) != item) {
    assert(table.TagAt(i) != kEmpty && "Orb_NameIndex::Erase: not indexed");
    i = table.Next(i);
  }
  table.TagAt(i) = kTombstone;
  table.ItemAt(i) = nullptr;
  --table.count;
  // Tombstones right before an empty slot end no probe: they empty.
  if (table.TagAt(table.Next(i)) == kEmpty) {
    while (table.TagAt(i) == kTombstone) {
      table.TagAt(i) = kEmpty;
      --table.used;
      i = i == 0 ? table.slots - 1 : i - 1;
    }
  }
}

template <class T>
template <class Items>
std::vector<typename Orb_NameIndex<T>::Hashed> Orb_NameIndex<T>::HashAll(Items const &items) {
  std::size_t const n = items.size();
  std::vector<Hashed> hashed;
  hashed.reserve(n);
  for (T *item : items)
    hashed.push_back({Hash(item->GetNameString()), item});
  // Many items are sorted by their home slots, so that a table is filled
  // from front to back rather than at random: the home slot grows with the
  // hash's low 32 bits, and a stable radix sort on them (three passes of 11
  // bits) keeps items of one name in their given order.
  if (n >= kSortedFill) {
    std::vector<Hashed> other(n);
    for (unsigned shift = 0; shift < 33; shift += 11) {
      std::vector<std::size_t> start(std::size_t(1) << 11, 0);
      auto const digit = [shift](Hashed const &h) {
        return (std::uint32_t(h.hash) >> shift) & ((1u << 11) - 1);
      };
      for (Hashed const &h : hashed)
        ++start[digit(h)];
      std::size_t sum = 0;
      for (std::size_t &s : start)
        sum += std::exchange(s, sum);
      for (Hashed const &h : hashed)
        other[start[digit(h)]++] = h;
      hashed.swap(other);
    }
  }
  return hashed;
}

template <class T> template <class Items> T *Orb_NameIndex<T>::FindRepeated(Items const &items) {
  assert(items.size() >= kSortedFill && "Orb_NameIndex::FindRepeated: few items");
  std::vector<Hashed> const hashed = HashAll(items);
  for (std::size_t k = 1; k < hashed.size(); ++k)
    if (RepeatsEarlier(hashed.data(), k))
      return hashed[k].item;
  return nullptr;
}

template <class T> bool Orb_NameIndex<T>::RepeatsEarlier(Hashed const *hashed, std::size_t k) {
  // Items of one name share their sort key and keep their order.
  Hashed const &h = hashed[k];
  for (std::size_t j = k; j-- > 0 && std::uint32_t(hashed[j].hash) == std::uint32_t(h.hash);)
    if (hashed[j].hash == h.hash && hashed[j].item->GetNameString() == h.item->GetNameString())
      return true;
  return false;
}

template <class T>
template <class Items>
T *Orb_NameIndex<T>::Build(std::size_t count, Items const &items, bool check) {
  std::size_t const n = items.size();
  // Groups enough that `count` names fill at most 7/8 of the slots.
  std::size_t const groups = std::max<std::size_t>(1, (8 * std::max(count, n) + 48) / 49);
  std::vector<Hashed> const hashed = HashAll(items);
  void *block =
      ::operator new(sizeof(Table) + groups * sizeof(Group), std::align_val_t(alignof(Table)));
  auto *table = new (block) Table{groups * kGroupSlots, groups * kGroupSlots * 7 / 8, 0, 0};
  std::uninitialized_value_construct_n(table->Groups(), groups);
  if (T *duplicate = Fill(*table, hashed.data(), n, n >= kSortedFill, check)) {
    Free(table);
    return duplicate;
  }
  table->used = table->count = n;
  Free(m_pTable);
  m_pTable = table;
  return nullptr;
}

template <class T>
T *Orb_NameIndex<T>::Fill(Table &table, Hashed const *hashed, std::size_t n, bool sorted,
                          bool check) {
  std::size_t cursor = 0; // Sorted: one past the last slot filled.
  for (std::size_t k = 0; k < n; ++k) {
    Hashed const &h = hashed[k];
    std::size_t i = table.Home(h.hash);
    if (sorted) {
      if (check && RepeatsEarlier(hashed, k))
        return h.item;
      // Homes come in order: the slots from the last home to the cursor are
      // taken, those after it free. Past the end, probe on from the front.
      i = std::max(i, cursor);
      if (i < table.slots) {
        cursor = i + 1;
      } else {
        for (i = 0; table.TagAt(i) != kEmpty;)
          i = table.Next(i);
      }
    } else {
      for (; table.TagAt(i) != kEmpty; i = table.Next(i))
        if (check && table.TagAt(i) == Tag(h.hash) &&
            table.ItemAt(i)->GetNameString() == h.item->GetNameString())
          return h.item;
    }
    table.TagAt(i) = Tag(h.hash);
    table.ItemAt(i) = h.item;
  }
  return nullptr;
}

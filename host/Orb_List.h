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
#include "Orb_Pool.h"

#include <algorithm>
#include <cassert>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <memory>
#include <string_view>
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
template <class T, class SlotOf> class Orb_List {
public:
  Orb_List() = default;
  Orb_List(Orb_List const &) = delete;
  Orb_List &operator=(Orb_List const &) = delete;

  std::size_t Size() const { return m_Count; }
  // The element at index `i` (< Size()) in host order.
  T *At(std::size_t i) const {
    if (m_Start + i >= m_Clean)
      Squeeze(m_Start + i + 1);
    // Squeezing may have moved the front.
    return m_Raw[m_Start + i];
  }
  // The Size() elements in host order, holes squeezed out.
  T *const *Data() const {
    Squeeze(m_Raw.size());
    return m_Raw.data() + m_Start;
  }
  Orb_Range<T, SlotOf> Range() const { return Orb_Range<T, SlotOf>(*this); }

  // Room for `more` elements beyond what the list holds, growing
  // geometrically so that adding one at a time stays linear.
  void Reserve(std::size_t more) {
    if (m_Raw.size() + more > m_Raw.capacity())
      m_Raw.reserve(std::max(m_Raw.size() + more, 2 * m_Raw.capacity()));
  }
  // Room for exactly `more` elements beyond what the list holds, for a
  // reader that knows how many follow.
  void ReserveExact(std::size_t more) { m_Raw.reserve(m_Raw.size() + more); }
  // Appends. Throws std::bad_alloc and changes nothing when out of memory.
  void Add(T *item) {
    // A first room of four saves the steps through one and two.
    if (m_Raw.size() == m_Raw.capacity())
      m_Raw.reserve(m_Raw.empty() ? 4 : 2 * m_Raw.capacity());
    m_Raw.push_back(item);
    auto const slot = static_cast<std::uint32_t>(m_Raw.size() - 1);
    SlotOf()(item, this) = slot;
    if (m_Clean == slot && m_Scan == slot)
      m_Clean = m_Scan = slot + 1;
    ++m_Count;
  }
  // Removes an element of the list; O(1) amortised (see above). Never throws.
  void Remove(T *item) noexcept;
  // Forgets every element without touching them.
  void Clear() noexcept {
    m_Raw.clear();
    m_Start = m_Clean = m_Scan = m_Count = 0;
  }
  // Sorts the elements with `less`, stably.
  template <class Less> void StableSort(Less const &less) {
    Squeeze(m_Raw.size());
    std::stable_sort(m_Raw.begin() + m_Start, m_Raw.end(), less);
    Renumber(m_Start);
  }
  // Approximate heap bytes the list holds.
  std::size_t Bytes() const { return m_Raw.capacity() * sizeof(T *); }

private:
  // Moves elements down over the holes until raw index `upTo` is clean.
  void Squeeze(std::size_t upTo) const noexcept;
  void Renumber(std::size_t from) const noexcept {
    for (std::size_t i = from; i < m_Raw.size(); ++i)
      SlotOf()(m_Raw[i], this) = static_cast<std::uint32_t>(i);
  }

  // m_Raw[m_Start, m_Clean): elements, no holes. [m_Clean, m_Scan): holes.
  // [m_Scan, end): elements and holes not yet squeezed.
  mutable std::vector<T *, Orb_SmallAllocator<T *>> m_Raw;
  mutable std::uint32_t m_Start = 0;
  mutable std::uint32_t m_Clean = 0;
  mutable std::uint32_t m_Scan = 0;
  std::uint32_t m_Count = 0;
};

template <class T, class SlotOf> void Orb_List<T, SlotOf>::Remove(T *item) noexcept {
  std::uint32_t const p = SlotOf()(item, this);
  assert(p < m_Raw.size() && m_Raw[p] == item && "Orb_List::Remove: not an element");
  --m_Count;
  m_Raw[p] = nullptr;
  if (m_Count == 0) {
    Clear();
    return;
  }
  if (p >= m_Scan) {
    // In the part not yet squeezed: a hole is all it takes.
  } else if (p == m_Start) {
    ++m_Start;
  } else {
    // Inside the clean part: the clean elements after it move up against
    // the holes already gathered, so that holes stay in one run.
    std::uint32_t const gap = m_Scan - m_Clean;
    if (gap > 0) {
      for (std::uint32_t j = m_Clean; j-- > p + 1;) {
        T *moved = m_Raw[j];
        m_Raw[j + gap] = moved;
        SlotOf()(moved, this) = j + gap;
      }
      std::fill(m_Raw.begin() + p + 1, m_Raw.begin() + std::min(m_Clean, p + 1 + gap), nullptr);
    }
    m_Clean = p;
    m_Scan = p + 1 + gap;
  }
  // Trailing holes go.
  while (m_Raw.size() > m_Scan && !m_Raw.back())
    m_Raw.pop_back();
  if (m_Scan == m_Raw.size()) {
    m_Raw.resize(m_Clean);
    m_Scan = m_Clean;
  }
}

template <class T, class SlotOf>
void Orb_List<T, SlotOf>::Squeeze(std::size_t upTo) const noexcept {
  while (m_Clean < upTo && m_Scan < m_Raw.size()) {
    T *item = m_Raw[m_Scan];
    if (item) {
      if (m_Scan != m_Clean) {
        m_Raw[m_Clean] = item;
        m_Raw[m_Scan] = nullptr;
        SlotOf()(item, this) = m_Clean;
      }
      ++m_Clean;
    }
    ++m_Scan;
  }
  if (m_Scan == m_Raw.size() && m_Clean < m_Scan) {
    m_Raw.resize(m_Clean);
    m_Scan = m_Clean;
  }
  // Holes gathered at the front go once they are half the list.
  if (m_Start > 0 && m_Clean == m_Raw.size() && m_Start >= m_Raw.size() / 2) {
    m_Raw.erase(m_Raw.begin(), m_Raw.begin() + m_Start);
    m_Start = 0;
    m_Clean = m_Scan = static_cast<std::uint32_t>(m_Raw.size());
    Renumber(0);
  }
}

// A name index over a named list: none while the list is small (a scan is
// cheaper), built on the first lookup or insertion that finds the list
// large, kept up to date from then on. Open addressing with linear probing
// over element pointers, up to 7/8 full; each slot keeps 32 bits of its name's hash beside
// it, so that a probe reads the element (a likely cache miss in a large
// index) only when the hashes match.
template <class T> class Orb_NameIndex {
public:
  static constexpr std::size_t kScanLimit = 16;

  T *Find(std::string_view name) const {
    if (m_Slots.empty())
      return nullptr;
    std::size_t const hash = Hash(name);
    auto const tag = static_cast<std::uint32_t>(hash);
    std::size_t const mask = m_Slots.size() - 1;
    for (std::size_t i = hash & mask;; i = (i + 1) & mask) {
      T *item = m_Slots[i];
      if (!item || (m_Tags[i] == tag && item->GetNameString() == name))
        return item;
    }
  }
  // Inserts unless an element of that name is there; returns that element,
  // or null when inserted.
  T *Insert(T *item) {
    if ((m_Count + 1) * 8 > m_Slots.size() * 7)
      Grow();
    std::string_view const name = item->GetNameString();
    std::size_t const hash = Hash(name);
    auto const tag = static_cast<std::uint32_t>(hash);
    std::size_t const mask = m_Slots.size() - 1;
    for (std::size_t i = hash & mask;; i = (i + 1) & mask) {
      T *&slot = m_Slots[i];
      if (!slot) {
        slot = item;
        m_Tags[i] = tag;
        ++m_Count;
        return nullptr;
      }
      if (m_Tags[i] == tag && slot->GetNameString() == name)
        return slot;
    }
  }
  void Erase(T *item) noexcept;
  std::size_t Bytes() const {
    return m_Slots.capacity() * sizeof(T *) + m_Tags.capacity() * sizeof(std::uint32_t);
  }

private:
  static std::size_t Hash(std::string_view name) { return std::hash<std::string_view>()(name); }
  void Grow() {
    std::size_t const size = m_Slots.empty() ? 32 : m_Slots.size() * 2;
    std::vector<T *> slots(size, nullptr);
    std::vector<std::uint32_t> tags(size, 0);
    std::size_t const mask = size - 1;
    for (std::size_t j = 0; j < m_Slots.size(); ++j) {
      if (!m_Slots[j])
        continue;
      // The tag holds the low 32 bits of the hash, all a mask of a table
      // below 2^32 slots needs.
      std::size_t i = m_Tags[j] & mask;
      while (slots[i])
        i = (i + 1) & mask;
      slots[i] = m_Slots[j];
      tags[i] = m_Tags[j];
    }
    m_Slots.swap(slots);
    m_Tags.swap(tags);
  }

  std::vector<T *> m_Slots;
  std::vector<std::uint32_t> m_Tags;
  std::size_t m_Count = 0;
};

template <class T> void Orb_NameIndex<T>::Erase(T *item) noexcept {
  std::size_t const mask = m_Slots.size() - 1;
  std::size_t i = Hash(item->GetNameString()) & mask;
  while (m_Slots[i] != item) {
    assert(m_Slots[i] && "Orb_NameIndex::Erase: not indexed");
    i = (i + 1) & mask;
  }
  // Backward shift: entries after the hole whose probe passes it move in.
  for (std::size_t j = (i + 1) & mask; m_Slots[j]; j = (j + 1) & mask) {
    std::size_t const home = m_Tags[j] & mask;
    if (((j - home) & mask) >= ((j - i) & mask)) {
      m_Slots[i] = m_Slots[j];
      m_Tags[i] = m_Tags[j];
      i = j;
    }
  }
  m_Slots[i] = nullptr;
  --m_Count;
}

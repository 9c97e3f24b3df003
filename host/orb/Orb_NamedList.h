#pragma once

// Children of one kind under one parent, in host order and findable by name.

#include "Orb_List.h"
#include "Orb_Name.h"

#include <cstddef>
#include <string>
#include <string_view>

// Where a host object keeps its slot in its parent's container (Orb_Model.h).
struct Orb_ChildSlot;

// Children of one kind in host order (Orb_List: O(1) removal), with lookup
// by name: a scan while there are few, an index (Orb_NameIndex) once there
// are many.
template <class T> class Orb_NamedList {
public:
  Orb_NamedList() = default;
  Orb_NamedList(Orb_NamedList const &) = delete;
  Orb_NamedList &operator=(Orb_NamedList const &) = delete;

  Orb_Range<T> Items() const { return m_List.Range(); }
  std::size_t Size() const { return m_List.Size(); }
  // The child of that name, or null (also for a null name).
  T *Find(std::string_view name) const;
  T *Find(char const *name) const { return name ? Find(std::string_view(name)) : nullptr; }
  T *Find(std::string const &name) const { return Find(std::string_view(name)); }
  // Appends `item` unless a child has its name; then returns false and
  // changes nothing. One hash insertion for a large list.
  bool AddUnique(T *item);
  // Appends `item` without looking at names, for a reader that adds many
  // children and then checks them all at once with CheckNames: one sorted
  // pass instead of a hash insertion at a random place per child.
  void Append(T *item) {
    m_List.Add(item);
    m_Index.Clear();
  }
  // A child whose name an earlier child has, or null.
  T *CheckNames();
  void Remove(T *item) noexcept {
    if (m_Index.Built())
      m_Index.Erase(item);
    m_List.Remove(item);
    if (m_List.Size() == 0)
      m_Index.Clear();
  }
  // Forgets every child without touching them.
  void Clear() noexcept {
    m_List.Clear();
    m_Index.Clear();
  }
  // Room for `more` children beyond those held, in the list and, when they
  // make the list large, in the index: adding them rehashes nothing.
  void Reserve(std::size_t more);
  template <class Less> void StableSort(Less const &less) { m_List.StableSort(less); }

private:
  // Builds the index when the list has grown past a scan.
  void IndexIfLarge() const {
    if (!m_Index.Built() && m_List.Size() > Orb_NameIndex<T>::kScanLimit)
      m_Index.Rebuild(2 * m_List.Size(), m_List.Range());
  }

  Orb_List<T, Orb_ChildSlot> m_List;
  mutable Orb_NameIndex<T> m_Index;
};

template <class T> T *Orb_NamedList<T>::Find(std::string_view name) const {
  IndexIfLarge();
  if (m_Index.Built())
    return m_Index.Find(name);
  for (T *item : m_List.Range())
    if (item->GetNameString() == name)
      return item;
  return nullptr;
}

template <class T> bool Orb_NamedList<T>::AddUnique(T *item) {
  IndexIfLarge();
  if (!m_Index.Built()) {
    if (Find(item->GetNameString()))
      return false;
    m_List.Add(item);
    return true;
  }
  // Geometric growth keeps insertions amortised O(1).
  if (!m_Index.HasRoom(1))
    m_Index.Rebuild(2 * (m_List.Size() + 1), m_List.Range());
  if (m_Index.Insert(item))
    return false;
  try {
    m_List.Add(item);
  } catch (...) {
    m_Index.Erase(item);
    throw;
  }
  return true;
}

template <class T> T *Orb_NamedList<T>::CheckNames() {
  // A long list gets its index from the first lookup or insertion: a
  // netlist's top block is often read and walked but never searched by name.
  if (m_List.Size() >= Orb_NameIndex<T>::kSortedFill) {
    m_Index.Clear();
    return Orb_NameIndex<T>::FindRepeated(m_List.Range());
  }
  if (m_List.Size() > Orb_NameIndex<T>::kScanLimit)
    return m_Index.RebuildChecked(2 * m_List.Size(), m_List.Range());
  // Few: each name against those before it, each name read once.
  std::string_view names[Orb_NameIndex<T>::kScanLimit];
  auto const items = m_List.Range();
  for (std::size_t i = 0; i < items.size(); ++i) {
    names[i] = items[i]->GetNameString();
    for (std::size_t j = 0; j < i; ++j)
      if (names[j] == names[i])
        return items[i];
  }
  return nullptr;
}

template <class T> void Orb_NamedList<T>::Reserve(std::size_t more) {
  m_List.Reserve(more);
  if (m_List.Size() + more > Orb_NameIndex<T>::kScanLimit && !m_Index.HasRoom(more))
    m_Index.Rebuild(m_List.Size() + more, m_List.Range());
}

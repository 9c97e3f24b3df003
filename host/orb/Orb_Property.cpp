#include "Orb_Property.h"

#include "Orb_Debug.h"
#include "Orb_Hash.h"
#include "Orb_Pool.h"

#include <algorithm>
#include <atomic>
#include <limits>
#include <mutex>
#include <new>
#include <stdexcept>
#include <unordered_map>

static_assert(sizeof(void *) != 8 || sizeof(Orb_Property) == 24,
              "a property is a name pointer, a length, a kind and 11 value bytes");
static_assert(sizeof(void *) != 8 || sizeof(Orb_PropertyHolder) == 8, "a holder is one pointer");

namespace {

// Each distinct property name, stored once: a header and then the NUL-
// terminated name, from Orb_SmallAllocate. A property holds a pointer to
// the name, the header just before it.
struct NameHeader {
  std::atomic<std::size_t> refs;
  std::size_t size;
};

NameHeader *HeaderOf(char const *name) {
  return reinterpret_cast<NameHeader *>(const_cast<char *>(name) - sizeof(NameHeader));
}

class NameTable {
public:
  // The stored name equal to `name`, counted once more.
  char const *Acquire(std::string_view name) {
    std::lock_guard<std::mutex> const lock(m_Mutex);
    auto found = m_Names.find(name);
    if (found != m_Names.end()) {
      HeaderOf(found->second)->refs.fetch_add(1, std::memory_order_relaxed);
      return found->second;
    }
    std::size_t const bytes = sizeof(NameHeader) + name.size() + 1;
    void *memory = Orb_SmallAllocate(bytes);
    auto *header = new (memory) NameHeader{{1}, name.size()};
    char *text = reinterpret_cast<char *>(header + 1);
    std::memcpy(text, name.data(), name.size());
    text[name.size()] = '\0';
    try {
      m_Names.emplace(std::string_view(text, name.size()), text);
    } catch (...) {
      Orb_SmallRelease(memory, bytes);
      throw;
    }
    return text;
  }

  // One more count of a name the caller already holds counted: no lookup.
  static char const *Share(char const *name) {
    HeaderOf(name)->refs.fetch_add(1, std::memory_order_relaxed);
    return name;
  }

  // One count less; the last frees the name. Only the last count needs
  // the lock, which keeps a lookup from reviving a name being freed.
  void Release(char const *name) noexcept {
    NameHeader *header = HeaderOf(name);
    std::size_t refs = header->refs.load(std::memory_order_relaxed);
    while (refs > 1)
      if (header->refs.compare_exchange_weak(refs, refs - 1, std::memory_order_acq_rel))
        return;
    std::lock_guard<std::mutex> const lock(m_Mutex);
    if (header->refs.fetch_sub(1, std::memory_order_acq_rel) != 1)
      return;
    std::size_t const size = header->size;
    m_Names.erase(std::string_view(name, size));
    header->~NameHeader();
    Orb_SmallRelease(header, sizeof(NameHeader) + size + 1);
  }

  std::size_t Count() {
    std::lock_guard<std::mutex> const lock(m_Mutex);
    return m_Names.size();
  }

private:
  std::mutex m_Mutex;
  std::unordered_map<std::string_view, char const *, Orb_NameHash> m_Names;
};

// Never destroyed: properties of static objects may outlive any static here.
NameTable &Names() {
  static auto *table = new NameTable;
  return *table;
}

} // namespace

Orb_Property::Orb_Property(Kind kind, char const *name, std::string_view value)
    : m_pName(Names().Acquire(name ? name : "")), m_Kind(static_cast<std::uint8_t>(kind)) {
  try {
    SetStringValue(value);
  } catch (...) {
    Names().Release(m_pName);
    throw;
  }
}

Orb_Property::Orb_Property(Kind kind, Orb_Property const &named, std::string_view value)
    : m_pName(NameTable::Share(named.m_pName)), m_Kind(static_cast<std::uint8_t>(kind)) {
  try {
    SetStringValue(value);
  } catch (...) {
    Names().Release(m_pName);
    throw;
  }
}

Orb_Property::~Orb_Property() {
  if (HasLists())
    delete Far();
  else
    ReleaseValue();
  Names().Release(m_pName);
}

// NOLINTNEXTLINE(misc-new-delete-overloads): matched by the sized delete
void *Orb_Property::operator new(std::size_t size) { return Orb_SmallAllocate(size); }

void Orb_Property::operator delete(void *pointer, std::size_t size) noexcept {
  Orb_SmallRelease(pointer, size);
}

std::size_t Orb_Property::GetNameCount() { return Names().Count(); }

void Orb_Property::ReleaseValue() noexcept {
  if (IsLong())
    Orb_SmallRelease(Far<char>(), m_Size + std::size_t(1));
  m_Size = 0;
  m_Bytes[0] = '\0';
}

void Orb_Property::SetStringValue(std::string_view value) {
  if (HasLists()) {
    Far()->value.assign(value.data(), value.size());
    return;
  }
  if (value.size() >= std::numeric_limits<std::uint32_t>::max())
    throw std::length_error("property value too long");
  // `value` may lie in this property's own bytes: it is copied before they
  // are freed or overwritten.
  char *old = IsLong() ? Far<char>() : nullptr;
  std::size_t const oldSize = m_Size;
  if (value.size() > kSmallValue) {
    char *bytes = static_cast<char *>(Orb_SmallAllocate(value.size() + 1));
    std::memcpy(bytes, value.data(), value.size());
    bytes[value.size()] = '\0';
    SetFar(bytes);
  } else {
    if (!value.empty())
      std::memmove(m_Bytes, value.data(), value.size());
    m_Bytes[value.size()] = '\0';
  }
  m_Size = static_cast<std::uint32_t>(value.size());
  if (old)
    Orb_SmallRelease(old, oldSize + 1);
}

Orb_Property::ListData const &Orb_Property::NoLists() {
  static ListData const none;
  return none;
}

Orb_Property::ListData &Orb_Property::Lists() {
  if (!HasLists()) {
    // The value moves into the list data, where it stays readable.
    auto lists = std::make_unique<ListData>();
    lists->value.assign(Bytes(), m_Size);
    ReleaseValue();
    SetFar(lists.release());
    m_Kind |= kHasLists;
  }
  return *Far();
}

Orb_Property *Orb_Property::CreatePropertyString(char const *name, char const *value) {
  auto &members = Lists().members;
  members.push_back(std::make_unique<Orb_Property>(STRING, name, value ? value : ""));
  return members.back().get();
}

// ---------------------------------------------------------------------------
// Holder

Orb_PropertyHolder::~Orb_PropertyHolder() {
  if (!m_pArray)
    return;
  Orb_Property **entries = Entries(m_pArray);
  for (std::uint32_t i = 0; i < m_pArray->count; ++i)
    delete entries[i];
  Orb_SmallRelease(m_pArray, ArrayBytes(m_pArray->capacity));
}

namespace {

// Adds position `at` of `entries` to an index of `slots` slots (a power of
// two), probing linearly from the name's hash.
void IndexAdd(std::uint32_t *index, std::size_t slots, Orb_Property *const *entries,
              std::uint32_t at) {
  std::size_t i = Orb_HashName(entries[at]->GetName()) & (slots - 1);
  while (index[i] != 0)
    i = (i + 1) & (slots - 1);
  index[i] = at + 1;
}

// Takes position `at` out of the index, moving later entries of its probe
// run back into the hole where their home allows.
void IndexRemove(std::uint32_t *index, std::size_t slots, Orb_Property *const *entries,
                 std::uint32_t at) {
  std::size_t const mask = slots - 1;
  std::size_t i = Orb_HashName(entries[at]->GetName()) & mask;
  while (index[i] != at + 1)
    i = (i + 1) & mask;
  for (std::size_t j = (i + 1) & mask; index[j] != 0; j = (j + 1) & mask) {
    std::size_t const home = Orb_HashName(entries[index[j] - 1]->GetName()) & mask;
    if (((j - home) & mask) >= ((j - i) & mask)) {
      index[i] = index[j];
      i = j;
    }
  }
  index[i] = 0;
}

} // namespace

void Orb_PropertyHolder::Reindex(Array *array) noexcept {
  std::size_t const slots = IndexSlots(array->capacity);
  if (slots == 0)
    return;
  std::uint32_t *index = Index(array);
  std::fill(index, index + slots, 0);
  for (std::uint32_t at = 0; at < array->count; ++at)
    IndexAdd(index, slots, Entries(array), at);
}

std::size_t Orb_PropertyHolder::Find(char const *name) const {
  if (!m_pArray)
    return 0;
  Orb_Property *const *entries = Entries(m_pArray);
  std::size_t const slots = IndexSlots(m_pArray->capacity);
  if (slots == 0) {
    std::size_t at = 0;
    while (at < m_pArray->count && std::strcmp(entries[at]->GetName(), name) != 0)
      ++at;
    return at;
  }
  std::uint32_t const *index = Index(m_pArray);
  for (std::size_t i = Orb_HashName(name) & (slots - 1); index[i] != 0; i = (i + 1) & (slots - 1))
    if (std::strcmp(entries[index[i] - 1]->GetName(), name) == 0)
      return index[i] - 1;
  return m_pArray->count;
}

Orb_Property *Orb_PropertyHolder::GetPropertyByName(char const *name) const {
  if (!name || !m_pArray)
    return nullptr;
  std::size_t const at = Find(name);
  return at < m_pArray->count ? Entries(m_pArray)[at] : nullptr;
}

Orb_Property *Orb_PropertyHolder::Insert(std::unique_ptr<Orb_Property> property) {
  std::uint32_t const count = m_pArray ? m_pArray->count : 0;
  std::size_t const at = Find(property->GetName());
  if (at < count) {
    Orb_Property *&entry = Entries(m_pArray)[at];
    std::unique_ptr<Orb_Property> const old(entry);
    entry = property.release();
    return entry;
  }
  if (!m_pArray || count == m_pArray->capacity) {
    if (count > UINT32_MAX / 4)
      throw std::length_error("too many properties on one object");
    std::uint32_t const capacity = count ? count * 2 : 1;
    std::size_t const bytes = ArrayBytes(capacity);
    auto *grown = new (Orb_SmallAllocate(bytes)) Array{count, capacity};
    if (m_pArray) {
      std::copy(Entries(m_pArray), Entries(m_pArray) + count, Entries(grown));
      Orb_SmallRelease(m_pArray, ArrayBytes(m_pArray->capacity));
    }
    m_pArray = grown;
    Reindex(m_pArray);
  }
  Orb_Property *added = property.release();
  Entries(m_pArray)[m_pArray->count] = added;
  if (std::size_t const slots = IndexSlots(m_pArray->capacity))
    IndexAdd(Index(m_pArray), slots, Entries(m_pArray), m_pArray->count);
  ++m_pArray->count;
  return added;
}

void Orb_PropertyHolder::Erase(std::size_t index) noexcept {
  Orb_Property **entries = Entries(m_pArray);
  std::size_t const slots = IndexSlots(m_pArray->capacity);
  bool const last = index + 1 == m_pArray->count;
  if (slots != 0 && last)
    IndexRemove(Index(m_pArray), slots, entries, static_cast<std::uint32_t>(index));
  delete entries[index];
  std::copy(entries + index + 1, entries + m_pArray->count, entries + index);
  // The last property gone, the object is back to one null pointer.
  if (--m_pArray->count == 0) {
    Orb_SmallRelease(m_pArray, ArrayBytes(m_pArray->capacity));
    m_pArray = nullptr;
    return;
  }
  // Positions after it moved down: made afresh, linear like the move.
  if (slots != 0 && !last)
    Reindex(m_pArray);
}

Orb_Property *Orb_PropertyHolder::CreatePropertyString(char const *name, char const *value) {
  return Insert(std::make_unique<Orb_Property>(Orb_Property::STRING, name, value ? value : ""));
}

Orb_Property *Orb_PropertyHolder::CreatePropertyStringList(char const *name) {
  return Insert(std::make_unique<Orb_Property>(Orb_Property::STRING_LIST, name));
}

Orb_Property *Orb_PropertyHolder::CreatePropertyList(char const *name) {
  return Insert(std::make_unique<Orb_Property>(Orb_Property::LIST, name));
}

void Orb_PropertyHolder::DeleteProperty(char const *name) {
  if (!name || !m_pArray)
    return;
  std::size_t const at = Find(name);
  if (at < m_pArray->count)
    Erase(at);
}

void Orb_PropertyHolder::DeleteProperty(Orb_Property *property) {
  Range const properties = GetProperties();
  for (std::size_t i = 0; i < properties.size(); ++i) {
    if (properties[i] == property) {
      Erase(i);
      return;
    }
  }
}

void Orb_PropertyHolder::CopyPropertiesFrom(Orb_PropertyHolder const &other) {
  // Onto itself, replacing a list would empty the very list being copied.
  if (&other == this)
    return;
  // Copies share the stored names of their sources.
  for (Orb_Property const *source : other.GetProperties()) {
    Orb_Property::Kind const kind = source->GetKind();
    std::unique_ptr<Orb_Property> copy(new Orb_Property(
        kind, *source, kind == Orb_Property::STRING ? source->GetValue() : std::string_view()));
    if (kind == Orb_Property::STRING_LIST)
      for (auto const &value : source->GetStrings())
        copy->AppendString(value);
    if (kind == Orb_Property::LIST) {
      auto &members = copy->Lists().members;
      members.reserve(source->GetMembers().size());
      for (auto const &member : source->GetMembers()) {
        std::unique_ptr<Orb_Property> copied(
            new Orb_Property(Orb_Property::STRING, *member, member->GetValue()));
        members.push_back(std::move(copied));
      }
    }
    Insert(std::move(copy));
  }
}

void Orb_PropertyHolder::DumpProperties(Port::Stream *stream, int indent) const {
  for (Orb_Property const *property : GetProperties()) {
    switch (property->GetKind()) {
    case Orb_Property::STRING:
      Orb_Debug::Printf(stream, indent, "%s = <%s>\n", property->GetName(),
                        property->GetStringValue());
      break;
    case Orb_Property::STRING_LIST:
      Orb_Debug::Printf(stream, indent, "%s (string list):\n", property->GetName());
      for (auto const &value : property->GetStrings())
        Orb_Debug::Printf(stream, indent + 1, "<%s>\n", value.c_str());
      break;
    case Orb_Property::LIST:
      Orb_Debug::Printf(stream, indent, "%s (list):\n", property->GetName());
      for (auto const &member : property->GetMembers())
        Orb_Debug::Printf(stream, indent + 1, "%s = <%s>\n", member->GetName(),
                          member->GetStringValue());
      break;
    }
  }
}

#pragma once

#include "Lum_PlatformApi.h"

#include <cstddef>
#include <cstdint>
#include <cstring>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

namespace Port {
class Stream;
}

// A named property of a host object: a string, a list of strings, or a list
// of named string members.
//
// Values are arbitrary bytes. A NUL byte, which only the length-carrying
// setters (SetStringValue, AppendString) can put in, is a byte like any
// other: it is copied, saved and read back, and GetValue and GetStrings give
// every byte; GetStringValue, a C string, ends at the first NUL. Names are C
// strings and so never hold NUL; a design database with a NUL in any name is
// refused as corrupt.
//
// Millions of objects carry a property, mostly one short string under a name
// that many others share, so a property is kept to 24 bytes: the name is
// stored once per distinct name in a process-wide table, counted by the
// properties that use it and freed with the last; a value of up to
// kSmallValue bytes is stored inside the property, a longer one in a block
// of its own; the entries and members of lists hang off one pointer.
class LUM_PLATFORM_API Orb_Property {
public:
  enum Kind { STRING, STRING_LIST, LIST };

  Orb_Property(Kind kind, char const *name, std::string_view value = std::string_view());
  Orb_Property(Orb_Property const &) = delete;
  Orb_Property &operator=(Orb_Property const &) = delete;
  ~Orb_Property();

  // Properties are many and small: they come from Orb_SmallAllocate.
  // The matching delete is the sized one below, so that the size class is known.
  static void *operator new(std::size_t size); // NOLINT(misc-new-delete-overloads)
  static void operator delete(void *pointer, std::size_t size) noexcept;

  Kind GetKind() const { return static_cast<Kind>(m_Kind & kKindMask); }
  char const *GetName() const { return m_pName; }

  // String: the value, replaced in place by SetStringValue.
  char const *GetStringValue() const { return HasLists() ? Far()->value.c_str() : Bytes(); }
  std::string_view GetValue() const {
    return HasLists() ? std::string_view(Far()->value) : std::string_view(Bytes(), m_Size);
  }
  void SetStringValue(std::string_view value);

  // String list: read, cleared and appended to in order.
  std::vector<std::string> const &GetStrings() const {
    return HasLists() ? Far()->strings : NoLists().strings;
  }
  void ClearStrings() {
    if (HasLists())
      Far()->strings.clear();
  }
  void AppendString(std::string value) { Lists().strings.push_back(std::move(value)); }

  // List: appends a string member (names may repeat) and returns it.
  Orb_Property *CreatePropertyString(char const *name, char const *value);
  std::vector<std::unique_ptr<Orb_Property>> const &GetMembers() const {
    return HasLists() ? Far()->members : NoLists().members;
  }

  // Distinct property names in use in the process.
  static std::size_t GetNameCount();

  // Values up to this many bytes are stored in the property itself.
  static constexpr std::size_t kSmallValue = 10;

private:
  friend class Orb_PropertyHolder;

  // A property of the same name as `named`, sharing its stored name.
  Orb_Property(Kind kind, Orb_Property const &named, std::string_view value);

  // The entries of a string list or the members of a list; a value set on
  // a property that has them lives here too. Null for a string property,
  // the common kind, which so costs nothing for them.
  struct ListData {
    std::string value;
    std::vector<std::string> strings;
    std::vector<std::unique_ptr<Orb_Property>> members;
  };
  static ListData const &NoLists();
  ListData &Lists();

  static constexpr std::uint8_t kKindMask = 3;
  static constexpr std::uint8_t kHasLists = 4;
  // Where the pointer to a long value or to the list data sits in m_Bytes:
  // the pointer-aligned end of the property.
  static constexpr std::size_t kFar = 3;

  bool HasLists() const { return (m_Kind & kHasLists) != 0; }
  bool IsLong() const { return m_Size > kSmallValue; }
  template <class T = ListData> T *Far() const {
    void *pointer = nullptr;
    std::memcpy(&pointer, m_Bytes + kFar, sizeof(void *));
    return static_cast<T *>(pointer);
  }
  void SetFar(void *pointer) { std::memcpy(m_Bytes + kFar, &pointer, sizeof(void *)); }
  char const *Bytes() const { return IsLong() ? Far<char>() : m_Bytes; }
  void ReleaseValue() noexcept;

  // The stored name, shared by every property of that name.
  char const *m_pName;
  // Value length while there is no list data.
  std::uint32_t m_Size = 0;
  // Kind, and kHasLists.
  std::uint8_t m_Kind;
  // A short value and its NUL; or, at kFar, the long value (m_Size + 1
  // bytes, NUL-terminated) or the list data.
  char m_Bytes[kSmallValue + 1] = {};
};

// The properties of one host object, in creation order. Names are unique:
// creating a property of an existing name replaces it at its place.
class LUM_PLATFORM_API Orb_PropertyHolder {
public:
  // The properties in order, valid until the next change of the holder.
  class Range {
  public:
    Range(Orb_Property *const *begin, std::size_t size) : m_pBegin(begin), m_Size(size) {}
    Orb_Property *const *begin() const { return m_pBegin; }
    Orb_Property *const *end() const { return m_pBegin + m_Size; }
    std::size_t size() const { return m_Size; }
    bool empty() const { return m_Size == 0; }
    Orb_Property *operator[](std::size_t index) const { return m_pBegin[index]; }

  private:
    Orb_Property *const *m_pBegin;
    std::size_t m_Size;
  };

  Orb_PropertyHolder() = default;
  Orb_PropertyHolder(Orb_PropertyHolder const &) = delete;
  Orb_PropertyHolder &operator=(Orb_PropertyHolder const &) = delete;
  ~Orb_PropertyHolder();

  // The property of that name, or null.
  Orb_Property *GetPropertyByName(char const *name) const;

  Orb_Property *CreatePropertyString(char const *name, char const *value);
  Orb_Property *CreatePropertyStringList(char const *name);
  Orb_Property *CreatePropertyList(char const *name);

  // Deleting an absent property does nothing. The pointer form accepts only
  // a property of this holder and otherwise does nothing.
  void DeleteProperty(char const *name);
  void DeleteProperty(Orb_Property *property);

  Range GetProperties() const {
    return m_pArray ? Range(Entries(m_pArray), m_pArray->count) : Range(nullptr, 0);
  }

  // Prints every property through the debug printer, one per line (list
  // entries and members indented one level deeper).
  void DumpProperties(Port::Stream *stream, int indent) const;

  // Copies every property of `other` onto this holder, replacing those of the
  // same names.
  void CopyPropertiesFrom(Orb_PropertyHolder const &other);

private:
  // One small block: this header, then `capacity` property pointers of
  // which the first `count` are in use. From kIndexFrom pointers on, a name
  // index follows them: IndexSlots(capacity) slots, open addressing by the
  // name's hash, each 0 (free) or a position plus one.
  struct Array {
    std::uint32_t count;
    std::uint32_t capacity;
  };
  static constexpr std::uint32_t kIndexFrom = 16;
  static std::size_t IndexSlots(std::size_t capacity) {
    return capacity < kIndexFrom ? 0 : 2 * capacity;
  }
  static std::size_t ArrayBytes(std::size_t capacity) {
    return sizeof(Array) + capacity * sizeof(void *) + IndexSlots(capacity) * sizeof(std::uint32_t);
  }
  static Orb_Property **Entries(Array *array) {
    return reinterpret_cast<Orb_Property **>(array + 1);
  }
  static std::uint32_t *Index(Array *array) {
    return reinterpret_cast<std::uint32_t *>(Entries(array) + array->capacity);
  }
  // The index over the array's entries, made afresh.
  static void Reindex(Array *array) noexcept;
  // The position of the property of that name, or `count` when none.
  std::size_t Find(char const *name) const;
  Orb_Property *Insert(std::unique_ptr<Orb_Property> property);
  void Erase(std::size_t index) noexcept;

  // Null while the object has no property: most objects have none.
  Array *m_pArray = nullptr;
};

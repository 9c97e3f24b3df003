#pragma once

#include "Lum_PlatformApi.h"

#include <cstddef>
#include <memory>
#include <string>
#include <vector>

namespace Port {
class Stream;
}

// A named property of a host object: a string, a list of strings, or a list
// of named string members.
//
// Values are arbitrary bytes. A NUL byte, which only the std::string setters
// (SetStringValue, AppendString) can put in, is a byte like any other: it is
// copied, saved and read back, and GetValue and GetStrings give every byte;
// GetStringValue, a C string, ends at the first NUL. Names are C strings and
// so never hold NUL; a design database with a NUL in any name is refused as
// corrupt.
class LUM_PLATFORM_API Orb_Property {
public:
  enum Kind { STRING, STRING_LIST, LIST };

  Orb_Property(Kind kind, std::string name, std::string value = std::string());
  Orb_Property(Orb_Property const &) = delete;
  Orb_Property &operator=(Orb_Property const &) = delete;
  ~Orb_Property();

  // Properties are many and small: they come from Orb_SmallAllocate.
  // The matching delete is the sized one below, so that the size class is known.
  static void *operator new(std::size_t size); // NOLINT(misc-new-delete-overloads)
  static void operator delete(void *pointer, std::size_t size) noexcept;

  Kind GetKind() const { return m_Kind; }
  char const *GetName() const { return m_Name.c_str(); }

  // String: the value, replaced in place by SetStringValue.
  char const *GetStringValue() const { return m_Value.c_str(); }
  std::string const &GetValue() const { return m_Value; }
  void SetStringValue(std::string value) { m_Value = std::move(value); }

  // String list: read, cleared and appended to in order.
  std::vector<std::string> const &GetStrings() const {
    return m_pLists ? m_pLists->strings : NoLists().strings;
  }
  void ClearStrings() {
    if (m_pLists)
      m_pLists->strings.clear();
  }
  void AppendString(std::string value) { Lists().strings.push_back(std::move(value)); }

  // List: appends a string member (names may repeat) and returns it.
  Orb_Property *CreatePropertyString(char const *name, char const *value);
  std::vector<std::unique_ptr<Orb_Property>> const &GetMembers() const {
    return m_pLists ? m_pLists->members : NoLists().members;
  }

private:
  Kind m_Kind;
  std::string m_Name;
  std::string m_Value;
  // The entries of a string list or the members of a list; null for a
  // string property, the common kind, which so costs one pointer for them.
  struct ListData {
    std::vector<std::string> strings;
    std::vector<std::unique_ptr<Orb_Property>> members;
  };
  static ListData const &NoLists();
  ListData &Lists();
  std::unique_ptr<ListData> m_pLists;
};

// The properties of one host object, in creation order. Names are unique:
// creating a property of an existing name replaces it at its place.
class LUM_PLATFORM_API Orb_PropertyHolder {
public:
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

  std::vector<std::unique_ptr<Orb_Property>> const &GetProperties() const {
    return m_pProperties ? *m_pProperties : NoProperties();
  }

  // Prints every property through the debug printer, one per line (list
  // entries and members indented one level deeper).
  void DumpProperties(Port::Stream *stream, int indent) const;

  // Copies every property of `other` onto this holder, replacing those of the
  // same names.
  void CopyPropertiesFrom(Orb_PropertyHolder const &other);

private:
  using Properties = std::vector<std::unique_ptr<Orb_Property>>;
  static Properties const &NoProperties();
  Orb_Property *Insert(std::unique_ptr<Orb_Property> property);

  // Null while the object has no property: most objects have none, and a
  // pointer costs a third of an empty vector.
  std::unique_ptr<Properties> m_pProperties;
};

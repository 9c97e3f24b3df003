#include "Orb_Property.h"

#include "Orb_Debug.h"
#include "Orb_Pool.h"

#include <algorithm>
#include <string_view>

Orb_Property::Orb_Property(Kind kind, std::string name, std::string value)
    : m_Kind(kind), m_Name(std::move(name)), m_Value(std::move(value)) {}

Orb_Property::~Orb_Property() = default;

// NOLINTNEXTLINE(misc-new-delete-overloads): matched by the sized delete
void *Orb_Property::operator new(std::size_t size) { return Orb_SmallAllocate(size); }

void Orb_Property::operator delete(void *pointer, std::size_t size) noexcept {
  Orb_SmallRelease(pointer, size);
}

Orb_Property::ListData const &Orb_Property::NoLists() {
  static ListData const none;
  return none;
}

Orb_Property::ListData &Orb_Property::Lists() {
  if (!m_pLists)
    m_pLists = std::make_unique<ListData>();
  return *m_pLists;
}

Orb_Property *Orb_Property::CreatePropertyString(char const *name, char const *value) {
  auto &members = Lists().members;
  members.push_back(std::make_unique<Orb_Property>(STRING, name ? name : "", value ? value : ""));
  return members.back().get();
}

Orb_PropertyHolder::~Orb_PropertyHolder() = default;

Orb_PropertyHolder::Properties const &Orb_PropertyHolder::NoProperties() {
  static Properties const none;
  return none;
}

Orb_Property *Orb_PropertyHolder::GetPropertyByName(char const *name) const {
  if (!name)
    return nullptr;
  for (auto const &property : GetProperties())
    if (std::string_view(property->GetName()) == name)
      return property.get();
  return nullptr;
}

Orb_Property *Orb_PropertyHolder::Insert(std::unique_ptr<Orb_Property> property) {
  if (!m_pProperties)
    m_pProperties = std::make_unique<Properties>();
  for (auto &existing : *m_pProperties) {
    if (std::string_view(existing->GetName()) == property->GetName()) {
      existing = std::move(property);
      return existing.get();
    }
  }
  m_pProperties->push_back(std::move(property));
  return m_pProperties->back().get();
}

Orb_Property *Orb_PropertyHolder::CreatePropertyString(char const *name, char const *value) {
  return Insert(
      std::make_unique<Orb_Property>(Orb_Property::STRING, name ? name : "", value ? value : ""));
}

Orb_Property *Orb_PropertyHolder::CreatePropertyStringList(char const *name) {
  return Insert(std::make_unique<Orb_Property>(Orb_Property::STRING_LIST, name ? name : ""));
}

Orb_Property *Orb_PropertyHolder::CreatePropertyList(char const *name) {
  return Insert(std::make_unique<Orb_Property>(Orb_Property::LIST, name ? name : ""));
}

void Orb_PropertyHolder::DeleteProperty(char const *name) {
  if (!name)
    return;
  if (!m_pProperties)
    return;
  auto it = std::find_if(m_pProperties->begin(), m_pProperties->end(),
                         [name](auto const &p) { return std::string_view(p->GetName()) == name; });
  if (it != m_pProperties->end())
    m_pProperties->erase(it);
}

void Orb_PropertyHolder::DeleteProperty(Orb_Property *property) {
  if (!m_pProperties)
    return;
  auto it = std::find_if(m_pProperties->begin(), m_pProperties->end(),
                         [property](auto const &p) { return p.get() == property; });
  if (it != m_pProperties->end())
    m_pProperties->erase(it);
}

void Orb_PropertyHolder::CopyPropertiesFrom(Orb_PropertyHolder const &other) {
  // Onto itself, replacing a list would empty the very list being copied.
  if (&other == this)
    return;
  for (auto const &source : other.GetProperties()) {
    Orb_Property *copy = nullptr;
    switch (source->GetKind()) {
    case Orb_Property::STRING:
      // Whole values: GetStringValue would stop at a NUL byte.
      Insert(std::make_unique<Orb_Property>(Orb_Property::STRING, source->GetName(),
                                            source->GetValue()));
      break;
    case Orb_Property::STRING_LIST:
      copy = CreatePropertyStringList(source->GetName());
      for (auto const &value : source->GetStrings())
        copy->AppendString(value);
      break;
    case Orb_Property::LIST:
      copy = CreatePropertyList(source->GetName());
      for (auto const &member : source->GetMembers())
        copy->CreatePropertyString(member->GetName(), "")->SetStringValue(member->GetValue());
      break;
    }
  }
}

void Orb_PropertyHolder::DumpProperties(Port::Stream *stream, int indent) const {
  for (auto const &property : GetProperties()) {
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

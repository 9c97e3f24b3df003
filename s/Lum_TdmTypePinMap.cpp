#include "Lum_TdmTypePinMap.h"

#include "Lum_TdmDbg.h"
#include "Lum_TdmPin.h"

#include "Lum_Exception.h"

#include <cstdint>
#include <string>
#include <string_view>
#include <utility>

namespace {

char const kSourcePath[] = "../s/Lum_TdmTypePinMap";
char const kRevision[] = "$Revision: 1.1 $";

// The name of a design pin handed to the map; a null pin is the caller's
// error, reported rather than dereferenced.
std::string_view DesignPinName(Lum_TdmPin const *designPin, int line) {
  if (!designPin)
    throw Lum_ExceptionInvalidTypeBlock("Lum", kSourcePath, kRevision, line, "",
                                        "Null design pin specified for a type pin map.", false);
  return designPin->GetOrbPin()->GetNameString();
}

} // namespace

Lum_TdmTypePinMap::Lum_TdmTypePinMap() : m_IsDefault(false) {}

Lum_TdmTypePinMap::Lum_TdmTypePinMap(Lum_TdmTypePinMap const &other) = default;

Lum_TdmTypePinMap &Lum_TdmTypePinMap::operator=(Lum_TdmTypePinMap const &other) = default;

Lum_TdmTypePinMap::~Lum_TdmTypePinMap() = default;

unsigned int Lum_TdmTypePinMap::GetNumPins() const {
  return static_cast<unsigned int>(m_PinMaps.size());
}

void Lum_TdmTypePinMap::SetPinMap(Port::StringBase<char> name, Lum_TlmPin const *typePin) {
  // emplace keeps an existing entry of the name.
  m_PinMaps.emplace(std::move(name), typePin);
}

void Lum_TdmTypePinMap::SetPinMap(Lum_TdmPin const *designPin, Lum_TlmPin const *typePin) {
  SetPinMap(Port::StringBase<char>(std::string(DesignPinName(designPin, __LINE__))), typePin);
}

Lum_TlmPin const *Lum_TdmTypePinMap::Find(std::string_view name) const {
  auto const found = m_PinMaps.find(name);
  return found == m_PinMaps.end() ? nullptr : found->second;
}

Lum_TlmPin const *Lum_TdmTypePinMap::GetPinMapping(Port::StringBase<char> name) const {
  return Find(name.str());
}

Lum_TlmPin const *Lum_TdmTypePinMap::GetPinMapping(Lum_TdmPin const *designPin) const {
  return Find(DesignPinName(designPin, __LINE__));
}

bool Lum_TdmTypePinMap::operator==(Lum_TdmTypePinMap const &other) const {
  if (m_PinMaps.size() != other.m_PinMaps.size())
    return false;
  for (auto const &[name, typePin] : m_PinMaps) {
    auto const found = other.m_PinMaps.find(name);
    if ((found == other.m_PinMaps.end() ? nullptr : found->second) != typePin)
      return false;
  }
  return true;
}

void Lum_TdmTypePinMap::Dbg() const {
  Orb_Debug::Printf("---------------------------------------\n");
  Orb_Debug::Printf("Data for class <%s>:\n",
                    Lum_TdmDbgDetail::ClassName<Lum_TdmTypePinMap>().c_str());
  Orb_Debug::Printf("m_IsDefault = <%s>\n", m_IsDefault ? "true" : "false");
  Orb_Debug::Printf("m_PinMaps (# = %d:\n", static_cast<int>(m_PinMaps.size()));
  for (auto const &[name, typePin] : m_PinMaps)
    Orb_Debug::Printf("  design pin name = <%s>, Lum_TlmPin * = <0x%x> \n", name.c_str(),
                      reinterpret_cast<std::uintptr_t>(typePin));
}

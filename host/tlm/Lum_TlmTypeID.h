#pragma once

#include "Lum_PlatformApi.h"

#include <map>
#include <string>

class Lum_TlmBlock;
class Lum_TlmLibrary;
class Lum_TlmPin;

// Identifies a type block by library name and type block name. A
// default-built identifier stands for "untyped": it represents exactly null.
class LUM_PLATFORM_API Lum_TlmBlockTypeID {
public:
  Lum_TlmBlockTypeID() = default;
  Lum_TlmBlockTypeID(char const *libraryName, char const *typeBlockName);

  bool IsUntyped() const { return !m_Named; }
  bool RepresentsTypeBlock(Lum_TlmBlock const *typeBlock) const;

private:
  bool m_Named = false;
  std::string m_Library;
  std::string m_Block;
};

// Identifies a type pin by library, type block and pin name. A default-built
// identifier represents exactly null.
class LUM_PLATFORM_API Lum_TlmPinTypeID {
public:
  Lum_TlmPinTypeID() = default;
  Lum_TlmPinTypeID(char const *libraryName, char const *typeBlockName, char const *pinName);

  bool IsUntyped() const { return !m_Named; }
  bool RepresentsTypePin(Lum_TlmPin const *typePin) const;

private:
  bool m_Named = false;
  Lum_TlmBlockTypeID m_Block;
  std::string m_Pin;
};

namespace Lum_Tlm {

// The global registry of the types of registered libraries.
class LUM_PLATFORM_API TypeIDRegistry {
public:
  // Enters the library's types. Registering a library again counts again.
  void RegisterTypeLibrary(Lum_TlmLibrary const *library);
  // How often a library of that name was registered.
  unsigned GetRegistrationCount(std::string const &libraryName) const;
  void Clear() { m_Counts.clear(); }

private:
  std::map<std::string, unsigned> m_Counts;
};

// Exists from the first TypeIDRegistryInitCounter's construction to the last
// one's destruction.
extern LUM_PLATFORM_API TypeIDRegistry *pTypeIDRegistry;

// Creates the registry with the first counter object and destroys it with
// the last. Every library that uses the registry keeps one static counter.
class LUM_PLATFORM_API TypeIDRegistryInitCounter {
public:
  TypeIDRegistryInitCounter();
  ~TypeIDRegistryInitCounter();
  TypeIDRegistryInitCounter(TypeIDRegistryInitCounter const &) = delete;
  TypeIDRegistryInitCounter &operator=(TypeIDRegistryInitCounter const &) = delete;
};

} // namespace Lum_Tlm

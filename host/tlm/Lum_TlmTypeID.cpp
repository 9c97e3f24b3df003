#include "Lum_TlmTypeID.h"

#include "Lum_Tlm.h"

Lum_TlmBlockTypeID::Lum_TlmBlockTypeID(char const *libraryName, char const *typeBlockName)
    : m_Named(true), m_Library(libraryName ? libraryName : ""),
      m_Block(typeBlockName ? typeBlockName : "") {}

bool Lum_TlmBlockTypeID::RepresentsTypeBlock(Lum_TlmBlock const *typeBlock) const {
  if (!m_Named || !typeBlock)
    return !m_Named && !typeBlock;
  // The names are compared as the host holds them, the type block's own
  // (most often the one that differs) first; the library's name is its host
  // design manager's, reached without specializing anything.
  Orb_Block const *block = typeBlock->GetOrbBlock();
  if (m_Block != block->GetNameString())
    return false;
  Orb_DesignMgr const *designMgr = block->GetView()->GetParent()->GetParent();
  return m_Library == designMgr->GetNameString();
}

Lum_TlmPinTypeID::Lum_TlmPinTypeID(char const *libraryName, char const *typeBlockName,
                                   char const *pinName)
    : m_Named(true), m_Block(libraryName, typeBlockName), m_Pin(pinName ? pinName : "") {}

bool Lum_TlmPinTypeID::RepresentsTypePin(Lum_TlmPin const *typePin) const {
  if (!m_Named || !typePin)
    return !m_Named && !typePin;
  return m_Pin == typePin->GetOrbPin()->GetNameString() &&
         m_Block.RepresentsTypeBlock(typePin->GetParent());
}

namespace Lum_Tlm {

TypeIDRegistry *pTypeIDRegistry = nullptr;

namespace {
unsigned g_InitCount = 0;
}

void TypeIDRegistry::RegisterTypeLibrary(Lum_TlmLibrary const *library) {
  if (library)
    ++m_Counts[library->GetLibraryName()];
}

unsigned TypeIDRegistry::GetRegistrationCount(std::string const &libraryName) const {
  auto it = m_Counts.find(libraryName);
  return it == m_Counts.end() ? 0 : it->second;
}

TypeIDRegistryInitCounter::TypeIDRegistryInitCounter() {
  if (g_InitCount++ == 0)
    pTypeIDRegistry = new TypeIDRegistry();
}

TypeIDRegistryInitCounter::~TypeIDRegistryInitCounter() {
  if (--g_InitCount == 0) {
    delete pTypeIDRegistry;
    pTypeIDRegistry = nullptr;
  }
}

// The platform's own counter: the registry exists while this library is
// loaded, whoever else counts.
static TypeIDRegistryInitCounter g_PlatformCounter;

} // namespace Lum_Tlm

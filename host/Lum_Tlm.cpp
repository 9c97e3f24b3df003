// Type libraries (stub until the component is written).
#include "Lum_Tlm.h"

#include "Lum_Exception.h"

char const *const Lum_TlmLibrary::LOCAL_LIBRARY_NAME = "Lum_LocalLibrary";

PM_PIC::PM_PIC(char const *personality, char const *part, char const * /*reserved*/)
    : m_Personality(personality ? personality : ""), m_Part(part ? part : "") {}

Lum_TlmLibrary const *Lum_TlmBlock::GetLibrary() const { return nullptr; }

bool Lum_TlmDesign::IsTypeBlockDesign(Orb_Design const &design) {
  Orb_Property const *mark = design.GetPropertyByName(Lum_TlmNames::kDesignTypeProperty);
  return mark && std::string(mark->GetStringValue()) != Lum_TlmNames::kDesignTypeUser;
}

void Lum_TlmLibrary::GetTlmVersion(unsigned &version, unsigned &revision) const {
  version = revision = 0;
}
Port::StringBase<char> Lum_TlmLibrary::GetFirstQualifier() const { return {}; }
Port::StringBase<char> Lum_TlmLibrary::GetSecondQualifier() const { return {}; }
Lum_TlmLibrary const *Lum_TlmLibrary::LoadLibrary(Port::StringBase<char> const &name, PM_PIC const &) {
  throw Lum_ExceptionInvalidLibrary("Lum", "host/Lum_Tlm", "", __LINE__, name.c_str(), "not yet", false);
}
void Lum_TlmLibrary::ReleaseLibrary(Lum_TlmLibrary const *) {}
Lum_TlmLibrary *Lum_TlmLibrary::GetLocalLibrary(Orb_Model *, PM_PIC const &) { return nullptr; }

#include "Lum_TdmPin.h"

#include "Lum_TdmBlock.h"
#include "Lum_TdmDbg.h"
#include "Lum_TdmModel.h"

#include "Lum_TlmTypeID.h"

#include <cstdint>

// The pin adds its type pin to its host base, nothing else: there are many.
static_assert(sizeof(Lum_TdmPin) == sizeof(Orb_PinT<Lum_TdmTraits>) + sizeof(void *),
              "Lum_TdmPin carries only its type pin");

Lum_TdmPin::Lum_TdmPin(Lum_TdmModel *model, Orb_Pin *pin, bool isNew)
    : Orb_PinT<Lum_TdmTraits>(model, pin), m_TypePin(nullptr) {
  // A loaded pin makes sure its block has a client; the answer is not kept.
  if (!isNew)
    GetParent();
}

Lum_TdmPin::~Lum_TdmPin() = default;

bool Lum_TdmPin::IsTypeOf(Lum_TlmPinTypeID const &typeId) const {
  return typeId.RepresentsTypePin(m_TypePin);
}

void Lum_TdmPin::CommitToOrb() {}

void Lum_TdmPin::TraverseAndCommitToOrb() { CommitToOrb(); }

std::uint64_t Lum_TdmPin::DbgMySize() const { return DbgClassSize() + DbgSecondarySize(); }

std::uint64_t Lum_TdmPin::DbgClassSize() const { return sizeof(Lum_TdmPin); }

std::uint64_t Lum_TdmPin::DbgSecondarySize() const { return 0; }

void Lum_TdmPin::DbgImpl() const {
  Lum_TdmDbgFrame<Lum_TdmPin>(
      [this] {
        Orb_Debug::Printf("(Lum_TlmPin *) m_TypePin = <0x%x>\n",
                          reinterpret_cast<std::uintptr_t>(m_TypePin));
      },
      [this] { Orb_PinDerived::Dbg(); });
}

void Lum_TdmPin::DebugDumpCallback(Port::Stream *stream, int indent) const {
  Lum_TdmDbgCallbackFrame(stream, indent, "Lum_TdmPin Data\n", [] {});
}

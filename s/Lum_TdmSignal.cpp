#include "Lum_TdmSignal.h"

#include "Lum_TdmDbg.h"
#include "Lum_TdmModel.h"

static_assert(sizeof(Lum_TdmSignal) == sizeof(Orb_SignalT<Lum_TdmTraits>),
              "Lum_TdmSignal adds no field to its host base");

Lum_TdmSignal::Lum_TdmSignal(Lum_TdmModel *model, Orb_Signal *signal, bool /*isNew*/)
    : Orb_SignalT<Lum_TdmTraits>(model, signal) {}

Lum_TdmSignal::~Lum_TdmSignal() = default;

void Lum_TdmSignal::CommitToOrb() {}

void Lum_TdmSignal::TraverseAndCommitToOrb() { CommitToOrb(); }

std::uint64_t Lum_TdmSignal::DbgMySize() const { return DbgClassSize() + DbgSecondarySize(); }

std::uint64_t Lum_TdmSignal::DbgClassSize() const { return sizeof(Lum_TdmSignal); }

std::uint64_t Lum_TdmSignal::DbgSecondarySize() const { return 0; }

void Lum_TdmSignal::DbgImpl() const {
  Lum_TdmDbgFrame<Lum_TdmSignal>([] {}, [this] { Orb_SignalDerived::Dbg(); });
}

void Lum_TdmSignal::DebugDumpCallback(Port::Stream *stream, int indent) const {
  Lum_TdmDbgCallbackFrame(stream, indent, "Lum_TdmSignal Data\n", [] {});
}

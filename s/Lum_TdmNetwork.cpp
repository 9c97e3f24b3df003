#include "Lum_TdmNetwork.h"

#include "Lum_TdmDbg.h"
#include "Lum_TdmModel.h"

static_assert(sizeof(Lum_TdmNetwork) == sizeof(Orb_NetworkT<Lum_TdmTraits>),
              "Lum_TdmNetwork adds no field to its host base");

Lum_TdmNetwork::Lum_TdmNetwork(Lum_TdmModel *model, Orb_Network *network)
    : Orb_NetworkT<Lum_TdmTraits>(model, network) {}

Lum_TdmNetwork::~Lum_TdmNetwork() = default;

void Lum_TdmNetwork::CommitToOrb() {}

void Lum_TdmNetwork::TraverseAndCommitToOrb() { CommitToOrb(); }

std::uint64_t Lum_TdmNetwork::DbgMySize() const { return DbgClassSize() + DbgSecondarySize(); }

std::uint64_t Lum_TdmNetwork::DbgClassSize() const { return sizeof(Lum_TdmNetwork); }

std::uint64_t Lum_TdmNetwork::DbgSecondarySize() const { return 0; }

void Lum_TdmNetwork::DbgImpl() const {
  Lum_TdmDbgFrame<Lum_TdmNetwork>([] {}, [this] { Orb_NetworkDerived::Dbg(); });
}

void Lum_TdmNetwork::DebugDumpCallback(Port::Stream *stream, int indent) const {
  Lum_TdmDbgCallbackFrame(stream, indent, "Lum_TdmNetwork Data\n", [] {});
}

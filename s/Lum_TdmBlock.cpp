#include "Lum_TdmBlock.h"

#include "Lum_TdmCommit.h"
#include "Lum_TdmDbg.h"
#include "Lum_TdmModel.h"
#include "Lum_TdmPin.h"
#include "Lum_TdmSignal.h"

Lum_TdmBlock::Lum_TdmBlock(Lum_TdmModel *model, Orb_Block *block, bool /*isNew*/)
    : Orb_BlockT<Lum_TdmTraits>(model, block) {}

Lum_TdmBlock::~Lum_TdmBlock() = default;

void Lum_TdmBlock::CommitToOrb() {}

void Lum_TdmBlock::TraverseAndCommitToOrb() {
  CommitToOrb();
  Orb_Block const *host = GetOrbBlock();
  Lum_TdmCommitEach<Lum_TdmPin>(GetContext(), Orb_Kind::Pin, host->GetPins());
  Lum_TdmCommitEach<Lum_TdmSignal>(GetContext(), Orb_Kind::Signal, host->GetSignals());
  Lum_TdmCommitEach<Lum_TdmBlock>(GetContext(), Orb_Kind::Block, host->GetBlocks());
}

std::uint64_t Lum_TdmBlock::DbgMySize() const { return DbgClassSize() + DbgSecondarySize(); }

std::uint64_t Lum_TdmBlock::DbgClassSize() const { return sizeof(Lum_TdmBlock); }

std::uint64_t Lum_TdmBlock::DbgSecondarySize() const { return 0; }

void Lum_TdmBlock::DbgImpl() const {
  Lum_TdmDbgFrame<Lum_TdmBlock>([] {}, [this] { Orb_BlockDerived::Dbg(); });
}

void Lum_TdmBlock::DebugDumpCallback(Port::Stream *stream, int indent) const {
  Lum_TdmDbgCallbackFrame(stream, indent, "Lum_TdmBlock Data\n", [] {});
}

#pragma once

#include "Lum_TdmTraits.h"

#include "Orb_Templates.h"

#include <cstdint>

// Client of a host block.
class LUM_TDM_API Lum_TdmBlock : public Orb_BlockT<Lum_TdmTraits> {
public:
  Lum_TdmBlock(Lum_TdmModel *model, Orb_Block *block, bool isNew);
  ~Lum_TdmBlock() override;

  void Dbg() const { DbgImpl(); }

  void DebugDumpCallback(Port::Stream *stream, int indent) const override;

  // Commits the block, then its pins, its signals and each child block with
  // its whole subtree, in host order. Objects without a client get one.
  virtual void TraverseAndCommitToOrb();
  virtual std::uint64_t DbgMySize() const;
  virtual std::uint64_t DbgClassSize() const;
  virtual std::uint64_t DbgSecondarySize() const;

protected:
  virtual void CommitToOrb();
  virtual void DbgImpl() const;
};

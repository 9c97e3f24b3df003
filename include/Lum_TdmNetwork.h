#pragma once

#include "Lum_TdmTraits.h"

#include "Orb_Templates.h"

#include <cstdint>

// Client of a host network. No data of its own.
class LUM_TDM_API Lum_TdmNetwork : public Orb_NetworkT<Lum_TdmTraits> {
public:
  Lum_TdmNetwork(Lum_TdmModel *model, Orb_Network *network);
  ~Lum_TdmNetwork() override;

  void Dbg() const { DbgImpl(); }

  void DebugDumpCallback(Port::Stream *stream, int indent) const override;

  virtual void TraverseAndCommitToOrb();
  virtual std::uint64_t DbgMySize() const;
  virtual std::uint64_t DbgClassSize() const;
  virtual std::uint64_t DbgSecondarySize() const;

protected:
  virtual void CommitToOrb();
  virtual void DbgImpl() const;
};

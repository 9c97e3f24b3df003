#pragma once

#include "Lum_TdmTraits.h"

#include "Orb_Templates.h"

#include <cstdint>

// Client of a host signal. No data of its own.
class LUM_TDM_API Lum_TdmSignal : public Orb_SignalT<Lum_TdmTraits> {
public:
  // The creation flag is accepted and not used.
  Lum_TdmSignal(Lum_TdmModel *model, Orb_Signal *signal, bool isNew);
  ~Lum_TdmSignal() override;

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

#pragma once

#include "Lum_TdmTraits.h"

#include "Orb_Templates.h"

#include <cstdint>

class Lum_TlmPin;
class Lum_TlmPinTypeID;

// Client of a host pin. It carries the pin's type pin, which its block sets;
// the pin does not own it.
class LUM_TDM_API Lum_TdmPin : public Orb_PinT<Lum_TdmTraits> {
public:
  // The pin starts without a type pin. A pin being loaded brings its parent
  // block's client into being.
  Lum_TdmPin(Lum_TdmModel *model, Orb_Pin *pin, bool isNew);
  ~Lum_TdmPin() override;

  // Replaces the type pin; null clears it. Nothing is checked or written.
  void SetTypePin(Lum_TlmPin const *typePin) { m_TypePin = typePin; }
  Lum_TlmPin const *GetTypePin() const { return m_TypePin; }
  // What the identifier answers for the type pin (null included).
  bool IsTypeOf(Lum_TlmPinTypeID const &typeId) const;

  void Dbg() const { DbgImpl(); }

  void DebugDumpCallback(Port::Stream *stream, int indent) const override;

  virtual void TraverseAndCommitToOrb();
  virtual std::uint64_t DbgMySize() const;
  virtual std::uint64_t DbgClassSize() const;
  virtual std::uint64_t DbgSecondarySize() const;

protected:
  // Writes nothing: the block persists its pins' typing.
  virtual void CommitToOrb();
  virtual void DbgImpl() const;

private:
  friend class Lum_TdmBlock;
  Lum_TlmPin const *m_TypePin;
};

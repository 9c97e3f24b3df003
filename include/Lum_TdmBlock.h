#pragma once

#include "Lum_TdmTraits.h"

#include "Orb_Templates.h"

#include <cstdint>

class Lum_TlmBlock;

// Client of a host block. It may be bound to a type block of one of its
// view's type libraries, whose instance it then is; each of its pins then
// carries a type pin of that type block or none. The block does not own the
// type block.
//
// The binding is persisted in the block's host properties at each commit:
// TDS_BLOCK_TYPE holds the type block's unique tag ("library:type block"),
// and TDS_BLOCK_PIN_MAP, a list with one member per pin whose name differs
// from its type pin's (pin name = type pin name). A loaded block is bound
// again from them.
class LUM_TDM_API Lum_TdmBlock : public Orb_BlockT<Lum_TdmTraits> {
public:
  // A created block (isNew true) is untyped and drops any TDS_BLOCK_TYPE and
  // TDS_BLOCK_PIN_MAP the host block already carries.
  //
  // A loaded block with TDS_BLOCK_TYPE looks up its type block in its view's
  // libraries and binds to it: each pin takes the type pin of its name, or of
  // the name TDS_BLOCK_PIN_MAP gives it (the last member of a name counts);
  // unless the view carries LUM_DONT_CREATE_UNUSED_PINS, a block with fewer
  // pins than its type block gets the type pins nobody took as new pins, and
  // its pins are then put in name order. Failures, each
  // Lum_ExceptionCorruptDatabase, leave the block without a client:
  // - the view has no library of the stored name (object: that name);
  // - the library has no type block of the stored name (object: that name);
  // - a connected pin finds no type pin (object: the pin's name);
  // - a pin to create already exists under that name (object: the design's
  //   name).
  // Whatever was done to the pins before the failure stays. A failure while
  // the view loads its libraries passes unchanged.
  Lum_TdmBlock(Lum_TdmModel *model, Orb_Block *block, bool isNew);
  ~Lum_TdmBlock() override;

  // The type block, or null for an untyped block.
  Lum_TlmBlock const *GetTypeBlock() const { return m_pTypeBlock; }

  void Dbg() const { DbgImpl(); }

  void DebugDumpCallback(Port::Stream *stream, int indent) const override;

  // Commits the block, then its pins, its signals and each child block with
  // its whole subtree, in host order. Objects without a client get one.
  virtual void TraverseAndCommitToOrb();
  virtual std::uint64_t DbgMySize() const;
  virtual std::uint64_t DbgClassSize() const;
  virtual std::uint64_t DbgSecondarySize() const;

protected:
  // Writes the binding: TDS_BLOCK_TYPE for a typed block, removed for an
  // untyped one; TDS_BLOCK_PIN_MAP rebuilt from nothing, present only when a
  // pin's name differs from its type pin's. A pin without a type pin gets no
  // member.
  virtual void CommitToOrb();
  // Runs once the type block is set (after a load that bound the block);
  // does nothing here. A derived block may override it, but on load the
  // call comes from this class's constructor, so this one runs.
  virtual void InitTypeBlock();
  virtual void DbgImpl() const;

private:
  void CommitTypeProperties();
  void ResolveTypeBlock();
  // Matches the pins to the type block's pins (null clears every type pin),
  // creates the missing ones and sorts; see the constructor for failures.
  void ReconcilePins(Lum_TlmBlock const *typeBlock);
  // Puts the pins in name order.
  void SortPinsByName();

  Lum_TlmBlock const *m_pTypeBlock;
};

#pragma once

#include "Lum_TdmTraits.h"

#include "Orb_Templates.h"

#include <cstdint>
#include <string>
#include <vector>

class Lum_TdmTypePinMap;
class Lum_TlmBlock;
class Lum_TlmBlockTypeID;
class Lum_TlmPin;
class Lum_TlmPinTypeID;

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

  // ---- Creating children from type blocks

  // Creates a child bound to the type block. With `pins`, the child gets one
  // pin per type pin (its name and direction, bound to it), in the type
  // block's pin order; InitTypeBlock runs on the child. With `graft`, when
  // the type block has a hierarchy for this block's view name, the hierarchy
  // is copied under the child between the model's RegisterGraftEventHandlers
  // and its CleanupGraftProps and UnregisterGraftEventHandlers; the copied
  // objects then lose their clients, so that each is bound afresh from its
  // copied properties when next reached. Throws, creating nothing:
  // - a null type block: Lum_ExceptionInvalidTypeBlock, this block's name;
  // - a type block of no library of this block's view:
  //   Lum_ExceptionCorruptDatabase, the type block's name.
  // A host failure after the child exists (a name taken, a bad graft) passes
  // unchanged; the child and what was made under it stay, and a registered
  // graft hook is unregistered.
  Lum_TdmBlock *CreateTypedBlock(char const *name, Lum_TlmBlock const *typeBlock, bool graft,
                                 bool pins);
  // Creates an untyped copy of the type block: its pins (names, directions,
  // properties, no type pins), TDS_LIBRARY_ASSOC ("<library database>:<type
  // block> <time stamp>") and, whenever the type block has a hierarchy for
  // this block's view name, that hierarchy, between the model's
  // RegisterGraftEventHandlers and UnregisterGraftEventHandlers. The copy is
  // not checked against the view's libraries. A null type block throws
  // Lum_ExceptionInvalidTypeBlock with this block's name and creates nothing;
  // host failures pass as for CreateTypedBlock.
  Lum_TdmBlock *CreateUntypedBlock(char const *name, Lum_TlmBlock const *typeBlock);

  // ---- Rebinding

  // Binds the block to the type block (null unbinds it), matching its pins
  // through the block's stored TDS_BLOCK_PIN_MAP as a load does: pins may be
  // created and all pins sorted. The same type block as now does nothing.
  // Nothing is written until the next commit. Failures leave the block as it
  // was (type block, every pin's type pin, no pin created by the call):
  // - the type block's library is not among the view's, or a connected pin
  //   has no type pin of its name: Lum_ExceptionInvalidTypeBlock, the type
  //   block's name;
  // - the pin matching fails: the exception of a load, unchanged.
  void SetTypeBlock(Lum_TlmBlock const *typeBlock);
  // Binds the block to the type block through `pinMap`, which must map every
  // pin of the block to a pin of that type block; null unbinds the block.
  // Creates, sorts and reads nothing else. The same type block as now does
  // nothing. Every failure is Lum_ExceptionCorruptDatabase and changes
  // nothing:
  // - the check of SetTypeBlock above fails (type block's name);
  // - the map has more entries than the block has pins (type block's name);
  // - a pin has no mapping or one to another type block's pin (the first such
  //   pin's name, in host order);
  // - the next open after a commit would refuse the block: a type pin that no
  //   pin takes while a pin holds its name, so that the open could not create
  //   it (that pin's name; the message names the block and how to mend it).
  //   The view's LUM_DONT_CREATE_UNUSED_PINS does not count: a commit
  //   removes it.
  // The block keeps no reference to the map.
  void SetTypeBlock(Lum_TlmBlock const *typeBlock, Lum_TdmTypePinMap const &pinMap);

  // ---- Typed queries. None changes the design; walking children or pins
  // may bring their clients into being.

  // The type block, or null for an untyped block.
  Lum_TlmBlock const *GetTypeBlock() const { return m_pTypeBlock; }
  // The type block as specialized in `context` (the client there of its host
  // block), or null for an untyped block. Throws
  // Lum_ExceptionInvalidTypeBlock with this block's name when the host block
  // has no client in that context, or one that is no type block (a null
  // context resolves nothing).
  Lum_TlmBlock const *GetTypeBlock(Orb_Context const *context) const;
  // The type block's host block, or null for an untyped block.
  Orb_Block const *GetNativeTypeBlock() const;
  // What the identifier answers for the type block (null when untyped).
  bool IsTypeOf(Lum_TlmBlockTypeID const &typeId) const;
  // The first child, in host order, whose type block the identifier
  // represents, or null. The two names are the same query.
  Lum_TdmBlock *GetFirstChildBlockOfType(Lum_TlmBlockTypeID const &typeId);
  Lum_TdmBlock const *GetFirstChildBlockOfType(Lum_TlmBlockTypeID const &typeId) const;
  Lum_TdmBlock *GetChildBlockOfType(Lum_TlmBlockTypeID const &typeId);
  Lum_TdmBlock const *GetChildBlockOfType(Lum_TlmBlockTypeID const &typeId) const;
  // Appends, after what `blocks` holds, the children in host order whose
  // type block is this very object (null: the untyped children).
  void GetChildBlocksOfType(Lum_TlmBlock const *typeBlock, std::vector<Lum_TdmBlock *> &blocks);
  void GetChildBlocksOfType(Lum_TlmBlock const *typeBlock,
                            std::vector<Lum_TdmBlock const *> &blocks) const;
  // Appends the children whose type block the identifier represents.
  void GetChildBlocksOfType(Lum_TlmBlockTypeID const &typeId, std::vector<Lum_TdmBlock *> &blocks);
  void GetChildBlocksOfType(Lum_TlmBlockTypeID const &typeId,
                            std::vector<Lum_TdmBlock const *> &blocks) const;
  // The children whose type block has the same host block as `typeBlock`,
  // whichever client model either belongs to (null: the untyped children).
  std::vector<Lum_TdmBlock *> GetChildBlocksOfType(Lum_TlmBlock const *typeBlock);
  std::vector<Lum_TdmBlock const *> GetChildBlocksOfType(Lum_TlmBlock const *typeBlock) const;
  // The first pin, in host order, whose type pin the identifier represents,
  // or null.
  Lum_TdmPin *GetPinOfType(Lum_TlmPinTypeID const &typeId);
  Lum_TdmPin const *GetPinOfType(Lum_TlmPinTypeID const &typeId) const;
  // The first pin whose type pin is this very object (null: the first pin
  // without one), or null.
  Lum_TdmPin *GetPinOfType(Lum_TlmPin const *typePin);
  Lum_TdmPin const *GetPinOfType(Lum_TlmPin const *typePin) const;

  // ---- Pin order

  // For a typed block with fewer pins than its type block: creates a bound
  // pin for every type pin whose name the block lacks, sorts all pins by name
  // and returns true. Otherwise (untyped, or at least as many pins, whatever
  // their names) changes nothing and returns false. Existing pins are left
  // as they are.
  bool ManifestAllTypedPins();
  // Puts the pins in name order.
  void NormalizePins();

  void Dbg() const { DbgImpl(); }

  void DebugDumpCallback(Port::Stream *stream, int indent) const override;

  // Commits the block, then its pins, its signals and each child block with
  // its whole subtree, in host order. Objects without a client get one.
  // Called on its own (not from its view's commit), it first checks the
  // subtree as the view's commit does and writes nothing when that fails.
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
  // Runs once the type block is set: after a load that bound the block,
  // after CreateTypedBlock on the new child and after every SetTypeBlock that
  // changed the binding (to null too); does nothing here. A derived block may
  // override it, but on load the call comes from this class's constructor,
  // so this one runs.
  virtual void InitTypeBlock();
  virtual void DbgImpl() const;

private:
  friend class Lum_TdmView;

  void CommitTypeProperties();
  void ResolveTypeBlock();
  // Matches the pins to the type block's pins (null clears every type pin),
  // creates the missing ones and sorts; see the constructor for failures.
  void ReconcilePins(Lum_TlmBlock const *typeBlock);
  // Puts the pins in name order.
  void SortPinsByName();
  // Whether the type block belongs to one of the view's libraries (which
  // builds the view's list if needed).
  bool IsOfViewLibrary(Lum_TlmBlock const *typeBlock) const;
  // Throws Lum_ExceptionCorruptDatabase (type block's name) when the type
  // block belongs to no library of the view, or a connected pin has no type
  // pin of its name. Changes nothing.
  void VerifyTypeBlock(Lum_TlmBlock const *typeBlock) const;
  // Throws Lum_ExceptionInvalidTypeBlock (the pin's name) when the next open
  // would refuse what a commit stores for this block: a connected pin that
  // finds no type pin, or (unless the view forbids creating pins) a type pin
  // that no pin took but whose name a pin holds. Changes nothing.
  void VerifyCommit(bool viewForbidsCreating) const;
  // VerifyCommit over this block and every block under it.
  void VerifyCommitTree() const;
  // Commits the block and its subtree, as TraverseAndCommitToOrb without the
  // check.
  void CommitSubtree();

  Lum_TlmBlock const *m_pTypeBlock;
};

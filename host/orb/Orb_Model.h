#pragma once

// The host design model: design managers, designs, views, blocks, pins,
// signals and networks, each with a name and properties, owned by one
// Orb_Model. Clients attach through Orb_ModelDerived (Orb_Derived.h).

#include "Orb_List.h"
#include "Orb_NamedList.h"
#include "Orb_Pool.h"
#include "Orb_Property.h"

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <map>
#include <memory>
#include <set>
#include <string>
#include <string_view>
#include <unordered_map>
#include <utility>
#include <vector>

class Orb_Block;
class Orb_Design;
class Orb_DesignMgr;
class Orb_Model;
class Orb_ModelDerived;
class Orb_Network;
class Orb_Pin;
class Orb_Signal;
class Orb_View;
template <class T> class Orb_SortFtor;
namespace Port {
class Stream;
}

// The kinds of host objects that clients specialize (Orb_Kinds.def).
enum class Orb_Kind : unsigned {
#define ORB_KIND(Kind, shown) Kind,
#include "Orb_Kinds.def"
};
// One term of the sum per kind.
constexpr unsigned Orb_KindCount = 0
#define ORB_KIND(Kind, shown) +1 // NOLINT(bugprone-macro-parentheses)
#include "Orb_Kinds.def"
    ;

LUM_PLATFORM_API char const *Orb_KindName(Orb_Kind kind);

// The deepest a block may lie: a view's top block is at depth 1, a child
// block one deeper than its parent. Far beyond real designs, it bounds every
// walk of a block tree; creating, grafting or reading a deeper block fails.
constexpr unsigned Orb_MaxBlockDepth = 1000;

// Base of every host object: name, kind, parent, bridge id and properties.
// Host objects are made and freed by their owners only, in their model's
// pools (Orb_ObjectPool), which also know the model an object belongs to.
// No virtual functions: the model destroys an object through its kind.
class LUM_PLATFORM_API Orb_Persistent {
public:
  Orb_Persistent(Orb_Persistent const &) = delete;
  Orb_Persistent &operator=(Orb_Persistent const &) = delete;

  char const *GetName() const { return m_Name.CStr(m_LongName); }
  std::string_view GetNameString() const { return m_Name.View(m_LongName); }
  Orb_Kind GetKind() const { return static_cast<Orb_Kind>(m_Kind); }
  Orb_Model *GetModel() const { return Orb_ObjectPool::ModelOf<Orb_Model>(this); }
  Orb_Persistent *GetParentObject() const { return m_pParent; }
  // Dense per kind and model: the slot's number in the model's pool.
  unsigned GetBridgeId() const { return Orb_ObjectPool::IdOf(this); }
  // Whether a deletion under way holds the object: its delete events have
  // fired or are about to, and it is freed when that deletion ends.
  bool IsBeingDeleted() const { return m_Dying; }

  // Prints the object's kind, name and properties, then lets the client of
  // every attached context add its lines (DebugDumpCallback).
  void DebugDump(Port::Stream *stream, int indent) const;

  // Properties (Orb_PropertyHolder). A block, view, design, design manager
  // or network keeps its own holder; a pin's or a signal's (most have none)
  // lives in its model, made by the first property and marked by a bit.
  Orb_Property *GetPropertyByName(char const *name) const {
    Orb_PropertyHolder const *holder = Properties();
    return holder ? holder->GetPropertyByName(name) : nullptr;
  }
  Orb_Property *CreatePropertyString(char const *name, char const *value) {
    return MakeProperties().CreatePropertyString(name, value);
  }
  Orb_Property *CreatePropertyStringList(char const *name) {
    return MakeProperties().CreatePropertyStringList(name);
  }
  Orb_Property *CreatePropertyList(char const *name) {
    return MakeProperties().CreatePropertyList(name);
  }
  void DeleteProperty(char const *name) {
    if (Properties())
      MakeProperties().DeleteProperty(name);
  }
  void DeleteProperty(Orb_Property *property) {
    if (Properties())
      MakeProperties().DeleteProperty(property);
  }
  Orb_PropertyHolder::Range GetProperties() const {
    Orb_PropertyHolder const *holder = Properties();
    return holder ? holder->GetProperties() : Orb_PropertyHolder::Range(nullptr, 0);
  }
  void DumpProperties(Port::Stream *stream, int indent) const {
    if (Orb_PropertyHolder const *holder = Properties())
      holder->DumpProperties(stream, indent);
  }
  // Copies every property of `other` onto this object, replacing those of
  // the same names.
  void CopyPropertiesFrom(Orb_Persistent const &other) {
    Orb_PropertyHolder const *holder = other.Properties();
    if (holder && !holder->GetProperties().empty())
      MakeProperties().CopyPropertiesFrom(*holder);
  }
  // The object's holder, or null while a pin or signal has none.
  Orb_PropertyHolder const *Properties() const;
  // The object's holder, made if needed. Throws std::bad_alloc.
  Orb_PropertyHolder &MakeProperties();

protected:
  Orb_Persistent(Orb_Model *model, Orb_Kind kind, Orb_Persistent *parent, std::string_view name);
  // The name is given back by Orb_Model::Destroy, which knows whether the
  // whole model is going.
  ~Orb_Persistent() = default;

private:
  friend class Orb_Model;
  friend class Orb_Network;
  friend class Orb_Pin;
  friend class Orb_Signal;
  friend struct Orb_ChildSlot;
  friend struct Orb_ConnectionSlot;
  Orb_Name m_Name;
  Orb_Persistent *m_pParent;
  // The object's slot in its parent's container (Orb_List).
  std::uint32_t m_Slot = 0;
  std::uint8_t m_Kind;
  bool m_LongName : 1;
  bool m_Dying : 1;
  bool m_DeleteFired : 1;
  // A signal's: it belongs to a network (its view keeps the membership).
  bool m_InNetwork : 1;
  // A pin's: it has an inner connection (its view keeps it).
  bool m_HasInner : 1;
  // A pin's or a signal's: its model keeps a property holder for it.
  bool m_HasProperties : 1;
  // The last two bytes are free for a derived class's small fields.
};

// Where a host object keeps its slot in its parent's container.
struct Orb_ChildSlot {
  std::uint32_t &operator()(Orb_Persistent *object, void const * /*list*/) const {
    return object->m_Slot;
  }
};

static_assert(sizeof(Orb_List<Orb_Pin, Orb_ChildSlot>) == 16, "two elements or an array");
static_assert(sizeof(Orb_NamedList<Orb_Pin>) == 24, "a list and the index's table pointer");

// Where a pin keeps its slot in the pin list of the signal it connects to,
// on the side that the list is of.
struct Orb_ConnectionSlot {
  std::uint32_t &operator()(Orb_Pin *pin, void const *list) const;
};

// Where a signal keeps its slot in its network's list.
struct Orb_NetworkSlot {
  std::uint32_t &operator()(Orb_Signal *signal, void const *list) const;
};

// A pin's inner connection and the pin's slot in that signal's pin list.
struct Orb_PinLink {
  Orb_Signal *signal;
  std::uint32_t slot;
};

class LUM_PLATFORM_API Orb_Pin : public Orb_Persistent {
public:
  static constexpr Orb_Kind kKind = Orb_Kind::Pin;

  enum PIN_DIRECTION { PIN_INPUT, PIN_OUTPUT, PIN_BIDIRECTIONAL };

  PIN_DIRECTION GetDirection() const { return static_cast<PIN_DIRECTION>(m_Direction); }
  Orb_Block *GetParent() const;
  // The outer connection: a signal of the parent block of the pin's block, or
  // null. A top block's pin has none.
  Orb_Signal *GetSignal() const;
  // The inner connection: a signal of the pin's own block, or null.
  Orb_Signal *GetInnerSignal() const;
  // Set the outer or the inner connection, replacing the previous one; null
  // disconnects that side. A signal of any other block (for Connect on a top
  // block's pin, any signal) throws Orb_Exception naming the pin and the
  // signal, and changes nothing.
  void Connect(Orb_Signal *signal);
  void ConnectInner(Orb_Signal *signal);

private:
  friend class Orb_Model;
  friend class Orb_ModelIO;
  friend class Orb_Block;
  friend struct Orb_ConnectionSlot;
  Orb_Pin(Orb_Model *model, Orb_Block *parent, std::string_view name, PIN_DIRECTION direction);
  // Points the outer or inner side at `signal` (null: disconnects it),
  // keeping the signals' pin lists in step. Throws std::bad_alloc and then
  // changes nothing.
  void Link(bool inner, Orb_Signal *signal);
  void Unlink(bool inner) noexcept;
  // Forgets one side without touching its signal, which is going.
  void Forget(bool inner) noexcept;
  // The inner connection's record in the view, or null.
  Orb_PinLink *InnerLink() const;
  // In the base's last bytes.
  std::uint8_t m_Direction;
  void SetSignal(Orb_Signal *signal);
  // The outer connection (its signal's bridge id plus one, 0 for none) and
  // the slot in its signal's pin list. The inner one lives in the view: most
  // pins (those of leaf blocks) have none.
  std::uint32_t m_OuterSlot = 0;
  std::uint32_t m_SignalId = 0;
};

LUM_PLATFORM_API char const *Orb_PinDirectionName(Orb_Pin::PIN_DIRECTION direction);

class LUM_PLATFORM_API Orb_Signal : public Orb_Persistent {
public:
  static constexpr Orb_Kind kKind = Orb_Kind::Signal;

  Orb_Block *GetParent() const;
  // The network the signal belongs to, or null.
  Orb_Network *GetNetwork() const;
  // Pins connected to the signal from either side, in connection order: pins
  // of its own block (their inner connection) and pins of its block's child
  // blocks (their outer one).
  Orb_Range<Orb_Pin, Orb_ConnectionSlot> GetPins() const { return m_Pins.Range(); }

private:
  friend class Orb_Model;
  friend class Orb_ModelIO;
  friend class Orb_Block;
  friend class Orb_Pin;
  friend class Orb_Network;
  friend struct Orb_ConnectionSlot;
  friend struct Orb_NetworkSlot;
  Orb_Signal(Orb_Model *model, Orb_Block *parent, std::string_view name);
  Orb_List<Orb_Pin, Orb_ConnectionSlot> m_Pins;
};

inline std::uint32_t &Orb_ConnectionSlot::operator()(Orb_Pin *pin, void const *list) const {
  if (pin->m_HasInner) {
    Orb_PinLink *link = pin->InnerLink();
    if (link->signal && list == &link->signal->m_Pins)
      return link->slot;
  }
  return pin->m_OuterSlot;
}

class LUM_PLATFORM_API Orb_Network : public Orb_Persistent {
public:
  static constexpr Orb_Kind kKind = Orb_Kind::Network;

  Orb_View *GetParent() const;
  // The network's signals in host order.
  Orb_Range<Orb_Signal, Orb_NetworkSlot> GetSignals() const { return m_Signals.Range(); }
  // Adds a signal of the same view, moving it out of any other network.
  // A signal of another view throws Orb_Exception.
  void AddSignal(Orb_Signal *signal);
  // Removes the signal from this network; does nothing if it is not a member.
  void RemoveSignal(Orb_Signal *signal);

private:
  friend class Orb_Persistent;
  friend class Orb_Model;
  friend class Orb_ModelIO;
  friend class Orb_View;
  Orb_Network(Orb_Model *model, Orb_View *parent, std::string_view name);
  Orb_List<Orb_Signal, Orb_NetworkSlot> m_Signals;
  Orb_PropertyHolder m_Properties;
};

class LUM_PLATFORM_API Orb_Block : public Orb_Persistent {
public:
  static constexpr Orb_Kind kKind = Orb_Kind::Block;

  // The parent block, or null for a view's top block.
  Orb_Block *GetParent() const;
  Orb_View *GetView() const { return m_pView; }

  Orb_Range<Orb_Block> GetBlocks() const { return Inner().blocks.Items(); }
  Orb_Range<Orb_Pin> GetPins() const { return m_Pins.Items(); }
  Orb_Range<Orb_Signal> GetSignals() const { return Inner().signals.Items(); }
  unsigned GetNumPins() const { return static_cast<unsigned>(m_Pins.Size()); }

  Orb_Block *GetBlockByName(char const *name) const { return Inner().blocks.Find(name); }
  Orb_Pin *GetPinByName(char const *name) const { return m_Pins.Find(name); }
  Orb_Signal *GetSignalByName(char const *name) const { return Inner().signals.Find(name); }

  // 1 for a view's top block, one more per parent block (walks the parents).
  unsigned GetDepth() const;

  // Creation fires the OnCreate event to every subscribed context before it
  // returns. A duplicate name, a block that is being deleted, or a child
  // block that would lie deeper than Orb_MaxBlockDepth, throws Orb_Exception
  // and creates nothing. If an event handler throws, the new object is
  // deleted again (with its delete events) and the exception passes
  // unchanged.
  Orb_Block *CreateBlock(char const *name, int flags = 0);
  Orb_Pin *CreatePin(char const *name, Orb_Pin::PIN_DIRECTION direction);
  Orb_Signal *CreateSignal(char const *name);

  // Deletion fires the delete events for everything the object owns, children
  // before parents, then for the object, then frees the host objects (see
  // Orb_Model::Delete).
  void DeleteBlock(Orb_Block *child);
  void DeletePin(Orb_Pin *pin);
  void DeleteSignal(Orb_Signal *signal);

  // Sorts the pin container with the functor, stably.
  void SortPins(Orb_SortFtor<Orb_Pin> const &ftor);

private:
  friend class Orb_Persistent;
  friend class Orb_Model;
  friend class Orb_ModelIO;
  friend class Orb_View;
  Orb_Block(Orb_Model *model, Orb_Persistent *parent, Orb_View *view, std::string_view name);
  // What only a block with child blocks or signals needs. Most blocks of a
  // netlist are leaves and go without it (a pointer instead of 80 bytes).
  struct Inside {
    Orb_NamedList<Orb_Block> blocks;
    Orb_NamedList<Orb_Signal> signals;
  };
  Inside const &Inner() const { return m_pInside ? *m_pInside : NoInside(); }
  // Made on first need and kept while the block lives, so that ranges over
  // its lists stay valid. Throws std::bad_alloc.
  Inside &MakeInside();
  static Inside const &NoInside();
  Orb_View *m_pView;
  Orb_NamedList<Orb_Pin> m_Pins;
  std::unique_ptr<Inside> m_pInside;
  Orb_PropertyHolder m_Properties;
};

class LUM_PLATFORM_API Orb_View : public Orb_Persistent {
public:
  static constexpr Orb_Kind kKind = Orb_Kind::View;

  Orb_Design *GetParent() const;
  // The top block, or null.
  Orb_Block *GetBlock() const { return m_pTopBlock; }
  Orb_Range<Orb_Network> GetNetworks() const { return m_Networks.Items(); }
  Orb_Network *GetNetworkByName(char const *name) const { return m_Networks.Find(name); }

  // A view has at most one top block; a second one throws Orb_Exception.
  Orb_Block *CreateTopBlock(char const *name);
  Orb_Network *CreateNetwork(char const *name);
  void DeleteTopBlock();
  void DeleteNetwork(Orb_Network *network);

private:
  friend class Orb_Persistent;
  friend class Orb_Model;
  friend class Orb_ModelIO;
  friend class Orb_Design;
  friend class Orb_Network;
  friend class Orb_Pin;
  friend class Orb_Signal;
  friend struct Orb_NetworkSlot;
  Orb_View(Orb_Model *model, Orb_Design *parent, std::string_view name);
  Orb_Block *m_pTopBlock = nullptr;
  Orb_NamedList<Orb_Network> m_Networks;
  Orb_PropertyHolder m_Properties;
  // The network of each of the view's signals that belongs to one, and the
  // signal's slot in the network's list. Most signals belong to none, so a
  // signal keeps only a bit (Orb_Signal::GetNetwork).
  struct Membership {
    Orb_Network *network;
    std::uint32_t slot;
  };
  std::unordered_map<Orb_Signal const *, Membership> m_Memberships;
  // The inner connections of the view's pins that have one.
  std::unordered_map<Orb_Pin const *, Orb_PinLink> m_InnerLinks;
};

inline std::uint32_t &Orb_NetworkSlot::operator()(Orb_Signal *signal, void const * /*list*/) const {
  return signal->GetParent()->GetView()->m_Memberships.find(signal)->second.slot;
}

class LUM_PLATFORM_API Orb_Design : public Orb_Persistent {
public:
  static constexpr Orb_Kind kKind = Orb_Kind::Design;

  Orb_DesignMgr *GetParent() const;
  Orb_Range<Orb_View> GetViews() const { return m_Views.Items(); }
  Orb_View *GetViewByName(char const *name) const { return m_Views.Find(name); }
  Orb_View *CreateView(char const *name);
  void DeleteView(Orb_View *view);

private:
  friend class Orb_Persistent;
  friend class Orb_Model;
  friend class Orb_ModelIO;
  friend class Orb_DesignMgr;
  Orb_Design(Orb_Model *model, Orb_DesignMgr *parent, std::string_view name);
  Orb_NamedList<Orb_View> m_Views;
  Orb_PropertyHolder m_Properties;
};

class LUM_PLATFORM_API Orb_DesignMgr : public Orb_Persistent {
public:
  static constexpr Orb_Kind kKind = Orb_Kind::DesignMgr;

  Orb_Range<Orb_Design> GetDesigns() const { return m_Designs.Items(); }
  Orb_Design *GetDesignByName(char const *name) const { return m_Designs.Find(name); }
  Orb_Design *CreateDesign(char const *name);
  void DeleteDesign(Orb_Design *design);

private:
  friend class Orb_Persistent;
  friend class Orb_Model;
  friend class Orb_ModelIO;
  Orb_DesignMgr(Orb_Model *model, std::string_view name);
  Orb_NamedList<Orb_Design> m_Designs;
  Orb_PropertyHolder m_Properties;
};

// Every kind has its class, which knows its kind.
#define ORB_KIND(Kind, shown)                                                                      \
  static_assert(Orb_##Kind::kKind == Orb_Kind::Kind, "Orb_" #Kind " is of kind " #Kind);
#include "Orb_Kinds.def"

// Something a client keeps with a host model and that is saved with it: its
// own host model, written into the design database under a key (for instance
// a type library local to the design). The host model owns it.
class LUM_PLATFORM_API Orb_ModelCompanion {
public:
  virtual ~Orb_ModelCompanion();
  virtual Orb_Model const *GetModelToSave() const = 0;
  // Called when an Open is refused after this companion took a waiting model
  // (Orb_Model::TakeLoadedCompanion) during its events: undo what was built
  // over that model and hand it back, so that it waits again. The default
  // hands back nothing, and the waiting model is then lost with the
  // companion.
  virtual std::unique_ptr<Orb_Model> ReleaseTakenModel();
};

// A host model. Built standalone by a caller, or by an Orb_ModelDerived that
// then owns it. Its objects are freed with it; clients must detach first.
class LUM_PLATFORM_API Orb_Model {
public:
  // name: the model's name; dbName: the design database's name; path: the
  // file it is saved to by default (may be empty); readOnly: Save refuses.
  Orb_Model(char const *name, char const *dbName, char const *path, bool readOnly);
  Orb_Model(Orb_Model const &) = delete;
  Orb_Model &operator=(Orb_Model const &) = delete;
  ~Orb_Model();

  char const *GetName() const { return m_Name.c_str(); }
  char const *GetDbName() const { return m_DbName.c_str(); }
  char const *GetPath() const { return m_Path.c_str(); }
  bool IsReadOnly() const { return m_ReadOnly; }

  Orb_Range<Orb_DesignMgr> GetDesignMgrs() const { return m_DesignMgrs.Items(); }
  Orb_DesignMgr *GetDesignMgrByName(char const *name) const { return m_DesignMgrs.Find(name); }
  Orb_DesignMgr *CreateDesignMgr(char const *name);
  void DeleteDesignMgr(Orb_DesignMgr *designMgr);

  // Writes the whole model (and its companions) to `path` through a temporary
  // file that is flushed and renamed over the target: a failed save throws
  // Orb_Exception and leaves the previous file unchanged. A symbolic link at
  // `path` stays: the file it leads to is replaced. A replaced file keeps its
  // permission bits. Temporary files of earlier saves to the same target
  // whose process is gone are removed.
  void Save(char const *path) const;
  void Save() const { Save(m_Path.c_str()); }

  // Loads every design manager of the database at `path` into this model,
  // then fires the OnLoad events (design managers, then per design manager
  // its designs; per design the design, its views; per view the view, its
  // block tree in pre-order with each block's pins and signals, then its
  // networks) to every subscribed context. All or nothing: an unreadable,
  // corrupt, truncated or newer file, a design manager name or a companion
  // key already in the model, or an Open from inside an Open's event
  // handler, throws Orb_Exception naming the file and loads nothing; an
  // event handler that throws makes the model delete what it loaded (with
  // the delete events), puts its companions back as they were, and the
  // exception passes unchanged.
  void Open(char const *path);

  // Companions saved with this model. A companion whose section was read by
  // Open waits, as a bare host model, until its owner takes it. A live
  // companion that replaces another destroys it, except during an Open's
  // events: then the replaced one is kept until the Open succeeds, to be put
  // back if it is refused.
  void SetCompanion(std::string const &key, std::unique_ptr<Orb_ModelCompanion> companion);
  Orb_ModelCompanion *GetCompanion(std::string const &key) const;
  std::unique_ptr<Orb_Model> TakeLoadedCompanion(std::string const &key);

  // Contexts. Attached contexts may hold clients; subscribed ones get events.
  void Attach(Orb_ModelDerived *context);
  void Detach(Orb_ModelDerived *context);
  void Subscribe(Orb_ModelDerived *context);
  std::vector<Orb_ModelDerived *> const &GetContexts() const { return m_Contexts; }

  // Counts of live host objects by kind (for tests and reports).
  std::size_t GetObjectCount(Orb_Kind kind) const;
  // Distinct long pin names (over 7 bytes) in the model, each stored once
  // (for tests and reports).
  std::size_t GetSharedNameCount() const { return m_Names.SharedCount(); }

  // Deletes any host object with its subtree: fires the delete events,
  // children before parents, takes the object out of its parent and frees
  // it. Event handlers may delete, create and change other objects. An
  // object of the subtree that a handler deletes meanwhile is already going
  // and is left to this deletion; anything else a handler deletes leaves its
  // container at once, but memory is freed only when the outermost deletion
  // (or open, or client model teardown) ends, so no walk meets a freed
  // object. A handler that throws does not stop the deletion: the remaining
  // events fire, the objects are freed, then the first exception passes.
  void Delete(Orb_Persistent *object);

private:
  friend class Orb_Persistent;
  friend class Orb_DesignMgr;
  friend class Orb_Design;
  friend class Orb_View;
  friend class Orb_Block;
  friend class Orb_ModelIO;
  friend class Orb_ModelDerived;
  friend class Orb_Pin;

  // While a hold is up, deleted objects leave their containers but stay in
  // memory; the last hold to go frees them. Walks that run event handlers or
  // client code hold the frees, so the objects they walk stay readable.
  class FreeHold {
  public:
    explicit FreeHold(Orb_Model &model) : m_Model(model) { ++model.m_HoldDepth; }
    FreeHold(FreeHold const &) = delete;
    FreeHold &operator=(FreeHold const &) = delete;
    ~FreeHold() { m_Model.ReleaseHold(); }

  private:
    Orb_Model &m_Model;
  };
  void ReleaseHold() noexcept;

  // What an Open's refusal must put back: the live companions as they were
  // (those replaced meanwhile are kept here) and the keys of the companions
  // that were waiting.
  struct OpenJournal {
    std::map<std::string, Orb_ModelCompanion *> liveBefore;
    std::set<std::string> waitingBefore;
    std::map<std::string, std::unique_ptr<Orb_ModelCompanion>> replaced;
  };
  void RestoreCompanions(OpenJournal &journal) noexcept;

  // Builds a host object of class T in its kind's pool and gives it the
  // slot's bridge id; Destroy destroys it and gives the slot back (except
  // while the model itself goes, when the pools go whole).
  template <class T, class... Args> T *Make(Args &&...args);
  void Destroy(Orb_Persistent *object) noexcept;

  // Fires OnCreate for a new object; on a throw deletes it and rethrows.
  template <class T> T *Announce(T *object);
  // Links a new object (of `kind`, for the message) and announces it. A
  // sibling of the same name frees the object and throws Orb_Exception.
  template <class T> T *Adopt(T *object, char const *kind);
  // Fires OnLoad for the object in every subscribed context that has no
  // client for it yet.
  void AnnounceLoad(Orb_Persistent *object);
  void AnnounceLoadTree(Orb_DesignMgr *designMgr);
  void FireDelete(Orb_Persistent *object);
  // The one place that puts a new object into its parent's container (a
  // view's top block into the view) and takes it out again. Link returns
  // false and adds nothing when a sibling of the same kind has the object's
  // name (or the view has a top block).
  bool Link(Orb_Persistent *object);
  void Unlink(Orb_Persistent *object);
  // Frees the object and its subtree without events, with any client that
  // some context still holds for them. Connections and network memberships
  // never leave a view, so when a whole view goes (keepLinks false) nothing
  // inside it needs unhooking.
  void Free(Orb_Persistent *object, bool keepLinks = true) noexcept;

  std::string m_Name;
  std::string m_DbName;
  std::string m_Path;
  bool m_ReadOnly;
  Orb_NamedList<Orb_DesignMgr> m_DesignMgrs;
  std::vector<Orb_ModelDerived *> m_Contexts;
  std::vector<Orb_ModelDerived *> m_Subscribers;
  Orb_ObjectPool m_Pools[Orb_KindCount];
  // Long object names (Orb_Name.h).
  Orb_NameTable m_Names;
  // The property holders of pins and signals that have properties.
  std::unordered_map<Orb_Persistent const *, Orb_PropertyHolder> m_SideProperties;
  bool m_TearingDown = false;
  std::size_t m_ObjectCount[Orb_KindCount] = {};
  std::map<std::string, std::unique_ptr<Orb_ModelCompanion>> m_Companions;
  std::map<std::string, std::unique_ptr<Orb_Model>> m_LoadedCompanions;
  unsigned m_HoldDepth = 0;
  // Deleted objects waiting for the last hold, in the order of their Delete
  // calls: a later one never lies inside an earlier one.
  std::vector<Orb_Persistent *> m_PendingFrees;
  // Set while an Open fires its events.
  OpenJournal *m_pOpenJournal = nullptr;
};

inline Orb_Signal *Orb_Pin::GetSignal() const {
  if (m_SignalId == 0)
    return nullptr;
  auto const k = static_cast<unsigned>(Orb_Kind::Signal);
  return static_cast<Orb_Signal *>(GetModel()->m_Pools[k].At(m_SignalId - 1));
}

inline void Orb_Pin::SetSignal(Orb_Signal *signal) {
  m_SignalId = signal ? signal->GetBridgeId() + 1 : 0;
}

template <class T, class... Args> T *Orb_Model::Make(Args &&...args) {
  auto const k = static_cast<unsigned>(T::kKind);
  void *memory = m_Pools[k].Allocate();
  T *object = nullptr;
  try {
    object = new (memory) T(std::forward<Args>(args)...);
  } catch (...) {
    m_Pools[k].Release(memory);
    throw;
  }
  ++m_ObjectCount[k];
  return object;
}

// Casts and walks over the tree of host objects.
#include "Orb_Walk.h"

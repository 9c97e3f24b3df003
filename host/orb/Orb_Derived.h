#pragma once

// Client bases: the host's half of every client object, and the client model
// base. A client object is built from (context, host object); its base
// registers it in the context's bridge before the derived constructor body
// runs and empties the entry when it is destroyed.

#include "Orb_Context.h"
#include "Orb_Model.h"
#include "Orb_Sync.h"

#include <cstddef>
#include <memory>
#include <vector>

namespace Port {
class Stream;
}

class LUM_PLATFORM_API Orb_ClientObject {
public:
  Orb_ClientObject(Orb_ClientObject const &) = delete;
  Orb_ClientObject &operator=(Orb_ClientObject const &) = delete;
  virtual ~Orb_ClientObject();

  // Lets the client add its lines to the host's dump of its object.
  virtual void DebugDumpCallback(Port::Stream *stream, int indent) const;

  // Client objects are many and small: they come from the size-class free
  // lists of Orb_SmallAllocate, not from one heap block each.
  // The matching delete is the sized one below, so that the size class is known.
  static void *operator new(std::size_t size); // NOLINT(misc-new-delete-overloads)
  static void operator delete(void *pointer, std::size_t size) noexcept;

  // The context that holds this client: of the contexts attached to the
  // object's host model (usually one), the one whose bridge table has it.
  // Found rather than kept, so that a client costs a pointer less.
  Orb_Context *GetContext() const;
  Orb_ModelDerived *GetClientOrbModel() const;
  Orb_Persistent *GetOrbObject() const { return m_pOrbObject; }

  char const *GetName() const { return m_pOrbObject->GetName(); }
  Orb_Property *GetPropertyByName(char const *name) const {
    return m_pOrbObject->GetPropertyByName(name);
  }
  Orb_Property *CreatePropertyString(char const *name, char const *value) {
    return m_pOrbObject->CreatePropertyString(name, value);
  }
  Orb_Property *CreatePropertyStringList(char const *name) {
    return m_pOrbObject->CreatePropertyStringList(name);
  }
  Orb_Property *CreatePropertyList(char const *name) {
    return m_pOrbObject->CreatePropertyList(name);
  }
  void DeleteProperty(char const *name) { m_pOrbObject->DeleteProperty(name); }
  void DeleteProperty(Orb_Property *property) { m_pOrbObject->DeleteProperty(property); }

protected:
  // Registers the client; throws Orb_Exception if the object already has a
  // client in this context or belongs to another host model.
  Orb_ClientObject(Orb_Context *context, Orb_Persistent *object);
  // The host's own dump of the object: kind, name and properties.
  void DbgHost() const;

private:
  Orb_Persistent *m_pOrbObject;
};

class LUM_PLATFORM_API Orb_PinDerived : public Orb_ClientObject {
public:
  Orb_PinDerived(Orb_Context *context, Orb_Pin *pin) : Orb_ClientObject(context, pin) {}
  Orb_Pin *GetOrbPin() const { return static_cast<Orb_Pin *>(GetOrbObject()); }
  Orb_Pin::PIN_DIRECTION GetDirection() const { return GetOrbPin()->GetDirection(); }
  // The outer connection (a signal of the parent block of the pin's block),
  // or null.
  Orb_Signal *GetSignal() const { return GetOrbPin()->GetSignal(); }
  // The inner connection (a signal of the pin's own block), or null.
  Orb_Signal *GetInnerSignal() const { return GetOrbPin()->GetInnerSignal(); }
  // The parent block's client, specialized on demand.
  Orb_BlockDerived *GetParent() const;
  void Dbg() const { DbgHost(); }
};

class LUM_PLATFORM_API Orb_SignalDerived : public Orb_ClientObject {
public:
  Orb_SignalDerived(Orb_Context *context, Orb_Signal *signal) : Orb_ClientObject(context, signal) {}
  Orb_Signal *GetOrbSignal() const { return static_cast<Orb_Signal *>(GetOrbObject()); }
  Orb_BlockDerived *GetParent() const;
  // The network's client, specialized on demand, or null.
  Orb_NetworkDerived *GetNetwork() const;
  void Dbg() const { DbgHost(); }
};

class LUM_PLATFORM_API Orb_NetworkDerived : public Orb_ClientObject {
public:
  Orb_NetworkDerived(Orb_Context *context, Orb_Network *network)
      : Orb_ClientObject(context, network) {}
  Orb_Network *GetOrbNetwork() const { return static_cast<Orb_Network *>(GetOrbObject()); }
  Orb_ViewDerived *GetParent() const;
  Orb_Range<Orb_Signal, Orb_NetworkSlot> GetSignals() const {
    return GetOrbNetwork()->GetSignals();
  }
  void Dbg() const { DbgHost(); }
};

class LUM_PLATFORM_API Orb_BlockDerived : public Orb_ClientObject {
public:
  Orb_BlockDerived(Orb_Context *context, Orb_Block *block) : Orb_ClientObject(context, block) {}
  Orb_Block *GetOrbBlock() const { return static_cast<Orb_Block *>(GetOrbObject()); }

  // The client of `block` in `context`, or null (also for a block of another
  // host model than the context's). Never creates one.
  static Orb_BlockDerived *OrbResolve(Orb_Context const *context, Orb_Block const *block);

  // Parent block (null for a top block) and view, specialized on demand.
  Orb_BlockDerived *GetParent() const;
  Orb_ViewDerived *GetView() const;

  Orb_Range<Orb_Block> GetBlocks() const { return GetOrbBlock()->GetBlocks(); }
  Orb_Range<Orb_Pin> GetPins() const { return GetOrbBlock()->GetPins(); }
  Orb_Range<Orb_Signal> GetSignals() const { return GetOrbBlock()->GetSignals(); }
  unsigned GetNumPins() const { return GetOrbBlock()->GetNumPins(); }

  // The pin's client, specialized on demand, or null when there is no pin of
  // that name.
  Orb_PinDerived *GetPinByName(char const *name) const;
  Orb_BlockDerived *GetBlockByName(char const *name) const;

  // Create the host object (see Orb_Block) and return its client in this
  // context.
  Orb_BlockDerived *CreateBlock(char const *name, int flags);
  Orb_PinDerived *CreatePin(char const *name, Orb_Pin::PIN_DIRECTION direction);
  Orb_SignalDerived *CreateSignal(char const *name);

  void DeleteBlock(Orb_Block *child) { GetOrbBlock()->DeleteBlock(child); }
  void DeletePin(Orb_Pin *pin) { GetOrbBlock()->DeletePin(pin); }
  void DeleteSignal(Orb_Signal *signal) { GetOrbBlock()->DeleteSignal(signal); }
  void SortPins(Orb_SortFtor<Orb_Pin> const &ftor) { GetOrbBlock()->SortPins(ftor); }

  void Dbg() const { DbgHost(); }
};

class LUM_PLATFORM_API Orb_ViewDerived : public Orb_ClientObject {
public:
  Orb_ViewDerived(Orb_Context *context, Orb_View *view) : Orb_ClientObject(context, view) {}
  Orb_View *GetOrbView() const { return static_cast<Orb_View *>(GetOrbObject()); }
  Orb_DesignDerived *GetParent() const;
  // The top block's client, specialized on demand, or null.
  Orb_BlockDerived *GetBlock() const;
  Orb_Range<Orb_Network> GetNetworks() const { return GetOrbView()->GetNetworks(); }

  Orb_BlockDerived *CreateTopBlock(char const *name);
  Orb_NetworkDerived *CreateNetwork(char const *name);

  // Appends every block of the view, in pre-order, as clients specialized on
  // demand.
  void LoadAllBlocks(std::vector<Orb_BlockDerived *> &blocks) const;

  void Dbg() const { DbgHost(); }
};

class LUM_PLATFORM_API Orb_DesignDerived : public Orb_ClientObject {
public:
  Orb_DesignDerived(Orb_Context *context, Orb_Design *design) : Orb_ClientObject(context, design) {}
  Orb_Design *GetOrbDesign() const { return static_cast<Orb_Design *>(GetOrbObject()); }
  Orb_DesignMgrDerived *GetParent() const;
  Orb_ViewDerived *GetViewByName(char const *name) const;
  Orb_ViewDerived *CreateView(char const *name);
  void Dbg() const { DbgHost(); }
};

class LUM_PLATFORM_API Orb_DesignMgrDerived : public Orb_ClientObject {
public:
  Orb_DesignMgrDerived(Orb_Context *context, Orb_DesignMgr *designMgr)
      : Orb_ClientObject(context, designMgr) {}
  Orb_DesignMgr *GetOrbDesignMgr() const { return static_cast<Orb_DesignMgr *>(GetOrbObject()); }
  Orb_DesignDerived *GetDesignByName(char const *name) const;
  Orb_DesignDerived *CreateDesign(char const *name);
  void Dbg() const { DbgHost(); }
};

// Base of every client model. Either makes a new empty host model, which it
// owns, or attaches to an existing one. It never loads anything by itself.
// Destroying it destroys every client still in its bridge (children before
// parents, while their host objects exist), then detaches from the host model
// and frees the host model if it made it. A client destructor may delete
// other clients or host objects meanwhile.
class LUM_PLATFORM_API Orb_ModelDerived : public Orb_Context, public Orb_Sync {
public:
  Orb_ModelDerived(char const *name, char const *dbName, char const *path, bool readOnly);
  explicit Orb_ModelDerived(Orb_Model *model);
  ~Orb_ModelDerived() override;

  bool OwnsOrbModel() const { return m_pOwnedModel != nullptr; }
  char const *GetDbName() const { return GetOrbModel()->GetDbName(); }

  Orb_DesignMgrDerived *CreateDesignMgr(char const *name);
  Orb_DesignMgrDerived *GetDesignMgrByName(char const *name);

  void Save(char const *path) const { GetOrbModel()->Save(path); }
  void Open(char const *path) { GetOrbModel()->Open(path); }

  // The host's own dump of the model: its names and object counts.
  void Dbg() const;

private:
  std::unique_ptr<Orb_Model> m_pOwnedModel;
};

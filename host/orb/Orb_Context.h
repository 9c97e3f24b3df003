#pragma once

#include "Orb_Model.h"

#include <array>
#include <vector>

class Orb_BlockDerived;
class Orb_ClientObject;
class Orb_DesignDerived;
class Orb_DesignMgrDerived;
class Orb_ModelDerived;
class Orb_NetworkDerived;
class Orb_PinDerived;
class Orb_SignalDerived;
class Orb_ViewDerived;

// A context's bridge table of one kind, read by bridge id. It stays valid
// while the context lives, also when the table grows. Bridge ids are numbered
// per host model: only ids of the context's own model's objects mean anything
// here (Orb_Context::GetClient checks the model).
class LUM_PLATFORM_API Orb_BridgeHandle {
public:
  explicit Orb_BridgeHandle(std::vector<Orb_ClientObject *> const *table) : m_pTable(table) {}
  // The client at that bridge id, or null.
  Orb_ClientObject *operator[](unsigned id) const {
    return id < m_pTable->size() ? (*m_pTable)[id] : nullptr;
  }

private:
  std::vector<Orb_ClientObject *> const *m_pTable;
};

// The client model as the host sees it: per kind, a bridge table from host
// objects (by bridge id) to this context's client objects.
class LUM_PLATFORM_API Orb_Context {
public:
  Orb_Context(Orb_Context const &) = delete;
  Orb_Context &operator=(Orb_Context const &) = delete;

  Orb_Model *GetOrbModel() const { return m_pOrbModel; }
  Orb_BridgeHandle GetBridgeHandle(Orb_Kind kind) const {
    return Orb_BridgeHandle(&m_Bridge[static_cast<unsigned>(kind)]);
  }

  // The existing client of the object in this context, or null (also for an
  // object of another host model). Never creates one.
  Orb_ClientObject *GetClient(Orb_Persistent const *object) const;
  Orb_DesignMgrDerived *GetClient(Orb_DesignMgr const *object) const;
  Orb_DesignDerived *GetClient(Orb_Design const *object) const;
  Orb_ViewDerived *GetClient(Orb_View const *object) const;
  Orb_BlockDerived *GetClient(Orb_Block const *object) const;
  Orb_PinDerived *GetClient(Orb_Pin const *object) const;
  Orb_SignalDerived *GetClient(Orb_Signal const *object) const;
  Orb_NetworkDerived *GetClient(Orb_Network const *object) const;

  // The client of the object; when it has none, fires this context's OnLoad
  // event for it and returns what the event made (null if it made nothing).
  // A null object gives null; an object of another host model throws
  // Orb_Exception and fires nothing.
  Orb_ClientObject *Specialize(Orb_Persistent *object);
  Orb_DesignMgrDerived *Specialize(Orb_DesignMgr *object);
  Orb_DesignDerived *Specialize(Orb_Design *object);
  Orb_ViewDerived *Specialize(Orb_View *object);
  Orb_BlockDerived *Specialize(Orb_Block *object);
  Orb_PinDerived *Specialize(Orb_Pin *object);
  Orb_SignalDerived *Specialize(Orb_Signal *object);
  Orb_NetworkDerived *Specialize(Orb_Network *object);

  // Number of clients this context holds, all kinds together.
  std::size_t GetClientCount() const;

protected:
  explicit Orb_Context(Orb_Model *model) : m_pOrbModel(model) {}
  ~Orb_Context() = default;

private:
  friend class Orb_ClientObject;
  friend class Orb_Model;
  friend class Orb_ModelDerived;
  // Room in each kind's table for bridge ids below `limits[kind]`, so that a
  // load that gives every object a client grows no table step by step.
  // Throws std::bad_alloc.
  void ReserveBridges(unsigned const (&limits)[Orb_KindCount]);
  // Throws Orb_Exception for an object of another model or one that has a
  // client here already.
  void Register(Orb_ClientObject *client);
  void CheckOwnModel(Orb_Persistent const *object) const;
  void Unregister(Orb_ClientObject *client);

  Orb_Model *m_pOrbModel;
  std::array<std::vector<Orb_ClientObject *>, Orb_KindCount> m_Bridge;
};

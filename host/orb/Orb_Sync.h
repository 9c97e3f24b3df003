#pragma once

#include "Lum_PlatformApi.h"

class Orb_Model;
class Orb_Persistent;
#define ORB_KIND(Kind, shown) class Orb_##Kind;
#include "Orb_Kinds.def"

// The host's events to a client model. The OnCreate and OnLoad events of a
// kind default to the plain specialization event of that kind, which does
// nothing; the delete events do nothing.
class LUM_PLATFORM_API Orb_Sync {
public:
  Orb_Sync(Orb_Sync const &) = delete;
  Orb_Sync &operator=(Orb_Sync const &) = delete;
  virtual ~Orb_Sync();

  virtual void SyncEventSpecializeModelOnCreate(Orb_Model *m) { SyncEventSpecializeModel(m); }
  virtual void SyncEventSpecializeModelOnLoad(Orb_Model *m) { SyncEventSpecializeModel(m); }
  virtual void SyncEventSpecializeModel(Orb_Model * /*m*/) {}
  virtual void SyncEventDeleteModel(Orb_Model * /*m*/) {}

  // Per kind, in the order of Orb_Kinds.def: OnCreate, OnLoad, the plain
  // specialization event and the delete event.
#define ORB_KIND(Kind, shown)                                                                      \
  virtual void SyncEventSpecialize##Kind##OnCreate(Orb_##Kind *o) {                                \
    SyncEventSpecialize##Kind(o);                                                                  \
  }                                                                                                \
  virtual void SyncEventSpecialize##Kind##OnLoad(Orb_##Kind *o) { SyncEventSpecialize##Kind(o); }  \
  virtual void SyncEventSpecialize##Kind(Orb_##Kind * /*o*/) {}                                    \
  virtual void SyncEventDelete##Kind(Orb_##Kind * /*o*/) {}
#include "Orb_Kinds.def"

  // Subscribes this client model to every event of its host model.
  void SetEventNotifyAll();
  bool IsSubscribed() const { return m_Subscribed; }

  // Delivers the OnCreate (create true) or OnLoad event of the object's kind.
  void FireSpecialize(Orb_Persistent *object, bool create);
  // Delivers the delete event of the object's kind.
  void FireDelete(Orb_Persistent *object);

protected:
  Orb_Sync() = default;

private:
  friend class Orb_ModelDerived;
  Orb_Model *m_pSyncModel = nullptr;
  bool m_Subscribed = false;
};

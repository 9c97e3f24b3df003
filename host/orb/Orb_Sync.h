#pragma once

#include "Lum_PlatformApi.h"

class Orb_Block;
class Orb_Design;
class Orb_DesignMgr;
class Orb_Model;
class Orb_Network;
class Orb_Persistent;
class Orb_Pin;
class Orb_Signal;
class Orb_View;

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

  virtual void SyncEventSpecializeDesignMgrOnCreate(Orb_DesignMgr *o) {
    SyncEventSpecializeDesignMgr(o);
  }
  virtual void SyncEventSpecializeDesignMgrOnLoad(Orb_DesignMgr *o) {
    SyncEventSpecializeDesignMgr(o);
  }
  virtual void SyncEventSpecializeDesignMgr(Orb_DesignMgr * /*o*/) {}
  virtual void SyncEventDeleteDesignMgr(Orb_DesignMgr * /*o*/) {}

  virtual void SyncEventSpecializeDesignOnCreate(Orb_Design *o) { SyncEventSpecializeDesign(o); }
  virtual void SyncEventSpecializeDesignOnLoad(Orb_Design *o) { SyncEventSpecializeDesign(o); }
  virtual void SyncEventSpecializeDesign(Orb_Design * /*o*/) {}
  virtual void SyncEventDeleteDesign(Orb_Design * /*o*/) {}

  virtual void SyncEventSpecializeViewOnCreate(Orb_View *o) { SyncEventSpecializeView(o); }
  virtual void SyncEventSpecializeViewOnLoad(Orb_View *o) { SyncEventSpecializeView(o); }
  virtual void SyncEventSpecializeView(Orb_View * /*o*/) {}
  virtual void SyncEventDeleteView(Orb_View * /*o*/) {}

  virtual void SyncEventSpecializeBlockOnCreate(Orb_Block *o) { SyncEventSpecializeBlock(o); }
  virtual void SyncEventSpecializeBlockOnLoad(Orb_Block *o) { SyncEventSpecializeBlock(o); }
  virtual void SyncEventSpecializeBlock(Orb_Block * /*o*/) {}
  virtual void SyncEventDeleteBlock(Orb_Block * /*o*/) {}

  virtual void SyncEventSpecializePinOnCreate(Orb_Pin *o) { SyncEventSpecializePin(o); }
  virtual void SyncEventSpecializePinOnLoad(Orb_Pin *o) { SyncEventSpecializePin(o); }
  virtual void SyncEventSpecializePin(Orb_Pin * /*o*/) {}
  virtual void SyncEventDeletePin(Orb_Pin * /*o*/) {}

  virtual void SyncEventSpecializeSignalOnCreate(Orb_Signal *o) { SyncEventSpecializeSignal(o); }
  virtual void SyncEventSpecializeSignalOnLoad(Orb_Signal *o) { SyncEventSpecializeSignal(o); }
  virtual void SyncEventSpecializeSignal(Orb_Signal * /*o*/) {}
  virtual void SyncEventDeleteSignal(Orb_Signal * /*o*/) {}

  virtual void SyncEventSpecializeNetworkOnCreate(Orb_Network *o) { SyncEventSpecializeNetwork(o); }
  virtual void SyncEventSpecializeNetworkOnLoad(Orb_Network *o) { SyncEventSpecializeNetwork(o); }
  virtual void SyncEventSpecializeNetwork(Orb_Network * /*o*/) {}
  virtual void SyncEventDeleteNetwork(Orb_Network * /*o*/) {}

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

#pragma once

#include "Lum_TdmTraits.h"

#include "Orb_Templates.h"

// The library's client model. Attached to a host model, it subscribes to all
// host events and gives every design manager, design, view, block, pin,
// signal and network a client object of this library, built in the
// specialization events (with the creation flag true on create, false on
// load) and destroyed in the deletion events. It keeps no data of its own.
//
// A constructor of a client object that throws makes the event throw, and the
// exception reaches whoever caused the creation or load; nothing of the
// half-built object remains.
class LUM_TDM_API Lum_TdmModel : public Orb_ModelT<Lum_TdmTraits> {
public:
  // A new, empty host model, owned by this model; the three strings (model
  // name, database name, database path) go to the host unchanged.
  Lum_TdmModel(char const *name, char const *dbName, char const *path);
  // Attached to an existing host model, which the caller keeps.
  explicit Lum_TdmModel(Orb_Model *model);
  ~Lum_TdmModel() override;

  void SyncEventSpecializeDesignMgrOnLoad(Orb_DesignMgr *designMgr) override;
  void SyncEventSpecializeDesignOnCreate(Orb_Design *design) override;
  void SyncEventSpecializeDesignOnLoad(Orb_Design *design) override;
  void SyncEventSpecializeViewOnCreate(Orb_View *view) override;
  void SyncEventSpecializeViewOnLoad(Orb_View *view) override;
  void SyncEventSpecializeBlockOnCreate(Orb_Block *block) override;
  void SyncEventSpecializeBlockOnLoad(Orb_Block *block) override;
  void SyncEventSpecializePinOnCreate(Orb_Pin *pin) override;
  void SyncEventSpecializePinOnLoad(Orb_Pin *pin) override;
  void SyncEventSpecializeSignalOnCreate(Orb_Signal *signal) override;
  void SyncEventSpecializeSignalOnLoad(Orb_Signal *signal) override;
  void SyncEventSpecializeNetworkOnLoad(Orb_Network *network) override;

  void SyncEventDeleteDesignMgr(Orb_DesignMgr *designMgr) override;
  void SyncEventDeleteDesign(Orb_Design *design) override;
  void SyncEventDeleteView(Orb_View *view) override;
  void SyncEventDeleteBlock(Orb_Block *block) override;
  void SyncEventDeletePin(Orb_Pin *pin) override;
  void SyncEventDeleteSignal(Orb_Signal *signal) override;
  void SyncEventDeleteNetwork(Orb_Network *network) override;

  // Hooks around a hierarchy graft during typed block creation. They do
  // nothing here; a derived model may override them.
  virtual void RegisterGraftEventHandlers();
  virtual void UnregisterGraftEventHandlers();
  virtual void CleanupGraftProps();

  // Prints the model's own dump through the host's debug printer.
  void Dbg() const { DbgImpl(); }

protected:
  virtual void DbgImpl() const;
};

#include "Lum_TdmModel.h"

#include "Lum_TdmBlock.h"
#include "Lum_TdmDbg.h"
#include "Lum_TdmDesign.h"
#include "Lum_TdmDesignMgr.h"
#include "Lum_TdmNetwork.h"
#include "Lum_TdmPin.h"
#include "Lum_TdmSignal.h"
#include "Lum_TdmView.h"

#include "Lum_TlmTypeID.h"

namespace {
// Keeps the type registry alive while this library is loaded.
Lum_Tlm::TypeIDRegistryInitCounter g_TypeIDRegistryInitCounter;
} // namespace

Lum_TdmModel::Lum_TdmModel(char const *name, char const *dbName, char const *path)
    : Orb_ModelT<Lum_TdmTraits>(name, dbName, path, false) {
  SetEventNotifyAll();
}

Lum_TdmModel::Lum_TdmModel(Orb_Model *model) : Orb_ModelT<Lum_TdmTraits>(model) {
  SetEventNotifyAll();
}

Lum_TdmModel::~Lum_TdmModel() = default;

void Lum_TdmModel::SyncEventSpecializeDesignMgrOnLoad(Orb_DesignMgr *designMgr) {
  new Lum_TdmDesignMgr(this, designMgr);
}

void Lum_TdmModel::SyncEventSpecializeDesignOnCreate(Orb_Design *design) {
  new Lum_TdmDesign(this, design, true);
}

void Lum_TdmModel::SyncEventSpecializeDesignOnLoad(Orb_Design *design) {
  new Lum_TdmDesign(this, design, false);
}

void Lum_TdmModel::SyncEventSpecializeViewOnCreate(Orb_View *view) {
  new Lum_TdmView(this, view, true);
}

void Lum_TdmModel::SyncEventSpecializeViewOnLoad(Orb_View *view) {
  new Lum_TdmView(this, view, false);
}

void Lum_TdmModel::SyncEventSpecializeBlockOnCreate(Orb_Block *block) {
  new Lum_TdmBlock(this, block, true);
}

void Lum_TdmModel::SyncEventSpecializeBlockOnLoad(Orb_Block *block) {
  new Lum_TdmBlock(this, block, false);
}

void Lum_TdmModel::SyncEventSpecializePinOnCreate(Orb_Pin *pin) { new Lum_TdmPin(this, pin, true); }

void Lum_TdmModel::SyncEventSpecializePinOnLoad(Orb_Pin *pin) { new Lum_TdmPin(this, pin, false); }

void Lum_TdmModel::SyncEventSpecializeSignalOnCreate(Orb_Signal *signal) {
  new Lum_TdmSignal(this, signal, true);
}

void Lum_TdmModel::SyncEventSpecializeSignalOnLoad(Orb_Signal *signal) {
  new Lum_TdmSignal(this, signal, false);
}

void Lum_TdmModel::SyncEventSpecializeNetworkOnLoad(Orb_Network *network) {
  new Lum_TdmNetwork(this, network);
}

// The client registers itself with the bridge, so the handlers keep no
// pointer; deletion finds it there again.
void Lum_TdmModel::SyncEventDeleteDesignMgr(Orb_DesignMgr *designMgr) {
  delete GetClient(designMgr);
}

void Lum_TdmModel::SyncEventDeleteDesign(Orb_Design *design) { delete GetClient(design); }

void Lum_TdmModel::SyncEventDeleteView(Orb_View *view) { delete GetClient(view); }

void Lum_TdmModel::SyncEventDeleteBlock(Orb_Block *block) { delete GetClient(block); }

void Lum_TdmModel::SyncEventDeletePin(Orb_Pin *pin) { delete GetClient(pin); }

void Lum_TdmModel::SyncEventDeleteSignal(Orb_Signal *signal) { delete GetClient(signal); }

void Lum_TdmModel::SyncEventDeleteNetwork(Orb_Network *network) { delete GetClient(network); }

void Lum_TdmModel::RegisterGraftEventHandlers() {}

void Lum_TdmModel::UnregisterGraftEventHandlers() {}

void Lum_TdmModel::CleanupGraftProps() {}

void Lum_TdmModel::DbgImpl() const {
  Lum_TdmDbgFrame<Lum_TdmModel>([] {}, [this] { Orb_ModelT<Lum_TdmTraits>::Dbg(); });
}

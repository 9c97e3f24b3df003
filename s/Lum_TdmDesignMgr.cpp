#include "Lum_TdmDesignMgr.h"

#include "Lum_TdmDbg.h"
#include "Lum_TdmModel.h"

Lum_TdmDesignMgr::Lum_TdmDesignMgr(Lum_TdmModel *model, Orb_DesignMgr *designMgr)
    : Orb_DesignMgrT<Lum_TdmTraits>(model, designMgr) {}

Lum_TdmDesignMgr::~Lum_TdmDesignMgr() = default;

void Lum_TdmDesignMgr::DbgImpl() const {
  Lum_TdmDbgFrame<Lum_TdmDesignMgr>([] {}, [this] { Orb_DesignMgrDerived::Dbg(); });
}

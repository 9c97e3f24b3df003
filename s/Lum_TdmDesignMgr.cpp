#include "Lum_TdmDesignMgr.h"

#include "Lum_TdmDbg.h"
#include "Lum_TdmModel.h"

static_assert(sizeof(Lum_TdmDesignMgr) == sizeof(Orb_DesignMgrT<Lum_TdmTraits>),
              "Lum_TdmDesignMgr adds no field to its host base");

Lum_TdmDesignMgr::Lum_TdmDesignMgr(Lum_TdmModel *model, Orb_DesignMgr *designMgr)
    : Orb_DesignMgrT<Lum_TdmTraits>(model, designMgr) {}

Lum_TdmDesignMgr::~Lum_TdmDesignMgr() = default;

void Lum_TdmDesignMgr::DbgImpl() const {
  Lum_TdmDbgFrame<Lum_TdmDesignMgr>([] {}, [this] { Orb_DesignMgrDerived::Dbg(); });
}

#pragma once

#include "Lum_TdmTraits.h"

#include "Orb_Templates.h"

// Client of a host design manager. It adds nothing but its debug dump.
class LUM_TDM_API Lum_TdmDesignMgr : public Orb_DesignMgrT<Lum_TdmTraits> {
public:
  Lum_TdmDesignMgr(Lum_TdmModel *model, Orb_DesignMgr *designMgr);
  ~Lum_TdmDesignMgr() override;

  void Dbg() const { DbgImpl(); }

protected:
  virtual void DbgImpl() const;
};

#include "Ora_GraftMgr.h"

Ora_GraftMgr::Ora_GraftMgr(bool blockBackReferences, bool networkBackReferences)
    : m_BlockBackReferences(blockBackReferences), m_NetworkBackReferences(networkBackReferences) {}

Ora_GraftMgr::~Ora_GraftMgr() = default;

bool Ora_GraftMgr::Graft(Orb_Block const * /*source*/, Orb_Block * /*destination*/) { return true; }

void Ora_GraftMgr::CopyPinProperties(Orb_Pin const *source, Orb_Pin *destination) {
  destination->CopyPropertiesFrom(*source);
}

Orb_Block const *Ora_GraftMgr::GetBlockSource(Orb_Block const *copy) const {
  auto it = m_BlockSources.find(copy);
  return it == m_BlockSources.end() ? nullptr : it->second;
}

Orb_Network const *Ora_GraftMgr::GetNetworkSource(Orb_Network const *copy) const {
  auto it = m_NetworkSources.find(copy);
  return it == m_NetworkSources.end() ? nullptr : it->second;
}

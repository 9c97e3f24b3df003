#pragma once

// Host templates over the client bases: the same accessors, typed with the
// client classes that a traits class names (Traits::Model, DesignMgr, Design,
// View, Block, Pin, Signal, Network). Children reached through them are
// specialized on demand.

#include "Orb_Derived.h"

#include <cstddef>
#include <vector>

template <class Traits> class LUM_PLATFORM_API Orb_PinT : public Orb_PinDerived {
public:
  using Orb_PinDerived::Orb_PinDerived;
  typename Traits::Model *GetClientOrbModel() const {
    return static_cast<typename Traits::Model *>(Orb_PinDerived::GetClientOrbModel());
  }
  typename Traits::Block *GetParent() const {
    return static_cast<typename Traits::Block *>(Orb_PinDerived::GetParent());
  }
};

template <class Traits> class LUM_PLATFORM_API Orb_SignalT : public Orb_SignalDerived {
public:
  using Orb_SignalDerived::Orb_SignalDerived;
  typename Traits::Model *GetClientOrbModel() const {
    return static_cast<typename Traits::Model *>(Orb_SignalDerived::GetClientOrbModel());
  }
  typename Traits::Block *GetParent() const {
    return static_cast<typename Traits::Block *>(Orb_SignalDerived::GetParent());
  }
  typename Traits::Network *GetNetwork() const {
    return static_cast<typename Traits::Network *>(Orb_SignalDerived::GetNetwork());
  }
};

template <class Traits> class LUM_PLATFORM_API Orb_NetworkT : public Orb_NetworkDerived {
public:
  using Orb_NetworkDerived::Orb_NetworkDerived;
  typename Traits::Model *GetClientOrbModel() const {
    return static_cast<typename Traits::Model *>(Orb_NetworkDerived::GetClientOrbModel());
  }
  typename Traits::View *GetParent() const {
    return static_cast<typename Traits::View *>(Orb_NetworkDerived::GetParent());
  }
  // The i-th signal in host order, specialized on demand.
  typename Traits::Signal *GetSignal(std::size_t i) const {
    return static_cast<typename Traits::Signal *>(GetContext()->Specialize(GetSignals()[i]));
  }
};

template <class Traits> class LUM_PLATFORM_API Orb_BlockT : public Orb_BlockDerived {
public:
  using Orb_BlockDerived::Orb_BlockDerived;
  typename Traits::Model *GetClientOrbModel() const {
    return static_cast<typename Traits::Model *>(Orb_BlockDerived::GetClientOrbModel());
  }
  typename Traits::Block *GetParent() const {
    return static_cast<typename Traits::Block *>(Orb_BlockDerived::GetParent());
  }
  typename Traits::View *GetView() const {
    return static_cast<typename Traits::View *>(Orb_BlockDerived::GetView());
  }
  // The i-th child block, pin or signal in host order, specialized on demand.
  typename Traits::Block *GetBlock(std::size_t i) const {
    return static_cast<typename Traits::Block *>(GetContext()->Specialize(GetBlocks()[i]));
  }
  typename Traits::Pin *GetPin(std::size_t i) const {
    return static_cast<typename Traits::Pin *>(GetContext()->Specialize(GetPins()[i]));
  }
  typename Traits::Signal *GetSignal(std::size_t i) const {
    return static_cast<typename Traits::Signal *>(GetContext()->Specialize(GetSignals()[i]));
  }
  typename Traits::Pin *GetPinByName(char const *name) const {
    return static_cast<typename Traits::Pin *>(Orb_BlockDerived::GetPinByName(name));
  }
  typename Traits::Block *GetBlockByName(char const *name) const {
    return static_cast<typename Traits::Block *>(Orb_BlockDerived::GetBlockByName(name));
  }
  typename Traits::Block *CreateBlock(char const *name, int flags) {
    return static_cast<typename Traits::Block *>(Orb_BlockDerived::CreateBlock(name, flags));
  }
  typename Traits::Pin *CreatePin(char const *name, Orb_Pin::PIN_DIRECTION direction) {
    return static_cast<typename Traits::Pin *>(Orb_BlockDerived::CreatePin(name, direction));
  }
  typename Traits::Signal *CreateSignal(char const *name) {
    return static_cast<typename Traits::Signal *>(Orb_BlockDerived::CreateSignal(name));
  }
};

template <class Traits> class LUM_PLATFORM_API Orb_ViewT : public Orb_ViewDerived {
public:
  using Orb_ViewDerived::Orb_ViewDerived;
  typename Traits::Model *GetClientOrbModel() const {
    return static_cast<typename Traits::Model *>(Orb_ViewDerived::GetClientOrbModel());
  }
  typename Traits::Design *GetParent() const {
    return static_cast<typename Traits::Design *>(Orb_ViewDerived::GetParent());
  }
  typename Traits::Block *GetBlock() const {
    return static_cast<typename Traits::Block *>(Orb_ViewDerived::GetBlock());
  }
  typename Traits::Network *GetNetwork(std::size_t i) const {
    return static_cast<typename Traits::Network *>(GetContext()->Specialize(GetNetworks()[i]));
  }
  typename Traits::Block *CreateTopBlock(char const *name) {
    return static_cast<typename Traits::Block *>(Orb_ViewDerived::CreateTopBlock(name));
  }
  typename Traits::Network *CreateNetwork(char const *name) {
    return static_cast<typename Traits::Network *>(Orb_ViewDerived::CreateNetwork(name));
  }
  void LoadAllBlocks(std::vector<typename Traits::Block *> &blocks) const {
    std::vector<Orb_BlockDerived *> all;
    Orb_ViewDerived::LoadAllBlocks(all);
    blocks.reserve(blocks.size() + all.size());
    for (Orb_BlockDerived *block : all)
      blocks.push_back(static_cast<typename Traits::Block *>(block));
  }
};

template <class Traits> class LUM_PLATFORM_API Orb_DesignT : public Orb_DesignDerived {
public:
  using Orb_DesignDerived::Orb_DesignDerived;
  typename Traits::Model *GetClientOrbModel() const {
    return static_cast<typename Traits::Model *>(Orb_DesignDerived::GetClientOrbModel());
  }
  typename Traits::DesignMgr *GetParent() const {
    return static_cast<typename Traits::DesignMgr *>(Orb_DesignDerived::GetParent());
  }
  typename Traits::View *GetViewByName(char const *name) const {
    return static_cast<typename Traits::View *>(Orb_DesignDerived::GetViewByName(name));
  }
  typename Traits::View *CreateView(char const *name) {
    return static_cast<typename Traits::View *>(Orb_DesignDerived::CreateView(name));
  }
};

template <class Traits> class LUM_PLATFORM_API Orb_DesignMgrT : public Orb_DesignMgrDerived {
public:
  using Orb_DesignMgrDerived::Orb_DesignMgrDerived;
  typename Traits::Model *GetClientOrbModel() const {
    return static_cast<typename Traits::Model *>(Orb_DesignMgrDerived::GetClientOrbModel());
  }
  typename Traits::Design *GetDesignByName(char const *name) const {
    return static_cast<typename Traits::Design *>(Orb_DesignMgrDerived::GetDesignByName(name));
  }
  typename Traits::Design *CreateDesign(char const *name) {
    return static_cast<typename Traits::Design *>(Orb_DesignMgrDerived::CreateDesign(name));
  }
};

template <class Traits> class LUM_PLATFORM_API Orb_ModelT : public Orb_ModelDerived {
public:
  using Orb_ModelDerived::Orb_ModelDerived;
  typename Traits::DesignMgr *CreateDesignMgr(char const *name) {
    return static_cast<typename Traits::DesignMgr *>(Orb_ModelDerived::CreateDesignMgr(name));
  }
  typename Traits::DesignMgr *GetDesignMgrByName(char const *name) {
    return static_cast<typename Traits::DesignMgr *>(Orb_ModelDerived::GetDesignMgrByName(name));
  }
};

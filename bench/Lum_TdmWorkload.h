#pragma once

// The typed workload of the library benchmarks: the host workload of
// Orb_HostWorkload.h (a top block with `blocks` children "u<i>" of 8 pins
// A0..A4, Y0..Y2 and 7 signals per child in the top block), made through the
// library: every child is created with CreateTypedBlock, with its pins, from
// one of 16 type blocks CELL0..CELL15 (taken round robin) of one registered
// type library, then its pins are wired as the host workload wires them.
//
// Also here: a client model that only specializes (plain client classes, no
// binding), the floor that the typed open is compared with.

#include "Orb_HostWorkload.h"

#include "Lum_TdmBlock.h"
#include "Lum_TdmDesign.h"
#include "Lum_TdmDesignMgr.h"
#include "Lum_TdmModel.h"
#include "Lum_TdmPin.h"
#include "Lum_TdmView.h"

#include "Lum_TdmSchema.h"
#include "Lum_Tlm.h"
#include "Orb_Templates.h"

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

namespace Lum_TdmWorkload {

inline constexpr char const *kLibrary = "CELLS";
inline constexpr int kTypeBlocks = 16;
inline constexpr char const *kInputs[] = {"A0", "A1", "A2", "A3", "A4"};
inline constexpr char const *kOutputs[] = {"Y0", "Y1", "Y2"};

// The type library CELLS: 16 type blocks CELL<t>, each with the pins A0..A4
// (inputs) and Y0..Y2 (outputs), registered in the catalog while it lives.
class Library {
public:
  Library() : m_Model(kLibrary, kLibrary, "", false) {
    Lum_TlmLibrary *library = m_Model.CreateLibrary(kLibrary, 1, 0);
    for (int t = 0; t < kTypeBlocks; ++t) {
      Lum_TlmBlock *typeBlock = library->CreateTypeBlock(("CELL" + std::to_string(t)).c_str());
      for (char const *input : kInputs)
        typeBlock->CreatePin(input, Orb_Pin::PIN_INPUT);
      for (char const *output : kOutputs)
        typeBlock->CreatePin(output, Orb_Pin::PIN_OUTPUT);
      m_TypeBlocks.push_back(typeBlock);
    }
    Lum_TlmCatalog::Register(library);
    m_pLibrary = library;
  }
  ~Library() { Lum_TlmCatalog::Unregister(m_pLibrary); }
  Library(Library const &) = delete;
  Library &operator=(Library const &) = delete;

  Lum_TlmBlock const *TypeBlock(std::int64_t i) const {
    return m_TypeBlocks[static_cast<std::size_t>(i % kTypeBlocks)];
  }
  std::vector<Lum_TlmBlock *> const &TypeBlocks() const { return m_TypeBlocks; }

private:
  Lum_TlmModel m_Model;
  Lum_TlmLibrary *m_pLibrary = nullptr;
  std::vector<Lum_TlmBlock *> m_TypeBlocks;
};

// The view with its design manager and design, listing the library CELLS.
inline Lum_TdmView *MakeView(Lum_TdmModel &model) {
  Lum_TdmView *view = model.CreateDesignMgr(Orb_HostWorkload::kDesignMgr)
                          ->CreateDesign(Orb_HostWorkload::kDesign)
                          ->CreateView(Orb_HostWorkload::kView);
  view->CreatePropertyString(Lum_TdmSchema::kDevicePm, "pm");
  view->CreatePropertyString(Lum_TdmSchema::kDevicePart, "part");
  view->CreatePropertyStringList(Lum_TdmSchema::kTypeLibraries)->AppendString("CELLS 1.0");
  return view;
}

// The view of the workload in `model`.
inline Lum_TdmView *ViewOf(Lum_TdmModel &model) {
  return model.GetDesignMgrByName(Orb_HostWorkload::kDesignMgr)
      ->GetDesignByName(Orb_HostWorkload::kDesign)
      ->GetViewByName(Orb_HostWorkload::kView);
}

// The typed creation alone: the top block and its typed children with their
// pins, unconnected.
inline Lum_TdmBlock *CreateBlocks(Lum_TdmModel &model, Library const &library,
                                  std::int64_t blocks) {
  Lum_TdmBlock *top = MakeView(model)->CreateTopBlock(Orb_HostWorkload::kTop);
  for (std::int64_t i = 0; i < blocks; ++i)
    top->CreateTypedBlock(("u" + std::to_string(i)).c_str(), library.TypeBlock(i), false, true);
  return top;
}

// Wires the children of `top` as Orb_HostWorkload::Build does: "c<i>" from
// Y0 of u<i> to A0 of u<i+1>, "n<i>_<pin>" alone on each other pin. The pins
// stand in the type block's order: A0..A4, Y0..Y2.
inline void Wire(Orb_Block *top) {
  Orb_Signal *chain = nullptr;
  std::string name;
  auto const &children = top->GetBlocks();
  for (std::size_t i = 0; i < children.size(); ++i) {
    std::string const index = std::to_string(i);
    auto const &pins = children[i]->GetPins();
    if (chain)
      pins[0]->Connect(chain);
    chain = top->CreateSignal(("c" + index).c_str());
    pins[5]->Connect(chain);
    for (int p : {1, 2, 3, 4, 6, 7}) {
      name = "n" + index + "_" + pins[static_cast<std::size_t>(p)]->GetName();
      pins[static_cast<std::size_t>(p)]->Connect(top->CreateSignal(name.c_str()));
    }
  }
}

// ---------------------------------------------------------------------------
// A client model that only specializes: one plain client object per host
// object, made on load and destroyed on deletion, nothing read or bound.

class PlainModel;
class PlainDesignMgr;
class PlainDesign;
class PlainView;
class PlainBlock;
class PlainPin;
class PlainSignal;
class PlainNetwork;

struct PlainTraits {
  using Model = PlainModel;
  using DesignMgr = PlainDesignMgr;
  using Design = PlainDesign;
  using View = PlainView;
  using Block = PlainBlock;
  using Pin = PlainPin;
  using Signal = PlainSignal;
  using Network = PlainNetwork;
};

class PlainDesignMgr : public Orb_DesignMgrT<PlainTraits> {
  using Orb_DesignMgrT<PlainTraits>::Orb_DesignMgrT;
};
class PlainDesign : public Orb_DesignT<PlainTraits> {
  using Orb_DesignT<PlainTraits>::Orb_DesignT;
};
class PlainView : public Orb_ViewT<PlainTraits> {
  using Orb_ViewT<PlainTraits>::Orb_ViewT;
};
class PlainBlock : public Orb_BlockT<PlainTraits> {
  using Orb_BlockT<PlainTraits>::Orb_BlockT;
};
class PlainPin : public Orb_PinT<PlainTraits> {
  using Orb_PinT<PlainTraits>::Orb_PinT;
};
class PlainSignal : public Orb_SignalT<PlainTraits> {
  using Orb_SignalT<PlainTraits>::Orb_SignalT;
};
class PlainNetwork : public Orb_NetworkT<PlainTraits> {
  using Orb_NetworkT<PlainTraits>::Orb_NetworkT;
};

class PlainModel : public Orb_ModelT<PlainTraits> {
public:
  PlainModel() : Orb_ModelT<PlainTraits>("plain", "plain", "", false) { SetEventNotifyAll(); }

  void SyncEventSpecializeDesignMgr(Orb_DesignMgr *o) override { new PlainDesignMgr(this, o); }
  void SyncEventSpecializeDesign(Orb_Design *o) override { new PlainDesign(this, o); }
  void SyncEventSpecializeView(Orb_View *o) override { new PlainView(this, o); }
  void SyncEventSpecializeBlock(Orb_Block *o) override { new PlainBlock(this, o); }
  void SyncEventSpecializePin(Orb_Pin *o) override { new PlainPin(this, o); }
  void SyncEventSpecializeSignal(Orb_Signal *o) override { new PlainSignal(this, o); }
  void SyncEventSpecializeNetwork(Orb_Network *o) override { new PlainNetwork(this, o); }
  void SyncEventDeleteDesignMgr(Orb_DesignMgr *o) override { delete GetClient(o); }
  void SyncEventDeleteDesign(Orb_Design *o) override { delete GetClient(o); }
  void SyncEventDeleteView(Orb_View *o) override { delete GetClient(o); }
  void SyncEventDeleteBlock(Orb_Block *o) override { delete GetClient(o); }
  void SyncEventDeletePin(Orb_Pin *o) override { delete GetClient(o); }
  void SyncEventDeleteSignal(Orb_Signal *o) override { delete GetClient(o); }
  void SyncEventDeleteNetwork(Orb_Network *o) override { delete GetClient(o); }
};

} // namespace Lum_TdmWorkload

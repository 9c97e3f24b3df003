#pragma once

// The host workload of the storage benchmarks: one view whose top block holds
// `blocks` child blocks "u<i>", each with 8 pins (5 inputs A0..A4, 3 outputs
// Y0..Y2) and one string property "TYPE" naming one of 16 cell types, taken
// round robin. The top block holds 7 signals per child: "c<i>" chains output
// Y0 of u<i> to input A0 of u<i+1>, and "n<i>_<pin>" connects each of the
// other six pins alone. Child pins connect on their outer side.
//
// The design manager, design and view are made through a Lum_TdmModel, so
// that they carry its stamps and a Lum_TdmModel opens the file; blocks, pins
// and signals are made through the host API alone and carry no typing.

#include "Lum_TdmDesign.h"
#include "Lum_TdmDesignMgr.h"
#include "Lum_TdmModel.h"
#include "Lum_TdmView.h"

#include "Orb_Model.h"

#include <cstdint>
#include <string>

namespace Orb_HostWorkload {

inline constexpr char const *kDesignMgr = "dm";
inline constexpr char const *kDesign = "chip";
inline constexpr char const *kView = "netlist";
inline constexpr char const *kTop = "top";

// The view, made with its design manager and design in `model`.
inline Orb_View *MakeView(Orb_Model &model) {
  Lum_TdmModel stamps(&model);
  Lum_TdmView *view = stamps.CreateDesignMgr(kDesignMgr)->CreateDesign(kDesign)->CreateView(kView);
  return view->GetOrbView();
}

inline Orb_Block *TopBlock(Orb_Model &model) {
  return model.GetDesignMgrByName(kDesignMgr)
      ->GetDesignByName(kDesign)
      ->GetViewByName(kView)
      ->GetBlock();
}

// Builds the workload in `model`, which must not hold it yet.
inline void Build(Orb_Model &model, std::int64_t blocks) {
  static char const *const kInputs[] = {"A0", "A1", "A2", "A3", "A4"};
  static char const *const kOutputs[] = {"Y0", "Y1", "Y2"};
  Orb_Block *top = MakeView(model)->CreateTopBlock(kTop);
  Orb_Signal *chain = nullptr;
  std::string name;
  for (std::int64_t i = 0; i < blocks; ++i) {
    std::string const index = std::to_string(i);
    Orb_Block *block = top->CreateBlock(("u" + index).c_str());
    block->CreatePropertyString("TYPE", ("CELL" + std::to_string(i % 16)).c_str());
    Orb_Pin *pins[8];
    for (int p = 0; p < 5; ++p)
      pins[p] = block->CreatePin(kInputs[p], Orb_Pin::PIN_INPUT);
    for (int p = 0; p < 3; ++p)
      pins[5 + p] = block->CreatePin(kOutputs[p], Orb_Pin::PIN_OUTPUT);
    if (chain)
      pins[0]->Connect(chain);
    chain = top->CreateSignal(("c" + index).c_str());
    pins[5]->Connect(chain);
    for (int p : {1, 2, 3, 4, 6, 7}) {
      name = "n" + index + "_" + pins[p]->GetName();
      pins[p]->Connect(top->CreateSignal(name.c_str()));
    }
  }
}

} // namespace Orb_HostWorkload

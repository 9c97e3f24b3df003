#pragma once

// Symbols that libLum_Tdm exports.
#define LUM_TDM_API __attribute__((visibility("default")))

class Lum_TdmBlock;
class Lum_TdmDesign;
class Lum_TdmDesignMgr;
class Lum_TdmModel;
class Lum_TdmNetwork;
class Lum_TdmPin;
class Lum_TdmSignal;
class Lum_TdmView;

// Makes the host templates hand out this library's client classes: a
// block's pins are Lum_TdmPins, a pin's parent is a Lum_TdmBlock, and so on.
struct Lum_TdmTraits {
  using Model = Lum_TdmModel;
  using DesignMgr = Lum_TdmDesignMgr;
  using Design = Lum_TdmDesign;
  using View = Lum_TdmView;
  using Block = Lum_TdmBlock;
  using Pin = Lum_TdmPin;
  using Signal = Lum_TdmSignal;
  using Network = Lum_TdmNetwork;
};

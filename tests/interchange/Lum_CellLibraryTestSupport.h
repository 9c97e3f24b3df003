#pragma once

// What the cell-library tests share: a type library as one line per cell.

#include "Lum_CellLibraryReader.h"

#include "Lum_Tlm.h"
#include "Orb_Model.h"
#include "Orb_Property.h"

#include <cstdlib>
#include <string>

namespace celltest {

// The real cell libraries: LUM_REAL_DIR from the environment when set (a
// work tree that does not sit beside them), else beside the repository.
inline std::string LibDir() {
  char const *dir = std::getenv("LUM_REAL_DIR");
  return std::string(dir && *dir ? dir : LUM_REAL_DIR) + "/lib/";
}

// " key=value" when the object has the property.
template <class Object>
std::string Shown(Object const *object, char const *property, char const *key) {
  Orb_Property const *found = object->GetPropertyByName(property);
  return found ? std::string(" ") + key + "=" + found->GetStringValue() : "";
}

// "NAME[ area=..][ dont_use=..][ supply=..](PIN in|out|inout[ f=..][ clock=..], ...)".
inline std::string Cell(Lum_TlmBlock const *block) {
  namespace n = Lum_CellLibraryNames;
  std::string text = block->GetName();
  std::string const extras = Shown(block, n::kArea, "area") +
                             Shown(block, n::kDontUse, "dont_use") +
                             Shown(block, n::kSupplyPins, "supply");
  if (!extras.empty())
    text += "[" + extras.substr(1) + "]";
  text += "(";
  for (std::size_t i = 0; i < block->GetPins().size(); ++i) {
    Lum_TlmPin const *pin = block->GetPin(i);
    Orb_Pin::PIN_DIRECTION const direction = pin->GetDirection();
    text += std::string(i ? ", " : "") + pin->GetName() +
            (direction == Orb_Pin::PIN_INPUT    ? " in"
             : direction == Orb_Pin::PIN_OUTPUT ? " out"
                                                : " inout") +
            Shown(pin, n::kFunction, "f") + Shown(pin, n::kClock, "clock");
  }
  return text + ")";
}

// Every cell of the model's library, one line each.
inline std::string Cells(Lum_TlmModel &model) {
  std::string text;
  for (Lum_TlmBlock const *block : model.GetLibrary()->GetTypeBlocks())
    text += Cell(block) + "\n";
  return text;
}

} // namespace celltest

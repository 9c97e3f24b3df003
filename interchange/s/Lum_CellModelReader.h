#pragma once

// The reader of cell models in Yosys JSON (`write_json` after reading cell
// models with -lib): every blackbox module becomes a cell, its ports its
// pins; a port of several bits becomes one pin per bit, "P[i]", in the
// declared order (from the left index to the right one).

#include "Lum_CellLibraryData.h"

#include <string>
#include <string_view>

class Lum_CellModelReader {
public:
  // Reads the whole document and checks all of it. Invalid JSON, a
  // document that is not a Yosys JSON file, a file without blackbox
  // modules, a port without a direction or bits and a cell or pin named
  // twice throw Lum_ExceptionInvalidFormat naming the file, line and column
  // and the module and port.
  static Lum_CellLibraryData Read(std::string_view text, std::string const &path);
};

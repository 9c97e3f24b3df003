#pragma once

#include "Lum_InterchangeApi.h"
#include "Lum_Netlist.h"

class Lum_TdmView;

// Makes the netlist of a view, folding its hierarchy back into modules: the
// top block is the top module; a child typed by a type block of the local
// library is an instance of the module of that name, whose contents are
// those of the first such instance met (depth first); every other child is
// a cell of its type block's name (an untyped child: of the cell type it was
// imported with). Net names, port order, constants and parameters come from
// the properties the import wrote; blocks made otherwise get their pin and
// signal names. A bus pin "B[i]" is bit i of port B.
class LUM_INTERCHANGE_API Lum_NetlistExporter {
public:
  static Lum_Netlist Export(Lum_TdmView &view);
};

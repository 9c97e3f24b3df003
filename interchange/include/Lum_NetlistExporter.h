#pragma once

#include "Lum_InterchangeApi.h"
#include "Lum_Netlist.h"
#include "Lum_NetlistWriter.h"

#include <string>
#include <vector>

class Lum_TdmModel;
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
  // Writes every view of the model that has a top block as a file of its
  // own in `dir`, "<design>.<view>.json" or ".v" (the design manager's name
  // put first when two views would share a name; characters a file name
  // should not carry become "_"), in host order, and returns the paths.
  // Each view is exported and saved before the next is made, each file
  // atomically. A view that cannot be exported or saved throws
  // Lum_ExceptionInvalidFormat naming the file and the view, leaving no file
  // of that view; the files of the views before it stay.
  static std::vector<std::string> SaveAll(Lum_TdmModel &model, std::string const &dir,
                                          Lum_NetlistWriter::Format format);
};

#pragma once

// What both netlist fuzz targets do with a netlist their reader took: import
// it (cells of no library untyped), export it again, write it in both forms
// and read each back. Only the project's exceptions may come out of a
// reader, the import or a writer; anything else (a crash, a leak, another
// exception) is a finding.

#include "Lum_ExceptionInvalidFormat.h"
#include "Lum_Netlist.h"
#include "Lum_NetlistExporter.h"
#include "Lum_NetlistImporter.h"
#include "Lum_NetlistJsonReader.h"
#include "Lum_NetlistVerilogReader.h"
#include "Lum_NetlistWriter.h"
#include "Lum_TdmModel.h"

#include "Port_Exception.h"

#include <sstream>

namespace LumFuzzNetlist {

inline void Exercise(Lum_Netlist const &netlist) {
  std::ostringstream json;
  Lum_NetlistWriter::WriteJson(netlist, json);
  Lum_NetlistJsonReader::ReadText(json.str(), "rewritten.json");
  try {
    Lum_TdmModel model("fuzz", "fuzz", "");
    Lum_NetlistImportOptions options;
    options.blackboxUnknown = true;
    Lum_TdmView *view = Lum_NetlistImporter::Import(model, netlist, options);
    Lum_Netlist const out = Lum_NetlistExporter::Export(*view);
    std::ostringstream verilog;
    Lum_NetlistWriter::WriteVerilog(out, verilog);
    Lum_NetlistVerilogReader::ReadText(verilog.str(), "exported.v");
  } catch (Port::Exception const &) {
    // A netlist that reads but does not map (a missing top, a width
    // mismatch, a name Verilog cannot carry) is refused, not a finding.
  }
}

} // namespace LumFuzzNetlist

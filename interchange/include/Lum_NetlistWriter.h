#pragma once

#include "Lum_InterchangeApi.h"
#include "Lum_Netlist.h"

#include <ostream>
#include <string>

// Writes a netlist as JSON (the form the JSON reader takes) or as
// structural Verilog (the form the Verilog reader takes). In Verilog, names
// that are not plain identifiers are escaped, a net with several names is
// declared under each, the later names tied to the first by assign, and
// bits no name covers get a generated wire.
class LUM_INTERCHANGE_API Lum_NetlistWriter {
public:
  enum class Format { Json, Verilog };

  static void WriteJson(Lum_Netlist const &netlist, std::ostream &out);
  // Throws Lum_ExceptionInvalidFormat (object: `name`) for a name Verilog
  // cannot carry (one with white space).
  static void WriteVerilog(Lum_Netlist const &netlist, std::ostream &out,
                           std::string const &name = "netlist");
  // Writes the file through a temporary beside it, renamed over the target
  // once complete: a failure leaves the previous file as it was. Throws
  // Lum_ExceptionInvalidFormat naming the file when it cannot be written.
  static void Save(Lum_Netlist const &netlist, std::string const &path, Format format);
  // "json" or "verilog" from a path's extension (.json, .v); Json otherwise.
  static Format FormatOf(std::string const &path);
};

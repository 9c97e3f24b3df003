#pragma once

#include "Lum_InterchangeApi.h"
#include "Lum_Netlist.h"

#include <string>
#include <string_view>

// Reads a netlist in the JSON form a synthesis tool writes: "modules", each
// with "ports" (direction, bits LSB first, offset, upto, signed), "cells"
// (type, parameters, port_directions, connections as bit lists) and
// "netnames" (several names may share bits), bits as integers or the
// constants "0", "1", "x", "z", and the "top" and "blackbox" attributes.
// Fields it does not know are skipped.
//
// Every failure is Lum_ExceptionInvalidFormat with the file and the path in
// the document where it was found ("modules.cpu.cells.$abc$12.connections.A"):
// text that is not JSON, a field of the wrong type, a bit id that no port or
// net name declares, two modules or ports of one name.
class LUM_INTERCHANGE_API Lum_NetlistJsonReader {
public:
  static Lum_Netlist Read(std::string const &path);
  // `path` names the text in messages.
  static Lum_Netlist ReadText(std::string_view text, std::string const &path);
};

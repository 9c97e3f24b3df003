#pragma once

#include "Lum_InterchangeApi.h"
#include "Lum_Netlist.h"

#include <string>
#include <string_view>

// Reads structural (gate-level) Verilog: modules with ANSI or non-ANSI port
// lists; input, output, inout, wire declarations with ranges; instances with
// parameters and named or positional connections; bit- and part-selects,
// concatenations (with repetition) and sized constants in connections;
// assign between nets (the two sides become one net); escaped identifiers;
// (* attributes *) and comments, which are skipped.
//
// Everything else (behavioural code, operators, parameters of modules) is
// refused with Lum_ExceptionInvalidFormat naming the file, line and column.
// The reader is linear in its input: one pass, nesting of concatenations and
// the length of a token bounded.
class LUM_INTERCHANGE_API Lum_NetlistVerilogReader {
public:
  static Lum_Netlist Read(std::string const &path);
  // `path` names the text in messages.
  static Lum_Netlist ReadText(std::string_view text, std::string const &path);
};

#pragma once

#include "Lum_InterchangeApi.h"
#include "Lum_Netlist.h"

#include <cstdint>
#include <functional>
#include <map>
#include <string>
#include <vector>

class Lum_TdmModel;
class Lum_TdmView;

// Names of the host properties the netlist mapping writes and reads back.
namespace Lum_NetlistProperties {
// Block of a module (the view's top block, a module's type block): the ports
// in order, each member "<direction> <width> <offset> <upto> <signed>", and
// the named nets, each member "<width> <offset> <upto> <signed> <hidden>".
constexpr char const *kPorts = "NL_PORTS";
constexpr char const *kNetNames = "NL_NETNAMES";
// Type block of a module whose name a type block cannot carry (a ":").
constexpr char const *kModuleName = "NL_MODULE_NAME";
// Signal: every name of the net, each entry "<bit position> <net name>".
constexpr char const *kNames = "NL_NAMES";
// Signal standing for a constant: "0", "1", "x" or "z".
constexpr char const *kConstant = "NL_CONSTANT";
// Instance: its parameters (members name = bits, MSB first) and string
// parameters (members name = text).
constexpr char const *kParameters = "NL_PARAMETERS";
constexpr char const *kStringParameters = "NL_STRING_PARAMETERS";
// Untyped instance of a cell no library has: the cell type.
constexpr char const *kCellType = "NL_CELL_TYPE";
} // namespace Lum_NetlistProperties

struct Lum_NetlistImportOptions {
  std::string top;                  // empty: the netlist's own top
  std::string viewName = "netlist"; // also the name of the modules' hierarchies
  std::string personality = "generic";
  std::string part = "generic";
  // Libraries the view draws from, by name, in lookup order; each must be
  // loadable (registered with the catalog or on the search path).
  std::vector<std::string> libraries;
  // Cells of no library become untyped blocks instead of an error.
  bool blackboxUnknown = false;
  // Called with the number of blocks made since the last call.
  std::function<void(std::uint64_t)> progress;
};

struct Lum_NetlistImportSummary {
  std::string top;
  std::uint64_t modules = 0; // design modules, the top included
  std::uint64_t nets = 0;    // signals made
  std::uint64_t untyped = 0; // instances of unknown cells (--blackbox-unknown)
  std::uint64_t moduleInstances = 0;
  // Instances of library cells by library, each module's counted once
  // however often the module is used.
  std::map<std::string, std::uint64_t> instancesByLibrary;
};

// Builds a design database from a netlist: a design manager and a design
// named after the top module, one view of it with the device and the
// libraries, and the top module as the view's top block. Each instance of a
// library cell is a child typed by its cell (bus ports bit by bit on pins
// "B[i]"); each design module becomes a type block of the database's local
// library with the module's contents as its hierarchy, and its instances are
// typed children with that hierarchy grafted beneath. Net names, port order,
// constants and parameters are kept in the NL_ properties above.
//
// Everything is checked before anything is built: an unknown top, a module
// that instantiates itself, a connection to a port the cell lacks or of
// another width, and cells of unknown types (one error listing every
// unknown type with its count and example instances) throw
// Lum_ExceptionInvalidFormat naming the netlist file and the position.
class LUM_INTERCHANGE_API Lum_NetlistImporter {
public:
  static Lum_TdmView *Import(Lum_TdmModel &model, Lum_Netlist const &netlist,
                             Lum_NetlistImportOptions const &options,
                             Lum_NetlistImportSummary *summary = nullptr);
};

#pragma once

// Cell libraries as users have them (Liberty files, cell models written as
// Yosys JSON blackbox modules) made into type libraries: one type block per
// cell, one type pin per logic pin with its direction.

#include "Lum_InterchangeApi.h"

#include <cstddef>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

class Lum_TlmModel;

struct Lum_CellLibraryOptions {
  // The type library's name; empty: the file's own (Liberty `library (name)`,
  // JSON: the file name without its extension).
  std::string name;
  // The device personality and part the library is for (cell libraries do
  // not name one); stored as the library's qualifiers when not empty.
  std::string personality;
  std::string part;
};

// What a read found, for a summary line and for tests.
struct Lum_CellLibrarySummary {
  std::string name; // the type library's name
  std::size_t cells = 0;
  std::size_t inputs = 0; // type pins by direction
  std::size_t outputs = 0;
  std::size_t inouts = 0;
  std::size_t buses = 0;            // bus ports (their bits count as pins above)
  std::size_t internalPins = 0;     // left out: not ports
  std::size_t supplyPins = 0;       // left out of the pins, kept as a cell property
  std::vector<std::string> dontUse; // cells marked dont_use, in file order
};

// Names of the properties the readers store (all string properties).
namespace Lum_CellLibraryNames {
constexpr char const *kArea = "LIB_AREA";              // type block: `area` as written
constexpr char const *kDontUse = "LIB_DONT_USE";       // type block: "true" when marked
constexpr char const *kSupplyPins = "LIB_SUPPLY_PINS"; // type block: "VDD:primary_power VSS:..."
constexpr char const *kFunction = "LIB_FUNCTION";      // type pin: `function` as written
constexpr char const *kClock = "LIB_CLOCK";            // type pin: "true" when a clock pin
constexpr char const *kThreeState = "LIB_THREE_STATE"; // type pin: `three_state` as written
constexpr char const *kSourceFormat = "LIB_SOURCE";    // type library: "liberty" or "json"
constexpr char const *kRevision = "LIB_REVISION";      // type library: Liberty `revision`
constexpr char const *kDate = "LIB_DATE";              // type library: Liberty `date`
} // namespace Lum_CellLibraryNames

class LUM_INTERCHANGE_API Lum_CellLibraryReader {
public:
  // Reads a Liberty file or Yosys JSON cell models (told apart by content)
  // into a new type library model holding one Lum_TlmLibrary. A file that
  // cannot be read or is not valid, and an ambiguous cell (two cells or two
  // pins of one name, a bus whose width disagrees with its type, a pin
  // without a direction), throw Lum_ExceptionInvalidFormat naming the file,
  // line and column; nothing is returned then.
  static std::unique_ptr<Lum_TlmModel> Read(std::string const &path,
                                            Lum_CellLibraryOptions const &options,
                                            Lum_CellLibrarySummary *summary = nullptr);
  // Reads from memory (fuzz targets, tests); `path` only names it in
  // messages and, for JSON, gives the default name.
  static std::unique_ptr<Lum_TlmModel> ReadText(std::string_view text, std::string const &path,
                                                Lum_CellLibraryOptions const &options,
                                                Lum_CellLibrarySummary *summary = nullptr);
  // Saves the model's library as <dir>/<name>.tlm through the host's safe
  // save (a temporary file renamed over the target: a failure leaves no new
  // file and the previous one intact) and returns the path. Throws
  // Orb_Exception when it cannot be written and Lum_ExceptionInvalidFormat
  // for a model without a library.
  static std::string Save(Lum_TlmModel const &library, std::string const &dir);
};

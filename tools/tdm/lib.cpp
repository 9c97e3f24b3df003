// tdm lib: turns a cell library (a Liberty file or JSON cell models) into a
// type library file, and lists what a type library file holds.

#include "commands.h"

#include "Lum_CellLibraryReader.h"

#include "Lum_Tlm.h"
#include "Orb_Model.h"
#include "Orb_Property.h"
#include "Port_Exception.h"

#include <CLI/CLI.hpp>

#include <cstdio>
#include <filesystem>
#include <string>
#include <system_error>
#include <vector>

namespace tdm {
namespace {

// The first ten names, then how many more.
std::string Joined(std::vector<std::string> const &names) {
  std::size_t const shown = names.size() < 10 ? names.size() : 10;
  std::string text;
  for (std::size_t i = 0; i < shown; ++i)
    text += (i ? ", " : "") + names[i];
  if (shown < names.size())
    text += " and " + std::to_string(names.size() - shown) + " more";
  return text;
}

std::string Plural(std::size_t n, char const *what, char const *plural = "s") {
  return std::to_string(n) + " " + what + (n == 1 ? "" : plural);
}

int RunImport(LibOptions const &lib, CommonOptions const &options) {
  Lum_CellLibraryOptions read;
  read.name = lib.name;
  read.personality = lib.personality;
  read.part = lib.part;
  Lum_CellLibrarySummary summary;
  std::string saved;
  try {
    std::unique_ptr<Lum_TlmModel> model = Lum_CellLibraryReader::Read(lib.file, read, &summary);
    // A folder named with -o that does not exist yet is made; a failed save
    // removes it again, so that a failure leaves nothing behind.
    std::error_code ignored;
    bool const made =
        !lib.output.empty() && std::filesystem::create_directories(lib.output, ignored);
    try {
      saved = Lum_CellLibraryReader::Save(*model, lib.output);
    } catch (...) {
      if (made)
        std::filesystem::remove(lib.output, ignored);
      throw;
    }
  } catch (Port::Exception const &e) {
    throw Failure(kExitUnreadable,
                  lib.file + ": " + Describe(e, lib.file) + "; nothing was written");
  }
  if (options.quiet)
    return kExitOk;
  std::size_t const pins = summary.inputs + summary.outputs + summary.inouts;
  std::printf("%s: %s, %s (%zu input, %zu output, %zu inout), %s\n", summary.name.c_str(),
              Plural(summary.cells, "cell").c_str(), Plural(pins, "pin").c_str(), summary.inputs,
              summary.outputs, summary.inouts, Plural(summary.buses, "bus", "es").c_str());
  std::printf("left out: %s, %s\n", Plural(summary.supplyPins, "supply pin").c_str(),
              Plural(summary.internalPins, "internal pin").c_str());
  std::printf("dont_use: %s%s%s\n", Plural(summary.dontUse.size(), "cell").c_str(),
              summary.dontUse.empty() ? "" : ": ", Joined(summary.dontUse).c_str());
  std::printf("wrote %s\n", saved.c_str());
  return kExitOk;
}

// "  key=value" for each property the block or pin carries.
template <class Object> std::string Properties(Object const *object) {
  namespace n = Lum_CellLibraryNames;
  std::string text;
  for (char const *name : {n::kArea, n::kDontUse, n::kSupplyPins, n::kFunction, n::kClock}) {
    Orb_Property const *property = object->GetPropertyByName(name);
    if (property)
      text += std::string("  ") + name + "=" + Quoted(property->GetStringValue());
  }
  return text;
}

int RunShow(LibOptions const &lib) {
  Lum_TlmModel model("show", "show", lib.file.c_str(), true);
  try {
    model.Open(lib.file.c_str());
  } catch (Port::Exception const &e) {
    throw Failure(kExitUnreadable, lib.file + ": " + Describe(e, lib.file));
  }
  Lum_TlmLibrary *library = model.GetLibrary();
  if (!library)
    throw Failure(kExitUnreadable, lib.file + ": holds no type library");
  std::vector<Lum_TlmBlock *> blocks = library->GetTypeBlocks();
  if (!lib.cell.empty()) {
    Lum_TlmBlock *block = library->GetTypeBlock(Port::StringBase<char>(lib.cell.c_str()));
    if (!block)
      throw Failure(kExitUsage, lib.file + ": no cell " + Quoted(lib.cell) + " in library " +
                                    library->GetLibraryName());
    blocks.assign(1, block);
  }
  unsigned version = 0;
  unsigned revision = 0;
  library->GetTlmVersion(version, revision);
  std::string qualifiers;
  for (Port::StringBase<char> const &qualifier :
       {library->GetFirstQualifier(), library->GetSecondQualifier()})
    if (!qualifier.empty())
      qualifiers += " " + qualifier.str();
  std::printf("library %s %u.%u%s, %s\n", library->GetLibraryName(), version, revision,
              qualifiers.c_str(), Plural(library->GetTypeBlocks().size(), "cell").c_str());
  for (Lum_TlmBlock const *block : blocks) {
    std::printf("%s%s\n", block->GetName(), Properties(block).c_str());
    for (std::size_t i = 0; i < block->GetPins().size(); ++i) {
      Lum_TlmPin const *pin = block->GetPin(i);
      std::printf("  %s %s%s\n", Orb_PinDirectionName(pin->GetDirection()), pin->GetName(),
                  Properties(pin).c_str());
    }
  }
  return kExitOk;
}

} // namespace

CLI::App *AddLibCommand(CLI::App &app, LibOptions &lib, CommonOptions &options) {
  CLI::App *command = app.add_subcommand(
      "lib", "Cell libraries: make a type library from a Liberty file or JSON cell models, or "
             "list a type library");
  command->require_subcommand(1);
  CLI::App *import = command->add_subcommand(
      "import", "Read FILE.lib (Liberty) or FILE.json (cell models written by Yosys) and write "
                "the type library N.tlm, atomically; print what it holds");
  import->add_option("FILE", lib.file, "Liberty file or Yosys JSON cell models")->required();
  import->add_option("--name", lib.name, "Type library name (default: the file's own)")
      ->type_name("N");
  import->add_option("--personality", lib.personality, "Device personality the library is for")
      ->type_name("PM");
  import->add_option("--part", lib.part, "Device part the library is for")->type_name("PART");
  import->add_option("-o,--output", lib.output, "Folder to write N.tlm in (default: .)")
      ->type_name("DIR");
  CLI::App *show = command->add_subcommand(
      "show", "List the cells of a type library file with their pins, directions and properties");
  show->add_option("FILE", lib.file, "Type library file (.tlm)")->required();
  show->add_option("--cell", lib.cell, "Only this cell")->type_name("C");
  for (CLI::App *sub : {import, show})
    sub->add_flag("-q,--quiet", options.quiet, "No output beyond errors");
  return command;
}

int RunLib(CLI::App const &command, LibOptions const &lib, CommonOptions const &options) {
  if (command.got_subcommand("import"))
    return RunImport(lib, options);
  return RunShow(lib);
}

} // namespace tdm

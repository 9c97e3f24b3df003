// tdm import: a gate-level netlist (JSON or structural Verilog) and its cell
// libraries become a typed design database. Libraries given as Liberty files
// or JSON cell models are read on the fly and kept as .tlm files beside the
// database, so that it opens again with --lib-path.

#include "commands.h"

#include "Lum_CellLibraryReader.h"
#include "Lum_Netlist.h"
#include "Lum_NetlistImporter.h"
#include "Lum_NetlistJsonReader.h"
#include "Lum_NetlistVerilogReader.h"
#include "Lum_TdmModel.h"
#include "Lum_TdmView.h"

#include "Lum_Tlm.h"
#include "Orb_Model.h"
#include "Port_Exception.h"

#include <cstdio>
#include <filesystem>
#include <fstream>
#include <memory>

namespace tdm {
namespace {

bool IsVerilog(std::string const &path) {
  std::string const extension = std::filesystem::path(path).extension().string();
  if (extension == ".v" || extension == ".vg" || extension == ".sv")
    return true;
  if (extension == ".json")
    return false;
  // Otherwise by content: JSON begins with "{".
  std::ifstream in(path, std::ios::binary);
  char c = 0;
  while (in.get(c) && std::isspace(static_cast<unsigned char>(c)))
    ;
  return c != '{';
}

// The libraries of the import: .tlm files by name through the search path,
// the others read now and registered while the import runs.
class Libraries {
public:
  Libraries(ImportOptions const &import) {
    for (std::string const &file : import.libraries) {
      std::filesystem::path const path(file);
      if (path.extension() == ".tlm") {
        if (!std::filesystem::exists(path))
          throw Failure(kExitUnreadable, file + ": no such type library file");
        std::string const dir = path.has_parent_path() ? path.parent_path().string() : ".";
        Lum_TlmCatalog::AddSearchDirectory(dir.c_str());
        names.push_back(path.stem().string());
        continue;
      }
      Lum_CellLibraryOptions options;
      options.personality = import.personality;
      options.part = import.part;
      try {
        read.push_back(Lum_CellLibraryReader::Read(file, options));
      } catch (Port::Exception const &e) {
        throw Failure(kExitUnreadable, Describe(e));
      }
      Lum_TlmLibrary *library = read.back()->GetLibrary();
      Lum_TlmCatalog::Register(library);
      registered.push_back(library);
      names.push_back(library->GetLibraryName());
    }
  }
  ~Libraries() {
    for (Lum_TlmLibrary const *library : registered)
      Lum_TlmCatalog::Unregister(library);
  }
  Libraries(Libraries const &) = delete;
  Libraries &operator=(Libraries const &) = delete;

  std::vector<std::string> names;
  std::vector<std::unique_ptr<Lum_TlmModel>> read;
  std::vector<Lum_TlmLibrary const *> registered;
};

} // namespace

int RunImport(ImportOptions const &import, CommonOptions const &options) {
  ApplyLibraryPath(options);
  Lum_Netlist netlist;
  try {
    netlist = IsVerilog(import.netlist) ? Lum_NetlistVerilogReader::Read(import.netlist)
                                        : Lum_NetlistJsonReader::Read(import.netlist);
  } catch (Port::Exception const &e) {
    throw Failure(kExitUnreadable, Describe(e) + "; nothing was written");
  }
  Libraries libraries(import);
  std::filesystem::path const output(import.output);
  std::string const dir = output.has_parent_path() ? output.parent_path().string() : ".";

  Lum_NetlistImportOptions mapping;
  mapping.top = import.top;
  mapping.personality = import.personality;
  mapping.part = import.part;
  mapping.libraries = libraries.names;
  mapping.blackboxUnknown = import.blackboxUnknown;
  Lum_NetlistImportSummary summary;
  {
    Progress progress("importing " + import.netlist, options);
    mapping.progress = [&progress](std::uint64_t n) { progress.Count(n); };
    Lum_TdmModel model("tdm", "tdm", import.output.c_str());
    try {
      Lum_TdmView *view = Lum_NetlistImporter::Import(model, netlist, mapping, &summary);
      view->CommitAll();
    } catch (Port::Exception const &e) {
      throw Failure(kExitUnreadable, Describe(e) + "; nothing was written");
    }
    try {
      model.Save(import.output.c_str());
    } catch (Port::Exception const &e) {
      throw Failure(kExitUnreadable,
                    import.output + ": cannot be saved: " + Describe(e, import.output));
    }
  }
  // The libraries read on the fly stay beside the database.
  std::vector<std::string> kept;
  for (auto const &library : libraries.read) {
    try {
      kept.push_back(Lum_CellLibraryReader::Save(*library, dir));
    } catch (Port::Exception const &e) {
      throw Failure(kExitUnreadable,
                    "the database is saved, but a type library is not: " + Describe(e));
    }
  }
  if (!options.quiet) {
    std::uint64_t leaves = 0;
    for (auto const &entry : summary.instancesByLibrary)
      leaves += entry.second;
    std::printf("imported %s: top %s, %llu module%s, %llu cell instance%s", import.netlist.c_str(),
                summary.top.c_str(), static_cast<unsigned long long>(summary.modules),
                summary.modules == 1 ? "" : "s", static_cast<unsigned long long>(leaves),
                leaves == 1 ? "" : "s");
    for (auto const &[library, count] : summary.instancesByLibrary)
      std::printf("%s%s: %llu", library == summary.instancesByLibrary.begin()->first ? " (" : ", ",
                  library.c_str(), static_cast<unsigned long long>(count));
    std::printf("%s, %llu module instance%s, %llu net%s, %llu untyped (unknown cells)\n",
                summary.instancesByLibrary.empty() ? "" : ")",
                static_cast<unsigned long long>(summary.moduleInstances),
                summary.moduleInstances == 1 ? "" : "s",
                static_cast<unsigned long long>(summary.nets), summary.nets == 1 ? "" : "s",
                static_cast<unsigned long long>(summary.untyped));
    for (std::string const &path : kept)
      std::printf("kept type library %s\n", path.c_str());
    std::printf("saved %s (open it with --lib-path %s)\n", import.output.c_str(), dir.c_str());
  }
  return kExitOk;
}

} // namespace tdm

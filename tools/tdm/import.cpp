// tdm import: a gate-level netlist (JSON or structural Verilog) and its cell
// libraries become a typed design database. Libraries given as Liberty files
// or JSON cell models are read on the fly and kept as .tlm files beside the
// database, so that it opens again with --lib-path.

#include "commands.h"

#include "Lum_Netlist.h"
#include "Lum_NetlistImporter.h"
#include "Lum_TdmModel.h"
#include "Lum_TdmView.h"
#include "Lum_TypeLibraryLoader.h"

#include "Orb_Model.h"
#include "Port_Exception.h"

#include <cstdio>
#include <filesystem>
#include <memory>

namespace tdm {

int RunImport(ImportOptions const &import, CommonOptions const &options) {
  ApplyLibraryPath(options);
  Lum_Netlist netlist;
  try {
    netlist = Lum_Netlist::ReadFile(import.netlist);
  } catch (Port::Exception const &e) {
    throw Failure(kExitUnreadable, Describe(e) + "; nothing was written");
  }
  Lum_TypeLibraryLoadOptions loading;
  loading.personality = import.personality;
  loading.part = import.part;
  std::unique_ptr<Lum_TypeLibraryLoader> const libraries = LoadLibraries(import.libraries, loading);
  std::filesystem::path const output(import.output);
  std::string const dir = output.has_parent_path() ? output.parent_path().string() : ".";

  Lum_NetlistImportOptions mapping;
  mapping.top = import.top;
  mapping.personality = import.personality;
  mapping.part = import.part;
  mapping.libraries = libraries->GetNames();
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
  std::vector<std::string> const kept = KeepLibraries(*libraries, import.output);
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

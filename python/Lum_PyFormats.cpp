// Python.h comes after the library's headers, whose locals it would shadow.
#include "Lum_PyFormats.h"
#include "Lum_PyDatabase.h"

#include "Lum_CellLibraryReader.h"
#include "Lum_Netlist.h"
#include "Lum_NetlistExporter.h"
#include "Lum_NetlistImporter.h"
#include "Lum_NetlistWriter.h"
#include "Lum_TdmView.h"
#include "Lum_TypeLibraryLoader.h"

#include "Lum_Tlm.h"
#include "Orb_Model.h"

#include <pybind11/pybind11.h>
#include <pybind11/stl.h>

#include <filesystem>
#include <memory>
#include <optional>
#include <sstream>
#include <string>
#include <vector>

namespace py = pybind11;

namespace lumpy {
namespace {

std::string FolderOf(std::string const &path) {
  std::filesystem::path const p(path);
  return p.has_parent_path() ? p.parent_path().string() : ".";
}

py::dict ImportLibrary(std::string const &path, std::string const &outputDir,
                       std::string const &name, std::string const &personality,
                       std::string const &part) {
  LibraryLock const lock;
  Lum_CellLibraryOptions options;
  options.name = name;
  options.personality = personality;
  options.part = part;
  Lum_CellLibrarySummary summary;
  std::string saved;
  {
    py::gil_scoped_release release;
    std::unique_ptr<Lum_TlmModel> model = Lum_CellLibraryReader::Read(path, options, &summary);
    saved = Lum_CellLibraryReader::Save(*model, outputDir);
  }
  py::dict result;
  result["name"] = summary.name;
  result["path"] = saved;
  result["cells"] = summary.cells;
  result["inputs"] = summary.inputs;
  result["outputs"] = summary.outputs;
  result["inouts"] = summary.inouts;
  result["buses"] = summary.buses;
  result["internal_pins"] = summary.internalPins;
  result["supply_pins"] = summary.supplyPins;
  result["dont_use"] = summary.dontUse;
  return result;
}

py::dict ImportNetlist(std::string const &netlistPath, std::string const &output,
                       std::vector<std::string> const &libraries, std::string const &top,
                       std::string const &personality, std::string const &part,
                       bool blackboxUnknown) {
  LibraryLock const lock;
  Lum_NetlistImportSummary summary;
  std::vector<std::string> kept;
  {
    py::gil_scoped_release release;
    Lum_Netlist const netlist = Lum_Netlist::ReadFile(netlistPath);
    // Unlike a one-shot tool, this process may hold a library of that name
    // already (an open database, a type library object): its .tlm serves.
    Lum_TypeLibraryLoadOptions loading;
    loading.personality = personality;
    loading.part = part;
    loading.refuseLoaded = true;
    Lum_TypeLibraryLoader const read(libraries, loading);
    Lum_NetlistImportOptions mapping;
    mapping.top = top;
    mapping.personality = personality;
    mapping.part = part;
    mapping.libraries = read.GetNames();
    mapping.blackboxUnknown = blackboxUnknown;
    {
      Lum_TdmModel model("lumtdm", "lumtdm", output.c_str());
      Lum_NetlistImporter::Import(model, netlist, mapping, &summary)->CommitAll();
      model.Save(output.c_str());
    }
    // The libraries read on the fly stay beside the database, so that it
    // opens again with lib_path=[its folder].
    kept = read.Save(FolderOf(output));
  }
  py::dict result;
  result["path"] = output;
  result["top"] = summary.top;
  result["modules"] = summary.modules;
  result["nets"] = summary.nets;
  result["untyped"] = summary.untyped;
  result["module_instances"] = summary.moduleInstances;
  result["instances_by_library"] = summary.instancesByLibrary;
  result["libraries"] = kept;
  return result;
}

Lum_NetlistWriter::Format FormatArg(std::optional<std::string> const &format,
                                    std::optional<std::string> const &path) {
  if (!format)
    return Lum_NetlistWriter::FormatOf(path ? *path : std::string());
  if (*format == "json")
    return Lum_NetlistWriter::Format::Json;
  if (*format == "verilog")
    return Lum_NetlistWriter::Format::Verilog;
  throw py::value_error("format is 'json' or 'verilog', not '" + *format + "'");
}

// The one view of a database, or the one named `name`.
Orb_View *ViewOf(Database const &db, std::optional<std::string> const &name) {
  std::vector<Orb_View *> views;
  std::string names;
  for (Orb_DesignMgr *designMgr : db.Model().GetOrbModel()->GetDesignMgrs())
    for (Orb_Design *design : designMgr->GetDesigns())
      for (Orb_View *view : design->GetViews()) {
        names += (names.empty() ? "" : ", ") + FullPath(view);
        if (!name || *name == view->GetName())
          views.push_back(view);
      }
  if (views.size() == 1)
    return views.front();
  std::string const what =
      views.empty() ? (name ? "has no view named '" + *name + "'" : std::string("has no view"))
                    : "holds several views: choose one with view=";
  throw py::value_error("database '" + db.GetPath() + "' " + what +
                        " (views: " + (names.empty() ? "none" : names) + ")");
}

py::object ExportNetlist(py::object const &source, std::optional<std::string> const &path,
                         std::optional<std::string> const &format,
                         std::optional<std::string> const &viewName) {
  LibraryLock const lock;
  Lum_NetlistWriter::Format const chosen = FormatArg(format, path);
  DatabasePtr db;
  Orb_View *view = nullptr;
  if (py::isinstance<Ref<Orb_View>>(source)) {
    auto const &ref = source.cast<Ref<Orb_View> const &>();
    if (viewName)
      throw py::value_error("view= names a view of a database; a view was given");
    view = ref.Get();
    db = ref.db;
  } else if (py::isinstance<Database>(source)) {
    db = source.cast<DatabasePtr>();
    view = ViewOf(*db, viewName);
  } else {
    throw py::type_error("export_netlist exports a lumtdm.View or a lumtdm.Database");
  }
  auto *tdmView = static_cast<Lum_TdmView *>(db->Model().Specialize(view));
  std::string text;
  {
    py::gil_scoped_release release;
    Lum_Netlist const netlist = Lum_NetlistExporter::Export(*tdmView);
    if (path) {
      Lum_NetlistWriter::Save(netlist, *path, chosen);
    } else {
      std::ostringstream out;
      if (chosen == Lum_NetlistWriter::Format::Json)
        Lum_NetlistWriter::WriteJson(netlist, out);
      else
        Lum_NetlistWriter::WriteVerilog(netlist, out);
      text = out.str();
    }
  }
  if (path)
    return py::none();
  return py::str(text);
}

} // namespace

void BindFormats(py::module_ &m) {
  m.def("import_library", &ImportLibrary, py::arg("path"), py::arg("output_dir") = ".",
        py::arg("name") = "", py::arg("personality") = "", py::arg("part") = "",
        "Reads a cell library (a Liberty file, or cell models written as JSON, told apart by "
        "content) and saves it as the type library <output_dir>/<name>.tlm, atomically. name: "
        "the type library's name (default: the file's own); personality, part: the device "
        "the library is for. Returns a summary dict: name, path (the .tlm written), cells, "
        "inputs, outputs, inouts, buses, internal_pins and supply_pins (left out), dont_use "
        "(cell names). InvalidFormatError (object_name: the file, message: line and column) "
        "for a file that is not a valid cell library; nothing is written then.");
  m.def("import_netlist", &ImportNetlist, py::arg("netlist"), py::arg("output"),
        py::arg("libraries") = std::vector<std::string>(), py::arg("top") = "",
        py::arg("personality") = "generic", py::arg("part") = "generic",
        py::arg("blackbox_unknown") = false,
        "Reads a gate-level netlist (JSON, or structural Verilog: .v, .vg, .sv) and saves it "
        "as the design database `output`. libraries: the cell libraries it draws from, in "
        "lookup order: .tlm files (found by name through the search path, their folder added "
        "to it), or Liberty files and JSON cell models, read now and kept as .tlm files "
        "beside the database so that it opens with lib_path=[its folder]. top: the top module "
        "(default: the netlist's own); personality, part: the view's device; "
        "blackbox_unknown: cells of no library become untyped blocks instead of an error. "
        "Returns a summary dict: path, top, modules, nets, untyped, module_instances, "
        "instances_by_library ({library: count}), libraries (the .tlm files kept). "
        "InvalidFormatError for a netlist or library that cannot be read or mapped; no "
        "database is written then.");
  m.def("export_netlist", &ExportNetlist, py::arg("source"), py::arg("path") = py::none(),
        py::arg("format") = py::none(), py::arg("view") = py::none(),
        "Writes a view as a gate-level netlist, its hierarchy folded back into modules. "
        "source: a View, or a Database with one view (or the one named by view=). format: "
        "'json' or 'verilog' (default: from the path's extension, else json). With a path, "
        "the file is written atomically and None returned; without one, the netlist is "
        "returned as a str. InvalidFormatError when the file cannot be written or a name "
        "cannot be written in Verilog.");
}

} // namespace lumpy

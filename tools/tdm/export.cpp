// tdm export: a view of a database, or every view, as a gate-level netlist,
// JSON or structural Verilog, its hierarchy folded back into modules.

#include "commands.h"

#include "Lum_NetlistExporter.h"
#include "Lum_NetlistWriter.h"
#include "Lum_TdmModel.h"
#include "Lum_TdmView.h"

#include "Orb_Model.h"
#include "Port_Exception.h"

#include <cstdio>
#include <ctime>
#include <filesystem>
#include <iostream>

namespace tdm {
namespace {

// Every view with a top block, one file each in the folder (made when
// missing).
int ExportAll(Lum_TdmModel &model, ExportOptions const &exported, Lum_NetlistWriter::Format format,
              CommonOptions const &options) {
  std::error_code error;
  std::filesystem::create_directories(exported.output, error);
  if (!std::filesystem::is_directory(exported.output))
    throw Failure(kExitUnreadable, exported.output + ": is not a folder and cannot be made one" +
                                       (error ? ": " + error.message() : std::string()));
  std::vector<std::string> written;
  try {
    written = Lum_NetlistExporter::SaveAll(model, exported.output, format);
  } catch (Port::Exception const &e) {
    throw Failure(kExitUnreadable, Describe(e) + "; nothing of that view was written");
  }
  if (!options.quiet)
    for (std::string const &file : written)
      std::cerr << "wrote " << file << "\n";
  return kExitOk;
}

// The CPU seconds of each phase, for --time: benchmarks set them against
// the same phases of other tools.
class PhaseTimes {
public:
  explicit PhaseTimes(bool on) : m_On(on), m_Last(std::clock()) {}

  void End(char const *phase) {
    if (!m_On)
      return;
    std::clock_t const now = std::clock();
    char text[64];
    std::snprintf(text, sizeof text, "%s%s %.3f s", m_Text.empty() ? "" : ", ", phase,
                  static_cast<double>(now - m_Last) / CLOCKS_PER_SEC);
    m_Text += text;
    m_Last = now;
  }

  void Print() const {
    if (m_On)
      std::cerr << "tdm export: " << m_Text << " (CPU)\n";
  }

private:
  bool m_On;
  std::clock_t m_Last;
  std::string m_Text;
};

} // namespace

int RunExport(std::string const &path, ExportOptions const &exported,
              CommonOptions const &options) {
  Lum_NetlistWriter::Format format = Lum_NetlistWriter::FormatOf(exported.output);
  if (exported.format == "json")
    format = Lum_NetlistWriter::Format::Json;
  else if (exported.format == "verilog")
    format = Lum_NetlistWriter::Format::Verilog;
  else if (!exported.format.empty())
    throw Failure(kExitUsage, "--format is json or verilog, not " + Quoted(exported.format));
  if (exported.allViews && !exported.view.empty())
    throw Failure(kExitUsage, "--all-views writes every view: leave out --view");
  if (exported.allViews && exported.output.empty())
    throw Failure(kExitUsage, "--all-views needs -o FOLDER for the files it writes");
  ApplyLibraryPath(options);
  PhaseTimes times(exported.time);
  std::unique_ptr<Lum_TdmModel> model = OpenTyped(path, options);
  times.End("open");
  if (exported.allViews)
    return ExportAll(*model, exported, format, options);
  std::vector<Orb_View *> const views = SelectViews(*model, path, exported.view);
  if (views.size() != 1) {
    std::string names;
    for (Orb_View const *view : views)
      names += (names.empty() ? "" : ", ") + ViewPath(view);
    throw Failure(kExitUsage,
                  path + ": " +
                      (views.empty() ? "has no view"
                                     : "holds several views (" + names +
                                           "): choose one with --view, or write every view "
                                           "with --all-views -o FOLDER"));
  }
  auto *view = static_cast<Lum_TdmView *>(model->Specialize(views.front()));
  try {
    Lum_Netlist const netlist = Lum_NetlistExporter::Export(*view);
    times.End("export");
    if (exported.output.empty()) {
      if (format == Lum_NetlistWriter::Format::Json)
        Lum_NetlistWriter::WriteJson(netlist, std::cout);
      else
        Lum_NetlistWriter::WriteVerilog(netlist, std::cout, "standard output");
      std::cout.flush();
      times.End("write");
    } else {
      Lum_NetlistWriter::Save(netlist, exported.output, format);
      times.End("write");
      if (!options.quiet)
        std::cerr << "wrote " << exported.output << " (" << netlist.modules.size() << " module"
                  << (netlist.modules.size() == 1 ? "" : "s") << ")\n";
    }
  } catch (Port::Exception const &e) {
    throw Failure(kExitUnreadable, Describe(e) + "; nothing was written");
  }
  model.reset();
  times.End("close");
  times.Print();
  return kExitOk;
}

} // namespace tdm

// tdm demo --real: the main job on a real design that the repository
// carries (examples/data): a synthesized netlist and its Liberty library are
// imported, the database checked, one cell type swapped for a stronger one,
// and the result exported and, when Yosys is installed, read back by it.

#include "commands.h"

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <string>

namespace tdm {
namespace {

char const kNetlist[] = "serv_sg13g2_hier.v";
char const kLiberty[] = "sg13g2_stdcell_typ_1p20V_25C.filtered.lib";
char const kLibrary[] = "sg13g2_stdcell_typ_1p20V_25C";
char const kTop[] = "serv_rf_top";

std::string DataDir() {
  char const *dir = std::getenv("LUM_EXAMPLE_DATA");
  return dir && *dir ? dir : LUM_EXAMPLE_DATA;
}

void Step(bool quiet, char const *text) {
  if (!quiet) {
    std::printf("\n== %s\n", text);
    std::fflush(stdout);
  }
}

std::string Shell(std::string const &word) {
  std::string quoted = "'";
  for (char c : word)
    quoted += c == '\'' ? std::string("'\\''") : std::string(1, c);
  return quoted + "'";
}

} // namespace

int RunDemoReal(DemoOptions const &demo, CommonOptions const &options) {
  std::string const data = DataDir();
  std::string const netlist = data + "/" + kNetlist;
  std::string const liberty = data + "/" + kLiberty;
  if (!std::filesystem::exists(netlist) || !std::filesystem::exists(liberty))
    throw Failure(kExitUnreadable, data + ": the real design (" + kNetlist + ", " + kLiberty +
                                       ") is missing; set LUM_EXAMPLE_DATA to the repository's "
                                       "examples/data");
  std::string directory = demo.dir.empty() ? "tdm_demo_real" : demo.dir;
  std::error_code error;
  std::filesystem::create_directories(directory, error);
  if (error)
    throw Failure(kExitUnreadable, directory + ": cannot make the folder: " + error.message());
  directory = std::filesystem::absolute(directory).lexically_normal().string();
  std::string const database = directory + "/serv.odb";
  std::string const exported = directory + "/serv_out.v";
  std::string const library = std::string(kLibrary) + ":";
  bool const quiet = options.quiet;
  CommonOptions local = options;
  local.libPath.insert(local.libPath.begin(), directory);

  Step(quiet, "import: the SERV RISC-V core as synthesized for IHP SG13G2, with its Liberty file");
  ImportOptions import;
  import.netlist = netlist;
  import.libraries = {liberty};
  import.personality = "sg13g2";
  import.part = "typ";
  import.output = database;
  RunImport(import, local);

  Step(quiet, "check: every block binds to its cell when the database is opened");
  if (RunCheck(database, local) != kExitOk)
    return kExitProblems;

  Step(quiet, "find: the inverters of drive strength 1");
  FindOptions find;
  find.type = library + "sg13g2_inv_1";
  find.count = true;
  RunFind(database, find, local);

  Step(quiet, "rebind: every sg13g2_inv_1 becomes a sg13g2_inv_2, all or nothing");
  RebindOptions rebind;
  rebind.from = library + "sg13g2_inv_1";
  rebind.to = library + "sg13g2_inv_2";
  RunRebind(database, rebind, local);
  find.type = library + "sg13g2_inv_2";
  RunFind(database, find, local);

  Step(quiet, "export: structural Verilog, the hierarchy folded back into modules");
  ExportOptions out;
  out.output = exported;
  RunExport(database, out, local);

  if (std::system("yosys -V >/dev/null 2>&1") == 0) {
    Step(quiet, "yosys reads the exported netlist back against the Liberty file");
    std::string const command = "yosys -q -p " +
                                Shell("read_liberty -lib " + liberty + "; read_verilog " +
                                      exported + "; hierarchy -check -top " + kTop + "; tee -o " +
                                      directory + "/yosys_stat.txt stat") +
                                " >" + Shell(directory + "/yosys.log") + " 2>&1";
    if (std::system(command.c_str()) != 0)
      throw Failure(kExitProblems,
                    "yosys refused " + exported + ": see " + directory + "/yosys.log");
    if (!quiet)
      std::printf("yosys: hierarchy checked, statistics in %s/yosys_stat.txt\n", directory.c_str());
  } else if (!quiet) {
    std::printf("\n(yosys is not installed: the last step, reading %s back, is skipped)\n",
                exported.c_str());
  }
  if (quiet)
    std::printf("%s\n", directory.c_str());
  else
    std::printf("\ndone: the files are in %s\n", directory.c_str());
  return kExitOk;
}

} // namespace tdm

// tdm: the command-line tool for typed design databases. main parses the
// command line and runs one subcommand; every failure ends here as one line
// on standard error and an exit code, never as a crash.

#include "commands.h"

#include "Port_Exception.h"

#include <CLI/CLI.hpp>

#include <charconv>
#include <cstdio>
#include <exception>
#include <new>
#include <string>

namespace {

char const kExitCodes[] = "Exit codes:\n"
                          "  0  success (tdm check: no problems)\n"
                          "  1  problems found (tdm check; tdm demo: a binding did not come back)\n"
                          "  2  usage error\n"
                          "  3  a database or library that cannot be read, or a file that cannot "
                          "be written\n";

void AddCommonOptions(CLI::App *command, tdm::CommonOptions &options) {
  command
      ->add_option("--lib-path", options.libPath,
                   "Directory searched for type libraries (<dir>/<personality>/<name>.tlm, then "
                   "<dir>/<name>.tlm); repeatable, searched in order before LUM_TLM_PATH")
      ->type_name("DIR")
      ->allow_extra_args(false)
      ->take_all();
  command->add_flag("-q,--quiet", options.quiet,
                    "No progress line and no output beyond results and errors");
}

// "tdm" and the subcommand given, as errors begin.
std::string CommandName(CLI::App const &app) {
  std::string name = "tdm";
  for (CLI::App const *command = &app; !command->get_subcommands().empty();) {
    command = command->get_subcommands().front();
    name += " " + command->get_name();
  }
  return name;
}

// An error on one line of standard error, control bytes escaped.
void PrintError(std::string const &name, std::string const &text) {
  std::fflush(stdout);
  std::fprintf(stderr, "%s: error: %s\n", name.c_str(), tdm::Escaped(text).c_str());
}

// A level count: a whole number of 0 or more.
std::string CheckDepth(std::string const &value) {
  int depth = -1;
  char const *end = value.data() + value.size();
  auto const result = std::from_chars(value.data(), end, depth);
  if (result.ec != std::errc() || result.ptr != end || depth < 0)
    return "must be a whole number of 0 or more, not " + tdm::Quoted(value);
  return std::string();
}

void AddDatabase(CLI::App *command, std::string &path) {
  command->add_option("DB", path, "Design database file")->required();
}

int Main(int argc, char **argv) {
  CLI::App app("tdm: look at, check and upgrade typed design databases.\n", "tdm");
  app.footer(kExitCodes);
  app.require_subcommand(1);

  tdm::CommonOptions common;
  std::string database;
  tdm::DemoOptions demo;
  demo.program = argc > 0 && argv[0] ? argv[0] : "tdm";
  tdm::CommitOptions commit;
  tdm::TreeOptions tree;
  tdm::LibOptions lib;
  tdm::ImportOptions import;
  tdm::ExportOptions exported;
  tdm::RebindOptions rebind;
  tdm::FindOptions find;

  CLI::App *demoCommand = app.add_subcommand(
      "demo", "Write two sample type libraries and a typed design database using them, commit, "
              "save and reopen it, check every binding came back and print a summary");
  demoCommand
      ->add_option("--dir", demo.dir,
                   "Folder for the files (made if missing; default: a new folder "
                   "tdm_demo_XXXXXX in the current directory)")
      ->type_name("DIR");

  CLI::App *infoCommand = app.add_subcommand(
      "info", "Per design and view: stamp, device, type libraries (recorded and found now), "
              "blocks per type block, pins, signals, networks and the memory report");
  AddDatabase(infoCommand, database);

  CLI::App *checkCommand = app.add_subcommand(
      "check", "List every problem that makes opening the database fail, grouped, without "
               "opening it through the client model (exit 1 when there are any)");
  AddDatabase(checkCommand, database);

  CLI::App *commitCommand = app.add_subcommand(
      "commit", "Open the database, commit every view and save it, in place (through a "
                "temporary file) or to OUT: upgrades the stamp and rewrites library lists and "
                "pin maps");
  AddDatabase(commitCommand, database);
  commitCommand->add_option("-o,--output", commit.output, "Write to OUT instead of in place")
      ->type_name("OUT");

  CLI::App *treeCommand = app.add_subcommand(
      "tree", "Print the block hierarchy with each block's type block ('-' when untyped)");
  CLI::App *dotCommand = app.add_subcommand(
      "dot", "Write the block hierarchy as a Graphviz graph (render with: dot -Tsvg)");
  for (CLI::App *command : {treeCommand, dotCommand}) {
    AddDatabase(command, database);
    command->add_option("--view", tree.view, "Only the views of this name")->type_name("V");
    command
        ->add_option("--depth", tree.depth,
                     "Levels below the top block to show (0: the top block alone)")
        ->type_name("N")
        ->check(CLI::Validator(CheckDepth, "N"));
  }
  treeCommand->add_flag("--pins", tree.pins, "Also each pin with its direction and type pin");
  CLI::App *libCommand = tdm::AddLibCommand(app, lib, common);
  libCommand->footer(kExitCodes);

  demoCommand->add_flag("--real", demo.real,
                        "The real-design walk-through: import a synthesized netlist and its "
                        "Liberty library, check, swap cells, export and read the result back");

  CLI::App *importCommand = app.add_subcommand(
      "import", "Make a typed design database from a gate-level netlist (JSON or structural "
                "Verilog) and its cell libraries, with a summary");
  importCommand->add_option("NETLIST", import.netlist, "Netlist file (.json or .v)")->required();
  importCommand
      ->add_option("--lib", import.libraries,
                   "Cell library: a type library (.tlm), a Liberty file (.lib) or JSON cell "
                   "models, read on the fly and kept as .tlm beside DB; repeatable")
      ->type_name("FILE")
      ->allow_extra_args(false);
  importCommand->add_option("--top", import.top, "Top module (default: the netlist's own)")
      ->type_name("T");
  importCommand->add_option("--pm", import.personality, "Device personality of the view")
      ->type_name("PM");
  importCommand->add_option("--part", import.part, "Device part of the view")->type_name("P");
  importCommand->add_flag("--blackbox-unknown", import.blackboxUnknown,
                          "Import cells that no library has as untyped blocks instead of failing");
  importCommand->add_option("-o,--output", import.output, "Database to write")
      ->type_name("DB")
      ->required();

  CLI::App *exportCommand = app.add_subcommand(
      "export", "Write a view as a gate-level netlist, its hierarchy folded back into modules");
  AddDatabase(exportCommand, database);
  exportCommand->add_option("--format", exported.format, "json or verilog (default: from OUT)")
      ->type_name("F");
  exportCommand->add_option("-o,--output", exported.output, "File to write (default: stdout)")
      ->type_name("OUT");
  exportCommand->add_option("--view", exported.view, "The view to write")->type_name("V");
  exportCommand->add_flag("--all-views", exported.allViews,
                          "Write every view, each to OUT/<design>.<view>.json or .v");
  exportCommand->add_flag("--time", exported.time,
                          "Print the CPU seconds of opening, exporting, writing and closing");

  CLI::App *rebindCommand =
      app.add_subcommand("rebind", "Swap the cell type of every matching block, all or nothing");
  AddDatabase(rebindCommand, database);
  rebindCommand->add_option("--from", rebind.from, "Cell type to replace")
      ->type_name("LIB:CELL")
      ->required();
  rebindCommand->add_option("--to", rebind.to, "Cell type to put instead")
      ->type_name("LIB:CELL")
      ->required();
  rebindCommand->add_option("--map", rebind.map, "Pins named otherwise in the new cell")
      ->type_name("OLD=NEW,...");
  rebindCommand->add_option("--where", rebind.where, "Only blocks whose path matches the glob")
      ->type_name("GLOB");
  rebindCommand->add_option("-o,--output", rebind.output, "Write to OUT instead of in place")
      ->type_name("OUT");
  rebindCommand
      ->add_option("--lib", rebind.libraries,
                   "Library of --to that the view does not list yet (.tlm, .lib or .json)")
      ->type_name("FILE");

  CLI::App *findCommand = app.add_subcommand("find", "List (or count) the blocks of one cell type");
  AddDatabase(findCommand, database);
  findCommand->add_option("--type", find.type, "Cell type")->type_name("LIB:CELL")->required();
  findCommand->add_flag("--count", find.count, "Print the count only");
  findCommand->add_option("--view", find.view, "Only the views of this name")->type_name("V");

  for (CLI::App *command : {demoCommand, infoCommand, checkCommand, commitCommand, treeCommand,
                            dotCommand, importCommand, exportCommand, rebindCommand, findCommand}) {
    AddCommonOptions(command, common);
    command->footer(kExitCodes);
  }

  try {
    app.parse(argc, argv);
  } catch (CLI::ParseError const &e) {
    // --help is a "parse error" that exits 0.
    if (e.get_exit_code() == 0)
      return app.exit(e) == 0 ? tdm::kExitOk : tdm::kExitUsage;
    std::string const name = CommandName(app);
    PrintError(name, tdm::OneLine(e.what()) + " (see " + name + " --help)");
    return tdm::kExitUsage;
  }

  std::string const name = CommandName(app);
  std::string const &where = database.empty() ? demo.dir : database;
  try {
    // Only files are read or replaced: a FIFO, a device or a folder is refused.
    if (!database.empty())
      tdm::RequireRegularFile(database);
    if (commitCommand->parsed() && !commit.output.empty())
      tdm::RequireRegularFile(commit.output);
    if (libCommand->parsed())
      return tdm::RunLib(*libCommand, lib, common);
    if (demoCommand->parsed())
      return demo.real ? tdm::RunDemoReal(demo, common) : tdm::RunDemo(demo, common);
    if (importCommand->parsed())
      return tdm::RunImport(import, common);
    if (exportCommand->parsed())
      return tdm::RunExport(database, exported, common);
    if (rebindCommand->parsed())
      return tdm::RunRebind(database, rebind, common);
    if (findCommand->parsed())
      return tdm::RunFind(database, find, common);
    if (infoCommand->parsed())
      return tdm::RunInfo(database, common);
    if (checkCommand->parsed())
      return tdm::RunCheck(database, common);
    if (commitCommand->parsed())
      return tdm::RunCommit(database, commit, common);
    if (treeCommand->parsed())
      return tdm::RunTree(database, tree, common);
    return tdm::RunDot(database, tree, common);
  } catch (tdm::Failure const &e) {
    PrintError(name, e.what());
    return e.GetCode();
  } catch (Port::Exception const &e) {
    PrintError(name, where + ": " + tdm::Describe(e, where));
    return tdm::kExitUnreadable;
  } catch (std::bad_alloc const &) {
    PrintError(name, where + ": out of memory");
    return tdm::kExitUnreadable;
  } catch (std::exception const &e) {
    PrintError(name, where + ": " + tdm::OneLine(e.what()));
    return tdm::kExitUnreadable;
  }
}

} // namespace

int main(int argc, char **argv) {
  try {
    return Main(argc, argv);
  } catch (std::exception const &e) {
    std::fprintf(stderr, "tdm: error: %s\n", e.what());
  } catch (...) {
    std::fprintf(stderr, "tdm: error: unexpected failure\n");
  }
  return tdm::kExitUnreadable;
}

#pragma once

// The subcommands of tdm. Each returns the exit code, or throws Failure.

#include "common.h"

#include <string>
#include <vector>

namespace CLI {
class App;
}

namespace tdm {

struct DemoOptions {
  std::string dir;     // empty: a new folder in the current directory
  std::string program; // how the user ran tdm, for the commands it suggests
  bool real = false;   // the real-design walk-through (demo_real.cpp)
};
int RunDemo(DemoOptions const &demo, CommonOptions const &options);
int RunDemoReal(DemoOptions const &demo, CommonOptions const &options);

int RunInfo(std::string const &path, CommonOptions const &options);

int RunCheck(std::string const &path, CommonOptions const &options);

struct CommitOptions {
  std::string output; // empty: in place
};
int RunCommit(std::string const &path, CommitOptions const &commit, CommonOptions const &options);

struct TreeOptions {
  std::string view; // empty: every view
  int depth = -1;   // levels below the top block; negative: all
  bool pins = false;
};
int RunTree(std::string const &path, TreeOptions const &tree, CommonOptions const &options);
int RunDot(std::string const &path, TreeOptions const &tree, CommonOptions const &options);

struct LibOptions {
  std::string file; // the cell library (import) or type library file (show)
  std::string name; // import: the type library's name; empty: the file's own
  std::string personality;
  std::string part;
  std::string output; // import: the folder written to; empty: the current one
  std::string cell;   // show: only this cell
};
// Adds "lib import" and "lib show" to the command line.
CLI::App *AddLibCommand(CLI::App &app, LibOptions &lib, CommonOptions &options);
int RunLib(CLI::App const &command, LibOptions const &lib, CommonOptions const &options);
struct ImportOptions {
  std::string netlist;                // .json or .v
  std::vector<std::string> libraries; // .tlm, .lib or cell models in .json
  std::string top;                    // empty: the netlist's own
  std::string personality = "generic";
  std::string part = "generic";
  std::string output;
  bool blackboxUnknown = false;
};
int RunImport(ImportOptions const &import, CommonOptions const &options);

struct ExportOptions {
  std::string format; // json or verilog; empty: from the output's extension, else json
  std::string output; // empty: standard output
  std::string view;   // empty: the only view
  // Every view, one file each in the folder `output`.
  bool allViews = false;
  bool time = false; // print the CPU seconds of each phase on standard error
};
int RunExport(std::string const &path, ExportOptions const &exported, CommonOptions const &options);

struct RebindOptions {
  std::string from;  // LIB:CELL
  std::string to;    // LIB:CELL
  std::string map;   // OLDPIN=NEWPIN,...
  std::string where; // glob over block paths; empty: every block
  std::string output;
  // Files of libraries for --to (.tlm, .lib or cell models in .json).
  std::vector<std::string> libraries;
};
int RunRebind(std::string const &path, RebindOptions const &rebind, CommonOptions const &options);

struct FindOptions {
  std::string type; // LIB:CELL
  bool count = false;
  std::string view;
};
int RunFind(std::string const &path, FindOptions const &find, CommonOptions const &options);

} // namespace tdm

// tdm import, export, rebind and find, run as processes on the real design
// the repository carries (examples/data): a synthesized netlist and its
// Liberty file.

#include "../Lum_TdmTestSupport.h"

#include "Lum_TdmSchema.h"
#include "Orb_Model.h"
#include "Orb_Property.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <string>
#include <sys/wait.h>
#include <vector>

using lumtest::FileBytes;
using ::testing::ContainsRegex;
using ::testing::HasSubstr;
using ::testing::Not;

namespace {

char const kLibrary[] = "sg13g2_stdcell_typ_1p20V_25C";

struct ToolRun {
  int code = -1;
  std::string out;
  std::string err;
};

class TdmNetlist : public ::testing::Test {
public:
  static void SetUpTestSuite() {
    s_Dir = new lumtest::TempDir;
    s_Imported = Tdm({"import", Data("serv_sg13g2_hier.v"), "--lib",
                      Data("sg13g2_stdcell_typ_1p20V_25C.filtered.lib"), "-o", File("serv.odb")});
  }
  static void TearDownTestSuite() { delete s_Dir; }

  static std::string Data(char const *name) { return std::string(LUM_EXAMPLE_DATA) + "/" + name; }
  static std::string File(std::string const &name) { return s_Dir->File(name); }

  static ToolRun Tdm(std::vector<std::string> const &args) {
    std::string command = "exec '" + std::string(TDM_PATH) + "'";
    for (std::string const &arg : args)
      command += " '" + arg + "'";
    command += " >'" + File("out.txt") + "' 2>'" + File("err.txt") + "'";
    int const status = std::system(command.c_str());
    ToolRun run;
    run.code = WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
    run.out = FileBytes(File("out.txt"));
    run.err = FileBytes(File("err.txt"));
    return run;
  }
  // A copy of the imported database to change.
  static std::string Copy(std::string const &name) {
    std::filesystem::copy_file(File("serv.odb"), File(name),
                               std::filesystem::copy_options::overwrite_existing);
    return File(name);
  }

protected:
  static lumtest::TempDir *s_Dir;
  static ToolRun s_Imported;
};

lumtest::TempDir *TdmNetlist::s_Dir = nullptr;
ToolRun TdmNetlist::s_Imported;

TEST_F(TdmNetlist, ImportsTheRealDesignWhichThenChecksClean) {
  ASSERT_EQ(s_Imported.code, 0) << s_Imported.err;
  EXPECT_THAT(s_Imported.out, HasSubstr("top serv_rf_top, 14 modules, 4667 cell instances"));
  EXPECT_TRUE(std::filesystem::exists(File(std::string(kLibrary) + ".tlm")));
  ToolRun const check = Tdm({"check", "--lib-path", s_Dir->Path(), File("serv.odb")});
  EXPECT_EQ(check.code, 0) << check.out << check.err;
  EXPECT_THAT(check.out, HasSubstr("no problems"));
}

TEST_F(TdmNetlist, ExportTimesItsPhasesOnlyWhenAsked) {
  ASSERT_EQ(s_Imported.code, 0) << s_Imported.err;
  std::vector<std::string> command = {"export",         "--lib-path", s_Dir->Path(),
                                      File("serv.odb"), "--format",   "json"};
  ToolRun const plain = Tdm(command);
  command.push_back("--time");
  ToolRun const timed = Tdm(command);
  ASSERT_EQ(timed.code, 0) << timed.err;
  EXPECT_EQ(timed.out, plain.out);
  EXPECT_EQ(plain.err, "");
  EXPECT_THAT(timed.err, ContainsRegex("^tdm export: open [0-9.]+ s, export [0-9.]+ s, write "
                                       "[0-9.]+ s, close [0-9.]+ s \\(CPU\\)\n$"));
}

TEST_F(TdmNetlist, RebindSwapsEveryMatchingBlockAndTheExportShowsIt) {
  ASSERT_EQ(s_Imported.code, 0) << s_Imported.err;
  std::string const db = Copy("rebind.odb");
  std::string const from = std::string(kLibrary) + ":sg13g2_inv_1";
  std::string const to = std::string(kLibrary) + ":sg13g2_inv_2";
  auto count = [&db](std::string const &type) {
    ToolRun const run = Tdm({"find", "--lib-path", s_Dir->Path(), db, "--type", type, "--count"});
    EXPECT_EQ(run.code, 0) << run.err;
    return std::atoi(run.out.c_str());
  };
  int const before = count(from);
  int const others = count(to);
  ASSERT_GT(before, 100);
  // Only under one instance first, then everywhere.
  ToolRun const some = Tdm({"rebind", "--lib-path", s_Dir->Path(), db, "--from", from, "--to", to,
                            "--where", "serv_rf_top/cpu/*"});
  ASSERT_EQ(some.code, 0) << some.err;
  int const moved = before - count(from);
  EXPECT_GT(moved, 0);
  EXPECT_LT(moved, before);
  EXPECT_EQ(count(to), others + moved);
  ToolRun const all = Tdm({"rebind", "--lib-path", s_Dir->Path(), db, "--from", from, "--to", to});
  ASSERT_EQ(all.code, 0) << all.err;
  EXPECT_EQ(count(from), 0);
  EXPECT_EQ(count(to), others + before);
  ToolRun const exported = Tdm({"export", "--lib-path", s_Dir->Path(), db, "--format", "verilog"});
  ASSERT_EQ(exported.code, 0) << exported.err;
  EXPECT_THAT(exported.out, HasSubstr("sg13g2_inv_2 "));
  EXPECT_THAT(exported.out, Not(HasSubstr("sg13g2_inv_1 ")));
}

TEST_F(TdmNetlist, ARebindThatFailsForOneBlockLeavesTheDatabaseByteIdentical) {
  ASSERT_EQ(s_Imported.code, 0) << s_Imported.err;
  std::string const db = Copy("failing.odb");
  std::string const bytes = FileBytes(db);
  // A flip-flop has pins an inverter lacks.
  ToolRun const run = Tdm({"rebind", "--lib-path", s_Dir->Path(), db, "--from",
                           std::string(kLibrary) + ":sg13g2_dfrbp_1", "--to",
                           std::string(kLibrary) + ":sg13g2_inv_1", "--map", "D=A,Q=Y"});
  EXPECT_EQ(run.code, 1);
  EXPECT_THAT(run.err, HasSubstr("tdm rebind: error: block serv_rf_top/"));
  EXPECT_THAT(run.err, HasSubstr("\" has no pin \""));
  EXPECT_THAT(run.err, HasSubstr("is unchanged"));
  EXPECT_EQ(FileBytes(db), bytes);
}

// A database with a second view: export names both and the two ways to
// choose; --all-views writes each, the netlist view as its own export does.
TEST_F(TdmNetlist, ExportsEveryViewOrAsksWhichOne) {
  ASSERT_EQ(s_Imported.code, 0) << s_Imported.err;
  std::string const db = Copy("views.odb");
  {
    Orb_Model host("t", "t", db.c_str(), false);
    host.Open(db.c_str());
    Orb_View *view = host.GetDesignMgrs()[0]->GetDesigns()[0]->CreateView("alt");
    view->CreatePropertyString(Lum_TdmSchema::kVersion, "3.1");
    view->CreateTopBlock("alt_top")->CreatePin("a", Orb_Pin::PIN_INPUT);
    host.Save(db.c_str());
  }
  std::string const lib = s_Dir->Path();
  ToolRun const neither = Tdm({"export", "--lib-path", lib, db});
  EXPECT_EQ(neither.code, 2);
  EXPECT_THAT(neither.err,
              HasSubstr("holds several views (serv_rf_top/serv_rf_top/netlist, "
                        "serv_rf_top/serv_rf_top/alt): choose one with --view, or write every "
                        "view with --all-views -o FOLDER"));
  EXPECT_EQ(Tdm({"export", "--lib-path", lib, db, "--all-views"}).code, 2);
  std::string const folder = File("views");
  ToolRun const all =
      Tdm({"export", "--lib-path", lib, db, "--all-views", "-o", folder, "--format", "verilog"});
  ASSERT_EQ(all.code, 0) << all.err;
  ToolRun const one =
      Tdm({"export", "--lib-path", lib, db, "--view", "netlist", "-o", File("one.v")});
  ASSERT_EQ(one.code, 0) << one.err;
  EXPECT_EQ(FileBytes(folder + "/serv_rf_top.netlist.v"), FileBytes(File("one.v")));
  EXPECT_THAT(FileBytes(folder + "/serv_rf_top.alt.v"), HasSubstr("module alt_top"));
}

// Rebinding to a library the view does not list: the library is read from
// --lib, added to the view's list and kept beside the database, so that the
// next open binds the new type; a rebind that fails adds nothing.
TEST_F(TdmNetlist, RebindsToALibraryTheViewDoesNotListYet) {
  ASSERT_EQ(s_Imported.code, 0) << s_Imported.err;
  lumtest::TempDir out;
  std::string const spare = out.File("spare.lib");
  std::ofstream(spare) << "library (spare) {\n  cell (spare_inv) {\n    pin (A) { direction : "
                          "input ; }\n    pin (Y) { direction : output ; function : \"!A\" ; "
                          "}\n  }\n}\n";
  std::string const db = out.File("serv.odb");
  std::filesystem::copy_file(File("serv.odb"), db);
  std::string const lib = "--lib-path=" + s_Dir->Path();
  std::string const from = std::string(kLibrary) + ":sg13g2_inv_1";
  // Without the file the library is not found; a flip-flop does not fit an
  // inverter. Neither changes the database or keeps the library.
  std::string const bytes = FileBytes(db);
  for (auto const &[args, message] : std::vector<std::pair<std::vector<std::string>, char const *>>{
           {{"rebind", lib, db, "--from", from, "--to", "spare:spare_inv"},
            "library \"spare\" of --to is not among the libraries of view "
            "serv_rf_top/serv_rf_top/netlist and cannot be loaded"},
           {{"rebind", lib, db, "--from", std::string(kLibrary) + ":sg13g2_dfrbp_1", "--to",
             "spare:spare_inv", "--lib", spare, "--map", "D=A,Q=Y"},
            "\" has no pin \""},
       }) {
    ToolRun const run = Tdm(args);
    EXPECT_NE(run.code, 0);
    EXPECT_THAT(run.err, HasSubstr(message));
    EXPECT_EQ(FileBytes(db), bytes);
    EXPECT_FALSE(std::filesystem::exists(out.File("spare.tlm")));
  }
  auto count = [&](std::string const &type) {
    ToolRun const run = Tdm({"find", lib, "--lib-path", out.Path(), db, "--type", type, "--count"});
    EXPECT_EQ(run.code, 0) << run.err;
    return std::atoi(run.out.c_str());
  };
  int const before = count(from);
  ASSERT_GT(before, 100);
  ToolRun const run =
      Tdm({"rebind", lib, db, "--from", from, "--to", "spare:spare_inv", "--lib", spare});
  ASSERT_EQ(run.code, 0) << run.err;
  EXPECT_THAT(run.out, HasSubstr("added type library spare to 1 view"));
  EXPECT_TRUE(std::filesystem::exists(out.File("spare.tlm")));
  // Reopened through the search path alone, the new type binds.
  EXPECT_EQ(count("spare:spare_inv"), before);
  EXPECT_EQ(count(from), 0);
  ToolRun const check = Tdm({"check", lib, "--lib-path", out.Path(), db});
  EXPECT_EQ(check.code, 0) << check.out << check.err;
  // The view lists the library after those it had.
  Orb_Model host("t", "t", db.c_str(), true);
  host.Open(db.c_str());
  std::vector<std::string> const listed = host.GetDesignMgrs()[0]
                                              ->GetDesigns()[0]
                                              ->GetViews()[0]
                                              ->GetPropertyByName(Lum_TdmSchema::kTypeLibraries)
                                              ->GetStrings();
  ASSERT_EQ(listed.size(), 3U);
  EXPECT_THAT(listed[0], HasSubstr(kLibrary));
  EXPECT_THAT(listed[2], HasSubstr("spare"));
}

TEST_F(TdmNetlist, ImportRefusalsNameTheProblemAndWriteNothing) {
  std::string const netlist = File("bad.v");
  std::string const db = File("bad.odb");
  struct Case {
    char const *text;
    std::vector<std::string> extra;
    char const *message;
  };
  for (Case const &bad : std::vector<Case>{
           {"module m(input a);\n  always @(a) ;\nendmodule\n",
            {},
            "bad.v\": line 2, column 3: 'always' is not structural"},
           {"module m(input a, output y);\n  sg13g2_inv_1 i1 (.A(a), .Y(y));\n  sg13g2_inv_1 i2 "
            "(.A(a), .Y(y));\nendmodule\n",
            {},
            "bad.v\": line 3, column 16: module m: net y has two drivers, i1.Y and i2.Y"},
           {"module m(input a, output y);\n  FOO f1 (.A(a), .Y(y));\n  FOO f2 (.A(a));\n  BAR "
            "b (.A(a));\nendmodule\n",
            {},
            "2 cell types are in no type library: BAR (1 instance, e.g. b); FOO (2 instances, "
            "e.g. f1, f2)."},
       }) {
    { std::ofstream(netlist) << bad.text; }
    std::vector<std::string> args = {
        "import", netlist, "--lib", Data("sg13g2_stdcell_typ_1p20V_25C.filtered.lib"), "-o", db};
    ToolRun const run = Tdm(args);
    EXPECT_EQ(run.code, 3) << bad.message;
    EXPECT_THAT(run.err, HasSubstr(bad.message));
    EXPECT_THAT(run.err, HasSubstr("nothing was written"));
    EXPECT_FALSE(std::filesystem::exists(db));
  }
  // With --blackbox-unknown the unknown cells come in untyped and go out as
  // they were.
  ToolRun const run = Tdm({"import", netlist, "--blackbox-unknown", "-o", db});
  ASSERT_EQ(run.code, 0) << run.err;
  EXPECT_THAT(run.out, HasSubstr("3 untyped"));
  ToolRun const exported = Tdm({"export", db, "--format", "verilog"});
  EXPECT_THAT(exported.out, HasSubstr("FOO f2 (\n    .A(a)\n  );"));
}

} // namespace

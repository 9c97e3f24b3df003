// Runs the tdm program as a process and checks its output, errors and exit codes. Databases are
// built at the host level, so that each carries exactly the stored state (and faults) a test
// needs; a real open in this process is the reference that tdm check must agree with.

#include "Lum_TdmModel.h"

#include "Lum_Tlm.h"
#include "Orb_Model.h"
#include "Port_Exception.h"
#include "Port_MsgManData.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <functional>
#include <sstream>
#include <string>
#include <sys/wait.h>
#include <vector>

namespace {

using ::testing::HasSubstr;

struct Outcome {
  int code = -1;
  std::string out;
  std::string err;
};

std::string Slurp(std::string const &path) {
  std::ifstream in(path, std::ios::binary);
  std::stringstream text;
  text << in.rdbuf();
  return text.str();
}

// Single quotes for the shell.
std::string Sh(std::string const &word) {
  std::string quoted = "'";
  for (char c : word)
    quoted += c == '\'' ? std::string("'\\''") : std::string(1, c);
  return quoted + "'";
}

class TdmTool : public ::testing::Test {
public:
  void SetUp() override {
    std::string pattern = (std::filesystem::temp_directory_path() / "tdm_tool_XXXXXX").string();
    ASSERT_NE(::mkdtemp(pattern.data()), nullptr);
    m_Dir = pattern;
    ::unsetenv("LUM_TLM_PATH");
    Lum_TlmCatalog::ClearSearchDirectories();
    Lum_TlmCatalog::AddSearchDirectory(m_Dir.c_str());
    WriteLibrary();
  }
  void TearDown() override {
    Lum_TlmCatalog::ClearSearchDirectories();
    std::filesystem::remove_all(m_Dir);
  }

  std::string File(std::string const &name) const { return m_Dir + "/" + name; }

  // Runs tdm with the arguments through the shell (`prefix` goes before the
  // command, for ulimit and the like) and collects both streams.
  Outcome Tdm(std::vector<std::string> const &args, std::string const &prefix = "") const {
    std::string command = prefix + " exec " + Sh(TDM_PATH);
    for (std::string const &arg : args)
      command += " " + Sh(arg);
    command += " >" + Sh(File("out.txt")) + " 2>" + Sh(File("err.txt"));
    int const status = std::system(command.c_str());
    Outcome run;
    run.code = WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
    run.out = Slurp(File("out.txt"));
    run.err = Slurp(File("err.txt"));
    return run;
  }
  Outcome Tdm(std::string const &command, std::string const &db) const {
    return Tdm({command, "--lib-path", m_Dir, db});
  }

  // GATES 1.2 "demo": NAND2 (A, B in; Y out) and INV (A in; Y out).
  void WriteLibrary(unsigned revision = 2) const {
    Lum_TlmModel model("GATES", "GATES", "", false);
    Lum_TlmLibrary *library = model.CreateLibrary("GATES", 1, revision, "demo");
    Lum_TlmBlock *nand = library->CreateTypeBlock("NAND2");
    nand->CreatePin("A", Orb_Pin::PIN_INPUT);
    nand->CreatePin("B", Orb_Pin::PIN_INPUT);
    nand->CreatePin("Y", Orb_Pin::PIN_OUTPUT);
    Lum_TlmBlock *inv = library->CreateTypeBlock("INV");
    inv->CreatePin("A", Orb_Pin::PIN_INPUT);
    inv->CreatePin("Y", Orb_Pin::PIN_OUTPUT);
    library->Save(File("GATES.tlm").c_str());
  }

  // A design "chip" with view "netlist", in the state a commit leaves it: u1 a NAND2 with A
  // connected, u2 an INV whose pin IN maps to A, u3 untyped.
  struct Design {
    Orb_DesignMgr *dm;
    Orb_Design *design;
    Orb_View *view;
    Orb_Block *top;
    Orb_Signal *net;
  };
  static Design AddDesign(Orb_DesignMgr *dm, char const *name, char const *stamp = "3.1") {
    Design d{};
    d.dm = dm;
    d.design = dm->CreateDesign(name);
    d.design->CreatePropertyString("TDS_DESIGN_TYPE", "TDS_DESIGN_TYPE_USER");
    d.view = d.design->CreateView("netlist");
    d.view->CreatePropertyString("TDS_TDM_VERSION", stamp);
    d.view->CreatePropertyString("TDS_DEVICE_PM", "demo");
    d.view->CreatePropertyString("TDS_DEVICE_PART", "d1");
    d.view->CreatePropertyStringList("TDS_VIEW_TYPE_LIBS")->AppendString("GATES 1.2 demo");
    d.top = d.view->CreateTopBlock(name);
    d.net = d.top->CreateSignal("n1");
    Orb_Block *u1 = AddTyped(d, "u1", "GATES:NAND2", {"A", "B", "Y"});
    u1->GetPinByName("A")->Connect(d.net);
    Orb_Block *u2 = AddTyped(d, "u2", "GATES:INV", {"IN", "Y"});
    u2->GetPinByName("IN")->Connect(d.net);
    u2->CreatePropertyList("TDS_BLOCK_PIN_MAP")->CreatePropertyString("IN", "A");
    d.top->CreateBlock("u3")->CreatePin("P", Orb_Pin::PIN_INPUT);
    d.view->CreateNetwork("nets")->AddSignal(d.net);
    return d;
  }
  static Orb_Block *AddTyped(Design const &d, char const *name, char const *type,
                             std::vector<char const *> const &pins) {
    Orb_Block *block = d.top->CreateBlock(name);
    block->CreatePropertyString("TDS_BLOCK_TYPE", type);
    for (char const *pin : pins)
      block->CreatePin(pin, Orb_Pin::PIN_INPUT);
    return block;
  }

  // Saves a database with design "chip" after `seed` changed it.
  std::string WriteDatabase(std::string const &name,
                            std::function<void(Design &)> const &seed = {}) {
    Orb_Model host("t", "t", "", false);
    Design d = AddDesign(host.CreateDesignMgr("work"), "chip");
    if (seed)
      seed(d);
    std::string path = File(name);
    host.Save(path.c_str());
    return path;
  }

  // Whether a real open through the client model succeeds.
  static bool Opens(std::string const &path) {
    Port_MsgCapture capture;
    try {
      Lum_TdmModel model("t", "t", path.c_str());
      model.Open(path.c_str());
      return true;
    } catch (Port::Exception const &) {
      return false;
    }
  }

  std::string m_Dir;
};

// The main job: what the demo writes opens with every binding, and the
// other subcommands read it.
TEST_F(TdmTool, DemoWritesAReopenableDesignThatEverySubcommandReads) {
  Outcome run = Tdm(std::vector<std::string>{"demo"}, "cd " + Sh(m_Dir) + " &&");
  ASSERT_EQ(run.code, 0) << run.out << run.err;
  EXPECT_EQ(run.err, "");
  std::string const first = run.out.substr(0, run.out.find('\n'));
  std::string const prefix = "tdm demo: wrote into " + m_Dir + "/tdm_demo_";
  ASSERT_EQ(first.substr(0, prefix.size()), prefix) << run.out;
  std::string const dir = first.substr(first.find(m_Dir));
  EXPECT_TRUE(std::filesystem::exists(dir + "/demo.odb"));

  run = Tdm({"demo", "--dir", File("d")});
  ASSERT_EQ(run.code, 0) << run.out << run.err;
  for (char const *line :
       {"  chip/reg        GATES:DFF    typed through a pin map",
        "  chip/core       CORES:ALU    typed, hierarchy grafted beneath",
        "  chip/core_copy  -            untyped copy of CORES:ALU",
        "reopened in a fresh model: 40 of 40 bindings", "Design <chip> View <netlist> consumes "})
    EXPECT_THAT(run.out, HasSubstr(line));
  std::string const db = File("d/demo.odb");
  // The demo's own GATES, not the fixture's.
  Lum_TlmCatalog::ClearSearchDirectories();
  Lum_TlmCatalog::AddSearchDirectory(File("d").c_str());
  EXPECT_TRUE(Opens(db));
  std::vector<std::string> const libPath = {"--lib-path", File("d")};
  auto tdm = [&](std::vector<std::string> args) {
    args.insert(args.begin() + 1, libPath.begin(), libPath.end());
    args.push_back(db);
    return Tdm(args);
  };
  run = tdm({"check"});
  EXPECT_EQ(run.code, 0) << run.out;
  run = tdm({"tree", "--pins"});
  EXPECT_EQ(run.code, 0) << run.err;
  for (char const *line :
       {"  reg  GATES:DFF\n    . pin DATA (input)  D\n    . pin CLOCK (input)  CK\n",
        "  core  CORES:ALU\n", "    g1  GATES:NAND2\n", "  core_copy  -\n"})
    EXPECT_THAT(run.out, HasSubstr(line)) << run.out;
  run = tdm({"info"});
  EXPECT_EQ(run.code, 0) << run.err;
  EXPECT_THAT(run.out, HasSubstr("      CORES        recorded 2.0 sample       now 2.0 sample\n"));
  EXPECT_EQ(tdm({"commit"}).code, 0);
  EXPECT_EQ(tdm({"dot"}).code, 0);

  // Quiet, it prints the folder alone.
  run = Tdm({"demo", "--quiet", "--dir", File("q")});
  EXPECT_EQ(run.code, 0) << run.err;
  EXPECT_EQ(run.out, File("q") + "\n");
}

// One fault per database: tdm check names it, and a real open fails too.
TEST_F(TdmTool, CheckReportsTheFaultThatMakesOpeningFail) {
  static auto const child = [](Design &d, char const *name) { return d.top->GetBlockByName(name); };
  std::pair<char const *, std::function<void(Design &)>> const seeds[] = {
      {"  \"OTHER\": 1 design: work/chip",
       [](Design &d) { d.design->CreatePropertyString("TDS_DESIGN_TYPE", "OTHER"); }},
      {"  \"0.2\": 1 view: work/chip/netlist",
       [](Design &d) { d.view->CreatePropertyString("TDS_TDM_VERSION", "0.2"); }},
      {"  \"3.2\": 1 view: work/chip/netlist",
       [](Design &d) { d.view->CreatePropertyString("TDS_TDM_VERSION", "3.2"); }},
      {"  without TDS_DEVICE_PART: 1 view: work/chip/netlist",
       [](Design &d) { d.view->DeleteProperty("TDS_DEVICE_PART"); }},
      {"  CELLS: 1 view: work/chip/netlist",
       [](Design &d) {
         d.view->GetPropertyByName("TDS_VIEW_TYPE_LIBS")->AppendString("CELLS 1.0");
       }},
      {"  CELLS:NAND2: 1 block: work/chip/netlist:chip/u1",
       [](Design &d) {
         child(d, "u1")->CreatePropertyString("TDS_BLOCK_TYPE", "CELLS:NAND2");
       }},
      {"  GATES:XOR2: 1 block: work/chip/netlist:chip/u1",
       [](Design &d) {
         child(d, "u1")->CreatePropertyString("TDS_BLOCK_TYPE", "GATES:XOR2");
       }},
      {"  GATES:INV: 1 pin: work/chip/netlist:chip/u2 pin IN (mapped to Z)",
       [](Design &d) {
         // The last member of a name wins.
         child(d, "u2")
             ->GetPropertyByName("TDS_BLOCK_PIN_MAP")
             ->CreatePropertyString("IN", "Z");
       }},
      {"  GATES:NAND2: 1 pin: work/chip/netlist:chip/u4 pin A",
       [](Design &d) {
         Orb_Block *u4 = AddTyped(d, "u4", "GATES:NAND2", {"A"});
         u4->CreatePropertyList("TDS_BLOCK_PIN_MAP")->CreatePropertyString("A", "B");
       }},
  };
  for (auto const &[expected, seed] : seeds) {
    SCOPED_TRACE(expected);
    std::string const db = WriteDatabase("seeded.odb", seed);
    Outcome const run = Tdm("check", db);
    EXPECT_EQ(run.code, 1) << run.out << run.err;
    EXPECT_THAT(run.out, HasSubstr(": 1 problem that makes opening fail\n"));
    EXPECT_THAT(run.out, HasSubstr(expected)) << run.out;
    EXPECT_FALSE(Opens(db)) << "a real open accepts what tdm check refuses";
  }
}

TEST_F(TdmTool, CheckReportsEveryProblemGroupedWithCounts) {
  std::string const db = WriteDatabase("many.odb", [](Design &d) {
    Orb_DesignMgr *dm = d.dm;
    for (char const *name : {"lib1", "lib2"})
      dm->CreateDesign(name)->CreatePropertyString("TDS_DESIGN_TYPE", "TDS_DESIGN_TYPE_LIBRARY");
    AddDesign(dm, "old1", "0.1");
    AddDesign(dm, "old2", "");
    AddDesign(dm, "new1", "3.2");
    AddDesign(dm, "new2", "4.0");
    for (char const *name : {"x1", "x2", "x3", "x4"})
      AddTyped(d, name, "GATES:XOR2", {});
    AddTyped(d, "m1", "GATES:MUX", {});
    AddTyped(d, "c1", "CELLS:NAND2", {});
    AddTyped(d, "c2", "CELLS:NAND2", {});
    for (char const *name : {"z1", "z2"})
      AddTyped(d, name, "GATES:NAND2", {"A", "B", "Y", "Z"})->GetPinByName("Z")->Connect(d.net);
    for (char const *name : {"k1", "k2"})
      AddTyped(d, name, "GATES:INV", {"Y"})
          ->CreatePropertyList("TDS_BLOCK_PIN_MAP")
          ->CreatePropertyString("Y", "A");
    // A view that forbids creating pins has no collisions.
    Design quiet = AddDesign(dm, "quiet");
    quiet.view->CreatePropertyString("LUM_DONT_CREATE_UNUSED_PINS", "");
    AddTyped(quiet, "k3", "GATES:INV", {"Y"})
        ->CreatePropertyList("TDS_BLOCK_PIN_MAP")
        ->CreatePropertyString("Y", "A");
    Design nodevice = AddDesign(dm, "nodevice");
    nodevice.view->DeleteProperty("TDS_DEVICE_PM");
    nodevice.view->DeleteProperty("TDS_DEVICE_PART");
    AddDesign(dm, "nopm").view->DeleteProperty("TDS_DEVICE_PM");
    AddDesign(dm, "nowhere")
        .view->GetPropertyByName("TDS_VIEW_TYPE_LIBS")
        ->AppendString("NOWHERE 1.0");
    Design broken = AddDesign(dm, "broken");
    broken.view->GetPropertyByName("TDS_VIEW_TYPE_LIBS")->AppendString("BROKEN 1.0");
    AddTyped(broken, "b1", "BROKEN:ANY", {});
  });
  std::ofstream(File("BROKEN.tlm")) << "not a library\n";

  Outcome const run = Tdm("check", db);
  EXPECT_EQ(run.code, 1) << run.err;
  // The whole report, with the folder shown as $ and the chip view's blocks as @.
  std::string report = run.out;
  for (auto const &[from, to] :
       {std::pair<std::string, char const *>{m_Dir, "$"}, {"work/chip/netlist:chip/", "@"}})
    for (std::size_t at = report.find(from); at != std::string::npos; at = report.find(from, at))
      report.replace(at, from.size(), to);
  EXPECT_EQ(report,
            "$/many.odb: 21 problems that make opening fail\n"
            "design with a foreign design mark (TDS_DESIGN_TYPE): 2\n"
            "  \"TDS_DESIGN_TYPE_LIBRARY\": 2 designs: work/lib1, work/lib2\n"
            "view stamp too old (TDS_TDM_VERSION below 0.3: convert the design): 2\n"
            "  \"\": 1 view: work/old2/netlist\n"
            "  \"0.1\": 1 view: work/old1/netlist\n"
            "view stamp too new (TDS_TDM_VERSION above 3.1: written by newer software): 2\n"
            "  \"3.2\": 1 view: work/new1/netlist\n"
            "  \"4.0\": 1 view: work/new2/netlist\n"
            "view without a device personality for its type libraries: 2\n"
            "  without TDS_DEVICE_PM: 1 view: work/nopm/netlist\n"
            "  without TDS_DEVICE_PM and TDS_DEVICE_PART: 1 view: work/nodevice/netlist\n"
            "type library that cannot be loaded: 2\n"
            "  BROKEN: 1 view: work/broken/netlist\n"
            "    \"BROKEN\": The library file $/BROKEN.tlm cannot be read: Design database "
            "'$/BROKEN.tlm' is not a design database.; work/broken/netlist types 1 block from it: "
            "work/broken/netlist:broken/b1\n"
            "  NOWHERE: 1 view: work/nowhere/netlist\n"
            "    \"NOWHERE\": Type library found neither in the catalog nor as a file NOWHERE.tlm "
            "on the search path \"$\" (personality demo).; work/nowhere/netlist types 0 blocks "
            "from it\n"
            "library not in the view's TDS_VIEW_TYPE_LIBS: 2\n"
            "  CELLS:NAND2: 2 blocks: @c1, @c2\n"
            "type block missing from its library: 5\n"
            "  GATES:MUX: 1 block: @m1\n"
            "  GATES:XOR2: 4 blocks: @x1, @x2, @x3, ...\n"
            "connected pin that no type pin matches: 2\n"
            "  GATES:NAND2: 2 pins: @z1 pin Z, @z2 pin Z\n"
            "pin in the way of a type pin that opening would create: 2\n"
            "  GATES:INV: 2 pins: @k1 pin Y, @k2 pin Y\n");
  EXPECT_FALSE(Opens(db));
}

// Type blocks of the database's own local library are looked up in the
// database, as an open does.
TEST_F(TdmTool, CheckResolvesTheLocalLibraryFromTheDatabase) {
  auto withLocal = [](char const *type) {
    return [type](Design &d) {
      Lum_TlmLibrary *local =
          Lum_TlmLibrary::GetLocalLibrary(d.view->GetModel(), PM_PIC("demo", "d1", nullptr));
      local->CreateTypeBlock("MACRO")->CreatePin("X", Orb_Pin::PIN_INPUT);
      d.view->GetPropertyByName("TDS_VIEW_TYPE_LIBS")
          ->AppendString(std::string(Lum_TlmLibrary::LOCAL_LIBRARY_NAME) + " 1.0");
      AddTyped(d, "mac", type, {"X"})->GetPinByName("X")->Connect(d.net);
    };
  };
  std::string const local = std::string(Lum_TlmLibrary::LOCAL_LIBRARY_NAME);
  std::string const good = WriteDatabase("good.odb", withLocal((local + ":MACRO").c_str()));
  Outcome run = Tdm("check", good);
  EXPECT_EQ(run.code, 0) << run.out;
  EXPECT_TRUE(Opens(good));

  std::string const bad = WriteDatabase("bad.odb", withLocal((local + ":OTHER").c_str()));
  run = Tdm("check", bad);
  EXPECT_EQ(run.code, 1);
  EXPECT_THAT(run.out, HasSubstr("  " + local + ":OTHER: 1 block: work/chip/netlist:chip/mac\n"));
  EXPECT_FALSE(Opens(bad));
}

TEST_F(TdmTool, ErrorsNameTheFileAndEndWithTheirExitCode) {
  std::string const db = WriteDatabase("chip.odb");
  std::ofstream(File("corrupt.odb")) << "garbage\n";
  std::string const missing = File("missing.odb");

  Outcome run = Tdm("info", missing);
  EXPECT_EQ(run.code, 3);
  EXPECT_THAT(run.err, HasSubstr("tdm info: error: " + missing + ": "));
  EXPECT_THAT(run.err, HasSubstr("No such file or directory"));
  run = Tdm("check", File("corrupt.odb"));
  EXPECT_EQ(run.code, 3);
  EXPECT_THAT(run.err, HasSubstr("tdm check: error: " + File("corrupt.odb") + ": "));
  EXPECT_THAT(run.err, HasSubstr("is not a design database"));

  // Without --lib-path the library is not found.
  run = Tdm({"tree", db});
  EXPECT_EQ(run.code, 3);
  EXPECT_THAT(run.err, HasSubstr(db + ": cannot be opened: \"GATES\": "));

  std::string const old = WriteDatabase(
      "old.odb", [](Design &d) { d.view->CreatePropertyString("TDS_TDM_VERSION", "0.1"); });
  run = Tdm("dot", old);
  EXPECT_EQ(run.code, 3);
  EXPECT_THAT(run.err, HasSubstr(old + ": cannot be opened: \"work\": Old design that requires "
                                       "conversion. (Tdm version is 0 and the revision is 1."));
  EXPECT_EQ(run.out, "");

  for (std::vector<std::string> const &args : std::vector<std::vector<std::string>>{
           {}, {"bogus"}, {"check"}, {"tree", db, "--depth", "-1"}, {"info", db, "--frobnicate"}}) {
    run = Tdm(args);
    EXPECT_EQ(run.code, 2) << run.err;
    EXPECT_THAT(run.err, HasSubstr("--help")) << run.err;
  }
  run = Tdm({"tree", "--view", "layout", "--lib-path", m_Dir, db});
  EXPECT_EQ(run.code, 2);
  EXPECT_THAT(run.err, HasSubstr("no view named \"layout\" (views: work/chip/netlist)"));

  run = Tdm({"commit", "--help"});
  EXPECT_EQ(run.code, 0);
  EXPECT_THAT(run.out, HasSubstr("Usage: tdm commit [OPTIONS] DB"));
  EXPECT_THAT(run.out, HasSubstr("3  a database or library that cannot be read"));
}

// On a clean database: check agrees with a real open, tree shows types and pins, and info shows
// the recorded and the current library versions.
TEST_F(TdmTool, CleanDatabaseChecksAndShows) {
  std::string const db = WriteDatabase("chip.odb");
  Outcome run = Tdm("check", db);
  EXPECT_EQ(run.code, 0) << run.out << run.err;
  EXPECT_THAT(run.out, HasSubstr("no problems: it opens (1 view, 4 blocks checked)"));
  EXPECT_EQ(run.err, "");
  EXPECT_TRUE(Opens(db));

  run = Tdm({"tree", "--pins", "--lib-path", m_Dir, db});
  EXPECT_EQ(run.code, 0) << run.err;
  EXPECT_EQ(run.out, "work/chip/netlist\n"
                     "chip  -\n"
                     "  u1  GATES:NAND2\n"
                     "    . pin A (input)  A\n"
                     "    . pin B (input)  B\n"
                     "    . pin Y (input)  Y\n"
                     "  u2  GATES:INV\n"
                     "    . pin IN (input)  A\n"
                     "    . pin Y (input)  Y\n"
                     "  u3  -\n"
                     "    . pin P (input)  -\n");
  run = Tdm({"tree", "--depth", "0", "--view", "netlist", "--lib-path", m_Dir, db});
  EXPECT_EQ(run.out, "work/chip/netlist\nchip  -\n");

  WriteLibrary(3);
  run = Tdm("info", db);
  EXPECT_EQ(run.code, 0) << run.err;
  for (char const *line :
       {"design work/chip\n  view netlist\n    stamp: 3.1\n", "    device: demo, part d1\n",
        "      GATES        recorded 1.2 demo         now 1.3 demo   <- differs\n",
        "    blocks: 4 (2 typed, 2 untyped)\n",
        "      GATES:INV                1\n      GATES:NAND2              1\n",
        "    pins: 6, signals: 1, networks: 1\n", "Design <chip> View <netlist> consumes ",
        "4 blocks consume "})
    EXPECT_THAT(run.out, HasSubstr(line)) << run.out;
}

TEST_F(TdmTool, CommitUpgradesAnOldStampAndTheResultOpens) {
  std::string const db = WriteDatabase(
      "old.odb", [](Design &d) { d.view->CreatePropertyString("TDS_TDM_VERSION", "2.5"); });
  std::string const out = File("new.odb");
  Outcome run = Tdm({"commit", "--lib-path", m_Dir, db, "-o", out});
  EXPECT_EQ(run.code, 0) << run.err;
  EXPECT_EQ(run.out, "work/chip/netlist: stamp 2.5 -> 3.1\ncommitted 1 view, saved " + out + "\n");

  Orb_Model host("t", "t", "", true);
  host.Open(out.c_str());
  Orb_View const *view = host.GetDesignMgrs()[0]->GetDesigns()[0]->GetViews()[0];
  EXPECT_STREQ(view->GetPropertyByName("TDS_TDM_VERSION")->GetStringValue(), "3.1");
  EXPECT_EQ(view->GetPropertyByName("TDS_VIEW_TYPE_LIBS")->GetStrings(),
            std::vector<std::string>{"GATES 1.2 demo"});
  EXPECT_TRUE(Opens(out));
  EXPECT_EQ(Tdm("check", out).code, 0);

  // In place, with the file size limited below the database's size: the
  // save fails and the database stays as it was.
  std::string const big = WriteDatabase("big.odb", [](Design &d) {
    d.view->CreatePropertyString("TDS_TDM_VERSION", "2.5");
    for (int i = 0; i < 200; ++i)
      d.top->CreateBlock(("spare" + std::to_string(i)).c_str());
  });
  std::string const before = Slurp(big);
  ASSERT_GT(before.size(), 2048U) << "ulimit -f 1 allows 1024 bytes";
  run = Tdm({"commit", "--lib-path", m_Dir, big}, "trap '' XFSZ; ulimit -f 1;");
  EXPECT_EQ(run.code, 3) << run.out << run.err;
  EXPECT_THAT(run.err, HasSubstr(big + ": cannot be saved: "));
  EXPECT_THAT(run.err, HasSubstr("the database is unchanged"));
  EXPECT_EQ(Slurp(big), before);
}

TEST_F(TdmTool, DotOutputIsAcceptedByGraphviz) {
  if (std::system("command -v dot >/dev/null 2>&1") != 0)
    GTEST_SKIP() << "Graphviz's dot is not installed";
  std::string const db =
      WriteDatabase("chip.odb", [](Design &d) { d.top->CreateBlock("odd \"name\"\\\n\xff"); });
  Outcome const run = Tdm("dot", db);
  ASSERT_EQ(run.code, 0) << run.err;
  EXPECT_THAT(run.out, HasSubstr("[label=\"u1\\nGATES:NAND2\"];"));
  EXPECT_THAT(run.out, HasSubstr("[label=\"u3\\n(untyped)\", style=\"rounded,dashed\""));
  std::ofstream(File("chip.dot")) << run.out;
  std::string const render = "dot -Tsvg " + Sh(File("chip.dot")) + " -o " + Sh(File("chip.svg"));
  EXPECT_EQ(std::system(render.c_str()), 0) << run.out;
  EXPECT_THAT(Slurp(File("chip.svg")), HasSubstr("GATES:NAND2"));
}

} // namespace

// Runs tdm as a process; a real open in this process is the reference tdm check must agree with.

#include "../Lum_TdmTestSupport.h"

#include "Lum_TdmSchema.h"
#include "Lum_TdmVerifier.h"
#include "Orb_Model.h"
#include "Port_Exception.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <functional>
#include <string>
#include <sys/stat.h>
#include <sys/wait.h>
#include <tuple>
#include <vector>

using lumtest::FileBytes;
using lumtest::TempDir;
using ::testing::HasSubstr;

namespace {

struct Outcome {
  int code = -1;
  std::string out;
  std::string err;
};

std::string Sh(std::string const &word) {
  std::string quoted = "'";
  for (char c : word)
    quoted += c == '\'' ? std::string("'\\''") : std::string(1, c);
  return quoted + "'";
}

class TdmTool : public ::testing::Test {
public:
  void SetUp() override {
    ::unsetenv("LUM_TLM_PATH");
    Lum_TlmCatalog::ClearSearchDirectories();
    Lum_TlmCatalog::AddSearchDirectory(m_Dir.c_str());
    WriteLibrary();
  }
  void TearDown() override { Lum_TlmCatalog::ClearSearchDirectories(); }

  std::string File(std::string const &name) const { return m_Dir + "/" + name; }

  // Runs tdm through the shell; `prefix` goes before the command (ulimit and the like).
  Outcome Tdm(std::vector<std::string> const &args, std::string const &prefix = "") const {
    std::string command = prefix + " exec " + Sh(TDM_PATH);
    for (std::string const &arg : args)
      command += " " + Sh(arg);
    command += " >" + Sh(File("out.txt")) + " 2>" + Sh(File("err.txt"));
    int const status = std::system(command.c_str());
    Outcome run;
    run.code = WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
    run.out = FileBytes(File("out.txt"));
    run.err = FileBytes(File("err.txt"));
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

  // Design "chip"/"netlist" as committed: u1 a NAND2, u2 an INV with pin map IN->A, u3 untyped.
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
    d.design->CreatePropertyString(Lum_TdmSchema::kDesignType, Lum_TdmSchema::kDesignTypeUser);
    d.view = d.design->CreateView("netlist");
    d.view->CreatePropertyString(Lum_TdmSchema::kVersion, stamp);
    d.view->CreatePropertyString(Lum_TdmSchema::kDevicePm, "demo");
    d.view->CreatePropertyString(Lum_TdmSchema::kDevicePart, "d1");
    d.view->CreatePropertyStringList(Lum_TdmSchema::kTypeLibraries)->AppendString("GATES 1.2 demo");
    d.top = d.view->CreateTopBlock(name);
    d.net = d.top->CreateSignal("n1");
    Orb_Block *u1 = AddTyped(d, "u1", "GATES:NAND2", {"A", "B", "Y"});
    u1->GetPinByName("A")->Connect(d.net);
    Orb_Block *u2 = AddTyped(d, "u2", "GATES:INV", {"IN", "Y"});
    u2->GetPinByName("IN")->Connect(d.net);
    u2->CreatePropertyList(Lum_TdmSchema::kBlockPinMap)->CreatePropertyString("IN", "A");
    d.top->CreateBlock("u3")->CreatePin("P", Orb_Pin::PIN_INPUT);
    d.view->CreateNetwork("nets")->AddSignal(d.net);
    return d;
  }
  static Orb_Block *AddTyped(Design const &d, char const *name, char const *type,
                             std::vector<char const *> const &pins) {
    Orb_Block *block = d.top->CreateBlock(name);
    block->CreatePropertyString(Lum_TdmSchema::kBlockType, type);
    for (char const *pin : pins)
      block->CreatePin(pin, Orb_Pin::PIN_INPUT);
    return block;
  }

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

  static bool Opens(std::string const &path) {
    Port_MsgCapture capture;
    try {
      lumtest::OpenModel(path);
    } catch (Port::Exception const &) {
      return false;
    }
    return true;
  }

  // The open refuses the database, and the verifier, which tdm check reports from, has that
  // very refusal (class, object, message) among its problems.
  static void ExpectOpenRefusalAmongProblems(std::string const &path) {
    std::string refusal;
    {
      Port_MsgCapture capture;
      refusal = lumtest::Failure([&] { lumtest::OpenModel(path); });
    }
    EXPECT_NE(refusal, "no failure") << "a real open accepts what tdm check refuses";
    std::vector<std::string> problems;
    for (Lum_TdmVerifier::Problem const &problem : Lum_TdmVerifier::CheckFile(path))
      if (problem.kind != Lum_TdmVerifier::Kind::BlockOfUnloadableLibrary)
        problems.push_back(problem.exception.substr(std::strlen("Lum_Exception")) + "|" +
                           problem.objectName + "|" + problem.message);
    EXPECT_THAT(problems, ::testing::Contains(refusal));
  }

  TempDir m_Temp;
  std::string const m_Dir = m_Temp.Path();
};

TEST_F(TdmTool, DemoWritesAReopenableDesignThatEverySubcommandReads) {
  Outcome run = Tdm({"demo", "--dir", File("d")});
  ASSERT_EQ(run.code, 0) << run.out << run.err;
  EXPECT_EQ(run.err, "");
  EXPECT_EQ(run.out.substr(0, run.out.find('\n')), "tdm demo: wrote into " + File("d"));
  for (char const *line : {"  chip/reg        GATES:DFF    typed through a pin map",
                           "  chip/core_copy  -            untyped copy of CORES:ALU",
                           "reopened in a fresh model: 40 of 40 bindings"})
    EXPECT_THAT(run.out, HasSubstr(line));
  std::string const db = File("d/demo.odb");
  Lum_TlmCatalog::ClearSearchDirectories();
  Lum_TlmCatalog::AddSearchDirectory(File("d").c_str());
  EXPECT_TRUE(Opens(db));
  for (char const *command : {"check", "tree", "info", "commit", "dot"})
    EXPECT_EQ(Tdm({command, "--lib-path", File("d"), db}).code, 0) << command;

  run = Tdm({"demo", "--quiet", "--dir", File("q")});
  EXPECT_EQ(run.code, 0) << run.err;
  EXPECT_EQ(run.out, File("q") + "\n");
}

// One fault per database: tdm check names it and a real open fails too; local types resolve.
TEST_F(TdmTool, CheckReportsTheFaultThatMakesOpeningFail) {
  std::string const local = Lum_TlmLibrary::LOCAL_LIBRARY_NAME;
  auto const withLocal = [&local](std::string const &type) {
    return [local, type](Design &d) {
      Lum_TlmLibrary::GetLocalLibrary(d.view->GetModel(), PM_PIC("demo", "d1", nullptr))
          ->CreateTypeBlock("MACRO")
          ->CreatePin("X", Orb_Pin::PIN_INPUT);
      d.view->GetPropertyByName(Lum_TdmSchema::kTypeLibraries)->AppendString(local + " 1.0");
      AddTyped(d, "mac", type.c_str(), {"X"})->GetPinByName("X")->Connect(d.net);
    };
  };
  std::pair<std::string, std::function<void(Design &)>> const seeds[] = {
      {"  GATES:INV: 1 pin: work/chip/netlist:chip/u2 pin IN (mapped to Z)",
       [](Design &d) {
         d.top->GetBlockByName("u2")
             ->GetPropertyByName(Lum_TdmSchema::kBlockPinMap)
             ->CreatePropertyString("IN", "Z");
       }},
      {"  GATES:NAND2: 1 pin: work/chip/netlist:chip/u4 pin A",
       [](Design &d) {
         AddTyped(d, "u4", "GATES:NAND2", {"A"})
             ->CreatePropertyList(Lum_TdmSchema::kBlockPinMap)
             ->CreatePropertyString("A", "B");
       }},
      {"  " + local + ":OTHER: 1 block: work/chip/netlist:chip/mac\n", withLocal(local + ":OTHER")},
  };
  for (auto const &[expected, seed] : seeds) {
    SCOPED_TRACE(expected);
    std::string const db = WriteDatabase("seeded.odb", seed);
    Outcome const run = Tdm("check", db);
    EXPECT_EQ(run.code, 1) << run.out << run.err;
    EXPECT_THAT(run.out, HasSubstr(expected)) << run.out;
    ExpectOpenRefusalAmongProblems(db);
  }
  std::string const good = WriteDatabase("good.odb", withLocal(local + ":MACRO"));
  EXPECT_EQ(Tdm("check", good).code, 0);
  EXPECT_TRUE(Opens(good));
  EXPECT_TRUE(Lum_TdmVerifier::CheckFile(good).empty());
}

TEST_F(TdmTool, CheckReportsEveryProblemGroupedWithCounts) {
  std::string const db = WriteDatabase("many.odb", [](Design &d) {
    Orb_DesignMgr *dm = d.dm;
    for (char const *name : {"lib1", "lib2"})
      dm->CreateDesign(name)->CreatePropertyString(Lum_TdmSchema::kDesignType,
                                                   Lum_TdmSchema::kDesignTypeLibrary);
    AddDesign(dm, "old1", "0.1");
    AddDesign(dm, "old2", "");
    AddDesign(dm, "new1", "3.2");
    AddDesign(dm, "new2", "4.0");
    for (char const *name : {"x1", "x2", "x3", "x4"})
      AddTyped(d, name, "GATES:XOR2", {});
    AddTyped(d, "m1", "GATES:MUX", {});
    for (char const *name : {"c1", "c2"})
      AddTyped(d, name, "CELLS:NAND2", {});
    for (char const *name : {"z1", "z2"})
      AddTyped(d, name, "GATES:NAND2", {"A", "B", "Y", "Z"})->GetPinByName("Z")->Connect(d.net);
    for (char const *name : {"k1", "k2"})
      AddTyped(d, name, "GATES:INV", {"Y"})
          ->CreatePropertyList(Lum_TdmSchema::kBlockPinMap)
          ->CreatePropertyString("Y", "A");
    // No collisions where the view forbids creating pins.
    Design quiet = AddDesign(dm, "quiet");
    quiet.view->CreatePropertyString(Lum_TdmSchema::kDontCreateUnusedPins, "");
    AddTyped(quiet, "k3", "GATES:INV", {"Y"})
        ->CreatePropertyList(Lum_TdmSchema::kBlockPinMap)
        ->CreatePropertyString("Y", "A");
    Design nodevice = AddDesign(dm, "nodevice");
    nodevice.view->DeleteProperty(Lum_TdmSchema::kDevicePm);
    nodevice.view->DeleteProperty(Lum_TdmSchema::kDevicePart);
    AddDesign(dm, "nopm").view->DeleteProperty(Lum_TdmSchema::kDevicePm);
    AddDesign(dm, "nowhere")
        .view->GetPropertyByName(Lum_TdmSchema::kTypeLibraries)
        ->AppendString("NOWHERE 1.0");
    Design broken = AddDesign(dm, "broken");
    broken.view->GetPropertyByName(Lum_TdmSchema::kTypeLibraries)->AppendString("BROKEN 1.0");
    AddTyped(broken, "b1", "BROKEN:ANY", {});
  });
  std::ofstream(File("BROKEN.tlm")) << "not a library\n";

  Outcome const run = Tdm("check", db);
  EXPECT_EQ(run.code, 1) << run.err;
  // Folder shown as $, the chip view's blocks as @.
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
  ExpectOpenRefusalAmongProblems(db);
}

// Errors name the file and end with their exit code; a clean database checks and shows.
TEST_F(TdmTool, ErrorsAndACleanDatabase) {
  std::string const db = WriteDatabase("chip.odb");
  std::string const corrupt = File("corrupt.odb"), missing = File("missing.odb");
  std::ofstream(corrupt) << "garbage\n";
  std::string const old = WriteDatabase(
      "old.odb", [](Design &d) { d.view->CreatePropertyString(Lum_TdmSchema::kVersion, "0.1"); });
  using Case = std::tuple<std::vector<std::string>, int, std::string>;
  for (auto const &[args, code, message] : std::vector<Case>{
           {{"info", missing}, 3, "tdm info: error: " + missing + ": "},
           {{"check", "--lib-path", m_Dir, corrupt}, 3, corrupt + ": Design database"},
           {{"tree", db}, 3, db + ": cannot be opened: \"GATES\": "},
           {{"dot", "--lib-path", m_Dir, old}, 3, old + ": cannot be opened: \"work\": Old design"},
           {{}, 2, "--help"},
           {{"bogus"}, 2, "--help"},
           {{"check"}, 2, "--help"},
           {{"tree", db, "--depth", "-1"}, 2, "--help"},
           {{"info", db, "--frobnicate"}, 2, "--help"},
           {{"tree", "--view", "layout", "--lib-path", m_Dir, db},
            2,
            "no view named \"layout\" (views: work/chip/netlist)"}}) {
    Outcome const run = Tdm(args);
    EXPECT_EQ(run.code, code) << message;
    EXPECT_THAT(run.err, HasSubstr(message));
  }
  Outcome run = Tdm({"commit", "--help"});
  EXPECT_EQ(run.code, 0);
  EXPECT_THAT(run.out, HasSubstr("Usage: tdm commit [OPTIONS] DB"));

  run = Tdm("check", db);
  EXPECT_EQ(run.code, 0) << run.out << run.err;
  EXPECT_THAT(run.out, HasSubstr("no problems: it opens (1 view, 4 blocks checked)"));
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
  EXPECT_EQ(Tdm({"tree", "--depth", "0", "--view", "netlist", "--lib-path", m_Dir, db}).out,
            "work/chip/netlist\nchip  -\n");

  WriteLibrary(3);
  run = Tdm("info", db);
  EXPECT_EQ(run.code, 0) << run.err;
  for (char const *line :
       {"design work/chip\n  view netlist\n    stamp: 3.1\n",
        "      GATES        recorded 1.2 demo         now 1.3 demo   <- differs\n",
        "    blocks: 4 (2 typed, 2 untyped)\n", "    pins: 6, signals: 1, networks: 1\n"})
    EXPECT_THAT(run.out, HasSubstr(line)) << run.out;
}

TEST_F(TdmTool, CommitUpgradesAnOldStampAndTheResultOpens) {
  std::string const db = WriteDatabase(
      "old.odb", [](Design &d) { d.view->CreatePropertyString(Lum_TdmSchema::kVersion, "2.5"); });
  std::string const out = File("new.odb");
  Outcome run = Tdm({"commit", "--lib-path", m_Dir, db, "-o", out});
  EXPECT_EQ(run.code, 0) << run.err;
  EXPECT_EQ(run.out, "work/chip/netlist: stamp 2.5 -> 3.1\ncommitted 1 view, saved " + out + "\n");
  EXPECT_EQ(Tdm("check", out).code, 0);

  // In place, with the file size limited below the database's: the database stays as it was.
  std::string const big = WriteDatabase("big.odb", [](Design &d) {
    d.view->CreatePropertyString(Lum_TdmSchema::kVersion, "2.5");
    for (int i = 0; i < 200; ++i)
      d.top->CreateBlock(("spare" + std::to_string(i)).c_str());
  });
  std::string const before = FileBytes(big);
  ASSERT_GT(before.size(), 2048U) << "ulimit -f 1 allows 1024 bytes";
  run = Tdm({"commit", "--lib-path", m_Dir, big}, "trap '' XFSZ; ulimit -f 1;");
  EXPECT_EQ(run.code, 3) << run.out << run.err;
  EXPECT_THAT(run.err, HasSubstr(big + ": cannot be saved: "));
  EXPECT_EQ(FileBytes(big), before);
}

TEST_F(TdmTool, DotOutputIsAcceptedByGraphviz) {
  if (std::system("command -v dot >/dev/null 2>&1") != 0)
    GTEST_SKIP() << "Graphviz's dot is not installed";
  std::string const db =
      WriteDatabase("chip.odb", [](Design &d) { d.top->CreateBlock("odd \"name\"\\\n\xff"); });
  Outcome const run = Tdm("dot", db);
  ASSERT_EQ(run.code, 0) << run.err;
  EXPECT_THAT(run.out, HasSubstr("[label=\"u3\\n(untyped)\", style=\"rounded,dashed\""));
  std::ofstream(File("chip.dot")) << run.out;
  std::string const render = "dot -Tsvg " + Sh(File("chip.dot")) + " -o " + Sh(File("chip.svg"));
  EXPECT_EQ(std::system(render.c_str()), 0) << run.out;
  EXPECT_THAT(FileBytes(File("chip.svg")), HasSubstr("GATES:NAND2"));
}

// Every error is one line with control bytes of paths escaped; a negative depth is refused; a
// FIFO or a folder is neither read (which would block) nor replaced, with exit code 3.
TEST_F(TdmTool, OneLineErrorsAndOnlyRegularFiles) {
  std::string const db = WriteDatabase("chip.odb");
  std::string const odd = File("two\nlines.odb"), fifo = File("pipe.odb");
  ASSERT_EQ(::mkfifo(fifo.c_str(), 0600), 0);
  std::string const shownOdd = m_Dir + "/two\\nlines.odb";
  using Case = std::tuple<std::vector<std::string>, int, std::string>;
  for (auto const &[args, code, message] : std::vector<Case>{
           {{"info", odd}, 3, "tdm info: error: " + shownOdd + ": "},
           {{"check", odd}, 3, "tdm check: error: " + shownOdd + ": "},
           {{"tree", db, "--depth", "-1"}, 2, "--depth: must be a whole number of 0 or more"},
           {{"tree", db, "--depth", "x"}, 2, "(see tdm tree --help)"},
           {{"check"}, 2, "tdm check: error: DB is required (see tdm check --help)"},
           {{"info", fifo}, 3, "tdm info: error: " + fifo + ": not a regular file (a FIFO)"},
           {{"check", fifo}, 3, "not a regular file (a FIFO)"},
           {{"commit", fifo}, 3, "not a regular file (a FIFO)"},
           {{"commit", "-o", fifo, db}, 3, fifo + ": not a regular file (a FIFO)"},
           {{"tree", m_Dir}, 3, "not a regular file (a folder)"}}) {
    SCOPED_TRACE(args[0] + " " + args.back());
    // A run that blocks is ended after a while, and fails.
    Outcome const run = Tdm(args, "(sleep 20; kill $$) </dev/null >/dev/null 2>&1 &");
    EXPECT_EQ(run.code, code) << run.err;
    EXPECT_THAT(run.err, HasSubstr(message));
    EXPECT_EQ(std::count(run.err.begin(), run.err.end(), '\n'), 1) << run.err;
  }
  struct stat status {};
  ASSERT_EQ(::stat(fifo.c_str(), &status), 0);
  EXPECT_TRUE(S_ISFIFO(status.st_mode)) << "the FIFO was replaced";
}

} // namespace

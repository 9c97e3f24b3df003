// Design databases: round trips, load events, refused files, failed saves, companions.

#include "host/HostTestSupport.h"

#include "Orb_Exception.h"
#include "Orb_Model.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <stdexcept>
#include <string_view>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

namespace fs = std::filesystem;

namespace {

using namespace HostTest;
using namespace std::string_literals;
using ::testing::HasSubstr;

void BuildSample(Orb_Model &model) {
  Orb_DesignMgr *designMgr = model.CreateDesignMgr("lib one");
  designMgr->CreatePropertyString("note", "a b:c\nd \xc3\xa9\xff 12:x");
  Orb_Design *design = designMgr->CreateDesign("cpu");
  design->CreateView("empty")->CreatePropertyString("", "");
  Orb_View *view = design->CreateView("schematic");
  Orb_Block *top = view->CreateTopBlock("top");
  Orb_Pin *z = top->CreatePin("z", Orb_Pin::PIN_OUTPUT);
  top->CreatePin("a", Orb_Pin::PIN_BIDIRECTIONAL)->CreatePropertyString("cap", "1 pF");
  Orb_Block *alu = top->CreateBlock("alu");
  alu->CreateBlock("adder")->CreateBlock("bit0");
  Orb_Signal *clk = top->CreateSignal("clk");
  Orb_Signal *carry = alu->CreateSignal("carry");
  alu->CreatePin("in", Orb_Pin::PIN_INPUT)->Connect(clk);
  Orb_Pin *out = alu->CreatePin("out", Orb_Pin::PIN_OUTPUT);
  out->ConnectInner(carry);
  out->Connect(top->CreateSignal("sum"));
  alu->GetBlockByName("adder")->CreatePin("ci", Orb_Pin::PIN_INPUT)->Connect(carry);
  z->ConnectInner(clk);
  Orb_Property *strings = alu->CreatePropertyStringList("lines");
  for (char const *value : {"", "x y", "\n", ":"})
    strings->AppendString(value);
  Orb_Property *list = alu->CreatePropertyList("params");
  list->CreatePropertyString("k", "1");
  list->CreatePropertyString("k", "2");
  list->CreatePropertyString("j", "\xfe:\n");
  alu->CreatePropertyString("nul", "")->SetStringValue("\0a\0"s);
  strings->AppendString("b\0"s);
  list->CreatePropertyString("n", "")->SetStringValue("\0"s);
  Orb_Network *clocks = view->CreateNetwork("clocks");
  clocks->AddSignal(carry);
  clocks->AddSignal(clk);
  clocks->CreatePropertyString("kind", "clock net");
  view->CreateNetwork("none");
  model.CreateDesignMgr("lib two")->CreateDesign("io");
}

class Orb_ModelIOTest : public ::testing::Test {
protected:
  void SetUp() override {
    std::string pattern = (fs::path(::testing::TempDir()) / "Orb_ModelIOTest.XXXXXX").string();
    ASSERT_NE(::mkdtemp(pattern.data()), nullptr);
    m_Dir = pattern;
    m_Path = PathOf("a.db");
    BuildSample(m_Sample);
    m_Sample.Save(m_Path.c_str());
  }
  void TearDown() override { fs::remove_all(m_Dir); }

  std::string PathOf(char const *name) const { return (fs::path(m_Dir) / name).string(); }
  static void WriteBytes(std::string const &path, std::string_view bytes) {
    std::ofstream(path, std::ios::binary) << bytes;
  }
  static void ExpectRefused(std::string const &path, char const *expected) {
    Orb_Model model("target", "db", "", false);
    ExpectRefused(model, path, expected);
    EXPECT_EQ(ObjectCount(model), 0u);
  }
  static void ExpectRefused(Orb_Model &model, std::string const &path, char const *expected) {
    std::string const message = ThrownBy([&] { model.Open(path.c_str()); }).message;
    EXPECT_THAT(message, HasSubstr(path));
    EXPECT_THAT(message, HasSubstr(expected));
  }
  void SaveWithCompanion(std::string const &path, char const *main,
                         std::unique_ptr<Orb_Model> companion) {
    Orb_Model model("orig", "db", "", false);
    if (main)
      model.CreateDesignMgr(main);
    model.SetCompanion("local", std::make_unique<TestCompanion>(std::move(companion)));
    model.Save(path.c_str());
  }

  std::string m_Dir;
  std::string m_Path;
  Orb_Model m_Sample{"sample", "db", "", false};
  EventLog log;
};

// Reopening gives the same model and bytes; Open adds to a model but refuses duplicates.
TEST_F(Orb_ModelIOTest, RoundTripGivesIdenticalModel) {
  Orb_Model reopened("sample", "db", "", false);
  reopened.Open(m_Path.c_str());
  EXPECT_EQ(Dump(reopened), Dump(m_Sample));
  reopened.Save(PathOf("b.db").c_str());
  EXPECT_EQ(ReadBytes(PathOf("b.db")), ReadBytes(m_Path));

  Orb_Model target("target", "db", "", false);
  target.CreateDesignMgr("mine");
  target.Open(m_Path.c_str());
  EXPECT_EQ(Dump(target), "design manager mine\n" + Dump(m_Sample));
  EXPECT_THROW(target.Open(m_Path.c_str()), Orb_Exception);
  EXPECT_EQ(Dump(target), "design manager mine\n" + Dump(m_Sample));
}

// Whichever load handler throws, everything loaded goes; a handler may delete what is to come.
TEST_F(Orb_ModelIOTest, LoadHandlersThrowOrDelete) {
  for (char const *name : {"lib one", "bit0", "clocks", "target"}) {
    Orb_Model model("target", "db", "", false);
    RecModel client(&log, &model);
    client.refuse = name;
    EXPECT_THAT([&] { model.Open(m_Path.c_str()); },
                ::testing::ThrowsMessage<std::runtime_error>(std::string("refused ") + name));
    EXPECT_EQ(ObjectCount(model), 0u) << name;
    EXPECT_EQ(client.GetClientCount(), 0u) << name;
  }

  // A handler may delete objects still to be loaded, its own block's parent included.
  Orb_Model model("target", "db", "", false);
  RecModel client(&log, &model);
  client.onLoad = [](Orb_Persistent *object) {
    if (object->GetNameString() == "adder")
      static_cast<Orb_Block *>(object)->GetView()->DeleteTopBlock();
  };
  model.Open(m_Path.c_str());
  Orb_View const *view = model.GetDesignMgrs()[0]->GetDesigns()[0]->GetViewByName("schematic");
  EXPECT_EQ(Dump(view), "view schematic\n network clocks <kind=clock net>\n network none\n");
  EXPECT_EQ(client.GetClientCount(), ObjectCount(model));
}

// A small valid hand-written database (with a NUL byte in a value).
using namespace std::string_view_literals;
constexpr std::string_view kSmallDatabase =
    "Orb design database\nV 1\nM 1:m 1:d\nD 2:dm\nG 1:g\n"
    "W 1:v\nB 3:top\nI 0 1:p\nS 1:s\nP 1:k 2:\0v\n"
    "B 1:c\nI 1 1:q\nE\nE\nC 0 1 0\nN 1:n 1 0\nE\nE\nE\nZ\n"sv;

// It opens as written, one OnLoad per object in file order, the model last.
TEST_F(Orb_ModelIOTest, OpensHandWrittenDatabaseWithLoadEvents) {
  WriteBytes(m_Path, kSmallDatabase);
  Orb_Model model("target", "db", "", false);
  RecModel client(&log, &model);
  model.Open(m_Path.c_str());
  EXPECT_EQ(Dump(model), "design manager dm\n design g\n  view v\n   block top\n"
                         "    pin p input => top/s\n    signal s <k=\0v> <- top/p\n    block c\n"
                         "     pin q output\n   network n top/s\n"s);
  EXPECT_EQ(Joined(log), "load design manager dm; load design g; load view v; load block top; "
                         "load pin p; load signal s +properties; load block c; load pin q; "
                         "load network n; load model target");
}

// Every broken file is refused naming file and fault.
TEST_F(Orb_ModelIOTest, RefusesBrokenFiles) {
  std::string const bytes = ReadBytes(m_Path);
  for (std::size_t size = 0; size < bytes.size(); ++size) {
    SCOPED_TRACE(size);
    WriteBytes(PathOf("cut.db"), std::string_view(bytes).substr(0, size));
    ExpectRefused(PathOf("cut.db"), size == 0 ? "not a design database" : "truncated");
  }
  ExpectRefused(PathOf("missing.db"), "cannot be opened");
  ExpectRefused(m_Dir, "cannot be read");

  // Blocks nested one level too deep, refused at the end of the deepest record.
  std::string deep;
  for (unsigned level = 1; level <= Orb_MaxBlockDepth; ++level)
    deep += "B 1:c\n";
  std::string const tooDeep = "corrupt at byte " +
                              std::to_string(kSmallDatabase.find("B 1:c\n") + deep.size()) +
                              ": block 'c' nested deeper than 1000 levels";
  for (unsigned level = 1; level <= Orb_MaxBlockDepth; ++level)
    deep += "E\n";
  // Enough siblings for the name index, then a repeated name.
  auto const record = [](char const *head, std::string const &name, char const *tail) {
    return head + std::to_string(name.size()) + ":" + name + tail;
  };
  std::string manySignals;
  std::string manyBlocks;
  for (int i = 0; i < 40; ++i) {
    manySignals += record("S ", "s" + std::to_string(i), "\n");
    manyBlocks += record("B ", "c" + std::to_string(i), "\nE\n");
  }
  manySignals += record("S ", "s5", "\n");
  manyBlocks += record("B ", "c37", "\nE\n");
  // Past the size at which names are checked by sorting their hashes.
  std::string hugeSignals;
  for (int i = 0; i < 5000; ++i)
    hugeSignals += record("S ", "s" + std::to_string(i), "\n");
  hugeSignals += record("S ", "s4321", "\n");
  // Each replaces `from` once in kSmallDatabase; an empty `from` replaces all.
  struct {
    std::string_view from, to;
    char const *expected;
  } const breakages[] = {
      {"", "id,name\n1,x\n", "not a design database"},
      {"V 1\n", "V 2\n", "format version 2"},
      {"G 1:g", "X 1:g", "unexpected record 'X'"},
      {"B 3:top", "B 3top", "expected ':'"},
      {"B 3:top\nI", "B 9:top\nI", "expected end of record"},
      {"C 0 1 0", "C 0 1 7", "pin 7 of a view with 2 pins"},
      // Numbers past the digits that cannot overflow read the same, or overflow.
      {"C 0 1 0", "C 0 1 0000000000000000000000000007", "pin 7 of a view with 2 pins"},
      {"C 0 1 0", "C 0 1 18446744073709551616", "number too large"},
      {"C 0 1 0", "C 0 1 x", "expected a number"},
      {"C 0 1 0", "C 0 2 0 0", "pin 'p' is connected twice inside"},
      {"I 1 1:q\nE\nE\nC 0 1 0", "I 1 1:q\nS 1:t\nE\nE\nC 1 1 0",
       "connects to signal 't' of block 'c', neither its own block nor its parent"},
      {"S 1:s\n", "I 2 1:p\n", "second pin named 'p'"},
      {"S 1:s\n", "S 1:s\nP 1:k 0:\nP 1:k 0:\n", "second property named 'k'"},
      {"S 1:s\n", manySignals, "second signal named 's5'"},
      {"S 1:s\n", hugeSignals, "second signal named 's4321'"},
      {"B 1:c\nI 1 1:q\nE\n", manyBlocks, "second block named 'c37'"},
      {"1:p", "1:\0"sv, "NUL byte in a name"},
      {"P 1:k", "P 2:k\0"sv, "NUL byte in a name"},
      {"Z\n", "Z\nZ\n", "data after the end record"},
      {"B 1:c\nI 1 1:q\nE\n", deep, tooDeep.c_str()},
      {"E\nZ\n", "E\nK 1:a\nM 1:m 1:d\nK 1:b\n", "companion section inside a companion"},
  };
  for (auto const &breakage : breakages) {
    SCOPED_TRACE(breakage.expected);
    std::string broken(breakage.from.empty() ? breakage.to : kSmallDatabase);
    if (!breakage.from.empty())
      broken.replace(broken.find(breakage.from), breakage.from.size(), breakage.to);
    WriteBytes(m_Path, broken);
    ExpectRefused(m_Path, breakage.expected);
  }
}

// A block with many children, read without indexing their names, finds each
// by name afterwards and still refuses a repeated name.
TEST_F(Orb_ModelIOTest, ManyChildrenFindableAfterOpen) {
  Orb_Model big("big", "db", "", false);
  Orb_Block *top =
      big.CreateDesignMgr("dm")->CreateDesign("d")->CreateView("v")->CreateTopBlock("t");
  for (int i = 0; i < 5000; ++i) {
    top->CreateSignal(("s" + std::to_string(i)).c_str());
    top->CreateBlock(("b" + std::to_string(i)).c_str());
  }
  big.Save(m_Path.c_str());
  Orb_Model opened("o", "db", "", false);
  opened.Open(m_Path.c_str());
  Orb_Block *read =
      opened.GetDesignMgrByName("dm")->GetDesignByName("d")->GetViewByName("v")->GetBlock();
  for (int i = 0; i < 5000; i += 7) {
    ASSERT_EQ(read->GetSignalByName(("s" + std::to_string(i)).c_str()), read->GetSignals()[i]);
    ASSERT_EQ(read->GetBlockByName(("b" + std::to_string(i)).c_str()), read->GetBlocks()[i]);
  }
  EXPECT_EQ(read->GetSignalByName("s5000"), nullptr);
  EXPECT_THROW(read->CreateBlock("b4999"), Orb_Exception);
  EXPECT_THROW(read->CreateSignal("s0"), Orb_Exception);
  EXPECT_NE(read->CreateSignal("s5000"), nullptr);
}

// A failed save keeps the old file; saves keep its mode and links and remove dead saves' files.
TEST_F(Orb_ModelIOTest, SaveReplacesFilesSafely) {
  std::string const previous = ReadBytes(m_Path);
  m_Sample.CreateDesignMgr("more")->CreateDesign("x");

  EXPECT_THROW(Orb_Model("ro", "db", m_Path.c_str(), true).Save(), Orb_Exception);
  EXPECT_THROW(m_Sample.Save(PathOf("nowhere/a.db").c_str()), Orb_Exception);
  rlimit saved{};
  getrlimit(RLIMIT_FSIZE, &saved);
  auto const oldHandler = std::signal(SIGXFSZ, SIG_IGN);
  rlimit small = saved;
  small.rlim_cur = previous.size() / 2;
  ASSERT_EQ(setrlimit(RLIMIT_FSIZE, &small), 0);
  EXPECT_THAT(ThrownBy([&] { m_Sample.Save(m_Path.c_str()); }).message, HasSubstr(m_Path));
  setrlimit(RLIMIT_FSIZE, &saved);
  std::signal(SIGXFSZ, oldHandler);

  EXPECT_EQ(ReadBytes(m_Path), previous);
  std::size_t entries = 0;
  for (auto const &entry : fs::directory_iterator(m_Dir))
    entries += entry.path().filename() != "a.db";
  EXPECT_EQ(entries, 0u) << "temporary file left behind";

  for (fs::perms mode : {fs::perms(0600), fs::perms(0666)}) {
    fs::permissions(m_Path, mode);
    m_Sample.Save(m_Path.c_str());
    EXPECT_EQ(fs::status(m_Path).permissions(), mode);
  }

  fs::create_directory(PathOf("sub"));
  fs::create_symlink("../a.db", PathOf("sub/link.db"));
  fs::create_symlink("sub/link.db", PathOf("chain.db"));
  fs::create_symlink("fresh.db", PathOf("dangling.db"));
  WriteBytes(m_Path, "old");
  Orb_Model other("other", "db", "", false);
  other.CreateDesignMgr("x");
  other.Save(PathOf("chain.db").c_str());
  other.Save(PathOf("dangling.db").c_str());
  EXPECT_TRUE(fs::is_symlink(PathOf("chain.db")) && fs::is_symlink(PathOf("sub/link.db")));
  EXPECT_TRUE(fs::is_symlink(PathOf("dangling.db")));
  EXPECT_EQ(ReadBytes(m_Path), ReadBytes(PathOf("fresh.db")));
  EXPECT_EQ(Dump(*Reopened(other)), Dump(other));

  fs::create_symlink("loop2.db", PathOf("loop1.db"));
  fs::create_symlink("loop1.db", PathOf("loop2.db"));
  EXPECT_THROW(other.Save(PathOf("loop1.db").c_str()), Orb_Exception);

  pid_t const dead = ::fork();
  ASSERT_GE(dead, 0);
  if (dead == 0)
    ::_exit(0);
  ASSERT_EQ(::waitpid(dead, nullptr, 0), dead);
  std::string const deadPid = std::to_string(dead);
  std::string const stale = "a.db.tmp." + deadPid + ".17";
  std::string const live[] = {"a.db.tmp." + std::to_string(::getppid()) + ".0",
                              "a.db.tmp." + deadPid + ".1x", "b.db.tmp." + deadPid + ".0"};
  WriteBytes(PathOf(stale.c_str()), "partial");
  for (auto const &name : live)
    WriteBytes(PathOf(name.c_str()), "keep");

  m_Sample.Save(m_Path.c_str());
  EXPECT_FALSE(fs::exists(PathOf(stale.c_str())));
  for (auto const &name : live)
    EXPECT_TRUE(fs::exists(PathOf(name.c_str()))) << name;
}

// Companions come back without events, survive an unclaimed save, go with a refused open.
TEST_F(Orb_ModelIOTest, CompanionsRoundTrip) {
  auto library = std::make_unique<Orb_Model>("lib", "libdb", "", false);
  BuildSample(*library);
  SaveWithCompanion(m_Path, "main", std::move(library));

  Orb_Model waiting("target", "db", "", false);
  RecModel client(&log, &waiting);
  waiting.Open(m_Path.c_str());
  EXPECT_EQ(Joined(log), "load design manager main; load model target");
  std::unique_ptr<Orb_Model> reopened = Reopened(waiting);
  std::unique_ptr<Orb_Model> loaded = reopened->TakeLoadedCompanion("local");
  ASSERT_NE(loaded, nullptr);
  EXPECT_EQ(std::string(loaded->GetName()) + loaded->GetDbName() + loaded->GetPath(), "liblibdb");
  EXPECT_EQ(Dump(*loaded), Dump(m_Sample));
  EXPECT_EQ(reopened->TakeLoadedCompanion("local"), nullptr);

  Orb_Model failed("target", "db", "", false);
  RecModel refusing(&log, &failed);
  refusing.refuse = "main";
  EXPECT_THROW(failed.Open(m_Path.c_str()), std::runtime_error);
  EXPECT_EQ(failed.TakeLoadedCompanion("local"), nullptr);

  // Nested companions cannot be stored.
  auto nested = std::make_unique<Orb_Model>("lib", "libdb", "", false);
  nested->SetCompanion(
      "inner", std::make_unique<TestCompanion>(std::make_unique<Orb_Model>("in", "db", "", false)));
  std::string const previous = ReadBytes(m_Path);
  EXPECT_THAT(ThrownBy([&] { SaveWithCompanion(m_Path, nullptr, std::move(nested)); }).message,
              HasSubstr("companions cannot nest"));
  EXPECT_EQ(ReadBytes(m_Path), previous);
}

// A companion the model already has refuses the open; a refused open restores replaced companions.
TEST_F(Orb_ModelIOTest, RefusedOpenKeepsTheModelsCompanions) {
  SaveWithCompanion(PathOf("main.db"), "main",
                    std::make_unique<Orb_Model>("lib", "libdb", "", false));
  SaveWithCompanion(PathOf("only.db"), nullptr,
                    std::make_unique<Orb_Model>("lib", "libdb", "", false));
  Orb_Model live("target", "db", "", false);
  auto *companion = new TestCompanion(std::make_unique<Orb_Model>("mine", "db", "", false));
  live.SetCompanion("local", std::unique_ptr<Orb_ModelCompanion>(companion));
  ExpectRefused(live, PathOf("main.db"), "'local'");
  EXPECT_EQ(live.GetCompanion("local"), companion);
  EXPECT_EQ(live.TakeLoadedCompanion("local"), nullptr);

  Orb_Model waiting("target", "db", "", false);
  waiting.Open(PathOf("main.db").c_str());
  ExpectRefused(waiting, PathOf("only.db"), "'local'");
  EXPECT_NE(waiting.TakeLoadedCompanion("local"), nullptr);

  Orb_Model target("target", "db", "", false);
  auto *mine = new TestCompanion(nullptr);
  target.SetCompanion("mine", std::unique_ptr<Orb_ModelCompanion>(mine));
  RecModel client(&log, &target);
  bool replacementFreed = false;
  client.onLoad = [&](Orb_Persistent *object) {
    if (object->GetNameString() == "cpu")
      target.SetCompanion("mine", std::make_unique<TestCompanion>(nullptr, &replacementFreed));
  };
  client.refuse = "io";
  EXPECT_THROW(target.Open(m_Path.c_str()), std::runtime_error);
  EXPECT_EQ(target.GetCompanion("mine"), mine);
  EXPECT_TRUE(replacementFreed);
  EXPECT_EQ(ObjectCount(target), 0u);
}

} // namespace

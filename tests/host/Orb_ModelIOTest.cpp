// Design databases: save and reopen round trips, load events, refused files,
// failed saves and companion models.

#include "Orb_Derived.h"
#include "Orb_Exception.h"
#include "Orb_Model.h"
#include "Orb_SortFtor.h"

#include <gtest/gtest.h>

#include <csignal>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <stdexcept>
#include <string_view>
#include <sys/resource.h>

namespace fs = std::filesystem;

namespace {

std::string PathIn(Orb_Persistent const *object) {
  Orb_Persistent const *parent = object->GetParentObject();
  return parent && parent->GetKind() == Orb_Kind::Block ? PathIn(parent) + "/" + object->GetName()
                                                        : object->GetName();
}

// Canonical text of an object and everything below it: one line per object
// with its properties, direction and connections, children indented.
void Dump(std::string &out, Orb_Persistent const *object, std::size_t depth) {
  out += std::string(depth, ' ') + Orb_KindName(object->GetKind()) + " " + object->GetName();
  for (auto const &property : object->GetProperties()) {
    out += " {" + std::to_string(property->GetKind()) + property->GetName() + "=" +
           property->GetValue();
    for (std::string const &value : property->GetStrings())
      out += "|" + value;
    for (auto const &member : property->GetMembers())
      out += "|" + std::string(member->GetName()) + "=" + member->GetValue();
    out += "}";
  }
  std::vector<Orb_Persistent const *> children;
  auto add = [&children](auto const &items) {
    children.insert(children.end(), items.begin(), items.end());
  };
  if (auto const *designMgr = dynamic_cast<Orb_DesignMgr const *>(object))
    add(designMgr->GetDesigns());
  if (auto const *design = dynamic_cast<Orb_Design const *>(object))
    add(design->GetViews());
  if (auto const *view = dynamic_cast<Orb_View const *>(object)) {
    if (view->GetBlock())
      children.push_back(view->GetBlock());
    add(view->GetNetworks());
  }
  if (auto const *block = dynamic_cast<Orb_Block const *>(object)) {
    add(block->GetPins());
    add(block->GetSignals());
    add(block->GetBlocks());
  }
  if (auto const *pin = dynamic_cast<Orb_Pin const *>(object))
    out += std::string(" ") + Orb_PinDirectionName(pin->GetDirection()) +
           (pin->GetSignal() ? " -> " + PathIn(pin->GetSignal()) : "");
  if (auto const *signal = dynamic_cast<Orb_Signal const *>(object))
    for (Orb_Pin const *pin : signal->GetPins())
      out += " <- " + PathIn(pin);
  if (auto const *network = dynamic_cast<Orb_Network const *>(object))
    for (Orb_Signal const *signal : network->GetSignals())
      out += " " + PathIn(signal);
  out += "\n";
  for (Orb_Persistent const *child : children)
    Dump(out, child, depth + 1);
}

std::string Dump(Orb_Model const &model) {
  std::string out;
  for (Orb_DesignMgr const *designMgr : model.GetDesignMgrs())
    Dump(out, designMgr, 0);
  return out;
}

std::size_t ObjectCount(Orb_Model const &model) {
  std::size_t count = 0;
  for (unsigned k = 0; k < Orb_KindCount; ++k)
    count += model.GetObjectCount(static_cast<Orb_Kind>(k));
  return count;
}

class ByName : public Orb_SortFtor<Orb_Pin> {
public:
  bool operator()(Orb_Pin const *a, Orb_Pin const *b) const override {
    return std::strcmp(a->GetName(), b->GetName()) < 0;
  }
};

// Two design managers with nested blocks, sorted pins, connections across
// blocks, networks and every kind of property with awkward bytes.
void BuildSample(Orb_Model &model) {
  Orb_DesignMgr *designMgr = model.CreateDesignMgr("lib one");
  designMgr->CreatePropertyString("note", "a b:c\nd \xc3\xa9\xff 12:x");
  Orb_Design *design = designMgr->CreateDesign("cpu");
  design->CreateView("empty")->CreatePropertyString("", "");
  Orb_View *view = design->CreateView("schematic");
  Orb_Block *top = view->CreateTopBlock("top");
  Orb_Pin *z = top->CreatePin("z", Orb_Pin::PIN_OUTPUT);
  Orb_Pin *a = top->CreatePin("a", Orb_Pin::PIN_INPUT);
  top->CreatePin("m", Orb_Pin::PIN_BIDIRECTIONAL)->CreatePropertyString("cap", "1 pF");
  top->SortPins(ByName());
  Orb_Block *alu = top->CreateBlock("alu");
  Orb_Pin *in = alu->CreatePin("in", Orb_Pin::PIN_INPUT);
  Orb_Pin *out = alu->CreatePin("out", Orb_Pin::PIN_OUTPUT);
  alu->CreateBlock("adder")->CreateBlock("bit0");
  Orb_Signal *clk = top->CreateSignal("clk");
  Orb_Signal *carry = alu->CreateSignal("carry");
  top->CreateSignal("unused")->CreatePropertyString("why", "spare");
  in->Connect(clk);
  a->Connect(clk);
  out->Connect(carry);
  z->Connect(carry);
  Orb_Property *strings = alu->CreatePropertyStringList("lines");
  for (char const *value : {"", "x y", "\n", ":"})
    strings->AppendString(value);
  Orb_Property *list = alu->CreatePropertyList("params");
  list->CreatePropertyString("k", "1");
  list->CreatePropertyString("k", "2");
  list->CreatePropertyString("j", "\xfe:\n");
  Orb_Network *clocks = view->CreateNetwork("clocks");
  clocks->AddSignal(carry);
  clocks->AddSignal(clk);
  clocks->CreatePropertyString("kind", "clock net");
  view->CreateNetwork("none");
  model.CreateDesignMgr("lib two")->CreateDesign("io");
}

struct Refused : std::runtime_error {
  using std::runtime_error::runtime_error;
};

// Records "Kind:name" per OnLoad event (an OnCreate would go unrecorded),
// makes a plain client, and throws Refused when it meets the object named
// `m_ThrowOn`.
class Recorder : public Orb_ModelDerived {
public:
  explicit Recorder(Orb_Model *model) : Orb_ModelDerived(model) { SetEventNotifyAll(); }

#define RECORD_KIND(Kind)                                                                          \
  void SyncEventSpecialize##Kind##OnLoad(Orb_##Kind *o) override {                                 \
    Record(#Kind, o->GetName());                                                                   \
    new Orb_##Kind##Derived(this, o);                                                              \
  }
  RECORD_KIND(DesignMgr)
  RECORD_KIND(Design)
  RECORD_KIND(View)
  RECORD_KIND(Block)
  RECORD_KIND(Pin)
  RECORD_KIND(Signal)
  RECORD_KIND(Network)
#undef RECORD_KIND
  void SyncEventSpecializeModelOnLoad(Orb_Model *m) override { Record("Model", m->GetName()); }

  std::string m_Events;
  std::string m_ThrowOn;

private:
  void Record(char const *kind, char const *name) {
    m_Events += std::string(m_Events.empty() ? "" : " ") + kind + ":" + name;
    if (m_ThrowOn == name)
      throw Refused(std::string("refused ") + name);
  }
};

class HeldCompanion : public Orb_ModelCompanion {
public:
  explicit HeldCompanion(std::unique_ptr<Orb_Model> model) : m_Model(std::move(model)) {}
  Orb_Model const *GetModelToSave() const override { return m_Model.get(); }
  std::unique_ptr<Orb_Model> m_Model;
};

// A temporary directory holding the sample saved as a.db.
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
  static std::string ReadBytes(std::string const &path) {
    std::ifstream in(path, std::ios::binary);
    return std::string(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
  }
  static void WriteBytes(std::string const &path, std::string_view bytes) {
    std::ofstream(path, std::ios::binary) << bytes;
  }
  // Opening `path` must throw Orb_Exception naming it and leave the model empty.
  static void ExpectRefused(std::string const &path, char const *expected) {
    Orb_Model model("target", "db", "", false);
    try {
      model.Open(path.c_str());
      ADD_FAILURE() << "opened " << path;
    } catch (Orb_Exception const &e) {
      EXPECT_NE(e.GetMessage().find(path), std::string::npos) << e.GetMessage();
      EXPECT_NE(e.GetMessage().find(expected), std::string::npos) << e.GetMessage();
    }
    EXPECT_EQ(ObjectCount(model), 0u);
  }

  std::string m_Dir;
  std::string m_Path;
  Orb_Model m_Sample{"sample", "db", "", false};
};

// Everything stored comes back in the same order, saving the reopened model
// gives the same bytes, and Open adds to a model's own design managers.
TEST_F(Orb_ModelIOTest, RoundTripGivesIdenticalModel) {
  Orb_Model reopened("sample", "db", "", false);
  reopened.Open(m_Path.c_str());
  EXPECT_EQ(Dump(reopened), Dump(m_Sample));
  EXPECT_NE(Dump(reopened).find("block top\n    pin a input -> top/clk\n    pin m {0cap=1 pF}"
                                " bidirectional\n    pin z output"),
            std::string::npos)
      << "pins in sorted order";
  reopened.Save(PathOf("b.db").c_str());
  EXPECT_EQ(ReadBytes(PathOf("b.db")), ReadBytes(m_Path));

  Orb_Model target("target", "db", "", false);
  target.CreateDesignMgr("mine");
  target.Open(m_Path.c_str());
  EXPECT_EQ(Dump(target), "design manager mine\n" + Dump(m_Sample));
  EXPECT_THROW(target.Open(m_Path.c_str()), Orb_Exception) << "design managers already there";
  EXPECT_EQ(Dump(target), "design manager mine\n" + Dump(m_Sample));
}

// Whichever handler refuses, also before the second design manager was
// announced, everything loaded goes and the exception arrives unchanged.
TEST_F(Orb_ModelIOTest, ThrowingHandlerUnloadsEverything) {
  for (char const *name : {"lib one", "bit0", "clocks", "io", "target"}) {
    SCOPED_TRACE(name);
    Orb_Model model("target", "db", "", false);
    Recorder recorder(&model);
    recorder.m_ThrowOn = name;
    try {
      model.Open(m_Path.c_str());
      ADD_FAILURE() << "handler did not throw";
    } catch (Refused const &e) {
      EXPECT_EQ(std::string(e.what()), std::string("refused ") + name);
    }
    EXPECT_EQ(ObjectCount(model), 0u);
    EXPECT_EQ(recorder.GetClientCount(), 0u);
  }
}

// Every prefix of a valid file is refused; so are missing files and
// directories.
TEST_F(Orb_ModelIOTest, RefusesTruncatedAndMissingFiles) {
  std::string const bytes = ReadBytes(m_Path);
  for (std::size_t size = 0; size < bytes.size(); ++size) {
    SCOPED_TRACE(size);
    WriteBytes(PathOf("cut.db"), std::string_view(bytes).substr(0, size));
    ExpectRefused(PathOf("cut.db"), size == 0 ? "not a design database" : "truncated");
  }
  ExpectRefused(PathOf("missing.db"), "cannot be opened");
  ExpectRefused(m_Dir, "cannot be read");
}

// A small hand-written database, valid as it is; broken variants follow.
constexpr std::string_view kSmallDatabase = "Orb design database\nV 1\nM 1:m 1:d\nD 2:dm\nG 1:g\n"
                                            "W 1:v\nB 3:top\nI 0 1:p\nS 1:s\nB 1:c\nI 1 1:q\nE\n"
                                            "E\nC 0 1 0\nN 1:n 1 0\nE\nE\nE\nZ\n";

// It opens into the expected objects, and OnLoad fires once per object in
// the documented order after the model is built, then the model's event.
TEST_F(Orb_ModelIOTest, OpensHandWrittenDatabaseWithLoadEvents) {
  WriteBytes(m_Path, kSmallDatabase);
  Orb_Model model("target", "db", "", false);
  Recorder recorder(&model);
  model.Open(m_Path.c_str());
  EXPECT_EQ(Dump(model), "design manager dm\n design g\n  view v\n   block top\n"
                         "    pin p input -> top/s\n    signal s <- top/p\n    block c\n"
                         "     pin q output\n   network n top/s\n");
  EXPECT_EQ(recorder.m_Events, "DesignMgr:dm Design:g View:v Block:top Pin:p Signal:s Block:c "
                               "Pin:q Network:n Model:target");
  EXPECT_EQ(recorder.GetClientCount(), 9u);
}

struct Breakage {
  char const *label;
  std::string_view from; // replaced once in kSmallDatabase; empty: replace everything
  std::string_view to;
  char const *expected;
};

void PrintTo(Breakage const &breakage, std::ostream *out) { *out << breakage.label; }

class Orb_ModelIOBrokenTest : public Orb_ModelIOTest,
                              public ::testing::WithParamInterface<Breakage> {};

TEST_P(Orb_ModelIOBrokenTest, IsRefused) {
  std::string bytes(GetParam().from.empty() ? GetParam().to : kSmallDatabase);
  if (!GetParam().from.empty())
    bytes.replace(bytes.find(GetParam().from), GetParam().from.size(), GetParam().to);
  WriteBytes(m_Path, bytes);
  ExpectRefused(m_Path, GetParam().expected);
}

INSTANTIATE_TEST_SUITE_P(
    Files, Orb_ModelIOBrokenTest,
    ::testing::Values(Breakage{"NotADatabase", "", "id,name\n1,x\n", "not a design database"},
                      Breakage{"NewerVersion", "V 1\n", "V 2\n", "format version 2"},
                      Breakage{"VersionZero", "V 1\n", "V 0\n", "format version 0"},
                      Breakage{"UnknownRecord", "G 1:g", "X 1:g", "unexpected record 'X'"},
                      Breakage{"BadLength", "B 3:top", "B 3top", "expected ':'"},
                      Breakage{"LongLength", "B 3:top\nI", "B 9:top\nI", "expected end of record"},
                      Breakage{"DanglingPin", "C 0 1 0", "C 0 1 7", "pin 7 of a view with 2 pins"},
                      Breakage{"DanglingSignal", "N 1:n 1 0", "N 1:n 1 1",
                               "signal 1 of a view with 1"},
                      Breakage{"DuplicatePin", "S 1:s\n", "I 2 1:p\n", "second pin named 'p'"},
                      Breakage{"DuplicateProperty", "S 1:s\n", "S 1:s\nP 1:k 0:\nP 1:k 0:\n",
                               "second property named 'k'"},
                      Breakage{"EmptyName", "W 1:v", "W 0:", "empty view name"},
                      Breakage{"NulInName", "1:p", std::string_view("1:\0", 3), "NUL byte"},
                      Breakage{"DataAfterEnd", "Z\n", "Z\nZ\n", "data after the end record"}),
    [](auto const &param) { return std::string(param.param.label); });

// A save that fails at any step throws naming the path and leaves the
// previous file and the directory as they were.
TEST_F(Orb_ModelIOTest, FailedSaveKeepsPreviousFile) {
  std::string const previous = ReadBytes(m_Path);
  m_Sample.CreateDesignMgr("more")->CreateDesign("x");

  EXPECT_THROW(Orb_Model("ro", "db", m_Path.c_str(), true).Save(), Orb_Exception);
  EXPECT_THROW(m_Sample.Save(""), Orb_Exception);
  fs::create_directory(PathOf("dir"));
  for (std::string const &target : {PathOf("dir"), PathOf("nowhere/a.db")}) {
    try {
      m_Sample.Save(target.c_str());
      ADD_FAILURE() << "saved to " << target;
    } catch (Orb_Exception const &e) {
      EXPECT_NE(e.GetMessage().find(target), std::string::npos) << e.GetMessage();
    }
  }
  // A file size limit makes a write fail halfway through.
  rlimit saved{};
  getrlimit(RLIMIT_FSIZE, &saved);
  auto const oldHandler = std::signal(SIGXFSZ, SIG_IGN);
  rlimit small = saved;
  small.rlim_cur = previous.size() / 2;
  ASSERT_EQ(setrlimit(RLIMIT_FSIZE, &small), 0);
  EXPECT_THROW(m_Sample.Save(m_Path.c_str()), Orb_Exception);
  setrlimit(RLIMIT_FSIZE, &saved);
  std::signal(SIGXFSZ, oldHandler);

  EXPECT_EQ(ReadBytes(m_Path), previous);
  std::size_t entries = 0;
  for (auto const &entry : fs::directory_iterator(m_Dir))
    entries += entry.path().filename() != "a.db" && entry.path().filename() != "dir";
  EXPECT_EQ(entries, 0u) << "temporary file left behind";
}

// A companion's model is saved under its key and comes back, without events,
// as a waiting model; unclaimed, it survives another save; a live companion
// or a failed open drops the loaded copy.
TEST_F(Orb_ModelIOTest, CompanionsRoundTrip) {
  Orb_Model original("orig", "db", "", false);
  original.CreateDesignMgr("main");
  auto library = std::make_unique<Orb_Model>("lib", "libdb", "", false);
  BuildSample(*library);
  original.SetCompanion("local", std::make_unique<HeldCompanion>(std::move(library)));
  original.Save(m_Path.c_str());

  Orb_Model waiting("target", "db", "", false);
  {
    Recorder recorder(&waiting);
    waiting.Open(m_Path.c_str());
    EXPECT_EQ(recorder.m_Events, "DesignMgr:main Model:target");
  }
  waiting.Save(PathOf("b.db").c_str());
  Orb_Model reopened("target", "db", "", false);
  reopened.Open(PathOf("b.db").c_str());
  std::unique_ptr<Orb_Model> loaded = reopened.TakeLoadedCompanion("local");
  ASSERT_NE(loaded, nullptr);
  EXPECT_EQ(std::string(loaded->GetName()) + loaded->GetDbName() + loaded->GetPath(), "liblibdb");
  EXPECT_FALSE(loaded->IsReadOnly());
  EXPECT_EQ(Dump(*loaded), Dump(m_Sample));
  EXPECT_EQ(reopened.TakeLoadedCompanion("local"), nullptr);

  Orb_Model live("target", "db", "", false);
  auto *companion = new HeldCompanion(std::make_unique<Orb_Model>("mine", "db", "", false));
  live.SetCompanion("local", std::unique_ptr<Orb_ModelCompanion>(companion));
  live.Open(m_Path.c_str());
  EXPECT_EQ(live.TakeLoadedCompanion("local"), nullptr);
  EXPECT_EQ(live.GetCompanion("local"), companion);

  Orb_Model failed("target", "db", "", false);
  Recorder recorder(&failed);
  recorder.m_ThrowOn = "main";
  EXPECT_THROW(failed.Open(m_Path.c_str()), Refused);
  EXPECT_EQ(failed.TakeLoadedCompanion("local"), nullptr);
}

} // namespace

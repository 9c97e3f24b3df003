// Type libraries: building, the catalog and search path, the local library, type identifiers.

#include "Lum_Tlm.h"
#include "Lum_Exception.h"
#include "Lum_TlmTypeID.h"
#include "Orb_Exception.h"
#include "host/HostTestSupport.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <memory>
#include <stdexcept>
#include <string>
#include <vector>

namespace {

namespace fs = std::filesystem;
using namespace HostTest;
using ::testing::HasSubstr;

std::string Version(Lum_TlmLibrary const *library) {
  unsigned version = 0, revision = 0;
  library->GetTlmVersion(version, revision);
  return std::to_string(version) + "." + std::to_string(revision);
}

// Library "gates": AND2 (A, B -> Y) and MUX with a "schematic" hierarchy of one block.
Lum_TlmLibrary *BuildGates(Lum_TlmModel &model, unsigned version = 2) {
  Lum_TlmLibrary *library = model.CreateLibrary("gates", version, 3, "fast", "");
  Lum_TlmBlock *and2 = library->CreateTypeBlock("AND2");
  and2->CreatePin("A", Orb_Pin::PIN_INPUT);
  and2->CreatePin("B", Orb_Pin::PIN_INPUT);
  and2->CreatePin("Y", Orb_Pin::PIN_OUTPUT);
  library->CreateTypeBlock("MUX")->CreateHier("schematic")->CreateBlock("inner", 0);
  return library;
}

// A temporary directory per test, and an empty search path before and after.
class TlmTest : public ::testing::Test {
protected:
  void SetUp() override {
    TearDown();
    std::string pattern = (fs::temp_directory_path() / "lum_tlm_XXXXXX").string();
    ASSERT_NE(::mkdtemp(pattern.data()), nullptr);
    m_Dir = pattern;
  }
  void TearDown() override {
    Lum_TlmCatalog::ClearSearchDirectories();
    ::unsetenv("LUM_TLM_PATH");
    if (!m_Dir.empty())
      fs::remove_all(m_Dir);
  }
  // Saves "gates" of `version` as <m_Dir>/<sub>/<file>.tlm; returns the directory.
  std::string SaveGates(std::string const &sub, unsigned version, char const *file = "gates") {
    std::string dir = m_Dir + "/" + sub;
    fs::create_directories(dir);
    Lum_TlmModel model("gates", "gates", "", false);
    BuildGates(model, version)->Save((dir + "/" + file + ".tlm").c_str());
    return dir;
  }
  static std::string LoadedVersion(PM_PIC const &pic) {
    Lum_TlmLibrary const *library = Lum_TlmLibrary::LoadLibrary("gates", pic);
    std::string version = Version(library);
    Lum_TlmLibrary::ReleaseLibrary(library);
    return version;
  }

  std::string m_Dir;
  PM_PIC m_Pic{"P1", "part", nullptr};
};

// A built library answers lookups, type IDs and registrations, and refuses names it cannot store.
TEST_F(TlmTest, BuiltLibraryAndTypeIdentifiers) {
  Lum_TlmModel model("m", "m", "", false);
  Lum_TlmLibrary *library = BuildGates(model);
  Lum_TlmBlock *and2 = library->GetTypeBlock("AND2");
  Lum_TlmBlock const *mux = library->GetTypeBlock("MUX");
  EXPECT_EQ(and2->GetUniqueTag().str(), "gates:AND2");
  EXPECT_FALSE(mux->HasHier("type")) << "the type view is not a hierarchy";
  Orb_Block *hier = mux->GetHier("schematic");
  ASSERT_NE(hier, nullptr);
  EXPECT_EQ(static_cast<Lum_TlmBlock *>(model.Specialize(hier->GetBlocks()[0]))->GetLibrary(),
            library);

  std::size_t const before = ObjectCount(*model.GetOrbModel());
  for (char const *name : {"", "a b", "a:b"})
    EXPECT_THROW(model.CreateLibrary(name, 1, 0), Lum_ExceptionInvalidLibrary) << name;
  for (char const *name : {"", "x:y"})
    EXPECT_THROW(library->CreateTypeBlock(name), Lum_ExceptionInvalidTypeBlock) << name;
  EXPECT_THROW(library->CreateTypeBlock("AND2"), Orb_Exception);
  EXPECT_EQ(ObjectCount(*model.GetOrbModel()), before);

  // A type view whose top block is misnamed (a damaged file) holds no type block.
  library->CreateDesign("LOC")->CreateView("type")->CreateTopBlock("LNC");
  EXPECT_EQ(library->GetTypeBlock("LOC"), nullptr);
  EXPECT_EQ(library->GetTypeBlock("LNC"), nullptr);
  EXPECT_EQ(library->GetTypeBlocks().size(), 2u) << "AND2 and MUX only";

  // Type IDs represent exactly their block or pin (default: null); the registry counts by name.
  Lum_TlmPin const *a = and2->GetPinByName("A");
  std::pair<Lum_TlmBlockTypeID, bool> const blockIds[] = {{{}, false},
                                                          {{"gates", "AND2"}, true},
                                                          {{"other", "AND2"}, false},
                                                          {{"gates", "AND"}, false},
                                                          {{"gates", "AND22"}, false},
                                                          {{"gatesx", "AND2"}, false}};
  for (std::size_t i = 0; i < std::size(blockIds); ++i) {
    EXPECT_EQ(blockIds[i].first.RepresentsTypeBlock(and2), blockIds[i].second) << i;
    EXPECT_EQ(blockIds[i].first.RepresentsTypeBlock(nullptr), i == 0) << i;
  }
  std::pair<Lum_TlmPinTypeID, bool> const pinIds[] = {{{}, false},
                                                      {{"gates", "AND2", "A"}, true},
                                                      {{"gates", "AND2", "B"}, false},
                                                      {{"gates", "MUX", "A"}, false}};
  for (std::size_t i = 0; i < std::size(pinIds); ++i) {
    EXPECT_EQ(pinIds[i].first.RepresentsTypePin(a), pinIds[i].second) << i;
    EXPECT_EQ(pinIds[i].first.RepresentsTypePin(nullptr), i == 0) << i;
  }

  Lum_Tlm::TypeIDRegistry *registry = Lum_Tlm::pTypeIDRegistry;
  ASSERT_NE(registry, nullptr) << "the platform's own counter creates it";
  unsigned const registered = registry->GetRegistrationCount("gates");
  {
    Lum_Tlm::TypeIDRegistryInitCounter counter;
    registry->RegisterTypeLibrary(library);
    registry->RegisterTypeLibrary(library);
  }
  EXPECT_EQ(Lum_Tlm::pTypeIDRegistry, registry);
  EXPECT_EQ(registry->GetRegistrationCount("gates"), registered + 2);
}

// A name loads per personality, counted apart; the last release unloads, the next load rereads.
TEST_F(TlmTest, LoadsPerPersonalityAndUnloadsAtLastRelease) {
  SaveGates("P1", 1);
  SaveGates("P2", 2);
  SaveGates("", 5);
  Lum_TlmCatalog::AddSearchDirectory(m_Dir.c_str());
  PM_PIC const p2("P2", "part", nullptr), p3("P3", "part", nullptr);
  Lum_TlmLibrary const *first = Lum_TlmLibrary::LoadLibrary("gates", m_Pic);
  Lum_TlmLibrary const *second = Lum_TlmLibrary::LoadLibrary("gates", p2);
  Lum_TlmLibrary const *plain = Lum_TlmLibrary::LoadLibrary("gates", p3);
  EXPECT_EQ(Version(first) + " " + Version(second) + " " + Version(plain), "1.3 2.3 5.3");
  EXPECT_EQ(Dump(plain->GetTypeBlock("AND2")->GetOrbBlock()),
            "block AND2\n pin A input\n pin B input\n pin Y output\n");
  EXPECT_TRUE(plain->GetTypeBlock("MUX")->HasHier("schematic"));
  EXPECT_EQ(Lum_TlmLibrary::LoadLibrary("gates", m_Pic), first);
  EXPECT_EQ(Lum_TlmCatalog::GetReferenceCount("gates", m_Pic), 2u);
  EXPECT_EQ(Lum_TlmCatalog::GetReferenceCount("gates"), 4u);

  Lum_TlmLibrary::ReleaseLibrary(second);
  EXPECT_FALSE(Lum_TlmCatalog::IsLoaded("gates", p2));
  EXPECT_EQ(Version(first), "1.3") << "the other personality's library stays";
  for (Lum_TlmLibrary const *library : {first, first, plain})
    Lum_TlmLibrary::ReleaseLibrary(library);
  EXPECT_FALSE(Lum_TlmCatalog::IsLoaded("gates"));
  Lum_TlmLibrary::ReleaseLibrary(plain); // no reference left: ignored
  SaveGates("", 7);
  EXPECT_EQ(LoadedVersion(PM_PIC("P3", "part", nullptr)), "7.3") << "the file is read again";
}

// A library file that cannot be read is an invalid library, named with the file and the fault.
TEST_F(TlmTest, UnreadableLibraryFileIsInvalidLibrary) {
  std::string const path = SaveGates("x", 1) + "/gates.tlm";
  Lum_TlmCatalog::AddSearchDirectory((m_Dir + "/x").c_str());
  std::string const bytes = ReadBytes(path);
  std::ofstream(path, std::ios::binary | std::ios::trunc) << bytes.substr(0, bytes.size() / 2);
  Thrown const e =
      ThrownBy<Lum_ExceptionInvalidLibrary>([&] { Lum_TlmLibrary::LoadLibrary("gates", m_Pic); });
  EXPECT_EQ(e.object, "gates");
  EXPECT_THAT(e.message, HasSubstr(path));
  EXPECT_THAT(e.message, HasSubstr("truncated at byte"));
  EXPECT_FALSE(Lum_TlmCatalog::IsLoaded("gates"));
}

// A type block of another library model means nothing here, though it shares a bridge id.
TEST_F(TlmTest, LookupsNeverCrossModels) {
  Lum_TlmModel first("a", "a", "", false), second("b", "b", "", false);
  Lum_TlmBlock *own = BuildGates(first)->GetTypeBlock("AND2");
  Lum_TlmBlock *foreign = second.CreateLibrary("other", 1, 0)->CreateTypeBlock("AND2");
  Orb_Block *block = foreign->GetOrbBlock();
  ASSERT_EQ(block->GetBridgeId(), own->GetOrbBlock()->GetBridgeId());

  EXPECT_EQ(Orb_BlockDerived::OrbResolve(&first, block), nullptr);
  EXPECT_EQ(Orb_BlockDerived::OrbResolve(&second, block), foreign);
  std::size_t const clients = first.GetClientCount();
  std::string const message = ThrownBy([&] { first.Specialize(block); }).message;
  EXPECT_THAT(message, HasSubstr("<a>"));
  EXPECT_THAT(message, HasSubstr("<b>"));
  EXPECT_THROW(std::make_unique<Lum_TlmBlock>(&first, block), Orb_Exception);
  EXPECT_EQ(first.GetClientCount(), clients);
}

// Added dirs precede LUM_TLM_PATH, personality subdirs their parent; misses say where.
TEST_F(TlmTest, SearchPathOrderAndMissingLibraries) {
  std::string const plain = SaveGates("plain", 1);
  SaveGates("plain/P1", 2);
  SaveGates("plain", 1, "other");
  ::setenv("LUM_TLM_PATH", (":" + plain + "::").c_str(), 1);
  EXPECT_EQ(LoadedVersion(m_Pic), "2.3");
  EXPECT_EQ(LoadedVersion(PM_PIC("P2", "part", nullptr)), "1.3");
  std::string const added = SaveGates("added", 3);
  Lum_TlmCatalog::AddSearchDirectory(added.c_str());
  EXPECT_EQ(LoadedVersion(m_Pic), "3.3");
  std::string const searchPath = added + ":" + plain;
  EXPECT_EQ(Lum_TlmCatalog::GetSearchPath(), searchPath);

  for (auto const &miss : {std::pair<char const *, std::string>{"nosuch", searchPath},
                           {"other", plain + "/other.tlm"}}) {
    char const *name = miss.first;
    Thrown const e =
        ThrownBy<Lum_ExceptionInvalidLibrary>([&] { Lum_TlmLibrary::LoadLibrary(name, m_Pic); });
    EXPECT_EQ(e.object, name);
    EXPECT_THAT(e.message, HasSubstr(miss.second));
    EXPECT_FALSE(Lum_TlmCatalog::IsLoaded(name));
  }
}

// The local library is made once per database, uncounted, and saved and reopened with it.
TEST_F(TlmTest, LocalLibraryTravelsWithTheDatabase) {
  Orb_Model design("d", "d", "", false);
  Lum_TlmLibrary *local = Lum_TlmLibrary::GetLocalLibrary(&design, m_Pic);
  EXPECT_EQ(Lum_TlmLibrary::GetLocalLibrary(&design, m_Pic), local);
  Lum_TlmLibrary::ReleaseLibrary(local);
  EXPECT_FALSE(Lum_TlmCatalog::IsLoaded(Lum_TlmLibrary::LOCAL_LIBRARY_NAME));
  local->CreateTypeBlock("CELL")->CreatePin("Q", Orb_Pin::PIN_BIDIRECTIONAL);
  std::unique_ptr<Orb_Model> reopened = Reopened(design);
  Lum_TlmLibrary *again = Lum_TlmLibrary::GetLocalLibrary(reopened.get(), m_Pic);
  EXPECT_EQ(Dump(again->GetTypeBlock("CELL")->GetOrbBlock()), "block CELL\n pin Q bidirectional\n");
  EXPECT_EQ(Lum_TlmLibrary::GetLocalLibrary(reopened.get(), m_Pic), again);
}

// A huge name is cut in what() and the message, not in GetObjectName; cuts keep UTF-8 whole.
TEST_F(TlmTest, MessagesCutLongNames) {
  std::string const name(std::size_t(1) << 20, 'n');
  Thrown const thrown = ThrownBy<Lum_ExceptionInvalidLibrary>(
      [&] { Lum_TlmLibrary::LoadLibrary(name.c_str(), m_Pic); });
  EXPECT_EQ(thrown.object, name);
  EXPECT_LT(thrown.message.size(), 512u);
  std::string const accented = std::string(255, 'a') + "\xc3\xa9" + std::string(10, 'b');
  Port::Exception const e("Lum", "f", "", 1, accented.c_str(), "m", false);
  EXPECT_EQ(std::string(e.what()),
            "Lum error at f:1: <" + std::string(255, 'a') + "... (267 bytes)> m");
  EXPECT_EQ(Port::Exception::ShownName(std::string(256, 'x')), std::string(256, 'x'));
}

// Takes the design database's local library when a design loads, as block loading does.
class TakingModel : public RecModel {
public:
  TakingModel(EventLog *eventLog, Orb_Model *model) : RecModel(eventLog, model) {}
  void SyncEventSpecializeDesignOnLoad(Orb_Design *o) override {
    Lum_TlmLibrary::GetLocalLibrary(GetOrbModel(), PM_PIC("P1", "part", nullptr));
    RecModel::SyncEventSpecializeDesignOnLoad(o);
  }
};

// A refused open leaves companions as they were; a second local library is refused.
TEST_F(TlmTest, RefusedOpenLeavesLocalLibraryAsBefore) {
  std::string const withLocal = m_Dir + "/with_local.odb";
  std::string const plain = m_Dir + "/plain.odb";
  {
    Orb_Model source("d", "d", "", false);
    source.CreateDesignMgr("loaded")->CreateDesign("refused");
    source.Save(plain.c_str());
    Lum_TlmLibrary::GetLocalLibrary(&source, m_Pic)->CreateTypeBlock("CELL");
    source.Save(withLocal.c_str());
  }
  EventLog log;
  for (std::string const &file : {withLocal, plain}) {
    SCOPED_TRACE(file);
    Orb_Model target("t", "t", "", false);
    target.CreateDesignMgr("mine");
    TakingModel client(&log, &target);
    client.refuse = "refused";
    std::string const before = SavedBytes(target);
    EXPECT_THROW(target.Open(file.c_str()), std::runtime_error);
    EXPECT_EQ(target.GetCompanion(Lum_TlmNames::kLocalLibraryCompanion), nullptr);
    EXPECT_EQ(SavedBytes(target), before);
  }

  // A waiting local library waits again.
  Orb_Model target("t", "t", "", false);
  target.Open(withLocal.c_str());
  target.DeleteDesignMgr(target.GetDesignMgrByName("loaded"));
  std::string const before = SavedBytes(target);
  {
    TakingModel client(&log, &target);
    client.refuse = "refused";
    EXPECT_THROW(target.Open(plain.c_str()), std::runtime_error);
  }
  EXPECT_EQ(SavedBytes(target), before);
  EXPECT_NE(Lum_TlmLibrary::GetLocalLibrary(&target, m_Pic)->GetTypeBlock("CELL"), nullptr);

  EXPECT_THAT(ThrownBy([&] { target.Open(withLocal.c_str()); }).message, HasSubstr(withLocal));
  EXPECT_TRUE(target.GetDesignMgrs().empty());
}

} // namespace

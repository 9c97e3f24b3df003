// Type libraries: building, the catalog and search path, the local library
// and the type identifiers.

#include "Lum_Tlm.h"
#include "Lum_Exception.h"
#include "Lum_TlmTypeID.h"
#include "Orb_Exception.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <memory>
#include <string>

namespace {

namespace fs = std::filesystem;

struct TempDir {
  TempDir() {
    std::string pattern = (fs::temp_directory_path() / "lum_tlm_XXXXXX").string();
    m_Path = ::mkdtemp(pattern.data());
  }
  ~TempDir() { fs::remove_all(m_Path); }
  // Creates the subdirectory and returns its path.
  std::string Sub(std::string const &name) const {
    fs::create_directories(m_Path + "/" + name);
    return m_Path + "/" + name;
  }
  std::string m_Path;
};

// "name:direction" of each pin in host order.
std::string Pins(Lum_TlmBlock const *block) {
  std::string text;
  for (std::size_t i = 0; i < block->GetNumPins(); ++i)
    text += std::string(text.empty() ? "" : " ") + block->GetPin(i)->GetName() + ":" +
            Orb_PinDirectionName(block->GetPin(i)->GetDirection());
  return text;
}

std::string Version(Lum_TlmLibrary const *library) {
  unsigned version = 0, revision = 0;
  library->GetTlmVersion(version, revision);
  return std::to_string(version) + "." + std::to_string(revision);
}

// A library "gates" with AND2 (A, B -> Y) and MUX, whose "schematic"
// hierarchy holds one inner block.
Lum_TlmLibrary *BuildGates(Lum_TlmModel &model, unsigned version = 2) {
  Lum_TlmLibrary *library = model.CreateLibrary("gates", version, 3, "fast", "");
  Lum_TlmBlock *and2 = library->CreateTypeBlock("AND2");
  and2->CreatePin("A", Orb_Pin::PIN_INPUT);
  and2->CreatePin("B", Orb_Pin::PIN_INPUT);
  and2->CreatePin("Y", Orb_Pin::PIN_OUTPUT);
  Lum_TlmBlock *mux = library->CreateTypeBlock("MUX");
  mux->CreatePin("S", Orb_Pin::PIN_INPUT);
  mux->CreateHier("schematic")->CreateBlock("inner", 0);
  return library;
}

void SaveGates(std::string const &path, unsigned version) {
  Lum_TlmModel model("gates", "gates", "", false);
  BuildGates(model, version)->Save(path.c_str());
}

// Each test starts and ends with an empty search path.
class TlmTest : public ::testing::Test {
protected:
  void SetUp() override { TearDown(); }
  void TearDown() override {
    Lum_TlmCatalog::ClearSearchDirectories();
    ::unsetenv("LUM_TLM_PATH");
  }
  TempDir m_Dir;
  PM_PIC m_Pic{"P1", "part", nullptr};
};

// A built library answers its version, qualifiers, type blocks, pins,
// unique tags and hierarchies.
TEST_F(TlmTest, BuiltLibraryIsComplete) {
  Lum_TlmModel model("m", "m", "", false);
  Lum_TlmLibrary *library = BuildGates(model);
  EXPECT_EQ(Version(library), "2.3");
  EXPECT_EQ(library->GetFirstQualifier().str(), "fast");
  EXPECT_TRUE(library->GetSecondQualifier().empty());
  ASSERT_EQ(library->GetTypeBlocks().size(), 2u);
  EXPECT_STREQ(library->GetTypeBlocks()[1]->GetName(), "MUX");

  Lum_TlmBlock *and2 = library->GetTypeBlock("AND2");
  ASSERT_NE(and2, nullptr);
  EXPECT_EQ(and2, library->GetTypeBlocks()[0]);
  EXPECT_EQ(Pins(and2), "A:input B:input Y:output");
  EXPECT_EQ(and2->GetUniqueTag().str(), "gates:AND2");
  EXPECT_EQ(library->GetTypeBlock("and2"), nullptr) << "lookups are case-sensitive";
  EXPECT_EQ(library->GetTypeBlock("XOR"), nullptr);
  EXPECT_TRUE(Lum_TlmDesign::IsTypeBlockDesign(*and2->GetOrbBlock()->GetView()->GetParent()));

  Lum_TlmBlock const *mux = library->GetTypeBlock("MUX");
  EXPECT_TRUE(mux->HasHier("schematic"));
  EXPECT_FALSE(mux->HasHier("type")) << "the type view is not a hierarchy";
  EXPECT_FALSE(and2->HasHier("schematic"));
  Orb_Block *hier = mux->GetHier("schematic");
  ASSERT_NE(hier, nullptr);
  EXPECT_STREQ(hier->GetName(), "MUX");
  EXPECT_EQ(static_cast<Lum_TlmBlock *>(model.Specialize(hier->GetBlocks()[0]))->GetLibrary(),
            library);
}

// Names that a view's library list or a block's stored type could not give
// back are refused, and nothing is created.
TEST_F(TlmTest, RefusesNamesThatCannotBeStored) {
  Lum_TlmModel model("m", "m", "", false);
  for (char const *name : {"", "a b", "a:b"})
    EXPECT_THROW(model.CreateLibrary(name, 1, 0), Lum_ExceptionInvalidLibrary) << name;
  EXPECT_EQ(model.GetOrbModel()->GetObjectCount(Orb_Kind::DesignMgr), 0u);

  Lum_TlmLibrary *library = BuildGates(model);
  for (char const *name : {"", "x:y"})
    EXPECT_THROW(library->CreateTypeBlock(name), Lum_ExceptionInvalidTypeBlock) << name;
  EXPECT_THROW(library->CreateTypeBlock("AND2"), Orb_Exception);
  EXPECT_EQ(library->GetTypeBlocks().size(), 2u);
}

// Only a design marked with a value other than the user mark holds type
// blocks.
TEST_F(TlmTest, TypeBlockDesignMark) {
  Orb_Model host("h", "h", "", false);
  Orb_Design *design = host.CreateDesignMgr("dm")->CreateDesign("d");
  EXPECT_FALSE(Lum_TlmDesign::IsTypeBlockDesign(*design));
  for (auto [mark, expected] : {std::pair{"TDS_DESIGN_TYPE_USER", false},
                                {"TDS_DESIGN_TYPE_LIBRARY", true},
                                {"OTHER", true}}) {
    design->CreatePropertyString("TDS_DESIGN_TYPE", mark);
    EXPECT_EQ(Lum_TlmDesign::IsTypeBlockDesign(*design), expected) << mark;
  }
}

// A saved library loads by name, counted; the last release unloads it and
// the next load reads the file again.
TEST_F(TlmTest, LoadsFromFileAndUnloadsAtLastRelease) {
  SaveGates(m_Dir.m_Path + "/gates.tlm", 2);
  Lum_TlmCatalog::AddSearchDirectory(m_Dir.m_Path.c_str());

  Lum_TlmLibrary const *library = Lum_TlmLibrary::LoadLibrary("gates", m_Pic);
  EXPECT_EQ(Lum_TlmLibrary::LoadLibrary("gates", m_Pic), library);
  EXPECT_EQ(Lum_TlmCatalog::GetReferenceCount("gates"), 2u);
  EXPECT_EQ(Version(library), "2.3");
  EXPECT_EQ(library->GetFirstQualifier().str(), "fast");
  EXPECT_EQ(Pins(library->GetTypeBlock("AND2")), "A:input B:input Y:output");
  EXPECT_TRUE(library->GetTypeBlock("MUX")->HasHier("schematic"));

  Lum_TlmLibrary::ReleaseLibrary(library);
  EXPECT_TRUE(Lum_TlmCatalog::IsLoaded("gates"));
  Lum_TlmLibrary::ReleaseLibrary(library);
  EXPECT_FALSE(Lum_TlmCatalog::IsLoaded("gates"));
  Lum_TlmLibrary::ReleaseLibrary(library); // no reference left: ignored

  SaveGates(m_Dir.m_Path + "/gates.tlm", 7);
  Lum_TlmLibrary const *again = Lum_TlmLibrary::LoadLibrary("gates", m_Pic);
  EXPECT_EQ(Version(again), "7.3") << "the file is read again";
  Lum_TlmLibrary::ReleaseLibrary(again);
}

// Added directories come before LUM_TLM_PATH; within a directory the
// personality's subdirectory comes first.
TEST_F(TlmTest, SearchPathOrder) {
  std::string const plain = m_Dir.Sub("plain"), added = m_Dir.Sub("added");
  SaveGates(plain + "/gates.tlm", 1);
  SaveGates(m_Dir.Sub("plain/P1") + "/gates.tlm", 2);
  SaveGates(added + "/gates.tlm", 3);
  ::setenv("LUM_TLM_PATH", (":" + plain + "::").c_str(), 1);

  auto loadedVersion = [](PM_PIC const &pic) {
    Lum_TlmLibrary const *library = Lum_TlmLibrary::LoadLibrary("gates", pic);
    std::string const version = Version(library);
    Lum_TlmLibrary::ReleaseLibrary(library);
    return version;
  };
  EXPECT_EQ(loadedVersion(m_Pic), "2.3");
  EXPECT_EQ(loadedVersion(PM_PIC("P2", "part", nullptr)), "1.3");
  Lum_TlmCatalog::AddSearchDirectory(added.c_str());
  EXPECT_EQ(loadedVersion(m_Pic), "3.3");
  EXPECT_EQ(Lum_TlmCatalog::GetSearchPath(), added + ":" + plain);
}

// A library that is nowhere, or a file that holds another library, throws
// with the name and the search path.
TEST_F(TlmTest, MissingLibraryThrows) {
  SaveGates(m_Dir.m_Path + "/other.tlm", 1);
  Lum_TlmCatalog::AddSearchDirectory(m_Dir.m_Path.c_str());
  for (char const *name : {"nosuch", "other"}) {
    try {
      Lum_TlmLibrary::LoadLibrary(name, m_Pic);
      ADD_FAILURE() << "no exception for " << name;
    } catch (Lum_ExceptionInvalidLibrary const &e) {
      EXPECT_EQ(e.GetObjectName(), name);
      EXPECT_NE(std::string(e.what()).find(m_Dir.m_Path), std::string::npos) << e.what();
    }
    EXPECT_FALSE(Lum_TlmCatalog::IsLoaded(name));
  }
}

// A registered library is loaded from the catalog, stays at zero
// references, and leaves the catalog when it is destroyed.
TEST_F(TlmTest, RegisteredLibrary) {
  auto model = std::make_unique<Lum_TlmModel>("m", "m", "", false);
  Lum_TlmLibrary *library = BuildGates(*model);
  Lum_TlmCatalog::Register(library);
  EXPECT_THROW(Lum_TlmCatalog::Register(library), Lum_ExceptionInvalidLibrary);

  EXPECT_EQ(Lum_TlmLibrary::LoadLibrary("gates", m_Pic), library);
  Lum_TlmLibrary::ReleaseLibrary(library);
  Lum_TlmLibrary::ReleaseLibrary(library);
  Lum_TlmLibrary::ReleaseLibrary(nullptr);
  EXPECT_EQ(Lum_TlmCatalog::GetReferenceCount("gates"), 0u);
  EXPECT_TRUE(Lum_TlmCatalog::IsLoaded("gates"));

  model.reset();
  EXPECT_FALSE(Lum_TlmCatalog::IsLoaded("gates"));
  EXPECT_THROW(Lum_TlmLibrary::LoadLibrary("gates", m_Pic), Lum_ExceptionInvalidLibrary);
}

// The local library is made once per design database, never counted, and
// its type blocks are saved and reopened with the database.
TEST_F(TlmTest, LocalLibraryTravelsWithTheDatabase) {
  std::string const path = m_Dir.m_Path + "/design.odb";
  {
    Orb_Model design("d", "d", "", false);
    Lum_TlmLibrary *local = Lum_TlmLibrary::GetLocalLibrary(&design, m_Pic);
    ASSERT_NE(local, nullptr);
    EXPECT_STREQ(local->GetLibraryName(), Lum_TlmLibrary::LOCAL_LIBRARY_NAME);
    EXPECT_EQ(Version(local), "1.0");
    EXPECT_EQ(Lum_TlmLibrary::GetLocalLibrary(&design, m_Pic), local);
    Lum_TlmLibrary::ReleaseLibrary(local);
    EXPECT_FALSE(Lum_TlmCatalog::IsLoaded(Lum_TlmLibrary::LOCAL_LIBRARY_NAME));
    local->CreateTypeBlock("CELL")->CreatePin("Q", Orb_Pin::PIN_BIDIRECTIONAL);
    design.Save(path.c_str());
  }
  Orb_Model reopened("d", "d", "", false);
  reopened.Open(path.c_str());
  Lum_TlmLibrary *local = Lum_TlmLibrary::GetLocalLibrary(&reopened, m_Pic);
  ASSERT_NE(local->GetTypeBlock("CELL"), nullptr);
  EXPECT_EQ(Pins(local->GetTypeBlock("CELL")), "Q:bidirectional");
  EXPECT_EQ(Lum_TlmLibrary::GetLocalLibrary(&reopened, m_Pic), local);
}

// A default identifier represents only null; a named one exactly its type
// block or pin. The registry counts registrations by library name and
// survives a counter that is not the last.
TEST_F(TlmTest, TypeIdentifiersAndRegistry) {
  Lum_TlmModel model("m", "m", "", false);
  Lum_TlmLibrary *library = BuildGates(model);
  Lum_TlmBlock const *and2 = library->GetTypeBlock("AND2");
  Lum_TlmBlock const *mux = library->GetTypeBlock("MUX");

  Lum_TlmPin const *a = and2->GetPinByName("A");
  EXPECT_TRUE(Lum_TlmBlockTypeID().RepresentsTypeBlock(nullptr));
  EXPECT_FALSE(Lum_TlmBlockTypeID().RepresentsTypeBlock(and2));
  Lum_TlmBlockTypeID const blockId("gates", "AND2");
  EXPECT_TRUE(blockId.RepresentsTypeBlock(and2));
  EXPECT_FALSE(blockId.RepresentsTypeBlock(mux));
  EXPECT_FALSE(blockId.RepresentsTypeBlock(nullptr));
  EXPECT_FALSE(Lum_TlmBlockTypeID("other", "AND2").RepresentsTypeBlock(and2));

  EXPECT_TRUE(Lum_TlmPinTypeID().RepresentsTypePin(nullptr));
  EXPECT_FALSE(Lum_TlmPinTypeID().RepresentsTypePin(a));
  EXPECT_TRUE(Lum_TlmPinTypeID("gates", "AND2", "A").RepresentsTypePin(a));
  EXPECT_FALSE(Lum_TlmPinTypeID("gates", "AND2", "A").RepresentsTypePin(nullptr));
  EXPECT_FALSE(Lum_TlmPinTypeID("gates", "AND2", "B").RepresentsTypePin(a));
  EXPECT_FALSE(Lum_TlmPinTypeID("gates", "MUX", "A").RepresentsTypePin(a));

  Lum_Tlm::TypeIDRegistry *registry = Lum_Tlm::pTypeIDRegistry;
  ASSERT_NE(registry, nullptr) << "the platform's own counter creates it";
  unsigned const before = registry->GetRegistrationCount("gates");
  {
    Lum_Tlm::TypeIDRegistryInitCounter counter;
    registry->RegisterTypeLibrary(library);
    registry->RegisterTypeLibrary(library);
  }
  EXPECT_EQ(Lum_Tlm::pTypeIDRegistry, registry);
  EXPECT_EQ(registry->GetRegistrationCount("gates"), before + 2);
}

} // namespace

// A type library made from a Liberty file, saved, found through the search
// path and used to type blocks that survive a save and reopen.

#include "Lum_CellLibraryReader.h"

#include "Lum_CellLibraryTestSupport.h"
#include "Lum_TdmTestSupport.h"

#include "Orb_Exception.h"

#include <gtest/gtest.h>

#include <filesystem>

using celltest::LibDir;
using lumtest::TempDir;

namespace {

class Lum_CellLibrarySave : public ::testing::Test {
protected:
  void SetUp() override {
    ::unsetenv("LUM_TLM_PATH");
    Lum_TlmCatalog::ClearSearchDirectories();
  }
  void TearDown() override { Lum_TlmCatalog::ClearSearchDirectories(); }

  TempDir m_Dir;
};

// A typed child made from a Liberty cell is committed, saved and reopened
// bound to the cell and its bus bits, through the catalog and search path.
TEST_F(Lum_CellLibrarySave, TypesBlocksThroughTheSearchPath) {
  Lum_CellLibraryOptions options;
  options.personality = "pm1";
  std::string const saved = Lum_CellLibraryReader::Save(
      *Lum_CellLibraryReader::Read(LibDir() + "tiny_example.lib", options), m_Dir.Path());
  EXPECT_EQ(saved, m_Dir.File("tiny.tlm"));
  Lum_TlmCatalog::AddSearchDirectory(m_Dir.Path().c_str());

  std::string const database = m_Dir.File("chip.odb");
  {
    lumtest::TypedDesign design;
    design.m_pView->CreatePropertyStringList("TDS_VIEW_TYPE_LIBS")->AppendString("tiny");
    Lum_TlmLibrary const *library = design.m_pView->GetLibrary(Port::StringBase<char>("tiny"));
    ASSERT_NE(library, nullptr);
    Lum_TlmBlock const *reg = library->GetTypeBlock(Port::StringBase<char>("REG4"));
    ASSERT_NE(reg, nullptr);
    Lum_TdmBlock *top = design.m_pView->CreateTopBlock("top");
    top->CreateTypedBlock("u1", reg, false, true);
    design.m_pView->CommitAll();
    design.Model().Save(database.c_str());
  }
  ASSERT_FALSE(Lum_TlmCatalog::IsLoaded("tiny")) << "released with the design";

  std::unique_ptr<Lum_TdmModel> reopened = lumtest::OpenModel(database);
  Lum_TdmBlock *u1 = lumtest::FirstView(*reopened)->GetBlock()->GetBlockByName("u1");
  ASSERT_NE(u1, nullptr);
  ASSERT_NE(u1->GetTypeBlock(), nullptr);
  EXPECT_EQ(u1->GetTypeBlock()->GetUniqueTag().str(), "tiny:REG4");
  Lum_TdmPin const *bit = u1->GetPinByName("D[2]");
  ASSERT_NE(bit, nullptr);
  ASSERT_NE(bit->GetTypePin(), nullptr);
  EXPECT_STREQ(bit->GetTypePin()->GetName(), "D[2]");
  EXPECT_EQ(bit->GetDirection(), Orb_Pin::PIN_INPUT);
}

// A library that cannot be written is an error that leaves nothing behind.
TEST_F(Lum_CellLibrarySave, FailedSaveLeavesNothing) {
  auto model = Lum_CellLibraryReader::ReadText("library (lib) { }", "lib.lib", {});
  EXPECT_THROW(Lum_CellLibraryReader::Save(*model, m_Dir.File("missing")), Orb_Exception);
  EXPECT_TRUE(std::filesystem::is_empty(m_Dir.Path()));
}

} // namespace

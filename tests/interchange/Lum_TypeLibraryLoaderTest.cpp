// The libraries a command draws from: .tlm files through the search path,
// cell libraries read and registered for as long as the loader lives, and
// every failure undoing what was registered before it.

#include "Lum_TypeLibraryLoader.h"

#include "Lum_CellLibraryTestSupport.h"
#include "Lum_TdmTestSupport.h"

#include "Lum_Exception.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>
#include <memory>

using celltest::LibDir;
using ::testing::HasSubstr;

namespace {

class Lum_TypeLibraryLoaderTest : public ::testing::Test {
protected:
  void SetUp() override { Lum_TlmCatalog::ClearSearchDirectories(); }
  void TearDown() override { Lum_TlmCatalog::ClearSearchDirectories(); }

  lumtest::TempDir m_Dir;
};

TEST_F(Lum_TypeLibraryLoaderTest, ReadsRegistersSavesAndUnregisters) {
  std::string tlm;
  {
    Lum_TypeLibraryLoader const loader({LibDir() + "tiny_example.lib"}, {});
    EXPECT_EQ(loader.GetNames(), std::vector<std::string>{"tiny"});
    EXPECT_TRUE(loader.HasRead());
    EXPECT_TRUE(Lum_TlmCatalog::IsLoaded("tiny"));
    std::vector<std::string> const saved = loader.Save(m_Dir.Path());
    ASSERT_EQ(saved.size(), 1U);
    tlm = saved.front();
  }
  EXPECT_FALSE(Lum_TlmCatalog::IsLoaded("tiny"));
  // The saved file serves by name, its folder going on the search path.
  Lum_TypeLibraryLoader const again({tlm}, {});
  EXPECT_EQ(again.GetNames(), std::vector<std::string>{"tiny"});
  EXPECT_FALSE(again.HasRead());
  EXPECT_EQ(Lum_TlmCatalog::GetSearchPath(), m_Dir.Path());
}

// A failure after a library was registered leaves nothing registered.
TEST_F(Lum_TypeLibraryLoaderTest, RefusalsNameTheFileAndUndoTheLoad) {
  struct Case {
    std::vector<std::string> files;
    bool refuseLoaded;
    char const *message;
    bool namesTheFile;
  };
  std::string const tiny = LibDir() + "tiny_example.lib";
  for (Case const &bad : std::vector<Case>{
           {{tiny, m_Dir.File("gone.tlm")}, false, "no such type library file", true},
           {{tiny, tiny}, true, "type library 'tiny' is loaded already in this process", true},
           // Without the refusal the catalog itself refuses the second one.
           {{tiny, tiny}, false, "already in the catalog", false},
       }) {
    try {
      Lum_TypeLibraryLoadOptions options;
      options.refuseLoaded = bad.refuseLoaded;
      Lum_TypeLibraryLoader const loader(bad.files, options);
      ADD_FAILURE() << bad.message;
    } catch (Lum_ExceptionInvalidLibrary const &e) {
      EXPECT_THAT(e.GetMessage(), HasSubstr(bad.message));
      if (bad.namesTheFile) {
        EXPECT_EQ(e.GetObjectName(), bad.files.back());
      }
    }
    EXPECT_FALSE(Lum_TlmCatalog::IsLoaded("tiny")) << bad.message;
  }
}

} // namespace

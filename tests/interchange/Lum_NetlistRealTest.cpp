// Every real netlist beside the repository goes in, is saved, reopened and
// goes out again as JSON and as Verilog; Yosys reads the original and both
// outputs, and the three must be the same netlist.

#include "Lum_NetlistTestSupport.h"

#include "Lum_NetlistExporter.h"
#include "Lum_NetlistImporter.h"
#include "Lum_NetlistJsonReader.h"
#include "Lum_NetlistVerilogReader.h"
#include "Lum_NetlistWriter.h"
#include "Lum_TdmModel.h"
#include "Lum_TdmView.h"

#include "../Lum_TdmTestSupport.h"

#include "Orb_Model.h"

#include <gtest/gtest.h>

#include <filesystem>

namespace {

struct RealNetlist {
  char const *design;
  char const *technology;
  char const *variant;
  char const *extension;
};

std::string Name(RealNetlist const &n) {
  return std::string(n.design) + "_" + n.technology + "_" + n.variant + n.extension;
}

class RealNetlists : public ::testing::TestWithParam<RealNetlist> {
public:
  static void SetUpTestSuite() {
    s_Dir = new lumtest::TempDir;
    if (!std::filesystem::exists(nltest::RealDir()))
      return;
    Lum_Netlist const ice40 =
        Lum_NetlistJsonReader::Read(nltest::RealDir() + "/lib/ice40_cells.json");
    s_Ice40 = new nltest::BlackboxLibrary(ice40, "ICE40");
    // The standard cells as Yosys reads them from the Liberty file.
    std::string const cells = s_Dir->File("sg13g2.json");
    std::string const command = "yosys -q -p 'read_liberty -lib " + nltest::RealDir() +
                                "/lib/sg13g2_stdcell_typ_1p20V_25C.filtered.lib; write_json " +
                                cells + "' >/dev/null 2>&1";
    if (nltest::HaveYosys() && std::system(command.c_str()) == 0)
      s_Sg13g2 = new nltest::BlackboxLibrary(Lum_NetlistJsonReader::Read(cells), "SG13G2");
  }
  static void TearDownTestSuite() {
    delete s_Ice40;
    delete s_Sg13g2;
    delete s_Dir;
  }

protected:
  static lumtest::TempDir *s_Dir;
  static nltest::BlackboxLibrary *s_Ice40;
  static nltest::BlackboxLibrary *s_Sg13g2;
};

lumtest::TempDir *RealNetlists::s_Dir = nullptr;
nltest::BlackboxLibrary *RealNetlists::s_Ice40 = nullptr;
nltest::BlackboxLibrary *RealNetlists::s_Sg13g2 = nullptr;

std::vector<std::string> Normalised(std::string const &file, std::string const &out) {
  EXPECT_TRUE(nltest::YosysNormalise(file, out)) << lumtest::FileBytes(out + ".log");
  return nltest::Canonical(Lum_NetlistJsonReader::Read(out));
}

TEST_P(RealNetlists, ImportReopenExportReadsBackTheSameInYosys) {
  RealNetlist const &real = GetParam();
  std::string const path = nltest::RealDir() + "/netlists/" + real.design + "/" + Name(real);
  if (!std::filesystem::exists(path))
    GTEST_SKIP() << path << " is not beside the repository";
#if defined(__SANITIZE_ADDRESS__)
  // Under the sanitizers the large design would take minutes; the default
  // preset runs it, the small one runs here.
  if (std::string(real.design) != "serv")
    GTEST_SKIP() << "only the small design under the sanitizers";
#endif
  if (!s_Sg13g2 || !nltest::HaveYosys())
    GTEST_SKIP() << "yosys is not installed: the round trip needs it as the outside reader";
  bool const json = std::string(real.extension) == ".json";
  Lum_Netlist const netlist =
      json ? Lum_NetlistJsonReader::Read(path) : Lum_NetlistVerilogReader::Read(path);

  std::string const stem = s_Dir->File(Name(real));
  std::string const database = stem + ".odb";
  Lum_NetlistImportOptions options;
  options.libraries = {std::string(real.technology) == "ice40" ? "ICE40" : "SG13G2"};
  {
    Lum_TdmModel model("netlist", "netlist", database.c_str());
    Lum_NetlistImportSummary summary;
    Lum_TdmView *view = Lum_NetlistImporter::Import(model, netlist, options, &summary);
    EXPECT_GT(summary.instancesByLibrary[options.libraries[0]], 400U);
    EXPECT_EQ(summary.untyped, 0U);
    view->CommitAll();
    model.Save(database.c_str());
  }
  // Reopened, every block binds again (what tdm check asks), and goes out.
  Lum_TdmModel model("netlist", "netlist", database.c_str());
  model.Open(database.c_str());
  Orb_View *hostView = model.GetOrbModel()->GetDesignMgrs()[0]->GetDesigns()[0]->GetViews()[0];
  auto *view = static_cast<Lum_TdmView *>(model.Specialize(hostView));
  Lum_Netlist const out = Lum_NetlistExporter::Export(*view);
  Lum_NetlistWriter::Save(out, stem + ".out.json", Lum_NetlistWriter::Format::Json);
  Lum_NetlistWriter::Save(out, stem + ".out.v", Lum_NetlistWriter::Format::Verilog);

  std::vector<std::string> const original = Normalised(path, stem + ".orig.yosys.json");
  ASSERT_FALSE(original.empty());
  for (char const *written : {".out.json", ".out.v"}) {
    std::vector<std::string> const back =
        Normalised(stem + written, stem + written + ".yosys.json");
    EXPECT_TRUE(original == back) << written << " lacks:\n"
                                  << nltest::Difference(original, back) << written << " adds:\n"
                                  << nltest::Difference(back, original);
  }
}

std::vector<RealNetlist> AllRealNetlists() {
  std::vector<RealNetlist> all;
  for (char const *design : {"serv", "picorv32"})
    for (char const *technology : {"sg13g2", "ice40"})
      for (char const *variant : {"flat", "hier"})
        for (char const *extension : {".json", ".v"})
          all.push_back({design, technology, variant, extension});
  return all;
}

INSTANTIATE_TEST_SUITE_P(Netlists, RealNetlists, ::testing::ValuesIn(AllRealNetlists()),
                         [](::testing::TestParamInfo<RealNetlist> const &param) {
                           std::string name = Name(param.param);
                           std::replace(name.begin(), name.end(), '.', '_');
                           return name;
                         });

} // namespace

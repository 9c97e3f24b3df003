// tdm lib import and show, run as a process on the real cell libraries.

#include "../Lum_TdmTestSupport.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <string>
#include <sys/wait.h>
#include <vector>

using lumtest::FileBytes;
using lumtest::TempDir;
using ::testing::HasSubstr;

namespace {

std::string Lib(std::string const &name) {
  char const *dir = std::getenv("LUM_REAL_DIR");
  return std::string(dir && *dir ? dir : LUM_REAL_DIR) + "/lib/" + name;
}

struct Outcome {
  int code = -1;
  std::string out;
  std::string err;
};

class TdmLib : public ::testing::Test {
protected:
  Outcome Tdm(std::vector<std::string> const &args) const {
    std::string command = std::string("'") + TDM_PATH + "'";
    for (std::string const &arg : args)
      command += " '" + arg + "'";
    command += " >'" + m_Dir.File("out.txt") + "' 2>'" + m_Dir.File("err.txt") + "'";
    int const status = std::system(command.c_str());
    Outcome run;
    run.code = WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
    run.out = FileBytes(m_Dir.File("out.txt"));
    run.err = FileBytes(m_Dir.File("err.txt"));
    std::filesystem::remove(m_Dir.File("out.txt"));
    std::filesystem::remove(m_Dir.File("err.txt"));
    return run;
  }

  TempDir m_Dir;
};

// Import writes N.tlm (making the folder it is told to write in) and says
// what it holds; show lists it back, a clock gate without its internal pin.
TEST_F(TdmLib, ImportThenShow) {
  std::string const folder = m_Dir.File("new/libs");
  Outcome const import = Tdm({"lib", "import", Lib("sg13g2_stdcell_typ_1p20V_25C.filtered.lib"),
                              "--name", "SG13", "--personality", "sg13g2", "-o", folder});
  ASSERT_EQ(import.code, 0) << import.err;
  EXPECT_EQ(import.err, "");
  EXPECT_THAT(import.out, HasSubstr("SG13: 78 cells, 249 pins (173 input, 75 output, 1 inout)"));
  EXPECT_THAT(import.out, HasSubstr("left out: 0 supply pins, 2 internal pins"));
  EXPECT_THAT(import.out, HasSubstr("dont_use: 10 cells: sg13g2_antennanp, sg13g2_decap_4,"));
  EXPECT_THAT(import.out, HasSubstr("wrote " + folder + "/SG13.tlm"));

  Outcome const show = Tdm({"lib", "show", folder + "/SG13.tlm", "--cell", "sg13g2_lgcp_1"});
  ASSERT_EQ(show.code, 0) << show.err;
  EXPECT_EQ(show.out, "library SG13 0.1 sg13g2, 78 cells\n"
                      "sg13g2_lgcp_1  LIB_AREA=\"27.216\"  LIB_DONT_USE=\"true\"\n"
                      "  output GCLK\n"
                      "  input CLK  LIB_CLOCK=\"true\"\n"
                      "  input GATE\n");
}

// Failures are one line with the file and place, the documented exit
// code, and no file written.
TEST_F(TdmLib, FailuresWriteNothing) {
  std::string const bad = m_Dir.File("bad.lib");
  { std::ofstream(bad) << "library (bad) {\n  cell (C) { pin (A) { } }\n}\n"; }
  struct Case {
    std::vector<std::string> args;
    int code;
    std::string err;
  };
  Case const cases[] = {
      {{"lib", "import", bad, "-o", m_Dir.Path()},
       3,
       "tdm lib import: error: " + bad +
           ": line 2, column 14: cell \"C\": pin \"A\" has no direction; nothing was written\n"},
      {{"lib", "import", Lib("tiny_example.lib"), "--name", "has space", "-o", m_Dir.Path()},
       3,
       "tdm lib import: error: " + Lib("tiny_example.lib") +
           ": the type library name \"has space\" must not be empty nor hold a space or ':'; "
           "give another name; nothing was written\n"},
      {{"lib", "show", bad}, 3, "tdm lib show: error: " + bad + ": "},
      {{"lib", "show", bad, "--bogus"}, 2, "(see tdm lib show --help)\n"},
  };
  for (Case const &c : cases) {
    Outcome const run = Tdm(c.args);
    EXPECT_EQ(run.code, c.code) << c.args[1] << " " << c.args[2];
    EXPECT_THAT(run.err, HasSubstr(c.err));
    EXPECT_EQ(std::count(run.err.begin(), run.err.end(), '\n'), 1) << run.err;
  }
  std::vector<std::string> files;
  for (auto const &entry : std::filesystem::directory_iterator(m_Dir.Path()))
    files.push_back(entry.path().filename().string());
  EXPECT_EQ(files, std::vector<std::string>{"bad.lib"});
}

} // namespace

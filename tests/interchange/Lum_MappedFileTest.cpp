// The netlist readers take their files mapped: files that end at a page
// boundary, without a newline or with nothing in them read as their text
// does, and a file that cannot be mapped is named in the error.

#include "Lum_ExceptionInvalidFormat.h"
#include "Lum_NetlistJsonReader.h"
#include "Lum_NetlistVerilogReader.h"

#include "../Lum_TdmTestSupport.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <fstream>
#include <unistd.h>

using ::testing::HasSubstr;

namespace {

Lum_Netlist Read(std::string const &path, bool json) {
  return json ? Lum_NetlistJsonReader::Read(path) : Lum_NetlistVerilogReader::Read(path);
}

std::string Write(lumtest::TempDir const &dir, char const *name, std::string const &text) {
  std::string const path = dir.File(name);
  std::ofstream(path, std::ios::binary) << text;
  return path;
}

// `text` with blanks inserted before its last `tail` bytes to make it `size`
// bytes long.
std::string Sized(std::string text, std::size_t tail, std::size_t size) {
  text.insert(text.size() - tail, size - text.size(), ' ');
  return text;
}

TEST(MappedNetlistFile, ReadsToTheLastByteAndNoFurther) {
  lumtest::TempDir dir;
  auto const page = static_cast<std::size_t>(::sysconf(_SC_PAGESIZE));
  std::string const verilog = "module m(input a);\nendmodule";
  std::string const json = R"({"modules": {"m": {}}})";
  struct Case {
    char const *name;
    std::string text;
    bool json;
  };
  for (Case const &c : std::vector<Case>{
           {"no_newline.v", verilog, false},
           {"page.v", Sized(verilog, 9, page), false},
           {"two_pages.v", Sized(verilog, 9, 2 * page), false},
           {"no_newline.json", json, true},
           {"page.json", Sized(json, 2, page), true},
       }) {
    Lum_Netlist const netlist = Read(Write(dir, c.name, c.text), c.json);
    ASSERT_EQ(netlist.modules.size(), 1U) << c.name;
    EXPECT_EQ(netlist.Text(netlist.modules[0].name), "m") << c.name;
  }
  // The last byte counts: a file cut one short of its end is refused.
  std::string const cut = Sized(verilog, 9, page);
  EXPECT_THROW(Read(Write(dir, "cut.v", cut.substr(0, page - 1)), false),
               Lum_ExceptionInvalidFormat);
  EXPECT_EQ(Read(Write(dir, "empty.v", ""), false).modules.size(), 0U);
  // A string that ends in an escaped backslash ends there: the megabytes
  // of blanks after it are no string.
  Lum_Netlist const escaped = Read(
      Write(dir, "escaped.json", R"({"modules": {"m\\": {}})" + std::string(2 << 20, ' ') + "}"),
      true);
  EXPECT_EQ(escaped.Text(escaped.modules[0].name), "m\\");
}

TEST(MappedNetlistFile, RefusalsNameTheFileAndThePosition) {
  lumtest::TempDir dir;
  struct Case {
    std::string path;
    bool json;
    char const *what;
  };
  // A token of megabytes is refused where it begins, without reading on.
  std::string const huge = "module " + std::string(std::size_t(4) << 20, 'n') + ";\nendmodule\n";
  for (Case const &c : std::vector<Case>{
           {dir.File("missing.v"), false, "file: cannot be read: No such file or directory"},
           {dir.File("missing.json"), true, "file: cannot be read: No such file or directory"},
           {dir.Path(), false, "file: cannot be read: not a regular file"},
           {Write(dir, "empty.json", ""), true, "document: not valid JSON"},
           {Write(dir, "huge.v", huge), false,
            "line 1, column 8: a token longer than 65536 bytes (4194304)"},
           {Write(dir, "huge.json",
                  "{\"modules\": {\"" + std::string(std::size_t(4) << 20, 'n') + "\": {}}}"),
            true, "line 1, column 14: a string longer than 1048576 bytes"},
           {Write(dir, "escaped.json",
                  "{\"modules\": {\"\\\"" + std::string(std::size_t(2) << 20, 'n') + "\": {}}}"),
            true, "line 1, column 14: a string longer than 1048576 bytes"},
       }) {
    try {
      Read(c.path, c.json);
      ADD_FAILURE() << c.path;
    } catch (Lum_ExceptionInvalidFormat const &e) {
      EXPECT_EQ(e.GetInputPath(), c.path);
      EXPECT_THAT(e.GetMessage(), HasSubstr(c.what));
    }
  }
}

} // namespace

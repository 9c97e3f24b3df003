#include "Lum_CellLibraryReader.h"

#include "Lum_CellLibraryTestSupport.h"
#include "Lum_ExceptionInvalidFormat.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>

using celltest::Cell;
using celltest::Cells;
using celltest::LibDir;
using ::testing::HasSubstr;

namespace {

std::unique_ptr<Lum_TlmModel> ReadLiberty(std::string const &body,
                                          Lum_CellLibrarySummary *summary = nullptr) {
  return Lum_CellLibraryReader::ReadText("library (t) {\n" + body + "\n}\n", "t.lib", {}, summary);
}

struct Construct {
  char const *what;
  char const *body; // inside `library (t) { ... }`
  char const *cells;
};

class LibertyConstruct : public ::testing::TestWithParam<Construct> {};

// Each construct real files use gives exactly these cells, pins, directions
// and properties.
TEST_P(LibertyConstruct, GivesTheCells) {
  Construct const &c = GetParam();
  EXPECT_EQ(Cells(*ReadLiberty(c.body)), c.cells) << c.what;
}

INSTANTIATE_TEST_SUITE_P(
    Table, LibertyConstruct,
    ::testing::Values(
        Construct{"quoted and bare values, missing ';', unquoted expressions",
                  "cell (C) {\n pin (A) { direction : \"input\" }\n"
                  " pin (Y) { direction : output\n  function : !(A&B) + C' }\n}",
                  "C(A in, Y out f=!(A&B) + C')\n"},
        Construct{"one group for several pins",
                  "cell (C) { pin (A, B) { direction : input ; clock : true ; } }",
                  "C(A in clock=true, B in clock=true)\n"},
        Construct{"internal and supply pins are not logic pins",
                  "cell (C) { pg_pin (VDD) { pg_type : primary_power ; } pg_pin (VSS) { }\n"
                  " pin (int) { direction : internal ; } pin (Y) { direction : output ; } }",
                  "C[supply=VDD:primary_power VSS](Y out)\n"},
        Construct{
            "pins of test_cell, ff, latch and statetable are not the cell's",
            "cell (C) { ff (IQ, IQN) { next_state : \"D\" ; } latch (L, LN) { data_in : D ; }\n"
            " statetable (\"D\", \"IQ\") { table : \"H : - : H\" ; }\n"
            " test_cell () { pin (D) { direction : input ; } pin (Q) { direction : output ; } }\n"
            " pin (D) { direction : input ; } }",
            "C(D in)\n"},
        Construct{"comments and strings hide braces; other groups are skipped whole",
                  "/* } */ cell (C) { // }\n"
                  " pin (A) { direction : input ; timing () { related_pin : \"}\" ;\n"
                  "  cell_rise (t) { index_1 (\"1, 2\") ; values (\"{\", \"}}\") ; } } }\n"
                  " operating_conditions (x) { process : 1 ; }\n}",
                  "C(A in)\n"},
        Construct{"backslash-newline continues a line outside and inside strings",
                  "cell (C) { pin\\\n(A) { direction \\\n : input ; function : \"A\\\n&B\" ; } }",
                  "C(A in f=A&B)\n"},
        Construct{"quoted group arguments",
                  "cell (\"C 1\") { pin (\"A\") { direction : input ; } }", "C 1(A in)\n"},
        Construct{"descending library bus type, per-bit and range members, direction on the bus",
                  "type (b4) { base_type : array ; bit_width : 4 ; bit_from : 3 ; bit_to : 0 ;"
                  " downto : true ; }\n"
                  "cell (C) { bus (D) { bus_type : b4 ; direction : input ;\n"
                  " pin (D[0]) { clock : true ; } pin (D[3:2]) { function : \"x\" ; } } }",
                  "C(D[3] in f=x, D[2] in f=x, D[1] in, D[0] in clock=true)\n"},
        Construct{
            "ascending cell-level type, direction only on member pins",
            "cell (C) { type (u3) { bit_width : 3 ; bit_from : 0 ; bit_to : 2 ; downto : false"
            " ; }\n bus (Q) { bus_type : \"u3\" ; pin (Q[0:1]) { direction : output ; }\n"
            " pin (Q[2]) { direction : inout ; } } }",
            "C(Q[0] out, Q[1] out, Q[2] inout)\n"},
        Construct{"member groups named like the bus, a type with bit_width alone",
                  "type (b2) { bit_width : 2 ; downto : true ; }\n"
                  "cell (C) { bus (A) { bus_type : b2 ; pin (A) { direction : input ; }\n"
                  " pin (A) { direction : input ; } } }",
                  "C(A[1] in, A[0] in)\n"},
        Construct{"bundle members are pins, in the members' order",
                  "cell (C) { bundle (B) { members (EN, CLR) ; direction : input ;\n"
                  " pin (CLR) { direction : output ; } } }",
                  "C(EN in, CLR out)\n"},
        Construct{"cell properties, cells without pins, pins in file order",
                  "cell (C) { area : 2.5 ; dont_use : true ; }\n"
                  "cell (D) { pin (Z) { direction : output ; } pin (A) { direction : input ; } }",
                  "C[area=2.5 dont_use=true]()\nD(Z out, A in)\n"}));

// The hand-made file that uses every construct gives the documented cells.
TEST(Lum_CellLibraryReader, HandMadeFile) {
  Lum_CellLibrarySummary summary;
  auto model = Lum_CellLibraryReader::Read(LibDir() + "tiny_example.lib", {}, &summary);
  EXPECT_EQ(Cells(*model),
            "NAND2[area=1.5](A in, B in, Y out f=!(A&B))\n"
            "DFFR(D in, CK in clock=true, RN in, Q out f=IQ, QN out f=IQN)\n"
            "REG4[supply=VDD:primary_power VSS:primary_ground](CK in clock=true, D[3] in, D[2] "
            "in, D[1] in, D[0] in, Q[3] out f=IQ, Q[2] out f=IQ, Q[1] out f=IQ, Q[0] out f=IQ, "
            "EN in, CLR in)\n");
  EXPECT_EQ(summary.name, "tiny");
  EXPECT_EQ(summary.cells, 3U);
  EXPECT_EQ(summary.inputs, 12U);
  EXPECT_EQ(summary.outputs, 7U);
  EXPECT_EQ(summary.buses, 2U);
  EXPECT_EQ(summary.supplyPins, 2U);
  unsigned version = 0;
  unsigned revision = 0;
  model->GetLibrary()->GetTlmVersion(version, revision);
  EXPECT_EQ(version * 100 + revision, 100U) << "no revision: 1.0";
}

// The open-PDK library: 78 cells, checked against the file for a flip-flop
// with reset, a clock gate whose internal pin is left out, a scan flip-flop
// whose test_cell repeats its pins, a fill cell and the one inout pin.
TEST(Lum_CellLibraryReader, RealStandardCells) {
  Lum_CellLibrarySummary summary;
  Lum_CellLibraryOptions options;
  options.personality = "sg13g2";
  options.part = "typ";
  auto model = Lum_CellLibraryReader::Read(LibDir() + "sg13g2_stdcell_typ_1p20V_25C.filtered.lib",
                                           options, &summary);
  Lum_TlmLibrary *library = model->GetLibrary();
  EXPECT_STREQ(library->GetLibraryName(), "sg13g2_stdcell_typ_1p20V_25C");
  EXPECT_EQ(summary.cells, 78U);
  EXPECT_EQ(library->GetTypeBlocks().size(), 78U);
  EXPECT_EQ(summary.internalPins, 2U);
  EXPECT_EQ(summary.inouts, 1U);
  unsigned version = 0;
  unsigned revision = 0;
  library->GetTlmVersion(version, revision);
  EXPECT_EQ(version * 100 + revision, 1U) << "$Revision: 0.1.0 $";
  EXPECT_EQ(library->GetFirstQualifier().str(), "sg13g2");
  EXPECT_EQ(library->GetSecondQualifier().str(), "typ");
  std::pair<char const *, char const *> const spots[] = {
      {"sg13g2_dfrbp_1", "sg13g2_dfrbp_1[area=47.1744](Q out f=IQ, Q_N out f=IQN, CLK in "
                         "clock=true, D in, RESET_B in)"},
      {"sg13g2_lgcp_1", "sg13g2_lgcp_1[area=27.216 dont_use=true](GCLK out, CLK in clock=true, "
                        "GATE in)"},
      {"sg13g2_sdfbbp_1", "sg13g2_sdfbbp_1[area=63.504](Q out f=IQ, Q_N out f=IQN, CLK in "
                          "clock=true, D in, RESET_B in, SCD in, SCE in, SET_B in)"},
      {"sg13g2_fill_1", "sg13g2_fill_1[area=1.8144 dont_use=true]()"},
      {"sg13g2_sighold", "sg13g2_sighold[area=9.072 dont_use=true](SH inout)"},
      {"sg13g2_a21o_1", "sg13g2_a21o_1[area=12.7008](X out f=((A1*A2)+B1), A1 in, A2 in, B1 in)"},
  };
  for (auto const &[name, expected] : spots) {
    Lum_TlmBlock const *block = library->GetTypeBlock(Port::StringBase<char>(name));
    ASSERT_NE(block, nullptr) << name;
    EXPECT_EQ(Cell(block), expected);
  }
}

// The FPGA cell models in JSON: 50 blackbox cells, buses bit by bit from
// the left index.
TEST(Lum_CellLibraryReader, CellModelsFromJson) {
  Lum_CellLibrarySummary summary;
  Lum_CellLibraryOptions options;
  options.name = "ICE40";
  auto model = Lum_CellLibraryReader::Read(LibDir() + "ice40_cells.json", options, &summary);
  Lum_TlmLibrary *library = model->GetLibrary();
  EXPECT_STREQ(library->GetLibraryName(), "ICE40");
  EXPECT_EQ(summary.cells, 50U);
  EXPECT_EQ(Cell(library->GetTypeBlock(Port::StringBase<char>("SB_LUT4"))),
            "SB_LUT4(O out, I0 in, I1 in, I2 in, I3 in)");
  Lum_TlmBlock const *ram = library->GetTypeBlock(Port::StringBase<char>("SB_RAM40_4K"));
  ASSERT_NE(ram, nullptr);
  EXPECT_EQ(ram->GetPins().size(), 16U * 3 + 11 * 2 + 6);
  EXPECT_STREQ(ram->GetPin(0)->GetName(), "RDATA[15]");
  EXPECT_STREQ(ram->GetPin(15)->GetName(), "RDATA[0]");
  EXPECT_EQ(ram->GetPinByName("WADDR[10]")->GetDirection(), Orb_Pin::PIN_INPUT);
}

// JSON ports: offsets and ascending declarations name their bits; modules
// with a body are designs, not cells; the file name is the default name.
TEST(Lum_CellLibraryReader, JsonPortShapes) {
  char const text[] = R"({"modules": {
    "top": {"attributes": {}, "ports": {"x": {"direction": "input", "bits": [2]}}},
    "CELL": {"attributes": {"blackbox": 1}, "ports": {
      "A": {"direction": "input", "bits": [2, 3], "offset": 4},
      "B": {"direction": "output", "bits": [4, 5], "upto": 1},
      "C": {"direction": "inout", "bits": ["0"], "offset": 7}}}}})";
  auto model = Lum_CellLibraryReader::ReadText(text, "dir/models.v.json", {});
  EXPECT_STREQ(model->GetLibrary()->GetLibraryName(), "models.v");
  EXPECT_EQ(Cells(*model), "CELL(A[5] in, A[4] in, B[0] out, B[1] out, C[7] inout)\n");
}

struct Bad {
  char const *what;
  std::string text;
  std::size_t line;
  std::size_t column;
  char const *message;
};

class InvalidFile : public ::testing::TestWithParam<Bad> {};

// Each fault is one exception naming the file, line and column and what
// is wrong.
TEST_P(InvalidFile, IsRefusedWithItsPlace) {
  Bad const &bad = GetParam();
  try {
    Lum_CellLibraryReader::ReadText(bad.text, "bad.lib", {});
    ADD_FAILURE() << bad.what << ": no failure";
  } catch (Lum_ExceptionInvalidFormat const &e) {
    EXPECT_EQ(e.GetInputPath(), "bad.lib") << bad.what;
    EXPECT_EQ(e.GetInputLine(), bad.line) << bad.what << ": " << e.GetMessage();
    EXPECT_EQ(e.GetInputColumn(), bad.column) << bad.what << ": " << e.GetMessage();
    EXPECT_THAT(e.GetMessage(), HasSubstr(bad.message)) << bad.what;
  }
}

std::string Nested(int depth) {
  std::string text = "library (t) { cell (C) {";
  for (int i = 0; i < depth; ++i)
    text += " g () {";
  return text;
}

INSTANTIATE_TEST_SUITE_P(
    Ambiguous, InvalidFile,
    ::testing::Values(
        Bad{"two cells of one name", "library (t) {\n cell (C) { }\n cell (C) { }\n}", 3, 2,
            "cell \"C\" is defined twice (first at line 2, column 2)"},
        Bad{"two pins of one name",
            "library (t) {\ncell (C) {\n pin (A) { direction : input ; }\n pin (B, A) { "
            "direction : output ; }\n}\n}",
            4, 2, "cell \"C\": pin \"A\" is declared twice (first at line 3, column 2)"},
        Bad{"a bus and a pin of one name",
            "library (t) { type (b) { bit_from : 0 ; bit_to : 0 ; }\ncell (C) {\n"
            " pin (A[0]) { direction : input ; }\n bus (A) { bus_type : b ; direction : input ; "
            "} } }",
            4, 2, "pin \"A[0]\" is declared twice"},
        Bad{"a bus whose width disagrees with its type",
            "library (t) {\ntype (w) { bit_width : 9 ; bit_from : 0 ; bit_to : 10 ; }\n"
            "cell (C) {\n  bus (D) { bus_type : w ; direction : input ; } } }",
            4, 3,
            "cell \"C\", bus \"D\": its type \"w\" (line 2, column 1) has bit_width 9, but "
            "bit_from 0 and bit_to 10 make 11 bits"},
        Bad{"a pin without a direction", "library (t) {\ncell (C) {\n  pin (A) { }\n} }", 3, 3,
            "cell \"C\": pin \"A\" has no direction"},
        Bad{"a bus bit without a direction",
            "library (t) { type (b) { bit_width : 2 ; bit_from : 1 ; bit_to : 0 ; }\n"
            "cell (C) { bus (D) { bus_type : b ;\n pin (D[1]) { direction : input ; } } } }",
            2, 12, "cell \"C\": pin \"D[0]\" has no direction"},
        Bad{"a bus without bus_type",
            "library (t) { cell (C) { bus (D) { direction : input ; } } }", 1, 26,
            "bus \"D\": no bus_type"},
        Bad{"a member pin of another bus",
            "library (t) { type (b) { bit_width : 1 ; }\ncell (C) { bus (D) { bus_type : b ;\n"
            "  pin (E[0]) { direction : input ; } } } }",
            3, 3, "member pin \"E[0]\" is not a bit of it"},
        Bad{"a bundle pin that is not a member",
            "library (t) { cell (C) { bundle (B) { members (X) ; pin (Y) { direction : input ; "
            "} } } }",
            1, 53, "pin \"Y\" is not one of its members"},
        Bad{"a cell name a type block cannot take", "library (t) {\n  cell (\"a:b\") { } }", 2, 3,
            "cell \"a:b\": a type block name must not be empty nor hold ':'"},
        Bad{"an unknown direction",
            "library (t) { cell (C) { pin (A) { direction : sideways ; } } }", 1, 48,
            "expected a direction (input, output, inout or internal), found \"sideways\""}));

INSTANTIATE_TEST_SUITE_P(
    Syntax, InvalidFile,
    ::testing::Values(
        Bad{"an empty file", " \n", 2, 1, "found an empty file"},
        Bad{"not a library", "cell (C) { }", 1, 1, "expected 'library (name) {'"},
        Bad{"an unterminated string", "library (t) {\n cell (C) { area : \"1.5 ; }\n}\n", 2, 20,
            "unterminated string"},
        Bad{"an unterminated comment", "library (t) {\n  /* cell (C) { }\n}\n", 2, 3,
            "unterminated comment"},
        Bad{"an unterminated group", "library (t) {\n cell (C) {\n", 3, 1,
            "expected '}' to close the group at line 2, column 2"},
        Bad{"an unterminated skipped group", "library (t) {\n timing () { values (\"1\") ;\n", 2, 2,
            "expected '}' to close this group"},
        Bad{"a NUL byte", std::string("library (t) {\n  area : 1 ;\0 }", 27), 2, 13, "byte 0x00"},
        Bad{"a NUL byte in a skipped group", std::string("library (t) { x () { \0 } }", 26), 1, 22,
            "NUL byte"},
        Bad{"a missing ';' before another value", "library (t) { area : \"1\" 2 }", 1, 26,
            "expected ';'"},
        Bad{"a missing value", "library (t) { cell (C) { area : ; } }", 1, 33,
            "expected a value after 'area :'"},
        Bad{"a missing ':' or '('", "library (t) { cell (C) { area 1 ; } }", 1, 31,
            "expected ':' or '(' after 'area'"},
        Bad{"an unclosed argument list", "library (t) { x (1, 2 { } }", 1, 23,
            "expected ')' to close the '(' at line 1, column 17"},
        Bad{"text after the library", "library (t) { }\ncell (C) { }", 2, 1,
            "expected the end of the file after the library group"},
        Bad{"deep nesting", Nested(300), 1, 1802, "groups nested deeper than 256"},
        Bad{"a huge name", "library (t) { cell (" + std::string(70000, 'x') + ") { } }", 1, 21,
            "a name or value longer than 65536 bytes"}));

INSTANTIATE_TEST_SUITE_P(
    Json, InvalidFile,
    ::testing::Values(
        Bad{"invalid JSON", "{\"modules\": {},\n  \"A\": [1, }", 2, 12, "invalid JSON"},
        Bad{"text after the document", "{\"modules\": {}}\n x", 1, 1, "invalid JSON"},
        Bad{"not a Yosys JSON file", "{\"x\": 1}", 1, 1, "expected a \"modules\" object"},
        Bad{"no blackbox module", "{\"modules\": {\"top\": {\"ports\": {}}}}", 1, 1,
            "no blackbox module"},
        Bad{"a port without a direction",
            "{\"modules\": {\"C\": {\"attributes\": {\"blackbox\": \"1\"},\n"
            " \"ports\": {\"A\": {\"bits\": [2]}}}}}",
            2, 12, "module \"C\", port \"A\" has no direction"},
        Bad{"a port without bits",
            "{\"modules\": {\"C\": {\"attributes\": {\"blackbox\": \"1\"},\n"
            " \"ports\": {\"A\": {\"direction\": \"input\", \"bits\": []}}}}}",
            2, 12, "port \"A\" has no bits"},
        Bad{"two modules of one name", "{\"modules\": {\"C\": {},\n \"C\": {}}}", 2, 2,
            "module \"C\" is defined twice"},
        Bad{"a bus bit and a port of one name",
            "{\"modules\": {\"C\": {\"attributes\": {\"blackbox\": \"1\"}, \"ports\": {\n"
            " \"A\": {\"direction\": \"input\", \"bits\": [2, 3]},\n"
            " \"A[1]\": {\"direction\": \"input\", \"bits\": [4]}}}}}",
            3, 2, "pin \"A[1]\" is named twice"}));

} // namespace

// The netlist readers, the import into the typed model and the export, on
// hand-written netlists: every construct, unknown cells, and bad input.

#include "Lum_NetlistTestSupport.h"

#include "Lum_CellLibraryReader.h"
#include "Lum_ExceptionInvalidFormat.h"
#include "Lum_NetlistExporter.h"
#include "Lum_NetlistImporter.h"
#include "Lum_NetlistJsonReader.h"
#include "Lum_NetlistVerilogReader.h"
#include "Lum_NetlistWriter.h"
#include "Lum_TdmBlock.h"
#include "Lum_TdmModel.h"
#include "Lum_TdmPin.h"
#include "Lum_TdmView.h"

#include "../Lum_TdmTestSupport.h"

#include "Lum_Tlm.h"
#include "Orb_Model.h"
#include "Orb_Property.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>
#include <sstream>

using ::testing::HasSubstr;

namespace {

// The cells of the hand-written netlists: REG4 has bus ports.
char const kCells[] = R"({"modules": {
  "NAND2": {"attributes": {"blackbox": "1"}, "ports": {
    "A": {"direction": "input", "bits": [2]}, "B": {"direction": "input", "bits": [3]},
    "Y": {"direction": "output", "bits": [4]}}},
  "INV": {"attributes": {"blackbox": "1"}, "ports": {
    "A": {"direction": "input", "bits": [2]}, "Y": {"direction": "output", "bits": [3]}}},
  "DFF": {"attributes": {"blackbox": "1"}, "ports": {
    "D": {"direction": "input", "bits": [2]}, "CK": {"direction": "input", "bits": [3]},
    "Q": {"direction": "output", "bits": [4]}, "QN": {"direction": "output", "bits": [5]}}},
  "REG4": {"attributes": {"blackbox": "1"}, "ports": {
    "D": {"direction": "input", "bits": [2, 3, 4, 5]},
    "Q": {"direction": "output", "bits": [6, 7, 8, 9]}}}}})";

// Every construct the Verilog reader takes, in one design.
char const kEverything[] = R"(// a comment
/* a block
   comment */
(* top = 1 *)
module top(a, \b/c[3] , y, q);
  input [0:3] a;
  input \b/c[3] ;
  output [3:0] y;
  output q;
  wire [3:0] n;
  wire m, alias1, alias2;
  assign alias1 = m;
  assign alias2 = alias1;
  assign y[3] = 1'b0;
  NAND2 u1 (.A(a[0]), .B(\b/c[3] ), .Y(m));
  NAND2 u2 (a[1], alias2, n[0]);
  sub s1 (.i({ a[2], a[3] }), .o(y[1:0]));
  sub s2 (.i(n[1:0]), .o({ y[2], q }));
  DFF r (.D(m), .CK(a[0]), .Q());
  (* keep *) REG4 #(.INIT(4'hx), .NAME("reg")) r4 (.D(4'b1010), .Q({ n[3:1], \cut[0] }));
endmodule

module sub(input [1:0] i, output [1:0] o);
  INV g0 (.A(i[0]), .Y(o[0]));
  INV g1 (.A(i[1]), .Y(o[1]));
endmodule
)";

class NetlistImport : public ::testing::Test {
public:
  void SetUp() override {
    m_Cells = std::make_unique<Lum_Netlist>(Lum_NetlistJsonReader::ReadText(kCells, "cells.json"));
    m_Library = std::make_unique<nltest::BlackboxLibrary>(*m_Cells, "TINY");
    m_Options.libraries = {"TINY"};
  }
  void TearDown() override { m_Library.reset(); }

  Lum_TdmView *Import(Lum_Netlist const &netlist, Lum_NetlistImportSummary *summary = nullptr) {
    return Lum_NetlistImporter::Import(m_Model, netlist, m_Options, summary);
  }

  static Orb_Block *Child(Orb_Block const *block, char const *name) {
    Orb_Block *child = block->GetBlockByName(name);
    EXPECT_NE(child, nullptr) << name;
    return child;
  }
  // The names the signal on a pin carries.
  static std::vector<std::string> Names(Orb_Signal const *signal) {
    Orb_Property const *names = signal->GetPropertyByName(Lum_NetlistProperties::kNames);
    return names ? names->GetStrings() : std::vector<std::string>();
  }

  std::unique_ptr<Lum_Netlist> m_Cells;
  std::unique_ptr<nltest::BlackboxLibrary> m_Library;
  Lum_NetlistImportOptions m_Options;
  Lum_TdmModel m_Model{"test", "test", ""};
};

TEST_F(NetlistImport, EveryConstructBecomesBlocksPinsAndSignals) {
  Lum_Netlist const netlist = Lum_NetlistVerilogReader::ReadText(kEverything, "every.v");
  Lum_NetlistImportSummary summary;
  Lum_TdmView *view = Import(netlist, &summary);
  EXPECT_EQ(summary.top, "top");
  EXPECT_EQ(summary.modules, 2U);
  EXPECT_EQ(summary.moduleInstances, 2U);
  EXPECT_EQ(summary.instancesByLibrary["TINY"], 6U); // 4 at the top, 2 in sub

  Orb_Block const *top = view->GetBlock()->GetOrbBlock();
  // Ports bit by bit from the least significant, the ascending bus by its
  // own indices, the escaped scalar under its whole name.
  std::vector<std::string> pins;
  for (Orb_Pin const *pin : top->GetPins())
    pins.push_back(pin->GetName());
  EXPECT_EQ(pins, (std::vector<std::string>{"a[3]", "a[2]", "a[1]", "a[0]", "b/c[3]", "y[0]",
                                            "y[1]", "y[2]", "y[3]", "q"}));
  // A net with three names, reached from both NAND2s; positional pins.
  Orb_Block const *u1 = Child(top, "u1");
  Orb_Block const *u2 = Child(top, "u2");
  Orb_Signal const *m = u1->GetPinByName("Y")->GetSignal();
  EXPECT_EQ(Names(m), (std::vector<std::string>{"0 m", "0 alias1", "0 alias2"}));
  EXPECT_EQ(u2->GetPinByName("B")->GetSignal(), m);
  EXPECT_EQ(u2->GetPinByName("A")->GetSignal(), top->GetPinByName("a[1]")->GetInnerSignal());
  EXPECT_EQ(u1->GetPinByName("B")->GetSignal(), top->GetPinByName("b/c[3]")->GetInnerSignal());
  EXPECT_EQ(view->GetBlock()->GetBlockByName("u1")->GetTypeBlock(),
            m_Library->Get()->GetTypeBlock(Port::StringBase<char>("NAND2")));
  // A constant driver, an unconnected pin, bus pins bit by bit, parameters.
  Orb_Signal const *zero = top->GetPinByName("y[3]")->GetInnerSignal();
  EXPECT_EQ(std::string(zero->GetPropertyByName(Lum_NetlistProperties::kConstant)->GetValue()),
            "0");
  EXPECT_EQ(Child(top, "r")->GetPinByName("Q")->GetSignal(), nullptr);
  Orb_Block const *r4 = Child(top, "r4");
  EXPECT_EQ(r4->GetPinByName("D[1]")->GetSignal()->GetPropertyByName("NL_CONSTANT")->GetValue(),
            "1");
  EXPECT_EQ(r4->GetPinByName("Q[1]")->GetSignal(), top->GetSignalByName("n[1]"));
  EXPECT_EQ(r4->GetPinByName("Q[0]")->GetSignal(), top->GetSignalByName("cut[0]"));
  auto const &parameters = r4->GetPropertyByName(Lum_NetlistProperties::kParameters)->GetMembers();
  ASSERT_EQ(parameters.size(), 1U);
  EXPECT_EQ(parameters[0]->GetValue(), "xxxx");
  EXPECT_EQ(
      r4->GetPropertyByName(Lum_NetlistProperties::kStringParameters)->GetMembers()[0]->GetValue(),
      "reg");
  // The module used twice: a type block of the local library, its contents
  // grafted under each instance.
  for (char const *name : {"s1", "s2"}) {
    Lum_TdmBlock *instance = view->GetBlock()->GetBlockByName(name);
    ASSERT_NE(instance->GetTypeBlock(), nullptr);
    EXPECT_STREQ(instance->GetTypeBlock()->GetName(), "sub");
    EXPECT_NE(instance->GetOrbBlock()->GetBlockByName("g0"), nullptr) << name;
    EXPECT_NE(instance->GetOrbBlock()->GetBlockByName("g1"), nullptr) << name;
  }
  EXPECT_EQ(Child(Child(top, "s2"), "g0")->GetPinByName("A")->GetSignal(),
            Child(top, "s2")->GetPinByName("i[0]")->GetInnerSignal());
}

TEST_F(NetlistImport, ExportedJsonAndVerilogReadBackAsTheSameNetlist) {
  Lum_Netlist const netlist = Lum_NetlistVerilogReader::ReadText(kEverything, "every.v");
  Lum_Netlist const out = Lum_NetlistExporter::Export(*Import(netlist));
  std::ostringstream json;
  std::ostringstream verilog;
  Lum_NetlistWriter::WriteJson(out, json);
  Lum_NetlistWriter::WriteVerilog(out, verilog);
  std::vector<std::string> const fromJson =
      nltest::Canonical(Lum_NetlistJsonReader::ReadText(json.str(), "out.json"));
  std::vector<std::string> const fromVerilog =
      nltest::Canonical(Lum_NetlistVerilogReader::ReadText(verilog.str(), "out.v"));
  EXPECT_TRUE(fromJson == fromVerilog) << nltest::Difference(fromJson, fromVerilog) << "\n--\n"
                                       << nltest::Difference(fromVerilog, fromJson);
  // Positional connections come out named; escaped names and the
  // ascending bus survive.
  EXPECT_THAT(verilog.str(), HasSubstr("NAND2 u2 (\n    .A(a[1]),\n    .B(m),\n    .Y(n[0])"));
  EXPECT_THAT(verilog.str(), HasSubstr("input [0:3] a;"));
  EXPECT_THAT(verilog.str(), HasSubstr("\\b/c[3] "));
  EXPECT_THAT(verilog.str(), HasSubstr(".INIT(4'bxxxx)"));
  EXPECT_THAT(json.str(), HasSubstr("\"upto\": 1"));
  // The original and its export are the same netlist but for the names the
  // positional connections did not have.
  std::vector<std::string> original = nltest::Canonical(netlist);
  for (std::string &line : original)
    for (auto const &[from, to] :
         {std::pair{"$0", "A"}, std::pair{"$1", "B"}, std::pair{"$2", "Y"}})
      for (std::size_t at = line.find(from); at != std::string::npos; at = line.find(from))
        line.replace(at, 2, to);
  std::sort(original.begin(), original.end());
  EXPECT_TRUE(original == fromVerilog) << nltest::Difference(original, fromVerilog) << "\n--\n"
                                       << nltest::Difference(fromVerilog, original);
}

TEST_F(NetlistImport, ExportFollowsTypePinsWhateverThePinsOrderAndNames) {
  Lum_Netlist const netlist =
      Lum_NetlistVerilogReader::ReadText("module top(input a, input b, output y, output z);\n"
                                         "  NAND2 u1 (.A(a), .B(b), .Y(y));\nendmodule\n",
                                         "top.v");
  Lum_TdmView *view = Import(netlist);
  Lum_TdmBlock *top = view->GetBlock();
  Lum_TlmBlock const *nand = top->GetBlockByName("u1")->GetTypeBlock();
  // A second instance with its pins in another order than its type block's,
  // the output's pin named otherwise (as a pin map leaves it).
  Lum_TdmBlock *u2 = top->CreateTypedBlock("u2", nand, false, false);
  struct Pin {
    char const *name, *typePin, *net;
  };
  for (Pin const &pin : {Pin{"OUT", "Y", "z"}, Pin{"B", "B", "a"}, Pin{"A", "A", "b"}}) {
    Lum_TdmPin *made = u2->CreatePin(pin.name, nand->GetPinByName(pin.typePin)->GetDirection());
    made->SetTypePin(nand->GetPinByName(pin.typePin));
    made->GetOrbPin()->Connect(top->GetOrbBlock()->GetSignalByName(pin.net));
  }
  std::ostringstream verilog;
  Lum_NetlistWriter::WriteVerilog(Lum_NetlistExporter::Export(*view), verilog);
  EXPECT_THAT(verilog.str(), HasSubstr("NAND2 u1 (\n    .A(a),\n    .B(b),\n    .Y(y)\n  );"));
  EXPECT_THAT(verilog.str(), HasSubstr("NAND2 u2 (\n    .Y(z),\n    .B(a),\n    .A(b)\n  );"));
}

TEST_F(NetlistImport, UnknownCellsAreListedAllAtOnceOrKeptUntyped) {
  char const text[] = R"(module top(input a, output y);
    wire [1:0] w;
    MYSTERY m1 (.I(a), .O(w[0]));
    MYSTERY m2 (.I(w[0]), .O(w[1]));
    OTHER o1 (.P({ w[1], a }), .Q(y));
    INV i1 (.A(a), .Y());
  endmodule)";
  Lum_Netlist const netlist = Lum_NetlistVerilogReader::ReadText(text, "unknown.v");
  try {
    Import(netlist);
    FAIL() << "imported cells no library has";
  } catch (Lum_ExceptionInvalidFormat const &e) {
    EXPECT_THAT(e.GetMessage(), HasSubstr("2 cell types are in no type library: MYSTERY (2 "
                                          "instances, e.g. m1, m2); OTHER (1 instance, e.g. o1)."));
  }
  m_Options.blackboxUnknown = true;
  Lum_TdmModel model("again", "again", "");
  Lum_NetlistImportSummary summary;
  Lum_TdmView *view = Lum_NetlistImporter::Import(model, netlist, m_Options, &summary);
  EXPECT_EQ(summary.untyped, 3U);
  Orb_Block const *o1 = Child(view->GetBlock()->GetOrbBlock(), "o1");
  EXPECT_EQ(std::string(o1->GetPropertyByName(Lum_NetlistProperties::kCellType)->GetValue()),
            "OTHER");
  EXPECT_NE(o1->GetPinByName("P[1]"), nullptr);
  // They go out as they came in.
  EXPECT_TRUE(nltest::Canonical(Lum_NetlistExporter::Export(*view)) == nltest::Canonical(netlist));
}

// Bad input: one error that says where and what.
struct BadInput {
  char const *name;
  bool json;
  std::string text;
  char const *where;
  char const *what;
};

std::vector<BadInput> BadInputs() {
  std::string const deep = std::string(100, '{') + "a" + std::string(100, '}');
  return {
      {"TruncatedJson", true, R"({"modules": {"m": {"ports": {)", "", "not valid JSON"},
      {"WrongJsonType", true,
       R"({"modules": {"m": {"ports": {"a": {"direction": "input", "bits": "2"}}}}})",
       "modules.m.ports.a.bits", "expected an array of bits"},
      {"UndeclaredBit", true,
       R"({"modules": {"m": {"cells": {"$abc$12": {"type": "INV", "connections": {"A": [99]}}}}}})",
       "modules.m.cells.$abc$12.connections.A", "bit 99 is declared by no port"},
      {"BadConstant", true, R"({"modules": {"m": {"netnames": {"n": {"bits": ["2"]}}}}})",
       "modules.m.netnames.n.bits", "not \"2\""},
      {"TwoModulesOfOneName", true, R"({"modules": {"m": {}, "m": {}}})", "modules.m",
       "a second module"},
      {"Behavioural", false,
       "module m(input c, d, output reg q);\n  always @(posedge c) q <= d;\nendmodule",
       "line 2, column 3", "'always' is not structural"},
      {"Operator", false, "module m(input a, b, output y);\n  assign y = a & b;\nendmodule",
       "line 2, column 16", "unexpected character '&'"},
      {"HugeToken", false, "module " + std::string(70000, 'n') + ";\nendmodule", "line 1, column 8",
       "a token longer than 65536 bytes"},
      {"DeepConcatenation", false, "module m(input a);\n  wire w = " + deep + ";\nendmodule",
       "line 2, column 76", "nested deeper than 64"},
      {"AssignWidths", false, "module m(input [1:0] a, output y);\n  assign y = a;\nendmodule",
       "line 2, column 10", "1 and 2 bits"},
      {"OutOfRange", false, "module m(input [1:0] a);\n  INV i (.A(a[2]));\nendmodule",
       "line 2, column 13", "[2] is outside the range of a"},
      {"TwoConstants", false,
       "module m(output y);\n  assign y = 1'b0;\n  assign y = 1'b1;\nendmodule",
       "line 3, column 10", "tied to both 0 and 1"},
      {"UnclosedComment", false, "module m; /* never closed\nendmodule", "line 1, column 11",
       "a comment is not closed"},
  };
}

class BadNetlists : public ::testing::TestWithParam<BadInput> {};

TEST_P(BadNetlists, AreRefusedWithThePosition) {
  BadInput const &bad = GetParam();
  try {
    if (bad.json)
      Lum_NetlistJsonReader::ReadText(bad.text, "bad.json");
    else
      Lum_NetlistVerilogReader::ReadText(bad.text, "bad.v");
    FAIL() << "read";
  } catch (Lum_ExceptionInvalidFormat const &e) {
    EXPECT_EQ(e.GetInputPath(), bad.json ? "bad.json" : "bad.v");
    EXPECT_THAT(e.GetMessage(), HasSubstr(std::string(bad.where) + ": "));
    EXPECT_THAT(e.GetMessage(), HasSubstr(bad.what));
  }
}

INSTANTIATE_TEST_SUITE_P(Readers, BadNetlists, ::testing::ValuesIn(BadInputs()),
                         [](::testing::TestParamInfo<BadInput> const &param) {
                           return std::string(param.param.name);
                         });

// Netlists that read but cannot be mapped: nothing is built.
TEST_F(NetlistImport, RefusesWhatCannotBeMapped) {
  struct Case {
    char const *text;
    char const *top;
    char const *what;
  };
  std::string chain;
  for (int i = 0; i < 1200; ++i)
    chain += "module c" + std::to_string(i) + "(input a);\n  c" + std::to_string(i + 1) +
             " x (.a(a));\nendmodule\n";
  chain += "module c1200(input a);\nendmodule\n";
  for (Case const &bad : std::vector<Case>{
           {"module m(input a);\n  INV i (.A(a), .Z(a));\nendmodule", "",
            "line 2, column 7: cell type INV has no port Z"},
           {"module m(input [1:0] a);\n  INV i (.A(a));\nendmodule", "",
            "2 bits connected to port A of INV, which has 1"},
           {"module m(input a);\n  n x (.a(a));\nendmodule\nmodule n(input a);\n  m y "
            "(.a(a));\nendmodule",
            "m", "instantiates itself"},
           {"module m;\nendmodule", "nosuch", "no design module named nosuch"},
           {chain.c_str(), "c0", "modules nest deeper than 1000 levels"},
       }) {
    Lum_Netlist const netlist = Lum_NetlistVerilogReader::ReadText(bad.text, "bad.v");
    m_Options.top = bad.top;
    Lum_TdmModel model("bad", "bad", "");
    try {
      Lum_NetlistImporter::Import(model, netlist, m_Options);
      ADD_FAILURE() << "imported " << bad.what;
    } catch (Lum_ExceptionInvalidFormat const &e) {
      EXPECT_THAT(e.GetMessage(), HasSubstr(bad.what));
    }
  }
  // The JSON form names the place by its path in the document.
  Lum_Netlist const json = Lum_NetlistJsonReader::ReadText(
      R"({"modules": {"cpu": {"ports": {"a": {"direction": "input", "bits": [2]}},
          "cells": {"$abc$12": {"type": "INV", "connections": {"A": [2, 2]}}}}}})",
      "cpu.json");
  m_Options.top.clear();
  try {
    Import(json);
    ADD_FAILURE() << "imported a width mismatch";
  } catch (Lum_ExceptionInvalidFormat const &e) {
    EXPECT_THAT(e.GetMessage(), HasSubstr("modules.cpu.cells.$abc$12.connections.A: 2 bits"));
  }
}

// A net with two drivers is refused before anything is built, at the second
// driver; an inout pin, a pin of unknown direction and x or z are no drivers.
TEST_F(NetlistImport, RefusesANetWithTwoDrivers) {
  struct Case {
    bool json;
    char const *text;
    char const *what; // empty: imports
  };
  char const *const sub = "module sub(input i, output o);\n  INV g (.A(i), .Y(o));\nendmodule\n";
  auto cells = [](char const *extra) {
    return std::string(R"({"modules": {"m": {"ports": {"a": {"direction": "input", "bits": [2]},
        "y": {"direction": "output", "bits": [3]}}, "cells": {
        "$abc$1": {"type": "INV", "connections": {"A": [2], "Y": [3]}}, )") +
           extra + "}}}}";
  };
  std::string const second =
      cells(R"("$abc$2": {"type": "INV", "connections": {"A": [2], "Y": [3]}})");
  std::string const unknownOut = cells(
      R"("u": {"type": "ODD", "port_directions": {"P": "output"}, "connections": {"P": [3]}})");
  std::string const unknownInout = cells(
      R"("u": {"type": "ODD", "port_directions": {"P": "inout"}, "connections": {"P": [3]}})");
  std::string const unknownBare = cells(R"("u": {"type": "ODD", "connections": {"P": [3]}})");
  std::string const moduleOut =
      std::string("module m(input a, output y);\n  sub s (.i(a), .o(y));\n  INV i (.A(a), "
                  ".Y(y));\nendmodule\n") +
      sub;
  m_Options.blackboxUnknown = true;
  for (Case const &c : std::vector<Case>{
           {false,
            "module m(input a, output y);\n  INV i1 (.A(a), .Y(y));\n  INV i2 (.A(a), "
            ".Y(y));\nendmodule",
            "line 3, column 7: module m: net y has two drivers, i1.Y and i2.Y"},
           {false, "module m(input a);\n  INV i (.A(a), .Y(a));\nendmodule",
            "line 2, column 7: module m: net a has two drivers, input port a and i.Y"},
           {false,
            "module m(input a, output y);\n  assign y = 1'b1;\n  INV i (.A(a), .Y(y));\nendmodule",
            "line 3, column 7: module m: net y has two drivers, constant 1 and i.Y"},
           {false,
            "module m(input [3:0] d, output [3:0] q);\n  wire [2:0] w;\n  REG4 r1 (.D(d), "
            ".Q(q));\n  REG4 r2 (.D(d), .Q({ q[2], w }));\nendmodule",
            "line 4, column 8: module m: net q[2] has two drivers, r1.Q[2] and r2.Q[3]"},
           {false, moduleOut.c_str(),
            "line 3, column 7: module m: net y has two drivers, s.o and i.Y"},
           {false,
            "module m(input a, output y);\n  assign y = 1'bz;\n  INV i (.A(a), .Y(y));\nendmodule",
            ""},
           {true, second.c_str(),
            "modules.m.cells.$abc$2.connections.Y: module m: net y has two drivers, $abc$1.Y and "
            "$abc$2.Y"},
           {true, unknownOut.c_str(),
            "modules.m.cells.u.connections.P: module m: net y has two drivers, $abc$1.Y and u.P"},
           {true, unknownInout.c_str(), ""},
           {true, unknownBare.c_str(), ""},
       }) {
    Lum_Netlist const netlist = c.json ? Lum_NetlistJsonReader::ReadText(c.text, "two.json")
                                       : Lum_NetlistVerilogReader::ReadText(c.text, "two.v");
    Lum_TdmModel model("two", "two", "");
    try {
      Lum_NetlistImporter::Import(model, netlist, m_Options);
      EXPECT_STREQ(c.what, "") << "imported";
    } catch (Lum_ExceptionInvalidFormat const &e) {
      EXPECT_EQ(e.GetInputPath(), c.json ? "two.json" : "two.v");
      EXPECT_EQ(e.GetMessage(), c.what);
    }
  }
}

// Tri-state outputs (Liberty three_state) share a bus: they are not two
// drivers of it.
TEST(NetlistDrivers, TriStateOutputsShareANet) {
  Lum_CellLibraryOptions options;
  options.name = "TRI";
  std::unique_ptr<Lum_TlmModel> const cells = Lum_CellLibraryReader::ReadText(
      "library (tri) {\n  cell (EBUF) {\n    pin (A) { direction : input ; }\n    pin (E) { "
      "direction : input ; }\n    pin (Z) { direction : output ; three_state : \"!E\" ; }\n  "
      "}\n}\n",
      "tri.lib", options);
  Lum_TlmLibrary *library = cells->GetLibrary();
  Orb_Property const *threeState = library->GetTypeBlock(Port::StringBase<char>("EBUF"))
                                       ->GetPinByName("Z")
                                       ->GetPropertyByName(Lum_CellLibraryNames::kThreeState);
  ASSERT_NE(threeState, nullptr);
  EXPECT_STREQ(threeState->GetStringValue(), "!E");
  Lum_TlmCatalog::Register(library);
  {
    Lum_NetlistImportOptions import;
    import.libraries = {"TRI"};
    Lum_TdmModel model("tri", "tri", "");
    EXPECT_NO_THROW(Lum_NetlistImporter::Import(
        model,
        Lum_NetlistVerilogReader::ReadText("module m(input a, b, e, f, output y);\n  EBUF u1 "
                                           "(.A(a), .E(e), .Z(y));\n  EBUF u2 (.A(b), .E(f), "
                                           ".Z(y));\nendmodule\n",
                                           "tri.v"),
        import));
  }
  Lum_TlmCatalog::Unregister(library);
}

// Every view of a model, one file each: each the same bytes as the export of
// that view alone, and so the same netlist to Yosys. A view that fails names
// itself and leaves no file; the files before it stay.
TEST_F(NetlistImport, SavesEveryViewAsItsOneViewExport) {
  Import(Lum_NetlistVerilogReader::ReadText(kEverything, "every.v"));
  Import(Lum_NetlistVerilogReader::ReadText(
      "module other(input a, output y);\n  INV i (.A(a), .Y(y));\nendmodule\n", "other.v"));
  lumtest::TempDir dir;
  std::vector<Orb_View *> views;
  for (Orb_DesignMgr *designMgr : m_Model.GetOrbModel()->GetDesignMgrs())
    views.push_back(designMgr->GetDesigns()[0]->GetViews()[0]);
  ASSERT_EQ(views.size(), 2U);
  for (auto const format : {Lum_NetlistWriter::Format::Json, Lum_NetlistWriter::Format::Verilog}) {
    std::string const extension = format == Lum_NetlistWriter::Format::Json ? ".json" : ".v";
    std::vector<std::string> const written =
        Lum_NetlistExporter::SaveAll(m_Model, dir.Path(), format);
    ASSERT_EQ(written, (std::vector<std::string>{dir.File("top.netlist" + extension),
                                                 dir.File("other.netlist" + extension)}));
    for (std::size_t i = 0; i < views.size(); ++i) {
      std::string const alone = dir.File("alone" + std::to_string(i) + extension);
      Lum_NetlistWriter::Save(
          Lum_NetlistExporter::Export(*static_cast<Lum_TdmView *>(m_Model.Specialize(views[i]))),
          alone, format);
      EXPECT_EQ(lumtest::FileBytes(written[i]), lumtest::FileBytes(alone)) << written[i];
      if (!nltest::HaveYosys())
        continue;
      ASSERT_TRUE(nltest::YosysNormalise(written[i], written[i] + ".yosys.json"));
      ASSERT_TRUE(nltest::YosysNormalise(alone, alone + ".yosys.json"));
      EXPECT_EQ(nltest::Canonical(Lum_NetlistJsonReader::Read(written[i] + ".yosys.json")),
                nltest::Canonical(Lum_NetlistJsonReader::Read(alone + ".yosys.json")));
    }
  }
  // A folder where the second file goes: the first is written, the second
  // named in the error, and no temporary is left.
  lumtest::TempDir failing;
  std::filesystem::create_directory(failing.File("other.netlist.json"));
  try {
    Lum_NetlistExporter::SaveAll(m_Model, failing.Path(), Lum_NetlistWriter::Format::Json);
    ADD_FAILURE() << "saved over a folder";
  } catch (Lum_ExceptionInvalidFormat const &e) {
    EXPECT_EQ(e.GetInputPath(), failing.File("other.netlist.json"));
    EXPECT_THAT(e.GetMessage(), HasSubstr("view other/other/netlist: "));
  }
  EXPECT_TRUE(std::filesystem::is_regular_file(failing.File("top.netlist.json")));
  auto const files = std::filesystem::directory_iterator(failing.Path());
  EXPECT_EQ(std::distance(begin(files), end(files)), 2);
}

} // namespace

namespace {

// The JSON fields that carry meaning beyond bits: offsets and ascending
// ranges, constants in net names, hidden names, port directions of cells,
// and parameter values (bits, integers, strings that look like bits).
TEST(NetlistJson, ReadsAndWritesTheFieldsThatCarryMeaning) {
  char const text[] = R"({"creator": "x", "models": {}, "modules": {"top": {
    "attributes": {"top": "00000000000000000000000000000001", "src": "a.v:1"},
    "ports": {"d": {"direction": "input", "bits": [2, 3, 4], "offset": 2, "upto": 1,
                    "signed": 1, "future_field": [1, 2]}},
    "cells": {"$auto$1": {"hide_name": 1, "type": "REG",
      "parameters": {"INIT": "01xz", "WIDTH": 3, "NAME": "10 ", "EMPTY": " "},
      "port_directions": {"Q": "output"},
      "connections": {"Q": [5], "D": [2, "x", 4]}}},
    "netnames": {"d": {"bits": [2, 3, 4], "offset": 2, "upto": 1},
                 "$q": {"hide_name": 1, "bits": [5, "1"]}}}}})";
  Lum_Netlist const netlist = Lum_NetlistJsonReader::ReadText(text, "fields.json");
  ASSERT_EQ(netlist.modules.size(), 1U);
  Lum_NetlistModule const &top = netlist.modules[0];
  EXPECT_TRUE(top.top);
  Lum_NetlistVector const &d = top.ports[0];
  EXPECT_EQ(d.offset, 2);
  EXPECT_TRUE(d.upto);
  EXPECT_TRUE(d.isSigned);
  EXPECT_EQ(d.IndexOf(0), 4); // the first bit of d[2:4] is d[4]
  EXPECT_TRUE(top.netNames[1].hidden);
  EXPECT_EQ(top.Bits(top.netNames[1].bits)[1], Lum_NetlistBits::kOne);
  Lum_NetlistConnection const &q = top.connections[0];
  EXPECT_EQ(netlist.Text(q.port), "Q");
  EXPECT_EQ(q.direction, Lum_NetlistDirection::Output);
  EXPECT_EQ(top.Bits(top.connections[1].bits)[1], Lum_NetlistBits::kUndefined);
  std::vector<std::pair<std::string, std::string>> parameters;
  for (Lum_NetlistParameter const &parameter : top.parameters)
    parameters.emplace_back(std::string(netlist.Text(parameter.name)),
                            (parameter.isString ? "string " : "bits ") +
                                std::string(netlist.Text(parameter.value)));
  EXPECT_EQ(parameters, (std::vector<std::pair<std::string, std::string>>{
                            {"INIT", "bits 01xz"},
                            {"WIDTH", "bits 00000000000000000000000000000011"},
                            {"NAME", "string 10"},
                            {"EMPTY", "string "}}));
  // Written again, the strings that look like bits keep their blank, and
  // the rewritten text reads as the same netlist.
  std::ostringstream out;
  Lum_NetlistWriter::WriteJson(netlist, out);
  EXPECT_THAT(out.str(), HasSubstr("\"NAME\": \"10 \""));
  EXPECT_THAT(out.str(), HasSubstr("\"EMPTY\": \" \""));
  EXPECT_TRUE(nltest::Canonical(Lum_NetlistJsonReader::ReadText(out.str(), "again.json")) ==
              nltest::Canonical(netlist));
}

// Names are kept once each, whatever their length, and survive a move; the
// netlist moved from is empty and can take new names of its own.
TEST(NetlistNames, AreInternedOnceAndSurviveAMove) {
  Lum_Netlist netlist;
  std::vector<std::string> texts = {"", "A", std::string(100000, 'x'), "a\0b"};
  for (int i = 0; i < 5000; ++i)
    texts.push_back("c" + std::to_string(i) + "/$abc$" + std::to_string(7 * i));
  std::vector<Lum_NetlistName> ids;
  for (std::string const &text : texts)
    ids.push_back(netlist.Intern(text));
  EXPECT_EQ(ids[0], 0U);
  for (std::size_t i = 0; i < texts.size(); ++i) {
    EXPECT_EQ(netlist.Intern(texts[i]), ids[i]);
    EXPECT_EQ(netlist.Find(texts[i]), ids[i]);
  }
  EXPECT_EQ(netlist.Find("c5000/$abc$0"), Lum_Netlist::kNone);
  Lum_Netlist moved(std::move(netlist));
  for (std::size_t i = 0; i < texts.size(); ++i) {
    ASSERT_EQ(moved.Text(ids[i]), texts[i]);
    EXPECT_EQ(moved.CText(ids[i])[texts[i].size()], '\0');
  }
  Lum_NetlistName const again = netlist.Intern("fresh"); // NOLINT(bugprone-use-after-move)
  EXPECT_EQ(netlist.Text(again), "fresh");
  EXPECT_EQ(moved.Find("fresh"), Lum_Netlist::kNone);
}

// Bit numbers belong to their module: the same numbers in the next module
// are other bits, and numbers far beyond the text's length read alike.
TEST(NetlistJson, NumbersBitsPerModuleWhateverTheirSize) {
  char const text[] = R"({"modules": {
    "a": {"ports": {"x": {"direction": "input", "bits": [1000000000000, 7]}},
          "cells": {"g": {"type": "INV", "connections": {"A": [7], "Y": [1000000000000]}}}},
    "b": {"ports": {"y": {"direction": "output", "bits": [7, 5]}},
          "cells": {"h": {"type": "INV", "connections": {"A": [5], "Y": [7]}}}}}})";
  Lum_Netlist const netlist = Lum_NetlistJsonReader::ReadText(text, "bits.json");
  ASSERT_EQ(netlist.modules.size(), 2U);
  for (Lum_NetlistModule const &module : netlist.modules) {
    Lum_NetlistBit const *port = module.Bits(module.ports[0].bits);
    EXPECT_EQ(module.numBits, Lum_NetlistBits::kFirstNet + 2);
    EXPECT_NE(port[0], port[1]);
    EXPECT_EQ(module.Bits(module.connections[0].bits)[0], port[1]) << netlist.Text(module.name);
    EXPECT_EQ(module.Bits(module.connections[1].bits)[0], port[0]) << netlist.Text(module.name);
  }
  try {
    Lum_NetlistJsonReader::ReadText(
        R"({"modules": {"c": {"ports": {"p": {"direction": "input", "bits": [3]}},
            "cells": {"k": {"type": "INV", "connections": {"A": [3, 99999999999]}}}}}})",
        "undeclared.json");
    ADD_FAILURE() << "read a bit no port or net declares";
  } catch (Lum_ExceptionInvalidFormat const &e) {
    EXPECT_THAT(e.GetMessage(), HasSubstr("modules.c.cells.k.connections.A: bit 99999999999 is "
                                          "declared by no port"));
  }
}

} // namespace

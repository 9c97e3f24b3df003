// tdm demo: the main job on a built-in sample. It writes two type libraries
// for a sample device, builds a design that uses them in every way a block
// can be typed, commits and saves it, reopens it in a fresh model, checks
// that every binding came back and prints what it did.

#include "commands.h"

#include "Lum_TdmBlock.h"
#include "Lum_TdmDesign.h"
#include "Lum_TdmDesignMgr.h"
#include "Lum_TdmModel.h"
#include "Lum_TdmNetwork.h"
#include "Lum_TdmPin.h"
#include "Lum_TdmSignal.h"
#include "Lum_TdmTypePinMap.h"
#include "Lum_TdmView.h"

#include "Lum_TdmSchema.h"
#include "Lum_Tlm.h"
#include "Orb_Model.h"
#include "Port_Exception.h"
#include "Port_Stream.h"

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <map>
#include <string>
#include <vector>

namespace tdm {
namespace {

// The sample device and the names the demo uses.
char const kPersonality[] = "sample";
char const kPart[] = "s100";
char const kViewName[] = "netlist";
char const kDatabaseFile[] = "demo.odb";

// GATES 1.2: small cells, pins of all three directions.
void WriteGates(std::string const &path) {
  Lum_TlmModel model("GATES", "GATES", "", false);
  Lum_TlmLibrary *library = model.CreateLibrary("GATES", 1, 2, kPersonality, "std");
  Lum_TlmBlock *nand = library->CreateTypeBlock("NAND2");
  nand->CreatePin("A", Orb_Pin::PIN_INPUT);
  nand->CreatePin("B", Orb_Pin::PIN_INPUT);
  nand->CreatePin("Y", Orb_Pin::PIN_OUTPUT);
  Lum_TlmBlock *inv = library->CreateTypeBlock("INV");
  inv->CreatePin("A", Orb_Pin::PIN_INPUT);
  inv->CreatePin("Y", Orb_Pin::PIN_OUTPUT);
  Lum_TlmBlock *dff = library->CreateTypeBlock("DFF");
  dff->CreatePin("D", Orb_Pin::PIN_INPUT);
  dff->CreatePin("CK", Orb_Pin::PIN_INPUT);
  dff->CreatePin("Q", Orb_Pin::PIN_OUTPUT);
  Lum_TlmBlock *pad = library->CreateTypeBlock("IOPAD");
  pad->CreatePin("A", Orb_Pin::PIN_INPUT);
  pad->CreatePin("EN", Orb_Pin::PIN_INPUT);
  pad->CreatePin("PAD", Orb_Pin::PIN_BIDIRECTIONAL);
  library->Save(path.c_str());
}

// CORES 2.0: a type block ALU whose hierarchy for the view name holds two
// typed gates, g1 (NAND2) and g2 (INV), wired A,B -> g1 -> g2 -> Y.
void WriteCores(std::string const &path) {
  Lum_TlmModel model("CORES", "CORES", "", false);
  Lum_TlmLibrary *library = model.CreateLibrary("CORES", 2, 0, kPersonality);
  Lum_TlmBlock *alu = library->CreateTypeBlock("ALU");
  Lum_TlmBlock *hier = alu->CreateHier(kViewName);
  for (Lum_TlmBlock *block : {alu, hier}) {
    block->CreatePin("A", Orb_Pin::PIN_INPUT);
    block->CreatePin("B", Orb_Pin::PIN_INPUT);
    block->CreatePin("Y", Orb_Pin::PIN_OUTPUT);
  }
  Orb_Block *inside = hier->GetOrbBlock();
  Orb_Signal *a = inside->CreateSignal("a");
  Orb_Signal *b = inside->CreateSignal("b");
  Orb_Signal *mid = inside->CreateSignal("mid");
  Orb_Signal *y = inside->CreateSignal("y");
  inside->GetPinByName("A")->ConnectInner(a);
  inside->GetPinByName("B")->ConnectInner(b);
  inside->GetPinByName("Y")->ConnectInner(y);
  Orb_Block *g1 = inside->CreateBlock("g1");
  g1->CreatePropertyString(Lum_TdmSchema::kBlockType, "GATES:NAND2");
  g1->CreatePin("A", Orb_Pin::PIN_INPUT)->Connect(a);
  g1->CreatePin("B", Orb_Pin::PIN_INPUT)->Connect(b);
  g1->CreatePin("Y", Orb_Pin::PIN_OUTPUT)->Connect(mid);
  Orb_Block *g2 = inside->CreateBlock("g2");
  g2->CreatePropertyString(Lum_TdmSchema::kBlockType, "GATES:INV");
  g2->CreatePin("A", Orb_Pin::PIN_INPUT)->Connect(mid);
  g2->CreatePin("Y", Orb_Pin::PIN_OUTPUT)->Connect(y);
  library->Save(path.c_str());
}

Lum_TlmBlock const *TypeBlock(Lum_TdmView const *view, char const *library, char const *name) {
  Lum_TlmLibrary const *found = view->GetLibrary(Port::StringBase<char>(library));
  Lum_TlmBlock const *typeBlock =
      found ? found->GetTypeBlock(Port::StringBase<char>(name)) : nullptr;
  if (!typeBlock)
    throw Failure(kExitUnreadable,
                  std::string("type block ") + library + ":" + name + " is missing after writing");
  return typeBlock;
}

// Every binding of a view: block path -> type block, pin path -> type pin.
using Bindings = std::map<std::string, std::string>;

void CollectBindings(Lum_TdmBlock *block, std::string const &path, Bindings &bindings) {
  Lum_TlmBlock const *typeBlock = block->GetTypeBlock();
  bindings[path] = typeBlock ? typeBlock->GetUniqueTag().str() : "-";
  for (std::size_t i = 0; i < block->GetPins().size(); ++i) {
    Lum_TdmPin const *pin = block->GetPin(i);
    bindings[path + "." + pin->GetName()] = pin->GetTypePin() ? pin->GetTypePin()->GetName() : "-";
  }
  for (std::size_t i = 0; i < block->GetBlocks().size(); ++i) {
    Lum_TdmBlock *child = block->GetBlock(i);
    CollectBindings(child, path + "/" + child->GetName(), bindings);
  }
}

Lum_TdmSignal *Wire(Lum_TdmBlock *top, char const *name) { return top->CreateSignal(name); }

void Connect(Lum_TdmBlock *block, char const *pin, Lum_TdmSignal *signal) {
  block->GetPinByName(pin)->GetOrbPin()->Connect(signal->GetOrbSignal());
}

struct Built {
  std::string summary;
  Bindings bindings;
};

// Builds design "chip" of design manager "demo" and saves it to `path`.
Built WriteDesign(std::string const &path) {
  Lum_TdmModel model("demo", "demo", path.c_str());
  Lum_TdmDesign *design = model.CreateDesignMgr("demo")->CreateDesign("chip");
  Lum_TdmView *view = design->CreateView(kViewName);
  view->CreatePropertyString(Lum_TdmSchema::kDevicePm, kPersonality);
  view->CreatePropertyString(Lum_TdmSchema::kDevicePart, kPart);
  // The view loads its libraries from this list when first asked for one.
  Orb_Property *libraries = view->CreatePropertyStringList(Lum_TdmSchema::kTypeLibraries);
  libraries->AppendString("GATES");
  libraries->AppendString("CORES");
  Lum_TlmBlock const *nand = TypeBlock(view, "GATES", "NAND2");
  Lum_TlmBlock const *inv = TypeBlock(view, "GATES", "INV");
  Lum_TlmBlock const *dff = TypeBlock(view, "GATES", "DFF");
  Lum_TlmBlock const *pad = TypeBlock(view, "GATES", "IOPAD");
  Lum_TlmBlock const *alu = TypeBlock(view, "CORES", "ALU");

  Lum_TdmBlock *top = view->CreateTopBlock("chip");
  Lum_TdmSignal *clk = Wire(top, "clk");
  Lum_TdmSignal *a = Wire(top, "a");
  Lum_TdmSignal *b = Wire(top, "b");
  Lum_TdmSignal *n1 = Wire(top, "n1");
  Lum_TdmSignal *n2 = Wire(top, "n2");
  Lum_TdmSignal *q = Wire(top, "q");
  for (auto const &[name, signal] : {std::pair{"CLK", clk}, std::pair{"A", a}, std::pair{"B", b}})
    top->CreatePin(name, Orb_Pin::PIN_INPUT)->GetOrbPin()->ConnectInner(signal->GetOrbSignal());
  top->CreatePin("IO", Orb_Pin::PIN_BIDIRECTIONAL);

  // Typed with the type block's pins, wired.
  Lum_TdmBlock *u1 = top->CreateTypedBlock("u1", nand, false, true);
  Connect(u1, "A", a);
  Connect(u1, "B", b);
  Connect(u1, "Y", n1);
  // Typed without pins: reopening gives it its type block's pins.
  top->CreateTypedBlock("spare", inv, false, false);
  // Pins named otherwise than the type pins, bound through a pin map, which
  // the commit stores as TDS_BLOCK_PIN_MAP.
  Lum_TdmBlock *reg = top->CreateBlock("reg", 0);
  Lum_TdmTypePinMap map;
  for (auto const &[pin, typePin, direction] :
       {std::tuple{"DATA", "D", Orb_Pin::PIN_INPUT}, std::tuple{"CLOCK", "CK", Orb_Pin::PIN_INPUT},
        std::tuple{"OUT", "Q", Orb_Pin::PIN_OUTPUT}}) {
    reg->CreatePin(pin, direction);
    map.SetPinMap(Port::StringBase<char>(pin), dff->GetPinByName(typePin));
  }
  reg->SetTypeBlock(dff, map);
  Connect(reg, "DATA", n2);
  Connect(reg, "CLOCK", clk);
  Connect(reg, "OUT", q);
  // Typed, with its hierarchy for this view grafted beneath.
  Lum_TdmBlock *core = top->CreateTypedBlock("core", alu, true, true);
  Connect(core, "A", n1);
  Connect(core, "B", b);
  Connect(core, "Y", n2);
  // An untyped copy of the same type block: pins and hierarchy, no binding.
  top->CreateUntypedBlock("core_copy", alu);
  // A bidirectional pad.
  Lum_TdmBlock *io = top->CreateTypedBlock("io", pad, false, true);
  Lum_TdmSignal *padNet = Wire(top, "pad");
  top->GetPinByName("IO")->GetOrbPin()->ConnectInner(padNet->GetOrbSignal());
  Connect(io, "A", q);
  Connect(io, "PAD", padNet);
  // A network gathering the clock and the data path.
  Lum_TdmNetwork *clocks = view->CreateNetwork("clocks");
  clocks->GetOrbNetwork()->AddSignal(clk->GetOrbSignal());
  Lum_TdmNetwork *datapath = view->CreateNetwork("datapath");
  for (Lum_TdmSignal *signal : {n1, n2, q})
    datapath->GetOrbNetwork()->AddSignal(signal->GetOrbSignal());

  view->CommitAll();
  model.Save(path.c_str());

  Built built;
  CollectBindings(top, "chip", built.bindings);
  built.summary =
      "  chip/u1         GATES:NAND2  typed, with its pins, wired to a, b, n1\n"
      "  chip/spare      GATES:INV    typed, without pins\n"
      "  chip/reg        GATES:DFF    typed through a pin map: DATA=D, CLOCK=CK, OUT=Q\n"
      "  chip/core       CORES:ALU    typed, hierarchy grafted beneath: g1 GATES:NAND2, g2 "
      "GATES:INV\n"
      "  chip/core_copy  -            untyped copy of CORES:ALU; its copied hierarchy is "
      "untyped too\n"
      "  chip/io         GATES:IOPAD  typed, inputs A and EN, bidirectional PAD on the top's IO\n"
      "  networks: clocks (clk), datapath (n1, n2, q)\n";
  return built;
}

std::string MakeDirectory(std::string const &requested) {
  std::string directory = requested;
  if (directory.empty()) {
    // A new folder per run, so that no earlier result is overwritten.
    std::string pattern = "tdm_demo_XXXXXX";
    if (!::mkdtemp(pattern.data()))
      throw Failure(kExitUnreadable, "cannot make a folder in the current directory: " +
                                         std::string(std::strerror(errno)));
    directory = pattern;
  } else {
    std::error_code error;
    std::filesystem::create_directories(directory, error);
    if (error)
      throw Failure(kExitUnreadable, directory + ": cannot make the folder: " + error.message());
  }
  directory = std::filesystem::absolute(directory).lexically_normal().string();
  if (directory.size() > 1 && directory.back() == '/')
    directory.pop_back();
  return directory;
}

} // namespace

int RunDemo(DemoOptions const &demo, CommonOptions const &options) {
  std::string const directory = MakeDirectory(demo.dir);
  std::string const database = directory + "/" + kDatabaseFile;
  // The libraries written here come first, before --lib-path and LUM_TLM_PATH.
  Lum_TlmCatalog::AddSearchDirectory(directory.c_str());
  ApplyLibraryPath(options);

  Built built;
  try {
    WriteGates(directory + "/GATES.tlm");
    WriteCores(directory + "/CORES.tlm");
    built = WriteDesign(database);
  } catch (Port::Exception const &e) {
    throw Failure(kExitUnreadable, directory + ": writing the demo failed: " + Describe(e));
  }

  std::unique_ptr<Lum_TdmModel> model = OpenTyped(database, options);
  Orb_View *hostView = SelectViews(*model, database, kViewName).front();
  auto *view = static_cast<Lum_TdmView *>(model->Specialize(hostView));
  Bindings reopened;
  CollectBindings(view->GetBlock(), "chip", reopened);
  std::vector<std::string> lost;
  // Pins that opening created, by block: those of blocks typed without pins.
  std::map<std::string, std::string> created;
  for (auto const &[what, binding] : built.bindings) {
    auto const found = reopened.find(what);
    if (found != reopened.end() && found->second == binding)
      continue;
    std::string line = what;
    line += ": " + binding + " before, ";
    line += found == reopened.end() ? "missing" : found->second;
    lost.push_back(line + " after");
  }
  for (auto const &entry : reopened) {
    std::string const &what = entry.first;
    std::size_t const dot = what.rfind('.');
    if (!built.bindings.count(what) && dot != std::string::npos)
      created[what.substr(0, dot)] +=
          (created[what.substr(0, dot)].empty() ? "" : ", ") + what.substr(dot + 1);
  }

  if (options.quiet) {
    std::printf("%s\n", directory.c_str());
  } else {
    std::printf("tdm demo: wrote into %s\n", directory.c_str());
    std::printf("  GATES.tlm   type library GATES 1.2 (sample std): NAND2, INV, DFF, IOPAD\n");
    std::printf("  CORES.tlm   type library CORES 2.0 (sample): ALU, with a hierarchy for view "
                "netlist\n");
    std::printf("  %s    design demo/chip, view netlist, device %s part %s\n", kDatabaseFile,
                kPersonality, kPart);
    std::printf("built, committed and saved:\n%s", built.summary.c_str());
    std::printf("reopened in a fresh model: %zu of %zu bindings (blocks and pins) came back\n",
                built.bindings.size() - lost.size(), built.bindings.size());
    for (auto const &[block, pins] : created)
      std::printf("  and opening gave %s the pins of its type block: %s\n", block.c_str(),
                  pins.c_str());
    std::fflush(stdout);
    Port::FileStream out(stdout);
    view->DbgReportSize(&out);
    std::printf("look at it with (or put %s on LUM_TLM_PATH):\n", directory.c_str());
    char const *program = demo.program.c_str();
    for (char const *command : {"info", "check", "tree --pins"})
      std::printf("  %s %s --lib-path %s %s\n", program, command, directory.c_str(),
                  database.c_str());
    std::printf("  %s dot --lib-path %s %s | dot -Tsvg -o %s/chip.svg\n", program,
                directory.c_str(), database.c_str(), directory.c_str());
  }
  if (!lost.empty()) {
    for (std::string const &line : lost)
      std::fprintf(stderr, "tdm demo: binding not restored: %s\n", line.c_str());
    return kExitProblems;
  }
  return kExitOk;
}

} // namespace tdm

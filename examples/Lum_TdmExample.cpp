// Builds a small typed design, saves its design database, reopens it in a
// fresh client model and prints what it found. What it writes stays.
//
// Usage:
//   Lum_TdmExample                  writes into a new folder lum_example_XXXXXX
//                                   in the current directory
//   Lum_TdmExample DIRECTORY        writes into DIRECTORY (made if missing)
//   Lum_TdmExample --open DIRECTORY reopens what an earlier run wrote there

#include "Lum_TdmBlock.h"
#include "Lum_TdmDesign.h"
#include "Lum_TdmDesignMgr.h"
#include "Lum_TdmModel.h"
#include "Lum_TdmNetwork.h"
#include "Lum_TdmPin.h"
#include "Lum_TdmSignal.h"
#include "Lum_TdmView.h"

#include "Lum_TdmSchema.h"
#include "Lum_Tlm.h"

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <string>
#include <vector>

namespace {

// Writes a type library with two type blocks to <directory>/CELLS.tlm.
void WriteCellLibrary(std::string const &directory) {
  Lum_TlmModel model("CELLS", "CELLS", "", false);
  Lum_TlmLibrary *library = model.CreateLibrary("CELLS", 2, 1, "generic");
  Lum_TlmBlock *nand = library->CreateTypeBlock("NAND2");
  nand->CreatePin("A", Orb_Pin::PIN_INPUT);
  nand->CreatePin("B", Orb_Pin::PIN_INPUT);
  nand->CreatePin("Y", Orb_Pin::PIN_OUTPUT);
  Lum_TlmBlock *dff = library->CreateTypeBlock("DFF");
  dff->CreatePin("D", Orb_Pin::PIN_INPUT);
  dff->CreatePin("CK", Orb_Pin::PIN_INPUT);
  dff->CreatePin("Q", Orb_Pin::PIN_OUTPUT);
  library->Save((directory + "/CELLS.tlm").c_str());
}

// Builds design "counter" with view "netlist" and saves it.
void WriteDesign(std::string const &path) {
  Lum_TdmModel model("example", "example_db", path.c_str());
  Lum_TdmDesignMgr *designMgr = model.CreateDesignMgr("work");
  Lum_TdmDesign *design = designMgr->CreateDesign("counter");
  Lum_TdmView *view = design->CreateView("netlist");
  view->CreatePropertyString(Lum_TdmSchema::kDevicePm, "generic");
  view->CreatePropertyString(Lum_TdmSchema::kDevicePart, "part0");
  view->CreatePropertyStringList(Lum_TdmSchema::kTypeLibraries)->AppendString("CELLS");

  Lum_TdmBlock *top = view->CreateTopBlock("counter");
  Lum_TdmPin *clock = top->CreatePin("clk", Orb_Pin::PIN_INPUT);
  Lum_TdmPin *out = top->CreatePin("q", Orb_Pin::PIN_OUTPUT);
  Lum_TdmSignal *clockNet = top->CreateSignal("clk_net");
  Lum_TdmSignal *outNet = top->CreateSignal("q_net");
  // The top block's pins connect inside, to signals of the top block; the
  // child blocks' pins connect outside, to the same signals.
  clock->GetOrbPin()->ConnectInner(clockNet->GetOrbSignal());
  out->GetOrbPin()->ConnectInner(outNet->GetOrbSignal());

  for (char const *name : {"bit0", "bit1"}) {
    Lum_TdmBlock *bit = top->CreateBlock(name, 0);
    bit->CreatePin("CK", Orb_Pin::PIN_INPUT)->GetOrbPin()->Connect(clockNet->GetOrbSignal());
    bit->CreatePin("Q", Orb_Pin::PIN_OUTPUT);
  }
  top->GetBlockByName("bit1")->GetPinByName("Q")->GetOrbPin()->Connect(outNet->GetOrbSignal());

  Lum_TdmNetwork *clocks = view->CreateNetwork("clocks");
  clocks->GetOrbNetwork()->AddSignal(clockNet->GetOrbSignal());

  view->CommitAll();
  model.Save(path.c_str());
}

void PrintBlock(Lum_TdmBlock *block, int depth) {
  std::printf("%*sblock %s\n", depth * 2, "", block->GetName());
  for (std::size_t i = 0; i < block->GetPins().size(); ++i) {
    Lum_TdmPin *pin = block->GetPin(i);
    Orb_Signal const *outside = pin->GetSignal();
    Orb_Signal const *inside = pin->GetInnerSignal();
    std::printf("%*s  pin %s (%s)%s%s%s%s\n", depth * 2, "", pin->GetName(),
                Orb_PinDirectionName(pin->GetDirection()), outside ? ", outside " : "",
                outside ? outside->GetName() : "", inside ? ", inside " : "",
                inside ? inside->GetName() : "");
  }
  for (std::size_t i = 0; i < block->GetSignals().size(); ++i)
    std::printf("%*s  signal %s\n", depth * 2, "", block->GetSignal(i)->GetName());
  for (std::size_t i = 0; i < block->GetBlocks().size(); ++i)
    PrintBlock(block->GetBlock(i), depth + 1);
}

// Reopens the database in a fresh model and prints it.
void ReadDesign(std::string const &path) {
  Lum_TdmModel model("reader", "example_db", path.c_str());
  model.Open(path.c_str());
  Orb_Model *host = model.GetOrbModel();
  for (Orb_DesignMgr *designMgr : host->GetDesignMgrs()) {
    std::printf("design manager %s\n", designMgr->GetName());
    for (Orb_Design *hostDesign : designMgr->GetDesigns()) {
      auto *design = static_cast<Lum_TdmDesign *>(model.GetClient(hostDesign));
      std::printf(" design %s (%s)\n", design->GetName(),
                  design->IsUserDesign() ? "user design" : "not a user design");
      for (Orb_View *hostView : hostDesign->GetViews()) {
        auto *view = static_cast<Lum_TdmView *>(model.GetClient(hostView));
        unsigned version = 0;
        unsigned revision = 0;
        view->GetTdmLoadedDesignVersion(version, revision);
        std::printf(" view %s, format %u.%u\n", view->GetName(), version, revision);
        std::vector<Lum_TlmLibrary const *> libraries;
        view->GetLibraries(libraries);
        for (Lum_TlmLibrary const *library : libraries) {
          library->GetTlmVersion(version, revision);
          std::printf("  type library %s %u.%u\n", library->GetLibraryName(), version, revision);
        }
        if (Lum_TdmBlock *top = view->GetBlock())
          PrintBlock(top, 1);
        for (std::size_t i = 0; i < hostView->GetNetworks().size(); ++i) {
          Lum_TdmNetwork *network = view->GetNetwork(i);
          std::printf("  network %s:", network->GetName());
          for (Orb_Signal *signal : network->GetSignals())
            std::printf(" %s", signal->GetName());
          std::printf("\n");
        }
      }
    }
  }
}

void PrintUsage(char const *program) {
  std::fprintf(stderr,
               "usage: %s [DIRECTORY]\n"
               "       %s --open DIRECTORY\n"
               "Writes a type library and a design database into DIRECTORY (by default a new\n"
               "folder lum_example_XXXXXX in the current directory), then reopens and prints\n"
               "the design. With --open it only reopens and prints what is in DIRECTORY.\n",
               program, program);
}

} // namespace

int main(int argc, char **argv) {
  std::string const first = argc > 1 ? argv[1] : "";
  bool const open = first == "--open";
  if (first == "-h" || first == "--help") {
    PrintUsage(argv[0]);
    return 0;
  }
  if ((open && argc != 3) || (!open && argc > 2) || (!open && !first.empty() && first[0] == '-')) {
    PrintUsage(argv[0]);
    return 2;
  }

  try {
    std::string directory;
    if (open) {
      directory = argv[2];
    } else if (argc > 1) {
      directory = argv[1];
      std::filesystem::create_directories(directory);
    } else {
      // A new folder per run, so that no earlier result is overwritten.
      std::string pattern = "lum_example_XXXXXX";
      if (!::mkdtemp(pattern.data())) {
        std::perror("error: cannot make a folder in the current directory");
        return 1;
      }
      directory = pattern;
    }
    directory = std::filesystem::absolute(directory).lexically_normal().string();
    if (directory.size() > 1 && directory.back() == '/')
      directory.pop_back();
    std::string const database = directory + "/counter.odb";
    // The design's blocks are typed from CELLS.tlm, looked up in the same folder.
    Lum_TlmCatalog::AddSearchDirectory(directory.c_str());

    if (!open) {
      WriteCellLibrary(directory);
      WriteDesign(database);
      std::printf("saved %s and %s/CELLS.tlm\n", database.c_str(), directory.c_str());
    }
    ReadDesign(database);
    if (!open)
      std::printf("kept in %s; to look at it again:\n  %s --open %s\n", directory.c_str(), argv[0],
                  directory.c_str());
  } catch (std::exception const &e) {
    // Port::Exception's what() names the object and the source of the error.
    std::fprintf(stderr, "error: %s\n", e.what());
    return 1;
  }
  return 0;
}

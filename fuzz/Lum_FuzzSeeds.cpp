// Writes the seed corpus of every fuzz target into DIRECTORY/<target>/:
//   Lum_FuzzSeeds DIRECTORY
// Design databases and library files come from the same code that callers
// use; the structured targets get fixed byte patterns.

#include "Lum_FuzzSupport.h"
#include "Lum_TdmSchema.h"

#include <cstdint>
#include <cstdio>
#include <filesystem>
#include <random>
#include <string>

namespace {

namespace fs = std::filesystem;

// A typed design: LIBT and the local library listed, a REG block with mapped
// pins, an ABC block without pins, a LOC block of the local library, a REG
// with its hierarchy grafted under it, and a second view without libraries.
void WriteTypedDesign(std::string const &path, bool dontCreatePins) {
  Lum_TdmModel model("seed", "seeddb", "");
  Lum_TdmDesign *design = model.CreateDesignMgr("dm")->CreateDesign("top");
  Lum_TdmView *view = design->CreateView("netlist");
  view->CreatePropertyString(Lum_TdmSchema::kDevicePm, "pm1");
  view->CreatePropertyString(Lum_TdmSchema::kDevicePart, "part1");
  Orb_Property *libraries = view->CreatePropertyStringList(Lum_TdmSchema::kTypeLibraries);
  libraries->AppendString("LIBT 2.1 q1");
  libraries->AppendString(Lum_TlmLibrary::LOCAL_LIBRARY_NAME);
  if (dontCreatePins)
    view->CreatePropertyString(Lum_TdmSchema::kDontCreateUnusedPins, "");
  Lum_TlmLibrary *local =
      Lum_TlmLibrary::GetLocalLibrary(model.GetOrbModel(), PM_PIC("pm1", "part1", nullptr));
  Lum_TlmBlock *loc = local->CreateTypeBlock("LOC");
  loc->CreatePin("LP", Orb_Pin::PIN_INPUT);

  Lum_TdmBlock *top = view->CreateTopBlock("top");
  Lum_TdmPin *in = top->CreatePin("in", Orb_Pin::PIN_INPUT);
  Lum_TdmSignal *signal = top->CreateSignal("s");
  in->GetOrbPin()->ConnectInner(signal->GetOrbSignal());
  Lum_TdmBlock *reg = top->CreateBlock("u1", 0);
  for (char const *name : {"DATA0", "CLK", "DATA1"})
    reg->CreatePin(name, Orb_Pin::PIN_INPUT)->GetOrbPin()->Connect(signal->GetOrbSignal());
  reg->CreatePropertyString(Lum_TdmSchema::kBlockType, "LIBT:REG");
  Orb_Property *pinMap = reg->CreatePropertyList(Lum_TdmSchema::kBlockPinMap);
  pinMap->CreatePropertyString("DATA0", "D0");
  pinMap->CreatePropertyString("DATA1", "D1");
  top->CreateBlock("u2", 0)->CreatePropertyString(Lum_TdmSchema::kBlockType, "LIBT:ABC");
  Lum_TdmBlock *localBlock = top->CreateBlock("u3", 0);
  localBlock->CreatePin("LP", Orb_Pin::PIN_INPUT);
  localBlock->CreatePropertyString(
      Lum_TdmSchema::kBlockType,
      (std::string(Lum_TlmLibrary::LOCAL_LIBRARY_NAME) + ":LOC").c_str());
  Lum_TdmBlock *grafted = top->CreateBlock("u4", 0);
  grafted->CreatePin("D0", Orb_Pin::PIN_INPUT);
  Ora_GraftMgr graft(false, false);
  graft.Graft(LumFuzz::TheLibrary().Reg()->GetHier("netlist"), grafted->GetOrbBlock());
  grafted->CreatePropertyString(Lum_TdmSchema::kBlockType, "LIBT:REG");
  design->CreateView("schematic")->CreateTopBlock("top")->CreateBlock("x", 0);
  model.Save(path.c_str());
}

// An untyped design of one block, and an empty database.
void WritePlainDesigns(std::string const &directory) {
  Lum_TdmModel plain("seed", "seeddb", "");
  plain.CreateDesignMgr("dm")->CreateDesign("d")->CreateView("v")->CreateTopBlock("t")->CreatePin(
      "p", Orb_Pin::PIN_OUTPUT);
  plain.Save((directory + "/plain.odb").c_str());
  Lum_TdmModel empty("seed", "seeddb", "");
  empty.Save((directory + "/empty.odb").c_str());
}

// Library files named FZ: one with the type block CELL (A, B, Y) and a
// hierarchy, one without CELL, and one of another library's name.
void WriteLibraries(std::string const &directory) {
  {
    Lum_TlmModel model("FZ", "FZ", "", false);
    Lum_TlmLibrary *library = model.CreateLibrary("FZ", 1, 0, "q1", "q2");
    Lum_TlmBlock *cell = library->CreateTypeBlock("CELL");
    cell->CreatePin("A", Orb_Pin::PIN_INPUT);
    cell->CreatePin("B", Orb_Pin::PIN_INPUT);
    cell->CreatePin("Y", Orb_Pin::PIN_OUTPUT);
    cell->CreateHier("netlist")->CreatePin("A", Orb_Pin::PIN_INPUT);
    library->CreateTypeBlock("OTHER")->CreatePin("Z", Orb_Pin::PIN_BIDIRECTIONAL);
    library->Save((directory + "/cell.tlm").c_str());
  }
  {
    Lum_TlmModel model("FZ", "FZ", "", false);
    model.CreateLibrary("FZ", 3, 7)->CreateTypeBlock("ELSE");
    model.GetLibrary()->Save((directory + "/nocell.tlm").c_str());
  }
  {
    Lum_TlmModel model("XY", "XY", "", false);
    model.CreateLibrary("XY", 1, 0)->CreateTypeBlock("CELL");
    model.GetLibrary()->Save((directory + "/othername.tlm").c_str());
  }
}

// Byte patterns for the targets that read structure from their bytes.
void WritePatterns(std::string const &directory, unsigned seed) {
  std::mt19937 random(seed);
  for (int n = 0; n < 8; ++n) {
    std::string bytes(static_cast<std::size_t>(16 << (n % 4)), '\0');
    for (char &byte : bytes)
      byte = static_cast<char>(n == 0 ? 0 : n == 1 ? 0xff : random() & 0xff);
    std::FILE *file = std::fopen((directory + "/pattern" + std::to_string(n)).c_str(), "wb");
    LumFuzz::Check(file && std::fwrite(bytes.data(), 1, bytes.size(), file) == bytes.size(),
                   "cannot write a pattern");
    std::fclose(file);
  }
}

} // namespace

int main(int argc, char **argv) {
  if (argc != 2) {
    std::fprintf(stderr, "usage: %s DIRECTORY\n", argv[0]);
    return 2;
  }
  std::string const root = argv[1];
  try {
    for (char const *target : {"open_bytes", "typed_values", "type_library", "caller_ops"})
      fs::create_directories(root + "/" + target);
    WriteTypedDesign(root + "/open_bytes/typed.odb", false);
    WriteTypedDesign(root + "/open_bytes/typed_nopins.odb", true);
    WritePlainDesigns(root + "/open_bytes");
    WriteLibraries(root + "/type_library");
    WritePatterns(root + "/typed_values", 1);
    WritePatterns(root + "/caller_ops", 2);
  } catch (std::exception const &e) {
    std::fprintf(stderr, "%s\n", e.what());
    return 1;
  }
  return 0;
}

// Opens a design whose view lists the type library FZ, whose file holds the
// fuzzer's bytes. Every failure must leave the model empty and the library
// unloaded; a design that opens is committed, saved and reopened with the
// same typing.

#include "Lum_FuzzSupport.h"
#include "Lum_TdmSchema.h"

#include <cstddef>
#include <cstdint>

namespace {

// A design "dm/top/netlist" listing FZ and the in-memory LIBT, with a block
// of type FZ:CELL (pins A, B connected, Y open) and one of type LIBT:ABC.
std::string WriteDesign() {
  std::string path = LumFuzz::TheScratch().File("design.odb");
  Lum_TdmModel model("fuzz", "fuzzdb", "");
  Lum_TdmView *view = model.CreateDesignMgr("dm")->CreateDesign("top")->CreateView("netlist");
  view->CreatePropertyString(Lum_TdmSchema::kDevicePm, "pm1");
  view->CreatePropertyString(Lum_TdmSchema::kDevicePart, "part1");
  Orb_Property *libraries = view->CreatePropertyStringList(Lum_TdmSchema::kTypeLibraries);
  libraries->AppendString("FZ 1.0");
  libraries->AppendString("LIBT 2.1");
  Lum_TdmBlock *top = view->CreateTopBlock("top");
  Lum_TdmSignal *signal = top->CreateSignal("s");
  Lum_TdmBlock *cell = top->CreateBlock("u1", 0);
  for (char const *name : {"A", "B", "Y"}) {
    Lum_TdmPin *pin = cell->CreatePin(name, Orb_Pin::PIN_INPUT);
    if (name[0] != 'Y')
      pin->GetOrbPin()->Connect(signal->GetOrbSignal());
  }
  cell->CreatePropertyString(Lum_TdmSchema::kBlockType, "FZ:CELL");
  top->CreateBlock("u2", 0)->CreatePropertyString(Lum_TdmSchema::kBlockType, "LIBT:ABC");
  model.Save(path.c_str());
  return path;
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const *data, std::size_t size) {
  LumFuzz::TheLibrary();
  static std::string const design = WriteDesign();
  static bool const searched =
      (Lum_TlmCatalog::AddSearchDirectory(LumFuzz::TheScratch().Path().c_str()), true);
  (void)searched;
  if (size > (std::size_t(1) << 20))
    return 0;
  Port_MsgCapture quiet;
  LumFuzz::WriteFile(LumFuzz::TheScratch().File("FZ.tlm"), data, size);

  {
    Lum_TdmModel model("fuzz", "fuzzdb", "");
    if (!LumFuzz::Attempt("open", [&] { model.Open(design.c_str()); }))
      LumFuzz::CheckEmptyAfterRefusal(model);
    else
      LumFuzz::CommitSaveReopen(model, LumFuzz::TheScratch().File("saved.odb"),
                                LumFuzz::Reopen::UnlessPinsWereHeldBack);
  }
  LumFuzz::Check(!Lum_TlmCatalog::IsLoaded("FZ"), "the library FZ stays loaded");
  return 0;
}

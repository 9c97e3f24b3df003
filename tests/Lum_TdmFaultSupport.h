#pragma once

// The small typed design that the fault-injection tests open again and
// again, and what a refused open must leave unchanged.

#include "Lum_TdmTestSupport.h"

#include "Lum_TdmSchema.h"
#include "Lum_Tlm.h"
#include "Ora_GraftMgr.h"

#include <filesystem>
#include <string>

namespace lumtest {

// Type libraries and a design database that uses every road of a typed open:
// the in-memory library LIBT, the library file CELLS on the search path and
// the database's local library; a block bound through a pin map that gains
// its missing pins and is sorted, a block with a grafted hierarchy, a block
// of the local library, connections, a network and a second view.
class FaultDesign {
public:
  FaultDesign() : m_Libt("LIBT", 2, 1) {
    Lum_TlmBlock *reg = m_Libt.AddTypeBlock("REG", {"D0", "D1", "CLK"});
    reg->CreatePin("Q", Orb_Pin::PIN_OUTPUT);
    Lum_TlmBlock *hier = reg->CreateHier("netlist");
    hier->CreatePin("D0", Orb_Pin::PIN_INPUT);
    hier->CreateBlock("ff", 0)->CreatePin("D", Orb_Pin::PIN_INPUT);
    {
      Lum_TlmModel cells("CELLS", "CELLS", "", false);
      Lum_TlmBlock *nand = cells.CreateLibrary("CELLS", 1, 0)->CreateTypeBlock("NAND");
      nand->CreatePin("A", Orb_Pin::PIN_INPUT);
      nand->CreatePin("Y", Orb_Pin::PIN_OUTPUT);
      cells.GetLibrary()->Save(m_Dir.File("CELLS.tlm").c_str());
    }
    Lum_TlmCatalog::AddSearchDirectory(m_Dir.Path().c_str());

    TypedDesign design;
    Orb_Property *libraries =
        design.m_pView->CreatePropertyStringList(Lum_TdmSchema::kTypeLibraries);
    libraries->AppendString("LIBT 2.1");
    libraries->AppendString("CELLS 1.0");
    libraries->AppendString(Lum_TlmLibrary::LOCAL_LIBRARY_NAME);
    Lum_TlmLibrary::GetLocalLibrary(design.Host(), PM_PIC("pm1", "part1", nullptr))
        ->CreateTypeBlock("LOC")
        ->CreatePin("L", Orb_Pin::PIN_INPUT);
    Lum_TdmBlock *top = design.m_pView->CreateTopBlock("top");
    Lum_TdmSignal *signal = top->CreateSignal("s");
    design.m_pView->CreateNetwork("n")->GetOrbNetwork()->AddSignal(signal->GetOrbSignal());
    Lum_TdmBlock *u1 = top->CreateBlock("u1", 0);
    for (char const *name : {"DATA0", "CLK"})
      u1->CreatePin(name, Orb_Pin::PIN_INPUT)->GetOrbPin()->Connect(signal->GetOrbSignal());
    u1->CreatePropertyString(Lum_TdmSchema::kBlockType, "LIBT:REG");
    u1->CreatePropertyList(Lum_TdmSchema::kBlockPinMap)->CreatePropertyString("DATA0", "D0");
    Lum_TdmBlock *u2 = top->CreateBlock("u2", 0);
    u2->CreatePin("A", Orb_Pin::PIN_INPUT)->GetOrbPin()->Connect(signal->GetOrbSignal());
    u2->CreatePropertyString(Lum_TdmSchema::kBlockType, "CELLS:NAND");
    Lum_TdmBlock *u3 = top->CreateBlock("u3", 0);
    u3->CreatePropertyString(Lum_TdmSchema::kBlockType,
                             (std::string(Lum_TlmLibrary::LOCAL_LIBRARY_NAME) + ":LOC").c_str());
    Lum_TdmBlock *u4 = top->CreateBlock("u4", 0);
    u4->CreatePin("D0", Orb_Pin::PIN_INPUT);
    Ora_GraftMgr(false, false).Graft(hier->GetOrbBlock(), u4->GetOrbBlock());
    u4->CreatePropertyString(Lum_TdmSchema::kBlockType, "LIBT:REG");
    design.m_pDesign->CreateView("schematic")->CreateTopBlock("s");
    design.Model().Save(Path().c_str());
  }
  ~FaultDesign() { Lum_TlmCatalog::ClearSearchDirectories(); }
  FaultDesign(FaultDesign const &) = delete;
  FaultDesign &operator=(FaultDesign const &) = delete;

  std::string Path() const { return m_Dir.File("fault.odb"); }
  std::string Scratch(char const *name) const { return m_Dir.File(name); }

  // Gives the model content of its own that a refused open must keep: a
  // design manager "keep" with a design, a view and a block with a pin.
  static void AddOwnContent(Lum_TdmModel &model) {
    Lum_TdmView *view = model.CreateDesignMgr("keep")->CreateDesign("d")->CreateView("v");
    view->CreateTopBlock("t")->CreatePin("p", Orb_Pin::PIN_INPUT);
  }

  // The binding of a block: its type block's tag, then each pin's name and
  // type pin in host order ("-" for none).
  static std::string Binding(Lum_TdmBlock *block) {
    std::string text = block->GetTypeBlock() ? block->GetTypeBlock()->GetUniqueTag().str() : "-";
    text += "(";
    for (std::size_t p = 0; p < block->GetPins().size(); ++p) {
      Lum_TdmPin *pin = block->GetPin(p);
      text += std::string(p ? "," : "") + pin->GetName() + ">" +
              (pin->GetTypePin() ? pin->GetTypePin()->GetName() : "-");
    }
    return text + ")";
  }

  static constexpr char const *kTyping =
      "u1=LIBT:REG(CLK>CLK,D1>D1,DATA0>D0,Q>Q) u2=CELLS:NAND(A>A,Y>Y) "
      "u3=Lum_LocalLibrary:LOC(L>L) u4=LIBT:REG(CLK>CLK,D0>D0,D1>D1,Q>Q) ";
  // The typing an open gives, block by block.
  static std::string Typing(Lum_TdmModel &model) {
    Lum_TdmBlock *top = model.GetDesignMgrByName("dm")
                            ->GetDesignByName("top")
                            ->GetViewByName("netlist")
                            ->GetBlock();
    std::string text;
    for (std::size_t i = 0; i < top->GetBlocks().size(); ++i)
      text += std::string(top->GetBlock(i)->GetName()) + "=" + Binding(top->GetBlock(i)) + " ";
    return text;
  }

private:
  TempDir m_Dir;
  TestLibrary m_Libt;
};

// What a refused open must leave as it was: the host objects, the clients,
// the companions and the saved bytes of the model.
struct ModelState {
  std::size_t hostObjects = 0;
  std::size_t clients = 0;
  bool hasLocalLibrary = false;
  std::string saved;

  bool operator==(ModelState const &other) const {
    return hostObjects == other.hostObjects && clients == other.clients &&
           hasLocalLibrary == other.hasLocalLibrary && saved == other.saved;
  }
};

inline std::ostream &operator<<(std::ostream &out, ModelState const &state) {
  return out << state.hostObjects << " host objects, " << state.clients << " clients, "
             << (state.hasLocalLibrary ? "a" : "no") << " local library, " << state.saved.size()
             << " bytes saved";
}

inline ModelState StateOf(Lum_TdmModel &model, std::string const &savePath) {
  ModelState state;
  Orb_Model const *host = model.GetOrbModel();
  state.hostObjects = HostObjectCount(host);
  state.clients = model.GetClientCount();
  state.hasLocalLibrary = host->GetCompanion(Lum_TlmNames::kLocalLibraryCompanion) != nullptr;
  model.Save(savePath.c_str());
  state.saved = FileBytes(savePath);
  return state;
}

inline std::string Listing(std::string const &directory) {
  std::string names;
  for (auto const &entry : std::filesystem::directory_iterator(directory))
    names += (names.empty() ? "" : " ") + entry.path().filename().string();
  return names;
}

} // namespace lumtest

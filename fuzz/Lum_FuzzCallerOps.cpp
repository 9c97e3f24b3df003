// Runs a sequence of caller operations, chosen by the fuzzer's bytes, over a
// small typed design: typed and untyped children, rebinding with and without
// pin maps, new pins, deletions, pin manifestation, commits, and saves with
// a reopen. Every call succeeds or throws an allowed exception; a failed
// rebinding leaves the block as it was; a refused creation creates nothing;
// every commit that succeeds is saved, and every save reopens with the same
// typing: nothing the library accepted may lead to a file its open refuses.

#include "Lum_FuzzSupport.h"

#include "Lum_Exception.h"
#include "Lum_TdmSchema.h"
#include "Lum_TdmTypePinMap.h"

#include <fuzzer/FuzzedDataProvider.h>

#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>
#include <vector>

namespace {

char const *const kNames[] = {"u1", "u2", "u3", "D0", "A", "Q", "x"};
char const *const kPinNames[] = {"D0", "D1", "CLK", "Q", "EN", "A", "B", "C", "L", "DATA0", "Z"};

// A library that no view lists: its type blocks are refused.
class Stranger {
public:
  Stranger() : m_Model("OTHER", "OTHER", "", false) {
    Lum_TlmBlock *block = m_Model.CreateLibrary("OTHER", 1, 0)->CreateTypeBlock("REG");
    block->CreatePin("D0", Orb_Pin::PIN_INPUT);
    m_pBlock = block;
  }
  Lum_TlmBlock const *Block() const { return m_pBlock; }

private:
  Lum_TlmModel m_Model;
  Lum_TlmBlock const *m_pBlock = nullptr;
};

PM_PIC Personality() { return PM_PIC("pm1", "part1", nullptr); }

// The design: view "netlist" listing LIBT and the local library (with LOC:
// L input, Q output), a top block with an inner signal and one REG child.
std::unique_ptr<Lum_TdmModel> MakeDesign() {
  auto model = std::make_unique<Lum_TdmModel>("fuzz", "fuzzdb", "");
  Lum_TdmView *view = model->CreateDesignMgr("dm")->CreateDesign("top")->CreateView("netlist");
  view->CreatePropertyString(Lum_TdmSchema::kDevicePm, "pm1");
  view->CreatePropertyString(Lum_TdmSchema::kDevicePart, "part1");
  Orb_Property *libraries = view->CreatePropertyStringList(Lum_TdmSchema::kTypeLibraries);
  libraries->AppendString("LIBT 2.1");
  libraries->AppendString(Lum_TlmLibrary::LOCAL_LIBRARY_NAME);
  Lum_TlmBlock *loc =
      Lum_TlmLibrary::GetLocalLibrary(model->GetOrbModel(), Personality())->CreateTypeBlock("LOC");
  loc->CreatePin("L", Orb_Pin::PIN_INPUT);
  loc->CreatePin("Q", Orb_Pin::PIN_OUTPUT);
  Lum_TdmBlock *top = view->CreateTopBlock("top");
  top->CreateSignal("s");
  top->CreateTypedBlock("u0", LumFuzz::TheLibrary().Reg(), false, true);
  return model;
}

Lum_TdmView *ViewOf(Lum_TdmModel &model) {
  return model.GetDesignMgrByName("dm")->GetDesignByName("top")->GetViewByName("netlist");
}

void CollectBlocks(Lum_TdmBlock *block, std::vector<Lum_TdmBlock *> &blocks) {
  blocks.push_back(block);
  for (std::size_t i = 0; i < block->GetBlocks().size(); ++i)
    CollectBlocks(block->GetBlock(i), blocks);
}

// The typing of one block and its pins, to compare around a rebinding.
std::string BlockTyping(Lum_TdmBlock *block) {
  std::string text = block->GetTypeBlock() ? block->GetTypeBlock()->GetUniqueTag().str() : "-";
  for (std::size_t i = 0; i < block->GetPins().size(); ++i) {
    Lum_TdmPin *pin = block->GetPin(i);
    text += std::string(" ") + pin->GetName() + ">" +
            (pin->GetTypePin() ? pin->GetTypePin()->GetName() : "-");
  }
  return text;
}

class Session {
public:
  Session(FuzzedDataProvider &in, Stranger const &stranger)
      : m_In(in), m_Stranger(stranger), m_pModel(MakeDesign()) {}

  void Run() {
    for (int step = 0; step < 32 && m_In.remaining_bytes() > 0; ++step)
      Step();
    LumFuzz::CommitSaveReopen(*m_pModel, LumFuzz::TheScratch().File("final.odb"),
                              LumFuzz::Reopen::Always);
  }

private:
  template <std::size_t N> char const *Pick(char const *const (&names)[N]) {
    return names[m_In.ConsumeIntegralInRange<std::size_t>(0, N - 1)];
  }

  // A type block of LIBT, the local library, a library the view does not
  // list, a hierarchy block (no type block at all), or null.
  Lum_TlmBlock const *TypeBlock() {
    switch (m_In.ConsumeIntegralInRange(0, 6)) {
    case 0:
    case 1:
      return LumFuzz::TheLibrary().Reg();
    case 2:
      return LumFuzz::TheLibrary().Abc();
    case 3:
      return Lum_TlmLibrary::GetLocalLibrary(m_pModel->GetOrbModel(), Personality())
          ->GetTypeBlock(Port::StringBase<char>("LOC"));
    case 4:
      return m_Stranger.Block();
    case 5:
      return LumFuzz::TheLibrary().Hier();
    default:
      return nullptr;
    }
  }

  // A map for the block's pins: each to a pin of the type block (or of
  // another, or to null) as the bytes choose; sometimes a pin is left out
  // or an extra name is mapped.
  Lum_TdmTypePinMap PinMap(Lum_TdmBlock *block, Lum_TlmBlock const *typeBlock) {
    Lum_TdmTypePinMap map;
    for (std::size_t i = 0; i < block->GetPins().size(); ++i) {
      int const how = m_In.ConsumeIntegralInRange(0, 7);
      if (how == 7)
        continue;
      Lum_TlmBlock const *from = how == 6 ? LumFuzz::TheLibrary().Abc() : typeBlock;
      Lum_TlmPin const *typePin = nullptr;
      if (from && how != 5 && !from->GetPins().empty())
        typePin =
            from->GetPin(m_In.ConsumeIntegralInRange<std::size_t>(0, from->GetPins().size() - 1));
      map.SetPinMap(block->GetPin(i), typePin);
    }
    if (m_In.ConsumeIntegralInRange(0, 7) == 0)
      map.SetPinMap(Port::StringBase<char>(Pick(kPinNames)), nullptr);
    return map;
  }

  void Step() {
    std::vector<Lum_TdmBlock *> blocks;
    CollectBlocks(ViewOf(*m_pModel)->GetBlock(), blocks);
    Lum_TdmBlock *block = blocks[m_In.ConsumeIntegralInRange<std::size_t>(0, blocks.size() - 1)];
    switch (m_In.ConsumeIntegralInRange(0, 11)) {
    case 0:
    case 1: {
      if (blocks.size() > 24)
        return;
      char const *name = Pick(kNames);
      Lum_TlmBlock const *typeBlock = TypeBlock();
      bool const graft = m_In.ConsumeBool();
      bool const pins = m_In.ConsumeBool();
      std::size_t const children = block->GetBlocks().size();
      try {
        LumFuzz::Attempt("CreateTypedBlock", [&] {
          try {
            block->CreateTypedBlock(name, typeBlock, graft, pins);
          } catch (Lum_Exception const &) {
            LumFuzz::Check(block->GetBlocks().size() == children,
                           "a refused CreateTypedBlock created a child");
            throw;
          }
        });
      } catch (...) {
        throw;
      }
      return;
    }
    case 2: {
      if (blocks.size() > 24)
        return;
      char const *name = Pick(kNames);
      Lum_TlmBlock const *typeBlock = TypeBlock();
      LumFuzz::Attempt("CreateUntypedBlock", [&] { block->CreateUntypedBlock(name, typeBlock); });
      return;
    }
    case 3: {
      Lum_TlmBlock const *typeBlock = TypeBlock();
      std::string const before = BlockTyping(block);
      if (!LumFuzz::Attempt("SetTypeBlock", [&] { block->SetTypeBlock(typeBlock); }))
        LumFuzz::Check(BlockTyping(block) == before, "a failed SetTypeBlock changed the block: " +
                                                         before + " became " + BlockTyping(block));
      return;
    }
    case 4: {
      Lum_TlmBlock const *typeBlock = TypeBlock();
      Lum_TdmTypePinMap const map = PinMap(block, typeBlock);
      std::string const before = BlockTyping(block);
      if (!LumFuzz::Attempt("SetTypeBlock with a pin map",
                            [&] { block->SetTypeBlock(typeBlock, map); }))
        LumFuzz::Check(BlockTyping(block) == before,
                       "a failed SetTypeBlock with a pin map changed the block: " + before +
                           " became " + BlockTyping(block));
      return;
    }
    case 5:
      if (Lum_TdmBlock *parent = block->GetParent())
        parent->DeleteBlock(block->GetOrbBlock());
      return;
    case 6: {
      char const *name = Pick(kPinNames);
      bool const connect = m_In.ConsumeBool();
      LumFuzz::Attempt("CreatePin", [&] {
        Lum_TdmPin *pin = block->CreatePin(name, Orb_Pin::PIN_INPUT);
        if (connect && block->GetParent() && !block->GetParent()->GetSignals().empty())
          pin->GetOrbPin()->Connect(block->GetParent()->GetOrbBlock()->GetSignals().front());
      });
      return;
    }
    case 7:
      LumFuzz::Attempt(m_In.ConsumeBool() ? "ManifestAllTypedPins" : "NormalizePins", [&] {
        block->ManifestAllTypedPins();
        block->NormalizePins();
      });
      return;
    case 8:
      // The commit, saved and reopened beside: the session goes on with
      // this model.
      LumFuzz::CommitSaveReopen(*m_pModel, LumFuzz::TheScratch().File("commit.odb"),
                                LumFuzz::Reopen::Always);
      return;
    case 9: {
      // A pin removed after the binding.
      auto const pins = block->GetPins();
      if (!pins.empty())
        block->DeletePin(pins[m_In.ConsumeIntegralInRange<std::size_t>(0, pins.size() - 1)]);
      return;
    }
    case 10: {
      // An existing pin connected after the binding.
      auto const pins = block->GetPins();
      Lum_TdmBlock *parent = block->GetParent();
      if (pins.empty() || !parent || parent->GetSignals().empty())
        return;
      Orb_Pin *pin = pins[m_In.ConsumeIntegralInRange<std::size_t>(0, pins.size() - 1)];
      if (!pin->GetSignal())
        pin->Connect(parent->GetOrbBlock()->GetSignals().front());
      return;
    }
    default:
      if (auto reopened = LumFuzz::CommitSaveReopen(
              *m_pModel, LumFuzz::TheScratch().File("step.odb"), LumFuzz::Reopen::Always))
        m_pModel = std::move(reopened);
      return;
    }
  }

  FuzzedDataProvider &m_In;
  Stranger const &m_Stranger;
  std::unique_ptr<Lum_TdmModel> m_pModel;
};

} // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const *data, std::size_t size) {
  LumFuzz::TheLibrary();
  static Stranger const stranger;
  Port_MsgCapture quiet;
  FuzzedDataProvider in(data, size);
  Session(in, stranger).Run();
  return 0;
}

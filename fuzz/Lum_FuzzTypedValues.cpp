// Opens a valid typed design whose typing values come from the fuzzer: the
// view's TDS_TDM_VERSION, TDS_VIEW_TYPE_LIBS and LUM_DONT_CREATE_UNUSED_PINS,
// the design's TDS_DESIGN_TYPE, and each block's TDS_BLOCK_TYPE and
// TDS_BLOCK_PIN_MAP. Each value is absent, one of the meaningful texts, or
// bytes of the fuzzer. A refused open leaves the model empty; an accepted
// one is committed, saved and reopened with the same typing.

#include "Lum_FuzzSupport.h"

#include "Lum_TdmSchema.h"
#include "Orb_Exception.h"

#include <fuzzer/FuzzedDataProvider.h>

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

namespace {

using Choices = std::vector<char const *>;

Choices const kVersions = {"3.1",
                           "3.0",
                           "2.9",
                           "0.3",
                           "0.2",
                           "3.2",
                           "4.0",
                           "3",
                           "",
                           "-1.0",
                           "99999999999999999999.1",
                           "4294967296.0",
                           " 3.1"};
Choices const kLibraryEntries = {"LIBT 2.1", "LIBT",  "LIBT 9.9 q1 q2", "NOPE 1.0",
                                 "",         " LIBT", "LIBT:REG",       "libt 2.1"};
Choices const kDesignTypes = {Lum_TdmSchema::kDesignTypeUser, Lum_TdmSchema::kDesignTypeLibrary, "",
                              "TDS_DESIGN_TYPE_USER ", "tds_design_type_user"};
Choices const kBlockTypes = {"LIBT:REG",   "LIBT:ABC", "LIBT:",     "LIBT",      ":REG",
                             "LIBT:REG:X", "NOPE:REG", "LIBT:NOPE", "LOCAL:LOC", ""};
Choices const kPinNames = {"D0", "D1", "CLK", "Q", "EN", "A", "B", "C", "DATA0", "X", "LP", ""};

char const *Pick(FuzzedDataProvider &in, Choices const &choices) {
  return choices[in.ConsumeIntegralInRange<std::size_t>(0, choices.size() - 1)];
}

// Absent (false), a listed text or the fuzzer's bytes.
bool Value(FuzzedDataProvider &in, Choices const &choices, std::string &value) {
  switch (in.ConsumeIntegralInRange<int>(0, 3)) {
  case 0:
    return false;
  case 3:
    value = in.ConsumeRandomLengthString(40);
    return true;
  default:
    value = Pick(in, choices);
    return true;
  }
}

std::string PinName(FuzzedDataProvider &in) {
  return in.ConsumeBool() ? Pick(in, kPinNames) : in.ConsumeRandomLengthString(8);
}

// The local library's name in the texts above is "LOCAL".
std::string Localized(std::string text) {
  std::string::size_type const at = text.find("LOCAL");
  if (at != std::string::npos)
    text.replace(at, 5, Lum_TlmLibrary::LOCAL_LIBRARY_NAME);
  return text;
}

// Builds and saves the design; false when the fuzzer's names are refused by
// the host (an empty or duplicate name), which is not what this target
// explores.
bool WriteDesign(FuzzedDataProvider &in, std::string const &path) {
  Lum_TdmModel model("fuzz", "fuzzdb", "");
  Lum_TdmDesign *design = model.CreateDesignMgr("dm")->CreateDesign("top");
  Lum_TdmView *view = design->CreateView("netlist");
  std::string value;
  design->DeleteProperty(Lum_TdmSchema::kDesignType);
  if (Value(in, kDesignTypes, value))
    design->CreatePropertyString(Lum_TdmSchema::kDesignType, value.c_str());
  view->CreatePropertyString(Lum_TdmSchema::kDevicePm, "pm1");
  view->CreatePropertyString(Lum_TdmSchema::kDevicePart, "part1");
  view->DeleteProperty(Lum_TdmSchema::kVersion);
  if (Value(in, kVersions, value))
    view->CreatePropertyString(Lum_TdmSchema::kVersion, value.c_str());
  if (in.ConsumeBool())
    view->CreatePropertyString(Lum_TdmSchema::kDontCreateUnusedPins, "");
  if (in.ConsumeBool()) {
    Orb_Property *libraries = view->CreatePropertyStringList(Lum_TdmSchema::kTypeLibraries);
    for (int n = in.ConsumeIntegralInRange<int>(0, 3); n > 0; --n)
      libraries->AppendString((Value(in, kLibraryEntries, value)
                                   ? value
                                   : std::string(Lum_TlmLibrary::LOCAL_LIBRARY_NAME))
                                  .c_str());
  } else if (Value(in, kLibraryEntries, value)) {
    view->CreatePropertyString(Lum_TdmSchema::kTypeLibraries, value.c_str());
  }
  if (in.ConsumeBool()) {
    Lum_TlmLibrary *local =
        Lum_TlmLibrary::GetLocalLibrary(model.GetOrbModel(), PM_PIC("pm1", "part1", nullptr));
    Lum_TlmBlock *loc = local->CreateTypeBlock("LOC");
    loc->CreatePin("LP", Orb_Pin::PIN_INPUT);
    loc->CreatePin("A", Orb_Pin::PIN_OUTPUT);
  }

  Lum_TdmBlock *top = view->CreateTopBlock("top");
  Lum_TdmSignal *signal = top->CreateSignal("s");
  for (int b = in.ConsumeIntegralInRange<int>(1, 4); b > 0; --b) {
    Lum_TdmBlock *parent = top;
    if (in.ConsumeBool() && !top->GetBlocks().empty())
      parent = top->GetBlock(top->GetBlocks().size() - 1);
    std::string const name = "u" + std::to_string(b);
    Lum_TdmBlock *block = parent->CreateBlock(name.c_str(), 0);
    Lum_TdmSignal *outer = parent == top ? signal : parent->CreateSignal(("s" + name).c_str());
    for (int p = in.ConsumeIntegralInRange<int>(0, 5); p > 0; --p) {
      std::string const pinName = PinName(in);
      if (pinName.empty() || block->GetPinByName(pinName.c_str()))
        return false;
      auto const direction = static_cast<Orb_Pin::PIN_DIRECTION>(in.ConsumeIntegralInRange(0, 2));
      Lum_TdmPin *pin = block->CreatePin(pinName.c_str(), direction);
      if (in.ConsumeBool())
        pin->GetOrbPin()->Connect(outer->GetOrbSignal());
    }
    if (Value(in, kBlockTypes, value))
      block->CreatePropertyString(Lum_TdmSchema::kBlockType, Localized(value).c_str());
    if (in.ConsumeBool()) {
      Orb_Property *pinMap = block->CreatePropertyList(Lum_TdmSchema::kBlockPinMap);
      for (int m = in.ConsumeIntegralInRange<int>(0, 4); m > 0; --m) {
        std::string const member = PinName(in);
        pinMap->CreatePropertyString(member.c_str(), PinName(in).c_str());
      }
    }
  }
  model.Save(path.c_str());
  return true;
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const *data, std::size_t size) {
  LumFuzz::TheLibrary();
  Port_MsgCapture quiet;
  FuzzedDataProvider in(data, size);
  std::string const input = LumFuzz::TheScratch().File("input.odb");
  bool written = false;
  try {
    written = WriteDesign(in, input);
  } catch (Orb_Exception const &) {
    // A name the host refuses: not this target's subject.
  }
  if (!written)
    return 0;

  Lum_TdmModel model("fuzz", "fuzzdb", "");
  if (!LumFuzz::Attempt("open", [&] { model.Open(input.c_str()); })) {
    LumFuzz::CheckEmptyAfterRefusal(model);
    return 0;
  }
  LumFuzz::CommitSaveReopen(model, LumFuzz::TheScratch().File("saved.odb"),
                            LumFuzz::Reopen::UnlessPinsWereHeldBack);
  return 0;
}

#pragma once

// The rules an open applies to a stored typed design, written once. The open
// applies each as it binds and throws at the first broken one; the verifier
// (Lum_TdmVerifier) applies them without binding and collects every broken
// one; the edits and the commit apply the pin rules to what they are about
// to store, so that nothing saved is refused by the next open. The messages
// are those of the open's exceptions.

#include "Lum_Tlm.h"
#include "Orb_Model.h"
#include "Orb_Property.h"

#include <algorithm>
#include <cstdint>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

class Lum_TdmLoadRules {
public:
  // ---- Messages of the open's exceptions

  static char const kForeignDesign[];   // Lum_ExceptionDesignLoad, the design
  static char const kOldStamp[];        // Lum_ExceptionCorruptDatabase, the design manager
  static char const kNewStamp[];        // the same
  static char const kLibraryNotFound[]; // Lum_ExceptionCorruptDatabase, the library name
  static char const kPinNotFound[];     // Lum_ExceptionCorruptDatabase, the pin

  // ---- Views

  enum class Stamp { Accepted, TooOld, TooNew };
  // Reads TDS_TDM_VERSION: fields the parse does not reach stay 0, negative
  // numbers wrap to their unsigned 32-bit value; no stamp reads as 0.0 and
  // is accepted. 0.0 to 0.2 are too old, above the current format too new.
  static Stamp ReadStamp(Orb_Property const *stamp, std::uint32_t &version,
                         std::uint32_t &revision);

  // The entries of TDS_VIEW_TYPE_LIBS: a string list, or a lone string taken
  // as one entry.
  static std::vector<std::string> LibraryEntries(Orb_Property const *property);
  // An entry's library name: its first field, leading blanks skipped. False
  // for an entry without one, which is ignored.
  static bool LibraryName(std::string const &entry, std::string &name);
  // The device personality property that a view lacks (TDS_DEVICE_PM first),
  // or null; both are needed to load a library.
  static char const *MissingDevice(Orb_View const *view);
  // The open's message for that (Lum_ExceptionInvalidLibrary, the view).
  static std::string NoDeviceMessage(char const *missing);

  // ---- Blocks

  // TDS_BLOCK_TYPE's value split: the library name is the text before the
  // first ":", the type block's name all that follows (empty without ":").
  static void SplitStoredType(std::string const &storedType, std::string &library,
                              std::string &typeBlock);
  // The open's message for a type block its library lacks
  // (Lum_ExceptionCorruptDatabase, the type block's name).
  static std::string TypeBlockMissingMessage(std::string const &typeBlock,
                                             std::string const &library);

  // ---- Pins

  // TDS_BLOCK_PIN_MAP read: design pin name to type pin name, the last
  // member of a name winning. The views point into the property.
  using NameMap = std::unordered_map<std::string_view, char const *>;
  static void ReadPinMap(Orb_Block const *block, NameMap &map);
  // The name of the type pin a stored pin looks for: the one the map gives
  // it, or its own.
  static char const *TypePinName(Orb_Pin const *pin, NameMap const &map) {
    if (!map.empty()) {
      auto const mapped = map.find(pin->GetNameString());
      if (mapped != map.end())
        return mapped->second;
    }
    return pin->GetName();
  }
  // The host pin of `typePins` (a type block's pins) that the block's i-th
  // pin looks for by TypePinName, or null. Pins mostly stand in their type
  // block's order, so the type pin at the same place is tried before the
  // lookup by name (names are unique in a block).
  static Orb_Pin *FindTypePin(Orb_Block const *typeBlock, Orb_Range<Orb_Pin> const &typePins,
                              std::size_t i, Orb_Pin const *pin, NameMap const &map) {
    std::string_view const name =
        map.empty() ? pin->GetNameString() : std::string_view(TypePinName(pin, map));
    if (i < typePins.size() && typePins[i]->GetNameString() == name)
      return typePins[i];
    return typeBlock->GetPinByName(map.empty() ? pin->GetName() : TypePinName(pin, map));
  }
  // A connected pin that finds no type pin fails the load.
  static bool IsUnmatched(Orb_Pin const *pin, Lum_TlmPin const *typePin) {
    return !typePin && pin->GetSignal();
  }
  // Whether the load gives a block the type pins nobody took: when it has
  // fewer pins than its type block and its view does not forbid it.
  static bool CreatesMissing(Lum_TlmBlock const *typeBlock, Orb_Block const *block,
                             bool forbidden) {
    return typeBlock->GetNumPins() > block->GetNumPins() && !forbidden;
  }
  // The same, reading the view's property only for a block that lacks pins.
  static bool CreatesMissing(Lum_TlmBlock const *typeBlock, Orb_Block const *block) {
    return typeBlock->GetNumPins() > block->GetNumPins() && !ForbidsCreating(block->GetView());
  }
  // Whether the view forbids creating type pins (LUM_DONT_CREATE_UNUSED_PINS).
  static bool ForbidsCreating(Orb_View const *view);
  // Calls `visit(typePin, collides)` for each type pin not in `taken` (which
  // is sorted here), in the type block's pin order. A type pin whose name a
  // pin of the block already holds collides: the load cannot create it.
  // `visit` may create the pin.
  template <class Visit>
  static void ForEachUntaken(Lum_TlmBlock const *typeBlock, Orb_Block const *block,
                             std::vector<Lum_TlmPin const *> &taken, Visit const &visit) {
    std::sort(taken.begin(), taken.end());
    std::size_t const count = typeBlock->GetPins().size();
    for (std::size_t i = 0; i < count; ++i) {
      Lum_TlmPin const *typePin = typeBlock->GetPin(i);
      if (!std::binary_search(taken.begin(), taken.end(), typePin))
        visit(typePin, block->GetPinByName(typePin->GetName()) != nullptr);
    }
  }
  // The open's message for a collision (Lum_ExceptionCorruptDatabase, the
  // design's name).
  static std::string PatchUpMessage(char const *block, char const *typePin, char const *typeBlock);

  // What the next open would do to a block whose pins are stored bound to
  // the type pins `typePinOf(pin)` gives (null: none stored, so the pin looks
  // for its own name): the first pin it would refuse, or the first type pin
  // it could not create. `createMissing` as CreatesMissing says.
  struct Refusal {
    Orb_Pin *unmatched = nullptr;
    Lum_TlmPin const *collision = nullptr;
    explicit operator bool() const { return unmatched || collision; }
  };
  template <class TypePinOf>
  static Refusal Predict(Orb_Block const *block, Lum_TlmBlock const *typeBlock, bool createMissing,
                         TypePinOf const &typePinOf) {
    Refusal refusal;
    std::vector<Lum_TlmPin const *> taken;
    for (Orb_Pin *pin : block->GetPins()) {
      Lum_TlmPin const *typePin = typePinOf(pin);
      if (IsUnmatched(pin, typePin)) {
        refusal.unmatched = pin;
        return refusal;
      }
      if (createMissing && typePin)
        taken.push_back(typePin);
    }
    if (!createMissing)
      return refusal;
    ForEachUntaken(typeBlock, block, taken, [&](Lum_TlmPin const *typePin, bool collides) {
      if (collides && !refusal.collision)
        refusal.collision = typePin;
    });
    return refusal;
  }
};

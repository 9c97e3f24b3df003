#pragma once

#include "Lum_TdmTraits.h"

#include "Port_String.h"

#include <map>
#include <string_view>

class Lum_TdmPin;
class Lum_TlmPin;

// A map from design pin names to the type pins they stand for, used to bind
// a block's pins to another type block. Names are case-sensitive and kept in
// byte order. The map owns its names, not the type pins, which belong to
// their type library; a null type pin may be stored. The default-map flag is
// kept, copied and dumped, and means nothing to the map itself.
class LUM_TDM_API Lum_TdmTypePinMap {
public:
  Lum_TdmTypePinMap();
  Lum_TdmTypePinMap(Lum_TdmTypePinMap const &other);
  Lum_TdmTypePinMap &operator=(Lum_TdmTypePinMap const &other);
  virtual ~Lum_TdmTypePinMap();

  void SetDefaultMap(bool isDefault) { m_IsDefault = isDefault; }
  bool IsDefaultMap() const { return m_IsDefault; }

  // The number of design pin names mapped.
  unsigned int GetNumPins() const;

  // Maps a design pin name to a type pin. The first entry of a name stays:
  // mapping a name again changes nothing. The pin form takes the pin's name;
  // a null design pin throws Lum_ExceptionInvalidTypeBlock and changes
  // nothing.
  void SetPinMap(Port::StringBase<char> name, Lum_TlmPin const *typePin);
  void SetPinMap(Lum_TdmPin const *designPin, Lum_TlmPin const *typePin);

  // The type pin mapped to the name, or null (also for a stored null). The
  // pin form takes the pin's name; a null design pin throws
  // Lum_ExceptionInvalidTypeBlock.
  Lum_TlmPin const *GetPinMapping(Port::StringBase<char> name) const;
  Lum_TlmPin const *GetPinMapping(Lum_TdmPin const *designPin) const;

  // Equal when both hold as many entries and each entry of this map finds
  // the same type pin (by identity) under its name in the other. A name
  // mapped to null here matches a name missing there, so with stored nulls
  // the comparison is not symmetric. The default-map flag does not count.
  bool operator==(Lum_TdmTypePinMap const &other) const;
  bool operator!=(Lum_TdmTypePinMap const &other) const { return !(*this == other); }

  // Prints the flag and every entry, in name order, through the host's
  // debug printer.
  void Dbg() const;

private:
  // Byte order of the names (that of Port::StringBase), also against a
  // string_view, so that a lookup by a pin's name builds no string.
  struct NameOrder {
    using is_transparent = void;
    bool operator()(Port::StringBase<char> const &a, Port::StringBase<char> const &b) const {
      return a < b;
    }
    bool operator()(Port::StringBase<char> const &a, std::string_view b) const {
      return std::string_view(a.str()) < b;
    }
    bool operator()(std::string_view a, Port::StringBase<char> const &b) const {
      return a < std::string_view(b.str());
    }
  };

  Lum_TlmPin const *Find(std::string_view name) const;

  bool m_IsDefault;
  std::map<Port::StringBase<char>, Lum_TlmPin const *, NameOrder> m_PinMaps;
};

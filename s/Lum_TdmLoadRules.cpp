#include "Lum_TdmLoadRules.h"

#include "Lum_TdmSchema.h"
#include "Port_String.h"

char const Lum_TdmLoadRules::kForeignDesign[] = "Attempt to specialize non-Tdm design.";
char const Lum_TdmLoadRules::kOldStamp[] = "Old design that requires conversion.";
char const Lum_TdmLoadRules::kNewStamp[] = "New design that requires newer software.";
char const Lum_TdmLoadRules::kLibraryNotFound[] = "Could not locate the specified library.";
char const Lum_TdmLoadRules::kPinNotFound[] = "Could not locate the specified pin.";

Lum_TdmLoadRules::Stamp Lum_TdmLoadRules::ReadStamp(Orb_Property const *stamp,
                                                    std::uint32_t &version,
                                                    std::uint32_t &revision) {
  version = 0;
  revision = 0;
  if (!stamp)
    return Stamp::Accepted;
  int readVersion = 0;
  int readRevision = 0;
  Port::sscanf(stamp->GetStringValue(), "%d.%d", &readVersion, &readRevision);
  version = static_cast<std::uint32_t>(readVersion);
  revision = static_cast<std::uint32_t>(readRevision);
  if (version == 0 && revision < Lum_TdmSchema::kOldestReadableRevision)
    return Stamp::TooOld;
  if (version > Lum_TdmSchema::kFormatVersion ||
      (version == Lum_TdmSchema::kFormatVersion && revision > Lum_TdmSchema::kFormatRevision))
    return Stamp::TooNew;
  return Stamp::Accepted;
}

std::vector<std::string> Lum_TdmLoadRules::LibraryEntries(Orb_Property const *property) {
  if (!property)
    return {};
  if (property->GetKind() == Orb_Property::STRING_LIST)
    return property->GetStrings();
  if (property->GetKind() == Orb_Property::STRING)
    return {std::string(property->GetValue())};
  return {};
}

bool Lum_TdmLoadRules::LibraryName(std::string const &entry, std::string &name) {
  Port::StringBase<char> const text(entry);
  std::size_t begin = 0;
  std::size_t end = 0;
  if (!text.NextTokenRange(0, " ", begin, end))
    return false;
  name = entry.substr(begin, end - begin);
  return true;
}

char const *Lum_TdmLoadRules::MissingDevice(Orb_View const *view) {
  if (!view->GetPropertyByName(Lum_TdmSchema::kDevicePm))
    return Lum_TdmSchema::kDevicePm;
  if (!view->GetPropertyByName(Lum_TdmSchema::kDevicePart))
    return Lum_TdmSchema::kDevicePart;
  return nullptr;
}

std::string Lum_TdmLoadRules::NoDeviceMessage(char const *missing) {
  return std::string("The view has no ") + missing +
         " property: the device personality is needed to load its type libraries.";
}

void Lum_TdmLoadRules::SplitStoredType(std::string const &storedType, std::string &library,
                                       std::string &typeBlock) {
  std::size_t const colon = storedType.find(':');
  library = storedType.substr(0, colon);
  typeBlock = colon == std::string::npos ? std::string() : storedType.substr(colon + 1);
}

std::string Lum_TdmLoadRules::TypeBlockMissingMessage(std::string const &typeBlock,
                                                      std::string const &library) {
  Port::StringBase<char> message;
  message.doFormat("\nCouldn't find type block <%s> in library <%s>.\n", typeBlock.c_str(),
                   library.c_str());
  return message.str();
}

void Lum_TdmLoadRules::ReadPinMap(Orb_Block const *block, NameMap &map) {
  Orb_Property const *pinMap = block->GetPropertyByName(Lum_TdmSchema::kBlockPinMap);
  if (!pinMap)
    return;
  map.reserve(pinMap->GetMembers().size());
  for (auto const &member : pinMap->GetMembers())
    map[std::string_view(member->GetName())] = member->GetStringValue();
}

bool Lum_TdmLoadRules::ForbidsCreating(Orb_View const *view) {
  return view->GetPropertyByName(Lum_TdmSchema::kDontCreateUnusedPins) != nullptr;
}

std::string Lum_TdmLoadRules::PatchUpMessage(char const *block, char const *typePin,
                                             char const *typeBlock) {
  Port::StringBase<char> message;
  message.doFormat("While trying to patch up design block <%s> with new type pin <%s>\nof "
                   "type block <%s>, found that the block already had a pin by that\nname.  "
                   "This could have been due to an earlier and inappropriate\nclient call to "
                   "pin->SetName().\n",
                   block, typePin, typeBlock);
  return message.str();
}

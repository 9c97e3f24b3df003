#include "Lum_TdmTypePinMapMgr.h"

#include "Lum_TdmTypePinMap.h"

#include "Lum_Exception.h"

#include <memory>
#include <utility>

namespace {
char const kSourcePath[] = "../s/Lum_TdmTypePinMapMgr";
char const kRevision[] = "$Revision: 1.1 $";
} // namespace

Lum_TdmTypePinMapMgr::Lum_TdmTypePinMapMgr() = default;

Lum_TdmTypePinMapMgr::~Lum_TdmTypePinMapMgr() {
  // Keys in key order, each list's maps in the order they were stored.
  for (auto &entry : m_PinMapLists)
    for (Lum_TdmTypePinMap const *map : *entry.second)
      delete map;
}

Lum_TdmTypePinMapMgr::MapList *Lum_TdmTypePinMapMgr::GetPinMapList(Port::StringBase<char> key) {
  std::unique_ptr<MapList> &list = m_PinMapLists[std::move(key)];
  if (!list)
    list = std::make_unique<MapList>();
  return list.get();
}

Lum_TdmTypePinMap const *Lum_TdmTypePinMapMgr::GetTypePinMap(Port::StringBase<char> key,
                                                             Lum_TdmTypePinMap const *map) {
  if (!map)
    throw Lum_ExceptionInvalidTypeBlock("Lum", kSourcePath, kRevision, __LINE__, key.c_str(),
                                        "Null type pin map specified in GetTypePinMap.", false);
  MapList *list = GetPinMapList(std::move(key));
  for (Lum_TdmTypePinMap const *stored : *list)
    if (*map == *stored)
      return stored;
  // Held until the list has taken it: a failed append leaks nothing.
  auto copy = std::make_unique<Lum_TdmTypePinMap>(*map);
  list->push_back(copy.get());
  return copy.release();
}

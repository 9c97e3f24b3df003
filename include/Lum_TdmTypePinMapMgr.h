#pragma once

#include "Lum_TdmTraits.h"

#include "Port_String.h"

#include <map>
#include <memory>
#include <vector>

class Lum_TdmTypePinMap;

// Keeps one shared, unchangeable copy of each distinct type pin map under a
// caller's key, so that callers building many equal maps hold one copy. The
// manager owns every map it stores and the lists that hold them; nothing is
// removed before the manager is destroyed. Keys are opaque: equal maps under
// two keys are two copies.
class LUM_TDM_API Lum_TdmTypePinMapMgr {
public:
  Lum_TdmTypePinMapMgr();
  Lum_TdmTypePinMapMgr(Lum_TdmTypePinMapMgr const &) = delete;
  Lum_TdmTypePinMapMgr &operator=(Lum_TdmTypePinMapMgr const &) = delete;
  // Destroys every stored map.
  virtual ~Lum_TdmTypePinMapMgr();

  // The stored map under `key` that equals `*map` (the first stored one that
  // compares equal with `*map` on the left), storing a copy of `*map` first
  // when there is none. The result stays valid until the manager is
  // destroyed and is never `map` itself: the caller may change or destroy its
  // own map afterwards. A null `map` throws Lum_ExceptionInvalidTypeBlock
  // with the key as object name and stores nothing.
  Lum_TdmTypePinMap const *GetTypePinMap(Port::StringBase<char> key, Lum_TdmTypePinMap const *map);

private:
  using MapList = std::vector<Lum_TdmTypePinMap const *>;
  // The list of `key`, made empty on first request.
  MapList *GetPinMapList(Port::StringBase<char> key);

  std::map<Port::StringBase<char>, std::unique_ptr<MapList>> m_PinMapLists;
};

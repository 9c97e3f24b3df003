#pragma once

#include "Orb_Model.h"

#include <unordered_map>

// Copies the contents of one block under another, possibly of another host
// model: child blocks recursively with their pins, signals, properties and
// connections, and, in the destination's view, networks for the copied
// signals. A pin of the source block itself stands for the destination's pin
// of the same name: the copy of the signal that it connected inside is
// connected to that pin's inner side; its outer side is never touched.
//
// Each graft makes its own network per source network that a copied signal
// belongs to, named "<destination path>/<source network>" (for example
// "top/u1/VCC"), with "_1", "_2", ... appended when the view has that name
// already: two grafts never share a network, nor join one of the view's.
//
// Every copy is created first (its OnCreate event fires) and only then given
// the source's properties, so a copy carries them whatever its creation
// handler removed. A name that already exists under the destination throws
// Orb_Exception; what was copied before stays.
class LUM_PLATFORM_API Ora_GraftMgr {
public:
  Ora_GraftMgr(bool blockBackReferences, bool networkBackReferences);
  Ora_GraftMgr(Ora_GraftMgr const &) = delete;
  Ora_GraftMgr &operator=(Ora_GraftMgr const &) = delete;
  virtual ~Ora_GraftMgr();

  // With back references on, the manager remembers the source of each block
  // or network it copies, for as long as the manager lives (not saved).
  void SetBlockBackReferences(bool on) { m_BlockBackReferences = on; }
  void SetNetworkBackReferences(bool on) { m_NetworkBackReferences = on; }

  // Returns true when done. A null block, a source equal to the destination
  // or a destination inside the source throws Orb_Exception before anything
  // is copied. Connections are made once every copy exists, so a graft that
  // fails part way leaves its copies unconnected.
  bool Graft(Orb_Block const *source, Orb_Block *destination);

  // Gives a copied pin its source's properties. Override to filter.
  virtual void CopyPinProperties(Orb_Pin const *source, Orb_Pin *destination);

  // The source of a copy made by this manager, or null (also when back
  // references were off).
  Orb_Block const *GetBlockSource(Orb_Block const *copy) const;
  Orb_Network const *GetNetworkSource(Orb_Network const *copy) const;

private:
  bool m_BlockBackReferences;
  bool m_NetworkBackReferences;
  std::unordered_map<Orb_Block const *, Orb_Block const *> m_BlockSources;
  std::unordered_map<Orb_Network const *, Orb_Network const *> m_NetworkSources;
};

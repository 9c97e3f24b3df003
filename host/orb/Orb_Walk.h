#pragma once

// Casts and walks over the tree of host objects (Orb_Model.h includes it).

#include "Orb_Model.h"

#include <cstddef>

// The object as a T (Orb_Block, Orb_Pin, ...) if it is of T's kind, else
// null (also for null): host objects have no virtual functions, so this
// stands in for dynamic_cast.
template <class T> T *Orb_Cast(Orb_Persistent *object) {
  return object && object->GetKind() == T::kKind ? static_cast<T *>(object) : nullptr;
}
template <class T> T const *Orb_Cast(Orb_Persistent const *object) {
  return object && object->GetKind() == T::kKind ? static_cast<T const *>(object) : nullptr;
}

// Calls `visit` on each object that `object` owns directly, in host order: a
// design manager's designs, a design's views, a view's networks and then its
// top block, a block's pins, then its signals, then its child blocks. The one
// place that knows the shape of the tree. Containers are read by index with
// their size read afresh, so a visit that removes objects (under an
// Orb_Model::FreeHold, which keeps them in memory) may make the walk miss
// some, but never read freed memory.
template <class F> void Orb_ForEachChild(Orb_Persistent *object, F const &visit) {
  auto each = [&visit](auto const &items) {
    for (std::size_t i = 0; i < items.size(); ++i)
      visit(items[i]);
  };
  switch (object->GetKind()) {
  case Orb_Kind::DesignMgr:
    each(static_cast<Orb_DesignMgr *>(object)->GetDesigns());
    break;
  case Orb_Kind::Design:
    each(static_cast<Orb_Design *>(object)->GetViews());
    break;
  case Orb_Kind::View: {
    auto *view = static_cast<Orb_View *>(object);
    each(view->GetNetworks());
    if (view->GetBlock())
      visit(view->GetBlock());
    break;
  }
  case Orb_Kind::Block: {
    auto *block = static_cast<Orb_Block *>(object);
    each(block->GetPins());
    each(block->GetSignals());
    each(block->GetBlocks());
    break;
  }
  case Orb_Kind::Pin:
  case Orb_Kind::Signal:
  case Orb_Kind::Network:
    break;
  }
}

// Visits the object and everything it owns, children before parents, each
// object after what it owns, in the order of Orb_ForEachChild. Recursion
// goes only as deep as blocks nest (Orb_MaxBlockDepth).
template <class F> void Orb_VisitPostOrder(Orb_Persistent *object, F const &visit) {
  Orb_ForEachChild(object, [&visit](Orb_Persistent *child) { Orb_VisitPostOrder(child, visit); });
  visit(object);
}

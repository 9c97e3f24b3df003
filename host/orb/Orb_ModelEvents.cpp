// Linking host objects into the tree and out of it, their load and delete
// events, and freeing them.

#include "Orb_Model.h"

#include "Orb_Derived.h"

#include <cassert>
#include <exception>
#include <vector>

void Orb_Model::Destroy(Orb_Persistent *object) noexcept {
  auto const k = static_cast<unsigned>(object->GetKind());
  // The whole table goes with the model, and so do the side properties.
  if (object->m_LongName && !m_TearingDown)
    m_Names.Release(object->m_Name.entry);
  if (object->m_HasProperties && !m_TearingDown)
    m_SideProperties.erase(object);
  switch (object->GetKind()) {
#define ORB_KIND(Kind, shown)                                                                      \
  case Orb_Kind::Kind:                                                                             \
    static_cast<Orb_##Kind *>(object)->~Orb_##Kind();                                              \
    break;
#include "Orb_Kinds.def"
  }
  --m_ObjectCount[k];
  if (!m_TearingDown)
    m_Pools[k].Release(object);
}

void Orb_Model::AnnounceLoad(Orb_Persistent *object) {
  // A handler may have deleted it before its turn came.
  if (object->m_Dying)
    return;
  for (std::size_t i = 0; i < m_Subscribers.size(); ++i) {
    Orb_ModelDerived *context = m_Subscribers[i];
    if (!context->GetClient(object))
      context->FireSpecialize(object, false);
  }
}

namespace {

// A block tree in pre-order: each block, its pins, its signals, then its
// child blocks.
void CollectBlockTree(Orb_Block *block, std::vector<Orb_Persistent *> &out) {
  out.push_back(block);
  Orb_ForEachChild(block, [&out](Orb_Persistent *child) {
    if (child->GetKind() == Orb_Kind::Block)
      CollectBlockTree(static_cast<Orb_Block *>(child), out);
    else
      out.push_back(child);
  });
}

} // namespace

void Orb_Model::AnnounceLoadTree(Orb_DesignMgr *designMgr) {
  // Handlers run client code that may delete or create objects: each level
  // is walked from a snapshot, which the caller's FreeHold keeps in memory,
  // one view at a time.
  assert(m_HoldDepth > 0 && "AnnounceLoadTree needs a FreeHold");
  // Without subscribers no event fires and no handler runs.
  if (m_Subscribers.empty())
    return;
  unsigned limits[Orb_KindCount];
  for (unsigned k = 0; k < Orb_KindCount; ++k)
    limits[k] = m_Pools[k].IdLimit();
  for (Orb_ModelDerived *context : m_Subscribers)
    context->ReserveBridges(limits);
  AnnounceLoad(designMgr);
  std::vector<Orb_Design *> const designs = designMgr->GetDesigns().ToVector();
  std::vector<Orb_Persistent *> objects;
  for (Orb_Design *design : designs) {
    AnnounceLoad(design);
    std::vector<Orb_View *> const views = design->GetViews().ToVector();
    for (Orb_View *view : views) {
      AnnounceLoad(view);
      if (view->m_Dying)
        continue;
      objects.clear();
      if (view->GetBlock())
        CollectBlockTree(view->GetBlock(), objects);
      auto const networks = view->GetNetworks();
      objects.insert(objects.end(), networks.begin(), networks.end());
      for (Orb_Persistent *object : objects)
        AnnounceLoad(object);
    }
  }
}

void Orb_Model::FireDelete(Orb_Persistent *object) {
  for (std::size_t i = 0; i < m_Subscribers.size(); ++i)
    m_Subscribers[i]->FireDelete(object);
  // A context that kept its client (not subscribed, or a handler that did not
  // destroy it) must not be left pointing at a freed host object.
  for (std::size_t i = 0; i < m_Contexts.size(); ++i)
    delete m_Contexts[i]->GetClient(object);
}

void Orb_Model::Delete(Orb_Persistent *object) {
  assert(object && object->GetModel() == this && "Delete: object of another model");
  // Already held by a deletion under way, which fires its events and frees it.
  if (object->m_Dying)
    return;
  // The snapshot stays readable under the hold whatever the handlers change.
  // Memory is taken first: a failure here must leave nothing marked.
  std::vector<Orb_Persistent *> doomed;
  // A block with its pins and signals fits without regrowing.
  doomed.reserve(32);
  Orb_VisitPostOrder(object, [&doomed](Orb_Persistent *owned) { doomed.push_back(owned); });
  if (m_PendingFrees.size() == m_PendingFrees.capacity())
    m_PendingFrees.reserve(2 * m_PendingFrees.size() + 1);
  FreeHold hold(*this);
  m_PendingFrees.push_back(object);
  // Marked before any handler runs, so that a handler's deletion of an
  // object of the subtree is left to this walk.
  for (Orb_Persistent *owned : doomed)
    owned->m_Dying = true;
  std::exception_ptr failure;
  for (Orb_Persistent *owned : doomed) {
    // A handler's deletion of an ancestor may have fired it already.
    if (owned->m_DeleteFired)
      continue;
    owned->m_DeleteFired = true;
    try {
      FireDelete(owned);
    } catch (...) {
      if (!failure)
        failure = std::current_exception();
    }
  }
  Unlink(object);
  if (failure)
    std::rethrow_exception(failure);
}

void Orb_Model::ReleaseHold() noexcept {
  if (--m_HoldDepth > 0)
    return;
  // Client destructors run by Free may delete more; those queue behind.
  ++m_HoldDepth;
  for (std::size_t i = 0; i < m_PendingFrees.size(); ++i)
    Free(m_PendingFrees[i]);
  m_PendingFrees.clear();
  --m_HoldDepth;
}

bool Orb_Model::Link(Orb_Persistent *object) {
  Orb_Persistent *parent = object->GetParentObject();
  switch (object->GetKind()) {
  case Orb_Kind::DesignMgr:
    return m_DesignMgrs.AddUnique(static_cast<Orb_DesignMgr *>(object));
  case Orb_Kind::Design:
    return static_cast<Orb_DesignMgr *>(parent)->m_Designs.AddUnique(
        static_cast<Orb_Design *>(object));
  case Orb_Kind::View:
    return static_cast<Orb_Design *>(parent)->m_Views.AddUnique(static_cast<Orb_View *>(object));
  case Orb_Kind::Block:
    if (parent->GetKind() == Orb_Kind::View) {
      auto *view = static_cast<Orb_View *>(parent);
      if (view->m_pTopBlock)
        return false;
      view->m_pTopBlock = static_cast<Orb_Block *>(object);
      return true;
    }
    return static_cast<Orb_Block *>(parent)->MakeInside().blocks.AddUnique(
        static_cast<Orb_Block *>(object));
  case Orb_Kind::Pin:
    return static_cast<Orb_Block *>(parent)->m_Pins.AddUnique(static_cast<Orb_Pin *>(object));
  case Orb_Kind::Signal:
    return static_cast<Orb_Block *>(parent)->MakeInside().signals.AddUnique(
        static_cast<Orb_Signal *>(object));
  case Orb_Kind::Network:
    return static_cast<Orb_View *>(parent)->m_Networks.AddUnique(
        static_cast<Orb_Network *>(object));
  }
  return false;
}

void Orb_Model::Unlink(Orb_Persistent *object) {
  Orb_Persistent *parent = object->GetParentObject();
  switch (object->GetKind()) {
  case Orb_Kind::DesignMgr:
    m_DesignMgrs.Remove(static_cast<Orb_DesignMgr *>(object));
    break;
  case Orb_Kind::Design:
    static_cast<Orb_DesignMgr *>(parent)->m_Designs.Remove(static_cast<Orb_Design *>(object));
    break;
  case Orb_Kind::View:
    static_cast<Orb_Design *>(parent)->m_Views.Remove(static_cast<Orb_View *>(object));
    break;
  case Orb_Kind::Block:
    if (parent->GetKind() == Orb_Kind::View)
      static_cast<Orb_View *>(parent)->m_pTopBlock = nullptr;
    else
      static_cast<Orb_Block *>(parent)->m_pInside->blocks.Remove(static_cast<Orb_Block *>(object));
    break;
  case Orb_Kind::Pin:
    static_cast<Orb_Block *>(parent)->m_Pins.Remove(static_cast<Orb_Pin *>(object));
    break;
  case Orb_Kind::Signal:
    static_cast<Orb_Block *>(parent)->m_pInside->signals.Remove(static_cast<Orb_Signal *>(object));
    break;
  case Orb_Kind::Network:
    static_cast<Orb_View *>(parent)->m_Networks.Remove(static_cast<Orb_Network *>(object));
    break;
  }
}

void Orb_Model::Free(Orb_Persistent *object, bool keepLinks) noexcept {
  // Connections and network memberships never leave a view: inside a view
  // that goes whole, nothing needs unhooking.
  bool const inner = keepLinks && object->GetKind() != Orb_Kind::View;
  Orb_ForEachChild(object, [this, inner](Orb_Persistent *child) { Free(child, inner); });
  if (keepLinks) {
    switch (object->GetKind()) {
    case Orb_Kind::Pin: {
      auto *pin = static_cast<Orb_Pin *>(object);
      pin->Unlink(false);
      pin->Unlink(true);
      break;
    }
    case Orb_Kind::Signal: {
      auto *signal = static_cast<Orb_Signal *>(object);
      for (Orb_Pin *pin : signal->m_Pins.Range())
        pin->Forget(pin->GetParent() == signal->GetParent());
      if (Orb_Network *network = signal->GetNetwork())
        network->RemoveSignal(signal);
      break;
    }
    case Orb_Kind::Network: {
      auto *network = static_cast<Orb_Network *>(object);
      auto &memberships = network->GetParent()->m_Memberships;
      for (Orb_Signal *signal : network->m_Signals.Range()) {
        memberships.erase(signal);
        signal->m_InNetwork = false;
      }
      break;
    }
    default:
      break;
    }
  }
  // A client made for the object after its delete event (a handler that
  // specialized a dying sibling) goes with it.
  for (std::size_t i = 0; i < m_Contexts.size(); ++i)
    delete m_Contexts[i]->GetClient(object);
  Destroy(object);
}

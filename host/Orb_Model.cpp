// Host objects: creation, structure, events and deletion.

#include "Orb_Model.h"

#include "Orb_Debug.h"
#include "Orb_Derived.h"
#include "Orb_Exception.h"
#include "Orb_Sanitizer.h"
#include "Orb_SortFtor.h"

#include <algorithm>
#include <cassert>
#include <exception>
#include <mutex>
#include <new>
#include <string>
#include <tuple>

namespace {

char const *const kSource = "host/Orb_Model";

void ThrowDuplicate(Orb_Persistent const *parent, char const *kind, char const *name) {
  std::string message = std::string("A ") + kind + " of this name already exists";
  if (parent)
    message += std::string(" in ") + Orb_KindName(parent->GetKind()) + " <" +
               Port::Exception::ShownName(parent->GetNameString()) + ">";
  message += ".";
  throw Orb_Exception(kSource, __LINE__, name, message.c_str());
}

void CheckName(char const *name, char const *kind) {
  if (!name || !*name)
    throw Orb_Exception(kSource, __LINE__, "", (std::string("Empty ") + kind + " name.").c_str());
}

// Nothing is created in an object that a deletion under way is about to free.
void CheckNotDying(Orb_Persistent const *parent, char const *kind, char const *name) {
  if (parent->IsBeingDeleted())
    throw Orb_Exception(kSource, __LINE__, name,
                        (std::string("Cannot create a ") + kind + " in " +
                         Orb_KindName(parent->GetKind()) + " <" + parent->GetName() +
                         ">, which is being deleted.")
                            .c_str());
}

// A pin's or signal's place, as "top/u1/name".
std::string PathOf(Orb_Persistent const *object) {
  std::string path(object->GetNameString());
  for (Orb_Persistent const *p = object->GetParentObject(); p && p->GetKind() == Orb_Kind::Block;
       p = p->GetParentObject())
    path.insert(0, 1, '/').insert(0, p->GetNameString());
  return path;
}

} // namespace

char const *Orb_KindName(Orb_Kind kind) {
  switch (kind) {
  case Orb_Kind::DesignMgr:
    return "design manager";
  case Orb_Kind::Design:
    return "design";
  case Orb_Kind::View:
    return "view";
  case Orb_Kind::Block:
    return "block";
  case Orb_Kind::Pin:
    return "pin";
  case Orb_Kind::Signal:
    return "signal";
  case Orb_Kind::Network:
    return "network";
  }
  return "object";
}

char const *Orb_PinDirectionName(Orb_Pin::PIN_DIRECTION direction) {
  switch (direction) {
  case Orb_Pin::PIN_INPUT:
    return "input";
  case Orb_Pin::PIN_OUTPUT:
    return "output";
  case Orb_Pin::PIN_BIDIRECTIONAL:
    return "bidirectional";
  }
  return "unknown";
}

// ---------------------------------------------------------------------------
// Objects

Orb_Persistent::Orb_Persistent(Orb_Model *model, Orb_Kind kind, Orb_Persistent *parent,
                               std::string_view name)
    : m_pParent(parent), m_Kind(static_cast<std::uint8_t>(kind)), m_LongName(false), m_Dying(false),
      m_DeleteFired(false), m_InNetwork(false), m_HasInner(false), m_HasProperties(false) {
  m_LongName = m_Name.Set(model->m_Names, name, kind == Orb_Kind::Pin);
}

Orb_PropertyHolder const *Orb_Persistent::Properties() const {
  switch (GetKind()) {
  case Orb_Kind::DesignMgr:
    return &static_cast<Orb_DesignMgr const *>(this)->m_Properties;
  case Orb_Kind::Design:
    return &static_cast<Orb_Design const *>(this)->m_Properties;
  case Orb_Kind::View:
    return &static_cast<Orb_View const *>(this)->m_Properties;
  case Orb_Kind::Block:
    return &static_cast<Orb_Block const *>(this)->m_Properties;
  case Orb_Kind::Network:
    return &static_cast<Orb_Network const *>(this)->m_Properties;
  case Orb_Kind::Pin:
  case Orb_Kind::Signal:
    break;
  }
  if (!m_HasProperties)
    return nullptr;
  return &GetModel()->m_SideProperties.find(this)->second;
}

Orb_PropertyHolder &Orb_Persistent::MakeProperties() {
  if (Orb_PropertyHolder const *holder = Properties())
    return const_cast<Orb_PropertyHolder &>(
        *holder); // NOLINT(cppcoreguidelines-pro-type-const-cast)
  auto &side = GetModel()->m_SideProperties;
  Orb_PropertyHolder &holder =
      side.emplace(std::piecewise_construct, std::forward_as_tuple(this), std::forward_as_tuple())
          .first->second;
  m_HasProperties = true;
  return holder;
}

Orb_Pin::Orb_Pin(Orb_Model *model, Orb_Block *parent, std::string_view name,
                 PIN_DIRECTION direction)
    : Orb_Persistent(model, Orb_Kind::Pin, parent, name), m_Direction(direction) {}

Orb_Block *Orb_Pin::GetParent() const { return static_cast<Orb_Block *>(GetParentObject()); }

void Orb_Pin::Connect(Orb_Signal *signal) {
  Orb_Block *outside = GetParent()->GetParent();
  if (signal && signal->GetParent() != outside) {
    std::string message =
        "Pin <" + PathOf(this) + "> cannot connect outside to signal <" + PathOf(signal) + ">: ";
    message += outside
                   ? "the pin connects outside only to signals of block <" + PathOf(outside) + ">."
                   : "a top block's pin connects only inside.";
    throw Orb_Exception(kSource, __LINE__, GetName(), message.c_str());
  }
  Link(false, signal);
}

void Orb_Pin::ConnectInner(Orb_Signal *signal) {
  if (signal && signal->GetParent() != GetParent())
    throw Orb_Exception(kSource, __LINE__, GetName(),
                        ("Pin <" + PathOf(this) + "> cannot connect inside to signal <" +
                         PathOf(signal) + ">: the pin connects inside only to signals of block <" +
                         PathOf(GetParent()) + ">.")
                            .c_str());
  Link(true, signal);
}

Orb_PinLink *Orb_Pin::InnerLink() const {
  if (!m_HasInner)
    return nullptr;
  return &GetParent()->GetView()->m_InnerLinks.find(this)->second;
}

Orb_Signal *Orb_Pin::GetInnerSignal() const {
  Orb_PinLink const *link = InnerLink();
  return link ? link->signal : nullptr;
}

void Orb_Pin::Link(bool inner, Orb_Signal *signal) {
  // One lookup of the inner record serves the whole change.
  Orb_PinLink *link = inner ? InnerLink() : nullptr;
  if (signal == (inner ? (link ? link->signal : nullptr) : m_pSignal))
    return;
  if (!signal) {
    Unlink(inner);
    return;
  }
  // Room first, so that running out of memory changes nothing.
  signal->m_Pins.Reserve(1);
  if (!inner) {
    Unlink(false);
    m_pSignal = signal;
  } else if (link) {
    link->signal->m_Pins.Remove(this);
    link->signal = signal;
  } else {
    GetParent()->GetView()->m_InnerLinks.emplace(this, Orb_PinLink{signal, 0});
    m_HasInner = true;
  }
  signal->m_Pins.Add(this);
}

void Orb_Pin::Unlink(bool inner) noexcept {
  Orb_Signal *signal = inner ? GetInnerSignal() : m_pSignal;
  if (signal)
    signal->m_Pins.Remove(this);
  Forget(inner);
}

void Orb_Pin::Forget(bool inner) noexcept {
  if (!inner) {
    m_pSignal = nullptr;
  } else if (m_HasInner) {
    GetParent()->GetView()->m_InnerLinks.erase(this);
    m_HasInner = false;
  }
}

Orb_Signal::Orb_Signal(Orb_Model *model, Orb_Block *parent, std::string_view name)
    : Orb_Persistent(model, Orb_Kind::Signal, parent, name) {}

Orb_Block *Orb_Signal::GetParent() const { return static_cast<Orb_Block *>(GetParentObject()); }

Orb_Network *Orb_Signal::GetNetwork() const {
  if (!m_InNetwork)
    return nullptr;
  return GetParent()->GetView()->m_Memberships.find(this)->second.network;
}

Orb_Network::Orb_Network(Orb_Model *model, Orb_View *parent, std::string_view name)
    : Orb_Persistent(model, Orb_Kind::Network, parent, name) {}

Orb_View *Orb_Network::GetParent() const { return static_cast<Orb_View *>(GetParentObject()); }

void Orb_Network::AddSignal(Orb_Signal *signal) {
  if (!signal || signal->GetNetwork() == this)
    return;
  if (signal->GetParent()->GetView() != GetParent())
    throw Orb_Exception(kSource, __LINE__, signal->GetName(),
                        "A network can only hold signals of its own view.");
  if (Orb_Network *previous = signal->GetNetwork())
    previous->RemoveSignal(signal);
  auto &memberships = GetParent()->m_Memberships;
  auto const entry = memberships.emplace(signal, Orb_View::Membership{this, 0}).first;
  try {
    m_Signals.Add(signal);
  } catch (...) {
    memberships.erase(entry);
    throw;
  }
  signal->m_InNetwork = true;
}

void Orb_Network::RemoveSignal(Orb_Signal *signal) {
  if (!signal || signal->GetNetwork() != this)
    return;
  m_Signals.Remove(signal);
  GetParent()->m_Memberships.erase(signal);
  signal->m_InNetwork = false;
}

Orb_Block::Orb_Block(Orb_Model *model, Orb_Persistent *parent, Orb_View *view,
                     std::string_view name)
    : Orb_Persistent(model, Orb_Kind::Block, parent, name), m_pView(view) {}

Orb_Block::Inside &Orb_Block::MakeInside() {
  if (!m_pInside)
    m_pInside = std::make_unique<Inside>();
  return *m_pInside;
}

Orb_Block::Inside const &Orb_Block::NoInside() {
  static Inside const none{};
  return none;
}

Orb_Block *Orb_Block::GetParent() const {
  Orb_Persistent *parent = GetParentObject();
  return parent && parent->GetKind() == Orb_Kind::Block ? static_cast<Orb_Block *>(parent)
                                                        : nullptr;
}

unsigned Orb_Block::GetDepth() const {
  unsigned depth = 1;
  for (Orb_Block const *parent = GetParent(); parent; parent = parent->GetParent())
    ++depth;
  return depth;
}

Orb_Block *Orb_Block::CreateBlock(char const *name, int /*flags*/) {
  CheckName(name, "block");
  CheckNotDying(this, "block", name);
  if (GetDepth() >= Orb_MaxBlockDepth)
    throw Orb_Exception(kSource, __LINE__, name,
                        ("A child block of block <" + Port::Exception::ShownName(GetNameString()) +
                         "> would lie deeper than " + std::to_string(Orb_MaxBlockDepth) +
                         " levels.")
                            .c_str());
  return GetModel()->Adopt(GetModel()->Make<Orb_Block>(GetModel(), this, m_pView, name), "block");
}

Orb_Pin *Orb_Block::CreatePin(char const *name, Orb_Pin::PIN_DIRECTION direction) {
  CheckName(name, "pin");
  CheckNotDying(this, "pin", name);
  return GetModel()->Adopt(GetModel()->Make<Orb_Pin>(GetModel(), this, name, direction), "pin");
}

Orb_Signal *Orb_Block::CreateSignal(char const *name) {
  CheckName(name, "signal");
  CheckNotDying(this, "signal", name);
  return GetModel()->Adopt(GetModel()->Make<Orb_Signal>(GetModel(), this, name), "signal");
}

void Orb_Block::DeleteBlock(Orb_Block *child) {
  assert(child && child->GetParentObject() == this && "DeleteBlock: not a child of this block");
  GetModel()->Delete(child);
}

void Orb_Block::DeletePin(Orb_Pin *pin) {
  assert(pin && pin->GetParent() == this && "DeletePin: not a pin of this block");
  GetModel()->Delete(pin);
}

void Orb_Block::DeleteSignal(Orb_Signal *signal) {
  assert(signal && signal->GetParent() == this && "DeleteSignal: not a signal of this block");
  GetModel()->Delete(signal);
}

void Orb_Block::SortPins(Orb_SortFtor<Orb_Pin> const &ftor) {
  m_Pins.StableSort([&ftor](Orb_Pin const *a, Orb_Pin const *b) { return ftor(a, b); });
}

Orb_View::Orb_View(Orb_Model *model, Orb_Design *parent, std::string_view name)
    : Orb_Persistent(model, Orb_Kind::View, parent, name) {}

Orb_Design *Orb_View::GetParent() const { return static_cast<Orb_Design *>(GetParentObject()); }

Orb_Block *Orb_View::CreateTopBlock(char const *name) {
  CheckName(name, "block");
  CheckNotDying(this, "block", name);
  if (m_pTopBlock)
    throw Orb_Exception(kSource, __LINE__, GetName(), "The view already has a top block.");
  return GetModel()->Adopt(GetModel()->Make<Orb_Block>(GetModel(), this, this, name), "block");
}

Orb_Network *Orb_View::CreateNetwork(char const *name) {
  CheckName(name, "network");
  CheckNotDying(this, "network", name);
  return GetModel()->Adopt(GetModel()->Make<Orb_Network>(GetModel(), this, name), "network");
}

void Orb_View::DeleteTopBlock() {
  if (m_pTopBlock)
    GetModel()->Delete(m_pTopBlock);
}

void Orb_View::DeleteNetwork(Orb_Network *network) {
  assert(network && network->GetParent() == this && "DeleteNetwork: not a network of this view");
  GetModel()->Delete(network);
}

Orb_Design::Orb_Design(Orb_Model *model, Orb_DesignMgr *parent, std::string_view name)
    : Orb_Persistent(model, Orb_Kind::Design, parent, name) {}

Orb_DesignMgr *Orb_Design::GetParent() const {
  return static_cast<Orb_DesignMgr *>(GetParentObject());
}

Orb_View *Orb_Design::CreateView(char const *name) {
  CheckName(name, "view");
  CheckNotDying(this, "view", name);
  return GetModel()->Adopt(GetModel()->Make<Orb_View>(GetModel(), this, name), "view");
}

void Orb_Design::DeleteView(Orb_View *view) {
  assert(view && view->GetParent() == this && "DeleteView: not a view of this design");
  GetModel()->Delete(view);
}

Orb_DesignMgr::Orb_DesignMgr(Orb_Model *model, std::string_view name)
    : Orb_Persistent(model, Orb_Kind::DesignMgr, nullptr, name) {}

Orb_Design *Orb_DesignMgr::CreateDesign(char const *name) {
  CheckName(name, "design");
  CheckNotDying(this, "design", name);
  return GetModel()->Adopt(GetModel()->Make<Orb_Design>(GetModel(), this, name), "design");
}

void Orb_DesignMgr::DeleteDesign(Orb_Design *design) {
  assert(design && design->GetParent() == this && "DeleteDesign: not a design of this manager");
  GetModel()->Delete(design);
}

Orb_ModelCompanion::~Orb_ModelCompanion() = default;

std::unique_ptr<Orb_Model> Orb_ModelCompanion::ReleaseTakenModel() { return nullptr; }

// ---------------------------------------------------------------------------
// Model

// What a million-block design pays per object; and every kind fits a pool page.
static_assert(sizeof(void *) != 8 || sizeof(Orb_Persistent) == 24, "name, parent, slot, flags");
static_assert(sizeof(void *) != 8 || sizeof(Orb_Pin) == 40, "base and the outer side");
static_assert(sizeof(void *) != 8 || sizeof(Orb_Signal) == 56, "base and pin list");
static_assert(sizeof(void *) != 8 || sizeof(Orb_Block) == 88, "base, view, pins, inside");
static_assert(sizeof(Orb_View) <= Orb_ObjectPool::kMaxSlotSize &&
                  sizeof(Orb_Design) <= Orb_ObjectPool::kMaxSlotSize &&
                  sizeof(Orb_DesignMgr) <= Orb_ObjectPool::kMaxSlotSize &&
                  sizeof(Orb_Network) <= Orb_ObjectPool::kMaxSlotSize,
              "a host object fits a pool page");

Orb_Model::Orb_Model(char const *name, char const *dbName, char const *path, bool readOnly)
    : m_Name(name ? name : ""), m_DbName(dbName ? dbName : ""), m_Path(path ? path : ""),
      m_ReadOnly(readOnly) {
  std::size_t const sizes[Orb_KindCount] = {
      sizeof(Orb_DesignMgr), sizeof(Orb_Design), sizeof(Orb_View),   sizeof(Orb_Block),
      sizeof(Orb_Pin),       sizeof(Orb_Signal), sizeof(Orb_Network)};
  for (unsigned k = 0; k < Orb_KindCount; ++k)
    m_Pools[k].SetSlotSize(sizes[k], this);
}

Orb_Model::~Orb_Model() {
  assert(m_Contexts.empty() && "Orb_Model destroyed while client models are attached");
  assert(m_HoldDepth == 0 && "Orb_Model destroyed while a deletion or an open is under way");
  // Companions may hold client models of their own host models; they go
  // before this model's objects.
  m_Companions.clear();
  m_LoadedCompanions.clear();
  // The pools go whole: objects are destroyed without giving back their
  // slots. Free leaves the containers alone, so the list can be walked as
  // it is.
  m_TearingDown = true;
  for (Orb_DesignMgr *designMgr : m_DesignMgrs.Items())
    Free(designMgr, false);
}

Orb_DesignMgr *Orb_Model::CreateDesignMgr(char const *name) {
  CheckName(name, "design manager");
  return Adopt(Make<Orb_DesignMgr>(this, name), "design manager");
}

void Orb_Model::DeleteDesignMgr(Orb_DesignMgr *designMgr) {
  assert(designMgr && designMgr->GetModel() == this && "DeleteDesignMgr: not of this model");
  Delete(designMgr);
}

void Orb_Model::SetCompanion(std::string const &key,
                             std::unique_ptr<Orb_ModelCompanion> companion) {
  std::unique_ptr<Orb_ModelCompanion> &slot = m_Companions[key];
  if (m_pOpenJournal && slot) {
    auto before = m_pOpenJournal->liveBefore.find(key);
    // The one that was there before the open is kept for a refusal to restore.
    if (before != m_pOpenJournal->liveBefore.end() && before->second == slot.get())
      m_pOpenJournal->replaced.emplace(key, std::move(slot));
  }
  slot = std::move(companion);
}

Orb_ModelCompanion *Orb_Model::GetCompanion(std::string const &key) const {
  auto it = m_Companions.find(key);
  return it == m_Companions.end() ? nullptr : it->second.get();
}

void Orb_Model::RestoreCompanions(OpenJournal &journal) noexcept {
  for (auto it = m_Companions.begin(); it != m_Companions.end();) {
    std::string const &key = it->first;
    auto before = journal.liveBefore.find(key);
    if (before != journal.liveBefore.end() && before->second == it->second.get()) {
      ++it;
      continue;
    }
    std::unique_ptr<Orb_ModelCompanion> added = std::move(it->second);
    // A model that was waiting before the open and that this companion took
    // waits again.
    if (added && journal.waitingBefore.count(key) && !m_LoadedCompanions.count(key)) {
      try {
        if (std::unique_ptr<Orb_Model> taken = added->ReleaseTakenModel())
          m_LoadedCompanions.emplace(key, std::move(taken));
      } catch (...) {
        // Without memory to keep it, the model goes with its companion.
      }
    }
    added.reset();
    // Nothing removes a key during an open, so a replaced companion's slot is
    // still here to take it back.
    auto replaced = journal.replaced.find(key);
    if (replaced != journal.replaced.end()) {
      it->second = std::move(replaced->second);
      ++it;
    } else {
      it = m_Companions.erase(it);
    }
  }
}

std::unique_ptr<Orb_Model> Orb_Model::TakeLoadedCompanion(std::string const &key) {
  auto it = m_LoadedCompanions.find(key);
  if (it == m_LoadedCompanions.end())
    return nullptr;
  std::unique_ptr<Orb_Model> model = std::move(it->second);
  m_LoadedCompanions.erase(it);
  return model;
}

void Orb_Model::Attach(Orb_ModelDerived *context) { m_Contexts.push_back(context); }

void Orb_Model::Detach(Orb_ModelDerived *context) {
  m_Contexts.erase(std::remove(m_Contexts.begin(), m_Contexts.end(), context), m_Contexts.end());
  m_Subscribers.erase(std::remove(m_Subscribers.begin(), m_Subscribers.end(), context),
                      m_Subscribers.end());
}

void Orb_Model::Subscribe(Orb_ModelDerived *context) {
  if (std::find(m_Subscribers.begin(), m_Subscribers.end(), context) == m_Subscribers.end())
    m_Subscribers.push_back(context);
}

std::size_t Orb_Model::GetObjectCount(Orb_Kind kind) const {
  return m_ObjectCount[static_cast<unsigned>(kind)];
}

void Orb_Model::Destroy(Orb_Persistent *object) noexcept {
  auto const k = static_cast<unsigned>(object->GetKind());
  // The whole table goes with the model, and so do the side properties.
  if (object->m_LongName && !m_TearingDown)
    m_Names.Release(object->m_Name.entry);
  if (object->m_HasProperties && !m_TearingDown)
    m_SideProperties.erase(object);
  switch (object->GetKind()) {
  case Orb_Kind::DesignMgr:
    static_cast<Orb_DesignMgr *>(object)->~Orb_DesignMgr();
    break;
  case Orb_Kind::Design:
    static_cast<Orb_Design *>(object)->~Orb_Design();
    break;
  case Orb_Kind::View:
    static_cast<Orb_View *>(object)->~Orb_View();
    break;
  case Orb_Kind::Block:
    static_cast<Orb_Block *>(object)->~Orb_Block();
    break;
  case Orb_Kind::Pin:
    static_cast<Orb_Pin *>(object)->~Orb_Pin();
    break;
  case Orb_Kind::Signal:
    static_cast<Orb_Signal *>(object)->~Orb_Signal();
    break;
  case Orb_Kind::Network:
    static_cast<Orb_Network *>(object)->~Orb_Network();
    break;
  }
  --m_ObjectCount[k];
  if (!m_TearingDown)
    m_Pools[k].Release(object);
}

template <class T> T *Orb_Model::Announce(T *object) {
  try {
    // Index loop: a handler may subscribe another context.
    for (std::size_t i = 0; i < m_Subscribers.size(); ++i)
      m_Subscribers[i]->FireSpecialize(object, true);
  } catch (...) {
    Delete(object);
    throw;
  }
  return object;
}

template <class T> T *Orb_Model::Adopt(T *object, char const *kind) {
  bool linked = false;
  try {
    linked = Link(object);
  } catch (...) {
    // In no container: nothing else would ever free it.
    Destroy(object);
    throw;
  }
  if (!linked) {
    std::string const name(object->GetNameString());
    Orb_Persistent *parent = object->GetParentObject();
    Destroy(object);
    ThrowDuplicate(parent, kind, name.c_str());
  }
  return Announce(object);
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

// ---------------------------------------------------------------------------
// Dump

void Orb_Persistent::DebugDump(Port::Stream *stream, int indent) const {
  Orb_Debug::Printf(stream, indent, "%s <%s>\n", Orb_KindName(GetKind()), GetName());
  DumpProperties(stream, indent + 1);
  for (Orb_ModelDerived *context : GetModel()->GetContexts())
    if (Orb_ClientObject *client = context->GetClient(this))
      client->DebugDumpCallback(stream, indent + 1);
}

// ---------------------------------------------------------------------------
// Pools

Orb_ObjectPool::~Orb_ObjectPool() {
  for (void *chunk : m_Chunks)
    ::operator delete(chunk, std::align_val_t(kPageBytes));
}

void Orb_ObjectPool::SetSlotSize(std::size_t size, void *owner) {
  assert(m_Chunks.empty() && "Orb_ObjectPool::SetSlotSize after the first allocation");
  assert(size <= kMaxSlotSize && "Orb_ObjectPool: slot larger than a page");
  // Host objects hold pointers and integers: pointer alignment is enough.
  std::size_t const align = alignof(void *);
  m_SlotSize = (std::max(size, sizeof(FreeSlot)) + align - 1) / align * align;
  m_Reciprocal =
      static_cast<std::uint32_t>(((std::uint64_t(1) << 32) + m_SlotSize - 1) / m_SlotSize);
  m_pOwner = owner;
}

void Orb_ObjectPool::NextPage() {
  if (m_pPageEnd == m_pChunkEnd) {
    std::size_t const bytes = m_NextChunkPages * kPageBytes;
    m_Chunks.reserve(m_Chunks.size() + 1);
    auto *chunk = static_cast<unsigned char *>(::operator new(bytes, std::align_val_t(kPageBytes)));
    m_Chunks.push_back(chunk);
    m_pPageEnd = chunk;
    m_pChunkEnd = chunk + bytes;
    m_Bytes += bytes;
    // Chunks double up to a megabyte: small models stay small.
    if (bytes < (std::size_t(1) << 20))
      m_NextChunkPages *= 2;
  }
  unsigned char *page = m_pPageEnd;
  new (page) PageHeader{m_pOwner, m_NextId, m_Reciprocal};
  m_pNext = page + kPageHeader;
  m_pPageEnd = page + kPageBytes;
}

void *Orb_ObjectPool::Allocate() {
  if (m_pFree) {
    FreeSlot *slot = m_pFree;
    Orb_Unpoison(slot, m_SlotSize);
    m_pFree = slot->next;
    return slot;
  }
  if (static_cast<std::size_t>(m_pPageEnd - m_pNext) < m_SlotSize)
    NextPage();
  void *slot = m_pNext;
  m_pNext += m_SlotSize;
  ++m_NextId;
  return slot;
}

void Orb_ObjectPool::Release(void *slot) noexcept {
  m_pFree = new (slot) FreeSlot{m_pFree};
  Orb_Poison(slot, m_SlotSize);
}

namespace {

// Free lists by size class (multiples of 8 bytes up to Orb_SmallLimit),
// carved from 64 KiB chunks.
class SmallPool {
public:
  static constexpr std::size_t kGrain = 8;

  void *Allocate(std::size_t size) {
    std::size_t const cls = (size + kGrain - 1) / kGrain;
    std::lock_guard<std::mutex> const lock(m_Mutex);
    if (Free *block = m_Free[cls]) {
      m_Free[cls] = block->next;
      return block;
    }
    std::size_t const bytes = cls * kGrain;
    if (static_cast<std::size_t>(m_pEnd - m_pNext) < bytes) {
      // What is left of the chunk goes to the free lists of smaller classes.
      for (std::size_t left = static_cast<std::size_t>(m_pEnd - m_pNext) / kGrain; left > 0;) {
        std::size_t const piece = std::min(left, Orb_SmallLimit / kGrain);
        m_Free[piece] = new (m_pNext) Free{m_Free[piece]};
        m_pNext += piece * kGrain;
        left -= piece;
      }
      m_pNext = static_cast<unsigned char *>(::operator new(kChunk));
      m_pEnd = m_pNext + kChunk;
    }
    void *block = m_pNext;
    m_pNext += bytes;
    return block;
  }
  void Release(void *pointer, std::size_t size) noexcept {
    std::size_t const cls = (size + kGrain - 1) / kGrain;
    std::lock_guard<std::mutex> const lock(m_Mutex);
    m_Free[cls] = new (pointer) Free{m_Free[cls]};
  }

private:
  struct Free {
    Free *next;
  };
  static constexpr std::size_t kChunk = std::size_t(1) << 16;
  std::mutex m_Mutex;
  Free *m_Free[Orb_SmallLimit / kGrain + 1] = {};
  unsigned char *m_pNext = nullptr;
  unsigned char *m_pEnd = nullptr;
};

// Never destroyed: small blocks of static models may outlive any static
// here. Its chunks stay reachable through it.
SmallPool &TheSmallPool() {
  static auto *pool = new SmallPool;
  return *pool;
}

constexpr bool kPooled = !ORB_ADDRESS_SANITIZER;

} // namespace

void *Orb_SmallAllocate(std::size_t size) {
  if (!kPooled || size == 0 || size > Orb_SmallLimit)
    return ::operator new(size);
  return TheSmallPool().Allocate(size);
}

void Orb_SmallRelease(void *pointer, std::size_t size) noexcept {
  if (!pointer)
    return;
  if (!kPooled || size == 0 || size > Orb_SmallLimit)
    ::operator delete(pointer);
  else
    TheSmallPool().Release(pointer, size);
}

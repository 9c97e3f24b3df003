// Host objects: their structure, connections and properties, and creating
// them through their owners (linked, then announced to the clients).

#include "Orb_Model.h"

#include "Orb_Derived.h"
#include "Orb_Exception.h"
#include "Orb_SortFtor.h"

#include <cassert>
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
#define ORB_KIND(Kind, shown)                                                                      \
  case Orb_Kind::Kind:                                                                             \
    return shown;
#include "Orb_Kinds.def"
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
  if (signal == (inner ? (link ? link->signal : nullptr) : GetSignal()))
    return;
  if (!signal) {
    Unlink(inner);
    return;
  }
  // Room first, so that running out of memory changes nothing.
  signal->m_Pins.Reserve(1);
  if (!inner) {
    Unlink(false);
    SetSignal(signal);
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
  Orb_Signal *signal = inner ? GetInnerSignal() : GetSignal();
  if (signal)
    signal->m_Pins.Remove(this);
  Forget(inner);
}

void Orb_Pin::Forget(bool inner) noexcept {
  if (!inner) {
    SetSignal(nullptr);
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
// Creating: linked into the parent, then announced to the clients

Orb_DesignMgr *Orb_Model::CreateDesignMgr(char const *name) {
  CheckName(name, "design manager");
  return Adopt(Make<Orb_DesignMgr>(this, name), "design manager");
}

void Orb_Model::DeleteDesignMgr(Orb_DesignMgr *designMgr) {
  assert(designMgr && designMgr->GetModel() == this && "DeleteDesignMgr: not of this model");
  Delete(designMgr);
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

// Host objects: creation, structure, events and deletion.

#include "Orb_Model.h"

#include "Orb_Debug.h"
#include "Orb_Derived.h"
#include "Orb_Exception.h"
#include "Orb_SortFtor.h"

#include <algorithm>
#include <cassert>
#include <new>
#include <string>

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
                               std::string name)
    : m_Name(std::move(name)), m_pModel(model), m_pParent(parent), m_Kind(kind),
      m_BridgeId(model->AllocateBridgeId(kind)) {}

Orb_Persistent::~Orb_Persistent() { m_pModel->ReleaseBridgeId(m_Kind, m_BridgeId); }

Orb_Pin::Orb_Pin(Orb_Model *model, Orb_Block *parent, std::string name, PIN_DIRECTION direction)
    : Orb_Persistent(model, Orb_Kind::Pin, parent, std::move(name)), m_Direction(direction) {}

Orb_Block *Orb_Pin::GetParent() const { return static_cast<Orb_Block *>(GetParentObject()); }

void Orb_Pin::Connect(Orb_Signal *signal) {
  if (signal == m_pSignal)
    return;
  if (signal && signal->GetParent()->GetView() != GetParent()->GetView())
    throw Orb_Exception(kSource, __LINE__, GetName(),
                        "A pin can only connect to a signal of its own view.");
  Disconnect();
  m_pSignal = signal;
  if (signal)
    signal->m_Pins.push_back(this);
}

void Orb_Pin::Disconnect() noexcept {
  if (!m_pSignal)
    return;
  auto &pins = m_pSignal->m_Pins;
  pins.erase(std::find(pins.begin(), pins.end(), this));
  m_pSignal = nullptr;
}

Orb_Signal::Orb_Signal(Orb_Model *model, Orb_Block *parent, std::string name)
    : Orb_Persistent(model, Orb_Kind::Signal, parent, std::move(name)) {}

Orb_Block *Orb_Signal::GetParent() const { return static_cast<Orb_Block *>(GetParentObject()); }

Orb_Network::Orb_Network(Orb_Model *model, Orb_View *parent, std::string name)
    : Orb_Persistent(model, Orb_Kind::Network, parent, std::move(name)) {}

Orb_View *Orb_Network::GetParent() const { return static_cast<Orb_View *>(GetParentObject()); }

void Orb_Network::AddSignal(Orb_Signal *signal) {
  if (!signal || signal->m_pNetwork == this)
    return;
  if (signal->GetParent()->GetView() != GetParent())
    throw Orb_Exception(kSource, __LINE__, signal->GetName(),
                        "A network can only hold signals of its own view.");
  if (signal->m_pNetwork)
    signal->m_pNetwork->RemoveSignal(signal);
  m_Signals.push_back(signal);
  signal->m_pNetwork = this;
}

void Orb_Network::RemoveSignal(Orb_Signal *signal) {
  if (!signal || signal->m_pNetwork != this)
    return;
  m_Signals.erase(std::find(m_Signals.begin(), m_Signals.end(), signal));
  signal->m_pNetwork = nullptr;
}

Orb_Block::Orb_Block(Orb_Model *model, Orb_Persistent *parent, Orb_View *view, std::string name)
    : Orb_Persistent(model, Orb_Kind::Block, parent, std::move(name)), m_pView(view) {}

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
  if (m_Blocks.Find(name))
    ThrowDuplicate(this, "block", name);
  if (GetDepth() >= Orb_MaxBlockDepth)
    throw Orb_Exception(kSource, __LINE__, name,
                        ("A child block of block <" + Port::Exception::ShownName(GetNameString()) +
                         "> would lie deeper than " + std::to_string(Orb_MaxBlockDepth) +
                         " levels.")
                            .c_str());
  auto *block = new Orb_Block(GetModel(), this, m_pView, name);
  m_Blocks.Add(block);
  return GetModel()->Announce(block);
}

Orb_Pin *Orb_Block::CreatePin(char const *name, Orb_Pin::PIN_DIRECTION direction) {
  CheckName(name, "pin");
  if (m_Pins.Find(name))
    ThrowDuplicate(this, "pin", name);
  auto *pin = new Orb_Pin(GetModel(), this, name, direction);
  m_Pins.Add(pin);
  return GetModel()->Announce(pin);
}

Orb_Signal *Orb_Block::CreateSignal(char const *name) {
  CheckName(name, "signal");
  if (m_Signals.Find(name))
    ThrowDuplicate(this, "signal", name);
  auto *signal = new Orb_Signal(GetModel(), this, name);
  m_Signals.Add(signal);
  return GetModel()->Announce(signal);
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
  auto &pins = m_Pins.MutableItems();
  std::stable_sort(pins.begin(), pins.end(),
                   [&ftor](Orb_Pin const *a, Orb_Pin const *b) { return ftor(a, b); });
}

Orb_View::Orb_View(Orb_Model *model, Orb_Design *parent, std::string name)
    : Orb_Persistent(model, Orb_Kind::View, parent, std::move(name)) {}

Orb_Design *Orb_View::GetParent() const { return static_cast<Orb_Design *>(GetParentObject()); }

Orb_Block *Orb_View::CreateTopBlock(char const *name) {
  CheckName(name, "block");
  if (m_pTopBlock)
    throw Orb_Exception(kSource, __LINE__, GetName(), "The view already has a top block.");
  m_pTopBlock = new Orb_Block(GetModel(), this, this, name);
  return GetModel()->Announce(m_pTopBlock);
}

Orb_Network *Orb_View::CreateNetwork(char const *name) {
  CheckName(name, "network");
  if (m_Networks.Find(name))
    ThrowDuplicate(this, "network", name);
  auto *network = new Orb_Network(GetModel(), this, name);
  m_Networks.Add(network);
  return GetModel()->Announce(network);
}

void Orb_View::DeleteTopBlock() {
  if (m_pTopBlock)
    GetModel()->Delete(m_pTopBlock);
}

void Orb_View::DeleteNetwork(Orb_Network *network) {
  assert(network && network->GetParent() == this && "DeleteNetwork: not a network of this view");
  GetModel()->Delete(network);
}

Orb_Design::Orb_Design(Orb_Model *model, Orb_DesignMgr *parent, std::string name)
    : Orb_Persistent(model, Orb_Kind::Design, parent, std::move(name)) {}

Orb_DesignMgr *Orb_Design::GetParent() const {
  return static_cast<Orb_DesignMgr *>(GetParentObject());
}

Orb_View *Orb_Design::CreateView(char const *name) {
  CheckName(name, "view");
  if (m_Views.Find(name))
    ThrowDuplicate(this, "view", name);
  auto *view = new Orb_View(GetModel(), this, name);
  m_Views.Add(view);
  return GetModel()->Announce(view);
}

void Orb_Design::DeleteView(Orb_View *view) {
  assert(view && view->GetParent() == this && "DeleteView: not a view of this design");
  GetModel()->Delete(view);
}

Orb_DesignMgr::Orb_DesignMgr(Orb_Model *model, std::string name)
    : Orb_Persistent(model, Orb_Kind::DesignMgr, nullptr, std::move(name)) {}

Orb_Design *Orb_DesignMgr::CreateDesign(char const *name) {
  CheckName(name, "design");
  if (m_Designs.Find(name))
    ThrowDuplicate(this, "design", name);
  auto *design = new Orb_Design(GetModel(), this, name);
  m_Designs.Add(design);
  return GetModel()->Announce(design);
}

void Orb_DesignMgr::DeleteDesign(Orb_Design *design) {
  assert(design && design->GetParent() == this && "DeleteDesign: not a design of this manager");
  GetModel()->Delete(design);
}

Orb_ModelCompanion::~Orb_ModelCompanion() = default;

// ---------------------------------------------------------------------------
// Model

Orb_Model::Orb_Model(char const *name, char const *dbName, char const *path, bool readOnly)
    : m_Name(name ? name : ""), m_DbName(dbName ? dbName : ""), m_Path(path ? path : ""),
      m_ReadOnly(readOnly) {}

Orb_Model::~Orb_Model() {
  assert(m_Contexts.empty() && "Orb_Model destroyed while client models are attached");
  // Companions may hold client models of their own host models; they go
  // before this model's objects.
  m_Companions.clear();
  m_LoadedCompanions.clear();
  // Free leaves the containers alone, so the list can be walked as it is.
  for (Orb_DesignMgr *designMgr : m_DesignMgrs.Items())
    Free(designMgr, false);
}

Orb_DesignMgr *Orb_Model::CreateDesignMgr(char const *name) {
  CheckName(name, "design manager");
  if (m_DesignMgrs.Find(name))
    ThrowDuplicate(nullptr, "design manager", name);
  auto *designMgr = new Orb_DesignMgr(this, name);
  m_DesignMgrs.Add(designMgr);
  return Announce(designMgr);
}

void Orb_Model::DeleteDesignMgr(Orb_DesignMgr *designMgr) {
  assert(designMgr && designMgr->GetModel() == this && "DeleteDesignMgr: not of this model");
  Delete(designMgr);
}

void Orb_Model::SetCompanion(std::string const &key,
                             std::unique_ptr<Orb_ModelCompanion> companion) {
  m_Companions[key] = std::move(companion);
}

Orb_ModelCompanion *Orb_Model::GetCompanion(std::string const &key) const {
  auto it = m_Companions.find(key);
  return it == m_Companions.end() ? nullptr : it->second.get();
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

unsigned Orb_Model::AllocateBridgeId(Orb_Kind kind) {
  auto const k = static_cast<unsigned>(kind);
  ++m_ObjectCount[k];
  if (!m_FreeBridgeIds[k].empty()) {
    unsigned const id = m_FreeBridgeIds[k].back();
    m_FreeBridgeIds[k].pop_back();
    return id;
  }
  return m_NextBridgeId[k]++;
}

void Orb_Model::ReleaseBridgeId(Orb_Kind kind, unsigned id) noexcept {
  auto const k = static_cast<unsigned>(kind);
  --m_ObjectCount[k];
  // Runs in destructors. Without memory the id is just never reused.
  try {
    m_FreeBridgeIds[k].push_back(id);
  } catch (std::bad_alloc const &) {
  }
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

void Orb_Model::AnnounceLoad(Orb_Persistent *object) {
  for (std::size_t i = 0; i < m_Subscribers.size(); ++i) {
    Orb_ModelDerived *context = m_Subscribers[i];
    if (!context->GetClient(object))
      context->FireSpecialize(object, false);
  }
}

namespace {

// Pre-order walk of a block tree: each block, its pins, its signals, then
// its child blocks.
template <class F> void WalkBlockTree(Orb_Block *block, F const &visit) {
  visit(block);
  for (std::size_t i = 0; i < block->GetPins().size(); ++i)
    visit(block->GetPins()[i]);
  for (std::size_t i = 0; i < block->GetSignals().size(); ++i)
    visit(block->GetSignals()[i]);
  for (std::size_t i = 0; i < block->GetBlocks().size(); ++i)
    WalkBlockTree(block->GetBlocks()[i], visit);
}

} // namespace

void Orb_Model::AnnounceLoadTree(Orb_DesignMgr *designMgr) {
  auto announce = [this](Orb_Persistent *object) { AnnounceLoad(object); };
  announce(designMgr);
  for (std::size_t d = 0; d < designMgr->GetDesigns().size(); ++d) {
    Orb_Design *design = designMgr->GetDesigns()[d];
    announce(design);
    for (std::size_t v = 0; v < design->GetViews().size(); ++v) {
      Orb_View *view = design->GetViews()[v];
      announce(view);
      if (view->GetBlock())
        WalkBlockTree(view->GetBlock(), announce);
      for (std::size_t n = 0; n < view->GetNetworks().size(); ++n)
        announce(view->GetNetworks()[n]);
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
  Orb_VisitPostOrder(object, [this](Orb_Persistent *owned) { FireDelete(owned); });
  Unlink(object);
  Free(object);
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
      static_cast<Orb_Block *>(parent)->m_Blocks.Remove(static_cast<Orb_Block *>(object));
    break;
  case Orb_Kind::Pin:
    static_cast<Orb_Block *>(parent)->m_Pins.Remove(static_cast<Orb_Pin *>(object));
    break;
  case Orb_Kind::Signal:
    static_cast<Orb_Block *>(parent)->m_Signals.Remove(static_cast<Orb_Signal *>(object));
    break;
  case Orb_Kind::Network:
    static_cast<Orb_View *>(parent)->m_Networks.Remove(static_cast<Orb_Network *>(object));
    break;
  }
}

void Orb_Model::Free(Orb_Persistent *object, bool keepLinks) {
  switch (object->GetKind()) {
  case Orb_Kind::DesignMgr:
    for (Orb_Design *design : static_cast<Orb_DesignMgr *>(object)->GetDesigns())
      Free(design, false);
    break;
  case Orb_Kind::Design:
    for (Orb_View *view : static_cast<Orb_Design *>(object)->GetViews())
      Free(view, false);
    break;
  case Orb_Kind::View: {
    auto *view = static_cast<Orb_View *>(object);
    for (Orb_Network *network : view->GetNetworks())
      Free(network, false);
    if (view->m_pTopBlock)
      Free(view->m_pTopBlock, false);
    break;
  }
  case Orb_Kind::Block: {
    auto *block = static_cast<Orb_Block *>(object);
    // Signals before pins: a signal lets go of all its pins at once, so the
    // pins connected to it (often its children's) have nothing to undo.
    for (Orb_Signal *signal : block->GetSignals())
      Free(signal, keepLinks);
    for (Orb_Pin *pin : block->GetPins())
      Free(pin, keepLinks);
    for (Orb_Block *child : block->GetBlocks())
      Free(child, keepLinks);
    break;
  }
  case Orb_Kind::Pin:
    if (keepLinks)
      static_cast<Orb_Pin *>(object)->Disconnect();
    break;
  case Orb_Kind::Signal: {
    auto *signal = static_cast<Orb_Signal *>(object);
    if (!keepLinks)
      break;
    for (Orb_Pin *pin : signal->m_Pins)
      pin->m_pSignal = nullptr;
    if (signal->m_pNetwork)
      signal->m_pNetwork->RemoveSignal(signal);
    break;
  }
  case Orb_Kind::Network: {
    auto *network = static_cast<Orb_Network *>(object);
    if (!keepLinks)
      break;
    for (Orb_Signal *signal : network->m_Signals)
      signal->m_pNetwork = nullptr;
    break;
  }
  }
  delete object;
}

// ---------------------------------------------------------------------------
// Dump

void Orb_Persistent::DebugDump(Port::Stream *stream, int indent) const {
  Orb_Debug::Printf(stream, indent, "%s <%s>\n", Orb_KindName(m_Kind), m_Name.c_str());
  DumpProperties(stream, indent + 1);
  for (Orb_ModelDerived *context : m_pModel->GetContexts())
    if (Orb_ClientObject *client = context->GetClient(this))
      client->DebugDumpCallback(stream, indent + 1);
}

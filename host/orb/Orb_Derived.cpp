// Bridge, events and client bases.

#include "Orb_Derived.h"

#include "Orb_Debug.h"
#include "Orb_Exception.h"

#include <cassert>
#include <cstdint>
#include <string>

namespace {
char const *const kSource = "host/Orb_Derived";
}

// ---------------------------------------------------------------------------
// Orb_Context

Orb_ClientObject *Orb_Context::GetClient(Orb_Persistent const *object) const {
  // Bridge ids are numbered per host model: another model's object would
  // find the client of an unrelated object here.
  if (!object || object->GetModel() != m_pOrbModel)
    return nullptr;
  return GetBridgeHandle(object->GetKind())[object->GetBridgeId()];
}

Orb_ClientObject *Orb_Context::Specialize(Orb_Persistent *object) {
  if (!object)
    return nullptr;
  CheckOwnModel(object);
  if (Orb_ClientObject *client = GetClient(object))
    return client;
  // Orb_ModelDerived is the only context there is.
  static_cast<Orb_ModelDerived *>(this)->FireSpecialize(object, false);
  return GetClient(object);
}

Orb_DesignMgrDerived *Orb_Context::GetClient(Orb_DesignMgr const *object) const {
  return static_cast<Orb_DesignMgrDerived *>(
      GetClient(static_cast<Orb_Persistent const *>(object)));
}

Orb_DesignMgrDerived *Orb_Context::Specialize(Orb_DesignMgr *object) {
  return static_cast<Orb_DesignMgrDerived *>(Specialize(static_cast<Orb_Persistent *>(object)));
}

Orb_DesignDerived *Orb_Context::GetClient(Orb_Design const *object) const {
  return static_cast<Orb_DesignDerived *>(GetClient(static_cast<Orb_Persistent const *>(object)));
}

Orb_DesignDerived *Orb_Context::Specialize(Orb_Design *object) {
  return static_cast<Orb_DesignDerived *>(Specialize(static_cast<Orb_Persistent *>(object)));
}

Orb_ViewDerived *Orb_Context::GetClient(Orb_View const *object) const {
  return static_cast<Orb_ViewDerived *>(GetClient(static_cast<Orb_Persistent const *>(object)));
}

Orb_ViewDerived *Orb_Context::Specialize(Orb_View *object) {
  return static_cast<Orb_ViewDerived *>(Specialize(static_cast<Orb_Persistent *>(object)));
}

Orb_BlockDerived *Orb_Context::GetClient(Orb_Block const *object) const {
  return static_cast<Orb_BlockDerived *>(GetClient(static_cast<Orb_Persistent const *>(object)));
}

Orb_BlockDerived *Orb_Context::Specialize(Orb_Block *object) {
  return static_cast<Orb_BlockDerived *>(Specialize(static_cast<Orb_Persistent *>(object)));
}

Orb_PinDerived *Orb_Context::GetClient(Orb_Pin const *object) const {
  return static_cast<Orb_PinDerived *>(GetClient(static_cast<Orb_Persistent const *>(object)));
}

Orb_PinDerived *Orb_Context::Specialize(Orb_Pin *object) {
  return static_cast<Orb_PinDerived *>(Specialize(static_cast<Orb_Persistent *>(object)));
}

Orb_SignalDerived *Orb_Context::GetClient(Orb_Signal const *object) const {
  return static_cast<Orb_SignalDerived *>(GetClient(static_cast<Orb_Persistent const *>(object)));
}

Orb_SignalDerived *Orb_Context::Specialize(Orb_Signal *object) {
  return static_cast<Orb_SignalDerived *>(Specialize(static_cast<Orb_Persistent *>(object)));
}

Orb_NetworkDerived *Orb_Context::GetClient(Orb_Network const *object) const {
  return static_cast<Orb_NetworkDerived *>(GetClient(static_cast<Orb_Persistent const *>(object)));
}

Orb_NetworkDerived *Orb_Context::Specialize(Orb_Network *object) {
  return static_cast<Orb_NetworkDerived *>(Specialize(static_cast<Orb_Persistent *>(object)));
}

std::size_t Orb_Context::GetClientCount() const {
  std::size_t count = 0;
  for (auto const &table : m_Bridge)
    for (Orb_ClientObject *client : table)
      count += client != nullptr;
  return count;
}

void Orb_Context::CheckOwnModel(Orb_Persistent const *object) const {
  if (object->GetModel() != m_pOrbModel)
    throw Orb_Exception(kSource, __LINE__, object->GetName(),
                        (std::string("The ") + Orb_KindName(object->GetKind()) + " <" +
                         object->GetName() + "> belongs to host model <" +
                         object->GetModel()->GetName() + ">, not to this context's model <" +
                         m_pOrbModel->GetName() + ">.")
                            .c_str());
}

void Orb_Context::Register(Orb_ClientObject *client) {
  Orb_Persistent *object = client->GetOrbObject();
  CheckOwnModel(object);
  auto &table = m_Bridge[static_cast<unsigned>(object->GetKind())];
  unsigned const id = object->GetBridgeId();
  // A load registers in id order: one more entry each time.
  if (id == table.size())
    table.push_back(nullptr);
  else if (id > table.size())
    table.resize(id + 1, nullptr);
  if (table[id])
    throw Orb_Exception(kSource, __LINE__, object->GetName(),
                        "The object already has a client in this context.");
  table[id] = client;
}

void Orb_Context::ReserveBridges(unsigned const (&limits)[Orb_KindCount]) {
  for (unsigned k = 0; k < Orb_KindCount; ++k)
    m_Bridge[k].reserve(limits[k]);
}

void Orb_Context::Unregister(Orb_ClientObject *client) {
  Orb_Persistent *object = client->GetOrbObject();
  auto &table = m_Bridge[static_cast<unsigned>(object->GetKind())];
  unsigned const id = object->GetBridgeId();
  if (id < table.size() && table[id] == client)
    table[id] = nullptr;
}

// ---------------------------------------------------------------------------
// Orb_Sync

Orb_Sync::~Orb_Sync() = default;

void Orb_Sync::SetEventNotifyAll() {
  assert(m_pSyncModel && "SetEventNotifyAll before the client model is attached");
  m_pSyncModel->Subscribe(static_cast<Orb_ModelDerived *>(this));
  m_Subscribed = true;
}

void Orb_Sync::FireSpecialize(Orb_Persistent *object, bool create) {
  switch (object->GetKind()) {
#define ORB_KIND(Kind, shown)                                                                      \
  case Orb_Kind::Kind: {                                                                           \
    auto *o = static_cast<Orb_##Kind *>(object);                                                   \
    create ? SyncEventSpecialize##Kind##OnCreate(o) : SyncEventSpecialize##Kind##OnLoad(o);        \
    break;                                                                                         \
  }
#include "Orb_Kinds.def"
  }
}

void Orb_Sync::FireDelete(Orb_Persistent *object) {
  switch (object->GetKind()) {
#define ORB_KIND(Kind, shown)                                                                      \
  case Orb_Kind::Kind:                                                                             \
    SyncEventDelete##Kind(static_cast<Orb_##Kind *>(object));                                      \
    break;
#include "Orb_Kinds.def"
  }
}

// ---------------------------------------------------------------------------
// Client bases

// NOLINTNEXTLINE(misc-new-delete-overloads): matched by the sized delete
void *Orb_ClientObject::operator new(std::size_t size) { return Orb_SmallAllocate(size); }

void Orb_ClientObject::operator delete(void *pointer, std::size_t size) noexcept {
  Orb_SmallRelease(pointer, size);
}

Orb_ClientObject::Orb_ClientObject(Orb_Context *context, Orb_Persistent *object)
    : m_pOrbObject(object) {
  assert(context && object && "a client needs a context and a host object");
  context->Register(this);
}

Orb_ClientObject::~Orb_ClientObject() {
  if (Orb_Context *context = GetContext())
    context->Unregister(this);
}

Orb_Context *Orb_ClientObject::GetContext() const {
  // Registration checked that the object is of the context's model, and a
  // context stays attached to its model while it holds clients.
  for (Orb_ModelDerived *context : m_pOrbObject->GetModel()->GetContexts())
    if (context->GetClient(m_pOrbObject) == this)
      return context;
  return nullptr;
}

void Orb_ClientObject::DebugDumpCallback(Port::Stream * /*stream*/, int /*indent*/) const {}

Orb_ModelDerived *Orb_ClientObject::GetClientOrbModel() const {
  return static_cast<Orb_ModelDerived *>(GetContext());
}

void Orb_ClientObject::DbgHost() const {
  Orb_Debug::Printf("%s <%s>\n", Orb_KindName(m_pOrbObject->GetKind()), m_pOrbObject->GetName());
  // A null stream follows the printer's own output.
  m_pOrbObject->DumpProperties(nullptr, 1);
}

Orb_BlockDerived *Orb_PinDerived::GetParent() const {
  return GetContext()->Specialize(GetOrbPin()->GetParent());
}

Orb_BlockDerived *Orb_SignalDerived::GetParent() const {
  return GetContext()->Specialize(GetOrbSignal()->GetParent());
}

Orb_NetworkDerived *Orb_SignalDerived::GetNetwork() const {
  return GetContext()->Specialize(GetOrbSignal()->GetNetwork());
}

Orb_ViewDerived *Orb_NetworkDerived::GetParent() const {
  return GetContext()->Specialize(GetOrbNetwork()->GetParent());
}

Orb_BlockDerived *Orb_BlockDerived::OrbResolve(Orb_Context const *context, Orb_Block const *block) {
  return context ? context->GetClient(block) : nullptr;
}

Orb_BlockDerived *Orb_BlockDerived::GetParent() const {
  return GetContext()->Specialize(GetOrbBlock()->GetParent());
}

Orb_ViewDerived *Orb_BlockDerived::GetView() const {
  return GetContext()->Specialize(GetOrbBlock()->GetView());
}

Orb_PinDerived *Orb_BlockDerived::GetPinByName(char const *name) const {
  return GetContext()->Specialize(GetOrbBlock()->GetPinByName(name));
}

Orb_BlockDerived *Orb_BlockDerived::GetBlockByName(char const *name) const {
  return GetContext()->Specialize(GetOrbBlock()->GetBlockByName(name));
}

Orb_BlockDerived *Orb_BlockDerived::CreateBlock(char const *name, int flags) {
  return GetContext()->Specialize(GetOrbBlock()->CreateBlock(name, flags));
}

Orb_PinDerived *Orb_BlockDerived::CreatePin(char const *name, Orb_Pin::PIN_DIRECTION direction) {
  return GetContext()->Specialize(GetOrbBlock()->CreatePin(name, direction));
}

Orb_SignalDerived *Orb_BlockDerived::CreateSignal(char const *name) {
  return GetContext()->Specialize(GetOrbBlock()->CreateSignal(name));
}

Orb_DesignDerived *Orb_ViewDerived::GetParent() const {
  return GetContext()->Specialize(GetOrbView()->GetParent());
}

Orb_BlockDerived *Orb_ViewDerived::GetBlock() const {
  return GetContext()->Specialize(GetOrbView()->GetBlock());
}

Orb_BlockDerived *Orb_ViewDerived::CreateTopBlock(char const *name) {
  return GetContext()->Specialize(GetOrbView()->CreateTopBlock(name));
}

Orb_NetworkDerived *Orb_ViewDerived::CreateNetwork(char const *name) {
  return GetContext()->Specialize(GetOrbView()->CreateNetwork(name));
}

namespace {
void CollectBlocks(Orb_Context *context, Orb_Block *block, std::vector<Orb_BlockDerived *> &out) {
  out.push_back(context->Specialize(block));
  for (std::size_t i = 0; i < block->GetBlocks().size(); ++i)
    CollectBlocks(context, block->GetBlocks()[i], out);
}
} // namespace

void Orb_ViewDerived::LoadAllBlocks(std::vector<Orb_BlockDerived *> &blocks) const {
  if (Orb_Block *top = GetOrbView()->GetBlock())
    CollectBlocks(GetContext(), top, blocks);
}

Orb_DesignMgrDerived *Orb_DesignDerived::GetParent() const {
  return GetContext()->Specialize(GetOrbDesign()->GetParent());
}

Orb_ViewDerived *Orb_DesignDerived::GetViewByName(char const *name) const {
  return GetContext()->Specialize(GetOrbDesign()->GetViewByName(name));
}

Orb_ViewDerived *Orb_DesignDerived::CreateView(char const *name) {
  return GetContext()->Specialize(GetOrbDesign()->CreateView(name));
}

Orb_DesignDerived *Orb_DesignMgrDerived::GetDesignByName(char const *name) const {
  return GetContext()->Specialize(GetOrbDesignMgr()->GetDesignByName(name));
}

Orb_DesignDerived *Orb_DesignMgrDerived::CreateDesign(char const *name) {
  return GetContext()->Specialize(GetOrbDesignMgr()->CreateDesign(name));
}

// ---------------------------------------------------------------------------
// Orb_ModelDerived

Orb_ModelDerived::Orb_ModelDerived(char const *name, char const *dbName, char const *path,
                                   bool readOnly)
    : Orb_Context(nullptr),
      m_pOwnedModel(std::make_unique<Orb_Model>(name, dbName, path, readOnly)) {
  m_pOrbModel = m_pOwnedModel.get();
  m_pSyncModel = m_pOrbModel;
  m_pOrbModel->Attach(this);
}

Orb_ModelDerived::Orb_ModelDerived(Orb_Model *model) : Orb_Context(model) {
  assert(model && "Orb_ModelDerived needs a host model");
  m_pSyncModel = model;
  model->Attach(this);
}

Orb_ModelDerived::~Orb_ModelDerived() {
  Orb_Model *model = GetOrbModel();
  {
    // Client destructors may delete clients or host objects: the hold keeps
    // host objects in memory while the walk goes on, and the walk looks each
    // client up when it gets there.
    Orb_Model::FreeHold hold(*model);
    auto const designMgrs = model->GetDesignMgrs();
    for (std::size_t i = 0; i < designMgrs.size(); ++i)
      Orb_VisitPostOrder(designMgrs[i],
                         [this](Orb_Persistent *object) { delete GetClient(object); });
    // Whatever the walk missed (a destructor that moved objects about) or a
    // destructor specialized behind it.
    for (auto &table : m_Bridge)
      for (std::size_t id = 0; id < table.size(); ++id)
        delete table[id];
  }
  model->Detach(this);
  // m_pOwnedModel, if any, goes with this object.
}

Orb_DesignMgrDerived *Orb_ModelDerived::CreateDesignMgr(char const *name) {
  return Specialize(GetOrbModel()->CreateDesignMgr(name));
}

Orb_DesignMgrDerived *Orb_ModelDerived::GetDesignMgrByName(char const *name) {
  return Specialize(GetOrbModel()->GetDesignMgrByName(name));
}

void Orb_ModelDerived::Dbg() const {
  Orb_Model const *model = GetOrbModel();
  Orb_Debug::Printf("model <%s> database <%s>\n", model->GetName(), model->GetDbName());
  for (unsigned k = 0; k < Orb_KindCount; ++k) {
    auto const kind = static_cast<Orb_Kind>(k);
    Orb_Debug::Printf("  %ss: %lU\n", Orb_KindName(kind),
                      static_cast<std::uint64_t>(model->GetObjectCount(kind)));
  }
}

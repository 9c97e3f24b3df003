#include "Lum_TdmBlock.h"

#include "Lum_TdmClient.h"
#include "Lum_TdmCommit.h"
#include "Lum_TdmDbg.h"
#include "Lum_TdmLoadRules.h"
#include "Lum_TdmModel.h"
#include "Lum_TdmNetwork.h"
#include "Lum_TdmPin.h"
#include "Lum_TdmPinAlpaSorter.h"
#include "Lum_TdmSignal.h"
#include "Lum_TdmTypePinMap.h"
#include "Lum_TdmView.h"

#include "Lum_Exception.h"
#include "Lum_TdmSchema.h"
#include "Lum_Tlm.h"
#include "Lum_TlmTypeID.h"
#include "Ora_GraftMgr.h"
#include "Port_String.h"
#include "UT_TIMESTAMP.h"

#include <algorithm>
#include <cassert>
#include <cstdint>
#include <cstring>
#include <string>
#include <string_view>
#include <type_traits>
#include <unordered_map>
#include <unordered_set>
#include <utility>
#include <vector>

namespace {

char const kSourcePath[] = "../s/Lum_TdmBlock";
char const kRevision[] = "$Revision: 1.1 $";

using Lum_TdmSchema::kBlockPinMap;
using Lum_TdmSchema::kBlockType;

// A pin whose name differs from its type pin's. A pin without a type pin is
// not one: it has nothing to record.
bool IsMappedPin(Lum_TdmPin const *pin) {
  Lum_TlmPin const *typePin = pin->GetTypePin();
  return typePin && std::strcmp(pin->GetName(), typePin->GetName()) != 0;
}

// Calls `visit` with each host object of `objects` (a block's children or
// pins, in host order) as its client, until it returns true; returns that
// client or null. The bridge table is fetched once for the walk.
template <class Client, class Range, class Visit>
Client *FindClient(Orb_Context *context, Range const &objects, Visit const &visit) {
  if (objects.empty())
    return nullptr;
  using Host = std::remove_pointer_t<typename Range::value_type>;
  Orb_BridgeHandle const bridge = context->GetBridgeHandle(Host::kKind);
  for (std::size_t i = 0; i < objects.size(); ++i) {
    Client *client = Lum_TdmClient::Of<Client>(context, bridge, objects[i]);
    if (visit(client))
      return client;
  }
  return nullptr;
}

template <class Visit> Lum_TdmBlock *FindChild(Lum_TdmBlock const *block, Visit const &visit) {
  return FindClient<Lum_TdmBlock>(block->GetContext(), block->GetBlocks(), visit);
}

template <class Visit> Lum_TdmPin *FindPin(Lum_TdmBlock const *block, Visit const &visit) {
  return FindClient<Lum_TdmPin>(block->GetContext(), block->GetPins(), visit);
}

// Destroys the clients that `context` holds for what a graft put under
// `block`, so that each is specialized afresh, and bound from its copied
// properties, when next reached: the block's signals with their networks,
// then each child block's pins and the child itself, followed at once by the
// child's own contents, in host order. The block and its own pins keep
// theirs. Walks with a stack of its own, as a hierarchy may be deep.
void DiscardGraftedClients(Orb_Block const *block, Orb_Context *context) {
  struct Frame {
    Orb_Block const *block;
    std::size_t nextChild;
  };
  std::vector<Frame> stack;
  auto enter = [&stack, context](Orb_Block const *entered) {
    for (Orb_Signal const *signal : entered->GetSignals()) {
      delete context->GetClient(signal);
      if (Orb_Network const *network = signal->GetNetwork())
        delete context->GetClient(network);
    }
    stack.push_back(Frame{entered, 0});
  };
  enter(block);
  while (!stack.empty()) {
    Frame &frame = stack.back();
    auto const children = frame.block->GetBlocks();
    if (frame.nextChild == children.size()) {
      stack.pop_back();
      continue;
    }
    Orb_Block const *child = children[frame.nextChild++];
    for (Orb_Pin const *pin : child->GetPins())
      delete context->GetClient(pin);
    delete context->GetClient(child);
    enter(child);
  }
}

// Calls UnregisterGraftEventHandlers when it goes out of scope, so that a
// graft that throws does not leave the model's handlers registered.
class GraftHooks {
public:
  explicit GraftHooks(Lum_TdmModel *model) : m_pModel(model) {
    m_pModel->RegisterGraftEventHandlers();
  }
  ~GraftHooks() {
    if (m_pModel)
      m_pModel->UnregisterGraftEventHandlers();
  }
  GraftHooks(GraftHooks const &) = delete;
  GraftHooks &operator=(GraftHooks const &) = delete;
  void Unregister() {
    Lum_TdmModel *model = m_pModel;
    m_pModel = nullptr;
    model->UnregisterGraftEventHandlers();
  }

private:
  Lum_TdmModel *m_pModel;
};

// The type block that the next open binds a block bound to `typeBlock` to.
Lum_TlmBlock const *ReopenedTypeBlock(Lum_TlmBlock const *typeBlock) {
  // The stored tag holds the block's name: a hierarchy block of a type
  // block, which is named like it, comes back as the type block.
  Lum_TlmBlock const *named =
      typeBlock->GetLibrary()->GetTypeBlock(Port::StringBase<char>(typeBlock->GetName()));
  return named ? named : typeBlock;
}

char const *RefusedPin(Lum_TdmLoadRules::Refusal const &refusal) {
  return refusal.unmatched ? refusal.unmatched->GetName() : refusal.collision->GetName();
}

std::string RefusalMessage(Lum_TdmLoadRules::Refusal const &refusal, char const *block,
                           Lum_TlmBlock const *typeBlock) {
  if (refusal.unmatched) {
    std::string const pin = refusal.unmatched->GetName();
    return "Pin <" + pin + "> of block <" + block +
           "> is connected but has no type pin of type block <" + typeBlock->GetName() +
           ">: the next open would refuse it. Bind it to a type pin (SetTypeBlock with a pin "
           "map), rename it after a type pin, or leave it unconnected.";
  }
  std::string const pin = refusal.collision->GetName();
  return "Pin <" + pin + "> of block <" + block + "> holds the name of type pin <" + pin +
         "> of type block <" + typeBlock->GetName() +
         ">, which no pin is bound to: the next open would have to create that type pin and "
         "could not. Bind a pin to <" +
         pin + ">, rename pin <" + pin + ">, or give the block every pin of its type block.";
}

} // namespace

// The block adds one pointer to its host base; whatever else a binding needs
// lives in the view.
static_assert(sizeof(Lum_TdmBlock) == sizeof(Orb_BlockT<Lum_TdmTraits>) + sizeof(void *),
              "Lum_TdmBlock carries only its type block");

Lum_TdmBlock::Lum_TdmBlock(Lum_TdmModel *model, Orb_Block *block, bool isNew)
    : Orb_BlockT<Lum_TdmTraits>(model, block), m_pTypeBlock(nullptr) {
  if (isNew)
    CommitTypeProperties();
  else
    ResolveTypeBlock();
}

Lum_TdmBlock::~Lum_TdmBlock() = default;

void Lum_TdmBlock::InitTypeBlock() {}

// ---------------------------------------------------------------------------
// Binding on load

void Lum_TdmBlock::ResolveTypeBlock() {
  Orb_Property const *stored = GetPropertyByName(kBlockType);
  if (!stored)
    return;
  std::string_view const storedType = stored->GetValue();
  Lum_TdmView const *view = GetView();
  Lum_TlmBlock const *typeBlock = view->FindTypeBlock(storedType);
  if (!typeBlock) {
    std::string libraryName;
    std::string typeBlockName;
    Lum_TdmLoadRules::SplitStoredType(std::string(storedType), libraryName, typeBlockName);
    Lum_TlmLibrary const *library = view->GetLibrary(Port::StringBase<char>(libraryName.c_str()));
    if (!library)
      throw Lum_ExceptionCorruptDatabase("Lum", kSourcePath, kRevision, __LINE__,
                                         libraryName.c_str(), Lum_TdmLoadRules::kLibraryNotFound,
                                         false);
    typeBlock = library->GetTypeBlock(Port::StringBase<char>(typeBlockName.c_str()));
    if (!typeBlock)
      throw Lum_ExceptionCorruptDatabase(
          "Lum", kSourcePath, kRevision, __LINE__, typeBlockName.c_str(),
          Lum_TdmLoadRules::TypeBlockMissingMessage(typeBlockName, libraryName).c_str(), false);
    view->NoteTypeBlock(storedType, typeBlock);
  }
  m_pTypeBlock = typeBlock;
  ReconcilePins(typeBlock);
  InitTypeBlock();
}

void Lum_TdmBlock::ReconcilePins(Lum_TlmBlock const *typeBlock) {
  Orb_Context *context = GetContext();
  auto const pins = GetOrbBlock()->GetPins();
  Orb_BridgeHandle const bridge = context->GetBridgeHandle(Orb_Kind::Pin);
  auto clientOf = [&](Orb_Pin *pin) { return Lum_TdmClient::Of<Lum_TdmPin>(context, bridge, pin); };

  if (!typeBlock) {
    for (std::size_t i = 0; i < pins.size(); ++i)
      clientOf(pins[i])->SetTypePin(nullptr);
    return;
  }

  // The map's views point into the property, which nothing touches before
  // the map is dropped.
  Lum_TdmLoadRules::NameMap nameMap;
  Lum_TdmLoadRules::ReadPinMap(GetOrbBlock(), nameMap);

  // The second phase creates what the first phase left untaken. The first
  // phase creates no pin, so whether the second will run is known now, and
  // the taken type pins are noted only then.
  bool const createMissing = Lum_TdmLoadRules::CreatesMissing(typeBlock, GetOrbBlock());
  std::vector<Lum_TlmPin const *> taken;
  if (createMissing)
    taken.reserve(pins.size());

  // First phase: every pin takes the type pin of its (mapped) name.
  Orb_Block const *typeHost = typeBlock->GetOrbBlock();
  auto const typePins = typeHost->GetPins();
  Orb_Context *typeContext = typeBlock->GetContext();
  for (std::size_t i = 0; i < pins.size(); ++i) {
    Orb_Pin *pin = pins[i];
    auto const *typePin = static_cast<Lum_TlmPin const *>(typeContext->Specialize(
        Lum_TdmLoadRules::FindTypePin(typeHost, typePins, i, pin, nameMap)));
    if (Lum_TdmLoadRules::IsUnmatched(pin, typePin))
      throw Lum_ExceptionCorruptDatabase("Lum", kSourcePath, kRevision, __LINE__, pin->GetName(),
                                         Lum_TdmLoadRules::kPinNotFound, false);
    clientOf(pin)->SetTypePin(typePin);
    if (createMissing && typePin)
      taken.push_back(typePin);
  }
  if (!createMissing)
    return;

  // Second phase: creation in the type block's pin order, then the sort.
  nameMap.clear();
  Lum_TdmLoadRules::ForEachUntaken(
      typeBlock, GetOrbBlock(), taken, [&](Lum_TlmPin const *typePin, bool collides) {
        if (collides)
          throw Lum_ExceptionCorruptDatabase(
              "Lum", kSourcePath, kRevision, __LINE__,
              GetOrbBlock()->GetView()->GetParent()->GetName(),
              Lum_TdmLoadRules::PatchUpMessage(GetName(), typePin->GetName(), typeBlock->GetName())
                  .c_str(),
              false);
        CreatePin(typePin->GetName(), typePin->GetDirection())->SetTypePin(typePin);
      });
  SortPinsByName();
}

void Lum_TdmBlock::SortPinsByName() {
  PinAlpaSorter sorter;
  Orb_SortFtor<Orb_Pin> const byName(&sorter);
  SortPins(byName);
}

// ---------------------------------------------------------------------------
// Creating children from type blocks

bool Lum_TdmBlock::IsOfViewLibrary(Lum_TlmBlock const *typeBlock) const {
  // A type block belongs to the library that shares its client model.
  Orb_ModelDerived const *typeModel = typeBlock->GetClientOrbModel();
  std::vector<Lum_TlmLibrary const *> const &libraries = GetView()->GetLibraryList();
  return std::any_of(libraries.begin(), libraries.end(),
                     [typeModel](Lum_TlmLibrary const *library) {
                       return library && library->GetClientOrbModel() == typeModel;
                     });
}

Lum_TdmBlock *Lum_TdmBlock::CreateTypedBlock(char const *name, Lum_TlmBlock const *typeBlock,
                                             bool graft, bool pins) {
  if (!typeBlock)
    throw Lum_ExceptionInvalidTypeBlock("Lum", kSourcePath, kRevision, __LINE__, GetName(),
                                        "Null type block specified in CreateTypedBlock.", false);
  if (!IsOfViewLibrary(typeBlock))
    throw Lum_ExceptionCorruptDatabase("Lum", kSourcePath, kRevision, __LINE__,
                                       typeBlock->GetName(), Lum_TdmLoadRules::kLibraryNotFound,
                                       false);

  Lum_TdmBlock *child = CreateBlock(name, 0);
  if (pins) {
    std::size_t const typePinCount = typeBlock->GetPins().size();
    for (std::size_t i = 0; i < typePinCount; ++i) {
      Lum_TlmPin const *typePin = typeBlock->GetPin(i);
      child->CreatePin(typePin->GetName(), typePin->GetDirection())->SetTypePin(typePin);
    }
  }
  child->m_pTypeBlock = typeBlock;
  child->InitTypeBlock();

  if (!graft)
    return child;
  Port::StringBase<char> const viewName(GetView()->GetName());
  if (!typeBlock->HasHier(viewName))
    return child;
  Lum_TdmModel *model = GetClientOrbModel();
  GraftHooks hooks(model);
  Ora_GraftMgr grafter(false, false);
  grafter.SetBlockBackReferences(true);
  grafter.SetNetworkBackReferences(true);
  grafter.Graft(typeBlock->GetHier(viewName), child->GetOrbBlock());
  model->CleanupGraftProps();
  hooks.Unregister();
  DiscardGraftedClients(child->GetOrbBlock(), GetContext());
  return child;
}

Lum_TdmBlock *Lum_TdmBlock::CreateUntypedBlock(char const *name, Lum_TlmBlock const *typeBlock) {
  if (!typeBlock)
    throw Lum_ExceptionInvalidTypeBlock("Lum", kSourcePath, kRevision, __LINE__, GetName(),
                                        "Null type block specified in CreateUntypedBlock.", false);
  Lum_TdmBlock *child = CreateBlock(name, 0);
  Ora_GraftMgr pinCopier(false, false);
  std::size_t const typePinCount = typeBlock->GetPins().size();
  for (std::size_t i = 0; i < typePinCount; ++i) {
    Lum_TlmPin const *typePin = typeBlock->GetPin(i);
    Lum_TdmPin *pin = child->CreatePin(typePin->GetName(), typePin->GetDirection());
    pinCopier.CopyPinProperties(typePin->GetOrbPin(), pin->GetOrbPin());
  }
  std::string association = typeBlock->GetClientOrbModel()->GetDbName();
  association += ':';
  association += typeBlock->GetName();
  association += ' ';
  association += UT_TIMESTAMP().getTimeStampString();
  child->CreatePropertyString(Lum_TdmSchema::kLibraryAssociation, association.c_str());

  Port::StringBase<char> const viewName(GetView()->GetName());
  if (typeBlock->HasHier(viewName)) {
    GraftHooks hooks(GetClientOrbModel());
    Ora_GraftMgr grafter(false, false);
    grafter.Graft(typeBlock->GetHier(viewName), child->GetOrbBlock());
    hooks.Unregister();
  }
  return child;
}

// ---------------------------------------------------------------------------
// Rebinding

void Lum_TdmBlock::VerifyTypeBlock(Lum_TlmBlock const *typeBlock) const {
  assert(typeBlock && "VerifyTypeBlock needs a type block");
  if (!IsOfViewLibrary(typeBlock))
    throw Lum_ExceptionCorruptDatabase("Lum", kSourcePath, kRevision, __LINE__,
                                       typeBlock->GetName(), Lum_TdmLoadRules::kLibraryNotFound,
                                       false);
  Orb_Block const *typeHost = typeBlock->GetOrbBlock();
  for (Orb_Pin const *pin : GetOrbBlock()->GetPins())
    if (pin->GetSignal() && !typeHost->GetPinByName(pin->GetName()))
      throw Lum_ExceptionCorruptDatabase("Lum", kSourcePath, kRevision, __LINE__,
                                         typeBlock->GetName(),
                                         "Mismatch between design block pins and type block "
                                         "pins.\n",
                                         false);
}

void Lum_TdmBlock::SetTypeBlock(Lum_TlmBlock const *typeBlock) {
  if (typeBlock == m_pTypeBlock)
    return;
  if (typeBlock) {
    try {
      VerifyTypeBlock(typeBlock);
    } catch (Port::Exception const &) {
      throw Lum_ExceptionInvalidTypeBlock("Lum", kSourcePath, kRevision, __LINE__,
                                          typeBlock->GetName(), "Could not resolve the Type Block.",
                                          false);
    }
  }

  // What the pins carry now, so that a failed reconciliation can be undone:
  // it may have rebound some pins and created others before it threw.
  Orb_Context *context = GetContext();
  Orb_BridgeHandle const bridge = context->GetBridgeHandle(Orb_Kind::Pin);
  auto const pins = GetOrbBlock()->GetPins();
  std::vector<std::pair<Orb_Pin *, Lum_TlmPin const *>> before;
  before.reserve(pins.size());
  for (Orb_Pin *pin : pins)
    before.emplace_back(pin, Lum_TdmClient::Of<Lum_TdmPin>(context, bridge, pin)->GetTypePin());
  try {
    ReconcilePins(typeBlock);
  } catch (...) {
    std::unordered_set<Orb_Pin const *> kept;
    kept.reserve(before.size());
    for (auto const &[pin, typePin] : before) {
      Lum_TdmClient::Of<Lum_TdmPin>(context, bridge, pin)->SetTypePin(typePin);
      kept.insert(pin);
    }
    std::vector<Orb_Pin *> created;
    for (Orb_Pin *pin : GetOrbBlock()->GetPins())
      if (!kept.count(pin))
        created.push_back(pin);
    for (Orb_Pin *pin : created)
      DeletePin(pin);
    throw;
  }
  m_pTypeBlock = typeBlock;
  InitTypeBlock();
}

void Lum_TdmBlock::SetTypeBlock(Lum_TlmBlock const *typeBlock, Lum_TdmTypePinMap const &pinMap) {
  if (typeBlock == m_pTypeBlock)
    return;
  Orb_Context *context = GetContext();
  Orb_BridgeHandle const bridge = context->GetBridgeHandle(Orb_Kind::Pin);
  auto const pins = GetOrbBlock()->GetPins();
  if (!typeBlock) {
    m_pTypeBlock = nullptr;
    for (Orb_Pin *pin : pins)
      Lum_TdmClient::Of<Lum_TdmPin>(context, bridge, pin)->SetTypePin(nullptr);
    InitTypeBlock();
    return;
  }
  try {
    VerifyTypeBlock(typeBlock);
  } catch (Port::Exception const &) {
    throw Lum_ExceptionCorruptDatabase("Lum", kSourcePath, kRevision, __LINE__,
                                       typeBlock->GetName(), Lum_TdmLoadRules::kLibraryNotFound,
                                       false);
  }
  if (pinMap.GetNumPins() > GetNumPins())
    throw Lum_ExceptionCorruptDatabase("Lum", kSourcePath, kRevision, __LINE__,
                                       typeBlock->GetName(),
                                       "The specified pin map has more pins then the library "
                                       "block.",
                                       false);

  // Every pin's mapping is checked before any pin changes.
  std::vector<std::pair<Lum_TdmPin *, Lum_TlmPin const *>> mapped;
  mapped.reserve(pins.size());
  for (Orb_Pin *hostPin : pins) {
    Lum_TdmPin *pin = Lum_TdmClient::Of<Lum_TdmPin>(context, bridge, hostPin);
    Lum_TlmPin const *typePin = pinMap.GetPinMapping(pin);
    if (!typePin || typePin->GetParent() != typeBlock)
      throw Lum_ExceptionCorruptDatabase("Lum", kSourcePath, kRevision, __LINE__, pin->GetName(),
                                         "Invalid type pin specified in type pin map.", false);
    mapped.emplace_back(pin, typePin);
  }
  // The commit stores the map: the next open must take it. The view's
  // LUM_DONT_CREATE_UNUSED_PINS does not count, as the commit removes it.
  std::size_t next = 0; // the host pins come in the order `mapped` has them
  Lum_TlmBlock const *reopened = ReopenedTypeBlock(typeBlock);
  Lum_TdmLoadRules::Refusal const refusal = Lum_TdmLoadRules::Predict(
      GetOrbBlock(), reopened, Lum_TdmLoadRules::CreatesMissing(reopened, GetOrbBlock(), false),
      [&](Orb_Pin *) { return reopened->GetPinByName(mapped[next++].second->GetName()); });
  if (refusal)
    throw Lum_ExceptionCorruptDatabase("Lum", kSourcePath, kRevision, __LINE__, RefusedPin(refusal),
                                       RefusalMessage(refusal, GetName(), reopened).c_str(), false);
  for (auto const &[pin, typePin] : mapped)
    pin->SetTypePin(typePin);
  m_pTypeBlock = typeBlock;
  InitTypeBlock();
}

// ---------------------------------------------------------------------------
// Typed queries

Lum_TlmBlock const *Lum_TdmBlock::GetTypeBlock(Orb_Context const *context) const {
  if (!m_pTypeBlock)
    return nullptr;
  Orb_Block const *typeHost = m_pTypeBlock->GetOrbBlock();
  if (!typeHost)
    return nullptr;
  // A context whose client of that block is no type block (another kind of
  // client model over the library) cannot resolve it either.
  auto const *resolved =
      dynamic_cast<Lum_TlmBlock const *>(Orb_BlockDerived::OrbResolve(context, typeHost));
  if (!resolved)
    throw Lum_ExceptionInvalidTypeBlock("Lum", kSourcePath, kRevision, __LINE__, GetName(),
                                        "Could not resolve the Type Block.", false);
  return resolved;
}

Orb_Block const *Lum_TdmBlock::GetNativeTypeBlock() const {
  return m_pTypeBlock ? m_pTypeBlock->GetOrbBlock() : nullptr;
}

bool Lum_TdmBlock::IsTypeOf(Lum_TlmBlockTypeID const &typeId) const {
  return typeId.RepresentsTypeBlock(m_pTypeBlock);
}

Lum_TdmBlock const *Lum_TdmBlock::GetFirstChildBlockOfType(Lum_TlmBlockTypeID const &typeId) const {
  return FindChild(this, [&typeId](Lum_TdmBlock const *child) {
    return typeId.RepresentsTypeBlock(child->m_pTypeBlock);
  });
}

Lum_TdmBlock *Lum_TdmBlock::GetFirstChildBlockOfType(Lum_TlmBlockTypeID const &typeId) {
  return const_cast<Lum_TdmBlock *>(std::as_const(*this).GetFirstChildBlockOfType(typeId));
}

Lum_TdmBlock const *Lum_TdmBlock::GetChildBlockOfType(Lum_TlmBlockTypeID const &typeId) const {
  return GetFirstChildBlockOfType(typeId);
}

Lum_TdmBlock *Lum_TdmBlock::GetChildBlockOfType(Lum_TlmBlockTypeID const &typeId) {
  return GetFirstChildBlockOfType(typeId);
}

void Lum_TdmBlock::GetChildBlocksOfType(Lum_TlmBlock const *typeBlock,
                                        std::vector<Lum_TdmBlock const *> &blocks) const {
  FindChild(this, [typeBlock, &blocks](Lum_TdmBlock const *child) {
    if (child->m_pTypeBlock == typeBlock)
      blocks.push_back(child);
    return false;
  });
}

void Lum_TdmBlock::GetChildBlocksOfType(Lum_TlmBlock const *typeBlock,
                                        std::vector<Lum_TdmBlock *> &blocks) {
  FindChild(this, [typeBlock, &blocks](Lum_TdmBlock *child) {
    if (child->m_pTypeBlock == typeBlock)
      blocks.push_back(child);
    return false;
  });
}

void Lum_TdmBlock::GetChildBlocksOfType(Lum_TlmBlockTypeID const &typeId,
                                        std::vector<Lum_TdmBlock const *> &blocks) const {
  FindChild(this, [&typeId, &blocks](Lum_TdmBlock const *child) {
    if (typeId.RepresentsTypeBlock(child->m_pTypeBlock))
      blocks.push_back(child);
    return false;
  });
}

void Lum_TdmBlock::GetChildBlocksOfType(Lum_TlmBlockTypeID const &typeId,
                                        std::vector<Lum_TdmBlock *> &blocks) {
  FindChild(this, [&typeId, &blocks](Lum_TdmBlock *child) {
    if (typeId.RepresentsTypeBlock(child->m_pTypeBlock))
      blocks.push_back(child);
    return false;
  });
}

std::vector<Lum_TdmBlock *> Lum_TdmBlock::GetChildBlocksOfType(Lum_TlmBlock const *typeBlock) {
  // Type blocks are compared by their host block, so that one of another
  // client model over the same library matches too.
  Orb_Block const *typeHost = typeBlock ? typeBlock->GetOrbBlock() : nullptr;
  std::vector<Lum_TdmBlock *> blocks;
  FindChild(this, [typeHost, &blocks](Lum_TdmBlock *child) {
    if (child->GetNativeTypeBlock() == typeHost)
      blocks.push_back(child);
    return false;
  });
  return blocks;
}

std::vector<Lum_TdmBlock const *>
Lum_TdmBlock::GetChildBlocksOfType(Lum_TlmBlock const *typeBlock) const {
  Orb_Block const *typeHost = typeBlock ? typeBlock->GetOrbBlock() : nullptr;
  std::vector<Lum_TdmBlock const *> blocks;
  FindChild(this, [typeHost, &blocks](Lum_TdmBlock const *child) {
    if (child->GetNativeTypeBlock() == typeHost)
      blocks.push_back(child);
    return false;
  });
  return blocks;
}

Lum_TdmPin const *Lum_TdmBlock::GetPinOfType(Lum_TlmPinTypeID const &typeId) const {
  return FindPin(this, [&typeId](Lum_TdmPin const *pin) { return pin->IsTypeOf(typeId); });
}

Lum_TdmPin *Lum_TdmBlock::GetPinOfType(Lum_TlmPinTypeID const &typeId) {
  return const_cast<Lum_TdmPin *>(std::as_const(*this).GetPinOfType(typeId));
}

Lum_TdmPin const *Lum_TdmBlock::GetPinOfType(Lum_TlmPin const *typePin) const {
  return FindPin(this, [typePin](Lum_TdmPin const *pin) { return pin->GetTypePin() == typePin; });
}

Lum_TdmPin *Lum_TdmBlock::GetPinOfType(Lum_TlmPin const *typePin) {
  return const_cast<Lum_TdmPin *>(std::as_const(*this).GetPinOfType(typePin));
}

// ---------------------------------------------------------------------------
// Pin order

bool Lum_TdmBlock::ManifestAllTypedPins() {
  if (!m_pTypeBlock || m_pTypeBlock->GetNumPins() <= GetNumPins())
    return false;
  Orb_Block const *host = GetOrbBlock();
  std::size_t const typePinCount = m_pTypeBlock->GetPins().size();
  for (std::size_t i = 0; i < typePinCount; ++i) {
    Lum_TlmPin const *typePin = m_pTypeBlock->GetPin(i);
    if (!host->GetPinByName(typePin->GetName()))
      CreatePin(typePin->GetName(), typePin->GetDirection())->SetTypePin(typePin);
  }
  SortPinsByName();
  return true;
}

void Lum_TdmBlock::NormalizePins() { SortPinsByName(); }

// ---------------------------------------------------------------------------
// Commit

void Lum_TdmBlock::CommitTypeProperties() {
  Orb_Property *stored = GetPropertyByName(kBlockType);
  if (m_pTypeBlock) {
    Port::StringBase<char> const tag = m_pTypeBlock->GetUniqueTag();
    if (stored && stored->GetKind() == Orb_Property::STRING)
      stored->SetStringValue(tag.str());
    else
      CreatePropertyString(kBlockType, tag.c_str());
  } else if (stored) {
    DeleteProperty(stored);
  }
  if (Orb_Property *pinMap = GetPropertyByName(kBlockPinMap))
    DeleteProperty(pinMap);
  if (!m_pTypeBlock)
    return;

  auto const pins = GetOrbBlock()->GetPins();
  if (pins.empty())
    return;
  Orb_Context *context = GetContext();
  Orb_BridgeHandle const bridge = context->GetBridgeHandle(Orb_Kind::Pin);
  auto clientOf = [&](Orb_Pin *pin) {
    return static_cast<Lum_TdmPin const *>(Lum_TdmClient::Of<Lum_TdmPin>(context, bridge, pin));
  };
  std::size_t first = 0;
  while (first < pins.size() && !IsMappedPin(clientOf(pins[first])))
    ++first;
  if (first == pins.size())
    return;
  Orb_Property *pinMap = CreatePropertyList(kBlockPinMap);
  for (std::size_t i = first; i < pins.size(); ++i) {
    Lum_TdmPin const *pin = clientOf(pins[i]);
    if (IsMappedPin(pin))
      pinMap->CreatePropertyString(pin->GetName(), pin->GetTypePin()->GetName());
  }
}

void Lum_TdmBlock::CommitToOrb() { CommitTypeProperties(); }

void Lum_TdmBlock::VerifyCommit(bool viewForbidsCreating) const {
  if (!m_pTypeBlock)
    return;
  // What the commit stores: each pin's type pin by name (through the pin
  // map when the names differ), nothing for a pin without one, which the
  // open then looks up by its own name.
  Orb_Context *context = GetContext();
  Orb_BridgeHandle const bridge = context->GetBridgeHandle(Orb_Kind::Pin);
  Lum_TlmBlock const *reopened = ReopenedTypeBlock(m_pTypeBlock);
  Lum_TdmLoadRules::Refusal const refusal = Lum_TdmLoadRules::Predict(
      GetOrbBlock(), reopened,
      Lum_TdmLoadRules::CreatesMissing(reopened, GetOrbBlock(), viewForbidsCreating),
      [&](Orb_Pin *pin) -> Lum_TlmPin const * {
        Lum_TlmPin const *typePin =
            Lum_TdmClient::Of<Lum_TdmPin>(context, bridge, pin)->GetTypePin();
        // A type pin of that very block is found by its name: no lookup.
        if (typePin && typePin->GetParent() == reopened)
          return typePin;
        return reopened->GetPinByName(typePin ? typePin->GetName() : pin->GetName());
      });
  if (refusal)
    throw Lum_ExceptionInvalidTypeBlock(
        "Lum", kSourcePath, kRevision, __LINE__, RefusedPin(refusal),
        RefusalMessage(refusal, GetName(), reopened).c_str(), false);
}

void Lum_TdmBlock::VerifyCommitTree() const {
  bool const forbidden = Lum_TdmLoadRules::ForbidsCreating(GetOrbBlock()->GetView());
  Orb_Context *context = GetContext();
  Orb_BridgeHandle const bridge = context->GetBridgeHandle(Orb_Kind::Block);
  VerifyCommit(forbidden);
  // A stack of its own, as a hierarchy may be deep.
  std::vector<Orb_Block *> stack{GetOrbBlock()};
  while (!stack.empty()) {
    Orb_Block *block = stack.back();
    stack.pop_back();
    for (Orb_Block *child : block->GetBlocks()) {
      Lum_TdmClient::Of<Lum_TdmBlock>(context, bridge, child)->VerifyCommit(forbidden);
      stack.push_back(child);
    }
  }
}

void Lum_TdmBlock::TraverseAndCommitToOrb() {
  // A commit of this subtree alone checks it first; within a view's commit
  // the view has checked every block.
  Lum_TdmView const *view = GetView();
  bool const outermost = !view->m_CommitVerified;
  if (outermost)
    VerifyCommitTree();
  view->m_CommitVerified = true;
  try {
    CommitSubtree();
  } catch (...) {
    if (outermost)
      view->m_CommitVerified = false;
    throw;
  }
  if (outermost)
    view->m_CommitVerified = false;
}

void Lum_TdmBlock::CommitSubtree() {
  CommitToOrb();
  Orb_Block const *host = GetOrbBlock();
  Lum_TdmCommitEach<Lum_TdmPin>(GetContext(), Orb_Kind::Pin, host->GetPins());
  Lum_TdmCommitEach<Lum_TdmSignal>(GetContext(), Orb_Kind::Signal, host->GetSignals());
  Lum_TdmCommitEach<Lum_TdmBlock>(GetContext(), Orb_Kind::Block, host->GetBlocks());
}

// ---------------------------------------------------------------------------
// Diagnostics

std::uint64_t Lum_TdmBlock::DbgMySize() const { return DbgClassSize() + DbgSecondarySize(); }

std::uint64_t Lum_TdmBlock::DbgClassSize() const { return sizeof(Lum_TdmBlock); }

std::uint64_t Lum_TdmBlock::DbgSecondarySize() const { return 0; }

void Lum_TdmBlock::DbgImpl() const {
  Lum_TdmDbgFrame<Lum_TdmBlock>(
      [this] {
        Orb_Debug::Printf("(Lum_TlmBlock *) m_pTypeBlock = <0x%x>, (%s)\n",
                          reinterpret_cast<std::uintptr_t>(m_pTypeBlock),
                          m_pTypeBlock ? m_pTypeBlock->GetName() : "");
      },
      [this] { Orb_BlockDerived::Dbg(); });
}

void Lum_TdmBlock::DebugDumpCallback(Port::Stream *stream, int indent) const {
  Lum_TdmDbgCallbackFrame(stream, indent, "Lum_TdmBlock Data\n", [] {});
}

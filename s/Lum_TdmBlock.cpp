#include "Lum_TdmBlock.h"

#include "Lum_TdmCommit.h"
#include "Lum_TdmDbg.h"
#include "Lum_TdmModel.h"
#include "Lum_TdmPin.h"
#include "Lum_TdmPinAlpaSorter.h"
#include "Lum_TdmSignal.h"
#include "Lum_TdmView.h"

#include "Lum_Exception.h"
#include "Lum_Tlm.h"
#include "Port_String.h"

#include <algorithm>
#include <cassert>
#include <cstdint>
#include <cstring>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

namespace {

char const kSourcePath[] = "../s/Lum_TdmBlock";
char const kRevision[] = "$Revision: 1.1 $";

char const kBlockTypeProperty[] = "TDS_BLOCK_TYPE";
char const kPinMapProperty[] = "TDS_BLOCK_PIN_MAP";
char const kDontCreatePinsProperty[] = "LUM_DONT_CREATE_UNUSED_PINS";

// A pin whose name differs from its type pin's. A pin without a type pin is
// not one: it has nothing to record.
bool IsMappedPin(Lum_TdmPin const *pin) {
  Lum_TlmPin const *typePin = pin->GetTypePin();
  return typePin && std::strcmp(pin->GetName(), typePin->GetName()) != 0;
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
  Orb_Property const *stored = GetPropertyByName(kBlockTypeProperty);
  if (!stored)
    return;
  std::string const &storedType = stored->GetValue();
  Lum_TdmView const *view = GetView();
  Lum_TlmBlock const *typeBlock = view->FindTypeBlock(storedType);
  if (!typeBlock) {
    // The library name is the text before the first ":", the type block's
    // name all that follows; without ":" the type block's name is empty.
    std::size_t const colon = storedType.find(':');
    std::string const libraryName = storedType.substr(0, colon);
    std::string const typeBlockName =
        colon == std::string::npos ? std::string() : storedType.substr(colon + 1);
    Lum_TlmLibrary const *library = view->GetLibrary(Port::StringBase<char>(libraryName.c_str()));
    if (!library)
      throw Lum_ExceptionCorruptDatabase("Lum", kSourcePath, kRevision, __LINE__,
                                         libraryName.c_str(),
                                         "Could not locate the specified library.", false);
    typeBlock = library->GetTypeBlock(Port::StringBase<char>(typeBlockName.c_str()));
    if (!typeBlock) {
      Port::StringBase<char> message;
      message.doFormat("\nCouldn't find type block <%s> in library <%s>.\n", typeBlockName.c_str(),
                       libraryName.c_str());
      throw Lum_ExceptionCorruptDatabase("Lum", kSourcePath, kRevision, __LINE__,
                                         typeBlockName.c_str(), message.c_str(), false);
    }
    view->NoteTypeBlock(storedType, typeBlock);
  }
  m_pTypeBlock = typeBlock;
  ReconcilePins(typeBlock);
  InitTypeBlock();
}

void Lum_TdmBlock::ReconcilePins(Lum_TlmBlock const *typeBlock) {
  Orb_Context *context = GetContext();
  std::vector<Orb_Pin *> const &pins = GetOrbBlock()->GetPins();
  Orb_BridgeHandle const bridge = context->GetBridgeHandle(Orb_Kind::Pin);
  auto clientOf = [&](Orb_Pin *pin) {
    Orb_ClientObject *client = bridge[pin->GetBridgeId()];
    if (!client)
      client = context->Specialize(pin);
    assert(client && "the client model made no client for a pin");
    return static_cast<Lum_TdmPin *>(client);
  };

  if (!typeBlock) {
    for (std::size_t i = 0; i < pins.size(); ++i)
      clientOf(pins[i])->SetTypePin(nullptr);
    return;
  }

  // Name map from TDS_BLOCK_PIN_MAP: design pin name to type pin name, the
  // last member of a name winning. The views point into the property, which
  // nothing touches before the map is dropped.
  std::unordered_map<std::string_view, char const *> nameMap;
  if (Orb_Property const *pinMap = GetPropertyByName(kPinMapProperty)) {
    nameMap.reserve(pinMap->GetMembers().size());
    for (auto const &member : pinMap->GetMembers())
      nameMap[std::string_view(member->GetName())] = member->GetStringValue();
  }

  // The second phase gives a block with fewer pins than its type block, in a
  // view that allows it, the type pins nobody took. The first phase creates
  // no pin, so whether it will run is known now, and the taken type pins are
  // noted only then.
  bool const createMissing = typeBlock->GetNumPins() > GetNumPins() &&
                             !GetOrbBlock()->GetView()->GetPropertyByName(kDontCreatePinsProperty);
  std::vector<Lum_TlmPin const *> taken;
  if (createMissing)
    taken.reserve(pins.size());

  // First phase: every pin takes the type pin of its (mapped) name.
  for (std::size_t i = 0; i < pins.size(); ++i) {
    Orb_Pin *pin = pins[i];
    char const *typePinName = pin->GetName();
    if (!nameMap.empty()) {
      auto const mapped = nameMap.find(std::string_view(pin->GetNameString()));
      if (mapped != nameMap.end())
        typePinName = mapped->second;
    }
    Lum_TlmPin const *typePin = typeBlock->GetPinByName(typePinName);
    if (!typePin && pin->GetSignal())
      throw Lum_ExceptionCorruptDatabase("Lum", kSourcePath, kRevision, __LINE__, pin->GetName(),
                                         "Could not locate the specified pin.", false);
    clientOf(pin)->SetTypePin(typePin);
    if (createMissing && typePin)
      taken.push_back(typePin);
  }
  if (!createMissing)
    return;

  // Second phase: creation in the type block's pin order, then the sort.
  nameMap.clear();
  std::sort(taken.begin(), taken.end());
  std::size_t const typePinCount = typeBlock->GetPins().size();
  for (std::size_t i = 0; i < typePinCount; ++i) {
    Lum_TlmPin const *typePin = typeBlock->GetPin(i);
    if (std::binary_search(taken.begin(), taken.end(), typePin))
      continue;
    if (GetOrbBlock()->GetPinByName(typePin->GetName())) {
      Port::StringBase<char> message;
      message.doFormat("While trying to patch up design block <%s> with new type pin <%s>\nof "
                       "type block <%s>, found that the block already had a pin by that\nname.  "
                       "This could have been due to an earlier and inappropriate\nclient call to "
                       "pin->SetName().\n",
                       GetName(), typePin->GetName(), typeBlock->GetName());
      throw Lum_ExceptionCorruptDatabase("Lum", kSourcePath, kRevision, __LINE__,
                                         GetOrbBlock()->GetView()->GetParent()->GetName(),
                                         message.c_str(), false);
    }
    CreatePin(typePin->GetName(), typePin->GetDirection())->SetTypePin(typePin);
  }
  SortPinsByName();
}

void Lum_TdmBlock::SortPinsByName() {
  PinAlpaSorter sorter;
  Orb_SortFtor<Orb_Pin> const byName(&sorter);
  SortPins(byName);
}

// ---------------------------------------------------------------------------
// Commit

void Lum_TdmBlock::CommitTypeProperties() {
  Orb_Property *stored = GetPropertyByName(kBlockTypeProperty);
  if (m_pTypeBlock) {
    Port::StringBase<char> const tag = m_pTypeBlock->GetUniqueTag();
    if (stored && stored->GetKind() == Orb_Property::STRING)
      stored->SetStringValue(tag.str());
    else
      CreatePropertyString(kBlockTypeProperty, tag.c_str());
  } else if (stored) {
    DeleteProperty(stored);
  }
  if (Orb_Property *pinMap = GetPropertyByName(kPinMapProperty))
    DeleteProperty(pinMap);
  if (!m_pTypeBlock)
    return;

  std::vector<Orb_Pin *> const &pins = GetOrbBlock()->GetPins();
  if (pins.empty())
    return;
  Orb_Context *context = GetContext();
  Orb_BridgeHandle const bridge = context->GetBridgeHandle(Orb_Kind::Pin);
  auto clientOf = [&](Orb_Pin *pin) {
    Orb_ClientObject *client = bridge[pin->GetBridgeId()];
    if (!client)
      client = context->Specialize(pin);
    assert(client && "the client model made no client for a pin");
    return static_cast<Lum_TdmPin const *>(client);
  };
  std::size_t first = 0;
  while (first < pins.size() && !IsMappedPin(clientOf(pins[first])))
    ++first;
  if (first == pins.size())
    return;
  Orb_Property *pinMap = CreatePropertyList(kPinMapProperty);
  for (std::size_t i = first; i < pins.size(); ++i) {
    Lum_TdmPin const *pin = clientOf(pins[i]);
    if (IsMappedPin(pin))
      pinMap->CreatePropertyString(pin->GetName(), pin->GetTypePin()->GetName());
  }
}

void Lum_TdmBlock::CommitToOrb() { CommitTypeProperties(); }

void Lum_TdmBlock::TraverseAndCommitToOrb() {
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

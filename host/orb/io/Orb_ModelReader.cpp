// Reading the records of a design database (the format is in
// Orb_ModelIO.h) into objects not yet in the model.

#include "Orb_ModelIO.h"

#include "Orb_Exception.h"

#include <algorithm>
#include <string>

void Orb_ModelIO::ReadHeader() {
  for (std::size_t i = 0; i < kMagic.size(); ++i) {
    int const c = m_pIn->Get();
    if (c < 0 && i > 0)
      m_pIn->Truncated();
    if (c != static_cast<unsigned char>(kMagic[i]))
      m_pIn->Refuse("is not a design database");
  }
  if (m_pIn->Tag() != 'V')
    m_pIn->Corrupt("expected the format version");
  std::uint64_t const version = m_pIn->Num();
  m_pIn->End();
  if (version == 0 || version > kFormatVersion)
    m_pIn->Refuse("has format version " + std::to_string(version) +
                  ", which this build cannot read (it reads version " +
                  std::to_string(kFormatVersion) + ")");
  // The model's own names are informational: Open keeps the target's.
  if (m_pIn->Tag() != 'M')
    m_pIn->Corrupt("expected the model record");
  m_pIn->Name(m_Text);
  m_pIn->Name(m_Text);
  m_pIn->End();
}

void Orb_ModelIO::ReadModel(Section &section, bool companion) {
  for (;;) {
    char const tag = m_pIn->Tag();
    if (tag == 'D') {
      std::string name = ReadName("design manager");
      m_pIn->End();
      if (section.model.m_DesignMgrs.Find(name))
        m_pIn->Refuse("holds design manager " + Quote(name) + ", which the model already has");
      if (section.designMgrs.Find(name))
        Duplicate("design manager", name, nullptr);
      auto *designMgr = section.model.Make<Orb_DesignMgr>(&section.model, std::move(name));
      try {
        section.designMgrs.AddUnique(designMgr);
      } catch (...) {
        // In no list: nothing else would ever free it.
        section.model.Free(designMgr);
        throw;
      }
      ReadDesignMgr(designMgr);
    } else if (tag == 'K') {
      if (companion)
        m_pIn->Corrupt("companion section inside a companion section");
      ReadCompanion(section);
    } else if (tag == 'Z') {
      m_pIn->End();
      return;
    } else {
      Unexpected(tag, "model");
    }
  }
}

void Orb_ModelIO::ReadCompanion(Section &section) {
  std::string key;
  m_pIn->Str(key);
  m_pIn->End();
  if (section.companions.count(key))
    m_pIn->Corrupt("second companion section " + Quote(key));
  if (m_pIn->Tag() != 'M')
    m_pIn->Corrupt("expected the model record of companion " + Quote(key));
  std::string name;
  std::string dbName;
  m_pIn->Name(name);
  m_pIn->Name(dbName);
  m_pIn->End();
  auto companion = std::make_unique<Orb_Model>(name.c_str(), dbName.c_str(), "", false);
  {
    Section inner(*companion);
    ReadModel(inner, true);
    Commit(inner);
  }
  section.companions.emplace(std::move(key), std::move(companion));
}

template <class Parent, class Child>
void Orb_ModelIO::ReadContainer(Parent *parent, char childTag, char const *parentKind,
                                char const *childKind, void (Orb_ModelIO::*readChild)(Child *)) {
  Orb_Persistent *holder = parent;
  for (;;) {
    char const tag = m_pIn->Tag();
    if (ReadProperty(tag, holder))
      continue;
    if (tag == childTag) {
      std::string name = ReadName(childKind);
      m_pIn->End();
      auto *child =
          parent->GetModel()->template Make<Child>(parent->GetModel(), parent, std::move(name));
      Place(child, childKind);
      (this->*readChild)(child);
      holder = nullptr;
    } else if (tag == 'E') {
      m_pIn->End();
      return;
    } else {
      Unexpected(tag, parentKind);
    }
  }
}

void Orb_ModelIO::ReadDesignMgr(Orb_DesignMgr *designMgr) {
  ReadContainer<Orb_DesignMgr, Orb_Design>(designMgr, 'G', "design manager", "design",
                                           &Orb_ModelIO::ReadDesign);
}

void Orb_ModelIO::ReadDesign(Orb_Design *design) {
  ReadContainer<Orb_Design, Orb_View>(design, 'W', "design", "view", &Orb_ModelIO::ReadView);
}

void Orb_ModelIO::ReadView(Orb_View *view) {
  m_Pins.clear();
  m_Signals.clear();
  Orb_Persistent *holder = view;
  for (;;) {
    char const tag = m_pIn->Tag();
    if (ReadProperty(tag, holder))
      continue;
    if (tag == 'B') {
      std::string name = ReadName("block");
      m_pIn->End();
      if (view->m_pTopBlock)
        m_pIn->Corrupt("second top block in view " + Quote(view->GetNameString()));
      view->m_pTopBlock =
          view->GetModel()->Make<Orb_Block>(view->GetModel(), view, view, std::move(name));
      ReadBlock(view->m_pTopBlock);
      holder = nullptr;
    } else if (tag == 'C') {
      ReadConnections();
      holder = nullptr;
    } else if (tag == 'N') {
      holder = ReadNetwork(view);
    } else if (tag == 'E') {
      m_pIn->End();
      return;
    } else {
      Unexpected(tag, "view");
    }
  }
}

void Orb_ModelIO::ReadBlock(Orb_Block *top) {
  // The file decides how deep blocks nest, so the open blocks live on a stack
  // of our own rather than on the call stack.
  Orb_Model *model = top->GetModel();
  std::vector<Orb_Block *> &open = m_OpenBlocks;
  open.assign(1, top);
  Orb_Persistent *holder = top;
  while (!open.empty()) {
    Orb_Block *block = open.back();
    char const tag = m_pIn->Tag();
    if (ReadProperty(tag, holder))
      continue;
    if (tag == 'I') {
      std::uint64_t const code = m_pIn->Num();
      std::string name = ReadName("pin");
      m_pIn->End();
      if (code > Orb_Pin::PIN_BIDIRECTIONAL)
        m_pIn->Corrupt("unknown direction of pin " + Quote(name));
      auto const direction = static_cast<Orb_Pin::PIN_DIRECTION>(code);
      auto *pin = model->Make<Orb_Pin>(model, block, name, direction);
      Append(
          pin, [block]() -> auto & { return block->m_Pins; });
      m_Pins.push_back(pin);
      holder = pin;
    } else if (tag == 'S') {
      std::string name = ReadName("signal");
      m_pIn->End();
      auto *signal = model->Make<Orb_Signal>(model, block, name);
      Append(
          signal, [block]() -> auto & { return block->MakeInside().signals; });
      m_Signals.push_back(signal);
      holder = signal;
    } else if (tag == 'B') {
      std::string name = ReadName("block");
      m_pIn->End();
      if (open.size() >= Orb_MaxBlockDepth)
        m_pIn->Corrupt("block " + Quote(name) + " nested deeper than " +
                       std::to_string(Orb_MaxBlockDepth) + " levels");
      auto *child = model->Make<Orb_Block>(model, block, block->m_pView, name);
      Append(
          child, [block]() -> auto & { return block->MakeInside().blocks; });
      open.push_back(child);
      holder = child;
    } else if (tag == 'E') {
      m_pIn->End();
      CheckNames(block);
      open.pop_back();
      // Properties belong right after their object's record, not after its
      // children.
      holder = nullptr;
    } else {
      Unexpected(tag, "block");
    }
  }
}

void Orb_ModelIO::ReadConnections() {
  Orb_Signal *signal = SignalAt(m_pIn->Num());
  std::uint64_t const count = m_pIn->Num();
  // The count is the file's word: no more than the view has pins.
  signal->m_Pins.ReserveExact(
      static_cast<std::size_t>(std::min<std::uint64_t>(count, m_Pins.size())));
  for (std::uint64_t n = count; n > 0; --n) {
    Orb_Pin *pin = PinAt(m_pIn->Num());
    Orb_Block *block = pin->GetParent();
    bool const inner = block == signal->GetParent();
    if (!inner && block->GetParent() != signal->GetParent())
      m_pIn->Corrupt(
          "pin " + Quote(pin->GetNameString()) + " of block " + Quote(block->GetNameString()) +
          " connects to signal " + Quote(signal->GetNameString()) + " of block " +
          Quote(signal->GetParent()->GetNameString()) + ", neither its own block nor its parent");
    if (inner ? pin->GetInnerSignal() : pin->GetSignal())
      m_pIn->Corrupt("pin " + Quote(pin->GetNameString()) + " is connected twice " +
                     (inner ? "inside" : "outside"));
    pin->Link(inner, signal);
  }
  m_pIn->End();
}

Orb_Network *Orb_ModelIO::ReadNetwork(Orb_View *view) {
  std::string name = ReadName("network");
  auto *network = view->GetModel()->Make<Orb_Network>(view->GetModel(), view, std::move(name));
  Place(network, "network");
  std::uint64_t const count = m_pIn->Num();
  auto const members = static_cast<std::size_t>(std::min<std::uint64_t>(count, m_Signals.size()));
  network->m_Signals.ReserveExact(members);
  view->m_Memberships.reserve(view->m_Memberships.size() + members);
  for (std::uint64_t n = count; n > 0; --n) {
    Orb_Signal *signal = SignalAt(m_pIn->Num());
    if (signal->GetNetwork())
      m_pIn->Corrupt("signal " + Quote(signal->GetNameString()) + " is in two networks");
    network->AddSignal(signal);
  }
  m_pIn->End();
  return network;
}

bool Orb_ModelIO::ReadProperty(char tag, Orb_Persistent *object) {
  if (tag != 'P' && tag != 'L' && tag != 'Q')
    return false;
  if (!object)
    m_pIn->Corrupt("property record without an object");
  Orb_PropertyHolder *holder = &object->MakeProperties();
  std::string name;
  m_pIn->Name(name);
  std::size_t const before = holder->GetProperties().size();
  Orb_Property *property = nullptr;
  if (tag == 'P') {
    m_pIn->Str(m_Text);
    property = holder->CreatePropertyString(name.c_str(), "");
    property->SetStringValue(m_Text);
  } else if (tag == 'L') {
    property = holder->CreatePropertyStringList(name.c_str());
    for (std::uint64_t n = m_pIn->Num(); n > 0; --n) {
      m_pIn->Str(m_Text);
      property->AppendString(m_Text);
    }
  } else {
    property = holder->CreatePropertyList(name.c_str());
    std::string memberName;
    for (std::uint64_t n = m_pIn->Num(); n > 0; --n) {
      m_pIn->Name(memberName);
      m_pIn->Str(m_Text);
      property->CreatePropertyString(memberName.c_str(), "")->SetStringValue(m_Text);
    }
  }
  m_pIn->End();
  if (holder->GetProperties().size() == before)
    m_pIn->Corrupt("second property named " + Quote(name));
  return true;
}

std::string Orb_ModelIO::ReadName(char const *kind) {
  std::string name;
  m_pIn->Name(name);
  if (name.empty())
    m_pIn->Corrupt(std::string("empty ") + kind + " name");
  return name;
}

Orb_Pin *Orb_ModelIO::PinAt(std::uint64_t index) const {
  if (index >= m_Pins.size())
    m_pIn->Corrupt("connection to pin " + std::to_string(index) + " of a view with " +
                   std::to_string(m_Pins.size()) + " pins");
  return m_Pins[index];
}

Orb_Signal *Orb_ModelIO::SignalAt(std::uint64_t index) const {
  if (index >= m_Signals.size())
    m_pIn->Corrupt("reference to signal " + std::to_string(index) + " of a view with " +
                   std::to_string(m_Signals.size()) + " signals");
  return m_Signals[index];
}

void Orb_ModelIO::Unexpected(char tag, char const *where) const {
  auto const byte = static_cast<unsigned char>(tag);
  std::string const shown =
      byte > ' ' && byte < 0x7f ? Quote(std::string(1, tag)) : "byte " + std::to_string(byte);
  m_pIn->Corrupt("unexpected record " + shown + " in a " + where);
}

void Orb_ModelIO::Place(Orb_Persistent *object, char const *kind) const {
  Orb_Model *model = object->GetModel();
  bool linked = false;
  try {
    linked = model->Link(object);
  } catch (...) {
    // In no container: nothing else would ever free it.
    model->Free(object);
    throw;
  }
  if (linked)
    return;
  std::string const name(object->GetNameString());
  Orb_Persistent const *parent = object->GetParentObject();
  model->Free(object);
  Duplicate(kind, name, parent);
}

template <class T, class List> void Orb_ModelIO::Append(T *child, List const &list) {
  try {
    list().Append(child);
  } catch (...) {
    // In no container: nothing else would ever free it.
    child->GetModel()->Free(child);
    throw;
  }
}

void Orb_ModelIO::CheckNames(Orb_Block *block) const {
  if (Orb_Pin const *pin = block->m_Pins.CheckNames())
    Duplicate("pin", std::string(pin->GetNameString()), block);
  if (!block->m_pInside)
    return;
  if (Orb_Signal const *signal = block->m_pInside->signals.CheckNames())
    Duplicate("signal", std::string(signal->GetNameString()), block);
  if (Orb_Block const *child = block->m_pInside->blocks.CheckNames())
    Duplicate("block", std::string(child->GetNameString()), block);
}

void Orb_ModelIO::Duplicate(char const *kind, std::string const &name,
                            Orb_Persistent const *parent) const {
  std::string what = std::string("second ") + kind + " named " + Quote(name);
  if (parent)
    what += std::string(" in ") + Orb_KindName(parent->GetKind()) + " " +
            Quote(parent->GetNameString());
  m_pIn->Corrupt(what);
}

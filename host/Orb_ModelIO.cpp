// Saving and opening design databases.
//
// A design database is a magic line followed by records. A record is a tag
// byte, fields each preceded by one space, and a newline. Numbers are decimal;
// strings are "<length>:<bytes>", so every byte survives: property values and
// companion keys may hold NUL, names may not (the API takes names as C
// strings). Design managers, designs, views and blocks end with an 'E'
// record; properties follow the record of the object they belong to. Blocks
// nest at most Orb_MaxBlockDepth deep. Pins and signals are numbered per view
// in the order they are written, and a view's connections and networks,
// written after its block tree, refer to them by number. A connection's side
// follows from where the pin is: a pin of the signal's own block connects
// inside, a pin of one of its child blocks outside; any other pin is corrupt.
// Companion models follow the design managers, each as an embedded model
// section that holds no companions of its own. A 'Z' record ends every model
// section, so a cut file shows.
//
//   Orb design database          magic line
//   V <version>                  format version
//   M <name> <dbName>            model
//   D <name> ... E               design manager
//   G <name> ... E               design
//   W <name> ... E               view
//   B <name> ... E               block (a view's top block, or a child block)
//   I <direction> <name>         pin (0 input, 1 output, 2 bidirectional)
//   S <name>                     signal
//   C <signal> <n> <pin>...      pins connected to a signal (either side), in order
//   N <name> <n> <signal>...     network and its signals, in order
//   P <name> <value>             string property
//   L <name> <n> <value>...      string list property
//   Q <name> <n> (<name> <value>)...  list property
//   K <key>, then M ... Z        companion model section
//   Z                            end of a model section

#include "Orb_Model.h"

#include "Orb_ByteIO.h"
#include "Orb_Derived.h"
#include "Orb_Exception.h"

#include <algorithm>
#include <cstdint>
#include <map>
#include <memory>
#include <string>
#include <string_view>
#include <unordered_set>
#include <vector>

namespace {

using Orb_IO::ByteReader;
using Orb_IO::ByteWriter;
using Orb_IO::QuotePath;

char const *const kSource = "host/Orb_ModelIO";
constexpr std::string_view kMagic = "Orb design database\n";
constexpr std::uint64_t kFormatVersion = 1;
static_assert(Orb_Pin::PIN_INPUT == 0 && Orb_Pin::PIN_OUTPUT == 1 &&
                  Orb_Pin::PIN_BIDIRECTIONAL == 2,
              "design databases store pin directions by these numbers");

// Names come from files and callers and may be huge: messages cut them.
// Paths are quoted whole.
std::string Quote(std::string_view name) { return "'" + Port::Exception::ShownName(name) + "'"; }

} // namespace

// Reads and writes model sections. A friend of the host classes, it builds
// objects directly in their containers, without events.
class Orb_ModelIO {
public:
  static void Save(Orb_Model const &model, std::string const &path);
  static void Open(Orb_Model &model, std::string const &path);

private:
  // What one model section built: design managers not yet in the model
  // (freed with the section unless committed) and companion models.
  struct Section {
    explicit Section(Orb_Model &target) : model(target) {}
    Section(Section const &) = delete;
    Section &operator=(Section const &) = delete;
    ~Section() { FreeDesignMgrs(model, designMgrs.Items()); }

    Orb_Model &model;
    Orb_NamedList<Orb_DesignMgr> designMgrs;
    std::map<std::string, std::unique_ptr<Orb_Model>> companions;
  };

  explicit Orb_ModelIO(ByteWriter *out) : m_pOut(out) {}
  explicit Orb_ModelIO(ByteReader *in) : m_pIn(in) {}

  static void FreeDesignMgrs(Orb_Model &model, Orb_Range<Orb_DesignMgr> designMgrs);
  // Moves the section's design managers into its model, without events.
  static std::vector<Orb_DesignMgr *> Commit(Section &section);
  static void Rollback(Orb_Model &model, std::vector<Orb_DesignMgr *> const &loaded,
                       std::vector<std::string> const &companionKeys);

  // `companionKey`: the key a companion model is written under, else null.
  void WriteModel(Orb_Model const &model, std::string_view const *companionKey = nullptr);
  void WriteDesignMgr(Orb_DesignMgr const *designMgr);
  void WriteView(Orb_View const *view);
  void WriteBlock(Orb_Block const *block);
  void WriteProperties(Orb_Persistent const *object);

  void ReadHeader();
  // A companion's section holds no companion sections of its own.
  void ReadModel(Section &section, bool companion = false);
  void ReadCompanion(Section &section);
  // Reads a design manager's or a design's records: its properties, then its
  // children of one kind, each read by `readChild`, up to the closing 'E'.
  template <class Parent, class Child>
  void ReadContainer(Parent *parent, char childTag, char const *parentKind, char const *childKind,
                     void (Orb_ModelIO::*readChild)(Child *));
  void ReadDesignMgr(Orb_DesignMgr *designMgr);
  void ReadDesign(Orb_Design *design);
  void ReadView(Orb_View *view);
  void ReadBlock(Orb_Block *block);
  void ReadConnections();
  Orb_Network *ReadNetwork(Orb_View *view);
  // Reads a property record for `object` if `tag` starts one.
  bool ReadProperty(char tag, Orb_Persistent *object);
  std::string ReadName(char const *kind);
  Orb_Pin *PinAt(std::uint64_t index) const;
  Orb_Signal *SignalAt(std::uint64_t index) const;
  [[noreturn]] void Unexpected(char tag, char const *where) const;
  // Puts a new object into its parent's container; a sibling of the same
  // name frees it and refuses the file.
  void Place(Orb_Persistent *object, char const *kind) const;
  // Appends a block's new pin, signal or child block without looking at
  // names; CheckNames refuses the file when the block's record ends if two
  // children of one kind share a name.
  template <class T, class List> static void Append(T *child, List const &list);
  void CheckNames(Orb_Block *block) const;
  [[noreturn]] void Duplicate(char const *kind, std::string const &name,
                              Orb_Persistent const *parent) const;

  ByteWriter *m_pOut = nullptr;
  ByteReader *m_pIn = nullptr;

  // Saving: pins and signals by bridge id, numbered from 1 in the order
  // written across the whole save (0: not written). An object written in
  // the current view has a number above the count when the view began, and
  // is written in it as the difference less one. Anything else (an object
  // whose deletion is held, still listed by a signal or a network) is left
  // out.
  std::vector<std::uint64_t> m_PinNumber;
  std::vector<std::uint64_t> m_SignalNumber;
  std::uint64_t m_PinCount = 0;
  std::uint64_t m_SignalCount = 0;
  std::uint64_t m_ViewPinBase = 0;
  std::uint64_t m_ViewSignalBase = 0;
  std::vector<Orb_Signal const *> m_ViewSignals;

  // Opening: the current view's pins and signals in number order.
  std::vector<Orb_Pin *> m_Pins;
  std::vector<Orb_Signal *> m_Signals;
  // The blocks ReadBlock is inside of, outermost first.
  std::vector<Orb_Block *> m_OpenBlocks;
  std::string m_Text;
};

// ---------------------------------------------------------------------------
// Saving

void Orb_Model::Save(char const *path) const {
  std::string const target = path ? path : "";
  if (target.empty())
    throw Orb_Exception(kSource, __LINE__, m_Name.c_str(),
                        ("Cannot save model " + Quote(m_Name) + ": no file path given.").c_str());
  if (m_ReadOnly)
    throw Orb_Exception(kSource, __LINE__, target.c_str(),
                        ("Cannot save design database " + QuotePath(target) + ": model " +
                         Quote(m_Name) + " is read-only.")
                            .c_str());
  Orb_ModelIO::Save(*this, target);
}

void Orb_ModelIO::Save(Orb_Model const &model, std::string const &path) {
  ByteWriter out(path);
  Orb_ModelIO io(&out);
  out.Raw(kMagic);
  out.Tag('V');
  out.Num(kFormatVersion);
  out.End();
  io.WriteModel(model);
  out.Commit();
}

void Orb_ModelIO::WriteModel(Orb_Model const &model, std::string_view const *companionKey) {
  auto const pins = static_cast<unsigned>(Orb_Kind::Pin);
  auto const signals = static_cast<unsigned>(Orb_Kind::Signal);
  if (m_PinNumber.size() < model.m_Pools[pins].IdLimit())
    m_PinNumber.resize(model.m_Pools[pins].IdLimit());
  if (m_SignalNumber.size() < model.m_Pools[signals].IdLimit())
    m_SignalNumber.resize(model.m_Pools[signals].IdLimit());

  m_pOut->Tag('M');
  m_pOut->Str(model.m_Name);
  m_pOut->Str(model.m_DbName);
  m_pOut->End();
  for (Orb_DesignMgr const *designMgr : model.m_DesignMgrs.Items())
    WriteDesignMgr(designMgr);

  // A companion read by Open that nobody claimed yet is kept as well; a live
  // companion of the same key wins.
  std::map<std::string_view, Orb_Model const *> companions;
  for (auto const &[key, companion] : model.m_Companions)
    if (Orb_Model const *companionModel = companion ? companion->GetModelToSave() : nullptr)
      companions.emplace(key, companionModel);
  for (auto const &[key, companionModel] : model.m_LoadedCompanions)
    companions.emplace(key, companionModel.get());
  // Open reads no companion section inside another: refuse rather than write
  // a database that cannot be opened again.
  if (companionKey && !companions.empty())
    m_pOut->Refuse("companion " + Quote(*companionKey) + " has companion " +
                   Quote(companions.begin()->first) + " of its own, and companions cannot nest");
  for (auto const &[key, companionModel] : companions) {
    m_pOut->Named('K', key);
    WriteModel(*companionModel, &key);
  }
  m_pOut->Tag('Z');
  m_pOut->End();
}

void Orb_ModelIO::WriteDesignMgr(Orb_DesignMgr const *designMgr) {
  m_pOut->Named('D', designMgr->GetNameString());
  WriteProperties(designMgr);
  for (Orb_Design const *design : designMgr->GetDesigns()) {
    m_pOut->Named('G', design->GetNameString());
    WriteProperties(design);
    for (Orb_View const *view : design->GetViews())
      WriteView(view);
    m_pOut->Raw("E\n");
  }
  m_pOut->Raw("E\n");
}

void Orb_ModelIO::WriteView(Orb_View const *view) {
  m_pOut->Named('W', view->GetNameString());
  WriteProperties(view);
  m_ViewPinBase = m_PinCount;
  m_ViewSignalBase = m_SignalCount;
  m_ViewSignals.clear();
  if (view->GetBlock())
    WriteBlock(view->GetBlock());
  for (std::size_t s = 0; s < m_ViewSignals.size(); ++s) {
    auto const pins = m_ViewSignals[s]->GetPins();
    auto const written = [this](Orb_Pin const *pin) {
      return m_PinNumber[pin->GetBridgeId()] > m_ViewPinBase;
    };
    auto const count = std::count_if(pins.begin(), pins.end(), written);
    if (count == 0)
      continue;
    m_pOut->Tag('C');
    m_pOut->Num(s);
    m_pOut->Num(static_cast<std::uint64_t>(count));
    for (Orb_Pin const *pin : pins)
      if (written(pin))
        m_pOut->Num(m_PinNumber[pin->GetBridgeId()] - m_ViewPinBase - 1);
    m_pOut->End();
  }
  for (Orb_Network const *network : view->GetNetworks()) {
    m_pOut->Tag('N');
    m_pOut->Str(network->GetNameString());
    auto const signals = network->GetSignals();
    auto const written = [this](Orb_Signal const *signal) {
      return m_SignalNumber[signal->GetBridgeId()] > m_ViewSignalBase;
    };
    m_pOut->Num(static_cast<std::uint64_t>(std::count_if(signals.begin(), signals.end(), written)));
    for (Orb_Signal const *signal : signals)
      if (written(signal))
        m_pOut->Num(m_SignalNumber[signal->GetBridgeId()] - m_ViewSignalBase - 1);
    m_pOut->End();
    WriteProperties(network);
  }
  m_pOut->Raw("E\n");
}

// Recursive: no block lies deeper than Orb_MaxBlockDepth.
void Orb_ModelIO::WriteBlock(Orb_Block const *block) {
  m_pOut->Named('B', block->GetNameString());
  WriteProperties(block);
  for (Orb_Pin const *pin : block->GetPins()) {
    m_PinNumber[pin->GetBridgeId()] = ++m_PinCount;
    m_pOut->Tag('I');
    m_pOut->Num(pin->GetDirection());
    m_pOut->Str(pin->GetNameString());
    m_pOut->End();
    WriteProperties(pin);
  }
  for (Orb_Signal const *signal : block->GetSignals()) {
    m_SignalNumber[signal->GetBridgeId()] = ++m_SignalCount;
    m_ViewSignals.push_back(signal);
    m_pOut->Named('S', signal->GetNameString());
    WriteProperties(signal);
  }
  for (Orb_Block const *child : block->GetBlocks())
    WriteBlock(child);
  m_pOut->Raw("E\n");
}

void Orb_ModelIO::WriteProperties(Orb_Persistent const *object) {
  for (auto const &property : object->GetProperties()) {
    switch (property->GetKind()) {
    case Orb_Property::STRING:
      m_pOut->Tag('P');
      m_pOut->Str(property->GetName());
      m_pOut->Str(property->GetValue());
      break;
    case Orb_Property::STRING_LIST:
      m_pOut->Tag('L');
      m_pOut->Str(property->GetName());
      m_pOut->Num(property->GetStrings().size());
      for (std::string const &value : property->GetStrings())
        m_pOut->Str(value);
      break;
    case Orb_Property::LIST:
      m_pOut->Tag('Q');
      m_pOut->Str(property->GetName());
      m_pOut->Num(property->GetMembers().size());
      for (auto const &member : property->GetMembers()) {
        m_pOut->Str(member->GetName());
        m_pOut->Str(member->GetValue());
      }
      break;
    }
    m_pOut->End();
  }
}

// ---------------------------------------------------------------------------
// Opening

void Orb_Model::Open(char const *path) { Orb_ModelIO::Open(*this, path ? path : ""); }

void Orb_ModelIO::Open(Orb_Model &model, std::string const &path) {
  if (model.m_pOpenJournal)
    throw Orb_Exception(kSource, __LINE__, path.c_str(),
                        ("Cannot open design database " + QuotePath(path) + " into model " +
                         Quote(model.m_Name) + " while another open is under way.")
                            .c_str());
  Section section(model);
  {
    ByteReader in(path);
    Orb_ModelIO io(&in);
    io.ReadHeader();
    io.ReadModel(section);
    if (in.Get() >= 0)
      in.Corrupt("data after the end record");
  }
  // Two companions of one key cannot both be kept, and dropping either loses
  // data: refused before anything is loaded.
  for (auto const &entry : section.companions)
    if (model.GetCompanion(entry.first) || model.m_LoadedCompanions.count(entry.first))
      throw Orb_Exception(kSource, __LINE__, path.c_str(),
                          ("Design database " + QuotePath(path) + " carries companion " +
                           Quote(entry.first) + ", which model " + Quote(model.m_Name) +
                           " already has.")
                              .c_str());

  Orb_Model::OpenJournal journal;
  for (auto const &[key, companion] : model.m_Companions)
    journal.liveBefore.emplace(key, companion.get());
  for (auto const &entry : model.m_LoadedCompanions)
    journal.waitingBefore.insert(entry.first);
  std::vector<std::string> companionKeys;
  for (auto const &entry : section.companions)
    companionKeys.push_back(entry.first);

  std::vector<Orb_DesignMgr *> const loaded = Commit(section);
  model.m_pOpenJournal = &journal;
  try {
    for (auto &[key, companion] : section.companions)
      model.m_LoadedCompanions.emplace(key, std::move(companion));
    Orb_Model::FreeHold hold(model);
    for (Orb_DesignMgr *designMgr : loaded)
      model.AnnounceLoadTree(designMgr);
    // Index loop: a handler may subscribe another context.
    for (std::size_t i = 0; i < model.m_Subscribers.size(); ++i)
      model.m_Subscribers[i]->SyncEventSpecializeModelOnLoad(&model);
  } catch (...) {
    Rollback(model, loaded, companionKeys);
    model.RestoreCompanions(journal);
    model.m_pOpenJournal = nullptr;
    throw;
  }
  model.m_pOpenJournal = nullptr;
}

void Orb_ModelIO::FreeDesignMgrs(Orb_Model &model, Orb_Range<Orb_DesignMgr> designMgrs) {
  for (Orb_DesignMgr *designMgr : designMgrs)
    model.Free(designMgr);
}

std::vector<Orb_DesignMgr *> Orb_ModelIO::Commit(Section &section) {
  std::vector<Orb_DesignMgr *> loaded = section.designMgrs.Items().ToVector();
  // Names were checked against the model's when read. A failure undoes the
  // move: the section still owns them all and frees them.
  std::size_t added = 0;
  try {
    for (; added < loaded.size(); ++added)
      section.model.m_DesignMgrs.AddUnique(loaded[added]);
  } catch (...) {
    for (std::size_t i = 0; i < added; ++i)
      section.model.m_DesignMgrs.Remove(loaded[i]);
    throw;
  }
  section.designMgrs.Clear();
  return loaded;
}

void Orb_ModelIO::Rollback(Orb_Model &model, std::vector<Orb_DesignMgr *> const &loaded,
                           std::vector<std::string> const &companionKeys) {
  // A handler may itself have deleted a loaded design manager; its hold is
  // down, so such a one is gone from the list and from memory.
  std::unordered_set<Orb_DesignMgr *> const live(model.m_DesignMgrs.Items().begin(),
                                                 model.m_DesignMgrs.Items().end());
  for (Orb_DesignMgr *designMgr : loaded) {
    if (!live.count(designMgr))
      continue;
    try {
      model.Delete(designMgr);
    } catch (...) {
      // The handler's exception is the one the caller must see.
    }
  }
  for (std::string const &key : companionKeys)
    model.m_LoadedCompanions.erase(key);
}

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

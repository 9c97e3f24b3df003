#pragma once

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
#include "Port_Exception.h"

#include <cstdint>
#include <map>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

// Reads and writes model sections. A friend of the host classes, it builds
// objects directly in their containers, without events.
class Orb_ModelIO {
public:
  static void Save(Orb_Model const &model, std::string const &path);
  static void Open(Orb_Model &model, std::string const &path);

  // The format, and how its messages name things.
  static constexpr char const *kSource = "host/Orb_ModelIO";
  static constexpr std::string_view kMagic = "Orb design database\n";
  static constexpr std::uint64_t kFormatVersion = 1;
  static_assert(Orb_Pin::PIN_INPUT == 0 && Orb_Pin::PIN_OUTPUT == 1 &&
                    Orb_Pin::PIN_BIDIRECTIONAL == 2,
                "design databases store pin directions by these numbers");

  // Names come from files and callers and may be huge: messages cut them.
  // Paths are quoted whole (Orb_IO::QuotePath).
  static std::string Quote(std::string_view name) {
    return "'" + Port::Exception::ShownName(name) + "'";
  }

private:
  using ByteReader = Orb_IO::ByteReader;
  using ByteWriter = Orb_IO::ByteWriter;

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

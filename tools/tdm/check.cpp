// tdm check: reads a design database at the host level, without binding it
// through the client model, and lists every problem that makes opening it
// fail, where a real open stops at the first. It follows the checks the
// client model makes on load, in the same terms: design marks, view stamps,
// the view's type libraries (loaded through the same component for the same
// device personality), stored type blocks, and the pin reconciliation.

#include "commands.h"

#include "Lum_Exception.h"
#include "Lum_Tlm.h"
#include "Orb_Model.h"
#include "Orb_Property.h"
#include "PM_PIC.h"
#include "Port_MsgManData.h"
#include "Port_String.h"

#include <cstdint>
#include <cstdio>
#include <cstring>
#include <map>
#include <string>
#include <string_view>
#include <unordered_map>
#include <unordered_set>
#include <vector>

namespace tdm {
namespace {

char const kDesignTypeProperty[] = "TDS_DESIGN_TYPE";
char const kUserDesign[] = "TDS_DESIGN_TYPE_USER";
char const kVersionProperty[] = "TDS_TDM_VERSION";
char const kLibrariesProperty[] = "TDS_VIEW_TYPE_LIBS";
char const kDevicePmProperty[] = "TDS_DEVICE_PM";
char const kDevicePartProperty[] = "TDS_DEVICE_PART";
char const kDontCreatePinsProperty[] = "LUM_DONT_CREATE_UNUSED_PINS";
char const kBlockTypeProperty[] = "TDS_BLOCK_TYPE";
char const kPinMapProperty[] = "TDS_BLOCK_PIN_MAP";

// The format this software reads up to; older than 0.3 needs conversion.
constexpr std::uint32_t kTdmVersion = 3;
constexpr std::uint32_t kTdmRevision = 1;

// Kinds of problems, in the order of the report.
enum class Kind {
  ForeignMark,
  StampTooOld,
  StampTooNew,
  NoDevice,
  LibraryUnloadable,
  LibraryNotListed,
  TypeBlockMissing,
  PinUnmatched,
  PinCollision,
};

struct KindText {
  char const *title;
  char const *unit; // what the examples are, singular
};

KindText const &TextOf(Kind kind) {
  static KindText const texts[] = {
      {"design with a foreign design mark (TDS_DESIGN_TYPE)", "design"},
      {"view stamp too old (TDS_TDM_VERSION below 0.3: convert the design)", "view"},
      {"view stamp too new (TDS_TDM_VERSION above 3.1: written by newer software)", "view"},
      {"view without a device personality for its type libraries", "view"},
      {"type library that cannot be loaded", "view"},
      {"library not in the view's TDS_VIEW_TYPE_LIBS", "block"},
      {"type block missing from its library", "block"},
      {"connected pin that no type pin matches", "pin"},
      {"pin in the way of a type pin that opening would create", "pin"},
  };
  return texts[static_cast<int>(kind)];
}

constexpr std::size_t kExamples = 3;

struct Group {
  std::uint64_t count = 0;
  std::vector<std::string> examples;
  std::string detail;
};

// Problems by kind, then by group (library:type block, library, stamp...).
class Problems {
public:
  // `example` is called only while the group still wants examples, so that
  // counting a million problems builds only a few paths.
  template <class F> void Add(Kind kind, std::string const &key, F const &example) {
    Group &group = m_Groups[kind][key];
    ++group.count;
    ++m_Total;
    if (group.examples.size() < kExamples)
      group.examples.push_back(example());
  }
  void SetDetail(Kind kind, std::string const &key, std::string const &detail) {
    m_Groups[kind][key].detail = detail;
  }

  std::uint64_t Total() const { return m_Total; }

  void Print(std::string const &path) const {
    std::printf("%s: %llu problem%s that make%s opening fail\n", path.c_str(),
                static_cast<unsigned long long>(m_Total), m_Total == 1 ? "" : "s",
                m_Total == 1 ? "s" : "");
    for (auto const &[kind, groups] : m_Groups) {
      std::uint64_t count = 0;
      for (auto const &entry : groups)
        count += entry.second.count;
      KindText const &text = TextOf(kind);
      std::printf("%s: %llu\n", text.title, static_cast<unsigned long long>(count));
      for (auto const &[key, group] : groups) {
        std::string examples;
        for (std::string const &example : group.examples)
          examples += (examples.empty() ? "" : ", ") + example;
        if (group.count > group.examples.size())
          examples += ", ...";
        std::printf("  %s: %llu %s%s: %s\n", key.c_str(),
                    static_cast<unsigned long long>(group.count), text.unit,
                    group.count == 1 ? "" : "s", examples.c_str());
        if (!group.detail.empty())
          std::printf("    %s\n", group.detail.c_str());
      }
    }
  }

private:
  std::map<Kind, std::map<std::string, Group>> m_Groups;
  std::uint64_t m_Total = 0;
};

// The entries of TDS_VIEW_TYPE_LIBS, read as the view reads them: a string
// list, or a lone string taken as one entry.
std::vector<std::string> LibraryEntries(Orb_Property const *property) {
  if (!property)
    return {};
  if (property->GetKind() == Orb_Property::STRING_LIST)
    return property->GetStrings();
  if (property->GetKind() == Orb_Property::STRING)
    return {std::string(property->GetValue())};
  return {};
}

// A library of a view's list, or why it is not there.
struct ListedLibrary {
  std::string name;
  Lum_TlmLibrary const *library = nullptr; // null: it failed to load
  bool release = false;                    // a reference to give back
  std::uint64_t blocks = 0;                // typed blocks that use it
  std::vector<std::string> examples;
};

class Checker {
public:
  Checker(Orb_Model &host, Progress &progress) : m_Host(host), m_Progress(progress) {}

  void CheckModel() {
    for (Orb_DesignMgr *designMgr : m_Host.GetDesignMgrs())
      for (Orb_Design *design : designMgr->GetDesigns())
        CheckDesign(design);
    for (auto const &[name, error] : m_LibraryErrors)
      m_Problems.SetDetail(Kind::LibraryUnloadable, name, error + m_LibraryDetails[name]);
  }

  Problems const &GetProblems() const { return m_Problems; }
  std::uint64_t Blocks() const { return m_Blocks; }
  std::uint64_t Views() const { return m_Views; }

private:
  void CheckDesign(Orb_Design *design) {
    Orb_Property const *mark = design->GetPropertyByName(kDesignTypeProperty);
    if (mark && std::strcmp(mark->GetStringValue(), kUserDesign) != 0) {
      // A refused design loads none of its views: they are not looked at.
      m_Problems.Add(Kind::ForeignMark, Quoted(std::string(mark->GetValue())),
                     [&] { return DesignPath(design); });
      return;
    }
    for (Orb_View *view : design->GetViews())
      CheckView(view);
  }

  void CheckView(Orb_View *view) {
    ++m_Views;
    if (!CheckStamp(view))
      return;

    // The view builds its library list when its first typed block loads: a
    // view without typed blocks never touches its libraries.
    std::vector<Orb_Block *> typed;
    if (Orb_Block *top = view->GetBlock())
      CollectTyped(top, typed);
    if (typed.empty())
      return;

    std::vector<ListedLibrary> libraries;
    bool const listBuilt = BuildLibraryList(view, libraries);
    if (listBuilt)
      for (Orb_Block *block : typed)
        CheckBlock(view, block, libraries);
    for (ListedLibrary const &listed : libraries) {
      if (listed.library)
        continue;
      std::string detail = "; " + ViewPath(view) + " types " + std::to_string(listed.blocks) +
                           " block" + (listed.blocks == 1 ? "" : "s") + " from it";
      for (std::size_t i = 0; i < listed.examples.size(); ++i)
        detail += (i ? ", " : ": ") + listed.examples[i];
      if (listed.blocks > listed.examples.size())
        detail += ", ...";
      m_LibraryDetails[listed.name] += detail;
    }
    for (ListedLibrary const &listed : libraries)
      if (listed.release)
        Lum_TlmLibrary::ReleaseLibrary(listed.library);
  }

  // Whether the view's stamp is accepted, read as the view reads it.
  bool CheckStamp(Orb_View *view) {
    Orb_Property const *stamp = view->GetPropertyByName(kVersionProperty);
    if (!stamp)
      return true;
    int version = 0;
    int revision = 0;
    Port::sscanf(stamp->GetStringValue(), "%d.%d", &version, &revision);
    auto const v = static_cast<std::uint32_t>(version);
    auto const r = static_cast<std::uint32_t>(revision);
    Kind kind;
    if (v == 0 && r <= 2)
      kind = Kind::StampTooOld;
    else if (v > kTdmVersion || (v == kTdmVersion && r > kTdmRevision))
      kind = Kind::StampTooNew;
    else
      return true;
    m_Problems.Add(kind, Quoted(std::string(stamp->GetValue())), [&] { return ViewPath(view); });
    return false;
  }

  void CollectTyped(Orb_Block *block, std::vector<Orb_Block *> &typed) {
    ++m_Blocks;
    // Typed blocks count for the progress line once they are checked.
    if (block->GetPropertyByName(kBlockTypeProperty))
      typed.push_back(block);
    else
      m_Progress.Count();
    for (Orb_Block *child : block->GetBlocks())
      CollectTyped(child, typed);
  }

  // Loads the view's libraries as the view would, but goes on past a
  // library that fails. False when no library can be loaded at all (the
  // device personality is missing): the blocks are then not checked.
  bool BuildLibraryList(Orb_View *view, std::vector<ListedLibrary> &libraries) {
    std::vector<std::string> names;
    for (std::string const &text : LibraryEntries(view->GetPropertyByName(kLibrariesProperty))) {
      Port::StringBase<char> const entry(text);
      std::size_t begin = 0;
      std::size_t end = 0;
      if (entry.NextTokenRange(0, " ", begin, end))
        names.push_back(text.substr(begin, end - begin));
    }
    if (names.empty())
      return true;

    Orb_Property const *pm = view->GetPropertyByName(kDevicePmProperty);
    Orb_Property const *part = view->GetPropertyByName(kDevicePartProperty);
    if (!pm || !part) {
      std::string const missing =
          !pm && !part ? std::string(kDevicePmProperty) + " and " + kDevicePartProperty
          : !pm        ? kDevicePmProperty
                       : kDevicePartProperty;
      m_Problems.Add(Kind::NoDevice, "without " + missing, [&] { return ViewPath(view); });
      return false;
    }
    PM_PIC const personality(pm->GetStringValue(), part->GetStringValue(), nullptr);

    for (std::string const &name : names) {
      ListedLibrary listed;
      listed.name = name;
      try {
        if (name == Lum_TlmLibrary::LOCAL_LIBRARY_NAME) {
          listed.library = Lum_TlmLibrary::GetLocalLibrary(&m_Host, personality);
        } else {
          listed.library = Lum_TlmLibrary::LoadLibrary(Port::StringBase<char>(name), personality);
          listed.release = true;
        }
      } catch (Port::Exception const &e) {
        m_Problems.Add(Kind::LibraryUnloadable, name, [&] { return ViewPath(view); });
        m_LibraryErrors.emplace(name, Describe(e));
      }
      libraries.push_back(std::move(listed));
    }
    return true;
  }

  void CheckBlock(Orb_View *view, Orb_Block *block, std::vector<ListedLibrary> &libraries) {
    m_Progress.Count();
    std::string const storedType(block->GetPropertyByName(kBlockTypeProperty)->GetValue());
    std::size_t const colon = storedType.find(':');
    std::string const libraryName = storedType.substr(0, colon);
    std::string const typeBlockName =
        colon == std::string::npos ? std::string() : storedType.substr(colon + 1);
    auto where = [&] { return ViewPath(view) + ":" + BlockPath(block); };

    ListedLibrary *listed = nullptr;
    for (ListedLibrary &candidate : libraries)
      if (candidate.name == libraryName) {
        listed = &candidate;
        break;
      }
    if (!listed) {
      m_Problems.Add(Kind::LibraryNotListed, storedType, where);
      return;
    }
    if (!listed->library) {
      // Reported with the library.
      ++listed->blocks;
      if (listed->examples.size() < kExamples)
        listed->examples.push_back(where());
      return;
    }
    Lum_TlmBlock const *typeBlock =
        listed->library->GetTypeBlock(Port::StringBase<char>(typeBlockName.c_str()));
    if (!typeBlock) {
      m_Problems.Add(Kind::TypeBlockMissing, storedType, where);
      return;
    }
    CheckPins(view, block, typeBlock->GetOrbBlock(), storedType, where);
  }

  // The pin reconciliation of a load, without changing anything: every pin
  // takes the type pin of its name or of the name TDS_BLOCK_PIN_MAP gives it
  // (the last member of a name wins), and a connected pin that finds none
  // fails; then, when the block has fewer pins than its type block and the
  // view allows it, each type pin nobody took is created, which fails when
  // the block already has a pin of that name.
  template <class Where>
  void CheckPins(Orb_View *view, Orb_Block *block, Orb_Block const *typeBlock,
                 std::string const &key, Where const &where) {
    std::unordered_map<std::string_view, char const *> nameMap;
    if (Orb_Property const *pinMap = block->GetPropertyByName(kPinMapProperty))
      for (auto const &member : pinMap->GetMembers())
        nameMap[std::string_view(member->GetName())] = member->GetStringValue();

    bool const createMissing = typeBlock->GetNumPins() > block->GetNumPins() &&
                               !view->GetPropertyByName(kDontCreatePinsProperty);
    std::unordered_set<Orb_Pin const *> taken;
    for (Orb_Pin *pin : block->GetPins()) {
      char const *typePinName = pin->GetName();
      auto const mapped = nameMap.find(std::string_view(pin->GetNameString()));
      if (mapped != nameMap.end())
        typePinName = mapped->second;
      Orb_Pin const *typePin = typeBlock->GetPinByName(typePinName);
      if (!typePin && pin->GetSignal())
        m_Problems.Add(Kind::PinUnmatched, key, [&] {
          std::string text = where() + " pin " + pin->GetName();
          if (mapped != nameMap.end())
            text += std::string(" (mapped to ") + typePinName + ")";
          return text;
        });
      if (typePin && createMissing)
        taken.insert(typePin);
    }
    if (!createMissing)
      return;
    for (Orb_Pin const *typePin : typeBlock->GetPins())
      if (!taken.count(typePin) && block->GetPinByName(typePin->GetName()))
        m_Problems.Add(Kind::PinCollision, key,
                       [&] { return where() + " pin " + typePin->GetName(); });
  }

  Orb_Model &m_Host;
  Progress &m_Progress;
  Problems m_Problems;
  std::map<std::string, std::string> m_LibraryErrors;
  std::map<std::string, std::string> m_LibraryDetails;
  std::uint64_t m_Blocks = 0;
  std::uint64_t m_Views = 0;
};

} // namespace

int RunCheck(std::string const &path, CommonOptions const &options) {
  ApplyLibraryPath(options);
  Progress progress("checking " + path, options);
  // A model of its own, with no client model attached: nothing is bound.
  Orb_Model host("tdm-check", "tdm-check", path.c_str(), true);
  try {
    host.Open(path.c_str());
  } catch (Port::Exception const &e) {
    throw Failure(kExitUnreadable, path + ": " + Describe(e, path));
  }

  Checker checker(host, progress);
  {
    // Library loads may warn through the message manager; the report says
    // all that matters.
    Port_MsgCapture const capture;
    checker.CheckModel();
  }
  progress.Stop();
  Problems const &problems = checker.GetProblems();
  if (problems.Total() == 0) {
    if (!options.quiet)
      std::printf("%s: no problems: it opens (%llu view%s, %llu block%s checked)\n", path.c_str(),
                  static_cast<unsigned long long>(checker.Views()), checker.Views() == 1 ? "" : "s",
                  static_cast<unsigned long long>(checker.Blocks()),
                  checker.Blocks() == 1 ? "" : "s");
    return kExitOk;
  }
  problems.Print(path);
  return kExitProblems;
}

} // namespace tdm

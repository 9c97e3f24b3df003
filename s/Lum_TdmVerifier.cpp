#include "Lum_TdmVerifier.h"

#include "Lum_TdmDesign.h"
#include "Lum_TdmLoadRules.h"

#include "Lum_Exception.h"
#include "Lum_TdmSchema.h"
#include "Lum_Tlm.h"
#include "Orb_Exception.h"
#include "Orb_Model.h"
#include "PM_PIC.h"
#include "Port_MsgManData.h"

#include <utility>

namespace {

using Kind = Lum_TdmVerifier::Kind;
using Problem = Lum_TdmVerifier::Problem;

// The class of an exception that loading a library threw.
char const *ClassOf(Port::Exception const &e) {
  if (dynamic_cast<Lum_ExceptionInvalidLibrary const *>(&e))
    return "Lum_ExceptionInvalidLibrary";
  if (dynamic_cast<Lum_ExceptionCorruptDatabase const *>(&e))
    return "Lum_ExceptionCorruptDatabase";
  if (dynamic_cast<Lum_Exception const *>(&e))
    return "Lum_Exception";
  if (dynamic_cast<Orb_Exception const *>(&e))
    return "Orb_Exception";
  return "Port::Exception";
}

Problem Make(Kind kind, std::string view, std::string path, std::string key, char const *exception,
             std::string objectName, std::string message) {
  Problem problem;
  problem.kind = kind;
  problem.view = std::move(view);
  problem.path = std::move(path);
  problem.key = std::move(key);
  problem.exception = exception;
  problem.objectName = std::move(objectName);
  problem.message = std::move(message);
  return problem;
}

// A library of a view's list, or why it is not there.
struct Listed {
  std::string name;
  Lum_TlmLibrary const *library = nullptr; // null: it failed to load
  bool release = false;                    // a reference to give back
};

// Gives the listed libraries back however the view's check ends.
class ListedLibraries {
public:
  ListedLibraries() = default;
  ListedLibraries(ListedLibraries const &) = delete;
  ListedLibraries &operator=(ListedLibraries const &) = delete;
  ~ListedLibraries() {
    for (Listed const &listed : m_List)
      if (listed.release)
        Lum_TlmLibrary::ReleaseLibrary(listed.library);
  }
  std::vector<Listed> &List() { return m_List; }
  Listed const *Find(std::string const &name) const {
    for (Listed const &listed : m_List)
      if (listed.name == name)
        return &listed;
    return nullptr;
  }

private:
  std::vector<Listed> m_List;
};

} // namespace

std::string Lum_TdmVerifier::DesignPath(Orb_Design const *design) {
  return std::string(design->GetParent()->GetName()) + "/" + design->GetName();
}

std::string Lum_TdmVerifier::ViewPath(Orb_View const *view) {
  return DesignPath(view->GetParent()) + "/" + view->GetName();
}

std::string Lum_TdmVerifier::BlockPath(Orb_Block const *block) {
  std::vector<Orb_Block const *> chain;
  for (Orb_Block const *b = block; b; b = b->GetParent())
    chain.push_back(b);
  std::string path;
  for (auto it = chain.rbegin(); it != chain.rend(); ++it)
    path += (path.empty() ? "" : "/") + std::string((*it)->GetName());
  return path;
}

Lum_TdmVerifier::Lum_TdmVerifier(Report report, std::function<void()> onBlock)
    : m_Report(std::move(report)), m_OnBlock(std::move(onBlock)) {}

void Lum_TdmVerifier::CheckModel(Orb_Model &host) {
  for (Orb_DesignMgr *designMgr : host.GetDesignMgrs())
    for (Orb_Design *design : designMgr->GetDesigns())
      CheckDesign(design);
}

void Lum_TdmVerifier::CheckDesign(Orb_Design *design) {
  if (!Lum_TdmDesign::IsUserDesign(*design)) {
    // A refused design loads none of its views: they are not looked at.
    m_Report(Make(Kind::ForeignMark, "", DesignPath(design),
                  std::string(design->GetPropertyByName(Lum_TdmSchema::kDesignType)->GetValue()),
                  "Lum_ExceptionDesignLoad", design->GetName(), Lum_TdmLoadRules::kForeignDesign));
    return;
  }
  for (Orb_View *view : design->GetViews())
    CheckView(view);
}

void Lum_TdmVerifier::CheckView(Orb_View *view) {
  ++m_Views;
  std::string const viewPath = ViewPath(view);
  Orb_Property const *stamp = view->GetPropertyByName(Lum_TdmSchema::kVersion);
  std::uint32_t version = 0;
  std::uint32_t revision = 0;
  Lum_TdmLoadRules::Stamp const read = Lum_TdmLoadRules::ReadStamp(stamp, version, revision);
  if (read != Lum_TdmLoadRules::Stamp::Accepted) {
    bool const old = read == Lum_TdmLoadRules::Stamp::TooOld;
    m_Report(Make(old ? Kind::StampTooOld : Kind::StampTooNew, viewPath, viewPath,
                  std::string(stamp->GetValue()), "Lum_ExceptionCorruptDatabase",
                  view->GetParent()->GetParent()->GetName(),
                  old ? Lum_TdmLoadRules::kOldStamp : Lum_TdmLoadRules::kNewStamp));
    return;
  }

  // The view builds its library list when its first typed block loads: a
  // view without typed blocks never touches its libraries. A stack of its
  // own, as a hierarchy may be deep; blocks in host order.
  std::vector<Orb_Block *> typed;
  std::vector<Orb_Block *> stack;
  if (Orb_Block *top = view->GetBlock())
    stack.push_back(top);
  while (!stack.empty()) {
    Orb_Block *block = stack.back();
    stack.pop_back();
    ++m_Blocks;
    if (m_OnBlock)
      m_OnBlock();
    if (block->GetPropertyByName(Lum_TdmSchema::kBlockType))
      typed.push_back(block);
    auto const children = block->GetBlocks();
    for (std::size_t i = children.size(); i-- > 0;)
      stack.push_back(children[i]);
  }
  if (typed.empty())
    return;

  // The list as the view builds it, going on past a library that fails. No
  // library loads without the device personality: the blocks are then not
  // looked at.
  std::vector<std::string> names;
  for (std::string const &entry :
       Lum_TdmLoadRules::LibraryEntries(view->GetPropertyByName(Lum_TdmSchema::kTypeLibraries))) {
    std::string name;
    if (Lum_TdmLoadRules::LibraryName(entry, name))
      names.push_back(std::move(name));
  }
  ListedLibraries libraries;
  if (!names.empty()) {
    if (char const *missing = Lum_TdmLoadRules::MissingDevice(view)) {
      bool const both = !view->GetPropertyByName(Lum_TdmSchema::kDevicePart) &&
                        !view->GetPropertyByName(Lum_TdmSchema::kDevicePm);
      std::string const key = std::string("without ") + missing +
                              (both ? std::string(" and ") + Lum_TdmSchema::kDevicePart : "");
      m_Report(Make(Kind::NoDevice, viewPath, viewPath, key, "Lum_ExceptionInvalidLibrary",
                    view->GetName(), Lum_TdmLoadRules::NoDeviceMessage(missing)));
      return;
    }
    PM_PIC const personality(view->GetPropertyByName(Lum_TdmSchema::kDevicePm)->GetStringValue(),
                             view->GetPropertyByName(Lum_TdmSchema::kDevicePart)->GetStringValue(),
                             nullptr);
    for (std::string const &name : names) {
      libraries.List().push_back(Listed{name, nullptr, false});
      Listed &listed = libraries.List().back();
      try {
        if (name == Lum_TlmLibrary::LOCAL_LIBRARY_NAME) {
          listed.library = Lum_TlmLibrary::GetLocalLibrary(view->GetModel(), personality);
        } else {
          listed.library = Lum_TlmLibrary::LoadLibrary(Port::StringBase<char>(name), personality);
          listed.release = true;
        }
      } catch (Port::Exception const &e) {
        m_Report(Make(Kind::LibraryUnloadable, viewPath, viewPath, name, ClassOf(e),
                      e.GetObjectName(), e.GetMessage()));
      }
    }
  }

  for (Orb_Block *block : typed) {
    std::string const storedType(block->GetPropertyByName(Lum_TdmSchema::kBlockType)->GetValue());
    std::string libraryName;
    std::string typeBlockName;
    Lum_TdmLoadRules::SplitStoredType(storedType, libraryName, typeBlockName);
    std::string const blockPath = viewPath + ":" + BlockPath(block);
    Listed const *listed = libraries.Find(libraryName);
    if (!listed) {
      m_Report(Make(Kind::LibraryNotListed, viewPath, blockPath, storedType,
                    "Lum_ExceptionCorruptDatabase", libraryName,
                    Lum_TdmLoadRules::kLibraryNotFound));
      continue;
    }
    if (!listed->library) {
      m_Report(Make(Kind::BlockOfUnloadableLibrary, viewPath, blockPath, libraryName, "", "", ""));
      continue;
    }
    Lum_TlmBlock const *typeBlock =
        listed->library->GetTypeBlock(Port::StringBase<char>(typeBlockName.c_str()));
    if (!typeBlock) {
      m_Report(Make(Kind::TypeBlockMissing, viewPath, blockPath, storedType,
                    "Lum_ExceptionCorruptDatabase", typeBlockName,
                    Lum_TdmLoadRules::TypeBlockMissingMessage(typeBlockName, libraryName)));
      continue;
    }

    // The pin matching of a load, changing nothing.
    Lum_TdmLoadRules::NameMap nameMap;
    Lum_TdmLoadRules::ReadPinMap(block, nameMap);
    bool const createMissing =
        Lum_TdmLoadRules::CreatesMissing(typeBlock, block, Lum_TdmLoadRules::ForbidsCreating(view));
    std::vector<Lum_TlmPin const *> taken;
    for (Orb_Pin *pin : block->GetPins()) {
      char const *typePinName = Lum_TdmLoadRules::TypePinName(pin, nameMap);
      Lum_TlmPin const *typePin = typeBlock->GetPinByName(typePinName);
      if (Lum_TdmLoadRules::IsUnmatched(pin, typePin)) {
        Problem problem =
            Make(Kind::PinUnmatched, viewPath, blockPath + " pin " + pin->GetName(), storedType,
                 "Lum_ExceptionCorruptDatabase", pin->GetName(), Lum_TdmLoadRules::kPinNotFound);
        if (typePinName != pin->GetName())
          problem.mappedTo = typePinName;
        m_Report(problem);
      }
      if (typePin && createMissing)
        taken.push_back(typePin);
    }
    if (!createMissing)
      continue;
    Lum_TdmLoadRules::ForEachUntaken(
        typeBlock, block, taken, [&](Lum_TlmPin const *typePin, bool collides) {
          if (collides)
            m_Report(Make(Kind::PinCollision, viewPath, blockPath + " pin " + typePin->GetName(),
                          storedType, "Lum_ExceptionCorruptDatabase", view->GetParent()->GetName(),
                          Lum_TdmLoadRules::PatchUpMessage(block->GetName(), typePin->GetName(),
                                                           typeBlock->GetName())));
        });
  }
}

std::vector<Lum_TdmVerifier::Problem>
Lum_TdmVerifier::Collect(std::function<void(Lum_TdmVerifier &)> const &check) {
  std::vector<Problem> problems;
  Port_MsgCapture const quiet;
  Lum_TdmVerifier verifier([&problems](Problem const &problem) { problems.push_back(problem); });
  check(verifier);
  return problems;
}

std::vector<Lum_TdmVerifier::Problem> Lum_TdmVerifier::CheckFile(std::string const &path) {
  // A model of its own, with no client model attached: nothing is bound.
  Orb_Model host("checked", "checked", path.c_str(), true);
  host.Open(path.c_str());
  return Collect([&host](Lum_TdmVerifier &verifier) { verifier.CheckModel(host); });
}

std::vector<Lum_TdmVerifier::Problem> Lum_TdmVerifier::Check(Orb_View *view) {
  return Collect([view](Lum_TdmVerifier &verifier) { verifier.CheckView(view); });
}

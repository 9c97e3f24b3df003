// tdm rebind: the everyday edit on a netlist, swapping the cell type of
// every matching block (resizing, moving to another library), all or
// nothing: every block is checked before any is rebound, and the database is
// saved only when all are. A --to library the view does not list yet is
// loaded (from the search path or a --lib file) and added to the view's
// libraries, so that the next open binds the new type.

#include "commands.h"

#include "Lum_TdmBlock.h"
#include "Lum_TdmModel.h"
#include "Lum_TdmPin.h"
#include "Lum_TdmTypePinMap.h"
#include "Lum_TdmTypePinMapMgr.h"
#include "Lum_TdmView.h"
#include "Lum_TypeLibraryLoader.h"

#include "Lum_TdmSchema.h"
#include "Lum_Tlm.h"
#include "Orb_Model.h"
#include "Orb_Property.h"
#include "Port_Exception.h"

#include <cstdio>
#include <fnmatch.h>
#include <map>

namespace tdm {
namespace {

std::pair<std::string, std::string> SplitType(std::string const &text, char const *option) {
  std::size_t const colon = text.find(':');
  if (colon == std::string::npos || colon == 0 || colon + 1 == text.size())
    throw Failure(kExitUsage, std::string(option) + " is LIBRARY:CELL, not " + Quoted(text));
  return {text.substr(0, colon), text.substr(colon + 1)};
}

Lum_TlmBlock const *FindCell(Lum_TlmLibrary const *library, std::string const &name,
                             std::string const &cell) {
  Lum_TlmBlock const *typeBlock = library->GetTypeBlock(Port::StringBase<char>(cell.c_str()));
  if (!typeBlock)
    throw Failure(kExitUsage, "library " + name + " has no cell " + Quoted(cell));
  return typeBlock;
}

Lum_TlmBlock const *FindType(Lum_TdmView const *view, std::string const &text, char const *option) {
  auto const [library, cell] = SplitType(text, option);
  Lum_TlmLibrary const *found = view->GetLibrary(Port::StringBase<char>(library.c_str()));
  if (!found)
    throw Failure(kExitUsage, "library " + Quoted(library) + " of " + option +
                                  " is not among the libraries of view " +
                                  ViewPath(view->GetOrbView()));
  return FindCell(found, library, cell);
}

// A reference LoadLibrary took, given back unless a view took it over.
class LoadedLibrary {
public:
  LoadedLibrary() = default;
  ~LoadedLibrary() { Lum_TlmLibrary::ReleaseLibrary(m_Library); }
  LoadedLibrary(LoadedLibrary const &) = delete;
  LoadedLibrary &operator=(LoadedLibrary const &) = delete;

  // Loads the library for the view's device; throws Failure naming both.
  void Load(Lum_TdmView const *view, std::string const &name) {
    Orb_View const *host = view->GetOrbView();
    Orb_Property const *pm = host->GetPropertyByName(Lum_TdmSchema::kDevicePm);
    Orb_Property const *part = host->GetPropertyByName(Lum_TdmSchema::kDevicePart);
    if (!pm || !part)
      throw Failure(kExitUnreadable, "view " + ViewPath(host) + " names no device (" +
                                         Lum_TdmSchema::kDevicePm + ", " +
                                         Lum_TdmSchema::kDevicePart + "), so library " +
                                         Quoted(name) + " cannot be loaded for it");
    try {
      m_Library = Lum_TlmLibrary::LoadLibrary(
          Port::StringBase<char>(name.c_str()),
          PM_PIC(pm->GetStringValue(), part->GetStringValue(), nullptr));
    } catch (Port::Exception const &e) {
      throw Failure(kExitUnreadable, "library " + Quoted(name) +
                                         " of --to is not among the libraries of view " +
                                         ViewPath(host) + " and cannot be loaded: " + Describe(e) +
                                         " (give its file with --lib, or its folder with "
                                         "--lib-path)");
    }
  }
  Lum_TlmLibrary const *Get() const { return m_Library; }
  // Adds the library to the view's list, which gives it back from then on.
  void HandTo(Lum_TdmView *view) {
    auto *opened = dynamic_cast<OpenedView *>(view);
    if (!opened)
      throw Failure(kExitUnreadable,
                    "view " + ViewPath(view->GetOrbView()) + " cannot take another library");
    opened->AddLibrary(m_Library);
    m_Library = nullptr;
  }

private:
  Lum_TlmLibrary const *m_Library = nullptr;
};

// Every block of the view, depth first, through the typed children.
void Walk(Lum_TdmBlock *block, std::vector<Lum_TdmBlock *> &blocks) {
  std::vector<Lum_TdmBlock *> stack{block};
  while (!stack.empty()) {
    Lum_TdmBlock *current = stack.back();
    stack.pop_back();
    blocks.push_back(current);
    for (std::size_t i = current->GetBlocks().size(); i > 0; --i)
      stack.push_back(current->GetBlock(i - 1));
  }
}

} // namespace

int RunRebind(std::string const &path, RebindOptions const &rebind, CommonOptions const &options) {
  // OLD=NEW pairs.
  std::map<std::string, std::string> renames;
  for (std::size_t start = 0; !rebind.map.empty() && start <= rebind.map.size();) {
    std::size_t const comma = std::min(rebind.map.find(',', start), rebind.map.size());
    std::string const pair = rebind.map.substr(start, comma - start);
    std::size_t const equals = pair.find('=');
    if (equals == std::string::npos || equals == 0 || equals + 1 == pair.size())
      throw Failure(kExitUsage, "--map takes OLDPIN=NEWPIN,..., not " + Quoted(pair));
    renames[pair.substr(0, equals)] = pair.substr(equals + 1);
    start = comma + 1;
  }
  auto const [toName, toCell] = SplitType(rebind.to, "--to");
  ApplyLibraryPath(options);
  // Libraries read now outlive the model, whose views may hold them.
  std::unique_ptr<Lum_TypeLibraryLoader> libraries;
  std::unique_ptr<Lum_TdmModel> model = OpenTyped(path, options);
  if (!rebind.libraries.empty()) {
    Lum_TypeLibraryLoadOptions loading;
    // A library the database holds already is used from its .tlm file.
    loading.refuseLoaded = true;
    libraries = LoadLibraries(rebind.libraries, loading);
  }
  Lum_TdmTypePinMapMgr maps;
  std::size_t rebound = 0;
  std::size_t views = 0;
  std::size_t added = 0;
  for (Orb_View *hostView : SelectViews(*model, path, "")) {
    auto *view = static_cast<Lum_TdmView *>(model->Specialize(hostView));
    if (!view->GetBlock())
      continue;
    ++views;
    Lum_TlmBlock const *from = FindType(view, rebind.from, "--from");
    // The --to library: one the view lists, or one loaded now and listed
    // only when a block is rebound to it.
    LoadedLibrary loaded;
    Lum_TlmLibrary const *toLibrary = view->GetLibrary(Port::StringBase<char>(toName.c_str()));
    if (!toLibrary) {
      loaded.Load(view, toName);
      toLibrary = loaded.Get();
    }
    Lum_TlmBlock const *to = FindCell(toLibrary, toName, toCell);
    std::vector<Lum_TdmBlock *> blocks;
    Walk(view->GetBlock(), blocks);
    // Check every block first; the first that cannot be rebound ends the
    // command before anything changed.
    std::vector<std::pair<Lum_TdmBlock *, Lum_TdmTypePinMap const *>> plan;
    // Equal maps of this swap are shared under one key.
    std::string key = rebind.from;
    key += '>';
    key += rebind.to;
    for (Lum_TdmBlock *block : blocks) {
      if (block->GetTypeBlock() != from)
        continue;
      std::string const blockPath = BlockPath(block->GetOrbBlock());
      if (!rebind.where.empty() && ::fnmatch(rebind.where.c_str(), blockPath.c_str(), 0) != 0)
        continue;
      Lum_TdmTypePinMap map;
      for (std::size_t i = 0; i < block->GetPins().size(); ++i) {
        Lum_TdmPin const *pin = block->GetPin(i);
        std::string name = pin->GetTypePin() ? pin->GetTypePin()->GetName() : pin->GetName();
        auto const renamed = renames.find(name);
        if (renamed != renames.end())
          name = renamed->second;
        Lum_TlmPin const *typePin = to->GetPinByName(name.c_str());
        if (!typePin) {
          std::string text = "block " + blockPath;
          text += ": pin " + Quoted(pin->GetName());
          text += " has no pin " + Quoted(name);
          text += " in " + rebind.to;
          text += " (map it with --map); nothing was rebound, " + path;
          text += " is unchanged";
          throw Failure(kExitProblems, text);
        }
        map.SetPinMap(Port::StringBase<char>(pin->GetName()), typePin);
      }
      plan.emplace_back(block, maps.GetTypePinMap(Port::StringBase<char>(key.c_str()), &map));
    }
    if (loaded.Get() && !plan.empty()) {
      loaded.HandTo(view);
      ++added;
    }
    for (auto const &[block, map] : plan) {
      try {
        block->SetTypeBlock(to, *map);
      } catch (Port::Exception const &e) {
        throw Failure(kExitProblems, "block " + BlockPath(block->GetOrbBlock()) +
                                         " cannot be rebound: " + Describe(e) + "; " + path +
                                         " is unchanged");
      }
    }
    rebound += plan.size();
    try {
      view->CommitAll();
    } catch (Port::Exception const &e) {
      throw Failure(kExitUnreadable, path + ": view " + ViewPath(hostView) +
                                         " cannot be committed: " + Describe(e) +
                                         "; nothing was saved");
    }
  }
  std::string const target = rebind.output.empty() ? path : rebind.output;
  try {
    model->Save(target.c_str());
  } catch (Port::Exception const &e) {
    throw Failure(kExitUnreadable,
                  target + ": cannot be saved: " + Describe(e, target) +
                      (rebind.output.empty() ? "; the database is unchanged" : ""));
  }
  // The libraries read now stay beside the database, for the next open.
  std::vector<std::string> const kept =
      libraries && added ? KeepLibraries(*libraries, target) : std::vector<std::string>();
  if (!options.quiet) {
    std::printf("rebound %zu block%s from %s to %s in %zu view%s, saved %s\n", rebound,
                rebound == 1 ? "" : "s", rebind.from.c_str(), rebind.to.c_str(), views,
                views == 1 ? "" : "s", target.c_str());
    if (added)
      std::printf("added type library %s to %zu view%s\n", toName.c_str(), added,
                  added == 1 ? "" : "s");
    for (std::string const &file : kept)
      std::printf("kept type library %s\n", file.c_str());
  }
  return kExitOk;
}

} // namespace tdm

// tdm rebind: the everyday edit on a netlist, swapping the cell type of
// every matching block (resizing, moving to another library), all or
// nothing: every block is checked before any is rebound, and the database is
// saved only when all are.

#include "commands.h"

#include "Lum_TdmBlock.h"
#include "Lum_TdmModel.h"
#include "Lum_TdmPin.h"
#include "Lum_TdmTypePinMap.h"
#include "Lum_TdmTypePinMapMgr.h"
#include "Lum_TdmView.h"

#include "Lum_Tlm.h"
#include "Orb_Model.h"
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

Lum_TlmBlock const *FindType(Lum_TdmView const *view, std::string const &text, char const *option) {
  auto const [library, cell] = SplitType(text, option);
  Lum_TlmLibrary const *found = view->GetLibrary(Port::StringBase<char>(library.c_str()));
  if (!found)
    throw Failure(kExitUsage, "library " + Quoted(library) + " of " + option +
                                  " is not among the libraries of view " +
                                  ViewPath(view->GetOrbView()));
  Lum_TlmBlock const *typeBlock = found->GetTypeBlock(Port::StringBase<char>(cell.c_str()));
  if (!typeBlock)
    throw Failure(kExitUsage, "library " + library + " has no cell " + Quoted(cell));
  return typeBlock;
}

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
  ApplyLibraryPath(options);
  std::unique_ptr<Lum_TdmModel> model = OpenTyped(path, options);
  Lum_TdmTypePinMapMgr maps;
  std::size_t rebound = 0;
  std::size_t views = 0;
  for (Orb_View *hostView : SelectViews(*model, path, "")) {
    auto *view = static_cast<Lum_TdmView *>(model->Specialize(hostView));
    if (!view->GetBlock())
      continue;
    ++views;
    Lum_TlmBlock const *from = FindType(view, rebind.from, "--from");
    Lum_TlmBlock const *to = FindType(view, rebind.to, "--to");
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
  if (!options.quiet)
    std::printf("rebound %zu block%s from %s to %s in %zu view%s, saved %s\n", rebound,
                rebound == 1 ? "" : "s", rebind.from.c_str(), rebind.to.c_str(), views,
                views == 1 ? "" : "s", target.c_str());
  return kExitOk;
}

} // namespace tdm

// tdm find: the blocks of one cell type, through the library's typed
// queries, listed by path or counted.

#include "commands.h"

#include "Lum_TdmBlock.h"
#include "Lum_TdmModel.h"
#include "Lum_TdmView.h"

#include "Lum_TlmTypeID.h"
#include "Orb_Model.h"

#include <cstdio>

namespace tdm {

int RunFind(std::string const &path, FindOptions const &find, CommonOptions const &options) {
  std::size_t const colon = find.type.find(':');
  if (colon == std::string::npos || colon == 0 || colon + 1 == find.type.size())
    throw Failure(kExitUsage, "--type is LIBRARY:CELL, not " + Quoted(find.type));
  std::string const library = find.type.substr(0, colon);
  std::string const cell = find.type.substr(colon + 1);
  Lum_TlmBlockTypeID const type(library.c_str(), cell.c_str());
  ApplyLibraryPath(options);
  std::unique_ptr<Lum_TdmModel> model = OpenTyped(path, options);
  std::size_t count = 0;
  for (Orb_View *hostView : SelectViews(*model, path, find.view)) {
    auto *view = static_cast<Lum_TdmView *>(model->Specialize(hostView));
    if (!view->GetBlock())
      continue;
    // Depth first over every block; each gives its children of the type.
    std::vector<Lum_TdmBlock *> stack{view->GetBlock()};
    std::vector<Lum_TdmBlock *> found;
    while (!stack.empty()) {
      Lum_TdmBlock *block = stack.back();
      stack.pop_back();
      found.clear();
      block->GetChildBlocksOfType(type, found);
      count += found.size();
      if (!find.count)
        for (Lum_TdmBlock const *match : found)
          std::printf("%s\n", BlockPath(match->GetOrbBlock()).c_str());
      for (std::size_t i = block->GetBlocks().size(); i > 0; --i)
        stack.push_back(block->GetBlock(i - 1));
    }
  }
  if (find.count)
    std::printf("%zu\n", count);
  return kExitOk;
}

} // namespace tdm

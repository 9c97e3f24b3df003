// tdm commit: opens a database, commits every view and saves it, which
// brings every stamp to the current format and rewrites library lists and
// pin maps from the bindings.

#include "commands.h"

#include "Lum_TdmModel.h"
#include "Lum_TdmView.h"

#include "Orb_Model.h"
#include "Port_Exception.h"

#include <cstdio>
#include <string>

namespace tdm {

int RunCommit(std::string const &path, CommitOptions const &commit, CommonOptions const &options) {
  ApplyLibraryPath(options);
  std::unique_ptr<Lum_TdmModel> model = OpenTyped(path, options);
  unsigned current = 0;
  unsigned currentRevision = 0;
  Lum_TdmView::GetTdmVersion(current, currentRevision);

  std::vector<std::string> changes;
  for (Orb_View *hostView : SelectViews(*model, path, "")) {
    auto *view = static_cast<Lum_TdmView *>(model->Specialize(hostView));
    unsigned version = 0;
    unsigned revision = 0;
    view->GetTdmLoadedDesignVersion(version, revision);
    try {
      view->CommitAll();
    } catch (Port::Exception const &e) {
      throw Failure(kExitUnreadable, path + ": view " + ViewPath(hostView) +
                                         " cannot be committed: " + Describe(e) +
                                         "; nothing was saved");
    }
    changes.push_back(ViewPath(hostView) + ": stamp " + std::to_string(version) + "." +
                      std::to_string(revision) + " -> " + std::to_string(current) + "." +
                      std::to_string(currentRevision));
  }

  std::string const target = commit.output.empty() ? path : commit.output;
  try {
    model->Save(target.c_str());
  } catch (Port::Exception const &e) {
    throw Failure(kExitUnreadable,
                  target + ": cannot be saved: " + Describe(e, target) +
                      (commit.output.empty() ? "; the database is unchanged" : ""));
  }
  if (!options.quiet) {
    for (std::string const &change : changes)
      std::printf("%s\n", change.c_str());
    std::printf("committed %zu view%s, saved %s\n", changes.size(), changes.size() == 1 ? "" : "s",
                target.c_str());
  }
  return kExitOk;
}

} // namespace tdm

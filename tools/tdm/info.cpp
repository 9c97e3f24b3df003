// tdm info: what a database holds, per design and view, once opened through
// the client model.

#include "commands.h"

#include "Lum_TdmBlock.h"
#include "Lum_TdmModel.h"
#include "Lum_TdmView.h"

#include "Lum_TdmSchema.h"
#include "Lum_Tlm.h"
#include "Orb_Model.h"
#include "Orb_Property.h"
#include "Port_Exception.h"
#include "Port_Stream.h"
#include "Port_String.h"

#include <cstdint>
#include <cstdio>
#include <map>
#include <string>
#include <vector>

namespace tdm {
namespace {

// A library's version and qualifiers as TDS_VIEW_TYPE_LIBS records them.
std::string VersionText(Lum_TlmLibrary const *library) {
  unsigned version = 0;
  unsigned revision = 0;
  library->GetTlmVersion(version, revision);
  std::string text = std::to_string(version) + "." + std::to_string(revision);
  for (Port::StringBase<char> const &qualifier :
       {library->GetFirstQualifier(), library->GetSecondQualifier()})
    if (!qualifier.empty())
      text += " " + qualifier.str();
  return text;
}

struct Counts {
  std::map<std::string, std::uint64_t> perType;
  std::uint64_t untyped = 0;
  std::uint64_t blocks = 0;
  std::uint64_t pins = 0;
  std::uint64_t signals = 0;
};

void CountBlocks(Lum_TdmModel &model, Orb_Block *block, Counts &counts) {
  auto *client = static_cast<Lum_TdmBlock *>(model.Specialize(block));
  ++counts.blocks;
  if (Lum_TlmBlock const *typeBlock = client->GetTypeBlock())
    ++counts.perType[typeBlock->GetUniqueTag().str()];
  else
    ++counts.untyped;
  counts.pins += block->GetPins().size();
  counts.signals += block->GetSignals().size();
  for (Orb_Block *child : block->GetBlocks())
    CountBlocks(model, child, counts);
}

void PrintLibraries(Lum_TdmView const *view) {
  Orb_Property const *recorded = view->GetPropertyByName(Lum_TdmSchema::kTypeLibraries);
  if (!recorded || recorded->GetStrings().empty()) {
    std::printf("    type libraries: none recorded\n");
    return;
  }
  std::printf("    type libraries (recorded in TDS_VIEW_TYPE_LIBS, found now):\n");
  for (std::string const &entry : recorded->GetStrings()) {
    std::size_t const space = entry.find(' ');
    std::string const name = entry.substr(0, space);
    std::string const then = space == std::string::npos ? "-" : entry.substr(space + 1);
    std::string now;
    try {
      Lum_TlmLibrary const *library = view->GetLibrary(Port::StringBase<char>(name.c_str()));
      now = library ? VersionText(library) : "not loaded";
    } catch (Port::Exception const &e) {
      now = "cannot be loaded: " + Describe(e);
    }
    std::printf("      %-12s recorded %-16s now %s%s\n", name.c_str(), then.c_str(), now.c_str(),
                now == then ? "" : "   <- differs");
  }
}

} // namespace

int RunInfo(std::string const &path, CommonOptions const &options) {
  ApplyLibraryPath(options);
  std::unique_ptr<Lum_TdmModel> model = OpenTyped(path, options);
  std::printf("%s\n", path.c_str());
  Orb_Design const *lastDesign = nullptr;
  for (Orb_View *hostView : SelectViews(*model, path, "")) {
    if (hostView->GetParent() != lastDesign) {
      lastDesign = hostView->GetParent();
      std::printf("design %s\n", DesignPath(lastDesign).c_str());
    }
    auto *view = static_cast<Lum_TdmView *>(model->Specialize(hostView));
    std::printf("  view %s\n", view->GetName());

    unsigned version = 0;
    unsigned revision = 0;
    view->GetTdmLoadedDesignVersion(version, revision);
    Orb_Property const *stamp = view->GetPropertyByName(Lum_TdmSchema::kVersion);
    std::printf("    stamp: %u.%u%s\n", version, revision,
                stamp ? "" : " (no TDS_TDM_VERSION: read as 0.0)");
    Orb_Property const *pm = view->GetPropertyByName(Lum_TdmSchema::kDevicePm);
    Orb_Property const *part = view->GetPropertyByName(Lum_TdmSchema::kDevicePart);
    std::printf("    device: %s, part %s\n", pm ? pm->GetStringValue() : "(none)",
                part ? part->GetStringValue() : "(none)");
    PrintLibraries(view);

    Counts counts;
    if (Orb_Block *top = hostView->GetBlock())
      CountBlocks(*model, top, counts);
    std::printf("    blocks: %llu (%llu typed, %llu untyped)\n",
                static_cast<unsigned long long>(counts.blocks),
                static_cast<unsigned long long>(counts.blocks - counts.untyped),
                static_cast<unsigned long long>(counts.untyped));
    for (auto const &[type, count] : counts.perType)
      std::printf("      %-24s %llu\n", type.c_str(), static_cast<unsigned long long>(count));
    if (counts.untyped)
      std::printf("      %-24s %llu\n", "(untyped)",
                  static_cast<unsigned long long>(counts.untyped));
    std::printf("    pins: %llu, signals: %llu, networks: %llu\n",
                static_cast<unsigned long long>(counts.pins),
                static_cast<unsigned long long>(counts.signals),
                static_cast<unsigned long long>(hostView->GetNetworks().size()));
    // The report goes through the same C stream as the lines above.
    std::fflush(stdout);
    Port::FileStream out(stdout);
    view->DbgReportSize(&out);
  }
  return kExitOk;
}

} // namespace tdm

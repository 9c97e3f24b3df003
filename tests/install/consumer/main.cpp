// Uses the installed libraries the way a tool does: builds a typed design,
// saves it, checks and reopens it, and catches the library's exceptions by
// their own types (which needs their type information exported from the
// libraries).
//
// Usage: consumer DIRECTORY

#include "Lum_TdmBlock.h"
#include "Lum_TdmDesign.h"
#include "Lum_TdmDesignMgr.h"
#include "Lum_TdmModel.h"
#include "Lum_TdmPin.h"
#include "Lum_TdmVerifier.h"
#include "Lum_TdmView.h"

#include "Lum_Exception.h"
#include "Lum_TdmSchema.h"
#include "Orb_Exception.h"

#include <cstdio>
#include <string>
#include <vector>

namespace {

int g_Failures = 0;

void Check(bool ok, char const *what) {
  if (!ok) {
    std::fprintf(stderr, "consumer: FAILED: %s\n", what);
    ++g_Failures;
  }
}

void Write(std::string const &path) {
  Lum_TdmModel model("tool", "tool_db", path.c_str());
  Lum_TdmView *view = model.CreateDesignMgr("work")->CreateDesign("counter")->CreateView("netlist");
  view->CreatePropertyString(Lum_TdmSchema::kDevicePm, "generic");
  view->CreatePropertyString(Lum_TdmSchema::kDevicePart, "part0");
  Lum_TdmBlock *top = view->CreateTopBlock("counter");
  top->CreatePin("clk", Orb_Pin::PIN_INPUT);
  Lum_TdmBlock *bit = top->CreateBlock("bit0", 0);
  bit->CreatePin("CK", Orb_Pin::PIN_INPUT);
  bit->CreatePin("Q", Orb_Pin::PIN_OUTPUT);
  view->CommitAll();
  model.Save(path.c_str());
}

// The checking call finds nothing in the saved design, and names a block
// typed from a library its view does not list.
void CheckWithoutOpening(std::string const &path) {
  Check(Lum_TdmVerifier::CheckFile(path).empty(), "the saved design checks clean");
  Lum_TdmModel model("tool", "tool_db", path.c_str());
  model.Open(path.c_str());
  Lum_TdmView *view =
      model.GetDesignMgrByName("work")->GetDesignByName("counter")->GetViewByName("netlist");
  view->GetBlock()->GetBlock(0)->CreatePropertyString(Lum_TdmSchema::kBlockType, "CELLS:DFF");
  std::vector<Lum_TdmVerifier::Problem> const problems = Lum_TdmVerifier::Check(view->GetOrbView());
  Check(problems.size() == 1 && problems[0].kind == Lum_TdmVerifier::Kind::LibraryNotListed &&
            problems[0].path == "work/counter/netlist:counter/bit0" &&
            problems[0].key == "CELLS:DFF" && problems[0].objectName == "CELLS",
        "a block of an unlisted library is reported");
}

void Reopen(std::string const &path) {
  Lum_TdmModel model("tool", "tool_db", path.c_str());
  model.Open(path.c_str());
  Lum_TdmView *view =
      model.GetDesignMgrByName("work")->GetDesignByName("counter")->GetViewByName("netlist");
  Lum_TdmBlock *top = view->GetBlock();
  Check(top && top->GetBlocks().size() == 1, "the top block has its child");
  Check(top && top->GetBlock(0)->GetNumPins() == 2, "the child block has both pins");
}

// A duplicate name is a host failure; a library found nowhere is the
// library's own kind.
void CatchByType() {
  Lum_TdmModel model("tool", "tool_db", "");
  Lum_TdmDesignMgr *designMgr = model.CreateDesignMgr("work");
  designMgr->CreateDesign("counter");
  bool caught = false;
  try {
    designMgr->CreateDesign("counter");
  } catch (Orb_Exception const &) {
    caught = true;
  }
  Check(caught, "a duplicate design throws Orb_Exception");

  Lum_TdmView *view = designMgr->GetDesignByName("counter")->CreateView("netlist");
  view->CreatePropertyString(Lum_TdmSchema::kDevicePm, "generic");
  view->CreatePropertyString(Lum_TdmSchema::kDevicePart, "part0");
  view->CreatePropertyStringList(Lum_TdmSchema::kTypeLibraries)->AppendString("NO_SUCH_LIBRARY");
  caught = false;
  try {
    std::vector<Lum_TlmLibrary const *> libraries;
    view->GetLibraries(libraries);
  } catch (Lum_ExceptionInvalidLibrary const &e) {
    caught = e.GetObjectName() == "NO_SUCH_LIBRARY";
  }
  Check(caught, "a missing type library throws Lum_ExceptionInvalidLibrary naming it");
}

} // namespace

int main(int argc, char **argv) {
  if (argc != 2) {
    std::fprintf(stderr, "usage: consumer DIRECTORY\n");
    return 2;
  }
  std::string const path = std::string(argv[1]) + "/consumer.odb";
  try {
    Write(path);
    CheckWithoutOpening(path);
    Reopen(path);
    CatchByType();
  } catch (std::exception const &e) {
    std::fprintf(stderr, "consumer: unexpected exception: %s\n", e.what());
    return 1;
  }
  if (g_Failures)
    return 1;
  std::printf("consumer: ok\n");
  return 0;
}

#pragma once

// What the fuzz targets share: a private scratch directory, an in-memory
// type library, the invariants every call must keep, and a text form of a
// model's typing that a save and a reopen must give back.

#include "Lum_TdmBlock.h"
#include "Lum_TdmDesign.h"
#include "Lum_TdmDesignMgr.h"
#include "Lum_TdmModel.h"
#include "Lum_TdmPin.h"
#include "Lum_TdmSignal.h"
#include "Lum_TdmView.h"

#include "Lum_Tlm.h"
#include "Ora_GraftMgr.h"
#include "Orb_FileOps.h"
#include "Port_Exception.h"
#include "Port_MsgManData.h"

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <exception>
#include <filesystem>
#include <fstream>
#include <functional>
#include <map>
#include <memory>
#include <new>
#include <string>
#include <vector>

namespace LumFuzz {

class Library;
Library &TheLibrary();

// Stops the run with a message: libFuzzer takes the abort as a finding and
// keeps the input.
[[noreturn]] inline void Fail(std::string const &what) {
  std::fprintf(stderr, "fuzz invariant broken: %s\n", what.c_str());
  std::fflush(stderr);
  std::abort();
}

inline void Check(bool condition, std::string const &what) {
  if (!condition)
    Fail(what);
}

// A directory of this process, removed at exit.
class Scratch {
public:
  Scratch() {
    std::string pattern = (std::filesystem::temp_directory_path() / "lum_fuzz_XXXXXX").string();
    Check(::mkdtemp(pattern.data()) != nullptr, "cannot make a scratch directory");
    m_Path = pattern;
  }
  ~Scratch() {
    std::error_code ignored;
    std::filesystem::remove_all(m_Path, ignored);
  }
  Scratch(Scratch const &) = delete;
  Scratch &operator=(Scratch const &) = delete;

  std::string File(std::string const &name) const { return (m_Path / name).string(); }
  std::string Path() const { return m_Path.string(); }

private:
  std::filesystem::path m_Path;
};

// Saves into the scratch directory need not survive a crash of the
// machine: without the sync the targets run many times faster.
inline int NoSync(int) { return 0; }

inline Scratch &TheScratch() {
  static Scratch scratch;
  static bool const fast = [] {
    Orb_FileOps ops = Orb_FileOps::Get();
    ops.fsync = &NoSync;
    Orb_FileOps::Set(ops);
    return true;
  }();
  (void)fast;
  return scratch;
}

inline void WriteFile(std::string const &path, std::uint8_t const *data, std::size_t size) {
  std::ofstream out(path, std::ios::binary | std::ios::trunc);
  out.write(reinterpret_cast<char const *>(data), static_cast<std::streamsize>(size));
  Check(out.good(), "cannot write " + path);
}

inline std::string ReadFile(std::string const &path) {
  std::ifstream in(path, std::ios::binary);
  return std::string(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
}

// The in-memory type library LIBT that the designs bind to: REG (D0, D1,
// CLK inputs, Q output, EN bidirectional) with a hierarchy for the view
// "netlist", and ABC (A, B inputs, C output).
class Library {
public:
  Library() : m_Model("LIBT", "LIBT", "", false) {
    m_pLibrary = m_Model.CreateLibrary("LIBT", 2, 1, "q1");
    m_pReg = m_pLibrary->CreateTypeBlock("REG");
    for (char const *pin : {"D0", "D1", "CLK"})
      m_pReg->CreatePin(pin, Orb_Pin::PIN_INPUT);
    m_pReg->CreatePin("Q", Orb_Pin::PIN_OUTPUT);
    m_pReg->CreatePin("EN", Orb_Pin::PIN_BIDIRECTIONAL);
    Lum_TlmBlock *hier = m_pReg->CreateHier("netlist");
    m_pHier = hier;
    hier->CreatePin("D0", Orb_Pin::PIN_INPUT);
    Lum_TlmBlock *inner = hier->CreateBlock("ff", 0);
    inner->CreatePin("D", Orb_Pin::PIN_INPUT);
    Lum_TlmSignal *net = hier->CreateSignal("d");
    hier->GetPinByName("D0")->GetOrbPin()->ConnectInner(net->GetOrbSignal());
    inner->GetPinByName("D")->GetOrbPin()->Connect(net->GetOrbSignal());
    m_pAbc = m_pLibrary->CreateTypeBlock("ABC");
    m_pAbc->CreatePin("A", Orb_Pin::PIN_INPUT);
    m_pAbc->CreatePin("B", Orb_Pin::PIN_INPUT);
    m_pAbc->CreatePin("C", Orb_Pin::PIN_OUTPUT);
    Lum_TlmCatalog::Register(m_pLibrary);
  }
  ~Library() { Lum_TlmCatalog::Unregister(m_pLibrary); }
  Library(Library const &) = delete;
  Library &operator=(Library const &) = delete;

  Lum_TlmLibrary *Get() const { return m_pLibrary; }
  Lum_TlmBlock *Reg() const { return m_pReg; }
  Lum_TlmBlock *Abc() const { return m_pAbc; }
  // The top block of REG's hierarchy for "netlist": a block of the library,
  // but no type block.
  Lum_TlmBlock *Hier() const { return m_pHier; }

private:
  Lum_TlmModel m_Model;
  Lum_TlmLibrary *m_pLibrary = nullptr;
  Lum_TlmBlock *m_pReg = nullptr;
  Lum_TlmBlock *m_pAbc = nullptr;
  Lum_TlmBlock *m_pHier = nullptr;
};

// Runs `call`; true when it returned. A Port::Exception with a message and
// std::bad_alloc are allowed failures (false); anything else is a finding.
// The last exception Attempt caught: what(), object name and message.
struct Failure {
  std::string what, objectName, message;
};
inline Failure &LastFailure() {
  static Failure failure;
  return failure;
}

inline bool Attempt(char const *what, std::function<void()> const &call) {
  try {
    call();
    return true;
  } catch (Port::Exception const &e) {
    LastFailure() = Failure{e.what(), e.GetObjectName(), e.GetMessage()};
    Check(!e.GetMessage().empty() && e.what()[0] != '\0',
          std::string(what) + " threw a Port::Exception without a message");
  } catch (std::bad_alloc const &) {
  } catch (std::exception const &e) {
    Fail(std::string(what) + " threw a foreign exception: " + e.what());
  } catch (...) {
    Fail(std::string(what) + " threw something that is not an exception");
  }
  return false;
}

inline Library &TheLibrary() {
  static Library library;
  return library;
}

inline std::size_t HostObjectCount(Orb_Model const &model) {
  std::size_t count = 0;
  for (unsigned k = 0; k < Orb_KindCount; ++k)
    count += model.GetObjectCount(static_cast<Orb_Kind>(k));
  return count;
}

// A refused open into an empty model leaves it empty: no host object, no
// client, no companion (the local library).
inline void CheckEmptyAfterRefusal(Lum_TdmModel const &model) {
  Orb_Model const *host = model.GetOrbModel();
  Check(HostObjectCount(*host) == 0,
        "a refused open left " + std::to_string(HostObjectCount(*host)) + " host objects");
  Check(model.GetClientCount() == 0,
        "a refused open left " + std::to_string(model.GetClientCount()) + " client objects");
  Check(host->GetCompanion(Lum_TlmNames::kLocalLibraryCompanion) == nullptr,
        "a refused open left the local library behind");
}

// Commits every view of the model.
inline void CommitAll(Lum_TdmModel &model) {
  for (Orb_DesignMgr *designMgr : model.GetOrbModel()->GetDesignMgrs())
    for (Orb_Design *design : designMgr->GetDesigns())
      for (Orb_View *view : design->GetViews())
        static_cast<Lum_TdmView *>(model.Specialize(view))->CommitAll();
}

// The typing of a model: per block, its type block's tag, and per pin its
// type pin's name ("-" for none). A block's key is its path of names joined
// by NUL (which no name holds) with an empty pin name; a pin's key adds its
// own name. Walking specializes what has no client yet.
using TypingKey = std::pair<std::string, std::string>;
using Typing = std::map<TypingKey, std::string>;

inline std::string Shown(TypingKey const &key) {
  std::string text = key.first;
  for (char &c : text)
    c = c ? c : '/';
  return key.second.empty() ? text : text + "." + key.second;
}

inline void CollectTyping(Lum_TdmBlock *block, std::string const &path, Typing &typing) {
  Lum_TlmBlock const *type = block->GetTypeBlock();
  typing[{path, ""}] = type ? type->GetUniqueTag().str() : std::string("-");
  for (std::size_t i = 0; i < block->GetPins().size(); ++i) {
    Lum_TdmPin *pin = block->GetPin(i);
    Lum_TlmPin const *typePin = pin->GetTypePin();
    typing[{path, pin->GetName()}] = typePin ? typePin->GetName() : "-";
  }
  for (std::size_t i = 0; i < block->GetBlocks().size(); ++i) {
    Lum_TdmBlock *child = block->GetBlock(i);
    CollectTyping(child, path + '\0' + child->GetName(), typing);
  }
}

inline Typing TypingOf(Lum_TdmModel &model) {
  Typing typing;
  for (Orb_DesignMgr *designMgr : model.GetOrbModel()->GetDesignMgrs())
    for (Orb_Design *design : designMgr->GetDesigns())
      for (Orb_View *view : design->GetViews()) {
        std::string const path =
            std::string(designMgr->GetName()) + '\0' + design->GetName() + '\0' + view->GetName();
        Lum_TdmView *client = static_cast<Lum_TdmView *>(model.Specialize(view));
        if (Lum_TdmBlock *top = client->GetBlock())
          CollectTyping(top, path + '\0' + top->GetName(), typing);
      }
  return typing;
}

// Whether `after` (the reopened model) keeps the typing of `before` (the
// saved one). The stored form keeps every block's type and every pin's type
// pin; a pin without a type pin stores nothing, so on reopen it may find the
// type pin of its own name, and a typed block may gain the type pins it
// lacked (the commit drops LUM_DONT_CREATE_UNUSED_PINS).
inline void CheckSameTyping(Typing const &before, Typing const &after) {
  for (auto const &[key, value] : before) {
    auto const found = after.find(key);
    Check(found != after.end(), "the reopened design lacks " + Shown(key));
    if (!key.second.empty() && value == "-") {
      Check(found->second == "-" || found->second == key.second,
            "the reopened pin " + Shown(key) + " took the type pin " + found->second);
      continue;
    }
    Check(found->second == value,
          "the reopened " + Shown(key) + " is typed " + found->second + ", saved as " + value);
  }
  for (auto const &[key, value] : after)
    Check(before.count(key) || value != "-", "the reopened design has a new untyped " + Shown(key));
}

// Whether a design that an open accepted may be refused by the next open:
// only when it opened because its view held the missing type pins back
// (LUM_DONT_CREATE_UNUSED_PINS, which the commit removes), so that a pin
// holding another type pin's name now keeps that type pin from being
// created. Every other saved design reopens.
enum class Reopen { Always, UnlessPinsWereHeldBack };

inline bool IsHeldBackPinRefusal(Failure const &failure) {
  return failure.message.find("found that the block already had a pin by that") !=
         std::string::npos;
}

// Commits, saves to `path`, reopens in a fresh model and checks that the
// typing survived; returns the reopened model, or null when the commit or
// the save failed (allowed), or when `reopen` allows the refusal met. A save
// that succeeded must reopen.
inline std::unique_ptr<Lum_TdmModel> CommitSaveReopen(Lum_TdmModel &model, std::string const &path,
                                                      Reopen reopen) {
  if (!Attempt("commit", [&] { CommitAll(model); }))
    return nullptr;
  Typing before;
  if (!Attempt("typing walk", [&] { before = TypingOf(model); }))
    return nullptr;
  if (!Attempt("save", [&] { model.Save(path.c_str()); }))
    return nullptr;
  auto reopened = std::make_unique<Lum_TdmModel>("reopened", "reopened", "");
  bool const opened = Attempt("reopen", [&] { reopened->Open(path.c_str()); });
  if (!opened) {
    CheckEmptyAfterRefusal(*reopened);
    if (reopen == Reopen::UnlessPinsWereHeldBack && IsHeldBackPinRefusal(LastFailure()))
      return nullptr;
    Fail("a saved design does not reopen: " + LastFailure().what);
  }
  Typing after;
  if (Attempt("typing walk of the reopened design", [&] { after = TypingOf(*reopened); }))
    CheckSameTyping(before, after);
  return reopened;
}

} // namespace LumFuzz

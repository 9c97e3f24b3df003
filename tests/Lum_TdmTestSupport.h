#pragma once

// Shared fixtures of the library's tests: temporary directories, a typed
// design with one view, in-memory type libraries, save-and-reopen, and the
// texts that tests compare.

#include "Lum_TdmBlock.h"
#include "Lum_TdmDesign.h"
#include "Lum_TdmDesignMgr.h"
#include "Lum_TdmModel.h"
#include "Lum_TdmNetwork.h"
#include "Lum_TdmPin.h"
#include "Lum_TdmSignal.h"
#include "Lum_TdmView.h"

#include "Lum_Exception.h"
#include "Lum_TdmSchema.h"
#include "Lum_Tlm.h"
#include "Port_MsgManData.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <functional>
#include <iterator>
#include <memory>
#include <string>
#include <vector>

namespace lumtest {

// A directory that exists for one test.
class TempDir {
public:
  TempDir() {
    std::string pattern = (std::filesystem::temp_directory_path() / "lum_tdm_XXXXXX").string();
    char *made = ::mkdtemp(pattern.data());
    EXPECT_NE(made, nullptr);
    m_Path = pattern;
  }
  ~TempDir() {
    std::error_code ignored;
    std::filesystem::remove_all(m_Path, ignored);
  }
  TempDir(TempDir const &) = delete;
  TempDir &operator=(TempDir const &) = delete;

  std::string File(std::string const &name) const { return (m_Path / name).string(); }
  std::string Path() const { return m_Path.string(); }

private:
  std::filesystem::path m_Path;
};

// An in-memory type library, registered with the catalog for its lifetime.
class TestLibrary {
public:
  TestLibrary(char const *name, unsigned version, unsigned revision,
              char const *firstQualifier = "", char const *secondQualifier = "")
      : m_Model(name, name, "", false) {
    m_pLibrary = m_Model.CreateLibrary(name, version, revision, firstQualifier, secondQualifier);
    Lum_TlmCatalog::Register(m_pLibrary);
  }
  ~TestLibrary() { Lum_TlmCatalog::Unregister(m_pLibrary); }
  TestLibrary(TestLibrary const &) = delete;
  TestLibrary &operator=(TestLibrary const &) = delete;

  Lum_TlmLibrary *Get() const { return m_pLibrary; }
  // Adds a type block with input pins of the given names.
  Lum_TlmBlock *AddTypeBlock(char const *name, std::vector<char const *> const &pins = {}) {
    Lum_TlmBlock *block = m_pLibrary->CreateTypeBlock(name);
    for (char const *pin : pins)
      block->CreatePin(pin, Orb_Pin::PIN_INPUT);
    return block;
  }

private:
  Lum_TlmModel m_Model;
  Lum_TlmLibrary *m_pLibrary = nullptr;
};

// A design manager "dm", a design "top" and a view "netlist" with a device
// personality, in a model of its own.
struct TypedDesign {
  explicit TypedDesign(std::unique_ptr<Lum_TdmModel> model = nullptr)
      : m_Model(model ? std::move(model) : std::make_unique<Lum_TdmModel>("test", "testdb", "")) {
    m_pDesignMgr = m_Model->CreateDesignMgr("dm");
    m_pDesign = m_pDesignMgr->CreateDesign("top");
    m_pView = m_pDesign->CreateView("netlist");
    m_pView->CreatePropertyString(Lum_TdmSchema::kDevicePm, "pm1");
    m_pView->CreatePropertyString(Lum_TdmSchema::kDevicePart, "part1");
  }

  Lum_TdmModel &Model() { return *m_Model; }
  Orb_Model *Host() { return m_Model->GetOrbModel(); }

  std::unique_ptr<Lum_TdmModel> m_Model;
  Lum_TdmDesignMgr *m_pDesignMgr = nullptr;
  Lum_TdmDesign *m_pDesign = nullptr;
  Lum_TdmView *m_pView = nullptr;
};

// Opens the database at `path` in a fresh model.
inline std::unique_ptr<Lum_TdmModel> OpenModel(std::string const &path) {
  auto model = std::make_unique<Lum_TdmModel>("reopened", "reopened", path.c_str());
  model->Open(path.c_str());
  return model;
}

// A client model that builds blocks of class Block and views of class View,
// for tests that override what those clients do.
template <class Block, class View = Lum_TdmView> class ClientModel : public Lum_TdmModel {
public:
  explicit ClientModel(char const *name = "clients") : Lum_TdmModel(name, name, "") {}
  void SyncEventSpecializeBlockOnCreate(Orb_Block *block) override { new Block(this, block, true); }
  void SyncEventSpecializeBlockOnLoad(Orb_Block *block) override { new Block(this, block, false); }
  void SyncEventSpecializeViewOnCreate(Orb_View *view) override { new View(this, view, true); }
  void SyncEventSpecializeViewOnLoad(Orb_View *view) override { new View(this, view, false); }
};

// Subscribed to a host model before the library's client model, it sees each
// new design and view first, in their creation events.
class EarlierSubscriber : public Orb_ModelDerived {
public:
  explicit EarlierSubscriber(Orb_Model *host) : Orb_ModelDerived(host) { SetEventNotifyAll(); }
  void SyncEventSpecializeDesignOnCreate(Orb_Design *design) override {
    if (m_OnDesign)
      m_OnDesign(design);
  }
  void SyncEventSpecializeViewOnCreate(Orb_View *view) override {
    if (m_OnView)
      m_OnView(view);
  }

  std::function<void(Orb_Design *)> m_OnDesign;
  std::function<void(Orb_View *)> m_OnView;
};

// Saves the model to `path` and opens it in a fresh model.
inline std::unique_ptr<Lum_TdmModel> SaveAndReopen(Lum_TdmModel &model, std::string const &path) {
  model.Save(path.c_str());
  return OpenModel(path);
}

// The host objects of every kind that a host model counts.
inline std::size_t HostObjectCount(Orb_Model const *host) {
  std::size_t count = 0;
  for (unsigned k = 0; k < Orb_KindCount; ++k)
    count += host->GetObjectCount(static_cast<Orb_Kind>(k));
  return count;
}

// What an action threw, as "class|object|message" for the library's
// exceptions, or "no failure".
template <class Action> std::string Failure(Action const &action) {
  auto const text = [](char const *kind, Lum_Exception const &e) {
    return kind + ("|" + e.GetObjectName()) + "|" + e.GetMessage();
  };
  try {
    action();
  } catch (Lum_ExceptionInvalidTypeBlock const &e) {
    return text("InvalidTypeBlock", e);
  } catch (Lum_ExceptionCorruptDatabase const &e) {
    return text("CorruptDatabase", e);
  } catch (Lum_ExceptionInvalidLibrary const &e) {
    return text("InvalidLibrary", e);
  } catch (Lum_ExceptionDesignLoad const &e) {
    return text("DesignLoad", e);
  }
  return "no failure";
}

// The first view of the first design of the first design manager.
inline Lum_TdmView *FirstView(Lum_TdmModel &model) {
  Orb_Model *host = model.GetOrbModel();
  if (host->GetDesignMgrs().empty())
    return nullptr;
  Orb_DesignMgr *dm = host->GetDesignMgrs().front();
  if (dm->GetDesigns().empty() || dm->GetDesigns().front()->GetViews().empty())
    return nullptr;
  return static_cast<Lum_TdmView *>(model.GetClient(dm->GetDesigns().front()->GetViews().front()));
}

// The string value of a property, or "<absent>".
inline std::string PropertyValue(Orb_ClientObject const *object, char const *name) {
  Orb_Property const *property = object->GetPropertyByName(name);
  return property ? property->GetStringValue() : "<absent>";
}

// The entries of a string-list property joined with "|", or "<absent>".
inline std::string ListValue(Orb_ClientObject const *object, char const *name) {
  Orb_Property const *property = object->GetPropertyByName(name);
  if (!property)
    return "<absent>";
  std::string joined;
  for (std::string const &entry : property->GetStrings())
    joined += (joined.empty() ? "" : "|") + entry;
  return joined;
}

// Names of objects joined with ",", "null" standing for a null pointer.
template <class Object> std::string Names(std::vector<Object *> const &objects) {
  std::string text;
  for (Object *object : objects)
    text += (text.empty() ? "" : ",") + std::string(object ? object->GetName() : "null");
  return text;
}

// The bytes of a file.
inline std::string FileBytes(std::string const &path) {
  std::ifstream in(path, std::ios::binary);
  return std::string(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
}

} // namespace lumtest

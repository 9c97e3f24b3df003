#pragma once

// The type-library component. A type library is a host model of its own
// with its own client model (Lum_TlmModel). The library is the client of its
// design manager; each type block lives in a design named after it, as the
// top block of the design's view "type"; the design's other views with a top
// block are the type block's hierarchies, keyed by view name.

#include "Lum_TdmSchema.h"
#include "Orb_Templates.h"
#include "PM_PIC.h"
#include "Port_String.h"

#include <memory>
#include <string>
#include <vector>

class Lum_TlmBlock;
class Lum_TlmDesign;
class Lum_TlmLibrary;
class Lum_TlmModel;
class Lum_TlmNetwork;
class Lum_TlmPin;
class Lum_TlmSignal;
class Lum_TlmView;

struct Lum_TlmTraits {
  using Model = Lum_TlmModel;
  using DesignMgr = Lum_TlmLibrary;
  using Design = Lum_TlmDesign;
  using View = Lum_TlmView;
  using Block = Lum_TlmBlock;
  using Pin = Lum_TlmPin;
  using Signal = Lum_TlmSignal;
  using Network = Lum_TlmNetwork;
};

// Names and values the component stores in its host models.
namespace Lum_TlmNames {
constexpr char const *kTypeViewName = "type";
constexpr char const *kDesignTypeProperty = Lum_TdmSchema::kDesignType;
constexpr char const *kDesignTypeLibrary = Lum_TdmSchema::kDesignTypeLibrary;
constexpr char const *kDesignTypeUser = Lum_TdmSchema::kDesignTypeUser;
constexpr char const *kVersionProperty = "TLM_VERSION";
constexpr char const *kFirstQualifierProperty = "TLM_QUALIFIER_1";
constexpr char const *kSecondQualifierProperty = "TLM_QUALIFIER_2";
constexpr char const *kLocalLibraryCompanion = "Lum_TlmLocalLibrary";
} // namespace Lum_TlmNames

// The client model of a type library's host model. It specializes every host
// object into the component's classes and destroys them on deletion. Both
// constructors subscribe to every event; neither loads anything.
class LUM_PLATFORM_API Lum_TlmModel : public Orb_ModelT<Lum_TlmTraits> {
public:
  // A new, empty library model (owns its host model).
  Lum_TlmModel(char const *name, char const *dbName, char const *path, bool readOnly);
  // Attached to an existing host model, which the caller keeps alive longer
  // than this model. Objects already in it are specialized on demand.
  explicit Lum_TlmModel(Orb_Model *model);
  ~Lum_TlmModel() override;

  // Creates the library (the model's design manager) and stores its version
  // and its non-empty qualifiers. Throws Orb_Exception for a duplicate name
  // and Lum_ExceptionInvalidLibrary for a name that is empty or holds a space
  // or a ":" (a view's library list could not give it back); nothing is
  // created then.
  Lum_TlmLibrary *CreateLibrary(char const *name, unsigned version, unsigned revision,
                                char const *firstQualifier = "", char const *secondQualifier = "");
  // The first library of the model, or null.
  Lum_TlmLibrary *GetLibrary();

  void SyncEventSpecializeDesignMgr(Orb_DesignMgr *o) override;
  void SyncEventSpecializeDesign(Orb_Design *o) override;
  void SyncEventSpecializeView(Orb_View *o) override;
  void SyncEventSpecializeBlock(Orb_Block *o) override;
  void SyncEventSpecializePin(Orb_Pin *o) override;
  void SyncEventSpecializeSignal(Orb_Signal *o) override;
  void SyncEventSpecializeNetwork(Orb_Network *o) override;
  void SyncEventDeleteDesignMgr(Orb_DesignMgr *o) override;
  void SyncEventDeleteDesign(Orb_Design *o) override;
  void SyncEventDeleteView(Orb_View *o) override;
  void SyncEventDeleteBlock(Orb_Block *o) override;
  void SyncEventDeletePin(Orb_Pin *o) override;
  void SyncEventDeleteSignal(Orb_Signal *o) override;
  void SyncEventDeleteNetwork(Orb_Network *o) override;
};

// A type library: the client of its model's design manager. Made and
// destroyed by its model's events; destroying it removes it from the
// catalog.
class LUM_PLATFORM_API Lum_TlmLibrary : public Orb_DesignMgrT<Lum_TlmTraits> {
public:
  // The name of a design database's local library.
  static char const *const LOCAL_LIBRARY_NAME;

  Lum_TlmLibrary(Lum_TlmModel *model, Orb_DesignMgr *designMgr);
  ~Lum_TlmLibrary() override;

  char const *GetLibraryName() const { return GetName(); }
  // The stored "version.revision"; fields that are absent or unreadable
  // give 0.
  void GetTlmVersion(unsigned &version, unsigned &revision) const;
  // The stored qualifiers, empty when absent.
  virtual Port::StringBase<char> GetFirstQualifier() const;
  virtual Port::StringBase<char> GetSecondQualifier() const;

  // The type block of that name (exact bytes), or null, also when the top
  // block of that design's type view is named otherwise (a damaged file). O(1).
  Lum_TlmBlock const *GetTypeBlock(Port::StringBase<char> const &name) const;
  Lum_TlmBlock *GetTypeBlock(Port::StringBase<char> const &name);

  // Type blocks in creation order.
  std::vector<Lum_TlmBlock *> GetTypeBlocks() const;

  // Adds a type block (a design of that name, marked as a library design,
  // with its "type" view and a top block of the same name); the caller adds
  // its pins with CreatePin. Throws Lum_ExceptionInvalidTypeBlock for a name
  // that is empty or holds a ":" (a block's stored type could not name it)
  // and Orb_Exception for a duplicate; nothing is created then.
  Lum_TlmBlock *CreateTypeBlock(char const *name);

  // Saves the library's host model to a library file; throws Orb_Exception
  // when the file cannot be written (the previous file stays).
  void Save(char const *path) const;

  // Loads a library by name for a personality: a library registered under
  // the name (whatever the personality), else the one already read for this
  // name and personality, else the first file found on the search path
  // (<dir>/<personality>/<name>.tlm before <dir>/<name>.tlm), read as a
  // library of its own for this personality. Each call takes a reference on
  // the library it returns. Never null: a library that cannot be found, a
  // file that cannot be read (missing, truncated, corrupt, of a newer format;
  // the message names the file and the reader's finding, such as the byte
  // offset) and a file without this library throw Lum_ExceptionInvalidLibrary
  // naming the library.
  static Lum_TlmLibrary const *LoadLibrary(Port::StringBase<char> const &name,
                                           PM_PIC const &personality);
  // Gives back a reference taken by LoadLibrary. A library read from a file
  // is unloaded with its last reference. Null, the local library, a library
  // not in the catalog and one that holds no reference are ignored; the
  // pointer itself is never read, so a library already destroyed is safe.
  static void ReleaseLibrary(Lum_TlmLibrary const *library);
  // The local library of a design database: the one kept with the host model
  // if any, else the one saved with it (taken from the opened database),
  // else a new empty one (version 1.0). It lives as long as the host model,
  // is saved and reopened with it, and is never counted or released. The
  // personality does not select anything: a database has one local library.
  // Throws Lum_ExceptionInvalidLibrary for a null model and
  // Lum_ExceptionCorruptDatabase when the saved local library lacks its
  // design manager.
  static Lum_TlmLibrary *GetLocalLibrary(Orb_Model *model, PM_PIC const &personality);
};

// The client of a type block design.
class LUM_PLATFORM_API Lum_TlmDesign : public Orb_DesignT<Lum_TlmTraits> {
public:
  Lum_TlmDesign(Lum_TlmModel *model, Orb_Design *design);
  // Whether the design holds type blocks: it carries TDS_DESIGN_TYPE with a
  // value other than "TDS_DESIGN_TYPE_USER".
  static bool IsTypeBlockDesign(Orb_Design const &design);
};

class LUM_PLATFORM_API Lum_TlmView : public Orb_ViewT<Lum_TlmTraits> {
public:
  Lum_TlmView(Lum_TlmModel *model, Orb_View *view) : Orb_ViewT<Lum_TlmTraits>(model, view) {}
};

// A type block (the top block of a type view) or a block of a hierarchy.
class LUM_PLATFORM_API Lum_TlmBlock : public Orb_BlockT<Lum_TlmTraits> {
public:
  Lum_TlmBlock(Lum_TlmModel *model, Orb_Block *block) : Orb_BlockT<Lum_TlmTraits>(model, block) {}

  // The library that holds the block.
  Lum_TlmLibrary const *GetLibrary() const;
  // Library name, ":", type block name.
  Port::StringBase<char> GetUniqueTag() const;

  // Whether the type block has a hierarchy for that view name: a view of
  // its design other than "type" that has a top block. GetHier gives that
  // host top block, or null.
  bool HasHier(Port::StringBase<char> viewName) const;
  Orb_Block *GetHier(Port::StringBase<char> viewName) const;
  // Creates the hierarchy for a view name (the view and its top block, named
  // like the type block) and returns the top block's client. Throws
  // Orb_Exception when the design already has a view of that name ("type"
  // included).
  Lum_TlmBlock *CreateHier(char const *viewName);
};

class LUM_PLATFORM_API Lum_TlmPin : public Orb_PinT<Lum_TlmTraits> {
public:
  Lum_TlmPin(Lum_TlmModel *model, Orb_Pin *pin) : Orb_PinT<Lum_TlmTraits>(model, pin) {}
};

class LUM_PLATFORM_API Lum_TlmSignal : public Orb_SignalT<Lum_TlmTraits> {
public:
  Lum_TlmSignal(Lum_TlmModel *model, Orb_Signal *signal)
      : Orb_SignalT<Lum_TlmTraits>(model, signal) {}
};

class LUM_PLATFORM_API Lum_TlmNetwork : public Orb_NetworkT<Lum_TlmTraits> {
public:
  Lum_TlmNetwork(Lum_TlmModel *model, Orb_Network *network)
      : Orb_NetworkT<Lum_TlmTraits>(model, network) {}
};

// The process-wide catalog of libraries and the search path for library
// files. Like the host model it is used from one thread at a time.
class LUM_PLATFORM_API Lum_TlmCatalog {
public:
  // Makes an in-memory library loadable by its name, for every personality.
  // The caller keeps it alive while it is registered and while references
  // that LoadLibrary gave out are held (its destruction unregisters it).
  // Null, the local library's name, or a name already in the catalog
  // (registered, or read from a file for any personality) throws
  // Lum_ExceptionInvalidLibrary.
  static void Register(Lum_TlmLibrary *library);
  // Removes a registered in-memory library, whatever its references. A
  // library that is not registered (or was read from a file) is ignored.
  static void Unregister(Lum_TlmLibrary const *library);

  // Library directories, searched in the order added, before those of the
  // environment variable LUM_TLM_PATH (colon-separated, read at each lookup).
  // Null and empty directories are ignored.
  static void AddSearchDirectory(char const *directory);
  static void ClearSearchDirectories();
  // The directories searched, in order, joined by ":".
  static std::string GetSearchPath();

  // References held on the libraries of that name, all personalities
  // together (0 when none is in the catalog), and whether any is.
  static unsigned GetReferenceCount(char const *name);
  static bool IsLoaded(char const *name);
  // The same for the library that LoadLibrary gives for that name and
  // personality.
  static unsigned GetReferenceCount(char const *name, PM_PIC const &personality);
  static bool IsLoaded(char const *name, PM_PIC const &personality);
};

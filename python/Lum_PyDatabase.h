#pragma once

// The state behind the Python module: an open database (a client model that
// counts deletions), handles that know when their object is gone, and the
// lock that keeps the library to one thread at a time.

#include "Lum_TdmModel.h"
#include "Lum_TdmTypePinMapMgr.h"

#include "Orb_Model.h"
#include "Port_Exception.h"

#include <cstdint>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

class Lum_TlmBlock;
class Lum_TlmLibrary;
class Lum_TlmPin;

namespace lumpy {

// The library and its platform are used from one thread at a time. Every call
// from Python takes this lock with the interpreter lock held; it never blocks
// while holding the interpreter lock (it lets the interpreter lock go first),
// so a thread that gave the interpreter lock up for a long call cannot
// deadlock with one that waits here. Nested takes by one thread are free.
class LibraryLock {
public:
  LibraryLock();
  ~LibraryLock();
  LibraryLock(LibraryLock const &) = delete;
  LibraryLock &operator=(LibraryLock const &) = delete;
};

// A handle that is used after its object is gone, or after its database was
// closed. Becomes lumtdm.StaleObjectError.
class StaleError : public std::exception {
public:
  explicit StaleError(std::string text) : m_Text(std::move(text)) {}
  char const *what() const noexcept override { return m_Text.c_str(); }

private:
  std::string m_Text;
};

class Database;

// The client model of an open database. It counts each host object's
// deletions by bridge id, so that a handle can tell its object from a later
// one that reuses the slot.
class TrackingModel : public Lum_TdmModel {
public:
  TrackingModel(Database &database, char const *dbName, char const *path)
      : Lum_TdmModel("lumtdm", dbName, path), m_Database(database) {}

  void SyncEventDeleteDesignMgr(Orb_DesignMgr *o) override;
  void SyncEventDeleteDesign(Orb_Design *o) override;
  void SyncEventDeleteView(Orb_View *o) override;
  void SyncEventDeleteBlock(Orb_Block *o) override;
  void SyncEventDeletePin(Orb_Pin *o) override;
  void SyncEventDeleteSignal(Orb_Signal *o) override;
  void SyncEventDeleteNetwork(Orb_Network *o) override;

private:
  Database &m_Database;
};

// An open (or closed) design database. Python objects hold it by shared
// pointer, so a database lives as long as any object of it is reachable.
class Database {
public:
  Database(std::string path, bool create);
  ~Database();
  Database(Database const &) = delete;
  Database &operator=(Database const &) = delete;

  bool IsOpen() const { return m_pModel != nullptr; }
  // The model; throws StaleError once closed.
  TrackingModel &Model() const;
  std::string const &GetPath() const { return m_Path; }
  void SetPath(std::string path) { m_Path = std::move(path); }

  // Destroys the model: every handle of this database goes stale.
  void Close();

  std::uint32_t Generation(Orb_Kind kind, std::uint32_t id) const {
    auto const &counts = m_Generations[static_cast<unsigned>(kind)];
    return id < counts.size() ? counts[id] : 0;
  }
  void NoteDeleted(Orb_Persistent const *object);

  Lum_TdmTypePinMapMgr &PinMaps() { return m_PinMaps; }

private:
  std::string m_Path;
  std::vector<std::uint32_t> m_Generations[Orb_KindCount];
  Lum_TdmTypePinMapMgr m_PinMaps;
  // Last, so that it goes first: its teardown may still count deletions.
  std::unique_ptr<TrackingModel> m_pModel;
};

using DatabasePtr = std::shared_ptr<Database>;

// A host object of a database, by pointer, slot and the slot's deletion
// count when the handle was made. The name is kept to say what a stale
// handle was.
struct Handle {
  DatabasePtr db;
  Orb_Persistent *object = nullptr;
  std::uint32_t id = 0;
  std::uint32_t generation = 0;
  Orb_Kind kind = Orb_Kind::Block;
  std::string name;

  Handle() = default;
  Handle(DatabasePtr database, Orb_Persistent *o);

  bool IsLive() const { return db->IsOpen() && db->Generation(kind, id) == generation; }
  // The object; throws StaleError when it is gone.
  Orb_Persistent *Check() const;
  // "block 'u1'"
  std::string Describe() const;
};

// A typed handle: Get() checks and gives the host object as T.
template <class T> struct Ref : Handle {
  using Handle::Handle;
  Ref() = default;
  explicit Ref(Handle const &h) : Handle(h) {}
  T *Get() const { return static_cast<T *>(Check()); }
};

// Who keeps a type library loaded for a type handle: the view it was reached
// through (the view holds its libraries until it goes), or a reference of
// its own from lumtdm.load_library.
struct LibraryHold {
  std::shared_ptr<Handle> view;
  std::shared_ptr<Lum_TlmLibrary const> counted;
  void Check() const;
};

struct TypeLibraryRef {
  LibraryHold hold;
  Lum_TlmLibrary const *library = nullptr;
  Lum_TlmLibrary const *Get() const {
    hold.Check();
    return library;
  }
};

struct TypeBlockRef {
  LibraryHold hold;
  Lum_TlmBlock const *block = nullptr;
  Lum_TlmBlock const *Get() const {
    hold.Check();
    return block;
  }
};

struct TypePinRef {
  LibraryHold hold;
  Lum_TlmPin const *pin = nullptr;
  Lum_TlmPin const *Get() const {
    hold.Check();
    return pin;
  }
};

// Loads a library with a reference of its own, released when the last
// holder goes.
std::shared_ptr<Lum_TlmLibrary const>
LoadCounted(std::string const &name, std::string const &personality, std::string const &part);

// "mgr/design/view/top/child", pins "<block>.pin", signals "<block>:sig",
// networks "<view>:net".
std::string FullPath(Orb_Persistent const *object);

} // namespace lumpy

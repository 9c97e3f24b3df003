#include "Lum_PyDatabase.h"

#include "Lum_Tlm.h"
#include "Orb_Derived.h"
#include "PM_PIC.h"
#include "Port_String.h"

#include <pybind11/pybind11.h>

#include <filesystem>

namespace py = pybind11;

namespace lumpy {

namespace {
std::mutex g_LibraryMutex;
thread_local int t_LockDepth = 0;
} // namespace

LibraryLock::LibraryLock() {
  if (t_LockDepth++ > 0)
    return;
  if (g_LibraryMutex.try_lock())
    return;
  // Another thread runs a long call without the interpreter lock: wait for
  // it without holding the interpreter lock ourselves.
  py::gil_scoped_release release;
  g_LibraryMutex.lock();
}

LibraryLock::~LibraryLock() {
  if (--t_LockDepth == 0)
    g_LibraryMutex.unlock();
}

// ---------------------------------------------------------------------------

#define LUMPY_NOTE_DELETE(Kind)                                                                    \
  void TrackingModel::SyncEventDelete##Kind(Orb_##Kind *o) {                                       \
    m_Database.NoteDeleted(o);                                                                     \
    Lum_TdmModel::SyncEventDelete##Kind(o);                                                        \
  }
LUMPY_NOTE_DELETE(DesignMgr)
LUMPY_NOTE_DELETE(Design)
LUMPY_NOTE_DELETE(View)
LUMPY_NOTE_DELETE(Block)
LUMPY_NOTE_DELETE(Pin)
LUMPY_NOTE_DELETE(Signal)
LUMPY_NOTE_DELETE(Network)
#undef LUMPY_NOTE_DELETE

Database::Database(std::string path, bool create) : m_Path(std::move(path)) {
  std::string const dbName =
      m_Path.empty() ? std::string("lumtdm") : std::filesystem::path(m_Path).stem().string();
  m_pModel = std::make_unique<TrackingModel>(*this, dbName.c_str(), m_Path.c_str());
  if (!create) {
    // Opening is the long call: other Python threads may run meanwhile.
    py::gil_scoped_release release;
    m_pModel->Open(m_Path.c_str());
  }
}

Database::~Database() {
  try {
    LibraryLock const lock;
    Close();
  } catch (...) {
    // Nothing to tell from a destructor; the model goes with its member.
  }
}

TrackingModel &Database::Model() const {
  if (!m_pModel)
    throw StaleError("database '" + m_Path + "' is closed");
  return *m_pModel;
}

void Database::Close() {
  if (!m_pModel)
    return;
  // Out of the model first, so that a handle never sees a model half gone.
  std::unique_ptr<TrackingModel> model = std::move(m_pModel);
  model.reset();
}

void Database::NoteDeleted(Orb_Persistent const *object) {
  auto &counts = m_Generations[static_cast<unsigned>(object->GetKind())];
  std::uint32_t const id = object->GetBridgeId();
  if (id >= counts.size())
    counts.resize(id + 1, 0);
  ++counts[id];
}

// ---------------------------------------------------------------------------

Handle::Handle(DatabasePtr database, Orb_Persistent *o)
    : db(std::move(database)), object(o), id(o->GetBridgeId()), kind(o->GetKind()),
      name(o->GetNameString()) {
  generation = db->Generation(kind, id);
}

Orb_Persistent *Handle::Check() const {
  if (!db->IsOpen())
    throw StaleError(Describe() + " is stale: its database '" + db->GetPath() + "' is closed");
  if (db->Generation(kind, id) != generation)
    throw StaleError(Describe() + " is stale: it was deleted");
  return object;
}

std::string Handle::Describe() const { return std::string(Orb_KindName(kind)) + " '" + name + "'"; }

void LibraryHold::Check() const {
  if (counted || !view || view->IsLive())
    return;
  if (!view->db->IsOpen())
    throw StaleError("type library object is stale: its database '" + view->db->GetPath() +
                     "' is closed");
  throw StaleError("type library object is stale: " + view->Describe() +
                   ", which loaded its library, was deleted");
}

std::shared_ptr<Lum_TlmLibrary const>
LoadCounted(std::string const &name, std::string const &personality, std::string const &part) {
  PM_PIC const pic(personality.c_str(), part.c_str(), nullptr);
  Lum_TlmLibrary const *library = nullptr;
  {
    py::gil_scoped_release release;
    library = Lum_TlmLibrary::LoadLibrary(Port::StringBase<char>(name.c_str()), pic);
  }
  return std::shared_ptr<Lum_TlmLibrary const>(library, [](Lum_TlmLibrary const *l) {
    LibraryLock const lock;
    Lum_TlmLibrary::ReleaseLibrary(l);
  });
}

std::string FullPath(Orb_Persistent const *object) {
  Orb_Persistent const *parent = object->GetParentObject();
  if (!parent)
    return object->GetName();
  char separator = '/';
  if (object->GetKind() == Orb_Kind::Pin)
    separator = '.';
  else if (object->GetKind() == Orb_Kind::Signal || object->GetKind() == Orb_Kind::Network)
    separator = ':';
  return FullPath(parent) + separator + object->GetName();
}

} // namespace lumpy

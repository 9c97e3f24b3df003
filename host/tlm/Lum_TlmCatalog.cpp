// The catalog of type libraries, the library search path, and loading and
// releasing libraries by name.
#include "Lum_Tlm.h"

#include "Lum_Exception.h"
#include "Orb_Exception.h"

#include <cstdlib>
#include <filesystem>
#include <map>
#include <string>
#include <string_view>
#include <system_error>
#include <unordered_map>
#include <utility>
#include <vector>

namespace {

char const kSourcePath[] = "host/Lum_TlmCatalog";
char const kRevision[] = "$Revision: 1.1 $";
char const kPathVariable[] = "LUM_TLM_PATH";
char const kFileSuffix[] = ".tlm";

struct Entry {
  Lum_TlmLibrary *library = nullptr;
  unsigned references = 0;
  // The model read from a library file; null for a registered library.
  std::unique_ptr<Lum_TlmModel> model;
};

// A library read from a file is keyed by its name and the personality it was
// loaded for, since each personality may find its own file.
using FileKey = std::pair<std::string, std::string>;

// Where an entry lives: the registered map (personality unused) or the file
// map.
struct EntryKey {
  bool registered;
  FileKey key;
};

// Set when the catalog is destroyed at exit: libraries destroyed after it
// (by other static objects) find nothing to unregister.
bool g_CatalogDestroyed = false;

struct Catalog {
  Catalog() = default;
  Catalog(Catalog const &) = delete;
  Catalog &operator=(Catalog const &) = delete;
  ~Catalog() {
    // Library files still referenced are unloaded with the entries; their
    // libraries' destructors must not come back into the maps meanwhile.
    g_CatalogDestroyed = true;
  }

  // In-memory libraries by name; they serve every personality.
  std::unordered_map<std::string, Entry> registered;
  // Libraries read from files, by (name, personality): ordered, so that the
  // libraries of one name are neighbours.
  std::map<FileKey, Entry> files;
  // Release and unregister find a library by its address, without reading
  // it: a registered library may already be gone.
  std::unordered_map<Lum_TlmLibrary const *, EntryKey> byLibrary;
  std::vector<std::string> directories;
};

Catalog &TheCatalog() {
  static Catalog catalog;
  return catalog;
}

Entry *FindEntry(Catalog &catalog, Lum_TlmLibrary const *library) {
  auto byLibrary = catalog.byLibrary.find(library);
  if (byLibrary == catalog.byLibrary.end())
    return nullptr;
  EntryKey const &where = byLibrary->second;
  if (where.registered) {
    auto found = catalog.registered.find(where.key.first);
    return found == catalog.registered.end() ? nullptr : &found->second;
  }
  auto found = catalog.files.find(where.key);
  return found == catalog.files.end() ? nullptr : &found->second;
}

// Removes the library's entry and hands back its model (null for a
// registered library) for the caller to destroy once the maps are settled.
std::unique_ptr<Lum_TlmModel> RemoveEntry(Catalog &catalog, Lum_TlmLibrary const *library) {
  auto byLibrary = catalog.byLibrary.find(library);
  if (byLibrary == catalog.byLibrary.end())
    return nullptr;
  std::unique_ptr<Lum_TlmModel> model;
  EntryKey const &where = byLibrary->second;
  if (where.registered) {
    catalog.registered.erase(where.key.first);
  } else {
    auto found = catalog.files.find(where.key);
    if (found != catalog.files.end()) {
      model = std::move(found->second.model);
      catalog.files.erase(found);
    }
  }
  catalog.byLibrary.erase(byLibrary);
  return model;
}

// The file libraries of that name, in personality order.
template <class F> void ForEachFileEntry(Catalog &catalog, std::string const &name, F const &f) {
  for (auto it = catalog.files.lower_bound(FileKey(name, std::string()));
       it != catalog.files.end() && it->first.first == name; ++it)
    f(it->second);
}

// The added directories, then those of LUM_TLM_PATH; empty entries are
// skipped.
std::vector<std::string> SearchDirectories() {
  std::vector<std::string> directories = TheCatalog().directories;
  char const *variable = std::getenv(kPathVariable);
  std::string_view rest = variable ? variable : "";
  while (!rest.empty()) {
    std::size_t const colon = rest.find(':');
    std::string_view const entry = rest.substr(0, colon);
    if (!entry.empty())
      directories.emplace_back(entry);
    rest = colon == std::string_view::npos ? std::string_view() : rest.substr(colon + 1);
  }
  return directories;
}

bool IsFile(std::string const &path) {
  std::error_code error;
  return std::filesystem::is_regular_file(path, error);
}

// The first library file for the name on the search path, or "" when none
// exists. A name that cannot be a file name has no file.
std::string FindLibraryFile(std::string const &name, std::string const &personality) {
  if (name.empty() || name.find('/') != std::string::npos)
    return {};
  std::string const fileName = name + kFileSuffix;
  for (std::string const &directory : SearchDirectories()) {
    std::filesystem::path const base(directory);
    if (!personality.empty()) {
      std::string candidate = (base / personality / fileName).string();
      if (IsFile(candidate))
        return candidate;
    }
    std::string candidate = (base / fileName).string();
    if (IsFile(candidate))
      return candidate;
  }
  return {};
}

[[noreturn]] void ThrowNotFound(std::string const &name, std::string const &personality) {
  std::string const path = Lum_TlmCatalog::GetSearchPath();
  std::string message = "Type library found neither in the catalog nor as a file " +
                        Port::Exception::ShownName(name) + kFileSuffix + " on the search path \"" +
                        path + "\"";
  if (!personality.empty())
    message += " (personality " + personality + ")";
  message += ".";
  if (path.empty())
    message +=
        std::string(" The search path is empty: add a directory or set ") + kPathVariable + ".";
  throw Lum_ExceptionInvalidLibrary("Lum", kSourcePath, kRevision, __LINE__, name.c_str(),
                                    message.c_str(), false);
}

} // namespace

// ---------------------------------------------------------------------------
// Loading and releasing

Lum_TlmLibrary const *Lum_TlmLibrary::LoadLibrary(Port::StringBase<char> const &name,
                                                  PM_PIC const &personality) {
  Catalog &catalog = TheCatalog();
  auto registered = catalog.registered.find(name.str());
  if (registered != catalog.registered.end()) {
    ++registered->second.references;
    return registered->second.library;
  }
  FileKey key(name.str(), personality.GetPersonality());
  auto loaded = catalog.files.find(key);
  if (loaded != catalog.files.end()) {
    ++loaded->second.references;
    return loaded->second.library;
  }

  std::string const path = FindLibraryFile(name.str(), personality.GetPersonality());
  if (path.empty())
    ThrowNotFound(name.str(), personality.GetPersonality());
  auto model = std::make_unique<Lum_TlmModel>(name.c_str(), path.c_str(), path.c_str(), false);
  try {
    model->Open(path.c_str());
  } catch (Orb_Exception const &e) {
    // The host's message names the file and says where and how it is broken.
    throw Lum_ExceptionInvalidLibrary(
        "Lum", kSourcePath, kRevision, __LINE__, name.c_str(),
        ("The library file " + path + " cannot be read: " + e.GetMessage()).c_str(), false);
  }
  Lum_TlmLibrary *library = model->GetDesignMgrByName(name.c_str());
  if (!library)
    throw Lum_ExceptionInvalidLibrary(
        "Lum", kSourcePath, kRevision, __LINE__, name.c_str(),
        ("The library file " + path + " does not hold this type library.").c_str(), false);

  Entry entry;
  entry.library = library;
  entry.references = 1;
  entry.model = std::move(model);
  auto inserted = catalog.files.emplace(key, std::move(entry)).first;
  try {
    catalog.byLibrary.emplace(library, EntryKey{false, key});
  } catch (...) {
    catalog.files.erase(inserted);
    throw;
  }
  return library;
}

void Lum_TlmLibrary::ReleaseLibrary(Lum_TlmLibrary const *library) {
  if (!library || g_CatalogDestroyed)
    return;
  Catalog &catalog = TheCatalog();
  Entry *entry = FindEntry(catalog, library);
  if (!entry || entry->references == 0)
    return;
  if (--entry->references > 0 || !entry->model)
    return;
  // Out of the catalog first: the library's destructor then finds nothing to
  // unregister while its model goes.
  RemoveEntry(catalog, library).reset();
}

// ---------------------------------------------------------------------------
// Lum_TlmCatalog

void Lum_TlmCatalog::Register(Lum_TlmLibrary *library) {
  if (!library)
    throw Lum_ExceptionInvalidLibrary("Lum", kSourcePath, kRevision, __LINE__, "",
                                      "Null library pointer given to the catalog.", false);
  std::string const name = library->GetLibraryName();
  if (name == Lum_TlmLibrary::LOCAL_LIBRARY_NAME)
    throw Lum_ExceptionInvalidLibrary("Lum", kSourcePath, kRevision, __LINE__, name.c_str(),
                                      "This name is reserved for a design's local library.", false);
  Catalog &catalog = TheCatalog();
  if (IsLoaded(name.c_str()))
    throw Lum_ExceptionInvalidLibrary("Lum", kSourcePath, kRevision, __LINE__, name.c_str(),
                                      "A type library of this name is already in the catalog.",
                                      false);
  Entry entry;
  entry.library = library;
  auto inserted = catalog.registered.emplace(name, std::move(entry)).first;
  try {
    catalog.byLibrary.emplace(library, EntryKey{true, FileKey(name, std::string())});
  } catch (...) {
    catalog.registered.erase(inserted);
    throw;
  }
}

void Lum_TlmCatalog::Unregister(Lum_TlmLibrary const *library) {
  if (!library || g_CatalogDestroyed)
    return;
  Catalog &catalog = TheCatalog();
  Entry const *entry = FindEntry(catalog, library);
  // A library read from a file leaves with its last reference.
  if (entry && entry->model)
    return;
  RemoveEntry(catalog, library);
}

void Lum_TlmCatalog::AddSearchDirectory(char const *directory) {
  if (directory && *directory)
    TheCatalog().directories.emplace_back(directory);
}

void Lum_TlmCatalog::ClearSearchDirectories() { TheCatalog().directories.clear(); }

std::string Lum_TlmCatalog::GetSearchPath() {
  std::string path;
  for (std::string const &directory : SearchDirectories()) {
    if (!path.empty())
      path += ':';
    path += directory;
  }
  return path;
}

unsigned Lum_TlmCatalog::GetReferenceCount(char const *name) {
  Catalog &catalog = TheCatalog();
  std::string const key = name ? name : "";
  auto registered = catalog.registered.find(key);
  unsigned count = registered == catalog.registered.end() ? 0 : registered->second.references;
  ForEachFileEntry(catalog, key, [&count](Entry const &entry) { count += entry.references; });
  return count;
}

unsigned Lum_TlmCatalog::GetReferenceCount(char const *name, PM_PIC const &personality) {
  Catalog &catalog = TheCatalog();
  std::string key = name ? name : "";
  auto registered = catalog.registered.find(key);
  if (registered != catalog.registered.end())
    return registered->second.references;
  auto loaded = catalog.files.find(FileKey(std::move(key), personality.GetPersonality()));
  return loaded == catalog.files.end() ? 0 : loaded->second.references;
}

bool Lum_TlmCatalog::IsLoaded(char const *name) {
  Catalog &catalog = TheCatalog();
  std::string const key = name ? name : "";
  bool loaded = catalog.registered.count(key) != 0;
  ForEachFileEntry(catalog, key, [&loaded](Entry const &) { loaded = true; });
  return loaded;
}

bool Lum_TlmCatalog::IsLoaded(char const *name, PM_PIC const &personality) {
  Catalog &catalog = TheCatalog();
  std::string key = name ? name : "";
  return catalog.registered.count(key) != 0 ||
         catalog.files.count(FileKey(std::move(key), personality.GetPersonality())) != 0;
}

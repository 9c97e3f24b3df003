#pragma once

#include "Lum_InterchangeApi.h"

#include <memory>
#include <string>
#include <vector>

class Lum_TlmLibrary;
class Lum_TlmModel;

struct Lum_TypeLibraryLoadOptions {
  // The device a cell library read now is for (stored as its qualifiers).
  std::string personality;
  std::string part;
  // Refuse a cell library whose type library name is loaded already in this
  // process (a long-lived process may hold it through an open database):
  // its .tlm file is then the one to give. Without it, registering the
  // second library of that name fails in the catalog.
  bool refuseLoaded = false;
};

// The type libraries a command draws from, given as files: a .tlm file is
// used by name through the search path (its folder added to the path); a
// Liberty file or JSON cell models are read now and registered with the
// catalog for as long as the loader lives. Keep the loader alive while
// anything made with its libraries (a model, a view) is.
class LUM_INTERCHANGE_API Lum_TypeLibraryLoader {
public:
  // Loads every file in order. A missing .tlm file, a cell library that
  // cannot be read (Lum_ExceptionInvalidFormat) or is refused as loaded
  // already throws, with whatever was registered before unregistered again.
  Lum_TypeLibraryLoader(std::vector<std::string> const &files,
                        Lum_TypeLibraryLoadOptions const &options);
  ~Lum_TypeLibraryLoader();
  Lum_TypeLibraryLoader(Lum_TypeLibraryLoader const &) = delete;
  Lum_TypeLibraryLoader &operator=(Lum_TypeLibraryLoader const &) = delete;

  // The type library names, in the order of the files.
  std::vector<std::string> const &GetNames() const { return m_Names; }
  // Whether a library was read from a cell library file (and so has no
  // .tlm file until Save).
  bool HasRead() const { return !m_Read.empty(); }
  // Saves the libraries read from cell library files as <dir>/<name>.tlm
  // (atomically, as Lum_CellLibraryReader::Save does) and returns the paths.
  std::vector<std::string> Save(std::string const &dir) const;

private:
  void Load(std::string const &file, Lum_TypeLibraryLoadOptions const &options);
  void UnregisterAll();

  std::vector<std::string> m_Names;
  std::vector<std::unique_ptr<Lum_TlmModel>> m_Read;
  std::vector<Lum_TlmLibrary const *> m_Registered;
};

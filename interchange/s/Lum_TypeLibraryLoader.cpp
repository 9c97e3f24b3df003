#include "Lum_TypeLibraryLoader.h"

#include "Lum_CellLibraryReader.h"

#include "Lum_Exception.h"
#include "Lum_Tlm.h"

#include <filesystem>

Lum_TypeLibraryLoader::Lum_TypeLibraryLoader(std::vector<std::string> const &files,
                                             Lum_TypeLibraryLoadOptions const &options) {
  try {
    for (std::string const &file : files)
      Load(file, options);
  } catch (...) {
    UnregisterAll();
    throw;
  }
}

Lum_TypeLibraryLoader::~Lum_TypeLibraryLoader() { UnregisterAll(); }

void Lum_TypeLibraryLoader::UnregisterAll() {
  for (Lum_TlmLibrary const *library : m_Registered)
    Lum_TlmCatalog::Unregister(library);
  m_Registered.clear();
}

void Lum_TypeLibraryLoader::Load(std::string const &file,
                                 Lum_TypeLibraryLoadOptions const &options) {
  std::filesystem::path const path(file);
  if (path.extension() == ".tlm") {
    if (!std::filesystem::exists(path))
      throw Lum_ExceptionInvalidLibrary("Lum", __FILE__, "", __LINE__, file.c_str(),
                                        "no such type library file", false);
    std::string const dir = path.has_parent_path() ? path.parent_path().string() : ".";
    Lum_TlmCatalog::AddSearchDirectory(dir.c_str());
    m_Names.push_back(path.stem().string());
    return;
  }
  Lum_CellLibraryOptions read;
  read.personality = options.personality;
  read.part = options.part;
  std::unique_ptr<Lum_TlmModel> model = Lum_CellLibraryReader::Read(file, read);
  Lum_TlmLibrary *library = model->GetLibrary();
  std::string const name = library->GetLibraryName();
  if (options.refuseLoaded && Lum_TlmCatalog::IsLoaded(name.c_str()))
    throw Lum_ExceptionInvalidLibrary(
        "Lum", __FILE__, "", __LINE__, file.c_str(),
        ("type library '" + name +
         "' is loaded already in this process: give its .tlm file instead, or first close what "
         "holds it")
            .c_str(),
        false);
  m_Read.push_back(std::move(model));
  Lum_TlmCatalog::Register(library);
  m_Registered.push_back(library);
  m_Names.push_back(name);
}

std::vector<std::string> Lum_TypeLibraryLoader::Save(std::string const &dir) const {
  std::vector<std::string> saved;
  for (auto const &library : m_Read)
    saved.push_back(Lum_CellLibraryReader::Save(*library, dir));
  return saved;
}

#include "Lum_CellLibraryReader.h"

#include "Lum_ExceptionInvalidFormat.h"

std::unique_ptr<Lum_TlmModel> Lum_CellLibraryReader::Read(std::string const &path,
                                                          Lum_CellLibraryOptions const &,
                                                          Lum_CellLibrarySummary *) {
  throw Lum_ExceptionInvalidFormat(__FILE__, __LINE__, path, 0, 0, "", "not readable yet");
}

std::unique_ptr<Lum_TlmModel> Lum_CellLibraryReader::ReadText(std::string_view,
                                                              std::string const &path,
                                                              Lum_CellLibraryOptions const &,
                                                              Lum_CellLibrarySummary *) {
  throw Lum_ExceptionInvalidFormat(__FILE__, __LINE__, path, 0, 0, "", "not readable yet");
}

std::string Lum_CellLibraryReader::Save(Lum_TlmModel const &, std::string const &dir) {
  throw Lum_ExceptionInvalidFormat(__FILE__, __LINE__, dir, 0, 0, "", "not writable yet");
}

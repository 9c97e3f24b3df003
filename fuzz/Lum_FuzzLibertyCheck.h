#pragma once

// What both cell-library fuzz targets check: reading any bytes either gives
// a type library that agrees with its summary, or throws
// Lum_ExceptionInvalidFormat with a place and a message (or runs out of
// memory). Anything else stops the run as a finding.

#include "Lum_CellLibraryReader.h"
#include "Lum_ExceptionInvalidFormat.h"

#include "Lum_Tlm.h"
#include "Orb_Model.h"

#include <cstddef>
#include <cstdio>
#include <cstdlib>
#include <new>
#include <string_view>

namespace LumFuzzCells {

[[noreturn]] inline void Finding(char const *what) {
  std::fprintf(stderr, "finding: %s\n", what);
  std::abort();
}

// Whether the reader takes the bytes for JSON cell models.
inline bool LooksLikeJson(std::string_view text) {
  std::size_t const first = text.find_first_not_of(" \t\r\n");
  return first != std::string_view::npos && text[first] == '{';
}

inline void ReadAndCheck(std::string_view text) {
  try {
    Lum_CellLibrarySummary summary;
    auto model = Lum_CellLibraryReader::ReadText(text, "fuzz", {}, &summary);
    Lum_TlmLibrary *library = model->GetLibrary();
    if (!library || library->GetTypeBlocks().size() != summary.cells)
      Finding("the library does not hold the cells the summary counts");
    std::size_t pins = 0;
    for (Lum_TlmBlock const *block : library->GetTypeBlocks())
      pins += block->GetPins().size();
    if (pins != summary.inputs + summary.outputs + summary.inouts)
      Finding("the type pins are not the pins the summary counts");
  } catch (Lum_ExceptionInvalidFormat const &e) {
    if (e.GetMessage().empty() || e.GetInputPath() != "fuzz")
      Finding("a refusal without a message or a file");
  } catch (std::bad_alloc const &) {
  } catch (...) {
    Finding("a failure other than Lum_ExceptionInvalidFormat");
  }
}

} // namespace LumFuzzCells

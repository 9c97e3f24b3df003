// Reads the fuzzer's bytes as a netlist with the Json reader; what reads
// is imported, exported and written again (Lum_FuzzNetlistSupport.h).

#include "Lum_FuzzNetlistSupport.h"

#include <cstddef>
#include <cstdint>
#include <string_view>

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const *data, std::size_t size) {
  std::string_view const text(reinterpret_cast<char const *>(data), size);
  try {
    LumFuzzNetlist::Exercise(Lum_NetlistJsonReader::ReadText(text, "fuzz"));
  } catch (Lum_ExceptionInvalidFormat const &) {
    // Refused with a position: the expected outcome for most inputs.
  }
  return 0;
}

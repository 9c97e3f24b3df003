// Any bytes (up to 1 MB) that start like JSON, read as Yosys JSON cell models.

#include "Lum_FuzzLibertyCheck.h"

#include <cstdint>

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const *data, std::size_t size) {
  std::string_view const text(reinterpret_cast<char const *>(data), size);
  // Liberty is the other target's.
  if (size > (std::size_t(1) << 20) || !LumFuzzCells::LooksLikeJson(text))
    return 0;
  LumFuzzCells::ReadAndCheck(text);
  return 0;
}

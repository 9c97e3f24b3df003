// Opens arbitrary bytes as a design database through Lum_TdmModel. A refused
// open must leave the model empty; an accepted one is committed, saved and
// reopened with the same typing. The designs may bind to the in-memory type
// library LIBT and to their own local library.

#include "Lum_FuzzSupport.h"

#include <cstddef>
#include <cstdint>

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const *data, std::size_t size) {
  LumFuzz::TheLibrary();
  // Large enough for every structure the reader knows, small enough to keep
  // runs fast.
  if (size > (std::size_t(1) << 20))
    return 0;
  Port_MsgCapture quiet;
  std::string const input = LumFuzz::TheScratch().File("input.odb");
  LumFuzz::WriteFile(input, data, size);

  Lum_TdmModel model("fuzz", "fuzzdb", "");
  if (!LumFuzz::Attempt("open", [&] { model.Open(input.c_str()); })) {
    LumFuzz::CheckEmptyAfterRefusal(model);
    return 0;
  }
  LumFuzz::CommitSaveReopen(model, LumFuzz::TheScratch().File("saved.odb"),
                            LumFuzz::Reopen::UnlessPinsWereHeldBack);
  return 0;
}

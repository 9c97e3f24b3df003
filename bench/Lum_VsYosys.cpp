// The typed workload (Lum_TdmWorkload.h) for a side-by-side run with Yosys
// (bench/vs-yosys):
//
//   Lum_VsYosys make N DB RTLIL   builds N blocks through the library, commits
//                                 and saves them to DB, and writes the same
//                                 netlist as RTLIL (16 cell modules CELL0..15
//                                 with ports A0..A4, Y0..Y2, a top module of N
//                                 cells and their 7 wires per cell)
//   Lum_VsYosys open DB           opens DB into a fresh Lum_TdmModel (every
//                                 block bound to its type block) and prints
//                                 one line: "open cpu_s wall_s rss_bytes"

#include "Lum_BenchCounters.h"
#include "Lum_TdmWorkload.h"

#include "Orb_Exception.h"
#include "Port_Exception.h"

#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <string>

namespace {

// The netlist of the workload as RTLIL: what Lum_TdmWorkload::Wire connects,
// with the same names.
void WriteRtlil(std::int64_t blocks, char const *path) {
  std::ofstream out(path);
  out << "autoidx 1\n";
  for (int t = 0; t < Lum_TdmWorkload::kTypeBlocks; ++t) {
    out << "attribute \\blackbox 1\nmodule \\CELL" << t << "\n";
    int port = 1;
    for (char const *input : Lum_TdmWorkload::kInputs)
      out << "  wire input " << port++ << " \\" << input << "\n";
    for (char const *output : Lum_TdmWorkload::kOutputs)
      out << "  wire output " << port++ << " \\" << output << "\n";
    out << "end\n";
  }
  out << "attribute \\top 1\nmodule \\top\n";
  std::string buffer;
  for (std::int64_t i = 0; i < blocks; ++i) {
    std::string const index = std::to_string(i);
    buffer.clear();
    buffer += "  wire \\c" + index + "\n";
    for (char const *pin : {"A1", "A2", "A3", "A4", "Y1", "Y2"})
      buffer += "  wire \\n" + index + "_" + pin + "\n";
    buffer +=
        "  cell \\CELL" + std::to_string(i % Lum_TdmWorkload::kTypeBlocks) + " \\u" + index + "\n";
    if (i > 0)
      buffer += "    connect \\A0 \\c" + std::to_string(i - 1) + "\n";
    for (char const *pin : {"A1", "A2", "A3", "A4"})
      buffer += std::string("    connect \\") + pin + " \\n" + index + "_" + pin + "\n";
    buffer += "    connect \\Y0 \\c" + index + "\n";
    for (char const *pin : {"Y1", "Y2"})
      buffer += std::string("    connect \\") + pin + " \\n" + index + "_" + pin + "\n";
    buffer += "  end\n";
    out << buffer;
  }
  out << "end\n";
  if (!out.flush())
    throw Orb_Exception(__FILE__, __LINE__, path, "cannot write the RTLIL file");
}

int Make(std::int64_t blocks, char const *db, char const *rtlil) {
  Lum_TdmWorkload::Library const library;
  Lum_TdmModel model("bench", "bench", "");
  Lum_TdmWorkload::Wire(Lum_TdmWorkload::CreateBlocks(model, library, blocks)->GetOrbBlock());
  Lum_TdmWorkload::ViewOf(model)->CommitAll();
  model.Save(db);
  WriteRtlil(blocks, rtlil);
  return 0;
}

int Open(char const *db) {
  Lum_TdmWorkload::Library const library;
  Lum_TdmModel model("bench", "bench", "");
  std::int64_t const rss = Lum_BenchCounters::ResidentBytes();
  double const cpu = Lum_BenchCounters::CpuSeconds();
  auto const start = std::chrono::steady_clock::now();
  model.Open(db);
  double const wall =
      std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
  std::printf("open %.4f %.4f %lld\n", Lum_BenchCounters::CpuSeconds() - cpu, wall,
              static_cast<long long>(Lum_BenchCounters::ResidentBytes() - rss));
  return 0;
}

} // namespace

int main(int argc, char **argv) {
  std::string const command = argc > 1 ? argv[1] : "";
  try {
    if (command == "make" && argc == 5)
      return Make(std::atoll(argv[2]), argv[3], argv[4]);
    if (command == "open" && argc == 3)
      return Open(argv[2]);
  } catch (Port::Exception const &e) {
    std::fprintf(stderr, "Lum_VsYosys: %s\n", e.what());
    return 1;
  }
  std::fprintf(stderr, "usage: Lum_VsYosys make N DB RTLIL | open DB\n");
  return 2;
}

#pragma once

// Helpers of the netlist tests: type libraries made from a netlist's cell
// definitions, Yosys as the outside reader, and a form of a netlist in which
// two netlists compare equal exactly when they have the same modules, ports,
// instances (names, types, parameters) and connectivity bit for bit.

#include "Lum_Netlist.h"
#include "Lum_NetlistJsonReader.h"

#include "Lum_Tlm.h"

#include <algorithm>
#include <cstdlib>
#include <map>
#include <memory>
#include <set>
#include <string>
#include <vector>

namespace nltest {

// The real designs: $LUM_REAL_DIR when set (a worktree away from the
// repository's usual place), else the folder beside the repository.
inline std::string RealDir() {
  char const *dir = std::getenv("LUM_REAL_DIR");
  return dir && *dir ? dir : LUM_REAL_DIR;
}

// A type library with one type block per blackbox module of the netlist (bus
// ports as pins "B[i]"), registered with the catalog while it lives.
class BlackboxLibrary {
public:
  BlackboxLibrary(Lum_Netlist const &netlist, char const *name)
      : m_Model(std::make_unique<Lum_TlmModel>(name, name, "", false)) {
    Lum_TlmLibrary *library = m_Model->CreateLibrary(name, 1, 0);
    for (Lum_NetlistModule const &module : netlist.modules) {
      if (!module.blackbox)
        continue;
      Lum_TlmBlock *cell = library->CreateTypeBlock(std::string(netlist.Text(module.name)).c_str());
      for (Lum_NetlistVector const &port : module.ports)
        for (std::uint32_t p = 0; p < port.bits.width; ++p) {
          std::string pin(netlist.Text(port.name));
          if (port.bits.width > 1)
            pin += "[" + std::to_string(p) + "]";
          cell->CreatePin(pin.c_str(), port.direction == Lum_NetlistDirection::Output
                                           ? Orb_Pin::PIN_OUTPUT
                                       : port.direction == Lum_NetlistDirection::Inout
                                           ? Orb_Pin::PIN_BIDIRECTIONAL
                                           : Orb_Pin::PIN_INPUT);
        }
    }
    Lum_TlmCatalog::Register(library);
    m_Library = library;
  }
  ~BlackboxLibrary() { Lum_TlmCatalog::Unregister(m_Library); }
  BlackboxLibrary(BlackboxLibrary const &) = delete;
  BlackboxLibrary &operator=(BlackboxLibrary const &) = delete;

  Lum_TlmLibrary *Get() const { return m_Library; }

private:
  std::unique_ptr<Lum_TlmModel> m_Model;
  Lum_TlmLibrary *m_Library = nullptr;
};

inline bool HaveYosys() { return std::system("yosys -V >/dev/null 2>&1") == 0; }

// Reads the file into Yosys and writes what Yosys holds as JSON, with cell
// definitions dropped (so that neither side knows directions the other does
// not) and aliases merged. `before` runs first (read_liberty -lib ...).
inline bool YosysNormalise(std::string const &in, std::string const &out,
                           std::string const &before = "") {
  bool const verilog = in.size() > 2 && in.compare(in.size() - 2, 2, ".v") == 0;
  std::string const script = before + (verilog ? "read_verilog " : "read_json ") + in +
                             "; delete =A:blackbox; opt_clean; write_json " + out;
  std::string const command = "yosys -q -p '" + script + "' >" + out + ".log 2>&1";
  return std::system(command.c_str()) == 0;
}

// One line per fact, sorted: module ports, cells with type and parameters,
// and per cell bit the net it is on, a net named by the smallest endpoint it
// reaches ("cell.port[i]" or "port p[i]").
//
// A name "\\$x" (a user's name that begins with "$") and "$x" (a generated
// one) count as the same: Verilog cannot tell them apart.
inline std::vector<std::string> Canonical(Lum_Netlist const &netlist) {
  std::vector<std::string> lines;
  for (Lum_NetlistModule const &module : netlist.modules) {
    if (module.blackbox)
      continue;
    std::string const name(netlist.Text(module.name));
    std::vector<std::string> endpoint(module.numBits);
    auto note = [&endpoint](Lum_NetlistBit bit, std::string const &what) {
      if (Lum_NetlistBits::IsConstant(bit))
        return;
      if (endpoint[bit].empty() || what < endpoint[bit])
        endpoint[bit] = what;
    };
    for (Lum_NetlistVector const &port : module.ports) {
      lines.push_back(name + " port " + std::string(netlist.Text(port.name)) + " " +
                      std::to_string(static_cast<int>(port.direction)) + " " +
                      std::to_string(port.bits.width));
      for (std::uint32_t p = 0; p < port.bits.width; ++p)
        note(module.Bits(port.bits)[p],
             "port " + std::string(netlist.Text(port.name)) + "[" + std::to_string(p) + "]");
    }
    for (Lum_NetlistCell const &cell : module.cells)
      for (std::uint32_t c = 0; c < cell.numConnections; ++c) {
        Lum_NetlistConnection const &connection = module.connections[cell.firstConnection + c];
        for (std::uint32_t p = 0; p < connection.bits.width; ++p)
          note(module.Bits(connection.bits)[p], std::string(netlist.Text(cell.name)) + "." +
                                                    std::string(netlist.Text(connection.port)) +
                                                    "[" + std::to_string(p) + "]");
      }
    auto net = [&endpoint](Lum_NetlistBit bit) {
      return Lum_NetlistBits::IsConstant(bit) ? std::string(1, Lum_NetlistBits::ConstantChar(bit))
                                              : endpoint[bit];
    };
    for (Lum_NetlistVector const &port : module.ports)
      for (std::uint32_t p = 0; p < port.bits.width; ++p)
        lines.push_back(name + " port " + std::string(netlist.Text(port.name)) + "[" +
                        std::to_string(p) + "] on " + net(module.Bits(port.bits)[p]));
    for (Lum_NetlistCell const &cell : module.cells) {
      std::string const cellName = name + " cell " + std::string(netlist.Text(cell.name));
      lines.push_back(cellName + " type " + std::string(netlist.Text(cell.type)));
      for (std::uint32_t i = 0; i < cell.numParameters; ++i) {
        Lum_NetlistParameter const &parameter = module.parameters[cell.firstParameter + i];
        lines.push_back(cellName + " parameter " + std::string(netlist.Text(parameter.name)) +
                        " = " + std::string(netlist.Text(parameter.value)));
      }
      for (std::uint32_t c = 0; c < cell.numConnections; ++c) {
        Lum_NetlistConnection const &connection = module.connections[cell.firstConnection + c];
        for (std::uint32_t p = 0; p < connection.bits.width; ++p)
          lines.push_back(cellName + " " + std::string(netlist.Text(connection.port)) + "[" +
                          std::to_string(p) + "] on " + net(module.Bits(connection.bits)[p]));
      }
    }
  }
  for (std::string &line : lines)
    for (std::size_t at = line.find("\\$"); at != std::string::npos; at = line.find("\\$", at))
      line.erase(at, 1);
  std::sort(lines.begin(), lines.end());
  return lines;
}

// The lines of `a` not in `b`, the first few, for a readable failure.
inline std::string Difference(std::vector<std::string> const &a,
                              std::vector<std::string> const &b) {
  std::vector<std::string> only;
  std::set_difference(a.begin(), a.end(), b.begin(), b.end(), std::back_inserter(only));
  std::string text;
  for (std::size_t i = 0; i < only.size() && i < 8; ++i)
    text += "  " + only[i] + "\n";
  return text + (only.size() > 8 ? "  ... " + std::to_string(only.size()) + " in all\n" : "");
}

} // namespace nltest

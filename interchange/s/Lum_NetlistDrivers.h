#pragma once

// The check that every net of a module has at most one driver: an input
// port of the module, an output of a cell, or a constant 0 or 1. Inout ports
// and pins, and pins of unknown direction, are not drivers for it.

#include "Lum_Netlist.h"

#include <cstdint>
#include <functional>
#include <vector>

class Lum_NetlistDrivers {
public:
  // The direction of a cell's connection, as the cell type has it (or the
  // file says, when the type does not know); Unknown skips the connection.
  using DirectionOf =
      std::function<Lum_NetlistDirection(Lum_NetlistCell const &, Lum_NetlistConnection const &)>;

  explicit Lum_NetlistDrivers(Lum_Netlist const &netlist) : m_Netlist(netlist) {}

  // One pass over the module's input ports and cell connections with a bit
  // per net. A net with a second driver throws Lum_ExceptionInvalidFormat
  // naming the file, the module, the net (one of its names) and both
  // drivers, at the second driver's position (its JSON path, or its line
  // and column).
  void Check(std::uint32_t module, DirectionOf const &directionOf);

  // A driver: bit `position` of input port `index`, or of connection
  // `connection` of cell `index`; a constant has index kNone.
  struct Driver {
    bool isPort = false;
    std::uint32_t index = Lum_Netlist::kNone;
    std::uint32_t connection = 0;
    std::uint32_t position = 0;
  };

private:
  Driver FirstDriver(Lum_NetlistModule const &module, Lum_NetlistBit bit,
                     DirectionOf const &directionOf) const;
  std::string Describe(Lum_NetlistModule const &module, Driver const &driver,
                       Lum_NetlistBit bit) const;
  std::string NetName(Lum_NetlistModule const &module, Lum_NetlistBit bit) const;
  [[noreturn]] void Fail(Lum_NetlistModule const &module, Lum_NetlistBit bit, Driver const &second,
                         DirectionOf const &directionOf) const;

  Lum_Netlist const &m_Netlist;
  std::vector<bool> m_Driven; // per bit of the module checked, reused
};

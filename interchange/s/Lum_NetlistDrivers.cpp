#include "Lum_NetlistDrivers.h"

#include "Lum_ExceptionInvalidFormat.h"
#include "Lum_NetlistNames.h"

namespace {

// Constants 0 and 1 drive their net; x and z do not.
bool IsDrivingConstant(Lum_NetlistBit bit) {
  return bit == Lum_NetlistBits::kZero || bit == Lum_NetlistBits::kOne;
}

// Calls visit(bit, driver) for each bit driven by an input port or a cell
// output, ports first, until it returns false.
template <class Visit>
void EachDriver(Lum_NetlistModule const &module, Lum_NetlistDrivers::DirectionOf const &directionOf,
                Visit const &visit) {
  for (std::uint32_t p = 0; p < module.ports.size(); ++p) {
    Lum_NetlistVector const &port = module.ports[p];
    if (port.direction != Lum_NetlistDirection::Input)
      continue;
    Lum_NetlistBit const *bits = module.Bits(port.bits);
    for (std::uint32_t b = 0; b < port.bits.width; ++b)
      if (!visit(bits[b], Lum_NetlistDrivers::Driver{true, p, 0, b}))
        return;
  }
  for (std::uint32_t c = 0; c < module.cells.size(); ++c) {
    Lum_NetlistCell const &cell = module.cells[c];
    for (std::uint32_t k = 0; k < cell.numConnections; ++k) {
      Lum_NetlistConnection const &connection = module.connections[cell.firstConnection + k];
      if (directionOf(cell, connection) != Lum_NetlistDirection::Output)
        continue;
      Lum_NetlistBit const *bits = module.Bits(connection.bits);
      for (std::uint32_t b = 0; b < connection.bits.width; ++b)
        if (!visit(bits[b], Lum_NetlistDrivers::Driver{false, c, k, b}))
          return;
    }
  }
}

} // namespace

void Lum_NetlistDrivers::Check(std::uint32_t index, DirectionOf const &directionOf) {
  Lum_NetlistModule const &module = m_Netlist.modules[index];
  m_Driven.assign(module.numBits, false);
  EachDriver(module, directionOf, [&](Lum_NetlistBit bit, Driver const &driver) {
    bool const again =
        Lum_NetlistBits::IsConstant(bit) ? IsDrivingConstant(bit) : bool(m_Driven[bit]);
    if (again)
      Fail(module, bit, driver, directionOf);
    if (!Lum_NetlistBits::IsConstant(bit))
      m_Driven[bit] = true;
    return true;
  });
}

// Only on the error path: the same walk, up to the first driver of the bit.
Lum_NetlistDrivers::Driver Lum_NetlistDrivers::FirstDriver(Lum_NetlistModule const &module,
                                                           Lum_NetlistBit bit,
                                                           DirectionOf const &directionOf) const {
  Driver first;
  if (!Lum_NetlistBits::IsConstant(bit))
    EachDriver(module, directionOf, [&](Lum_NetlistBit driven, Driver const &driver) {
      if (driven == bit)
        first = driver;
      return driven != bit;
    });
  return first;
}

std::string Lum_NetlistDrivers::Describe(Lum_NetlistModule const &module, Driver const &driver,
                                         Lum_NetlistBit bit) const {
  if (driver.index == Lum_Netlist::kNone)
    return std::string("constant ") + Lum_NetlistBits::ConstantChar(bit);
  if (driver.isPort) {
    Lum_NetlistVector const &port = module.ports[driver.index];
    return "input port " +
           Lum_NetlistNames::BitName(m_Netlist.Text(port.name), port, driver.position);
  }
  Lum_NetlistCell const &cell = module.cells[driver.index];
  Lum_NetlistConnection const &connection =
      module.connections[cell.firstConnection + driver.connection];
  std::string text =
      std::string(m_Netlist.Text(cell.name)) + "." + std::string(m_Netlist.Text(connection.port));
  if (connection.bits.width > 1)
    text += "[" + std::to_string(driver.position) + "]";
  return text;
}

std::string Lum_NetlistDrivers::NetName(Lum_NetlistModule const &module, Lum_NetlistBit bit) const {
  for (auto const *vectors : {&module.netNames, &module.ports})
    for (Lum_NetlistVector const &net : *vectors)
      for (std::uint32_t b = 0; b < net.bits.width; ++b)
        if (module.Bits(net.bits)[b] == bit)
          return Lum_NetlistNames::BitName(m_Netlist.Text(net.name), net, b);
  if (Lum_NetlistBits::IsConstant(bit))
    return std::string("1'b") + Lum_NetlistBits::ConstantChar(bit);
  return "$" + std::to_string(bit);
}

void Lum_NetlistDrivers::Fail(Lum_NetlistModule const &module, Lum_NetlistBit bit,
                              Driver const &second, DirectionOf const &directionOf) const {
  std::string const moduleName(m_Netlist.Text(module.name));
  std::string const what = "module " + moduleName + ": net " + NetName(module, bit) +
                           " has two drivers, " +
                           Describe(module, FirstDriver(module, bit, directionOf), bit) + " and " +
                           Describe(module, second, bit);
  std::uint32_t line = module.line;
  std::uint32_t column = module.column;
  std::string where;
  if (m_Netlist.fromJson) {
    where = "modules." + moduleName;
    if (second.isPort)
      where += ".ports." + std::string(m_Netlist.Text(module.ports[second.index].name));
    else
      where +=
          ".cells." + std::string(m_Netlist.Text(module.cells[second.index].name)) +
          ".connections." +
          std::string(m_Netlist.Text(
              module.connections[module.cells[second.index].firstConnection + second.connection]
                  .port));
    line = column = 0;
  } else {
    if (!second.isPort) {
      line = module.cells[second.index].line;
      column = module.cells[second.index].column;
    }
    where = "line " + std::to_string(line) + ", column " + std::to_string(column);
  }
  throw Lum_ExceptionInvalidFormat(__FILE__, __LINE__, m_Netlist.path, line, column, where, what);
}

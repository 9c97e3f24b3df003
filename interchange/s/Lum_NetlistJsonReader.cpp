#include "Lum_NetlistJsonReader.h"

#include "Lum_ExceptionInvalidFormat.h"
#include "Lum_MappedFile.h"

#include <simdjson.h>

#include <algorithm>
#include <cstdint>
#include <unordered_map>
#include <vector>

namespace {

namespace od = simdjson::ondemand;

// Thrown inside the reader with the message only; the reader adds the path.
struct Refusal {
  std::string what;
};

class JsonNetlistReader {
public:
  JsonNetlistReader(std::string const &path) { m_Netlist.path = path; }

  Lum_Netlist Run(simdjson::padded_string_view text) {
    // Bit numbers below a quarter of the text's length (or a floor) are
    // looked up in a table of 4-byte ids, which so stays no larger than the
    // text; a file numbers its bits densely, so larger numbers are rare.
    m_DenseLimit = std::max<std::size_t>(text.size() / 4, 1 << 16);
    try {
      od::document document = m_Parser.iterate(text);
      od::object root = Object(document.get_value());
      bool sawModules = false;
      for (od::field field : root) {
        std::string_view const key = field.unescaped_key();
        if (key == "modules") {
          sawModules = true;
          Push(key);
          ReadModules(Object(field.value()));
          Pop();
        }
      }
      if (!sawModules)
        throw Refusal{"no \"modules\" object"};
    } catch (simdjson::simdjson_error const &e) {
      Fail(std::string("not valid JSON: ") + simdjson::error_message(e.error()));
    } catch (Refusal const &e) {
      Fail(e.what);
    }
    m_Netlist.fromJson = true;
    return std::move(m_Netlist);
  }

private:
  [[noreturn]] void Fail(std::string const &what) {
    std::string where;
    for (std::string_view part : m_Path) {
      if (!where.empty())
        where += '.';
      where += part;
    }
    if (where.empty())
      where = "document";
    throw Lum_ExceptionInvalidFormat(__FILE__, __LINE__, m_Netlist.path, 0, 0, where, what);
  }

  void Push(std::string_view part) { m_Path.push_back(part); }
  void Pop() { m_Path.pop_back(); }

  static od::object Object(od::value value) {
    if (value.type() != od::json_type::object)
      throw Refusal{"expected an object"};
    return value.get_object();
  }
  static std::string_view String(od::value value) {
    if (value.type() != od::json_type::string)
      throw Refusal{"expected a string"};
    return value.get_string();
  }

  // A parameter or attribute value: bits MSB first, a string, or a number
  // (a 32-bit constant).
  Lum_NetlistParameter Value(std::string_view name, od::value value) {
    Lum_NetlistParameter parameter;
    parameter.name = m_Netlist.Intern(name);
    switch (value.type()) {
    case od::json_type::string: {
      std::string_view text = value.get_string();
      bool bits = !text.empty();
      for (char c : text)
        bits = bits && (c == '0' || c == '1' || c == 'x' || c == 'z');
      if (!bits) {
        // A string that would read as bits is written with a trailing blank.
        std::string_view const trimmed = text.substr(0, text.size() - (text.empty() ? 0 : 1));
        bool looksLikeBits = !text.empty() && text.back() == ' ';
        for (char c : trimmed)
          looksLikeBits = looksLikeBits && (c == '0' || c == '1' || c == 'x' || c == 'z');
        if (looksLikeBits)
          text = trimmed;
      }
      parameter.value = m_Netlist.Intern(text);
      parameter.isString = !bits;
      break;
    }
    case od::json_type::number: {
      std::int64_t const number = value.get_int64();
      std::string bits(32, '0');
      for (int i = 0; i < 32; ++i)
        bits[31 - i] = ((static_cast<std::uint64_t>(number) >> i) & 1U) ? '1' : '0';
      parameter.value = m_Netlist.Intern(bits);
      break;
    }
    default:
      throw Refusal{"expected a string or a number"};
    }
    return parameter;
  }

  void ReadModules(od::object modules) {
    for (od::field field : modules) {
      std::string_view const name = field.unescaped_key();
      Push(name);
      std::uint32_t const index = m_Netlist.AddModule(m_Netlist.Intern(name));
      if (index == Lum_Netlist::kNone)
        throw Refusal{"a second module of this name"};
      ReadModule(m_Netlist.modules[index], Object(field.value()));
      Pop();
    }
  }

  void ReadModule(Lum_NetlistModule &module, od::object object) {
    for (std::size_t id = Lum_NetlistBits::kFirstNet; id < m_Numbers.size(); ++id)
      if (m_Numbers[id] < m_DenseLimit)
        m_Dense[m_Numbers[id]] = Lum_Netlist::kNone;
    m_Sparse.clear();
    m_Numbers.assign(Lum_NetlistBits::kFirstNet, 0);
    m_Declared.assign(Lum_NetlistBits::kFirstNet, true);
    for (od::field field : object) {
      std::string_view const key = field.unescaped_key();
      Push(key);
      if (key == "attributes") {
        for (od::field attribute : Object(field.value())) {
          std::string_view const name = attribute.unescaped_key();
          Push(name);
          if (name == "top" || name == "blackbox") {
            Lum_NetlistParameter const value = Value(name, attribute.value());
            bool const set = m_Netlist.Text(value.value).find('1') != std::string_view::npos;
            (name == "top" ? module.top : module.blackbox) = set;
          }
          Pop();
        }
      } else if (key == "ports") {
        for (od::field port : Object(field.value())) {
          std::string_view const name = port.unescaped_key();
          Push(name);
          module.ports.push_back(ReadVector(module, name, Object(port.value()), true));
          Pop();
        }
      } else if (key == "netnames") {
        for (od::field net : Object(field.value())) {
          std::string_view const name = net.unescaped_key();
          Push(name);
          module.netNames.push_back(ReadVector(module, name, Object(net.value()), false));
          Pop();
        }
      } else if (key == "cells") {
        for (od::field cell : Object(field.value())) {
          std::string_view const name = cell.unescaped_key();
          Push(name);
          ReadCell(module, name, Object(cell.value()));
          Pop();
        }
      }
      Pop();
    }
    module.numBits = static_cast<std::uint32_t>(m_Declared.size());
    CheckDeclared(module);
  }

  // Appends the bit list to the module's bits; `declare` marks its bits
  // declared (ports and net names).
  Lum_NetlistSpan ReadBits(Lum_NetlistModule &module, od::value value, bool declare) {
    if (value.type() != od::json_type::array)
      throw Refusal{"expected an array of bits"};
    Lum_NetlistSpan span;
    span.first = static_cast<std::uint32_t>(module.bits.size());
    for (od::value bit : value.get_array()) {
      Lum_NetlistBit id = 0;
      if (bit.type() == od::json_type::number) {
        id = IdOf(bit.get_uint64());
        if (declare)
          m_Declared[id] = true;
      } else if (bit.type() == od::json_type::string) {
        std::string_view const text = bit.get_string();
        if (text.size() != 1 ||
            (text[0] != '0' && text[0] != '1' && text[0] != 'x' && text[0] != 'z'))
          throw Refusal{"a bit is a number or one of \"0\", \"1\", \"x\", \"z\", not \"" +
                        std::string(text) + "\""};
        id = text[0] == '0'   ? Lum_NetlistBits::kZero
             : text[0] == '1' ? Lum_NetlistBits::kOne
             : text[0] == 'x' ? Lum_NetlistBits::kUndefined
                              : Lum_NetlistBits::kFloating;
      } else {
        throw Refusal{"a bit is a number or a string"};
      }
      module.bits.push_back(id);
    }
    span.width = static_cast<std::uint32_t>(module.bits.size()) - span.first;
    return span;
  }

  // The module's id of a bit number of the file, given on first sight.
  Lum_NetlistBit IdOf(std::uint64_t number) {
    Lum_NetlistBit *slot = nullptr;
    if (number < m_DenseLimit) {
      if (number >= m_Dense.size())
        m_Dense.resize(std::min<std::size_t>(std::max<std::size_t>(number + 1, 2 * m_Dense.size()),
                                             m_DenseLimit),
                       Lum_Netlist::kNone);
      slot = &m_Dense[number];
    } else {
      slot = &m_Sparse.try_emplace(number, Lum_Netlist::kNone).first->second;
    }
    if (*slot == Lum_Netlist::kNone) {
      if (m_Declared.size() >= Lum_Netlist::kNone - 1)
        throw Refusal{"too many bits"};
      *slot = static_cast<Lum_NetlistBit>(m_Declared.size());
      m_Declared.push_back(false);
      m_Numbers.push_back(number);
    }
    return *slot;
  }

  static Lum_NetlistDirection Direction(std::string_view text) {
    if (text == "input")
      return Lum_NetlistDirection::Input;
    if (text == "output")
      return Lum_NetlistDirection::Output;
    if (text == "inout")
      return Lum_NetlistDirection::Inout;
    throw Refusal{"direction is \"input\", \"output\" or \"inout\", not \"" + std::string(text) +
                  "\""};
  }

  static std::int64_t Integer(od::value value) {
    if (value.type() != od::json_type::number)
      throw Refusal{"expected a number"};
    return value.get_int64();
  }

  Lum_NetlistVector ReadVector(Lum_NetlistModule &module, std::string_view name, od::object object,
                               bool port) {
    Lum_NetlistVector vector;
    vector.name = m_Netlist.Intern(name);
    vector.hidden = !name.empty() && name[0] == '$';
    bool sawBits = false;
    for (od::field field : object) {
      std::string_view const key = field.unescaped_key();
      Push(key);
      if (key == "bits") {
        vector.bits = ReadBits(module, field.value(), true);
        sawBits = true;
      } else if (key == "direction" && port) {
        vector.direction = Direction(String(field.value()));
      } else if (key == "offset") {
        std::int64_t const offset = Integer(field.value());
        if (offset < -(std::int64_t(1) << 30) || offset > (std::int64_t(1) << 30))
          throw Refusal{"offset out of range"};
        vector.offset = static_cast<std::int32_t>(offset);
      } else if (key == "upto") {
        vector.upto = Integer(field.value()) != 0;
      } else if (key == "signed") {
        vector.isSigned = Integer(field.value()) != 0;
      } else if (key == "hide_name") {
        vector.hidden = Integer(field.value()) != 0;
      }
      Pop();
    }
    if (!sawBits)
      throw Refusal{"no \"bits\""};
    if (port && vector.direction == Lum_NetlistDirection::Unknown)
      throw Refusal{"no \"direction\""};
    if (port)
      for (Lum_NetlistVector const &other : module.ports)
        if (other.name == vector.name)
          throw Refusal{"a second port of this name"};
    return vector;
  }

  void ReadCell(Lum_NetlistModule &module, std::string_view name, od::object object) {
    Lum_NetlistCell cell;
    cell.name = m_Netlist.Intern(name);
    cell.firstConnection = static_cast<std::uint32_t>(module.connections.size());
    cell.firstParameter = static_cast<std::uint32_t>(module.parameters.size());
    bool sawType = false;
    // Directions may come before or after the connections.
    std::vector<std::pair<Lum_NetlistName, Lum_NetlistDirection>> &directions = m_Directions;
    directions.clear();
    for (od::field field : object) {
      std::string_view const key = field.unescaped_key();
      Push(key);
      if (key == "type") {
        cell.type = m_Netlist.Intern(String(field.value()));
        sawType = true;
      } else if (key == "parameters") {
        for (od::field parameter : Object(field.value())) {
          std::string_view const parameterName = parameter.unescaped_key();
          Push(parameterName);
          module.parameters.push_back(Value(parameterName, parameter.value()));
          Pop();
        }
      } else if (key == "port_directions") {
        for (od::field port : Object(field.value())) {
          std::string_view const portName = port.unescaped_key();
          Push(portName);
          directions.emplace_back(m_Netlist.Intern(portName), Direction(String(port.value())));
          Pop();
        }
      } else if (key == "connections") {
        for (od::field port : Object(field.value())) {
          std::string_view const portName = port.unescaped_key();
          Push(portName);
          Lum_NetlistConnection connection;
          connection.port = m_Netlist.Intern(portName);
          for (std::uint32_t i = cell.firstConnection; i < module.connections.size(); ++i)
            if (module.connections[i].port == connection.port)
              throw Refusal{"a second connection of this port"};
          connection.bits = ReadBits(module, port.value(), false);
          module.connections.push_back(connection);
          Pop();
        }
      }
      Pop();
    }
    if (!sawType)
      throw Refusal{"no \"type\""};
    cell.numConnections =
        static_cast<std::uint32_t>(module.connections.size()) - cell.firstConnection;
    cell.numParameters = static_cast<std::uint32_t>(module.parameters.size()) - cell.firstParameter;
    for (auto const &[port, direction] : directions)
      for (std::uint32_t i = cell.firstConnection; i < module.connections.size(); ++i)
        if (module.connections[i].port == port)
          module.connections[i].direction = direction;
    module.cells.push_back(cell);
  }

  // Every bit a cell uses must be a bit of a port or a net name.
  void CheckDeclared(Lum_NetlistModule const &module) {
    for (Lum_NetlistCell const &cell : module.cells)
      for (std::uint32_t c = 0; c < cell.numConnections; ++c) {
        Lum_NetlistConnection const &connection = module.connections[cell.firstConnection + c];
        Lum_NetlistBit const *bits = module.Bits(connection.bits);
        for (std::uint32_t i = 0; i < connection.bits.width; ++i)
          if (!m_Declared[bits[i]]) {
            std::uint64_t const number = m_Numbers[bits[i]];
            Push("cells");
            Push(m_Netlist.Text(cell.name));
            Push("connections");
            Push(m_Netlist.Text(connection.port));
            throw Refusal{"bit " + std::to_string(number) +
                          " is declared by no port and no net name of the module"};
          }
      }
  }

  Lum_Netlist m_Netlist;
  od::parser m_Parser;
  std::vector<std::string_view> m_Path;
  // A module's bits: the id of a number (m_Dense below m_DenseLimit, else
  // m_Sparse), the number of an id, and whether a port or net declares it.
  std::size_t m_DenseLimit = 0;
  std::vector<Lum_NetlistBit> m_Dense;
  std::unordered_map<std::uint64_t, Lum_NetlistBit> m_Sparse;
  std::vector<std::uint64_t> m_Numbers;
  std::vector<bool> m_Declared;
  // A cell's port directions, reused from cell to cell.
  std::vector<std::pair<Lum_NetlistName, Lum_NetlistDirection>> m_Directions;
};

} // namespace

namespace {

// Bytes of one string (a name or a value, such as a memory's INIT bits) that
// a netlist may hold.
constexpr std::size_t kMaxString = std::size_t(1) << 20;

// Refuses a string longer than kMaxString before the parser indexes the
// document, whose index would grow with it: one pass from quote to quote.
void CheckStrings(std::string_view text, std::string const &path) {
  for (std::size_t at = text.find('"'); at != std::string_view::npos;) {
    std::size_t end = at + 1;
    while ((end = text.find_first_of("\"\\", end)) != std::string_view::npos && text[end] == '\\')
      end += 2;
    std::size_t const length = (end == std::string_view::npos ? text.size() : end) - at - 1;
    if (length > kMaxString) {
      std::size_t const line =
          1 + static_cast<std::size_t>(std::count(text.begin(), text.begin() + at, '\n'));
      std::size_t const lineStart = text.rfind('\n', at);
      std::size_t const column = at - (lineStart == std::string_view::npos ? 0 : lineStart + 1) + 1;
      throw Lum_ExceptionInvalidFormat(
          __FILE__, __LINE__, path, line, column,
          "line " + std::to_string(line) + ", column " + std::to_string(column),
          "a string longer than " + std::to_string(kMaxString) + " bytes");
    }
    at = end == std::string_view::npos ? end : text.find('"', end + 1);
  }
}

} // namespace

Lum_Netlist Lum_NetlistJsonReader::Read(std::string const &path) {
  // Mapped, not copied: the zero bytes after the end are simdjson's padding.
  Lum_MappedFile const file(path, simdjson::SIMDJSON_PADDING);
  CheckStrings(file.Text(), path);
  JsonNetlistReader reader(path);
  return reader.Run(simdjson::padded_string_view(file.Data(), file.Size(),
                                                 file.Size() + simdjson::SIMDJSON_PADDING));
}

Lum_Netlist Lum_NetlistJsonReader::ReadText(std::string_view text, std::string const &path) {
  CheckStrings(text, path);
  simdjson::padded_string const padded(text);
  JsonNetlistReader reader(path);
  return reader.Run(padded);
}

#include "Lum_CellModelReader.h"

#include "Lum_ExceptionInvalidFormat.h"

#include <simdjson.h>

#include <cstdint>
#include <unordered_set>
#include <vector>

namespace {

namespace od = simdjson::ondemand;

// How deep values the reader does not interpret may nest.
constexpr unsigned kMaxDepth = 128;
// The widest port the reader builds.
constexpr std::uint64_t kMaxPortWidth = 1 << 16;

std::string Quote(std::string_view name) { return "\"" + std::string(name) + "\""; }

struct Port {
  std::string name;
  char const *at = nullptr;
  Lum_CellPinDirection direction = Lum_CellPinDirection::Input;
  bool hasDirection = false;
  std::uint64_t width = 0;
  bool hasBits = false;
  std::int64_t offset = 0;
  bool upto = false;
};

class Walker {
public:
  Walker(std::string_view text, std::string const &path)
      : m_Json(text.data(), text.size()), m_Path(path), m_Cursor(m_Json.data()),
        m_CursorLineStart(m_Json.data()) {}

  Lum_CellLibraryData Run() {
    m_Library.format = "json";
    Check(m_Parser.iterate(m_Json).get(m_Doc), nullptr, "");
    od::object root;
    simdjson::error_code const error = m_Doc.get_object().get(root);
    Check(error, nullptr,
          error == simdjson::INCORRECT_TYPE ? "expected a Yosys JSON document (an object)" : "");
    bool sawModules = false;
    for (auto result : root) {
      od::field field;
      Check(std::move(result).get(field), nullptr, "");
      std::string_view key;
      Check(field.unescaped_key().get(key), nullptr, "");
      if (key == "modules") {
        sawModules = true;
        Modules(field.value());
      } else {
        Validate(field.value(), 1);
      }
    }
    // A location past the root object is text after it.
    char const *rest = nullptr;
    if (m_Doc.current_location().get(rest) == simdjson::SUCCESS)
      Fail(rest, "expected the end of the document");
    if (!sawModules)
      Fail(m_Json.data(), "expected a \"modules\" object: this is not a Yosys JSON file");
    if (m_Library.cells.empty())
      Fail(m_Json.data(), "no blackbox module (cell model) in the file");
    return std::move(m_Library);
  }

private:
  char const *Location() {
    char const *at = nullptr;
    if (m_Doc.current_location().get(at) != simdjson::SUCCESS)
      return m_Json.data() + m_Json.size();
    return at;
  }

  // The line and column of a place in the text. Places asked for in text
  // order cost one pass over the text in all.
  void Locate(char const *at, std::size_t &line, std::size_t &column) {
    char const *const end = m_Json.data() + m_Json.size();
    if (!at || at < m_Json.data() || at > end)
      at = end;
    if (at < m_Cursor) {
      m_Cursor = m_Json.data();
      m_CursorLine = 1;
      m_CursorLineStart = m_Cursor;
    }
    for (; m_Cursor < at; ++m_Cursor)
      if (*m_Cursor == '\n') {
        ++m_CursorLine;
        m_CursorLineStart = m_Cursor + 1;
      }
    line = m_CursorLine;
    column = static_cast<std::size_t>(at - m_CursorLineStart) + 1;
  }

  [[noreturn]] void Fail(char const *at, std::string const &what) {
    std::size_t line = 0;
    std::size_t column = 0;
    Locate(at, line, column);
    throw Lum_ExceptionInvalidFormat(
        __FILE__, __LINE__, m_Path, line, column,
        "line " + std::to_string(line) + ", column " + std::to_string(column), what);
  }

  // Fails on a simdjson error: "invalid JSON (reason)" at the place the
  // parser stopped, or `what` when given.
  void Check(simdjson::error_code error, char const *at, std::string const &what) {
    if (error == simdjson::SUCCESS)
      return;
    std::string const reason = simdjson::error_message(error);
    Fail(at ? at : Location(),
         what.empty() ? "invalid JSON: " + reason : what + " (" + reason + ")");
  }

  od::object Object(od::value value, std::string const &what) {
    od::object object;
    Check(value.get_object().get(object), nullptr, "expected an object for " + what);
    return object;
  }

  // Reads a value the reader does not interpret, so that invalid JSON
  // anywhere is found.
  void Validate(od::value value, unsigned depth) {
    if (depth > kMaxDepth)
      Fail(Location(), "values nested deeper than " + std::to_string(kMaxDepth));
    od::json_type type;
    Check(value.type().get(type), nullptr, "");
    switch (type) {
    case od::json_type::object: {
      od::object object;
      Check(value.get_object().get(object), nullptr, "");
      for (auto result : object) {
        od::field field;
        Check(std::move(result).get(field), nullptr, "");
        std::string_view key;
        Check(field.unescaped_key().get(key), nullptr, "");
        Validate(field.value(), depth + 1);
      }
      return;
    }
    case od::json_type::array: {
      od::array array;
      Check(value.get_array().get(array), nullptr, "");
      for (auto result : array) {
        od::value element;
        Check(std::move(result).get(element), nullptr, "");
        Validate(element, depth + 1);
      }
      return;
    }
    case od::json_type::number: {
      od::number number;
      Check(value.get_number().get(number), nullptr, "");
      return;
    }
    case od::json_type::string: {
      std::string_view text;
      Check(value.get_string().get(text), nullptr, "");
      return;
    }
    case od::json_type::boolean: {
      bool flag = false;
      Check(value.get_bool().get(flag), nullptr, "");
      return;
    }
    case od::json_type::null: {
      bool null = false;
      Check(value.is_null().get(null), nullptr, "");
      return;
    }
    }
  }

  void Modules(od::value value) {
    std::unordered_set<std::string> names;
    for (auto result : Object(value, "\"modules\"")) {
      od::field field;
      Check(std::move(result).get(field), nullptr, "");
      char const *const at = field.key().raw() - 1;
      std::string_view key;
      Check(field.unescaped_key().get(key), nullptr, "");
      std::string name(key);
      if (!names.insert(name).second)
        Fail(at, "module " + Quote(name) + " is defined twice");
      Module(std::move(name), at, field.value());
    }
  }

  void Module(std::string name, char const *at, od::value value) {
    std::string const where = "module " + Quote(name);
    bool blackbox = false;
    std::vector<Port> ports;
    for (auto result : Object(value, where)) {
      od::field field;
      Check(std::move(result).get(field), nullptr, "");
      std::string_view key;
      Check(field.unescaped_key().get(key), nullptr, "");
      if (key == "attributes")
        blackbox = Attributes(field.value(), where);
      else if (key == "ports")
        ports = Ports(field.value(), where);
      else
        Validate(field.value(), 3);
    }
    // Modules with a body are designs, not cell models.
    if (!blackbox)
      return;
    Lum_CellData cell;
    cell.name = std::move(name);
    Locate(at, cell.line, cell.column);
    std::unordered_set<std::string> pins;
    for (Port const &port : ports)
      AddPins(cell, port, pins);
    m_Library.cells.push_back(std::move(cell));
  }

  bool Attributes(od::value value, std::string const &where) {
    bool blackbox = false;
    for (auto result : Object(value, "the attributes of " + where)) {
      od::field field;
      Check(std::move(result).get(field), nullptr, "");
      std::string_view key;
      Check(field.unescaped_key().get(key), nullptr, "");
      if (key != "blackbox") {
        Validate(field.value(), 4);
        continue;
      }
      // A bit string (MSB first) or, with -compat-int, a number.
      od::value flag = field.value();
      od::json_type type;
      Check(flag.type().get(type), nullptr, "");
      if (type == od::json_type::string) {
        std::string_view bits;
        Check(flag.get_string().get(bits), nullptr, "");
        blackbox = bits.find('1') != std::string_view::npos;
      } else {
        std::int64_t number = 0;
        Check(flag.get_int64().get(number), nullptr,
              where + ": expected a bit string or a number for \"blackbox\"");
        blackbox = number != 0;
      }
    }
    return blackbox;
  }

  std::vector<Port> Ports(od::value value, std::string const &where) {
    std::vector<Port> ports;
    std::unordered_set<std::string> names;
    for (auto result : Object(value, "the ports of " + where)) {
      od::field field;
      Check(std::move(result).get(field), nullptr, "");
      Port port;
      port.at = field.key().raw() - 1;
      std::string_view key;
      Check(field.unescaped_key().get(key), nullptr, "");
      port.name = key;
      std::string const what = where + ", port " + Quote(port.name);
      if (!names.insert(port.name).second)
        Fail(port.at, what + " is defined twice");
      for (auto inner : Object(field.value(), what)) {
        od::field attribute;
        Check(std::move(inner).get(attribute), nullptr, "");
        std::string_view name;
        Check(attribute.unescaped_key().get(name), nullptr, "");
        if (name == "direction")
          Direction(attribute.value(), port, what);
        else if (name == "bits")
          Bits(attribute.value(), port, what);
        else if (name == "offset")
          Check(attribute.value().get_int64().get(port.offset), nullptr,
                what + ": expected a whole number for \"offset\"");
        else if (name == "upto")
          Upto(attribute.value(), port, what);
        else
          Validate(attribute.value(), 5);
      }
      if (!port.hasDirection)
        Fail(port.at, what + " has no direction");
      if (!port.hasBits || port.width == 0)
        Fail(port.at, what + " has no bits");
      ports.push_back(std::move(port));
    }
    return ports;
  }

  void Direction(od::value value, Port &port, std::string const &what) {
    std::string_view text;
    Check(value.get_string().get(text), nullptr, what + ": expected a string for \"direction\"");
    if (text == "input")
      port.direction = Lum_CellPinDirection::Input;
    else if (text == "output")
      port.direction = Lum_CellPinDirection::Output;
    else if (text == "inout")
      port.direction = Lum_CellPinDirection::Inout;
    else
      Fail(Location(),
           what + ": expected direction \"input\", \"output\" or \"inout\", found " + Quote(text));
    port.hasDirection = true;
  }

  void Bits(od::value value, Port &port, std::string const &what) {
    od::array bits;
    Check(value.get_array().get(bits), nullptr, what + ": expected an array for \"bits\"");
    port.hasBits = true;
    for (auto result : bits) {
      od::value bit;
      Check(std::move(result).get(bit), nullptr, "");
      od::json_type type;
      Check(bit.type().get(type), nullptr, "");
      if (type != od::json_type::number && type != od::json_type::string)
        Fail(Location(), what + ": expected a bit number or a constant in \"bits\"");
      Validate(bit, 6);
      if (++port.width > kMaxPortWidth)
        Fail(port.at, what + " is wider than " + std::to_string(kMaxPortWidth) + " bits");
    }
  }

  void Upto(od::value value, Port &port, std::string const &what) {
    std::int64_t upto = 0;
    Check(value.get_int64().get(upto), nullptr, what + ": expected a number for \"upto\"");
    port.upto = upto != 0;
  }

  void AddPin(Lum_CellData &cell, Port const &port, Lum_CellPinData const &pin,
              std::unordered_set<std::string> &names) {
    if (!names.insert(pin.name).second)
      Fail(port.at, "module " + Quote(cell.name) + ": pin " + Quote(pin.name) +
                        " is named twice (port " + Quote(port.name) + ")");
    cell.pins.push_back(pin);
  }

  void AddPins(Lum_CellData &cell, Port const &port, std::unordered_set<std::string> &names) {
    Lum_CellPinData pin;
    pin.direction = port.direction;
    if (port.width == 1 && port.offset == 0) {
      pin.name = port.name;
      AddPin(cell, port, pin, names);
      return;
    }
    if (port.width > 1)
      ++cell.buses;
    auto const width = static_cast<std::int64_t>(port.width);
    // Declared order: [high:low] unless the port is declared [low:high].
    for (std::int64_t i = 0; i < width; ++i) {
      std::int64_t const index = port.upto ? port.offset + i : port.offset + width - 1 - i;
      pin.name = port.name + "[" + std::to_string(index) + "]";
      AddPin(cell, port, pin, names);
    }
  }

  simdjson::padded_string m_Json;
  std::string const &m_Path;
  od::parser m_Parser;
  od::document m_Doc;
  Lum_CellLibraryData m_Library;
  char const *m_Cursor = nullptr;
  std::size_t m_CursorLine = 1;
  char const *m_CursorLineStart = nullptr;
};

} // namespace

Lum_CellLibraryData Lum_CellModelReader::Read(std::string_view text, std::string const &path) {
  return Walker(text, path).Run();
}

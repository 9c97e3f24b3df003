#include "Lum_NetlistWriter.h"

#include "Lum_ExceptionInvalidFormat.h"
#include "Lum_NetlistNames.h"

#include <cctype>
#include <cerrno>
#include <charconv>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <deque>
#include <fcntl.h>
#include <fstream>
#include <memory>
#include <sstream>
#include <type_traits>
#include <unistd.h>
#include <unordered_map>
#include <unordered_set>

namespace {

// Text for a stream, gathered in a buffer and handed over in large pieces:
// an insertion into a std::ostream, or even an append to a std::string,
// costs far more than a copy into a buffer that is known to have room.
class Buffered {
public:
  explicit Buffered(std::ostream &out) : m_Out(out), m_Text(new char[kSize]) {}
  Buffered(Buffered const &) = delete;
  Buffered &operator=(Buffered const &) = delete;
  ~Buffered() { Flush(); }

  Buffered &operator<<(std::string_view text) {
    if (text.size() > kSize - m_Used) {
      Flush();
      if (text.size() > kSize) {
        m_Out.write(text.data(), static_cast<std::streamsize>(text.size()));
        return *this;
      }
    }
    if (!text.empty()) // (an empty view may have no data)
      std::memcpy(m_Text.get() + m_Used, text.data(), text.size());
    m_Used += text.size();
    return *this;
  }
  Buffered &operator<<(char const *text) { return *this << std::string_view(text); }
  Buffered &operator<<(char c) {
    if (m_Used == kSize)
      Flush();
    m_Text[m_Used++] = c;
    return *this;
  }
  template <typename Integer, typename = std::enable_if_t<std::is_integral_v<Integer> &&
                                                          !std::is_same_v<Integer, char> &&
                                                          !std::is_same_v<Integer, bool>>>
  Buffered &operator<<(Integer value) {
    char digits[24];
    char const *end = std::to_chars(digits, digits + sizeof digits, value).ptr;
    return *this << std::string_view(digits, static_cast<std::size_t>(end - digits));
  }

  void Flush() {
    m_Out.write(m_Text.get(), static_cast<std::streamsize>(m_Used));
    m_Used = 0;
  }

private:
  static constexpr std::size_t kSize = 1 << 16;
  std::ostream &m_Out;
  std::unique_ptr<char[]> m_Text;
  std::size_t m_Used = 0;
};

// ---------------------------------------------------------------------------
// JSON

void JsonString(Buffered &out, std::string_view text, bool trailingBlank = false) {
  out << '"';
  // Runs without a character to escape go out whole.
  std::size_t plain = 0;
  while (plain < text.size() && text[plain] != '"' && text[plain] != '\\' &&
         static_cast<unsigned char>(text[plain]) >= 0x20)
    ++plain;
  out << text.substr(0, plain);
  text.remove_prefix(plain);
  for (char const c : text) {
    auto const byte = static_cast<unsigned char>(c);
    if (c == '"' || c == '\\') {
      out << '\\' << c;
    } else if (byte < 0x20) {
      char escaped[8];
      std::snprintf(escaped, sizeof escaped, "\\u%04x", byte);
      out << escaped;
    } else {
      out << c;
    }
  }
  if (trailingBlank)
    out << ' ';
  out << '"';
}

bool LooksLikeBits(std::string_view text) {
  for (char c : text)
    if (c != '0' && c != '1' && c != 'x' && c != 'z')
      return false;
  return true;
}

void JsonBits(Buffered &out, Lum_NetlistBit const *bits, std::uint32_t width) {
  out << '[';
  for (std::uint32_t i = 0; i < width; ++i) {
    out << (i ? ", " : " ");
    if (Lum_NetlistBits::IsConstant(bits[i]))
      out << '"' << Lum_NetlistBits::ConstantChar(bits[i]) << '"';
    else
      out << bits[i] - 2; // ids from 2 up, as the format numbers them
  }
  out << " ]";
}

void JsonVector(Buffered &out, Lum_Netlist const &netlist, Lum_NetlistModule const &module,
                Lum_NetlistVector const &vector, bool port) {
  out << "        ";
  JsonString(out, netlist.Text(vector.name));
  out << ": {\n";
  if (port)
    out << "          \"direction\": \"" << Lum_NetlistNames::DirectionWord(vector.direction)
        << "\",\n";
  else
    out << "          \"hide_name\": " << (vector.hidden ? 1 : 0) << ",\n";
  out << "          \"bits\": ";
  JsonBits(out, module.Bits(vector.bits), vector.bits.width);
  if (vector.offset)
    out << ",\n          \"offset\": " << vector.offset;
  if (vector.upto)
    out << ",\n          \"upto\": 1";
  if (vector.isSigned)
    out << ",\n          \"signed\": 1";
  out << "\n        }";
}

// ---------------------------------------------------------------------------
// Verilog

bool IsKeyword(std::string_view name) {
  static std::unordered_set<std::string_view> const kKeywords = {
      "always",    "and",     "assign",   "begin",    "buf",         "case",    "casex",
      "casez",     "default", "defparam", "else",     "end",         "endcase", "endfunction",
      "endmodule", "endtask", "for",      "function", "generate",    "genvar",  "if",
      "initial",   "inout",   "input",    "integer",  "localparam",  "module",  "nand",
      "nor",       "not",     "or",       "output",   "parameter",   "real",    "reg",
      "signed",    "supply0", "supply1",  "task",     "tri",         "wire",    "xnor",
      "xor",       "wand",    "wor",      "while",    "endgenerate", "specify", "endspecify"};
  return kKeywords.count(name) != 0;
}

class VerilogModule {
public:
  VerilogModule(Lum_Netlist const &netlist, Lum_NetlistModule const &module, Buffered &out,
                std::string const &file)
      : m_Netlist(netlist), m_Module(module), m_Out(out), m_File(file) {}

  void Write() {
    CollectVectors();
    m_Out << "module " << Name(m_Netlist.Text(m_Module.name)) << "(";
    for (std::size_t i = 0; i < m_Module.ports.size(); ++i)
      m_Out << (i ? ", " : "") << Name(m_Netlist.Text(m_Module.ports[i].name));
    m_Out << ");\n";
    for (std::size_t v = 0; v < m_Vectors.size(); ++v) {
      Lum_NetlistVector const &vector = *m_Vectors[v];
      std::string const range = Range(vector);
      std::string const name = Name(VectorName(v));
      if (v < m_Module.ports.size())
        m_Out << "  " << Lum_NetlistNames::DirectionWord(vector.direction) << " "
              << (vector.isSigned ? "signed " : "") << range << name << ";\n";
      m_Out << "  wire " << (vector.isSigned ? "signed " : "") << range << name << ";\n";
    }
    for (Lum_NetlistCell const &cell : m_Module.cells)
      WriteCell(cell);
    // Every name other than a bit's first is tied to it.
    for (std::size_t v = 0; v < m_Vectors.size(); ++v) {
      Lum_NetlistVector const &vector = *m_Vectors[v];
      Lum_NetlistBit const *bits = m_Module.Bits(vector.bits);
      std::vector<Lum_NetlistBit> tied;
      bool needed = false;
      for (std::uint32_t p = 0; p < vector.bits.width; ++p) {
        Holder const &holder = m_Holders[bits[p]];
        needed = needed || Lum_NetlistBits::IsConstant(bits[p]) || holder.vector != v ||
                 holder.position != p;
      }
      if (!needed)
        continue;
      // Only the bits that are not their own first name.
      for (std::uint32_t p = 0; p < vector.bits.width; ++p) {
        Holder const &holder = m_Holders[bits[p]];
        if (!Lum_NetlistBits::IsConstant(bits[p]) && holder.vector == v && holder.position == p)
          continue;
        m_Out << "  assign " << Name(VectorName(v));
        if (!(vector.bits.width == 1 && vector.offset == 0 && !vector.upto))
          m_Out << "[" << vector.IndexOf(p) << "]";
        m_Out << " = " << Expression(&bits[p], 1) << ";\n";
      }
    }
    m_Out << "endmodule\n\n";
  }

private:
  struct Holder {
    std::size_t vector = SIZE_MAX;
    std::uint32_t position = 0;
  };

  std::string Name(std::string_view name) const {
    std::string text;
    AppendName(text, name);
    return text;
  }

  void AppendName(std::string &text, std::string_view name) const {
    // "\$x" is a user's name "$x" (a bare "$x" a generated one, which
    // Verilog cannot tell apart).
    if (name.size() > 1 && name[0] == '\\' && name[1] == '$')
      name.remove_prefix(1);
    // ASCII classes, checked inline: a call per character costs more than
    // the rest of the name's writing.
    auto letter = [](char c) { return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z'); };
    bool plain = !name.empty() && (letter(name[0]) || name[0] == '_');
    for (char c : name) {
      // White space: the blank, and the controls below it (tab to carriage
      // return among them).
      if (c == ' ' || static_cast<unsigned char>(c) < 0x20)
        throw Lum_ExceptionInvalidFormat(__FILE__, __LINE__, m_File, 0, 0,
                                         "module " + std::string(m_Netlist.Text(m_Module.name)),
                                         "the name \"" + std::string(name) +
                                             "\" holds white space, which Verilog cannot carry");
      plain = plain && (letter(c) || (c >= '0' && c <= '9') || c == '_' || c == '$');
    }
    if (plain && !IsKeyword(name)) {
      text += name;
      return;
    }
    text += '\\';
    text += name;
    text += ' ';
  }

  static std::string Range(Lum_NetlistVector const &vector) {
    if (vector.bits.width == 1 && vector.offset == 0 && !vector.upto)
      return std::string();
    std::int64_t const low = vector.offset;
    std::int64_t const high = low + vector.bits.width - 1;
    return vector.upto ? "[" + std::to_string(low) + ":" + std::to_string(high) + "] "
                       : "[" + std::to_string(high) + ":" + std::to_string(low) + "] ";
  }

  // Ports, then net names not named like a port, then a generated wire for
  // every bit that none covers; each bit's first holder names it.
  void CollectVectors() {
    std::unordered_set<Lum_NetlistName> portNames;
    for (Lum_NetlistVector const &port : m_Module.ports) {
      m_Vectors.push_back(&port);
      portNames.insert(port.name);
    }
    // Visible names before generated ones take the bits first.
    std::unordered_set<std::string_view> taken;
    for (Lum_NetlistVector const &port : m_Module.ports)
      taken.insert(m_Netlist.Text(port.name));
    for (int hidden = 0; hidden < 2; ++hidden)
      for (Lum_NetlistVector const &net : m_Module.netNames)
        if (net.hidden == (hidden == 1) && !portNames.count(net.name)) {
          m_Vectors.push_back(&net);
          taken.insert(m_Netlist.Text(net.name));
        }
    m_Holders.assign(m_Module.numBits, Holder());
    for (std::size_t v = 0; v < m_Vectors.size(); ++v) {
      Lum_NetlistBit const *bits = m_Module.Bits(m_Vectors[v]->bits);
      for (std::uint32_t p = 0; p < m_Vectors[v]->bits.width; ++p)
        if (!Lum_NetlistBits::IsConstant(bits[p]) && m_Holders[bits[p]].vector == SIZE_MAX)
          m_Holders[bits[p]] = {v, p};
    }
    for (Lum_NetlistConnection const &connection : m_Module.connections) {
      Lum_NetlistBit const *bits = m_Module.Bits(connection.bits);
      for (std::uint32_t p = 0; p < connection.bits.width; ++p)
        if (!Lum_NetlistBits::IsConstant(bits[p]) && m_Holders[bits[p]].vector == SIZE_MAX) {
          std::string name = "_n" + std::to_string(bits[p]) + "_";
          while (taken.count(name))
            name += "_";
          m_Generated.emplace_back();
          Lum_NetlistVector &vector = m_Generated.back();
          m_GeneratedNames.push_back(name);
          vector.bits.width = 1;
          m_Holders[bits[p]] = {m_Vectors.size(), 0};
          m_Vectors.push_back(&vector);
          taken.insert(m_GeneratedNames.back());
        }
    }
  }

  std::string_view VectorName(std::size_t v) const {
    if (v >= m_Vectors.size() - m_Generated.size())
      return m_GeneratedNames[v - (m_Vectors.size() - m_Generated.size())];
    return m_Netlist.Text(m_Vectors[v]->name);
  }

  // Bits LSB first as a Verilog expression: whole vectors, part-selects,
  // bit-selects and constants, concatenated from the most significant end.
  std::string Expression(Lum_NetlistBit const *bits, std::uint32_t width) const {
    std::string text;
    AppendExpression(text, bits, width);
    return text;
  }

  void AppendExpression(std::string &text, Lum_NetlistBit const *bits, std::uint32_t width) const {
    std::size_t const start = text.size();
    std::size_t parts = 0;
    std::uint32_t p = width;
    while (p > 0) {
      if (parts++)
        text += ", ";
      std::uint32_t const end = p; // chunk covers [start, end)
      Lum_NetlistBit const bit = bits[p - 1];
      if (Lum_NetlistBits::IsConstant(bit)) {
        std::uint32_t count = 0;
        while (p > count && Lum_NetlistBits::IsConstant(bits[p - 1 - count]))
          ++count;
        AppendNumber(text, count);
        text += "'b";
        for (; count > 0; --count)
          text += Lum_NetlistBits::ConstantChar(bits[--p]);
        continue;
      }
      Holder const &first = m_Holders[bit];
      --p;
      std::uint32_t low = first.position;
      while (p > 0 && !Lum_NetlistBits::IsConstant(bits[p - 1]) &&
             m_Holders[bits[p - 1]].vector == first.vector && low > 0 &&
             m_Holders[bits[p - 1]].position == low - 1) {
        --p;
        --low;
      }
      Lum_NetlistVector const &vector = *m_Vectors[first.vector];
      AppendName(text, VectorName(first.vector));
      bool const whole = low == 0 && first.position == vector.bits.width - 1;
      bool const scalar = vector.bits.width == 1 && vector.offset == 0 && !vector.upto;
      if (!whole && !scalar) {
        text += '[';
        if (end - p != 1) {
          AppendNumber(text, vector.IndexOf(first.position));
          text += ':';
        }
        AppendNumber(text, vector.IndexOf(low));
        text += ']';
      }
    }
    if (parts > 1) {
      text.insert(start, "{ ");
      text += " }";
    }
  }

  template <typename Integer> static void AppendNumber(std::string &text, Integer value) {
    char digits[24];
    char const *end = std::to_chars(digits, digits + sizeof digits, value).ptr;
    text.append(digits, static_cast<std::size_t>(end - digits));
  }

  void WriteCell(Lum_NetlistCell const &cell) {
    m_Text.clear();
    AppendName(m_Text, m_Netlist.Text(cell.type));
    m_Out << "  " << m_Text << " ";
    if (cell.numParameters) {
      m_Out << "#(";
      for (std::uint32_t i = 0; i < cell.numParameters; ++i) {
        Lum_NetlistParameter const &parameter = m_Module.parameters[cell.firstParameter + i];
        m_Text.clear();
        AppendName(m_Text, m_Netlist.Text(parameter.name));
        m_Out << (i ? ",\n    ." : "\n    .") << m_Text << "(";
        std::string_view const value = m_Netlist.Text(parameter.value);
        if (parameter.isString) {
          m_Out << '"';
          for (char c : value) {
            if (c == '"' || c == '\\')
              m_Out << '\\' << c;
            else if (c == '\n')
              m_Out << "\\n";
            else
              m_Out << c;
          }
          m_Out << '"';
        } else {
          m_Out << value.size() << "'b" << value;
        }
        m_Out << ")";
      }
      m_Out << "\n  ) ";
    }
    m_Text.clear();
    AppendName(m_Text, m_Netlist.Text(cell.name));
    m_Out << m_Text << " (";
    for (std::uint32_t c = 0; c < cell.numConnections; ++c) {
      Lum_NetlistConnection const &connection = m_Module.connections[cell.firstConnection + c];
      m_Text.clear();
      AppendName(m_Text, m_Netlist.Text(connection.port));
      m_Text += '(';
      AppendExpression(m_Text, m_Module.Bits(connection.bits), connection.bits.width);
      m_Text += ')';
      m_Out << (c ? ",\n    ." : "\n    .") << m_Text;
    }
    m_Out << "\n  );\n";
  }

  Lum_Netlist const &m_Netlist;
  Lum_NetlistModule const &m_Module;
  Buffered &m_Out;
  std::string const &m_File;
  std::vector<Lum_NetlistVector const *> m_Vectors;
  std::deque<Lum_NetlistVector> m_Generated;
  std::deque<std::string> m_GeneratedNames;
  std::vector<Holder> m_Holders;
  std::string m_Text; // a name or a connection being written, reused
};

} // namespace

void Lum_NetlistWriter::WriteJson(Lum_Netlist const &netlist, std::ostream &stream) {
  Buffered out(stream);
  out << "{\n  \"creator\": \"libLum_Interchange\",\n  \"modules\": {";
  bool firstModule = true;
  for (Lum_NetlistModule const &module : netlist.modules) {
    out << (firstModule ? "\n    " : ",\n    ");
    firstModule = false;
    JsonString(out, netlist.Text(module.name));
    out << ": {\n      \"attributes\": {";
    if (module.top || module.blackbox)
      out << "\n        \"" << (module.top ? "top" : "blackbox")
          << "\": \"00000000000000000000000000000001\"\n      ";
    out << "},\n      \"ports\": {";
    for (std::size_t i = 0; i < module.ports.size(); ++i) {
      out << (i ? ",\n" : "\n");
      JsonVector(out, netlist, module, module.ports[i], true);
    }
    out << (module.ports.empty() ? "" : "\n      ") << "},\n      \"cells\": {";
    for (std::size_t i = 0; i < module.cells.size(); ++i) {
      Lum_NetlistCell const &cell = module.cells[i];
      std::string_view const name = netlist.Text(cell.name);
      out << (i ? ",\n        " : "\n        ");
      JsonString(out, name);
      out << ": {\n          \"hide_name\": " << (!name.empty() && name[0] == '$' ? 1 : 0)
          << ",\n          \"type\": ";
      JsonString(out, netlist.Text(cell.type));
      out << ",\n          \"parameters\": {";
      for (std::uint32_t p = 0; p < cell.numParameters; ++p) {
        Lum_NetlistParameter const &parameter = module.parameters[cell.firstParameter + p];
        out << (p ? ",\n            " : "\n            ");
        JsonString(out, netlist.Text(parameter.name));
        out << ": ";
        std::string_view const value = netlist.Text(parameter.value);
        // A string that would read as bits gets a trailing blank.
        JsonString(out, value, parameter.isString && LooksLikeBits(value));
      }
      out << (cell.numParameters ? "\n          " : "")
          << "},\n          \"attributes\": {},\n          \"port_directions\": {";
      bool firstDirection = true;
      for (std::uint32_t c = 0; c < cell.numConnections; ++c) {
        Lum_NetlistConnection const &connection = module.connections[cell.firstConnection + c];
        if (connection.direction == Lum_NetlistDirection::Unknown)
          continue;
        out << (firstDirection ? "\n            " : ",\n            ");
        firstDirection = false;
        JsonString(out, netlist.Text(connection.port));
        out << ": \"" << Lum_NetlistNames::DirectionWord(connection.direction) << '"';
      }
      out << (firstDirection ? "" : "\n          ") << "},\n          \"connections\": {";
      for (std::uint32_t c = 0; c < cell.numConnections; ++c) {
        Lum_NetlistConnection const &connection = module.connections[cell.firstConnection + c];
        out << (c ? ",\n            " : "\n            ");
        JsonString(out, netlist.Text(connection.port));
        out << ": ";
        JsonBits(out, module.Bits(connection.bits), connection.bits.width);
      }
      out << (cell.numConnections ? "\n          " : "") << "}\n        }";
    }
    out << (module.cells.empty() ? "" : "\n      ") << "},\n      \"netnames\": {";
    for (std::size_t i = 0; i < module.netNames.size(); ++i) {
      out << (i ? ",\n" : "\n");
      JsonVector(out, netlist, module, module.netNames[i], false);
    }
    out << (module.netNames.empty() ? "" : "\n      ") << "}\n    }";
  }
  out << "\n  }\n}\n";
}

void Lum_NetlistWriter::WriteVerilog(Lum_Netlist const &netlist, std::ostream &stream,
                                     std::string const &name) {
  Buffered out(stream);
  out << "// Written by libLum_Interchange\n\n";
  for (Lum_NetlistModule const &module : netlist.modules)
    if (!module.blackbox)
      VerilogModule(netlist, module, out, name).Write();
}

Lum_NetlistWriter::Format Lum_NetlistWriter::FormatOf(std::string const &path) {
  std::size_t const dot = path.rfind('.');
  std::string const extension = dot == std::string::npos ? "" : path.substr(dot);
  return extension == ".v" || extension == ".vg" || extension == ".sv" ? Format::Verilog
                                                                       : Format::Json;
}

void Lum_NetlistWriter::Save(Lum_Netlist const &netlist, std::string const &path, Format format) {
  auto fail = [&path](std::string const &what) {
    throw Lum_ExceptionInvalidFormat(__FILE__, __LINE__, path, 0, 0, "file", what);
  };
  std::string temporary = path + ".XXXXXX";
  int const descriptor = ::mkstemp(temporary.data());
  if (descriptor < 0)
    fail(std::string("cannot be written: ") + std::strerror(errno));
  ::close(descriptor);
  try {
    {
      std::ofstream out(temporary, std::ios::binary | std::ios::trunc);
      if (format == Format::Json)
        WriteJson(netlist, out);
      else
        WriteVerilog(netlist, out, path);
      out.flush();
      if (!out)
        fail("cannot be written (disk full?)");
    }
    // The data reaches the disk before the name points at it.
    int const sync = ::open(temporary.c_str(), O_RDONLY);
    if (sync >= 0) {
      ::fsync(sync);
      ::close(sync);
    }
    if (std::rename(temporary.c_str(), path.c_str()) != 0)
      fail(std::string("cannot be written: ") + std::strerror(errno));
  } catch (...) {
    std::remove(temporary.c_str());
    throw;
  }
}

#pragma once

#include "Lum_InterchangeApi.h"

#include <cstdint>
#include <limits>
#include <memory>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

// A gate-level netlist in memory, as the readers make it and the writers take
// it: modules with ports, cells (instances of library cells or of other
// modules) and named nets. It is compact: every name and value is an
// interned string id, every signal bit a 32-bit id, and the bit lists of a
// module live in one vector, so nothing is allocated per bit.

using Lum_NetlistBit = std::uint32_t;
using Lum_NetlistName = std::uint32_t;

// Bits 0 to 3 are the constants; a module's nets are numbered from 4 up.
namespace Lum_NetlistBits {
constexpr Lum_NetlistBit kZero = 0;
constexpr Lum_NetlistBit kOne = 1;
constexpr Lum_NetlistBit kUndefined = 2; // "x"
constexpr Lum_NetlistBit kFloating = 3;  // "z"
constexpr Lum_NetlistBit kFirstNet = 4;
inline bool IsConstant(Lum_NetlistBit bit) { return bit < kFirstNet; }
// '0', '1', 'x' or 'z' for a constant bit.
inline char ConstantChar(Lum_NetlistBit bit) { return "01xz"[bit & 3U]; }
} // namespace Lum_NetlistBits

enum class Lum_NetlistDirection : std::uint8_t { Unknown, Input, Output, Inout };

// A run of bits in the module's bit vector, LSB first.
struct Lum_NetlistSpan {
  std::uint32_t first = 0;
  std::uint32_t width = 0;
};

// A port or a named net: a vector of bits with its declared index range.
// Bit i (LSB first) has the index offset + i, or offset + width - 1 - i when
// the range is ascending ("upto", [lo:hi]).
struct Lum_NetlistVector {
  Lum_NetlistName name = 0;
  Lum_NetlistSpan bits;
  std::int32_t offset = 0;
  bool upto = false;
  bool isSigned = false;
  bool hidden = false;                                            // a generated name
  Lum_NetlistDirection direction = Lum_NetlistDirection::Unknown; // ports only

  std::int64_t IndexOf(std::uint32_t position) const {
    return upto ? std::int64_t(offset) + bits.width - 1 - position
                : std::int64_t(offset) + position;
  }
};

// A parameter of a cell: a constant (bits, MSB first, of 0 1 x z) or a string.
struct Lum_NetlistParameter {
  Lum_NetlistName name = 0;
  Lum_NetlistName value = 0;
  bool isString = false;
};

struct Lum_NetlistConnection {
  Lum_NetlistName port = 0;
  Lum_NetlistSpan bits;
  Lum_NetlistDirection direction = Lum_NetlistDirection::Unknown; // when the file says
};

struct Lum_NetlistCell {
  Lum_NetlistName name = 0;
  Lum_NetlistName type = 0;
  std::uint32_t firstConnection = 0;
  std::uint32_t numConnections = 0;
  std::uint32_t firstParameter = 0;
  std::uint32_t numParameters = 0;
  // Where the instance is in a Verilog file (0 in a JSON file).
  std::uint32_t line = 0;
  std::uint32_t column = 0;
};

struct Lum_NetlistModule {
  Lum_NetlistName name = 0;
  bool blackbox = false;                              // a cell definition, not a design module
  bool top = false;                                   // marked as the top by the file
  std::uint32_t numBits = Lum_NetlistBits::kFirstNet; // bit ids in use: 0 .. numBits - 1
  std::uint32_t line = 0;
  std::uint32_t column = 0;
  std::vector<Lum_NetlistVector> ports;
  std::vector<Lum_NetlistVector> netNames;
  std::vector<Lum_NetlistCell> cells;
  std::vector<Lum_NetlistConnection> connections;
  std::vector<Lum_NetlistParameter> parameters;
  std::vector<Lum_NetlistBit> bits; // every span above points here

  Lum_NetlistSpan AddBits(std::vector<Lum_NetlistBit> const &more);
  Lum_NetlistSpan AddBits(Lum_NetlistBit const *more, std::uint32_t count);
  Lum_NetlistBit const *Bits(Lum_NetlistSpan span) const { return bits.data() + span.first; }
};

class LUM_INTERCHANGE_API Lum_Netlist {
public:
  static constexpr std::uint32_t kNone = std::numeric_limits<std::uint32_t>::max();

  Lum_Netlist();
  Lum_Netlist(Lum_Netlist const &) = delete;
  Lum_Netlist &operator=(Lum_Netlist const &) = delete;
  Lum_Netlist(Lum_Netlist &&) noexcept;
  Lum_Netlist &operator=(Lum_Netlist &&) noexcept;
  ~Lum_Netlist();

  // Reads a netlist file: Verilog by its extension (.v, .vg, .sv), JSON by
  // .json, and by its content otherwise (JSON begins with "{").
  static Lum_Netlist ReadFile(std::string const &path);

  // The id of the string, the same for equal strings. Id 0 is "".
  Lum_NetlistName Intern(std::string_view text);
  std::string_view Text(Lum_NetlistName name) const { return m_Texts[name]; }
  // The same text, null-terminated, for the host's C-string calls.
  char const *CText(Lum_NetlistName name) const { return m_Texts[name].data(); }
  // The id of the string if it was interned, else kNone.
  Lum_NetlistName Find(std::string_view text) const;

  // The index of the module of that name, or kNone.
  std::uint32_t FindModule(Lum_NetlistName name) const;
  std::uint32_t FindModule(std::string_view name) const;
  // Adds a module; the caller fills it. A name taken already returns kNone.
  std::uint32_t AddModule(Lum_NetlistName name);

  // The top module: the one named, else the one the file marks, else the
  // only design module that no other instantiates. kNone when there is none
  // or when several are candidates.
  std::uint32_t FindTop(std::string_view requested) const;

  // The design modules (not blackboxes) in an order where every module
  // comes after the modules it instantiates. Throws Lum_ExceptionInvalidFormat
  // naming the module when a module instantiates itself, directly or not.
  std::vector<std::uint32_t> BottomUp() const;

  std::vector<Lum_NetlistModule> modules;
  std::string path;      // the file it was read from, for messages
  bool fromJson = false; // positions are JSON paths, not lines

private:
  // An interned text: its id and the low bits of its hash.
  struct Slot {
    Lum_NetlistName id = kNone;
    std::uint32_t hash = 0;
  };
  std::string_view Store(std::string_view text);
  std::size_t Probe(std::string_view text, std::uint32_t hash) const;

  // The texts, each followed by a '\0', in chunks that never move.
  std::vector<std::unique_ptr<char[]>> m_Chunks;
  std::size_t m_ChunkFree = 0;
  char *m_ChunkNext = nullptr;
  std::vector<std::string_view> m_Texts;
  std::vector<Slot> m_Slots; // open addressing, a power of two long
  std::unordered_map<Lum_NetlistName, std::uint32_t> m_Modules;
};

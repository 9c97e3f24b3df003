#include "Lum_LibertyReader.h"

#include "Lum_LibertyScanner.h"

#include <charconv>
#include <cstring>
#include <string>
#include <string_view>
#include <unordered_map>
#include <utility>
#include <vector>

namespace {

using Position = Lum_LibertyScanner::Position;

// The group a statement stands in.
enum class Context {
  Top,
  Library,
  Type,
  Cell,
  CellPin,
  SupplyPin,
  Bus,
  BusPin,
  Bundle,
  BundlePin,
  Skip
};

// The groups the reader interprets, by the group they stand in; every other
// group is skipped without being interpreted (test_cell, ff, latch and
// statetable among them, so their pins never become the cell's).
struct GroupRule {
  Context parent;
  char const *keyword;
  Context child;
};
constexpr GroupRule kGroups[] = {
    {Context::Top, "library", Context::Library},   {Context::Library, "cell", Context::Cell},
    {Context::Library, "type", Context::Type},     {Context::Cell, "pin", Context::CellPin},
    {Context::Cell, "pg_pin", Context::SupplyPin}, {Context::Cell, "bus", Context::Bus},
    {Context::Cell, "bundle", Context::Bundle},    {Context::Cell, "type", Context::Type},
    {Context::Bus, "pin", Context::BusPin},        {Context::Bundle, "pin", Context::BundlePin},
};

// The attributes the reader keeps, by the group they stand in.
enum class Field {
  None,
  Revision,
  Date,
  Area,
  DontUse,
  Direction,
  Function,
  Clock,
  ThreeState,
  BusType,
  BitWidth,
  BitFrom,
  BitTo,
  Downto,
  PgType,
  Members,
};
struct FieldRule {
  Context where;
  char const *name;
  Field field;
};
constexpr FieldRule kFields[] = {
    {Context::Library, "revision", Field::Revision},
    {Context::Library, "date", Field::Date},
    {Context::Type, "bit_width", Field::BitWidth},
    {Context::Type, "bit_from", Field::BitFrom},
    {Context::Type, "bit_to", Field::BitTo},
    {Context::Type, "downto", Field::Downto},
    {Context::Cell, "area", Field::Area},
    {Context::Cell, "dont_use", Field::DontUse},
    {Context::SupplyPin, "pg_type", Field::PgType},
    {Context::Bus, "bus_type", Field::BusType},
    {Context::Bundle, "members", Field::Members},
};
// Pins, buses and bundles all take these.
constexpr char const *kPinFields[] = {"direction", "function", "clock", "three_state"};
constexpr Field kPinFieldIds[] = {Field::Direction, Field::Function, Field::Clock,
                                  Field::ThreeState};

bool IsPinLike(Context c) {
  return c == Context::CellPin || c == Context::BusPin || c == Context::BundlePin ||
         c == Context::Bus || c == Context::Bundle;
}

Context ChildOf(Context parent, std::string_view keyword) {
  for (GroupRule const &rule : kGroups)
    if (rule.parent == parent && keyword == rule.keyword)
      return rule.child;
  return Context::Skip;
}

Field FieldOf(Context where, std::string_view name) {
  if (IsPinLike(where))
    for (std::size_t i = 0; i < std::size(kPinFields); ++i)
      if (name == kPinFields[i])
        return kPinFieldIds[i];
  for (FieldRule const &rule : kFields)
    if (rule.where == where && name == rule.name)
      return rule.field;
  return Field::None;
}

enum class Direction { None, Input, Output, Inout, Internal };

constexpr long kMaxBusWidth = kLumCellMaxBusWidth;

std::string Quote(std::string_view name) { return "\"" + std::string(name) + "\""; }

std::string At(Position at) {
  return "line " + std::to_string(at.line) + ", column " + std::to_string(at.column);
}

// What one pin group (or a bus or bundle itself) says about its pins.
struct PinGroup {
  Position at;
  std::vector<std::string> names;
  Direction direction = Direction::None;
  std::string function;
  std::string clock;
  std::string threeState;

  void Reset(Position where) {
    at = where;
    names.clear();
    direction = Direction::None;
    function.clear();
    clock.clear();
    threeState.clear();
  }
};

struct BusType {
  Position at;
  long width = -1;
  long from = -1;
  long to = -1;
  int downto = -1; // -1: not given
};

class Parser {
public:
  explicit Parser(Lum_LibertyScanner &scanner) : m_S(scanner) {}

  Lum_CellLibraryData Run() {
    m_S.SkipBlanks(false);
    if (m_S.Peek() < 0)
      m_S.Fail(m_S.Where(), "expected 'library (name) {', found an empty file");
    Position const at = m_S.Where();
    if (m_S.Name(false) != "library")
      m_S.Fail(at, "expected 'library (name) {'");
    m_Keyword = "library";
    Statement(Context::Top, at, m_Keyword, 0);
    m_S.SkipBlanks(false);
    if (m_S.Peek() >= 0)
      m_S.Fail(m_S.Where(), "expected the end of the file after the library group, found " +
                                Lum_LibertyScanner::Describe(m_S.Peek()));
    m_Library.format = "liberty";
    return std::move(m_Library);
  }

private:
  // The statements of a group, after its '{', up to and past its '}'.
  void Body(Context context, Position open, unsigned depth) {
    for (;;) {
      m_S.SkipBlanks(false);
      int const c = m_S.Peek();
      if (c == '}') {
        m_S.Advance();
        return;
      }
      if (c < 0)
        m_S.Fail(m_S.Where(),
                 "expected '}' to close the group at " + At(open) + ", found the end of the file");
      if (c == ';') {
        m_S.Advance();
        continue;
      }
      Position const at = m_S.Where();
      std::string_view const name = m_S.Name(false);
      if (name.empty())
        m_S.Fail(at, "expected an attribute or a group, found " + Lum_LibertyScanner::Describe(c));
      m_Keyword.assign(name);
      Statement(context, at, m_Keyword, depth);
    }
  }

  // One attribute or group from after its name. `keyword` is m_Keyword,
  // which the group's own statements reuse: it is not read after Body.
  void Statement(Context context, Position at, std::string const &keyword, unsigned depth) {
    m_S.SkipBlanks(false);
    int c = m_S.Peek();
    if (c == ':' && context != Context::Top) {
      m_S.Advance();
      Attribute(context, keyword);
      return;
    }
    if (c != '(')
      m_S.Fail(m_S.Where(),
               std::string(context == Context::Top ? "expected '('" : "expected ':' or '('") +
                   " after '" + keyword + "', found " + Lum_LibertyScanner::Describe(c));
    Position const open = m_S.Where();
    m_S.Advance();
    Context const child = ChildOf(context, keyword);
    Field const field = FieldOf(context, keyword);
    if (child != Context::Skip || field != Field::None)
      Arguments(open);
    else
      m_S.SkipArgs(open);
    m_S.SkipBlanks(false);
    c = m_S.Peek();
    if (c != '{') {
      if (context == Context::Top)
        m_S.Fail(m_S.Where(),
                 "expected '{' after 'library (...)', found " + Lum_LibertyScanner::Describe(c));
      if (c == ';')
        m_S.Advance();
      if (field == Field::Members) {
        m_Members.assign(m_Args.begin(), m_Args.begin() + static_cast<long>(m_ArgCount));
        m_HasMembers = true;
      }
      return;
    }
    m_S.Advance();
    if (depth + 1 >= Lum_LibertyScanner::kMaxDepth)
      m_S.Fail(at, "groups nested deeper than " + std::to_string(Lum_LibertyScanner::kMaxDepth));
    if (child == Context::Skip) {
      m_S.SkipGroup(at, depth + 1);
      return;
    }
    Begin(child, keyword, at);
    Body(child, at, depth + 1);
    End(child);
  }

  // The arguments of a group or complex attribute, after its '('.
  void Arguments(Position open) {
    m_ArgCount = 0;
    for (;;) {
      m_S.SkipBlanks(false);
      int c = m_S.Peek();
      if (c == ')' && m_ArgCount == 0) {
        m_S.Advance();
        return;
      }
      Position const at = m_S.Where();
      std::string_view const arg = c == '"' ? m_S.Quoted(true) : m_S.Name(true);
      if (arg.empty() && c != '"')
        m_S.Fail(at, "expected a name or ')', found " + Lum_LibertyScanner::Describe(c));
      if (m_ArgCount == m_Args.size())
        m_Args.emplace_back();
      Lum_LibertyScanner::Assign(m_Args[m_ArgCount++], arg);
      m_S.SkipBlanks(false);
      c = m_S.Peek();
      if (c == ')') {
        m_S.Advance();
        return;
      }
      if (c != ',')
        m_S.Fail(m_S.Where(), "expected ',' or ')' to close the '(' at " + At(open) + ", found " +
                                  Lum_LibertyScanner::Describe(c));
      m_S.Advance();
    }
  }

  // A simple attribute, after its ':'.
  void Attribute(Context context, std::string const &name) {
    m_S.SkipBlanks(false);
    Position const at = m_S.Where();
    Field const field = FieldOf(context, name);
    int c = m_S.Peek();
    std::string_view value;
    if (c == '"') {
      value = m_S.Quoted(field != Field::None);
    } else {
      value = m_S.BareValue();
      if (value.empty())
        m_S.Fail(at, "expected a value after '" + name + " :', found " +
                         Lum_LibertyScanner::Describe(c));
    }
    if (field != Field::None) {
      Lum_LibertyScanner::Assign(m_Value, value);
      Keep(context, field, at);
    }
    // A missing ';' is accepted before a newline, a '}' and the end.
    m_S.SkipBlanks(true);
    c = m_S.Peek();
    if (c == ';')
      m_S.Advance();
    else if (c != '\n' && c != '}' && c >= 0)
      m_S.Fail(m_S.Where(), "expected ';' after the value of '" + name + "', found " +
                                Lum_LibertyScanner::Describe(c));
  }

  PinGroup *PinsOf(Context context) {
    switch (context) {
    case Context::CellPin:
    case Context::BusPin:
    case Context::BundlePin:
      return &m_Pin;
    case Context::Bus:
      return &m_BusOwn;
    case Context::Bundle:
      return &m_BundleOwn;
    default:
      return nullptr;
    }
  }

  void Keep(Context context, Field field, Position at) {
    switch (field) {
    case Field::Revision:
      m_Library.revision = m_Value;
      return;
    case Field::Date:
      m_Library.date = m_Value;
      return;
    case Field::Area:
      m_Cell.area = m_Value;
      return;
    case Field::DontUse:
      m_Cell.dontUse = m_Value;
      return;
    case Field::PgType:
      m_PgType = m_Value;
      return;
    case Field::BusType:
      m_BusTypeName = m_Value;
      return;
    case Field::BitWidth:
      m_Type.width = Number(at);
      return;
    case Field::BitFrom:
      m_Type.from = Number(at);
      return;
    case Field::BitTo:
      m_Type.to = Number(at);
      return;
    case Field::Downto:
      if (m_Value != "true" && m_Value != "false")
        m_S.Fail(at, "expected 'true' or 'false' for downto, found " + Quote(m_Value));
      m_Type.downto = m_Value == "true" ? 1 : 0;
      return;
    case Field::Direction:
      PinsOf(context)->direction = ParseDirection(at);
      return;
    case Field::Function:
      PinsOf(context)->function = m_Value;
      return;
    case Field::Clock:
      PinsOf(context)->clock = m_Value;
      return;
    case Field::ThreeState:
      PinsOf(context)->threeState = m_Value;
      return;
    case Field::Members:
    case Field::None:
      return;
    }
  }

  long Number(Position at) {
    long value = -1;
    char const *const end = m_Value.data() + m_Value.size();
    auto const result = std::from_chars(m_Value.data(), end, value);
    if (result.ec != std::errc() || result.ptr != end || value < 0 || value > kMaxBusWidth)
      m_S.Fail(at, "expected a whole number from 0 to " + std::to_string(kMaxBusWidth) +
                       ", found " + Quote(m_Value));
    return value;
  }

  Direction ParseDirection(Position at) {
    if (m_Value == "input")
      return Direction::Input;
    if (m_Value == "output")
      return Direction::Output;
    if (m_Value == "inout")
      return Direction::Inout;
    if (m_Value == "internal")
      return Direction::Internal;
    m_S.Fail(at,
             "expected a direction (input, output, inout or internal), found " + Quote(m_Value));
  }

  std::string Cell() const { return "cell " + Quote(m_Cell.name); }

  std::string const &OneName(Position at, char const *what) {
    if (m_ArgCount != 1 || m_Args[0].empty())
      m_S.Fail(at, std::string("expected one name in '") + what + " (...)'");
    return m_Args[0];
  }

  void Begin(Context context, std::string const &keyword, Position at) {
    switch (context) {
    case Context::Library:
      m_Library.name = OneName(at, "library");
      m_Library.line = at.line;
      m_Library.column = at.column;
      return;
    case Context::Cell: {
      std::string const &name = OneName(at, "cell");
      auto const [it, added] = m_CellNames.emplace(name, at);
      if (!added)
        m_S.Fail(at, "cell " + Quote(name) + " is defined twice (first at " + At(it->second) + ")");
      m_Cell = Lum_CellData();
      m_Cell.name = name;
      m_Cell.line = at.line;
      m_Cell.column = at.column;
      m_PinNames.clear();
      m_CellTypes.clear();
      m_InCell = true;
      return;
    }
    case Context::Type:
      m_TypeName = OneName(at, "type");
      m_Type = BusType();
      m_Type.at = at;
      return;
    case Context::CellPin:
    case Context::BusPin:
    case Context::BundlePin:
    case Context::SupplyPin:
      if (m_ArgCount == 0)
        m_S.Fail(at, "expected at least one name in '" + keyword + " (...)'");
      m_Pin.Reset(at);
      m_Pin.names.assign(m_Args.begin(), m_Args.begin() + static_cast<long>(m_ArgCount));
      m_PgType.clear();
      return;
    case Context::Bus:
      m_BusOwn.Reset(at);
      m_BusOwn.names.assign(1, OneName(at, "bus"));
      m_BusTypeName.clear();
      m_BusMembers.clear();
      return;
    case Context::Bundle:
      m_BundleOwn.Reset(at);
      m_BundleOwn.names.assign(1, OneName(at, "bundle"));
      m_Members.clear();
      m_HasMembers = false;
      m_BundleMembers.clear();
      return;
    case Context::Top:
    case Context::Skip:
      return;
    }
  }

  void End(Context context) {
    switch (context) {
    case Context::Cell:
      m_Library.cells.push_back(std::move(m_Cell));
      m_InCell = false;
      return;
    case Context::Type: {
      auto &types = m_InCell ? m_CellTypes : m_LibraryTypes;
      if (!types.emplace(m_TypeName, m_Type).second)
        m_S.Fail(m_Type.at, "type " + Quote(m_TypeName) + " is defined twice");
      return;
    }
    case Context::CellPin:
      for (std::string const &name : m_Pin.names)
        AddNamed(name, m_Pin);
      return;
    case Context::SupplyPin:
      for (std::string const &name : m_Pin.names) {
        Claim(name, m_Pin.at);
        if (!m_Cell.supplyPins.empty())
          m_Cell.supplyPins += ' ';
        m_Cell.supplyPins += m_PgType.empty() ? name : name + ":" + m_PgType;
        ++m_Cell.supplyPinCount;
      }
      return;
    case Context::BusPin:
      m_BusMembers.push_back(m_Pin);
      return;
    case Context::BundlePin:
      m_BundleMembers.push_back(m_Pin);
      return;
    case Context::Bus:
      EndBus();
      return;
    case Context::Bundle:
      EndBundle();
      return;
    case Context::Top:
    case Context::Library:
    case Context::Skip:
      return;
    }
  }

  // Records a pin name of the current cell; a second use is an error.
  void Claim(std::string const &name, Position at) {
    if (++m_PinCount > kLumCellMaxPins)
      m_S.Fail(at,
               Cell() + ": the library has more than " + std::to_string(kLumCellMaxPins) + " pins");
    auto const [it, added] = m_PinNames.emplace(name, at);
    if (!added)
      m_S.Fail(at, Cell() + ": pin " + Quote(name) + " is declared twice (first at " +
                       At(it->second) + ")");
  }

  void AddPin(std::string const &name, PinGroup const &group, Direction direction) {
    Claim(name, group.at);
    if (direction == Direction::None)
      m_S.Fail(group.at, Cell() + ": pin " + Quote(name) + " has no direction");
    if (direction == Direction::Internal) {
      ++m_Cell.internalPins;
      return;
    }
    Lum_CellPinData pin;
    pin.name = name;
    pin.direction = direction == Direction::Input    ? Lum_CellPinDirection::Input
                    : direction == Direction::Output ? Lum_CellPinDirection::Output
                                                     : Lum_CellPinDirection::Inout;
    pin.function = group.function;
    pin.clock = group.clock;
    pin.threeState = group.threeState;
    m_Cell.pins.push_back(std::move(pin));
  }

  // A name as a pin group gives it: "A", or "A[3:0]" for the bits it spans.
  struct Range {
    std::string_view base;
    long from = -1; // -1: no index
    long to = -1;
  };
  Range ParseRange(std::string_view name, Position at) {
    Range range{name};
    std::size_t const open = name.find('[');
    if (open == std::string_view::npos || name.back() != ']')
      return range;
    std::string_view const inside = name.substr(open + 1, name.size() - open - 2);
    std::size_t const colon = inside.find(':');
    auto number = [&](std::string_view text) {
      long value = -1;
      auto const result = std::from_chars(text.data(), text.data() + text.size(), value);
      if (result.ec != std::errc() || result.ptr != text.data() + text.size() || value < 0 ||
          value > kMaxBusWidth)
        m_S.Fail(at, Cell() + ": expected a bit index from 0 to " + std::to_string(kMaxBusWidth) +
                         " in " + Quote(name));
      return value;
    };
    range.base = name.substr(0, open);
    range.from = number(inside.substr(0, colon));
    range.to = colon == std::string_view::npos ? range.from : number(inside.substr(colon + 1));
    return range;
  }

  static std::string BitName(std::string_view base, long index) {
    return std::string(base) + "[" + std::to_string(index) + "]";
  }

  void AddNamed(std::string const &name, PinGroup const &group) {
    Range const range = ParseRange(name, group.at);
    if (range.from < 0 || range.from == range.to) {
      AddPin(name, group, group.direction);
      return;
    }
    long const step = range.from <= range.to ? 1 : -1;
    for (long i = range.from;; i += step) {
      AddPin(BitName(range.base, i), group, group.direction);
      if (i == range.to)
        break;
    }
  }

  BusType const &FindType(Position at) {
    if (m_BusTypeName.empty())
      m_S.Fail(at, Cell() + ", bus " + Quote(m_BusOwn.names[0]) + ": no bus_type");
    auto it = m_CellTypes.find(m_BusTypeName);
    if (it == m_CellTypes.end()) {
      it = m_LibraryTypes.find(m_BusTypeName);
      if (it == m_LibraryTypes.end())
        m_S.Fail(at, Cell() + ", bus " + Quote(m_BusOwn.names[0]) + ": bus_type " +
                         Quote(m_BusTypeName) + " is not a type defined before it");
    }
    return it->second;
  }

  void EndBus() {
    std::string const &bus = m_BusOwn.names[0];
    Position const at = m_BusOwn.at;
    std::string const prefix = Cell() + ", bus " + Quote(bus);
    BusType type = FindType(at);
    if (type.from < 0 || type.to < 0) {
      if (type.width <= 0)
        m_S.Fail(at, prefix + ": its type " + Quote(m_BusTypeName) + " (" + At(type.at) +
                         ") gives neither bit_from and bit_to nor bit_width");
      bool const down = type.downto != 0;
      type.from = down ? type.width - 1 : 0;
      type.to = down ? 0 : type.width - 1;
    }
    long const span = (type.from > type.to ? type.from - type.to : type.to - type.from) + 1;
    if (type.width >= 0 && type.width != span)
      m_S.Fail(at, prefix + ": its type " + Quote(m_BusTypeName) + " (" + At(type.at) +
                       ") has bit_width " + std::to_string(type.width) + ", but bit_from " +
                       std::to_string(type.from) + " and bit_to " + std::to_string(type.to) +
                       " make " + std::to_string(span) + " bits");
    long const low = type.from < type.to ? type.from : type.to;
    // Each bit starts with the bus's own attributes; member groups override.
    std::vector<PinGroup> bits(static_cast<std::size_t>(span), m_BusOwn);
    std::vector<bool> memberDirection(static_cast<std::size_t>(span), false);
    for (PinGroup const &member : m_BusMembers) {
      for (std::string const &name : member.names) {
        Range range = ParseRange(name, member.at);
        if (range.base != bus)
          m_S.Fail(member.at, prefix + ": member pin " + Quote(name) + " is not a bit of it");
        if (range.from < 0) {
          range.from = type.from;
          range.to = type.to;
        }
        long const first = range.from < range.to ? range.from : range.to;
        long const last = range.from < range.to ? range.to : range.from;
        m_MemberBits += static_cast<std::size_t>(last - first + 1);
        if (m_MemberBits > kLumCellMaxMemberBits)
          m_S.Fail(member.at, prefix + ": bus member pins address more than " +
                                  std::to_string(kLumCellMaxMemberBits) + " bits in all");
        if (first < low || last >= low + span)
          m_S.Fail(member.at, prefix + ": member pin " + Quote(name) + " is outside bits " +
                                  std::to_string(type.from) + " to " + std::to_string(type.to));
        for (long i = first; i <= last; ++i) {
          auto const index = static_cast<std::size_t>(i - low);
          PinGroup &bit = bits[index];
          if (member.direction != Direction::None) {
            if (memberDirection[index] && bit.direction != member.direction)
              m_S.Fail(member.at, prefix + ": bit " + BitName(bus, i) +
                                      " is given two directions (also at " + At(bit.at) + ")");
            bit.direction = member.direction;
            bit.at = member.at;
            memberDirection[index] = true;
          }
          if (!member.function.empty())
            bit.function = member.function;
          if (!member.clock.empty())
            bit.clock = member.clock;
          if (!member.threeState.empty())
            bit.threeState = member.threeState;
        }
      }
    }
    long const step = type.from <= type.to ? 1 : -1;
    for (long i = type.from;; i += step) {
      PinGroup &bit = bits[static_cast<std::size_t>(i - low)];
      bit.at = at;
      AddPin(BitName(bus, i), bit, bit.direction);
      if (i == type.to)
        break;
    }
    ++m_Cell.buses;
  }

  void EndBundle() {
    std::string const prefix = Cell() + ", bundle " + Quote(m_BundleOwn.names[0]);
    if (!m_HasMembers || m_Members.empty())
      m_S.Fail(m_BundleOwn.at, prefix + ": no members");
    // Each member starts with the bundle's own attributes; its pin groups
    // override them.
    std::vector<PinGroup> pins(m_Members.size(), m_BundleOwn);
    std::unordered_map<std::string, std::size_t> index;
    for (std::size_t i = 0; i < m_Members.size(); ++i)
      index.emplace(m_Members[i], i);
    for (PinGroup const &group : m_BundleMembers)
      for (std::string const &name : group.names) {
        auto const found = index.find(name);
        if (found == index.end())
          m_S.Fail(group.at, prefix + ": pin " + Quote(name) + " is not one of its members");
        PinGroup &pin = pins[found->second];
        if (group.direction != Direction::None)
          pin.direction = group.direction;
        if (!group.function.empty())
          pin.function = group.function;
        if (!group.clock.empty())
          pin.clock = group.clock;
        if (!group.threeState.empty())
          pin.threeState = group.threeState;
      }
    for (std::size_t i = 0; i < m_Members.size(); ++i)
      AddPin(m_Members[i], pins[i], pins[i].direction);
  }

  Lum_LibertyScanner &m_S;
  Lum_CellLibraryData m_Library;
  Lum_CellData m_Cell;
  bool m_InCell = false;
  std::unordered_map<std::string, Position> m_CellNames;
  std::unordered_map<std::string, Position> m_PinNames;
  std::unordered_map<std::string, BusType> m_LibraryTypes;
  std::unordered_map<std::string, BusType> m_CellTypes;
  std::string m_TypeName;
  BusType m_Type;
  PinGroup m_Pin;
  std::string m_PgType;
  PinGroup m_BusOwn;
  std::string m_BusTypeName;
  std::vector<PinGroup> m_BusMembers;
  PinGroup m_BundleOwn;
  std::vector<std::string> m_Members;
  bool m_HasMembers = false;
  std::vector<PinGroup> m_BundleMembers;
  std::size_t m_PinCount = 0;
  std::size_t m_MemberBits = 0;
  // Reused for every statement: no allocation per token once warm.
  std::string m_Keyword;
  std::string m_Value;
  std::vector<std::string> m_Args;
  std::size_t m_ArgCount = 0;
};

} // namespace

Lum_CellLibraryData Lum_LibertyReader::Read(Lum_LibertyScanner &scanner) {
  return Parser(scanner).Run();
}

#include "Lum_NetlistExporter.h"

#include "Lum_ExceptionInvalidFormat.h"
#include "Lum_NetlistImporter.h"
#include "Lum_NetlistNames.h"
#include "Lum_TdmBlock.h"
#include "Lum_TdmModel.h"
#include "Lum_TdmPin.h"
#include "Lum_TdmView.h"

#include "Lum_Tlm.h"
#include "Orb_Model.h"
#include "Orb_Property.h"

#include <algorithm>
#include <charconv>
#include <cstring>
#include <deque>
#include <map>
#include <set>
#include <stdexcept>
#include <unordered_map>
#include <unordered_set>

namespace {

using namespace Lum_NetlistProperties;

Lum_NetlistDirection DirectionOf(Orb_Pin::PIN_DIRECTION direction) {
  return direction == Orb_Pin::PIN_OUTPUT          ? Lum_NetlistDirection::Output
         : direction == Orb_Pin::PIN_BIDIRECTIONAL ? Lum_NetlistDirection::Inout
                                                   : Lum_NetlistDirection::Input;
}

std::string PropertyValue(Orb_Persistent const *object, char const *name) {
  Orb_Property const *property = object->GetPropertyByName(name);
  return property ? std::string(property->GetValue()) : std::string();
}

// The declared ports of a module block, in order (empty without NL_PORTS).
std::vector<Lum_NetlistVector> DeclaredPorts(Lum_Netlist &netlist, Orb_Block const *block) {
  std::vector<Lum_NetlistVector> ports;
  Orb_Property const *list = block->GetPropertyByName(kPorts);
  if (!list)
    return ports;
  for (auto const &member : list->GetMembers()) {
    Lum_NetlistVector port;
    if (!Lum_NetlistNames::ParseMeta(member->GetValue(), true, port))
      continue;
    port.name = netlist.Intern(member->GetName());
    ports.push_back(port);
  }
  return ports;
}

// The bit of each signal of a module: open addressing over a power-of-two
// table, as every connection of every cell looks its signal up.
class SignalBits {
public:
  explicit SignalBits(std::size_t count) {
    std::size_t size = 16;
    while (size < 2 * count)
      size *= 2;
    m_Slots.assign(size, Slot());
  }

  void Add(Orb_Signal const *signal, Lum_NetlistBit bit) {
    std::size_t at = Start(signal);
    while (m_Slots[at].signal && m_Slots[at].signal != signal)
      at = (at + 1) & (m_Slots.size() - 1);
    m_Slots[at] = {signal, bit};
  }

  // The bit of a signal of the module (each was added first).
  Lum_NetlistBit At(Orb_Signal const *signal) const {
    std::size_t at = Start(signal);
    while (m_Slots[at].signal != signal) {
      if (!m_Slots[at].signal)
        throw std::out_of_range("a signal of another block");
      at = (at + 1) & (m_Slots.size() - 1);
    }
    return m_Slots[at].bit;
  }

private:
  struct Slot {
    Orb_Signal const *signal = nullptr;
    Lum_NetlistBit bit = 0;
  };

  std::size_t Start(Orb_Signal const *signal) const {
    auto const key = static_cast<std::uint64_t>(reinterpret_cast<std::uintptr_t>(signal));
    return static_cast<std::size_t>((key * 0x9E3779B97F4A7C15ULL) >> 32) & (m_Slots.size() - 1);
  }

  std::vector<Slot> m_Slots;
};

class Exporter {
public:
  explicit Exporter(Lum_TdmView &view) : m_View(view) {}

  Lum_Netlist Run() {
    Lum_TdmBlock *top = m_View.GetBlock();
    if (!top)
      return std::move(m_Netlist);
    m_Queue.push_back({top, top->GetOrbBlock(), m_Netlist.Intern(top->GetName())});
    m_Defined.insert(m_Queue.back().name);
    for (std::size_t i = 0; i < m_Queue.size(); ++i)
      Define(m_Queue[i], i == 0);
    return std::move(m_Netlist);
  }

private:
  struct Pending {
    Lum_TdmBlock *block;   // the contents
    Orb_Block const *meta; // NL_PORTS and NL_NETNAMES
    Lum_NetlistName name;
  };

  // The module name and the block with its declarations, for a child that
  // is an instance of a module; else a null block.
  std::pair<Lum_NetlistName, Orb_Block const *> CellType(Lum_TdmBlock *child) {
    Lum_TlmBlock const *typeBlock = child->GetTypeBlock();
    if (!typeBlock) {
      Orb_Property const *type = child->GetOrbBlock()->GetPropertyByName(kCellType);
      std::string_view const name = type ? type->GetValue() : std::string_view();
      return {m_Netlist.Intern(name.empty() ? std::string_view("$untyped") : name), nullptr};
    }
    // Many cells share a type: its module name is worked out once.
    auto const known = m_TypeNames.find(typeBlock);
    if (known != m_TypeNames.end())
      return known->second;
    return m_TypeNames[typeBlock] = TypeBlockCellType(typeBlock);
  }

  std::pair<Lum_NetlistName, Orb_Block const *> TypeBlockCellType(Lum_TlmBlock const *typeBlock) {
    Orb_Block const *host = typeBlock->GetOrbBlock();
    bool const local = std::strcmp(typeBlock->GetLibrary()->GetLibraryName(),
                                   Lum_TlmLibrary::LOCAL_LIBRARY_NAME) == 0;
    std::string name = PropertyValue(host, kModuleName);
    if (name.empty())
      name = typeBlock->GetName();
    return {m_Netlist.Intern(name), local ? host : nullptr};
  }

  Lum_NetlistBit Fresh(Lum_NetlistModule &module) { return module.numBits++; }

  void Define(Pending const &pending, bool isTop) {
    std::uint32_t const index = m_Netlist.AddModule(pending.name);
    Lum_NetlistModule &module = m_Netlist.modules[index];
    module.top = isTop;
    Orb_Block const *block = pending.block->GetOrbBlock();
    SignalBits bits(block->GetSignals().size());
    // Net names: declared ones first, in their order, then the signals that
    // carry no name under their own. The bits of net n are
    // netBits[netStart[n], netStart[n] + width); m_NetOf gives a net by the
    // id of its name (reset below for the next module).
    std::vector<Lum_NetlistVector> nets;
    std::vector<std::size_t> netStart;
    std::vector<Lum_NetlistBit> netBits;
    auto addNet = [&](Lum_NetlistVector const &net) {
      if (m_NetOf.size() <= net.name)
        m_NetOf.resize(net.name + 1, Lum_Netlist::kNone);
      if (m_NetOf[net.name] != Lum_Netlist::kNone)
        return false;
      m_NetOf[net.name] = static_cast<std::uint32_t>(nets.size());
      nets.push_back(net);
      netStart.push_back(netBits.size());
      netBits.resize(netBits.size() + net.bits.width, Lum_Netlist::kNone);
      return true;
    };
    if (Orb_Property const *list = pending.meta->GetPropertyByName(kNetNames))
      for (auto const &member : list->GetMembers()) {
        Lum_NetlistVector net;
        if (!Lum_NetlistNames::ParseMeta(member->GetValue(), false, net))
          continue;
        net.name = m_Netlist.Intern(member->GetName());
        addNet(net);
      }
    for (Orb_Signal const *signal : block->GetSignals()) {
      Lum_NetlistBit bit = 0;
      Orb_Property const *constantProperty = signal->GetPropertyByName(kConstant);
      std::string_view const constant =
          constantProperty ? constantProperty->GetValue() : std::string_view();
      if (!constant.empty())
        bit = constant == "0"   ? Lum_NetlistBits::kZero
              : constant == "1" ? Lum_NetlistBits::kOne
              : constant == "x" ? Lum_NetlistBits::kUndefined
                                : Lum_NetlistBits::kFloating;
      else
        bit = Fresh(module);
      bits.Add(signal, bit);
      Orb_Property const *names = signal->GetPropertyByName(kNames);
      bool named = false;
      if (names)
        for (std::string const &entry : names->GetStrings()) {
          // "<position> <net name>"
          std::size_t const blank = entry.find(' ');
          if (blank == std::string::npos)
            continue;
          Lum_NetlistName const id = m_Netlist.Find(std::string_view(entry).substr(blank + 1));
          std::uint32_t const net =
              id < m_NetOf.size() ? m_NetOf[id] : static_cast<std::uint32_t>(Lum_Netlist::kNone);
          std::uint32_t position = 0;
          auto const parsed = std::from_chars(entry.data(), entry.data() + blank, position);
          if (net == Lum_Netlist::kNone || parsed.ec != std::errc() ||
              parsed.ptr != entry.data() + blank || position >= nets[net].bits.width)
            continue;
          netBits[netStart[net] + position] = bit;
          named = true;
        }
      if (!named && constant.empty()) {
        Lum_NetlistVector net;
        std::string_view const name = signal->GetName();
        net.name = m_Netlist.Intern(name);
        net.hidden = !name.empty() && name[0] == '$';
        net.bits.width = 1;
        if (addNet(net))
          netBits.back() = bit;
      }
    }
    // Ports: declared ones, or one per pin.
    std::vector<Lum_NetlistVector> ports = DeclaredPorts(m_Netlist, pending.meta);
    if (ports.empty() && !pending.meta->GetPropertyByName(kPorts))
      for (Orb_Pin const *pin : block->GetPins()) {
        Lum_NetlistVector port;
        port.name = m_Netlist.Intern(pin->GetName());
        port.direction = DirectionOf(pin->GetDirection());
        port.bits.width = 1;
        ports.push_back(port);
      }
    for (Lum_NetlistVector &port : ports) {
      std::vector<Lum_NetlistBit> portBits(port.bits.width);
      for (std::uint32_t p = 0; p < port.bits.width; ++p) {
        Orb_Pin const *pin = block->GetPinByName(
            Lum_NetlistNames::BitName(m_Netlist.Text(port.name), port, p).c_str());
        Orb_Signal const *inner = pin ? pin->GetInnerSignal() : nullptr;
        portBits[p] = inner ? bits.At(inner) : Fresh(module);
      }
      port.bits = module.AddBits(portBits);
      module.ports.push_back(port);
    }
    for (Lum_NetlistBit &bit : netBits)
      if (bit == Lum_Netlist::kNone)
        bit = Fresh(module);
    for (std::size_t n = 0; n < nets.size(); ++n) {
      nets[n].bits = module.AddBits(netBits.data() + netStart[n], nets[n].bits.width);
      module.netNames.push_back(nets[n]);
      m_NetOf[nets[n].name] = Lum_Netlist::kNone;
    }
    std::size_t const children = pending.block->GetBlocks().size();
    for (std::size_t i = 0; i < children; ++i)
      AddCell(module, pending.block->GetBlock(i), bits);
  }

  // Where a pin goes: its port (interned) and its index in the port.
  struct PinPlace {
    Lum_TlmPin const *typePin = nullptr;
    Lum_NetlistName port = 0;
    std::int64_t index = 0;
  };

  PinPlace PlaceOf(std::string_view name) {
    auto const [base, index] = Lum_NetlistNames::SplitBitName(name);
    PinPlace place;
    place.port = m_Netlist.Intern(base);
    place.index = index;
    return place;
  }

  // The places of a type block's pins, in its order, worked out once.
  std::vector<PinPlace> const &Places(Lum_TlmBlock const *typeBlock) {
    static std::vector<PinPlace> const none;
    if (!typeBlock)
      return none;
    auto const [found, isNew] = m_Places.try_emplace(typeBlock);
    if (isNew)
      for (std::size_t i = 0; i < typeBlock->GetPins().size(); ++i) {
        Lum_TlmPin const *typePin = typeBlock->GetPin(i);
        found->second.push_back(PlaceOf(typePin->GetName()));
        found->second.back().typePin = typePin;
      }
    return found->second;
  }

  std::vector<Lum_NetlistVector> const &Declared(Orb_Block const *definition) {
    auto const found = m_Declared.find(definition);
    if (found != m_Declared.end())
      return found->second;
    return m_Declared[definition] = DeclaredPorts(m_Netlist, definition);
  }

  void AddCell(Lum_NetlistModule &module, Lum_TdmBlock *child, SignalBits const &bits) {
    auto const [type, definition] = CellType(child);
    if (definition && m_Defined.insert(type).second)
      m_Queue.push_back({child, definition, type});
    Lum_NetlistCell cell;
    cell.name = m_Netlist.Intern(child->GetName());
    cell.type = type;
    Orb_Block const *host = child->GetOrbBlock();
    // Bus pins by port, positions from the module's declaration when there
    // is one, else from the smallest index.
    static std::vector<Lum_NetlistVector> const none;
    std::vector<Lum_NetlistVector> const &declared = !definition ? none : Declared(definition);
    // m_Ports[0, used) are this cell's ports; the rest keep their capacity.
    std::size_t used = 0;
    std::size_t const count = child->GetPins().size();
    std::vector<PinPlace> const &places = Places(child->GetTypeBlock());
    for (std::size_t i = 0; i < count; ++i) {
      // A typed pin stands for its type pin, whatever its own name.
      Lum_TdmPin const *client = child->GetPin(i);
      Orb_Pin const *pin = client->GetOrbPin();
      Lum_TlmPin const *typePin = client->GetTypePin();
      // The pins of a cell are mostly its type block's, in its order: their
      // ports are known. Others are worked out from their names.
      PinPlace place;
      if (typePin && i < places.size() && places[i].typePin == typePin)
        place = places[i];
      else
        place = PlaceOf(typePin ? typePin->GetName() : pin->GetName());
      // Cells have few ports: a search is cheaper than a map.
      std::size_t at = 0;
      while (at < used && m_Ports[at].name != place.port)
        ++at;
      if (at == used) {
        if (used == m_Ports.size())
          m_Ports.emplace_back();
        m_Ports[used].name = place.port;
        m_Ports[used].direction = DirectionOf(pin->GetDirection());
        m_Ports[used++].pins.clear();
      }
      m_Ports[at].pins.emplace_back(place.index, pin);
    }
    cell.firstConnection = static_cast<std::uint32_t>(module.connections.size());
    for (std::size_t at = 0; at < used; ++at) {
      CellPort const &port = m_Ports[at];
      bool connected = false;
      for (auto const &entry : port.pins)
        connected = connected || entry.second->GetSignal();
      if (!connected)
        continue;
      Lum_NetlistVector const *declaration = nullptr;
      for (Lum_NetlistVector const &candidate : declared)
        if (candidate.name == port.name)
          declaration = &candidate;
      std::int64_t low = port.pins.front().first;
      std::int64_t high = low;
      for (auto const &entry : port.pins) {
        low = std::min(low, entry.first);
        high = std::max(high, entry.first);
      }
      std::uint32_t width = static_cast<std::uint32_t>(high - low + 1);
      if (declaration)
        width = declaration->bits.width;
      std::vector<Lum_NetlistBit> &portBits = m_PortBits;
      portBits.assign(width, Lum_Netlist::kNone);
      for (auto const &[index, pin] : port.pins) {
        std::int64_t position = index - low;
        if (declaration)
          position = declaration->upto
                         ? std::int64_t(declaration->offset) + declaration->bits.width - 1 - index
                         : index - declaration->offset;
        if (position < 0 || position >= width)
          continue;
        Orb_Signal const *signal = pin->GetSignal();
        portBits[static_cast<std::size_t>(position)] = signal ? bits.At(signal) : Fresh(module);
      }
      for (Lum_NetlistBit &bit : portBits)
        if (bit == Lum_Netlist::kNone)
          bit = Fresh(module);
      Lum_NetlistConnection connection;
      connection.port = port.name;
      connection.direction = port.direction;
      connection.bits = module.AddBits(portBits);
      module.connections.push_back(connection);
    }
    cell.numConnections =
        static_cast<std::uint32_t>(module.connections.size()) - cell.firstConnection;
    cell.firstParameter = static_cast<std::uint32_t>(module.parameters.size());
    for (char const *name : {kParameters, kStringParameters})
      if (Orb_Property const *list = host->GetPropertyByName(name))
        for (auto const &member : list->GetMembers()) {
          Lum_NetlistParameter parameter;
          parameter.name = m_Netlist.Intern(member->GetName());
          parameter.value = m_Netlist.Intern(member->GetValue());
          parameter.isString = name == kStringParameters;
          module.parameters.push_back(parameter);
        }
    cell.numParameters = static_cast<std::uint32_t>(module.parameters.size()) - cell.firstParameter;
    module.cells.push_back(cell);
  }

  Lum_TdmView &m_View;
  Lum_Netlist m_Netlist;
  std::deque<Pending> m_Queue;
  std::unordered_set<Lum_NetlistName> m_Defined;
  std::unordered_map<Lum_TlmBlock const *, std::pair<Lum_NetlistName, Orb_Block const *>>
      m_TypeNames;
  std::unordered_map<Orb_Block const *, std::vector<Lum_NetlistVector>> m_Declared;
  std::unordered_map<Lum_TlmBlock const *, std::vector<PinPlace>> m_Places;
  std::vector<Lum_NetlistBit> m_PortBits; // reused for every connection
  std::vector<std::uint32_t> m_NetOf;     // a module's nets by name id
  // The pins of a cell by port, reused for every cell.
  struct CellPort {
    Lum_NetlistName name = 0;
    Lum_NetlistDirection direction = Lum_NetlistDirection::Unknown;
    std::vector<std::pair<std::int64_t, Orb_Pin const *>> pins;
  };
  std::vector<CellPort> m_Ports;
};

} // namespace

Lum_Netlist Lum_NetlistExporter::Export(Lum_TdmView &view) {
  Exporter exporter(view);
  return exporter.Run();
}

namespace {

// A name as a part of a file name: no separators, control bytes or blanks.
std::string FileNamePart(std::string_view name) {
  std::string part(name.empty() ? std::string_view("_") : name);
  for (char &c : part)
    if (!std::isalnum(static_cast<unsigned char>(c)) && c != '_' && c != '-' && c != '$' &&
        c != '.')
      c = '_';
  if (part[0] == '.')
    part[0] = '_';
  return part;
}

} // namespace

std::vector<std::string> Lum_NetlistExporter::SaveAll(Lum_TdmModel &model, std::string const &dir,
                                                      Lum_NetlistWriter::Format format) {
  char const *const extension = format == Lum_NetlistWriter::Format::Json ? ".json" : ".v";
  std::string const folder = dir.empty() ? std::string(".") : dir;
  std::vector<std::string> written;
  std::set<std::string> taken;
  for (Orb_DesignMgr *designMgr : model.GetOrbModel()->GetDesignMgrs())
    for (Orb_Design *design : designMgr->GetDesigns())
      for (Orb_View *hostView : design->GetViews()) {
        auto *view = static_cast<Lum_TdmView *>(model.Specialize(hostView));
        if (!view->GetBlock())
          continue;
        std::string name =
            FileNamePart(design->GetName()) + "." + FileNamePart(hostView->GetName());
        if (taken.count(name))
          name.insert(0, FileNamePart(designMgr->GetName()) + ".");
        // Names that still clash (after "_" replaced characters) get "_"s.
        while (!taken.insert(name).second)
          name += '_';
        std::string path = folder;
        path.append("/").append(name).append(extension);
        try {
          Lum_NetlistWriter::Save(Export(*view), path, format);
        } catch (Port::Exception const &e) {
          throw Lum_ExceptionInvalidFormat(__FILE__, __LINE__, path, 0, 0,
                                           "view " + std::string(designMgr->GetName()) + "/" +
                                               design->GetName() + "/" + hostView->GetName(),
                                           e.GetMessage());
        }
        written.push_back(path);
      }
  return written;
}

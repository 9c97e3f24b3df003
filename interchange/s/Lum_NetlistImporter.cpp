#include "Lum_NetlistImporter.h"

#include "Lum_CellLibraryReader.h"
#include "Lum_ExceptionInvalidFormat.h"
#include "Lum_NetlistDrivers.h"
#include "Lum_NetlistNames.h"
#include "Lum_TdmBlock.h"
#include "Lum_TdmDesign.h"
#include "Lum_TdmDesignMgr.h"
#include "Lum_TdmModel.h"
#include "Lum_TdmSchema.h"
#include "Lum_TdmView.h"

#include "Lum_Tlm.h"
#include "Ora_GraftMgr.h"
#include "Orb_Model.h"
#include "Orb_Property.h"

#include <algorithm>
#include <charconv>
#include <unordered_map>
#include <unordered_set>

namespace {

using namespace Lum_NetlistProperties;
constexpr std::uint32_t kNone = Lum_Netlist::kNone;
// Levels of module instances below the top that an import accepts.
constexpr std::uint32_t kMaxDepth = 1000;

Orb_Pin::PIN_DIRECTION PinDirection(Lum_NetlistDirection direction) {
  switch (direction) {
  case Lum_NetlistDirection::Output:
    return Orb_Pin::PIN_OUTPUT;
  case Lum_NetlistDirection::Inout:
    return Orb_Pin::PIN_BIDIRECTIONAL;
  default:
    return Orb_Pin::PIN_INPUT;
  }
}

// What a cell type offers: its pins in the order its blocks carry them, and
// per port the pin of each bit (LSB first).
struct CellType {
  enum Kind { kUnknown, kLibrary, kModule } kind = kUnknown;
  Lum_TlmBlock const *typeBlock = nullptr;
  std::string tag; // "library:type block"
  std::uint32_t module = kNone;
  struct Port {
    std::string name;
    Lum_NetlistDirection direction = Lum_NetlistDirection::Unknown;
    std::vector<std::uint32_t> pins;
  };
  std::vector<Port> ports;
  std::unordered_map<std::string, std::uint32_t> byName;
  // Ports by the netlist's name ids, filled as connections ask.
  mutable std::unordered_map<Lum_NetlistName, CellType::Port const *> byId;
  std::vector<std::pair<std::string, Orb_Pin::PIN_DIRECTION>> pins;
  // Unknown types: how many instances, and the first few.
  std::uint64_t count = 0;
  std::uint64_t made = 0; // instances built
  std::vector<Lum_NetlistName> examples;
};

class Importer {
public:
  Importer(Lum_TdmModel &model, Lum_Netlist const &netlist, Lum_NetlistImportOptions const &options,
           Lum_NetlistImportSummary &summary)
      : m_Model(model), m_Netlist(netlist), m_Options(options), m_Summary(summary),
        m_Graft(false, false) {}

  Lum_TdmView *Run() {
    std::uint32_t const top = m_Netlist.FindTop(m_Options.top);
    if (top == kNone)
      FailFile(m_Options.top.empty()
                   ? "no single top module (name one of the modules that no other instantiates)"
                   : "no design module named " + m_Options.top);
    std::vector<std::uint32_t> order = Reachable(top);
    std::string const topName(m_Netlist.Text(m_Netlist.modules[top].name));
    m_Summary.top = topName;

    Lum_TdmDesign *design = m_Model.CreateDesignMgr(topName.c_str())->CreateDesign(topName.c_str());
    Lum_TdmView *view = design->CreateView(m_Options.viewName.c_str());
    view->CreatePropertyString(Lum_TdmSchema::kDevicePm, m_Options.personality.c_str());
    view->CreatePropertyString(Lum_TdmSchema::kDevicePart, m_Options.part.c_str());
    Orb_Property *list = view->CreatePropertyStringList(Lum_TdmSchema::kTypeLibraries);
    for (std::string const &name : m_Options.libraries)
      list->AppendString(name);
    for (std::string const &name : m_Options.libraries) {
      Lum_TlmLibrary const *library = view->GetLibrary(Port::StringBase<char>(name.c_str()));
      if (!library)
        FailFile("type library " + name + " cannot be loaded");
      m_Libraries.push_back(library);
    }
    PM_PIC const personality(m_Options.personality.c_str(), m_Options.part.c_str(), nullptr);
    m_Local = Lum_TlmLibrary::GetLocalLibrary(m_Model.GetOrbModel(), personality);
    view->AddLocalLibrary();

    // Everything is checked before anything is built.
    ResolveTypes(order);
    ReportUnknown();
    Lum_NetlistDrivers drivers(m_Netlist);
    for (std::uint32_t module : order) {
      CheckConnections(module);
      drivers.Check(module, [this](Lum_NetlistCell const &cell, Lum_NetlistConnection const &c) {
        Lum_NetlistDirection const known = FindPort(m_Types.at(cell.type), c.port)->direction;
        return known != Lum_NetlistDirection::Unknown ? known : c.direction;
      });
    }

    m_ModuleHier.assign(m_Netlist.modules.size(), nullptr);
    for (std::uint32_t module : order)
      if (module != top)
        BuildModuleType(module);
    Lum_TdmBlock *topBlock = view->CreateTopBlock(topName.c_str());
    Lum_NetlistModule const &topModule = m_Netlist.modules[top];
    WriteModuleProperties(topBlock->GetOrbBlock(), topModule);
    for (auto const &[name, direction] : ModulePins(topModule))
      topBlock->GetOrbBlock()->CreatePin(name.c_str(), direction);
    BuildContents(topBlock->GetOrbBlock(), topBlock, topModule);
    m_Summary.modules = order.size();
    for (auto const &entry : m_Types)
      if (entry.second.kind == CellType::kLibrary && entry.second.made)
        m_Summary.instancesByLibrary[entry.second.typeBlock->GetLibrary()->GetLibraryName()] +=
            entry.second.made;
    Flush();
    return view;
  }

private:
  // ---- errors

  [[noreturn]] void FailFile(std::string const &what) const {
    throw Lum_ExceptionInvalidFormat(__FILE__, __LINE__, m_Netlist.path, 0, 0, "netlist", what);
  }

  [[noreturn]] void FailAt(Lum_NetlistModule const &module, Lum_NetlistCell const &cell,
                           Lum_NetlistName port, std::string const &what) const {
    std::string where;
    if (m_Netlist.fromJson) {
      where = "modules." + std::string(m_Netlist.Text(module.name)) + ".cells." +
              std::string(m_Netlist.Text(cell.name));
      if (port != kNone)
        where += ".connections." + std::string(m_Netlist.Text(port));
    } else {
      where = "line " + std::to_string(cell.line) + ", column " + std::to_string(cell.column);
    }
    throw Lum_ExceptionInvalidFormat(__FILE__, __LINE__, m_Netlist.path,
                                     m_Netlist.fromJson ? 0 : cell.line,
                                     m_Netlist.fromJson ? 0 : cell.column, where, what);
  }

  // ---- the modules the top uses, bottom up

  std::vector<std::uint32_t> Reachable(std::uint32_t top) const {
    std::vector<bool> used(m_Netlist.modules.size(), false);
    used[top] = true;
    std::vector<std::uint32_t> stack{top};
    while (!stack.empty()) {
      std::uint32_t const module = stack.back();
      stack.pop_back();
      for (Lum_NetlistCell const &cell : m_Netlist.modules[module].cells) {
        std::uint32_t const child = m_Netlist.FindModule(cell.type);
        if (child != kNone && !m_Netlist.modules[child].blackbox && !used[child]) {
          used[child] = true;
          stack.push_back(child);
        }
      }
    }
    std::vector<std::uint32_t> order;
    for (std::uint32_t module : m_Netlist.BottomUp())
      if (used[module])
        order.push_back(module);
    // Each level is grafted into the one above: bound the depth, so that a
    // pathological nesting is refused instead of copied without end.
    std::vector<std::uint32_t> depth(m_Netlist.modules.size(), 0);
    for (std::uint32_t module : order) {
      for (Lum_NetlistCell const &cell : m_Netlist.modules[module].cells) {
        std::uint32_t const child = m_Netlist.FindModule(cell.type);
        if (child != kNone && !m_Netlist.modules[child].blackbox)
          depth[module] = std::max(depth[module], depth[child] + 1);
      }
      if (depth[module] > kMaxDepth)
        FailFile("modules nest deeper than " + std::to_string(kMaxDepth) + " levels below " +
                 std::string(m_Netlist.Text(m_Netlist.modules[module].name)));
    }
    return order;
  }

  // ---- cell types

  // Pin names and directions of a module's ports, in port order.
  std::vector<std::pair<std::string, Orb_Pin::PIN_DIRECTION>>
  ModulePins(Lum_NetlistModule const &module) const {
    std::vector<std::pair<std::string, Orb_Pin::PIN_DIRECTION>> pins;
    for (Lum_NetlistVector const &port : module.ports)
      for (std::uint32_t p = 0; p < port.bits.width; ++p)
        pins.emplace_back(Lum_NetlistNames::BitName(m_Netlist.Text(port.name), port, p),
                          PinDirection(port.direction));
    return pins;
  }

  void AddPort(CellType &type, std::string name, Lum_NetlistDirection direction) {
    type.byName.emplace(name, static_cast<std::uint32_t>(type.ports.size()));
    type.ports.push_back({std::move(name), direction, {}});
  }

  void DescribeModule(CellType &type, std::uint32_t index) {
    Lum_NetlistModule const &module = m_Netlist.modules[index];
    type.module = index;
    type.pins = ModulePins(module);
    std::uint32_t pin = 0;
    for (Lum_NetlistVector const &port : module.ports) {
      AddPort(type, std::string(m_Netlist.Text(port.name)), port.direction);
      for (std::uint32_t p = 0; p < port.bits.width; ++p)
        type.ports.back().pins.push_back(pin++);
    }
  }

  // A library cell's ports from its pins: "B[3]" is bit 3 of port B, any
  // other name a one-bit port.
  void DescribeLibraryCell(CellType &type) {
    std::vector<std::vector<std::pair<std::int64_t, std::uint32_t>>> bits;
    std::uint32_t index = 0;
    for (Orb_Pin const *pin : type.typeBlock->GetPins()) {
      std::string const name = pin->GetName();
      Orb_Pin::PIN_DIRECTION const direction = pin->GetDirection();
      type.pins.emplace_back(name, direction);
      auto const [view, bit] = Lum_NetlistNames::SplitBitName(name);
      std::string const base(view);
      auto const found = type.byName.find(base);
      if (found == type.byName.end()) {
        // A tri-state output shares its net with others, as an inout does.
        bool const shared = direction == Orb_Pin::PIN_BIDIRECTIONAL ||
                            pin->GetPropertyByName(Lum_CellLibraryNames::kThreeState);
        AddPort(type, base,
                shared                             ? Lum_NetlistDirection::Inout
                : direction == Orb_Pin::PIN_OUTPUT ? Lum_NetlistDirection::Output
                                                   : Lum_NetlistDirection::Input);
        bits.emplace_back();
      }
      bits[type.byName[base]].emplace_back(bit, index++);
    }
    for (std::size_t p = 0; p < type.ports.size(); ++p) {
      std::sort(bits[p].begin(), bits[p].end());
      for (auto const &entry : bits[p])
        type.ports[p].pins.push_back(entry.second);
    }
  }

  void ResolveTypes(std::vector<std::uint32_t> const &order) {
    for (std::uint32_t index : order) {
      Lum_NetlistModule const &module = m_Netlist.modules[index];
      for (Lum_NetlistCell const &cell : module.cells) {
        auto const [entry, isNew] = m_Types.try_emplace(cell.type);
        CellType &type = entry->second;
        if (isNew)
          Classify(type, cell.type);
        if (type.kind == CellType::kUnknown) {
          ++type.count;
          if (type.examples.size() < 3)
            type.examples.push_back(cell.name);
          if (m_Options.blackboxUnknown)
            LearnUnknownPorts(type, module, cell);
        }
      }
    }
  }

  void Classify(CellType &type, Lum_NetlistName name) {
    std::uint32_t const module = m_Netlist.FindModule(name);
    if (module != kNone && !m_Netlist.modules[module].blackbox) {
      type.kind = CellType::kModule;
      DescribeModule(type, module);
      return;
    }
    Port::StringBase<char> const text(std::string(m_Netlist.Text(name)).c_str());
    for (Lum_TlmLibrary const *library : m_Libraries)
      if (Lum_TlmBlock const *typeBlock = library->GetTypeBlock(text)) {
        type.kind = CellType::kLibrary;
        type.typeBlock = typeBlock;
        type.tag = typeBlock->GetUniqueTag().c_str();
        DescribeLibraryCell(type);
        return;
      }
    // A cell definition in the netlist itself gives the ports of an
    // unknown cell.
    if (module != kNone)
      DescribeModule(type, module);
  }

  // An unknown cell without a definition: its ports are the union of what
  // its instances connect.
  void LearnUnknownPorts(CellType &type, Lum_NetlistModule const &module,
                         Lum_NetlistCell const &cell) {
    if (type.module != kNone)
      return;
    for (std::uint32_t c = 0; c < cell.numConnections; ++c) {
      Lum_NetlistConnection const &connection = module.connections[cell.firstConnection + c];
      std::string name(m_Netlist.Text(connection.port));
      auto const found = type.byName.find(name);
      if (found != type.byName.end()) {
        CellType::Port &port = type.ports[found->second];
        if (port.direction == Lum_NetlistDirection::Unknown)
          port.direction = connection.direction;
        for (std::uint32_t p = static_cast<std::uint32_t>(port.pins.size());
             p < connection.bits.width; ++p)
          port.pins.push_back(kNone);
        continue;
      }
      AddPort(type, name, connection.direction);
      type.ports.back().pins.assign(connection.bits.width, kNone);
    }
  }

  void ReportUnknown() {
    std::vector<std::pair<std::string, CellType *>> unknown;
    for (auto &[name, type] : m_Types)
      if (type.kind == CellType::kUnknown)
        unknown.emplace_back(std::string(m_Netlist.Text(name)), &type);
    if (unknown.empty())
      return;
    std::sort(unknown.begin(), unknown.end());
    if (!m_Options.blackboxUnknown) {
      std::string text = std::to_string(unknown.size()) + " cell type" +
                         (unknown.size() == 1 ? " is" : "s are") + " in no type library:";
      for (auto const &[name, type] : unknown) {
        text += " " + name + " (" + std::to_string(type->count) + " instance" +
                (type->count == 1 ? "" : "s") + ", e.g.";
        for (std::size_t i = 0; i < type->examples.size(); ++i)
          text += std::string(i ? ", " : " ") + std::string(m_Netlist.Text(type->examples[i]));
        text += ");";
      }
      text.back() = '.';
      FailFile(text + " Give the libraries that define them, or import them as untyped blocks "
                      "with --blackbox-unknown");
    }
    // Pins of unknown cells: every bit of every port seen, in port order.
    for (auto const &entry : unknown) {
      CellType &type = *entry.second;
      if (type.module != kNone)
        continue;
      std::uint32_t pin = 0;
      for (CellType::Port &port : type.ports)
        for (std::uint32_t p = 0; p < port.pins.size(); ++p) {
          port.pins[p] = pin++;
          type.pins.emplace_back(port.pins.size() == 1 ? port.name
                                                       : port.name + "[" + std::to_string(p) + "]",
                                 PinDirection(port.direction));
        }
    }
  }

  CellType::Port const *FindPort(CellType const &type, Lum_NetlistName id) const {
    auto const known = type.byId.find(id);
    if (known != type.byId.end())
      return known->second;
    return type.byId[id] = FindPort(type, m_Netlist.Text(id));
  }

  CellType::Port const *FindPort(CellType const &type, std::string_view name) const {
    auto const found = type.byName.find(std::string(name));
    if (found != type.byName.end())
      return &type.ports[found->second];
    // "$<k>": the k-th port, from a positional connection.
    if (name.size() > 1 && name[0] == '$' &&
        name.find_first_not_of("0123456789", 1) == std::string_view::npos) {
      std::size_t const position = std::stoul(std::string(name.substr(1)));
      if (position < type.ports.size())
        return &type.ports[position];
    }
    return nullptr;
  }

  void CheckConnections(std::uint32_t index) const {
    Lum_NetlistModule const &module = m_Netlist.modules[index];
    for (Lum_NetlistCell const &cell : module.cells) {
      CellType const &type = m_Types.at(cell.type);
      for (std::uint32_t c = 0; c < cell.numConnections; ++c) {
        Lum_NetlistConnection const &connection = module.connections[cell.firstConnection + c];
        CellType::Port const *port = FindPort(type, connection.port);
        if (!port)
          FailAt(module, cell, connection.port,
                 "cell type " + std::string(m_Netlist.Text(cell.type)) + " has no port " +
                     std::string(m_Netlist.Text(connection.port)));
        if (port->pins.size() != connection.bits.width)
          FailAt(module, cell, connection.port,
                 std::to_string(connection.bits.width) + " bits connected to port " + port->name +
                     " of " + std::string(m_Netlist.Text(cell.type)) + ", which has " +
                     std::to_string(port->pins.size()));
      }
    }
  }

  // ---- building

  void WriteModuleProperties(Orb_Block *block, Lum_NetlistModule const &module) const {
    Orb_Property *ports = block->CreatePropertyList(kPorts);
    for (Lum_NetlistVector const &port : module.ports)
      ports->CreatePropertyString(m_Netlist.CText(port.name),
                                  Lum_NetlistNames::PortMeta(port).c_str());
    Orb_Property *nets = block->CreatePropertyList(kNetNames);
    for (Lum_NetlistVector const &net : module.netNames)
      nets->CreatePropertyString(m_Netlist.CText(net.name), Lum_NetlistNames::NetMeta(net).c_str());
  }

  void BuildModuleType(std::uint32_t index) {
    Lum_NetlistModule const &module = m_Netlist.modules[index];
    std::string const name(m_Netlist.Text(module.name));
    std::string const typeName = Lum_NetlistNames::TypeBlockName(name);
    Lum_TlmBlock *typeBlock = m_Local->GetTypeBlock(Port::StringBase<char>(typeName.c_str()));
    if (typeBlock)
      FailFile("module " + name + " and another have the same type block name " + typeName);
    typeBlock = m_Local->CreateTypeBlock(typeName.c_str());
    if (typeName != name)
      typeBlock->GetOrbBlock()->CreatePropertyString(kModuleName, name.c_str());
    WriteModuleProperties(typeBlock->GetOrbBlock(), module);
    Lum_TlmBlock *hier = typeBlock->CreateHier(m_Options.viewName.c_str());
    for (auto const &[pin, direction] : ModulePins(module)) {
      typeBlock->GetOrbBlock()->CreatePin(pin.c_str(), direction);
      hier->GetOrbBlock()->CreatePin(pin.c_str(), direction);
    }
    CellType &type = m_Types.at(module.name);
    type.typeBlock = typeBlock;
    type.tag = typeBlock->GetUniqueTag().c_str();
    m_ModuleHier[index] = hier->GetOrbBlock();
    BuildContents(hier->GetOrbBlock(), nullptr, module);
  }

  Orb_Signal *ConstantSignal(Orb_Block *block, Lum_NetlistBit bit) {
    char const name[] = {'$', 'c', 'o', 'n', 's', 't', Lum_NetlistBits::ConstantChar(bit), 0};
    if (Orb_Signal *signal = block->GetSignalByName(name))
      return signal;
    Orb_Signal *signal = block->CreateSignal(name);
    char const value[] = {Lum_NetlistBits::ConstantChar(bit), 0};
    signal->CreatePropertyString(kConstant, value);
    ++m_Summary.nets;
    return signal;
  }

  // The signal of a bit when it is made already (a constant's is made on
  // first use), else null.
  Orb_Signal *Made(Orb_Block *block, std::vector<Orb_Signal *> const &signals, Lum_NetlistBit bit) {
    return Lum_NetlistBits::IsConstant(bit) ? ConstantSignal(block, bit) : signals[bit];
  }

  // The signal of a bit, made on first use under m_Name (or, when a signal
  // has that name already, a unique variant of it).
  Orb_Signal *Signal(Orb_Block *block, std::vector<Orb_Signal *> &signals, Lum_NetlistBit bit) {
    if (Orb_Signal *made = Made(block, signals, bit))
      return made;
    if (block->GetSignalByName(m_Name.c_str()))
      AppendNumber(m_Name.append(1, '$'), bit);
    signals[bit] = block->CreateSignal(m_Name.c_str());
    ++m_Summary.nets;
    return signals[bit];
  }

  static std::string &AppendNumber(std::string &text, std::int64_t number) {
    char digits[24];
    char const *end = std::to_chars(digits, digits + sizeof digits, number).ptr;
    return text.append(digits, static_cast<std::size_t>(end - digits));
  }

  // m_Name becomes the name of bit `position` of the vector.
  void NameBit(std::string_view name, Lum_NetlistVector const &vector, std::uint32_t position) {
    m_Name.assign(name);
    if (vector.bits.width == 1 && vector.offset == 0 && !vector.upto)
      return;
    AppendNumber(m_Name.append(1, '['), vector.IndexOf(position)).append(1, ']');
  }

  void BuildContents(Orb_Block *block, Lum_TdmBlock *client, Lum_NetlistModule const &module) {
    std::vector<Orb_Signal *> signals(module.numBits, nullptr);
    // Nets take the first visible name they have, then a generated one.
    for (int hidden = 0; hidden < 2; ++hidden)
      for (Lum_NetlistVector const &net : module.netNames) {
        if (net.hidden != (hidden == 1))
          continue;
        std::string_view const name = m_Netlist.Text(net.name);
        Lum_NetlistBit const *bits = module.Bits(net.bits);
        for (std::uint32_t p = 0; p < net.bits.width; ++p) {
          // The name is made only for a signal still to make.
          Orb_Signal *signal = Made(block, signals, bits[p]);
          if (!signal) {
            NameBit(name, net, p);
            signal = Signal(block, signals, bits[p]);
          }
          Orb_Property *names = signal->GetPropertyByName(kNames);
          if (!names)
            names = signal->CreatePropertyStringList(kNames);
          // "<position> <name>", made in one allocation the property keeps.
          char digits[16];
          char *end = std::to_chars(digits, digits + sizeof digits - 1, p).ptr;
          *end++ = ' ';
          std::string entry;
          entry.reserve(static_cast<std::size_t>(end - digits) + name.size());
          entry.append(digits, end).append(name);
          names->AppendString(std::move(entry));
        }
      }
    // Ports: pins in port order, each bit connected inside.
    std::uint32_t pin = 0;
    auto const pins = block->GetPins();
    for (Lum_NetlistVector const &port : module.ports) {
      Lum_NetlistBit const *bits = module.Bits(port.bits);
      for (std::uint32_t p = 0; p < port.bits.width; ++p, ++pin) {
        Orb_Signal *signal = Made(block, signals, bits[p]);
        if (!signal) {
          NameBit(m_Netlist.Text(port.name), port, p);
          signal = Signal(block, signals, bits[p]);
        }
        pins[pin]->ConnectInner(signal);
      }
    }
    for (Lum_NetlistCell const &cell : module.cells) {
      CellType &type = m_Types.at(cell.type);
      Orb_Block *child = MakeChild(block, client, type, cell);
      AddParameters(child, module, cell);
      auto const childPins = child->GetPins();
      for (std::uint32_t c = 0; c < cell.numConnections; ++c) {
        Lum_NetlistConnection const &connection = module.connections[cell.firstConnection + c];
        CellType::Port const *port = FindPort(type, connection.port);
        Lum_NetlistBit const *bits = module.Bits(connection.bits);
        for (std::uint32_t p = 0; p < connection.bits.width; ++p) {
          Lum_NetlistBit const bit = bits[p];
          Orb_Signal *signal = Made(block, signals, bit);
          if (!signal) {
            AppendNumber(m_Name.assign("$n"), bit);
            signal = Signal(block, signals, bit);
          }
          childPins[port->pins[p]]->Connect(signal);
        }
      }
      if (++m_Pending == 4096)
        Flush();
    }
  }

  Orb_Block *MakeChild(Orb_Block *block, Lum_TdmBlock *client, CellType &type,
                       Lum_NetlistCell const &cell) {
    char const *name = m_Netlist.CText(cell.name);
    if (type.kind == CellType::kLibrary)
      ++type.made;
    else if (type.kind == CellType::kModule)
      ++m_Summary.moduleInstances;
    else
      ++m_Summary.untyped;
    if (client && type.kind != CellType::kUnknown)
      return client->CreateTypedBlock(name, type.typeBlock, type.kind == CellType::kModule, true)
          ->GetOrbBlock();
    Orb_Block *child = block->CreateBlock(name);
    if (type.kind == CellType::kUnknown)
      child->CreatePropertyString(kCellType, m_Netlist.CText(cell.type));
    else
      child->CreatePropertyString(Lum_TdmSchema::kBlockType, type.tag.c_str());
    for (auto const &[pin, direction] : type.pins)
      child->CreatePin(pin.c_str(), direction);
    if (type.kind == CellType::kModule)
      m_Graft.Graft(m_ModuleHier[type.module], child);
    return child;
  }

  void AddParameters(Orb_Block *child, Lum_NetlistModule const &module,
                     Lum_NetlistCell const &cell) const {
    Orb_Property *bits = nullptr;
    Orb_Property *strings = nullptr;
    for (std::uint32_t i = 0; i < cell.numParameters; ++i) {
      Lum_NetlistParameter const &parameter = module.parameters[cell.firstParameter + i];
      Orb_Property *&list = parameter.isString ? strings : bits;
      if (!list)
        list = child->CreatePropertyList(parameter.isString ? kStringParameters : kParameters);
      list->CreatePropertyString(m_Netlist.CText(parameter.name), m_Netlist.CText(parameter.value));
    }
  }

  void Flush() {
    if (m_Options.progress && m_Pending)
      m_Options.progress(m_Pending);
    m_Pending = 0;
  }

  Lum_TdmModel &m_Model;
  Lum_Netlist const &m_Netlist;
  Lum_NetlistImportOptions const &m_Options;
  Lum_NetlistImportSummary &m_Summary;
  Ora_GraftMgr m_Graft;
  std::vector<Lum_TlmLibrary const *> m_Libraries;
  Lum_TlmLibrary *m_Local = nullptr;
  std::unordered_map<Lum_NetlistName, CellType> m_Types;
  std::vector<Orb_Block *> m_ModuleHier;
  std::string m_Name;
  std::uint64_t m_Pending = 0;
};

} // namespace

Lum_TdmView *Lum_NetlistImporter::Import(Lum_TdmModel &model, Lum_Netlist const &netlist,
                                         Lum_NetlistImportOptions const &options,
                                         Lum_NetlistImportSummary *summary) {
  Lum_NetlistImportSummary local;
  Importer importer(model, netlist, options, summary ? *summary : local);
  return importer.Run();
}

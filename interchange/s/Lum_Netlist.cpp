#include "Lum_Netlist.h"

#include "Lum_ExceptionInvalidFormat.h"

#include <utility>

Lum_NetlistSpan Lum_NetlistModule::AddBits(std::vector<Lum_NetlistBit> const &more) {
  Lum_NetlistSpan span;
  span.first = static_cast<std::uint32_t>(bits.size());
  span.width = static_cast<std::uint32_t>(more.size());
  bits.insert(bits.end(), more.begin(), more.end());
  return span;
}

Lum_Netlist::Lum_Netlist() { Intern(""); }
Lum_Netlist::Lum_Netlist(Lum_Netlist &&) noexcept = default;
Lum_Netlist &Lum_Netlist::operator=(Lum_Netlist &&) noexcept = default;
Lum_Netlist::~Lum_Netlist() = default;

Lum_NetlistName Lum_Netlist::Intern(std::string_view text) {
  auto const found = m_Ids.find(text);
  if (found != m_Ids.end())
    return found->second;
  auto const id = static_cast<Lum_NetlistName>(m_Texts.size());
  m_Texts.emplace_back(text);
  // The deque never moves its strings, so the key can view the stored copy.
  m_Ids.emplace(std::string_view(m_Texts.back()), id);
  return id;
}

Lum_NetlistName Lum_Netlist::Find(std::string_view text) const {
  auto const found = m_Ids.find(text);
  return found == m_Ids.end() ? kNone : found->second;
}

std::uint32_t Lum_Netlist::FindModule(Lum_NetlistName name) const {
  auto const found = m_Modules.find(name);
  return found == m_Modules.end() ? kNone : found->second;
}

std::uint32_t Lum_Netlist::FindModule(std::string_view name) const {
  Lum_NetlistName const id = Find(name);
  return id == kNone ? kNone : FindModule(id);
}

std::uint32_t Lum_Netlist::AddModule(Lum_NetlistName name) {
  auto const index = static_cast<std::uint32_t>(modules.size());
  if (!m_Modules.emplace(name, index).second)
    return kNone;
  modules.emplace_back();
  modules.back().name = name;
  return index;
}

std::uint32_t Lum_Netlist::FindTop(std::string_view requested) const {
  if (!requested.empty()) {
    std::uint32_t const index = FindModule(requested);
    return index != kNone && !modules[index].blackbox ? index : kNone;
  }
  std::uint32_t marked = kNone;
  for (std::uint32_t i = 0; i < modules.size(); ++i)
    if (modules[i].top && !modules[i].blackbox)
      marked = marked == kNone ? i : kNone - 1;
  if (marked != kNone)
    return marked == kNone - 1 ? kNone : marked;
  std::vector<bool> used(modules.size(), false);
  for (Lum_NetlistModule const &module : modules)
    for (Lum_NetlistCell const &cell : module.cells) {
      std::uint32_t const child = FindModule(cell.type);
      if (child != kNone)
        used[child] = true;
    }
  std::uint32_t top = kNone;
  for (std::uint32_t i = 0; i < modules.size(); ++i)
    if (!modules[i].blackbox && !used[i]) {
      if (top != kNone)
        return kNone;
      top = i;
    }
  return top;
}

std::vector<std::uint32_t> Lum_Netlist::BottomUp() const {
  // Depth-first with an explicit stack, so that deep nesting costs heap, not
  // call stack. 0: not seen, 1: on the stack, 2: done.
  std::vector<std::uint8_t> state(modules.size(), 0);
  std::vector<std::uint32_t> order;
  std::vector<std::pair<std::uint32_t, std::uint32_t>> stack; // module, next cell
  for (std::uint32_t root = 0; root < modules.size(); ++root) {
    if (state[root] != 0 || modules[root].blackbox)
      continue;
    stack.emplace_back(root, 0);
    state[root] = 1;
    while (!stack.empty()) {
      auto &[module, next] = stack.back();
      Lum_NetlistModule const &current = modules[module];
      if (next == current.cells.size()) {
        state[module] = 2;
        order.push_back(module);
        stack.pop_back();
        continue;
      }
      Lum_NetlistCell const &cell = current.cells[next++];
      std::uint32_t const child = FindModule(cell.type);
      if (child == kNone || modules[child].blackbox || state[child] == 2)
        continue;
      if (state[child] == 1) {
        std::string const where = fromJson ? "modules." + std::string(Text(current.name)) +
                                                 ".cells." + std::string(Text(cell.name))
                                           : "line " + std::to_string(cell.line) + ", column " +
                                                 std::to_string(cell.column);
        throw Lum_ExceptionInvalidFormat(
            __FILE__, __LINE__, path, fromJson ? 0 : cell.line, fromJson ? 0 : cell.column, where,
            "module " + std::string(Text(modules[child].name)) +
                " instantiates itself (through instance " + std::string(Text(cell.name)) +
                " of module " + std::string(Text(current.name)) + ")");
      }
      state[child] = 1;
      stack.emplace_back(child, 0);
    }
  }
  return order;
}

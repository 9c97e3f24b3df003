#include "Lum_Netlist.h"

#include "Lum_ExceptionInvalidFormat.h"
#include "Lum_NetlistJsonReader.h"
#include "Lum_NetlistVerilogReader.h"

#include <algorithm>
#include <cctype>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <stdexcept>
#include <utility>

namespace {

bool IsVerilog(std::string const &path) {
  std::string const extension = std::filesystem::path(path).extension().string();
  if (extension == ".v" || extension == ".vg" || extension == ".sv")
    return true;
  if (extension == ".json")
    return false;
  std::ifstream in(path, std::ios::binary);
  char c = 0;
  while (in.get(c) && std::isspace(static_cast<unsigned char>(c)))
    ;
  return c != '{';
}

} // namespace

Lum_Netlist Lum_Netlist::ReadFile(std::string const &path) {
  return IsVerilog(path) ? Lum_NetlistVerilogReader::Read(path) : Lum_NetlistJsonReader::Read(path);
}

Lum_NetlistSpan Lum_NetlistModule::AddBits(std::vector<Lum_NetlistBit> const &more) {
  return AddBits(more.data(), static_cast<std::uint32_t>(more.size()));
}

Lum_NetlistSpan Lum_NetlistModule::AddBits(Lum_NetlistBit const *more, std::uint32_t count) {
  Lum_NetlistSpan span;
  span.first = static_cast<std::uint32_t>(bits.size());
  span.width = count;
  bits.insert(bits.end(), more, more + count);
  return span;
}

Lum_Netlist::Lum_Netlist() { Intern(""); }
Lum_Netlist::Lum_Netlist(Lum_Netlist &&other) noexcept { *this = std::move(other); }

// The texts' chunks move with their views; the other netlist is left empty
// (without even ""), so that it can never write into chunks it gave away.
Lum_Netlist &Lum_Netlist::operator=(Lum_Netlist &&other) noexcept {
  if (this == &other)
    return *this;
  modules = std::move(other.modules);
  path = std::move(other.path);
  fromJson = other.fromJson;
  m_Chunks = std::move(other.m_Chunks);
  m_ChunkFree = std::exchange(other.m_ChunkFree, 0);
  m_ChunkNext = std::exchange(other.m_ChunkNext, nullptr);
  m_Texts = std::move(other.m_Texts);
  m_Slots = std::move(other.m_Slots);
  m_Modules = std::move(other.m_Modules);
  other.modules.clear();
  other.m_Chunks.clear();
  other.m_Texts.clear();
  other.m_Slots.clear();
  other.m_Modules.clear();
  return *this;
}
Lum_Netlist::~Lum_Netlist() = default;

namespace {

constexpr std::size_t kChunk = 1 << 16;

// Eight bytes at a time, each word mixed in by a multiply: names run to
// tens of characters, and this needs no call.
std::uint32_t HashOf(std::string_view text) {
  std::uint64_t hash = 0x9E3779B97F4A7C15ULL ^ text.size();
  std::size_t at = 0;
  for (; at + 8 <= text.size(); at += 8) {
    std::uint64_t word = 0;
    std::memcpy(&word, text.data() + at, 8);
    hash = (hash ^ word) * 0xFF51AFD7ED558CCDULL;
    hash ^= hash >> 32;
  }
  std::uint64_t tail = 0;
  if (at < text.size()) // (an empty view may have no data)
    std::memcpy(&tail, text.data() + at, text.size() - at);
  hash = (hash ^ tail) * 0xC4CEB9FE1A85EC53ULL;
  hash ^= hash >> 29;
  return static_cast<std::uint32_t>(hash ^ (hash >> 32));
}

} // namespace

std::string_view Lum_Netlist::Store(std::string_view text) {
  std::size_t const size = text.size() + 1;
  if (size > m_ChunkFree) {
    // A text longer than a chunk has one of its own.
    std::size_t const chunk = std::max(size, kChunk);
    m_Chunks.push_back(std::make_unique<char[]>(chunk));
    m_ChunkNext = m_Chunks.back().get();
    m_ChunkFree = chunk;
  }
  char *const stored = m_ChunkNext;
  if (!text.empty())
    std::memcpy(stored, text.data(), text.size());
  stored[text.size()] = '\0';
  m_ChunkNext += size;
  m_ChunkFree -= size;
  return std::string_view(stored, text.size());
}

// The slot of the text, or the empty slot where it would go.
std::size_t Lum_Netlist::Probe(std::string_view text, std::uint32_t hash) const {
  std::size_t const mask = m_Slots.size() - 1;
  for (std::size_t at = hash & mask;; at = (at + 1) & mask) {
    Slot const &slot = m_Slots[at];
    if (slot.id == kNone || (slot.hash == hash && m_Texts[slot.id] == text))
      return at;
  }
}

Lum_NetlistName Lum_Netlist::Intern(std::string_view text) {
  std::uint32_t const hash = HashOf(text);
  if (!m_Slots.empty()) {
    std::size_t const at = Probe(text, hash);
    if (m_Slots[at].id != kNone)
      return m_Slots[at].id;
  }
  if (m_Texts.size() >= kNone - 1)
    throw std::length_error("more than 2^32 - 2 distinct names in a netlist");
  // At most half full: probes stay short.
  if (2 * (m_Texts.size() + 1) > m_Slots.size()) {
    std::vector<Slot> old(std::max<std::size_t>(64, 2 * m_Slots.size()));
    old.swap(m_Slots);
    std::size_t const mask = m_Slots.size() - 1;
    for (Slot const &slot : old)
      if (slot.id != kNone) {
        std::size_t at = slot.hash & mask;
        while (m_Slots[at].id != kNone)
          at = (at + 1) & mask;
        m_Slots[at] = slot;
      }
  }
  auto const id = static_cast<Lum_NetlistName>(m_Texts.size());
  m_Texts.push_back(Store(text));
  m_Slots[Probe(text, hash)] = {id, hash};
  return id;
}

Lum_NetlistName Lum_Netlist::Find(std::string_view text) const {
  if (m_Slots.empty())
    return kNone;
  return m_Slots[Probe(text, HashOf(text))].id;
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

// tdm tree and tdm dot: the block hierarchy of each view with the type
// block of every block, as indented text or as a Graphviz graph.

#include "commands.h"

#include "Lum_TdmBlock.h"
#include "Lum_TdmModel.h"
#include "Lum_TdmPin.h"

#include "Lum_Tlm.h"
#include "Orb_Model.h"

#include <cstdint>
#include <cstdio>
#include <string>

namespace tdm {
namespace {

std::string TypeText(Lum_TdmBlock const *block) {
  Lum_TlmBlock const *typeBlock = block->GetTypeBlock();
  return typeBlock ? typeBlock->GetUniqueTag().str() : std::string("-");
}

void PrintTree(Lum_TdmModel &model, Orb_Block *block, int level, TreeOptions const &tree) {
  auto *client = static_cast<Lum_TdmBlock *>(model.Specialize(block));
  std::printf("%*s%s  %s\n", 2 * level, "", block->GetName(), TypeText(client).c_str());
  if (tree.pins) {
    for (std::size_t i = 0; i < block->GetPins().size(); ++i) {
      Lum_TdmPin const *pin = client->GetPin(i);
      Lum_TlmPin const *typePin = pin->GetTypePin();
      std::printf("%*s. pin %s (%s)  %s\n", 2 * level + 2, "", pin->GetName(),
                  Orb_PinDirectionName(pin->GetDirection()), typePin ? typePin->GetName() : "-");
    }
  }
  if (tree.depth >= 0 && level >= tree.depth)
    return;
  for (Orb_Block *child : block->GetBlocks())
    PrintTree(model, child, level + 1, tree);
}

// Text for a double-quoted Graphviz string: quotes and backslashes escaped,
// line breaks as \n, other control bytes and bytes that are not UTF-8 as
// '?', so that any name makes a valid graph.
std::string DotText(std::string const &text) {
  std::string out;
  std::size_t i = 0;
  while (i < text.size()) {
    auto const byte = static_cast<unsigned char>(text[i]);
    if (byte == '"' || byte == '\\') {
      out += '\\';
      out += text[i++];
      continue;
    }
    if (byte == '\n') {
      out += "\\n";
      ++i;
      continue;
    }
    if (byte < 0x20 || byte == 0x7f) {
      out += '?';
      ++i;
      continue;
    }
    if (byte < 0x80) {
      out += text[i++];
      continue;
    }
    std::size_t const length = byte >= 0xf0 && byte < 0xf5   ? 4
                               : byte >= 0xe0                ? 3
                               : byte >= 0xc2 && byte < 0xe0 ? 2
                                                             : 0;
    bool valid = length != 0 && i + length <= text.size();
    for (std::size_t k = 1; valid && k < length; ++k)
      valid = (static_cast<unsigned char>(text[i + k]) & 0xc0) == 0x80;
    if (valid) {
      out.append(text, i, length);
      i += length;
    } else {
      out += '?';
      ++i;
    }
  }
  return out;
}

class DotWriter {
public:
  explicit DotWriter(Lum_TdmModel &model) : m_Model(model) {}

  // Writes the block and, down to the depth, its children with an edge from
  // each parent; returns the block's node id.
  std::uint64_t Block(Orb_Block *block, int level, TreeOptions const &tree) {
    auto *client = static_cast<Lum_TdmBlock *>(m_Model.Specialize(block));
    std::uint64_t const id = m_NextId++;
    bool const typed = client->GetTypeBlock() != nullptr;
    std::printf("    n%llu [label=\"%s\\n%s\"%s];\n", static_cast<unsigned long long>(id),
                DotText(block->GetName()).c_str(),
                typed ? DotText(TypeText(client)).c_str() : "(untyped)",
                typed ? "" : ", style=\"rounded,dashed\", color=gray40, fontcolor=gray30");
    if (tree.depth >= 0 && level >= tree.depth)
      return id;
    for (Orb_Block *child : block->GetBlocks()) {
      std::uint64_t const childId = Block(child, level + 1, tree);
      std::printf("    n%llu -> n%llu;\n", static_cast<unsigned long long>(id),
                  static_cast<unsigned long long>(childId));
    }
    return id;
  }

private:
  Lum_TdmModel &m_Model;
  std::uint64_t m_NextId = 0;
};

} // namespace

int RunTree(std::string const &path, TreeOptions const &tree, CommonOptions const &options) {
  ApplyLibraryPath(options);
  std::unique_ptr<Lum_TdmModel> model = OpenTyped(path, options);
  for (Orb_View *view : SelectViews(*model, path, tree.view)) {
    std::printf("%s\n", ViewPath(view).c_str());
    if (Orb_Block *top = view->GetBlock())
      PrintTree(*model, top, 0, tree);
  }
  return kExitOk;
}

int RunDot(std::string const &path, TreeOptions const &tree, CommonOptions const &options) {
  ApplyLibraryPath(options);
  std::unique_ptr<Lum_TdmModel> model = OpenTyped(path, options);
  std::vector<Orb_View *> const views = SelectViews(*model, path, tree.view);
  std::printf("digraph \"%s\" {\n", DotText(path).c_str());
  std::printf("  rankdir=TB;\n");
  std::printf("  node [shape=box, style=rounded, fontname=\"Helvetica\"];\n");
  DotWriter writer(*model);
  std::size_t cluster = 0;
  for (Orb_View *view : views) {
    std::printf("  subgraph cluster_%zu {\n", cluster++);
    std::printf("    label=\"%s\";\n", DotText(ViewPath(view)).c_str());
    if (Orb_Block *top = view->GetBlock())
      writer.Block(top, 0, tree);
    std::printf("  }\n");
  }
  std::printf("}\n");
  return kExitOk;
}

} // namespace tdm

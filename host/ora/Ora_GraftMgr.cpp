#include "Ora_GraftMgr.h"

#include "Orb_Exception.h"

#include <algorithm>
#include <string>
#include <unordered_map>
#include <utility>
#include <vector>

namespace {

char const *const kSource = "host/Ora_GraftMgr";

// Levels of blocks in the subtree of `block`, itself included; counting stops
// once it passes `limit`.
unsigned SubtreeLevels(Orb_Block const *block, unsigned limit) {
  std::vector<std::pair<Orb_Block const *, unsigned>> pending{{block, 1}};
  unsigned levels = 0;
  while (!pending.empty() && levels <= limit) {
    auto const [next, level] = pending.back();
    pending.pop_back();
    levels = std::max(levels, level);
    for (Orb_Block const *child : next->GetBlocks())
      pending.emplace_back(child, level + 1);
  }
  return levels;
}

// One graft: the copies made so far, keyed by their sources, so that
// connections are resolved in constant time per pin.
struct GraftRun {
  Ora_GraftMgr &manager;
  Orb_Block const *source;
  Orb_Block *destination;
  // The manager's back reference maps, or null when those are off.
  std::unordered_map<Orb_Block const *, Orb_Block const *> *blockSources;
  std::unordered_map<Orb_Network const *, Orb_Network const *> *networkSources;
  // The prefix of this graft's network names: the destination block's path.
  std::string networkPrefix;
  std::unordered_map<Orb_Pin const *, Orb_Pin *> pinCopies;
  // Copied signals in creation order, so that connections are made in a
  // reproducible order.
  std::vector<std::pair<Orb_Signal const *, Orb_Signal *>> signalCopies;
  // This graft's network for each source network.
  std::unordered_map<Orb_Network const *, Orb_Network *> networkCopies;
};

// The destination's path through its blocks, as "top/u1/".
std::string PathPrefix(Orb_Block const *block) {
  std::string path;
  for (; block; block = block->GetParent())
    path.insert(0, 1, '/').insert(0, block->GetNameString());
  return path;
}

// A network of its own for the copies of one source network, named after the
// destination and the source network, made unique in the view.
Orb_Network *CopyNetwork(GraftRun &run, Orb_Network const *network, Orb_View *view) {
  std::string const base = run.networkPrefix + network->GetName();
  std::string name = base;
  for (unsigned n = 1; view->GetNetworkByName(name.c_str()); ++n)
    name = base + "_" + std::to_string(n);
  Orb_Network *copy = view->CreateNetwork(name.c_str());
  copy->CopyPropertiesFrom(*network);
  run.networkCopies.emplace(network, copy);
  if (run.networkSources)
    (*run.networkSources)[copy] = network;
  return copy;
}

void CopySignals(GraftRun &run, Orb_Block const *source, Orb_Block *copy) {
  Orb_View *view = copy->GetView();
  for (Orb_Signal const *signal : source->GetSignals()) {
    Orb_Signal *signalCopy = copy->CreateSignal(signal->GetName());
    signalCopy->CopyPropertiesFrom(*signal);
    run.signalCopies.emplace_back(signal, signalCopy);
    Orb_Network const *network = signal->GetNetwork();
    if (!network)
      continue;
    auto known = run.networkCopies.find(network);
    Orb_Network *target =
        known != run.networkCopies.end() ? known->second : CopyNetwork(run, network, view);
    target->AddSignal(signalCopy);
  }
}

void CopyBlock(GraftRun &run, Orb_Block const *source, Orb_Block *parent) {
  Orb_Block *copy = parent->CreateBlock(source->GetName(), 0);
  copy->CopyPropertiesFrom(*source);
  if (run.blockSources)
    (*run.blockSources)[copy] = source;
  for (Orb_Pin const *pin : source->GetPins()) {
    Orb_Pin *pinCopy = copy->CreatePin(pin->GetName(), pin->GetDirection());
    run.manager.CopyPinProperties(pin, pinCopy);
    run.pinCopies.emplace(pin, pinCopy);
  }
  CopySignals(run, source, copy);
  for (Orb_Block const *child : source->GetBlocks())
    CopyBlock(run, child, copy);
}

void ConnectCopies(GraftRun &run) {
  // Walking each copied signal's source pins reproduces its connection order.
  // Pins outside the source subtree have no copy and stay behind; a pin of
  // the source block itself stands for the destination's pin of that name,
  // whose inner side takes the copy. The pairs are collected first, so that
  // no connection changes a pin list being walked.
  std::vector<std::pair<Orb_Pin *, Orb_Signal *>> connections;
  for (auto const &[signal, signalCopy] : run.signalCopies) {
    for (Orb_Pin const *pin : signal->GetPins()) {
      Orb_Pin *pinCopy = nullptr;
      if (pin->GetParent() == run.source) {
        pinCopy = run.destination->GetPinByName(pin->GetName());
      } else {
        auto it = run.pinCopies.find(pin);
        if (it != run.pinCopies.end())
          pinCopy = it->second;
      }
      if (pinCopy)
        connections.emplace_back(pinCopy, signalCopy);
    }
  }
  // A copy sits where its source sat, so the side is the source's: inner for
  // a pin of the signal's own block, outer for a pin of a child block.
  for (auto const &[pin, signal] : connections) {
    if (pin->GetParent() == signal->GetParent())
      pin->ConnectInner(signal);
    else
      pin->Connect(signal);
  }
}

} // namespace

Ora_GraftMgr::Ora_GraftMgr(bool blockBackReferences, bool networkBackReferences)
    : m_BlockBackReferences(blockBackReferences), m_NetworkBackReferences(networkBackReferences) {}

Ora_GraftMgr::~Ora_GraftMgr() = default;

bool Ora_GraftMgr::Graft(Orb_Block const *source, Orb_Block *destination) {
  if (!source || !destination)
    throw Orb_Exception(kSource, __LINE__, source ? source->GetName() : "",
                        "Graft needs a source and a destination block.");
  if (source == destination)
    throw Orb_Exception(kSource, __LINE__, source->GetName(),
                        "A block cannot be grafted onto itself.");
  // Copying into the source's own subtree would walk what it is creating.
  for (Orb_Block const *b = destination->GetParent(); b; b = b->GetParent())
    if (b == source)
      throw Orb_Exception(kSource, __LINE__, destination->GetName(),
                          (std::string("The destination block lies inside the source block <") +
                           Port::Exception::ShownName(source->GetNameString()) + ">.")
                              .c_str());
  // The source's children land one level below the destination: refused here,
  // before anything is copied, rather than halfway through.
  unsigned const depth = destination->GetDepth();
  if (depth - 1 + SubtreeLevels(source, Orb_MaxBlockDepth) > Orb_MaxBlockDepth)
    throw Orb_Exception(kSource, __LINE__, source->GetName(),
                        ("Grafted under block <" +
                         Port::Exception::ShownName(destination->GetNameString()) +
                         ">, copies of this block's children would lie deeper than " +
                         std::to_string(Orb_MaxBlockDepth) + " levels.")
                            .c_str());

  GraftRun run{*this,
               source,
               destination,
               m_BlockBackReferences ? &m_BlockSources : nullptr,
               m_NetworkBackReferences ? &m_NetworkSources : nullptr,
               PathPrefix(destination),
               {},
               {},
               {}};
  CopySignals(run, source, destination);
  for (Orb_Block const *child : source->GetBlocks())
    CopyBlock(run, child, destination);
  ConnectCopies(run);
  return true;
}

void Ora_GraftMgr::CopyPinProperties(Orb_Pin const *source, Orb_Pin *destination) {
  destination->CopyPropertiesFrom(*source);
}

Orb_Block const *Ora_GraftMgr::GetBlockSource(Orb_Block const *copy) const {
  auto it = m_BlockSources.find(copy);
  return it == m_BlockSources.end() ? nullptr : it->second;
}

Orb_Network const *Ora_GraftMgr::GetNetworkSource(Orb_Network const *copy) const {
  auto it = m_NetworkSources.find(copy);
  return it == m_NetworkSources.end() ? nullptr : it->second;
}

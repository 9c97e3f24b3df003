#pragma once

// The commit walk over one kind of children.

#include "Lum_TdmClient.h"

#include <vector>

// Commits each host child in host order through its client, which is
// specialized on the spot when it has none. The bridge table is fetched once
// for the loop.
template <class Client, class Children>
void Lum_TdmCommitEach(Orb_Context *context, Orb_Kind kind, Children const &children) {
  if (children.empty())
    return;
  Orb_BridgeHandle const bridge = context->GetBridgeHandle(kind);
  for (std::size_t i = 0; i < children.size(); ++i) {
    Lum_TdmClient::Of<Client>(context, bridge, children[i])->TraverseAndCommitToOrb();
  }
}

#pragma once

// The client of a host object, made if missing.

#include "Orb_Derived.h"

#include <cassert>

class Lum_TdmClient {
public:
  // The client of `object` in `context`, read from a bridge table of the
  // object's kind fetched once by the caller (for a walk over many objects);
  // an object without one is specialized on the spot.
  template <class Client, class Host>
  static Client *Of(Orb_Context *context, Orb_BridgeHandle const &bridge, Host *object) {
    Orb_ClientObject *client = bridge[object->GetBridgeId()];
    if (!client)
      client = context->Specialize(object);
    assert(client && "the client model made no client for a host object");
    return static_cast<Client *>(client);
  }
};

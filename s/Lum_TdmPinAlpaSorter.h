#pragma once

// The one order the library puts a block's pins in: plain byte order of their
// names. Only the block's source and its tests see it.

#include "Orb_Model.h"
#include "Orb_SortFtor.h"

#include <cstring>

// Compares two host pins by name, byte by byte with each byte unsigned
// (strcmp's order): case-sensitive, upper case before lower case, no numeric
// reading of digits, a name before any longer name that begins with it,
// bytes 128 to 255 after ASCII. Equal names compare false both ways.
class PinAlpaSorter : public Orb_SortFtor<Orb_Pin> {
public:
  bool operator()(Orb_Pin const *a, Orb_Pin const *b) const override {
    return std::strcmp(a->GetName(), b->GetName()) < 0;
  }
  ~PinAlpaSorter() override = default;
};

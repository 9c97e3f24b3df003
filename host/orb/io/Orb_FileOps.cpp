#include "Orb_FileOps.h"

#include <cstdio>
#include <unistd.h>

namespace {

// Constant-initialized: in place before any static constructor may save.
Orb_FileOps g_FileOps{&::write, &::fsync, &::close, &::rename};

} // namespace

Orb_FileOps Orb_FileOps::System() { return Orb_FileOps{&::write, &::fsync, &::close, &::rename}; }

Orb_FileOps const &Orb_FileOps::Get() { return g_FileOps; }

Orb_FileOps Orb_FileOps::Set(Orb_FileOps const &ops) {
  Orb_FileOps const previous = g_FileOps;
  g_FileOps = ops;
  return previous;
}

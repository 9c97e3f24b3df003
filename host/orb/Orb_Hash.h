#pragma once

// The hash of names in the host's tables: SipHash-1-3 under a key drawn at
// random once per process. Names come from files, and an unkeyed hash lets
// a file be made of names that all collide, which turns every table of them
// into a list; with a secret key, colliding names cannot be prepared.

#include "Lum_PlatformApi.h"

#include <cstddef>
#include <cstdint>
#include <string_view>

// The keyed hash of `name`; the same for the same bytes within a process.
LUM_PLATFORM_API std::uint64_t Orb_HashName(std::string_view name) noexcept;

// Orb_HashName as the hash functor of a standard unordered container.
struct Orb_NameHash {
  std::size_t operator()(std::string_view name) const noexcept {
    return static_cast<std::size_t>(Orb_HashName(name));
  }
};

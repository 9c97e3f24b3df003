// SipHash-1-3 over names, with a process-wide random key.

#include "Orb_Hash.h"

#include <chrono>
#include <cstring>
#include <sys/random.h>

namespace {

struct Key {
  std::uint64_t k0, k1;
};

Key MakeKey() noexcept {
  Key key{};
  auto *bytes = reinterpret_cast<unsigned char *>(&key);
  std::size_t got = 0;
  while (got < sizeof key) {
    ssize_t const n = ::getrandom(bytes + got, sizeof key - got, 0);
    if (n <= 0)
      break;
    got += static_cast<std::size_t>(n);
  }
  if (got < sizeof key) {
    // No entropy source: the clock and an address still differ per run.
    key.k0 ^=
        static_cast<std::uint64_t>(std::chrono::steady_clock::now().time_since_epoch().count());
    key.k1 ^= reinterpret_cast<std::uintptr_t>(&key) * 0x9E3779B97F4A7C15u;
  }
  return key;
}

// Made on first use: a name may be hashed during another static's
// construction.
Key const &TheKey() noexcept {
  static Key const key = MakeKey();
  return key;
}

constexpr std::uint64_t Rotl(std::uint64_t x, int b) { return (x << b) | (x >> (64 - b)); }

struct State {
  std::uint64_t v0, v1, v2, v3;
  void Round() {
    v0 += v1;
    v1 = Rotl(v1, 13);
    v1 ^= v0;
    v0 = Rotl(v0, 32);
    v2 += v3;
    v3 = Rotl(v3, 16);
    v3 ^= v2;
    v0 += v3;
    v3 = Rotl(v3, 21);
    v3 ^= v0;
    v2 += v1;
    v1 = Rotl(v1, 17);
    v1 ^= v2;
    v2 = Rotl(v2, 32);
  }
  // One compression round per 8-byte word.
  void Absorb(std::uint64_t m) {
    v3 ^= m;
    Round();
    v0 ^= m;
  }
};

std::uint64_t LoadLittle(unsigned char const *p, std::size_t n) {
  std::uint64_t word = 0;
  for (std::size_t i = 0; i < n; ++i)
    word |= std::uint64_t(p[i]) << (8 * i);
  return word;
}

} // namespace

std::uint64_t Orb_HashName(std::string_view name) noexcept {
  Key const &key = TheKey();
  State s{key.k0 ^ 0x736f6d6570736575u, key.k1 ^ 0x646f72616e646f6du, key.k0 ^ 0x6c7967656e657261u,
          key.k1 ^ 0x7465646279746573u};
  auto const *p = reinterpret_cast<unsigned char const *>(name.data());
  std::size_t const size = name.size();
  std::size_t const whole = size & ~std::size_t(7);
  for (std::size_t i = 0; i < whole; i += 8) {
    std::uint64_t word;
    std::memcpy(&word, p + i, 8);
#if __BYTE_ORDER__ == __ORDER_BIG_ENDIAN__
    word = __builtin_bswap64(word);
#endif
    s.Absorb(word);
  }
  s.Absorb(LoadLittle(p + whole, size - whole) | (std::uint64_t(size) << 56));
  s.v2 ^= 0xff;
  s.Round();
  s.Round();
  s.Round();
  return s.v0 ^ s.v1 ^ s.v2 ^ s.v3;
}

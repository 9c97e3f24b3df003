// Costs that must grow linearly whatever the names: many properties on one object, and names
// made to collide in an unkeyed hash.

#include "host/GrowthSupport.h"
#include "host/HostTestSupport.h"

#include "Orb_FileOps.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <functional>
#include <string_view>

namespace {

using namespace HostTest;

int NoSync(int /*fd*/) { return 0; }

// Saves without syncing: the tests time the host, not the disk.
class HostGrowthTest : public ::testing::Test {
protected:
  void SetUp() override {
    if (UnderMemoryChecker())
      GTEST_SKIP() << "timings under valgrind say nothing";
    Orb_FileOps fast = Orb_FileOps::Get();
    fast.fsync = &NoSync;
    m_Saved = Orb_FileOps::Set(fast);
  }
  void TearDown() override {
    Orb_FileOps::Set(m_Saved);
    std::remove(m_Path.c_str());
  }

  // Seconds to build a top block with `fill`, plus seconds to open it saved.
  double BuildAndOpen(std::function<void(Orb_Block *)> const &fill) {
    Orb_Model model("m", "db", "", false);
    Orb_Block *top =
        model.CreateDesignMgr("dm")->CreateDesign("d")->CreateView("v")->CreateTopBlock("top");
    double const build = SecondsOf([&] { fill(top); });
    model.Save(m_Path.c_str());
    Orb_Model opened("o", "db", "", false);
    return build + SecondsOf([&] { opened.Open(m_Path.c_str()); });
  }

  std::string m_Path = ::testing::TempDir() + "HostGrowth." + std::to_string(::getpid());
  Orb_FileOps m_Saved = Orb_FileOps::Get();
};

// Names of 16 bytes on which libstdc++'s unkeyed string hash (64-bit MurmurHash2 under a fixed
// seed) agrees: the second word is solved for, so that the state after it is the same whatever
// the first word.
std::vector<std::string> CollidingNames(std::size_t n) {
  constexpr std::uint64_t kMul = 0xc6a4a7935bd1e995u;
  constexpr std::uint64_t kSeed = 0xc70f6907u;
  std::uint64_t inverse = kMul; // Newton's iteration, each step doubling the correct bits.
  for (int i = 0; i < 5; ++i)
    inverse *= 2 - kMul * inverse;
  auto const mix = [](std::uint64_t v) { return v ^ (v >> 47); };
  auto const word = [&](std::uint64_t k) { return mix(k * kMul) * kMul; };
  auto const unword = [&](std::uint64_t d) { return mix(d * inverse) * inverse; };
  std::uint64_t const start = kSeed ^ (16 * kMul);
  std::vector<std::string> names;
  for (std::uint64_t i = 0; names.size() < n; ++i) {
    std::string first = "c" + std::to_string(10000000 + i).substr(1);
    std::uint64_t k1 = 0;
    std::memcpy(&k1, first.data(), 8);
    std::uint64_t const k2 = unword(((start ^ word(k1)) * kMul) ^ 0x0123456789abcdefu);
    char second[8];
    std::memcpy(second, &k2, 8);
    if (std::memchr(second, 0, 8) == nullptr)
      names.push_back(first + std::string(second, 8));
  }
  return names;
}

// Properties of one object: creating them and opening them is linear in their number.
TEST_F(HostGrowthTest, ManyPropertiesOnOneObject) {
  auto const run = [this](std::size_t n) {
    return BuildAndOpen([n](Orb_Block *top) {
      for (std::size_t i = 0; i < n; ++i)
        top->CreatePropertyString(("p" + std::to_string(i)).c_str(), "v");
    });
  };
  EXPECT_LE(GrowthOfDoubling(run, 10000), kLinearGrowth);
}

// Past the size where a holder indexes its names: replacing, deleting from the back, the middle
// and the front, and lookups after each, against a plain list.
TEST(HostPropertyIndexTest, IndexedPropertiesKeepOrderAndLookups) {
  Orb_PropertyHolder holder;
  std::vector<std::string> expected;
  auto const check = [&](char const *when) {
    SCOPED_TRACE(when);
    std::vector<std::string> names;
    for (Orb_Property const *property : holder.GetProperties())
      names.push_back(property->GetName());
    EXPECT_EQ(names, expected);
    for (int i = 0; i < 80; ++i) {
      std::string const name = "p" + std::to_string(i);
      bool const live = std::find(expected.begin(), expected.end(), name) != expected.end();
      Orb_Property const *found = holder.GetPropertyByName(name.c_str());
      EXPECT_EQ(found ? found->GetName() : std::string(), live ? name : std::string());
    }
  };
  for (int i = 0; i < 70; ++i) {
    expected.push_back("p" + std::to_string(i));
    holder.CreatePropertyString(expected.back().c_str(), "v");
  }
  holder.CreatePropertyStringList("p33");
  EXPECT_EQ(holder.GetProperties()[33]->GetKind(), Orb_Property::STRING_LIST);
  check("replaced");
  for (char const *name : {"p69", "p68", "p0", "p40", "p41", "p1"}) {
    holder.DeleteProperty(name);
    expected.erase(std::find(expected.begin(), expected.end(), name));
  }
  check("deleted");
  while (expected.size() > 3) {
    holder.DeleteProperty(holder.GetProperties()[expected.size() / 2]);
    expected.erase(expected.begin() + static_cast<std::ptrdiff_t>(expected.size() / 2));
  }
  holder.CreatePropertyString("p79", "v");
  expected.push_back("p79");
  check("shrunk and grown");
}

// Pins (a shared name table, a name index) and signals whose names all collide in the
// unkeyed hash: creating and opening them is linear in their number.
TEST_F(HostGrowthTest, NamesThatCollideInAnUnkeyedHash) {
#if !defined(__GLIBCXX__)
  GTEST_SKIP() << "the names collide in libstdc++'s hash";
#endif
  std::vector<std::string> const names = CollidingNames(8000);
  ASSERT_EQ(std::hash<std::string_view>()(names[0]), std::hash<std::string_view>()(names[1]));
  auto const run = [&](std::size_t n) {
    return BuildAndOpen([&](Orb_Block *top) {
      Orb_Block *cell = top->CreateBlock("cell");
      for (std::size_t i = 0; i < n; ++i) {
        cell->CreatePin(names[i].c_str(), Orb_Pin::PIN_INPUT);
        top->CreateSignal(names[i].c_str());
      }
    });
  };
  EXPECT_LE(GrowthOfDoubling(run, 4000), kLinearGrowth);
}

} // namespace

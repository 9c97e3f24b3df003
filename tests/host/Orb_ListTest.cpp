#include "Orb_List.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <memory>
#include <random>
#include <string>
#include <vector>

namespace {

struct Item {
  explicit Item(int n) : name("i" + std::to_string(n)) {}
  std::string const &GetNameString() const { return name; }
  std::string name;
  std::uint32_t slot = 0;
};

struct ItemSlot {
  std::uint32_t &operator()(Item *item, void const * /*list*/) const { return item->slot; }
};

using List = Orb_List<Item, ItemSlot>;

// Items 0..n-1 in a list, with the vector the list must match.
class OrbListTest : public ::testing::Test {
protected:
  void Fill(int n) {
    for (int i = 0; i < n; ++i) {
      m_Items.push_back(std::make_unique<Item>(i));
      m_List.Add(m_Items.back().get());
      m_Expected.push_back(m_Items.back().get());
    }
  }
  void Remove(Item *item) {
    m_List.Remove(item);
    m_Expected.erase(std::find(m_Expected.begin(), m_Expected.end(), item));
  }
  // Compares by index first (the incremental path), then by iteration.
  void ExpectSame(char const *when) {
    ASSERT_EQ(m_List.Size(), m_Expected.size()) << when;
    for (std::size_t i = 0; i < m_Expected.size(); ++i)
      ASSERT_EQ(m_List.At(i), m_Expected[i]) << when << ", index " << i;
    EXPECT_EQ(m_List.Range().ToVector(), m_Expected) << when;
  }

  std::vector<std::unique_ptr<Item>> m_Items;
  List m_List;
  std::vector<Item *> m_Expected;
};

// The patterns that must stay linear also keep host order at every step.
TEST_F(OrbListTest, RemovalPatternsKeepOrder) {
  Fill(200);
  // From the front, reading the front each time.
  for (int k = 0; k < 30; ++k) {
    Remove(m_List.At(0));
    ASSERT_EQ(m_List.At(0), m_Expected.front());
  }
  ExpectSame("front removals");
  // From the back.
  for (int k = 0; k < 30; ++k)
    Remove(m_List.At(m_List.Size() - 1));
  ExpectSame("back removals");
  // A snapshot of every third, in order, then in reverse.
  std::vector<Item *> snapshot;
  for (std::size_t i = 0; i < m_List.Size(); i += 3)
    snapshot.push_back(m_List.At(i));
  auto const taken = static_cast<int>(snapshot.size());
  for (int k = 0; k < taken; k += 2)
    Remove(snapshot[static_cast<std::size_t>(k)]);
  for (int k = taken % 2 == 0 ? taken - 1 : taken - 2; k > 0; k -= 2)
    Remove(snapshot[static_cast<std::size_t>(k)]);
  ExpectSame("snapshot removals");
  // Walking by index and removing as one goes.
  for (std::size_t i = 0; i < m_List.Size(); ++i)
    if (i % 4 == 1) {
      Remove(m_List.At(i));
      --i;
    }
  ExpectSame("index walk removals");
  // Appending after removals, then removing everything.
  Fill(20);
  ExpectSame("appends after removals");
  while (m_List.Size() > 0)
    Remove(m_List.At(m_List.Size() / 2));
  ExpectSame("emptied");
}

// Random removals, appends and reads against a vector: order and slots stay
// right whatever the interleaving.
TEST_F(OrbListTest, RandomChurnMatchesVector) {
  std::mt19937 random(7);
  Fill(50);
  for (int step = 0; step < 4000; ++step) {
    unsigned const what = random() % 10;
    if (what < 4 && !m_Expected.empty()) {
      Remove(m_Expected[random() % m_Expected.size()]);
    } else if (what < 6) {
      Fill(1);
    } else if (!m_Expected.empty()) {
      std::size_t const i = random() % m_Expected.size();
      ASSERT_EQ(m_List.At(i), m_Expected[i]) << "step " << step;
    }
    if (step % 500 == 0)
      ExpectSame("churn");
  }
  ExpectSame("after churn");
}

// Churn that removes and adds as many as it keeps holds the list's memory
// flat: holes do not pile up.
TEST_F(OrbListTest, ChurnKeepsMemoryFlat) {
  Fill(1000);
  std::size_t const before = m_List.Bytes();
  for (int round = 0; round < 50; ++round) {
    for (int k = 0; k < 100; ++k)
      Remove(m_Expected[static_cast<std::size_t>(k) * 7 % m_Expected.size()]);
    Fill(100);
    ASSERT_EQ(m_List.At(m_List.Size() - 1), m_Expected.back());
  }
  ExpectSame("after churn");
  EXPECT_LE(m_List.Bytes(), 4 * before);
}

// Stable sort renumbers the slots: removals after it find their elements.
TEST_F(OrbListTest, SortThenRemove) {
  Fill(30);
  Remove(m_Expected[3]);
  auto const byNameDesc = [](Item const *a, Item const *b) { return a->name > b->name; };
  m_List.StableSort(byNameDesc);
  std::stable_sort(m_Expected.begin(), m_Expected.end(), byNameDesc);
  ExpectSame("sorted");
  Remove(m_Expected[5]);
  Remove(m_Expected[0]);
  ExpectSame("removed after sort");
}

// The name index finds, refuses duplicates and forgets erased names, also
// across growth and backward-shift erasure.
TEST(OrbNameIndexTest, FindInsertEraseAgainstReference) {
  std::vector<std::unique_ptr<Item>> items;
  Orb_NameIndex<Item> index;
  for (int i = 0; i < 3000; ++i) {
    items.push_back(std::make_unique<Item>(i));
    ASSERT_EQ(index.Insert(items.back().get()), nullptr) << i;
  }
  Item duplicate(18);
  EXPECT_EQ(index.Insert(&duplicate), items[18].get()) << "a taken name is refused";
  for (int i = 0; i < 3000; i += 3)
    index.Erase(items[static_cast<std::size_t>(i)].get());
  for (int i = 0; i < 3000; ++i) {
    Item *expected = i % 3 == 0 ? nullptr : items[static_cast<std::size_t>(i)].get();
    ASSERT_EQ(index.Find("i" + std::to_string(i)), expected) << i;
  }
  EXPECT_EQ(index.Insert(&duplicate), nullptr) << "an erased name is free again";
  EXPECT_EQ(index.Find("i18"), &duplicate);
  EXPECT_EQ(index.Find("i19"), items[19].get());
}

} // namespace

#include "Orb_List.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <map>
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

// The removal patterns that must stay linear keep host order at every step.
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
  // Appending after removals; a stable sort renumbers the slots, so removals after it find their
  // elements; then removing everything.
  Fill(20);
  ExpectSame("appends after removals");
  auto const byNameDesc = [](Item const *a, Item const *b) { return a->name > b->name; };
  m_List.StableSort(byNameDesc);
  std::stable_sort(m_Expected.begin(), m_Expected.end(), byNameDesc);
  ExpectSame("sorted");
  Remove(m_Expected[5]);
  Remove(m_Expected[0]);
  ExpectSame("removed after sort");
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

// Up to two elements stay in the list itself, the second moving to slot 0
// when the first goes; growing past two moves them to an array, in order,
// with their slots; a sort of two renumbers them.
TEST(OrbListInlineTest, TwoInPlaceThenGrows) {
  Item a(0), b(1), c(2), d(3);
  List list;
  list.Reserve(2);
  list.Add(&a);
  list.Add(&b);
  EXPECT_EQ(list.Bytes(), 0u);
  EXPECT_EQ(list.Range(), (std::vector<Item *>{&a, &b}));
  list.Remove(&a);
  EXPECT_EQ(list.Range(), (std::vector<Item *>{&b}));
  EXPECT_EQ(b.slot, 0u);
  list.Add(&a);
  list.StableSort([](Item *x, Item *y) { return x->name < y->name; });
  EXPECT_EQ(list.Range(), (std::vector<Item *>{&a, &b}));
  EXPECT_EQ(b.slot, 1u);
  list.Add(&c);
  EXPECT_GT(list.Bytes(), 0u);
  list.Add(&d);
  list.Remove(&b);
  EXPECT_EQ(list.Range(), (std::vector<Item *>{&a, &c, &d}));
  EXPECT_EQ(list.At(2), &d);
  EXPECT_EQ(d.slot, 2u);
  // Emptied, the array is kept and reused.
  std::size_t const bytes = list.Bytes();
  for (Item *item : {&a, &c, &d})
    list.Remove(item);
  EXPECT_TRUE(list.Range().empty());
  list.Add(&b);
  EXPECT_EQ(list.Bytes(), bytes);
  EXPECT_EQ(list.Range(), (std::vector<Item *>{&b}));
}

// Drives a name index as a named list does: rebuilt from the live
// elements, with room for twice as many, when an insertion finds it full.
struct IndexDriver {
  Item *Insert(Item *item) {
    if (!index.HasRoom(1))
      index.Rebuild(2 * (live.size() + 1), live);
    Item *taken = index.Insert(item);
    if (!taken)
      live.push_back(item);
    return taken;
  }
  void Erase(Item *item) {
    index.Erase(item);
    live.erase(std::find(live.begin(), live.end(), item));
  }
  Orb_NameIndex<Item> index;
  std::vector<Item *> live;
};

// Finds, refusals and erasures against a reference, across rebuilds, with
// tombstones piling up from erasures between insertions. A refusal must look
// past tombstones for the name.
TEST(OrbNameIndexTest, ChurnMatchesReference) {
  std::mt19937 random(11);
  std::vector<std::unique_ptr<Item>> items;
  IndexDriver driver;
  std::map<std::string, Item *> reference;
  for (int step = 0; step < 20000; ++step) {
    int const n = static_cast<int>(random() % 600);
    std::string const name = "i" + std::to_string(n);
    auto const found = reference.find(name);
    if (random() % 3 == 0 && found != reference.end()) {
      driver.Erase(found->second);
      reference.erase(found);
    } else {
      items.push_back(std::make_unique<Item>(n));
      Item *taken = driver.Insert(items.back().get());
      ASSERT_EQ(taken, found == reference.end() ? nullptr : found->second) << "step " << step;
      if (!taken)
        reference[name] = items.back().get();
    }
    if (step % 1000 == 0)
      for (int k = 0; k < 600; ++k) {
        auto const it = reference.find("i" + std::to_string(k));
        ASSERT_EQ(driver.index.Find("i" + std::to_string(k)),
                  it == reference.end() ? nullptr : it->second)
            << "step " << step << ", name " << k;
      }
  }
}

// A table of one group (seven slots, six usable) for five names: probes wrap
// around, and erasures leave tombstones before names still there.
TEST(OrbNameIndexTest, SmallestTableWrapsAndKeepsRefusing) {
  std::vector<std::unique_ptr<Item>> items(5);
  for (int i = 0; i < 5; ++i)
    items[static_cast<std::size_t>(i)] = std::make_unique<Item>(i);
  Orb_NameIndex<Item> index;
  index.Rebuild(5, std::vector<Item *>());
  for (auto const &item : items)
    ASSERT_EQ(index.Insert(item.get()), nullptr);
  for (int i = 0; i < 5; i += 2)
    index.Erase(items[static_cast<std::size_t>(i)].get());
  for (int i = 0; i < 5; ++i) {
    Item again(i);
    EXPECT_EQ(index.Insert(&again) != nullptr, i % 2 == 1) << i;
    if (i % 2 == 0)
      index.Erase(&again);
  }
  EXPECT_EQ(index.Find("i99"), nullptr);
  index.Rebuild(100, std::vector<Item *>{items[1].get(), items[3].get()});
  EXPECT_TRUE(index.HasRoom(98)) << "a rebuild sizes for the count asked";
  EXPECT_EQ(index.Find("i3"), items[3].get());
  EXPECT_EQ(index.Find("i0"), nullptr);
}

// A checked rebuild, small (probed) and large (sorted by home slot, so the
// tail wraps to the front), finds a repeated name wherever it lies and then
// keeps the old index; without repeats every name is found, and inserting,
// erasing and finding go on working in the table it made.
TEST(OrbNameIndexTest, CheckedRebuildFindsRepeatsAndIndexesTheRest) {
  for (int const n : {40, 5000, 70000}) {
    SCOPED_TRACE(n);
    std::vector<std::unique_ptr<Item>> items;
    std::vector<Item *> all;
    for (int i = 0; i < n; ++i) {
      items.push_back(std::make_unique<Item>(i));
      all.push_back(items.back().get());
    }
    Orb_NameIndex<Item> index;
    for (int const at : {0, n / 2, n - 1}) {
      std::vector<Item *> repeated = all;
      Item again(at);
      repeated.insert(repeated.begin() + (at == n - 1 ? n : at + 1), &again);
      EXPECT_EQ(index.RebuildChecked(repeated.size(), repeated), &again) << at;
      EXPECT_FALSE(index.Built());
    }
    ASSERT_EQ(index.RebuildChecked(all.size(), all), nullptr);
    for (Item *item : all)
      ASSERT_EQ(index.Find(item->name), item) << item->name;
    EXPECT_EQ(index.Find("i" + std::to_string(n)), nullptr);
    index.Erase(all[1]);
    EXPECT_EQ(index.Find("i1"), nullptr);
    EXPECT_EQ(index.Insert(all[1]), nullptr);
    Item again(n - 1);
    EXPECT_EQ(index.Insert(&again), all.back());
  }
}

} // namespace

// Type pin maps: first entry wins, equality by identity and copies; the
// manager that stores one copy per distinct map and key.

#include "Lum_TdmTypePinMap.h"
#include "Lum_TdmTypePinMapMgr.h"

#include "Lum_TdmTestSupport.h"

#include "Lum_Exception.h"

#include <gtest/gtest.h>

#include <cstddef>
#include <utility>
#include <vector>

using namespace lumtest;

namespace {

class TdmTypePinMapTest : public ::testing::Test {
protected:
  TdmTypePinMapTest() : m_Library("LIBM", 1, 0) {
    Lum_TlmBlock *typeBlock = m_Library.AddTypeBlock("REG", {"D0", "D1", "CLK"});
    m_pD0 = typeBlock->GetPinByName("D0");
    m_pD1 = typeBlock->GetPinByName("D1");
    m_pClk = typeBlock->GetPinByName("CLK");
  }

  TestLibrary m_Library;
  Lum_TlmPin const *m_pD0 = nullptr;
  Lum_TlmPin const *m_pD1 = nullptr;
  Lum_TlmPin const *m_pClk = nullptr;
};

// The first entry of a name stays; names differing in case are two entries;
// the pin forms use the design pin's name both ways.
TEST_F(TdmTypePinMapTest, FirstEntryWinsAndPinFormsUseTheName) {
  TypedDesign design;
  Lum_TdmBlock *top = design.m_pView->CreateTopBlock("top");
  Lum_TdmPin *data0 = top->CreatePin("DATA0", Orb_Pin::PIN_INPUT);
  Lum_TdmPin *clk = top->CreatePin("clk", Orb_Pin::PIN_INPUT);

  Lum_TdmTypePinMap map;
  EXPECT_FALSE(map.IsDefaultMap());
  map.SetPinMap("DATA0", m_pD0);
  map.SetPinMap(data0, m_pD1);
  map.SetPinMap("DATA0", nullptr);
  EXPECT_EQ(map.GetNumPins(), 1u);
  EXPECT_EQ(map.GetPinMapping(data0), m_pD0);

  map.SetPinMap(clk, m_pClk);
  map.SetPinMap("CLK", m_pD1);
  EXPECT_EQ(map.GetNumPins(), 3u);
  EXPECT_EQ(map.GetPinMapping("clk"), m_pClk);
  EXPECT_EQ(map.GetPinMapping("CLK"), m_pD1);
  EXPECT_EQ(map.GetPinMapping("DATA"), nullptr);
}

// A lookup through a design pin finds exactly the entry of its name, among
// names that are prefixes of one another or hold bytes above 0x7f (ordered
// as unsigned), as a lookup by string does.
TEST_F(TdmTypePinMapTest, PinLookupMatchesTheWholeName) {
  TypedDesign design;
  Lum_TdmBlock *top = design.m_pView->CreateTopBlock("top");
  char const *const names[] = {"A", "AB", "ABC", "B", "\xC3\xA9", "\x7F"};
  Lum_TlmPin const *const typePins[] = {m_pD0, m_pD1, m_pClk, nullptr, m_pD1, m_pD0};
  Lum_TdmTypePinMap map;
  for (std::size_t i = 0; i < 6; ++i)
    if (i != 2)
      map.SetPinMap(names[i], typePins[i]);
  for (std::size_t i = 0; i < 6; ++i) {
    Lum_TdmPin const *pin = top->CreatePin(names[i], Orb_Pin::PIN_INPUT);
    Lum_TlmPin const *expected = i == 2 ? nullptr : typePins[i];
    EXPECT_EQ(map.GetPinMapping(pin), expected) << i;
    EXPECT_EQ(map.GetPinMapping(names[i]), expected) << i;
  }
  EXPECT_EQ(map.GetPinMapping(top->CreatePin("AA", Orb_Pin::PIN_INPUT)), nullptr);
}

// Equality ignores insertion order and the default flag, compares type pins
// by identity and sizes first, and lets a stored null on the left match a
// missing name on the right; copies are equal and independent.
TEST_F(TdmTypePinMapTest, EqualityIsByEntriesOnly) {
  auto const map = [](std::vector<std::pair<char const *, Lum_TlmPin const *>> const &entries) {
    Lum_TdmTypePinMap made;
    for (auto const &[name, typePin] : entries)
      made.SetPinMap(name, typePin);
    return made;
  };
  Lum_TdmTypePinMap left = map({{"A", m_pD0}, {"B", m_pD1}});
  left.SetDefaultMap(true);
  EXPECT_TRUE(Lum_TdmTypePinMap() == Lum_TdmTypePinMap());
  EXPECT_TRUE(left == map({{"B", m_pD1}, {"A", m_pD0}}));
  EXPECT_FALSE(left == map({{"A", m_pD0}, {"B", m_pClk}})) << "one type pin differs";

  Lum_TdmTypePinMap larger(left);
  EXPECT_TRUE(larger.IsDefaultMap());
  larger.SetPinMap("C", m_pClk);
  EXPECT_FALSE(left == larger);
  EXPECT_FALSE(larger == left);
  Lum_TdmTypePinMap assigned;
  assigned = larger;
  EXPECT_TRUE(assigned == larger);

  Lum_TdmTypePinMap const withNull = map({{"A", nullptr}, {"B", m_pD1}});
  Lum_TdmTypePinMap const withOther = map({{"B", m_pD1}, {"C", m_pClk}});
  EXPECT_TRUE(withNull == withOther);
  EXPECT_FALSE(withOther == withNull);
}

// A null design pin is refused with an exception, never dereferenced.
TEST_F(TdmTypePinMapTest, NullDesignPinIsRefused) {
  Lum_TdmTypePinMap map;
  EXPECT_THROW(map.SetPinMap(static_cast<Lum_TdmPin const *>(nullptr), m_pD0),
               Lum_ExceptionInvalidTypeBlock);
  EXPECT_EQ(map.GetNumPins(), 0u);
  EXPECT_THROW(map.GetPinMapping(static_cast<Lum_TdmPin const *>(nullptr)),
               Lum_ExceptionInvalidTypeBlock);
}

// The pin map manager: one stored copy per distinct map and key.
class TdmTypePinMapMgrTest : public TdmTypePinMapTest {
protected:
  // A map of DATA -> D0 and OUT -> D1.
  Lum_TdmTypePinMap DataMap(bool isDefault = false) const {
    Lum_TdmTypePinMap map;
    map.SetDefaultMap(isDefault);
    map.SetPinMap(Port::StringBase<char>("DATA"), m_pD0);
    map.SetPinMap(Port::StringBase<char>("OUT"), m_pD1);
    return map;
  }

  Lum_TdmTypePinMapMgr m_Manager;
};

// Equal maps under one key share the stored copy, which is never the caller's
// object and does not follow later changes to it; the first map stored
// under a key fixes the copy's default flag.
TEST_F(TdmTypePinMapMgrTest, EqualMapsShareOneCopyPerKey) {
  Lum_TdmTypePinMap first = DataMap();
  Lum_TdmTypePinMap const *shared = m_Manager.GetTypePinMap("dff", &first);
  EXPECT_NE(shared, &first);
  first.SetPinMap(Port::StringBase<char>("CLOCK"), m_pClk);
  EXPECT_EQ(shared->GetNumPins(), 2u) << "the stored copy followed the caller's map";

  Lum_TdmTypePinMap const second = DataMap();
  EXPECT_EQ(m_Manager.GetTypePinMap("dff", &second), shared);
  EXPECT_NE(m_Manager.GetTypePinMap("other key", &second), shared);
  Lum_TdmTypePinMap const *changed = m_Manager.GetTypePinMap("dff", &first);
  EXPECT_NE(changed, shared);
  EXPECT_EQ(changed->GetPinMapping(Port::StringBase<char>("CLOCK")), m_pClk);

  Lum_TdmTypePinMap const flagged = DataMap(true);
  EXPECT_FALSE(m_Manager.GetTypePinMap("dff", &flagged)->IsDefaultMap());
  EXPECT_TRUE(m_Manager.GetTypePinMap("flagged", &flagged)->IsDefaultMap());
}

// The caller's map is compared on the left: one whose extra name maps to null
// matches a stored map of the same size, while the reverse does not. A new
// key with an empty map stores one empty map; a null map is refused.
TEST_F(TdmTypePinMapMgrTest, CallerMapIsOnTheLeftEmptyAndNullMaps) {
  Lum_TdmTypePinMap const stored = DataMap(); // DATA -> D0, OUT -> D1
  Lum_TdmTypePinMap withNull;                 // DATA -> D0, NC -> null
  withNull.SetPinMap(Port::StringBase<char>("DATA"), m_pD0);
  withNull.SetPinMap(Port::StringBase<char>("NC"), nullptr);
  Lum_TdmTypePinMap const *shared = m_Manager.GetTypePinMap("dff", &stored);
  EXPECT_EQ(m_Manager.GetTypePinMap("dff", &withNull), shared);

  Lum_TdmTypePinMap const *nullFirst = m_Manager.GetTypePinMap("nulls", &withNull);
  EXPECT_NE(m_Manager.GetTypePinMap("nulls", &stored), nullFirst);

  Lum_TdmTypePinMap const empty;
  Lum_TdmTypePinMap const *storedEmpty = m_Manager.GetTypePinMap("empty", &empty);
  EXPECT_EQ(storedEmpty->GetNumPins(), 0u);
  EXPECT_EQ(m_Manager.GetTypePinMap("empty", &empty), storedEmpty);
  EXPECT_EQ(Failure([&] { m_Manager.GetTypePinMap("dff", nullptr); }),
            "InvalidTypeBlock|dff|Null type pin map specified in GetTypePinMap.");
}

} // namespace

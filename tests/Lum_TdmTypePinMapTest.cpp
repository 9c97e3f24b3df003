// Type pin maps: first entry wins, equality by identity and copies; the
// manager that stores one copy per distinct map and key.

#include "Lum_TdmTypePinMap.h"
#include "Lum_TdmTypePinMapMgr.h"

#include "Lum_TdmTestSupport.h"

#include "Lum_Exception.h"

#include <gtest/gtest.h>

#include <cstddef>

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
  EXPECT_EQ(map.GetPinMapping(""), nullptr);
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
// by identity and sizes first, and lets a stored null match a missing name;
// copies are equal and independent.
TEST_F(TdmTypePinMapTest, EqualityIsByEntriesOnly) {
  Lum_TdmTypePinMap left, right;
  left.SetDefaultMap(true);
  EXPECT_TRUE(left == right) << "empty maps";

  left.SetPinMap("A", m_pD0);
  left.SetPinMap("B", m_pD1);
  right.SetPinMap("B", m_pD1);
  right.SetPinMap("A", m_pD0);
  EXPECT_TRUE(left == right);
  EXPECT_TRUE(right == left);

  Lum_TdmTypePinMap other;
  other.SetPinMap("A", m_pD0);
  other.SetPinMap("B", m_pClk);
  EXPECT_FALSE(left == other) << "one type pin differs";

  Lum_TdmTypePinMap larger(left);
  EXPECT_TRUE(larger == left);
  EXPECT_TRUE(larger.IsDefaultMap());
  larger.SetPinMap("C", m_pClk);
  EXPECT_FALSE(left == larger);
  EXPECT_FALSE(larger == left);
  right = larger;
  EXPECT_TRUE(right == larger);
  EXPECT_TRUE(right.IsDefaultMap());

  // A name mapped to null on the left matches a missing name on the right,
  // but not the other way round.
  Lum_TdmTypePinMap withNull, withOther;
  withNull.SetPinMap("A", nullptr);
  withNull.SetPinMap("B", m_pD1);
  withOther.SetPinMap("B", m_pD1);
  withOther.SetPinMap("C", m_pClk);
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
  ASSERT_NE(shared, nullptr);
  EXPECT_NE(shared, &first);

  first.SetPinMap(Port::StringBase<char>("CLOCK"), m_pClk);
  EXPECT_EQ(shared->GetNumPins(), 2u) << "the stored copy followed the caller's map";

  Lum_TdmTypePinMap const second = DataMap();
  EXPECT_EQ(m_Manager.GetTypePinMap("dff", &second), shared);
  EXPECT_NE(m_Manager.GetTypePinMap("other key", &second), shared);
  EXPECT_EQ(m_Manager.GetTypePinMap("other key", &second),
            m_Manager.GetTypePinMap("other key", &second));

  // The changed map differs now and gets a copy of its own.
  Lum_TdmTypePinMap const *changed = m_Manager.GetTypePinMap("dff", &first);
  EXPECT_NE(changed, shared);
  EXPECT_EQ(changed->GetPinMapping(Port::StringBase<char>("CLOCK")), m_pClk);

  // The first map stored under a key fixes the default flag of the copy.
  Lum_TdmTypePinMap const plain = DataMap(false);
  Lum_TdmTypePinMap const flagged = DataMap(true);
  Lum_TdmTypePinMap const *plainFirst = m_Manager.GetTypePinMap("plain", &plain);
  EXPECT_EQ(m_Manager.GetTypePinMap("plain", &flagged), plainFirst);
  EXPECT_FALSE(plainFirst->IsDefaultMap());

  Lum_TdmTypePinMap const *flaggedFirst = m_Manager.GetTypePinMap("flagged", &flagged);
  EXPECT_TRUE(flaggedFirst->IsDefaultMap());
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
  ASSERT_NE(storedEmpty, nullptr);
  EXPECT_EQ(storedEmpty->GetNumPins(), 0u);
  EXPECT_EQ(m_Manager.GetTypePinMap("empty", &empty), storedEmpty);

  EXPECT_EQ(Failure([&] { m_Manager.GetTypePinMap("dff", nullptr); }),
            "InvalidTypeBlock|dff|Null type pin map specified in GetTypePinMap.");
}

} // namespace

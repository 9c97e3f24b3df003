// The pin map manager: one stored copy per distinct map and key.

#include "Lum_TdmTypePinMapMgr.h"

#include "Lum_TdmTestSupport.h"
#include "Lum_TdmTypePinMap.h"

#include "Lum_Exception.h"

#include <gtest/gtest.h>

using namespace lumtest;

namespace {

class TdmTypePinMapMgrTest : public ::testing::Test {
protected:
  TdmTypePinMapMgrTest() : m_Library("LIBM", 1, 0) {
    Lum_TlmBlock *dff = m_Library.AddTypeBlock("DFF", {"D", "Q", "CK"});
    m_pD = dff->GetPinByName("D");
    m_pQ = dff->GetPinByName("Q");
    m_pCK = dff->GetPinByName("CK");
  }

  // A map of DATA -> D and OUT -> Q.
  Lum_TdmTypePinMap DataMap(bool isDefault = false) const {
    Lum_TdmTypePinMap map;
    map.SetDefaultMap(isDefault);
    map.SetPinMap(Port::StringBase<char>("DATA"), m_pD);
    map.SetPinMap(Port::StringBase<char>("OUT"), m_pQ);
    return map;
  }

  TestLibrary m_Library;
  Lum_TlmPin const *m_pD = nullptr;
  Lum_TlmPin const *m_pQ = nullptr;
  Lum_TlmPin const *m_pCK = nullptr;
  Lum_TdmTypePinMapMgr m_Manager;
};

// Equal maps under one key share the stored copy, which is never the caller's
// object and does not follow later changes to it.
TEST_F(TdmTypePinMapMgrTest, EqualMapsShareOneCopyPerKey) {
  Lum_TdmTypePinMap first = DataMap();
  Lum_TdmTypePinMap const *shared = m_Manager.GetTypePinMap("dff", &first);
  ASSERT_NE(shared, nullptr);
  EXPECT_NE(shared, &first);

  first.SetPinMap(Port::StringBase<char>("CLOCK"), m_pCK);
  EXPECT_EQ(shared->GetNumPins(), 2u) << "the stored copy followed the caller's map";

  Lum_TdmTypePinMap const second = DataMap();
  EXPECT_EQ(m_Manager.GetTypePinMap("dff", &second), shared);
  EXPECT_NE(m_Manager.GetTypePinMap("other key", &second), shared);
  EXPECT_EQ(m_Manager.GetTypePinMap("other key", &second),
            m_Manager.GetTypePinMap("other key", &second));

  // The changed map differs now and gets a copy of its own.
  Lum_TdmTypePinMap const *changed = m_Manager.GetTypePinMap("dff", &first);
  EXPECT_NE(changed, shared);
  EXPECT_EQ(changed->GetPinMapping(Port::StringBase<char>("CLOCK")), m_pCK);
}

// The first map stored under a key fixes the default flag of the shared copy.
TEST_F(TdmTypePinMapMgrTest, FirstStoredFlagWins) {
  Lum_TdmTypePinMap const plain = DataMap(false);
  Lum_TdmTypePinMap const flagged = DataMap(true);
  Lum_TdmTypePinMap const *shared = m_Manager.GetTypePinMap("dff", &plain);
  EXPECT_EQ(m_Manager.GetTypePinMap("dff", &flagged), shared);
  EXPECT_FALSE(shared->IsDefaultMap());

  Lum_TdmTypePinMap const *flaggedFirst = m_Manager.GetTypePinMap("flagged", &flagged);
  EXPECT_TRUE(flaggedFirst->IsDefaultMap());
}

// The caller's map is compared on the left: one whose extra name maps to null
// matches a stored map of the same size, while the reverse does not.
TEST_F(TdmTypePinMapMgrTest, CallerMapIsOnTheLeft) {
  Lum_TdmTypePinMap const stored = DataMap(); // DATA -> D, OUT -> Q
  Lum_TdmTypePinMap withNull;                 // DATA -> D, NC -> null
  withNull.SetPinMap(Port::StringBase<char>("DATA"), m_pD);
  withNull.SetPinMap(Port::StringBase<char>("NC"), nullptr);

  Lum_TdmTypePinMap const *shared = m_Manager.GetTypePinMap("dff", &stored);
  EXPECT_EQ(m_Manager.GetTypePinMap("dff", &withNull), shared);

  Lum_TdmTypePinMap const *nullFirst = m_Manager.GetTypePinMap("nulls", &withNull);
  EXPECT_NE(m_Manager.GetTypePinMap("nulls", &stored), nullFirst);
}

// A new key with an empty map stores one empty map; a null map is refused.
TEST_F(TdmTypePinMapMgrTest, EmptyAndNullMaps) {
  Lum_TdmTypePinMap const empty;
  Lum_TdmTypePinMap const *stored = m_Manager.GetTypePinMap("empty", &empty);
  ASSERT_NE(stored, nullptr);
  EXPECT_EQ(stored->GetNumPins(), 0u);
  EXPECT_EQ(m_Manager.GetTypePinMap("empty", &empty), stored);

  try {
    m_Manager.GetTypePinMap("dff", nullptr);
    FAIL() << "a null map was accepted";
  } catch (Lum_ExceptionInvalidTypeBlock const &e) {
    EXPECT_EQ(e.GetObjectName(), "dff");
    EXPECT_EQ(e.GetMessage(), "Null type pin map specified in GetTypePinMap.");
  }
}

} // namespace

// How a port's or a net's declaration is kept as a property value: what is
// written reads back the same, and what is not such a value is refused.

#include "../../interchange/s/Lum_NetlistNames.h"

#include <gtest/gtest.h>

#include <limits>

namespace {

Lum_NetlistVector Vector(std::uint32_t width, std::int32_t offset, bool upto, bool isSigned,
                         bool hidden, Lum_NetlistDirection direction) {
  Lum_NetlistVector vector;
  vector.bits.width = width;
  vector.offset = offset;
  vector.upto = upto;
  vector.isSigned = isSigned;
  vector.hidden = hidden;
  vector.direction = direction;
  return vector;
}

TEST(NetlistMeta, ReadsBackWhatItWrites) {
  Lum_NetlistVector const cases[] = {Vector(1, 0, false, false, false, Lum_NetlistDirection::Input),
                                     Vector(32, -7, true, true, true, Lum_NetlistDirection::Output),
                                     Vector(std::numeric_limits<std::uint32_t>::max(),
                                            std::numeric_limits<std::int32_t>::min(), false, true,
                                            false, Lum_NetlistDirection::Inout),
                                     Vector(0, std::numeric_limits<std::int32_t>::max(), true,
                                            false, true, Lum_NetlistDirection::Input)};
  for (Lum_NetlistVector const &written : cases) {
    Lum_NetlistVector port;
    ASSERT_TRUE(Lum_NetlistNames::ParseMeta(Lum_NetlistNames::PortMeta(written), true, port))
        << Lum_NetlistNames::PortMeta(written);
    EXPECT_EQ(port.direction, written.direction);
    EXPECT_EQ(port.bits.width, written.bits.width);
    EXPECT_EQ(port.offset, written.offset);
    EXPECT_EQ(port.upto, written.upto);
    EXPECT_EQ(port.isSigned, written.isSigned);

    Lum_NetlistVector net;
    ASSERT_TRUE(Lum_NetlistNames::ParseMeta(Lum_NetlistNames::NetMeta(written), false, net))
        << Lum_NetlistNames::NetMeta(written);
    EXPECT_EQ(net.bits.width, written.bits.width);
    EXPECT_EQ(net.offset, written.offset);
    EXPECT_EQ(net.upto, written.upto);
    EXPECT_EQ(net.isSigned, written.isSigned);
    EXPECT_EQ(net.hidden, written.hidden);
  }
  EXPECT_EQ(Lum_NetlistNames::PortMeta(cases[1]), "output 32 -7 1 1");
  EXPECT_EQ(Lum_NetlistNames::NetMeta(cases[1]), "32 -7 1 1 1");
}

TEST(NetlistMeta, RefusesWhatIsNotADeclaration) {
  struct Case {
    char const *text;
    bool port;
  };
  Case const cases[] = {{"", false},           {"", true},
                        {"1 0 0", false},      {"input 1 0 0", true},
                        {"1 0 0 0", false},    {"input 1 0", true},
                        {"1 x 0 0 0", false},  {"input -1 0 0 0", true},
                        {"1 0 0 0 1z", false}, {"input 1 0 0 99999999999", true}};
  for (Case const &entry : cases) {
    Lum_NetlistVector vector;
    vector.bits.width = 5;
    EXPECT_FALSE(Lum_NetlistNames::ParseMeta(entry.text, entry.port, vector)) << entry.text;
    EXPECT_EQ(vector.bits.width, 5U) << "changed by a refused value: " << entry.text;
  }
}

} // namespace

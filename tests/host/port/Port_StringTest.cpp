#include "Port_String.h"

#include <gtest/gtest.h>

#include <cstdio>
#include <string>

namespace {

// Each text converts as far as it can: a number out of range fails and stops the scan, and so
// does a conversion the scanner does not know, before it reads that argument. The targets start
// as 0; they are read as unsigned, so that a negative %d shows as its 32-bit value.
TEST(PortScanTest, ConvertsWithinRange) {
  struct {
    char const *text, *format;
    int result;
    unsigned first = 0, second = 0;
  } const cases[] = {{"3.1", "%d.%d", 2, 3, 1},
                     {"3", "%d.%d", 1, 3, 0},
                     {"", "%d.%d", EOF},
                     {"  ", "%d.%d", EOF},
                     {"abc", "%d.%d", 0},
                     {"3,1", "%d.%d", 1, 3, 0},
                     {" +7.-2x", "%d.%d", 2, 7, 0xFFFFFFFEu},
                     {"-1.0", "%d.%d", 2, 0xFFFFFFFFu, 0},
                     {"2147483647.-2147483648", "%d.%d", 2, 0x7FFFFFFFu, 0x80000000u},
                     {"2147483648.1", "%d.%d", 0},
                     {"4294967296.0", "%d.%d", 0},
                     {"99999999999999999999.1", "%d.%d", 0},
                     {"1.-2147483649", "%d.%d", 1, 1, 0},
                     {"-.5", "%d.%d", 0},
                     {"4294967295.0", "%u.%u", 2, 0xFFFFFFFFu, 0},
                     {"4294967296.0", "%u.%u", 0},
                     {"2.-1", "%u.%u", 2, 2, 0xFFFFFFFFu},
                     {"1.99999999999999999999999", "%u.%u", 1, 1, 0},
                     {" -5 %x9", " %d %% x%u", 2, 0xFFFFFFFBu, 9},
                     {"-5%x9", " %d %% x%u", 2, 0xFFFFFFFBu, 9},
                     {"-5 x9", " %d %% x%u", 1, 0xFFFFFFFBu, 0}};
  for (auto const &c : cases) {
    SCOPED_TRACE(std::string(c.text) + " with " + c.format);
    int a = 0, b = 0;
    unsigned first = 0, second = 0;
    int result = 0;
    if (std::string(c.format) == "%d.%d") {
      result = Port::sscanf(c.text, "%d.%d", &a, &b);
      first = static_cast<unsigned>(a);
      second = static_cast<unsigned>(b);
    } else if (std::string(c.format) == "%u.%u") {
      result = Port::sscanf(c.text, "%u.%u", &first, &second);
    } else {
      result = Port::sscanf(c.text, " %d %% x%u", &a, &second);
      first = static_cast<unsigned>(a);
    }
    EXPECT_EQ(result, c.result);
    EXPECT_EQ(first, c.first);
    EXPECT_EQ(second, c.second);
  }

  unsigned value = 0;
  char word[8] = "keep";
  EXPECT_EQ(Port::sscanf("8 word", "%u %7s", &value, word), 1);
  EXPECT_EQ(value, 8u);
  EXPECT_STREQ(word, "keep");
}

} // namespace

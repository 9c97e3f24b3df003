#include "Lum_ExceptionInvalidFormat.h"

#include <gtest/gtest.h>

TEST(Lum_ExceptionInvalidFormat, NamesTheFileAndWhereInIt) {
  Lum_ExceptionInvalidFormat const error(__FILE__, __LINE__, "cells.lib", 3, 7, "line 3, column 7",
                                         "expected ';'");
  Lum_Exception const &base = error;
  EXPECT_EQ(base.GetObjectName(), "cells.lib");
  EXPECT_EQ(base.GetMessage(), "line 3, column 7: expected ';'");
  EXPECT_EQ(error.GetInputLine(), 3U);
  EXPECT_EQ(error.GetInputColumn(), 7U);
}

// Under AddressSanitizer the host's pools hide no use after free.

#include "Orb_Sanitizer.h"
#include "Orb_Model.h"

#include <gtest/gtest.h>

#include <cstdio>
#include <string>

namespace {

// A freed pin's slot stays poisoned while the pool keeps it: reading the pin is reported.
TEST(HostSanitizerDeathTest, UseOfAFreedPinIsReported) {
  if (!ORB_ADDRESS_SANITIZER)
    GTEST_SKIP() << "not built with AddressSanitizer";
  GTEST_FLAG_SET(death_test_style, "threadsafe");
  EXPECT_DEATH(
      {
        Orb_Model model("m", "db", "", false);
        Orb_Block *top =
            model.CreateDesignMgr("dm")->CreateDesign("d")->CreateView("v")->CreateTopBlock("t");
        Orb_Pin *pin = top->CreatePin("p", Orb_Pin::PIN_INPUT);
        top->DeletePin(pin);
        std::string const name(pin->GetNameString());
        std::fprintf(stderr, "read %s\n", name.c_str());
      },
      "AddressSanitizer: use-after-poison");
}

} // namespace

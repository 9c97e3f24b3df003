#pragma once

#include "Lum_PlatformApi.h"

#include <ctime>
#include <string>

// A moment in time, by default the moment of construction.
class LUM_PLATFORM_API UT_TIMESTAMP {
public:
  UT_TIMESTAMP();
  explicit UT_TIMESTAMP(std::time_t seconds) : m_Seconds(seconds) {}

  // ISO 8601 UTC text, for instance "2026-01-31T12:34:56Z".
  std::string getTimeStampString() const;
  std::time_t GetSeconds() const { return m_Seconds; }

private:
  std::time_t m_Seconds;
};

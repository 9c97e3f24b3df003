#pragma once

#include "Lum_PlatformApi.h"

#include <string>

// A device personality: personality name and part. The third argument is
// reserved and passed as null.
class LUM_PLATFORM_API PM_PIC {
public:
  PM_PIC(char const *personality, char const *part, char const *reserved);

  std::string const &GetPersonality() const { return m_Personality; }
  std::string const &GetPart() const { return m_Part; }

private:
  std::string m_Personality;
  std::string m_Part;
};

#pragma once

#include "Port_Exception.h"

// Failures of the host model: duplicate names, unreadable or corrupt design
// databases, failed saves, misuse of host objects.
class LUM_PLATFORM_API Orb_Exception : public Port::Exception {
public:
  Orb_Exception(char const *file, int line, char const *objectName, char const *message);
  ~Orb_Exception() override;
};

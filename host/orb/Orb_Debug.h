#pragma once

#include "Lum_PlatformApi.h"

namespace Port {
class Stream;
}

// The host's debug printer. Its conversions are Port::vformat's and safe:
// %s, %d, %u, %c, %x (uintptr_t: callers pass pointers as uintptr_t), %lU
// (uint64_t) and %%, each with flags, width and precision. An unknown
// conversion ends the formatting: the rest is printed as it stands and no
// further argument is read.
class LUM_PLATFORM_API Orb_Debug {
public:
  // Writes to the current debug output (standard output unless redirected).
  static void Printf(char const *format, ...);
  // Writes `indent` levels of indentation (two blanks each), then the text.
  static void Printf(Port::Stream *stream, int indent, char const *format, ...);

  // Redirects the output of the first form; null restores standard output.
  // Returns the previous stream (null for standard output).
  static Port::Stream *SetOutput(Port::Stream *stream);
};

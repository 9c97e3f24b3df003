#pragma once

// The system calls through which the host's writer makes a saved database
// durable. Tests replace them to make a save fail at a chosen step; the
// default calls the system directly.

#include "Lum_PlatformApi.h"

#include <cstddef>
#include <sys/types.h>

struct LUM_PLATFORM_API Orb_FileOps {
  ssize_t (*write)(int fd, void const *data, std::size_t size);
  int (*fsync)(int fd);
  int (*close)(int fd);
  int (*rename)(char const *from, char const *to);

  // The operations in use.
  static Orb_FileOps const &Get();
  // Puts `ops` in place and returns the ones it replaces. Not for concurrent
  // use with a save.
  static Orb_FileOps Set(Orb_FileOps const &ops);
  // The system's own calls.
  static Orb_FileOps System();
};

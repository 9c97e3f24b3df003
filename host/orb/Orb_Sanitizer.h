#pragma once

// What the host's own allocators tell AddressSanitizer. ORB_ADDRESS_SANITIZER
// is 1 in a build with AddressSanitizer, under GCC (__SANITIZE_ADDRESS__) and
// clang (__has_feature); then the small-block pools step aside for the heap,
// and the object pools poison a freed slot until it is handed out again, so
// that a use after free of any host object is reported.

#include <cstddef>

#if defined(__SANITIZE_ADDRESS__)
#define ORB_ADDRESS_SANITIZER 1
#elif defined(__has_feature)
#if __has_feature(address_sanitizer)
#define ORB_ADDRESS_SANITIZER 1
#endif
#endif
#ifndef ORB_ADDRESS_SANITIZER
#define ORB_ADDRESS_SANITIZER 0
#endif

#if ORB_ADDRESS_SANITIZER
#include <sanitizer/asan_interface.h>
#endif

// Marks memory the program holds but must not touch (a freed slot).
inline void Orb_Poison(void const *memory, std::size_t size) {
#if ORB_ADDRESS_SANITIZER
  ASAN_POISON_MEMORY_REGION(memory, size);
#else
  static_cast<void>(memory);
  static_cast<void>(size);
#endif
}

// Makes poisoned memory usable again (a slot handed out).
inline void Orb_Unpoison(void const *memory, std::size_t size) {
#if ORB_ADDRESS_SANITIZER
  ASAN_UNPOISON_MEMORY_REGION(memory, size);
#else
  static_cast<void>(memory);
  static_cast<void>(size);
#endif
}

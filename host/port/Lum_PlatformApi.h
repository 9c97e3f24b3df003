#pragma once

// Symbols of the platform stand-in library that its users may reach.
#define LUM_PLATFORM_API __attribute__((visibility("default")))

#pragma once

// Symbols of libLum_Interchange that other programs may use.
#define LUM_INTERCHANGE_API __attribute__((visibility("default")))

#pragma once

// The stored schema of typed designs: every property name that carries
// typing, the values of the design mark and the format version a view is
// stamped with. Everything that reads or writes these properties by name
// takes them from here.

namespace Lum_TdmSchema {

// ---- Designs

// The design mark: absent or kDesignTypeUser on a user design; any other
// value marks a design that no typed design model loads (a type library's).
constexpr char const kDesignType[] = "TDS_DESIGN_TYPE";
constexpr char const kDesignTypeUser[] = "TDS_DESIGN_TYPE_USER";
constexpr char const kDesignTypeLibrary[] = "TDS_DESIGN_TYPE_LIBRARY";

// ---- Views

// The format stamp, "<version>.<revision>".
constexpr char const kVersion[] = "TDS_TDM_VERSION";
// The type libraries the view's blocks draw from: one "<name> <version>.<revision>
// [<qualifier>...]" entry per library.
constexpr char const kTypeLibraries[] = "TDS_VIEW_TYPE_LIBS";
// The device personality the libraries are loaded for.
constexpr char const kDevicePm[] = "TDS_DEVICE_PM";
constexpr char const kDevicePart[] = "TDS_DEVICE_PART";
// Keeps a load from creating the type pins a typed block lacks; a commit
// removes it.
constexpr char const kDontCreateUnusedPins[] = "LUM_DONT_CREATE_UNUSED_PINS";

// ---- Blocks

// A typed block's type block, "<library>:<type block>".
constexpr char const kBlockType[] = "TDS_BLOCK_TYPE";
// A list with one member per pin named otherwise than its type pin:
// pin name = type pin name.
constexpr char const kBlockPinMap[] = "TDS_BLOCK_PIN_MAP";
// An untyped copy's origin, "<library database>:<type block> <time stamp>".
constexpr char const kLibraryAssociation[] = "TDS_LIBRARY_ASSOC";

// ---- Format

// The format this software writes and reads up to: 3.1. Stamps from 0.0 to
// 0.2 are too old to read.
constexpr unsigned kFormatVersion = 3;
constexpr unsigned kFormatRevision = 1;
constexpr char const kFormatStamp[] = "3.1";
constexpr unsigned kOldestReadableRevision = 3; // of version 0

} // namespace Lum_TdmSchema

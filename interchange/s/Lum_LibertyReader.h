#pragma once

// The Liberty reader: the cells of a `library (name) { ... }` file with
// their logic pins (scalar pins, bus bits, bundle members) and directions.
// Supply pins, internal pins and the pins of test_cell, ff, latch and
// statetable groups are not logic pins; every group the reader does not
// interpret (timing, power, tables, templates, ...) is skipped by brace
// matching.

#include "Lum_CellLibraryData.h"

class Lum_LibertyScanner;

class Lum_LibertyReader {
public:
  // Reads the whole input. An invalid file or an ambiguous cell (two cells
  // or two pins of one name, a bus that disagrees with its type, a pin
  // without a direction) throws Lum_ExceptionInvalidFormat naming the cell,
  // line and column.
  static Lum_CellLibraryData Read(Lum_LibertyScanner &scanner);
};

#pragma once

// What the cell-library readers extract from a file, before it becomes a
// type library: cells with their logic pins in port order and the few
// properties users query afterwards.

#include <cstddef>
#include <string>
#include <vector>

// Bounds on what a file may make, so that a small hostile file cannot make
// the readers build a huge library: pins of all cells together, bits of one
// bus, and bus bits that member pin groups may address in all.
constexpr std::size_t kLumCellMaxPins = std::size_t(1) << 20;
constexpr long kLumCellMaxBusWidth = 1L << 16;
constexpr std::size_t kLumCellMaxMemberBits = std::size_t(1) << 22;

enum class Lum_CellPinDirection { Input, Output, Inout };

struct Lum_CellPinData {
  std::string name; // a bus bit is "B[3]"
  Lum_CellPinDirection direction = Lum_CellPinDirection::Input;
  std::string function; // empty when the file gives none
  std::string clock;
  std::string threeState; // the enable of a tri-state output; empty for others
};

struct Lum_CellData {
  std::string name;
  std::size_t line = 0;
  std::size_t column = 0;
  std::string area;
  std::string dontUse;
  std::string supplyPins; // "VDD:primary_power VSS:primary_ground"
  std::size_t supplyPinCount = 0;
  std::size_t buses = 0;
  std::size_t internalPins = 0;
  std::vector<Lum_CellPinData> pins;
};

struct Lum_CellLibraryData {
  std::string name; // the file's own name for the library
  std::size_t line = 0;
  std::size_t column = 0;
  std::string format; // "liberty" or "json"
  std::string revision;
  std::string date;
  std::vector<Lum_CellData> cells;
};

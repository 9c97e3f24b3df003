#pragma once

#include "Lum_Exception.h"
#include "Lum_InterchangeApi.h"

#include <cstddef>
#include <string>

// A file of a real format (a cell library or a netlist) that cannot be read:
// the object name is the file's path, the message says where in it ("line L,
// column C" or, for JSON, the path in the document) and what was expected.
class LUM_INTERCHANGE_API Lum_ExceptionInvalidFormat : public Lum_Exception {
public:
  // `where` is the position as it reads in the message ("line 3, column 7"
  // or "modules.cpu.cells.$abc$12.connections.A"); line and column are 0
  // when the position is not a line and column.
  Lum_ExceptionInvalidFormat(char const *sourceFile, int sourceLine, std::string const &inputPath,
                             std::size_t line, std::size_t column, std::string const &where,
                             std::string const &what);
  ~Lum_ExceptionInvalidFormat() override;

  std::string const &GetInputPath() const { return GetObjectName(); }
  std::size_t GetInputLine() const { return m_InputLine; }
  std::size_t GetInputColumn() const { return m_InputColumn; }

private:
  std::size_t m_InputLine;
  std::size_t m_InputColumn;
};

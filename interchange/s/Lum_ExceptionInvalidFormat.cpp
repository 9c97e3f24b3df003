#include "Lum_ExceptionInvalidFormat.h"

namespace {
std::string Message(std::string const &where, std::string const &what) {
  return where.empty() ? what : where + ": " + what;
}
} // namespace

Lum_ExceptionInvalidFormat::Lum_ExceptionInvalidFormat(char const *sourceFile, int sourceLine,
                                                       std::string const &inputPath,
                                                       std::size_t line, std::size_t column,
                                                       std::string const &where,
                                                       std::string const &what)
    : Lum_Exception("Lum", sourceFile, "$Revision: 1.1 $", sourceLine, inputPath.c_str(),
                    Message(where, what).c_str(), false),
      m_InputLine(line), m_InputColumn(column) {}

Lum_ExceptionInvalidFormat::~Lum_ExceptionInvalidFormat() = default;

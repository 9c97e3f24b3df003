#include "Lum_CellLibraryReader.h"

#include "Lum_CellLibraryData.h"
#include "Lum_CellModelReader.h"
#include "Lum_ExceptionInvalidFormat.h"
#include "Lum_LibertyReader.h"
#include "Lum_LibertyScanner.h"
#include "Lum_MappedFile.h"

#include "Lum_Tlm.h"
#include "Orb_Model.h"

#include <cerrno>
#include <charconv>
#include <cstdio>
#include <cstring>

namespace {

struct FileCloser {
  void operator()(std::FILE *file) const { std::fclose(file); }
};
using File = std::unique_ptr<std::FILE, FileCloser>;

[[noreturn]] void Fail(std::string const &path, std::size_t line, std::size_t column,
                       std::string const &what) {
  std::string const where =
      line == 0 ? std::string()
                : "line " + std::to_string(line) + ", column " + std::to_string(column);
  throw Lum_ExceptionInvalidFormat(__FILE__, __LINE__, path, line, column, where, what);
}

// JSON cell models start with '{'; a Liberty file never does.
bool IsJson(std::string_view head) {
  if (head.substr(0, 3) == "\xEF\xBB\xBF")
    head.remove_prefix(3);
  std::size_t const first = head.find_first_not_of(" \t\r\n");
  return first != std::string_view::npos && head[first] == '{';
}

// "dir/cells.json" gives "cells".
std::string Stem(std::string const &path) {
  std::size_t const slash = path.find_last_of('/');
  std::string name = slash == std::string::npos ? path : path.substr(slash + 1);
  std::size_t const dot = name.find_last_of('.');
  if (dot != std::string::npos && dot > 0)
    name.resize(dot);
  return name;
}

// The first two numbers of a revision ("$Revision: 0.1.0 $" gives 0.1);
// 1.0 when it has none.
void ParseVersion(std::string const &text, unsigned &version, unsigned &revision) {
  version = 1;
  revision = 0;
  std::size_t const digit = text.find_first_of("0123456789");
  if (digit == std::string::npos)
    return;
  char const *const end = text.data() + text.size();
  unsigned major = 0;
  auto result = std::from_chars(text.data() + digit, end, major);
  if (result.ec != std::errc())
    return;
  unsigned minor = 0;
  if (result.ptr + 1 < end && *result.ptr == '.') {
    auto const next = std::from_chars(result.ptr + 1, end, minor);
    if (next.ec != std::errc())
      minor = 0;
  }
  version = major;
  revision = minor;
}

bool ValidName(std::string const &name, char const *forbidden) {
  return !name.empty() && name.find('\0') == std::string::npos &&
         name.find_first_of(forbidden) == std::string::npos;
}

std::unique_ptr<Lum_TlmModel> Build(Lum_CellLibraryData const &data, std::string const &path,
                                    Lum_CellLibraryOptions const &options,
                                    Lum_CellLibrarySummary *summary) {
  std::string name = options.name;
  if (name.empty())
    name = data.name.empty() ? Stem(path) : data.name;
  if (!ValidName(name, " :"))
    Fail(path, options.name.empty() ? data.line : 0, data.column,
         "the type library name \"" + name +
             "\" must not be empty nor hold a space or ':'; give another name");
  // Checked before anything is made: a cell refused halfway would leave a
  // half-built library.
  for (Lum_CellData const &cell : data.cells) {
    if (!ValidName(cell.name, ":"))
      Fail(path, cell.line, cell.column,
           "cell \"" + cell.name + "\": a type block name must not be empty nor hold ':'");
    for (Lum_CellPinData const &pin : cell.pins)
      if (!ValidName(pin.name, ""))
        Fail(path, cell.line, cell.column,
             "cell \"" + cell.name + "\": a pin name must not be empty nor hold a NUL byte");
  }

  unsigned version = 1;
  unsigned revision = 0;
  ParseVersion(data.revision, version, revision);
  auto model = std::make_unique<Lum_TlmModel>(name.c_str(), name.c_str(), "", false);
  Lum_TlmLibrary *library = model->CreateLibrary(name.c_str(), version, revision,
                                                 options.personality.c_str(), options.part.c_str());
  library->CreatePropertyString(Lum_CellLibraryNames::kSourceFormat, data.format.c_str());
  if (!data.revision.empty())
    library->CreatePropertyString(Lum_CellLibraryNames::kRevision, data.revision.c_str());
  if (!data.date.empty())
    library->CreatePropertyString(Lum_CellLibraryNames::kDate, data.date.c_str());

  Lum_CellLibrarySummary found;
  found.name = name;
  for (Lum_CellData const &cell : data.cells) {
    Lum_TlmBlock *block = library->CreateTypeBlock(cell.name.c_str());
    if (!cell.area.empty())
      block->CreatePropertyString(Lum_CellLibraryNames::kArea, cell.area.c_str());
    if (!cell.dontUse.empty())
      block->CreatePropertyString(Lum_CellLibraryNames::kDontUse, cell.dontUse.c_str());
    if (!cell.supplyPins.empty())
      block->CreatePropertyString(Lum_CellLibraryNames::kSupplyPins, cell.supplyPins.c_str());
    for (Lum_CellPinData const &pin : cell.pins) {
      Orb_Pin::PIN_DIRECTION direction = Orb_Pin::PIN_INPUT;
      switch (pin.direction) {
      case Lum_CellPinDirection::Input:
        ++found.inputs;
        break;
      case Lum_CellPinDirection::Output:
        direction = Orb_Pin::PIN_OUTPUT;
        ++found.outputs;
        break;
      case Lum_CellPinDirection::Inout:
        direction = Orb_Pin::PIN_BIDIRECTIONAL;
        ++found.inouts;
        break;
      }
      Lum_TlmPin *typePin = block->CreatePin(pin.name.c_str(), direction);
      if (!pin.function.empty())
        typePin->CreatePropertyString(Lum_CellLibraryNames::kFunction, pin.function.c_str());
      if (!pin.clock.empty())
        typePin->CreatePropertyString(Lum_CellLibraryNames::kClock, pin.clock.c_str());
      if (!pin.threeState.empty())
        typePin->CreatePropertyString(Lum_CellLibraryNames::kThreeState, pin.threeState.c_str());
    }
    ++found.cells;
    found.buses += cell.buses;
    found.internalPins += cell.internalPins;
    found.supplyPins += cell.supplyPinCount;
    if (cell.dontUse == "true")
      found.dontUse.push_back(cell.name);
  }
  if (summary)
    *summary = std::move(found);
  return model;
}

} // namespace

std::unique_ptr<Lum_TlmModel> Lum_CellLibraryReader::Read(std::string const &path,
                                                          Lum_CellLibraryOptions const &options,
                                                          Lum_CellLibrarySummary *summary) {
  File file(std::fopen(path.c_str(), "rb"));
  if (!file)
    Fail(path, 0, 0, std::string("cannot be opened: ") + std::strerror(errno));
  char head[4096];
  std::size_t const got = std::fread(head, 1, sizeof head, file.get());
  if (!IsJson(std::string_view(head, got))) {
    // Liberty files are streamed: they run to hundreds of megabytes.
    if (std::fseek(file.get(), 0, SEEK_SET) != 0)
      Fail(path, 0, 0, std::string("cannot be read: ") + std::strerror(errno));
    Lum_LibertyScanner scanner(file.get(), path);
    return Build(Lum_LibertyReader::Read(scanner), path, options, summary);
  }
  Lum_MappedFile const text(path);
  return Build(Lum_CellModelReader::Read(text.Text(), path), path, options, summary);
}

std::unique_ptr<Lum_TlmModel> Lum_CellLibraryReader::ReadText(std::string_view text,
                                                              std::string const &path,
                                                              Lum_CellLibraryOptions const &options,
                                                              Lum_CellLibrarySummary *summary) {
  if (IsJson(text.substr(0, 4096)))
    return Build(Lum_CellModelReader::Read(text, path), path, options, summary);
  Lum_LibertyScanner scanner(text, path);
  return Build(Lum_LibertyReader::Read(scanner), path, options, summary);
}

std::string Lum_CellLibraryReader::Save(Lum_TlmModel const &library, std::string const &dir) {
  auto const managers = library.GetOrbModel()->GetDesignMgrs();
  if (managers.begin() == managers.end())
    Fail(dir, 0, 0, "the model holds no type library to save");
  std::string const name = (*managers.begin())->GetName();
  std::string path = (dir.empty() ? std::string(".") : dir) + "/" + name + ".tlm";
  library.Save(path.c_str());
  return path;
}

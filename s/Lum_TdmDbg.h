#pragma once

// Framing shared by the own dumps (Dbg) of the library's classes.

#include "Orb_Debug.h"

#include <cxxabi.h>

#include <algorithm>
#include <cstdlib>
#include <string>
#include <typeinfo>

namespace Lum_TdmDbgDetail {

// The readable name of `const T*` with "const" and "*" taken out: the class
// whose DbgImpl runs.
template <class T> std::string ClassName() {
  char const *mangled = typeid(T const *).name();
  int status = 0;
  char *demangled = abi::__cxa_demangle(mangled, nullptr, nullptr, &status);
  std::string name = status == 0 && demangled ? demangled : mangled;
  std::free(demangled);
  // Drop the pointer and every "const" word, keep the rest as it stands.
  std::string result;
  std::size_t pos = 0;
  while (pos < name.size()) {
    std::size_t const start = name.find_first_not_of(" *", pos);
    if (start == std::string::npos)
      break;
    std::size_t const stop = std::min(name.find_first_of(" *", start), name.size());
    std::string const word = name.substr(start, stop - start);
    if (word != "const")
      result += (result.empty() ? "" : " ") + word;
    pos = stop;
  }
  return result;
}

inline char const *RuleLine() { return "=======================================\n"; }
inline char const *PlusLine() { return "+++++++++++++++++++++++++++++++++++++++\n"; }

} // namespace Lum_TdmDbgDetail

// Prints the own dump of `self`: the class name of T, the lines that
// `ownLines` prints, then the host base's dump through `hostDump`.
template <class T, class OwnLines, class HostDump>
void Lum_TdmDbgFrame(OwnLines const &ownLines, HostDump const &hostDump) {
  using namespace Lum_TdmDbgDetail;
  Orb_Debug::Printf(RuleLine());
  Orb_Debug::Printf("Data for class <%s>:\n", ClassName<T>().c_str());
  ownLines();
  Orb_Debug::Printf(RuleLine());
  Orb_Debug::Printf("Orb data:\n");
  hostDump();
  Orb_Debug::Printf(RuleLine());
}

// Prints a callback dump: the plus line, the title, the own lines, the plus
// line, each with the host's stream and indentation.
template <class OwnLines>
void Lum_TdmDbgCallbackFrame(Port::Stream *stream, int indent, char const *title,
                             OwnLines const &ownLines) {
  using namespace Lum_TdmDbgDetail;
  Orb_Debug::Printf(stream, indent, PlusLine());
  Orb_Debug::Printf(stream, indent, title);
  ownLines();
  Orb_Debug::Printf(stream, indent, PlusLine());
}

#pragma once

// Framing shared by the own dumps (Dbg) of the library's classes.

#include "Orb_Debug.h"

#include <cxxabi.h>

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
  for (std::string const cut : {"const", "*"})
    for (auto pos = name.find(cut); pos != std::string::npos; pos = name.find(cut))
      name.erase(pos, cut.size());
  auto const first = name.find_first_not_of(' ');
  auto const last = name.find_last_not_of(' ');
  return first == std::string::npos ? name : name.substr(first, last - first + 1);
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

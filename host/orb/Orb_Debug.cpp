#include "Orb_Debug.h"

#include "Orb_Derived.h"
#include "Orb_Model.h"
#include "Port_Stream.h"
#include "Port_String.h"

#include <cstdarg>
#include <cstdio>

namespace {
// Where the printer's first form writes; null means standard output.
Port::Stream *g_pDebugOutput = nullptr;
} // namespace

void Orb_Debug::Printf(char const *format, ...) {
  va_list args;
  va_start(args, format);
  std::string const text = Port::vformat(format, args);
  va_end(args);
  if (g_pDebugOutput)
    g_pDebugOutput->Write(text);
  else
    std::fwrite(text.data(), 1, text.size(), stdout);
}

void Orb_Debug::Printf(Port::Stream *stream, int indent, char const *format, ...) {
  va_list args;
  va_start(args, format);
  std::string text(indent > 0 ? static_cast<std::size_t>(indent) * 2 : 0, ' ');
  text += Port::vformat(format, args);
  va_end(args);
  // Without a stream of its own the text follows the redirected output.
  if (!stream)
    stream = g_pDebugOutput;
  if (stream)
    stream->Write(text);
  else
    std::fwrite(text.data(), 1, text.size(), stdout);
}

Port::Stream *Orb_Debug::SetOutput(Port::Stream *stream) {
  Port::Stream *previous = g_pDebugOutput;
  g_pDebugOutput = stream;
  return previous;
}

void Orb_Persistent::DebugDump(Port::Stream *stream, int indent) const {
  Orb_Debug::Printf(stream, indent, "%s <%s>\n", Orb_KindName(GetKind()), GetName());
  DumpProperties(stream, indent + 1);
  for (Orb_ModelDerived *context : GetModel()->GetContexts())
    if (Orb_ClientObject *client = context->GetClient(this))
      client->DebugDumpCallback(stream, indent + 1);
}

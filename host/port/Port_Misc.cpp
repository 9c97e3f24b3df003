// Streams, exceptions, the message manager and time stamps.

#include "Port_Exception.h"
#include "Port_MsgManData.h"
#include "Port_Stream.h"
#include "Port_String.h"
#include "UT_TIMESTAMP.h"

#include <cstdarg>
#include <cstdio>
#include <ctime>

namespace Port {

Stream::~Stream() = default;

void FileStream::Write(char const *data, std::size_t size) { std::fwrite(data, 1, size, m_pFile); }

Exception::Exception(char const *subsystem, char const *file, char const *revision, int line,
                     char const *objectName, char const *message, bool flag)
    : m_Subsystem(subsystem ? subsystem : ""), m_File(file ? file : ""),
      m_Revision(revision ? revision : ""), m_Line(line),
      m_ObjectName(objectName ? objectName : ""), m_Message(message ? message : ""), m_Flag(flag) {
  m_What = m_Subsystem + " error at " + m_File + ":" + std::to_string(m_Line);
  if (!m_Revision.empty())
    m_What += " (" + m_Revision + ")";
  m_What += ": ";
  if (!m_ObjectName.empty())
    m_What += "<" + ShownName(m_ObjectName) + "> ";
  m_What += m_Message;
}

std::string Exception::ShownName(std::string_view name) {
  if (name.size() <= kMaxShownName)
    return std::string(name);
  std::size_t cut = kMaxShownName;
  // Back to the start of a UTF-8 sequence: continuation bytes are 10xxxxxx.
  for (std::size_t back = 0; back < 3 && (static_cast<unsigned char>(name[cut]) & 0xC0) == 0x80;
       ++back)
    --cut;
  return std::string(name.substr(0, cut)) + "... (" + std::to_string(name.size()) + " bytes)";
}

Exception::~Exception() = default;

} // namespace Port

namespace {

// The calling thread's innermost live capture, or null when its reports go
// to standard error. Per thread: a capture collects only the reports of the
// thread that made it.
thread_local Port_MsgCapture *g_pCapture = nullptr;

} // namespace

void Port_MsgManData::Report(Port_MsgReport report) {
  if (g_pCapture) {
    g_pCapture->m_Reports.push_back(std::move(report));
    return;
  }
  if (report.severity == Port_MsgReport::ERROR)
    std::fprintf(stderr, "%s error (%s:%d): %s", report.subsystem.c_str(), report.path.c_str(),
                 report.line, report.text.c_str());
  else
    std::fprintf(stderr, "debug: %s", report.text.c_str());
  if (report.text.empty() || report.text.back() != '\n')
    std::fputc('\n', stderr);
}

Port_MsgManData::Port_MsgManData(char const *subsystem, char const *path, int line,
                                 char const *revision)
    : m_Subsystem(subsystem ? subsystem : ""), m_Path(path ? path : ""), m_Line(line),
      m_Revision(revision ? revision : "") {}

Port_MsgManData Port_MsgManData::createObject(char const *subsystem, char const *path, int line,
                                              char const *revision) {
  return Port_MsgManData(subsystem, path, line, revision);
}

void Port_MsgManData::issueError(char const *format, ...) const {
  va_list args;
  va_start(args, format);
  std::string text = Port::vformat(format, args);
  va_end(args);
  Report({Port_MsgReport::ERROR, m_Subsystem, m_Path, m_Line, m_Revision, std::move(text)});
}

void Port_MsgManData::debugStub(char const *format, ...) {
  va_list args;
  va_start(args, format);
  std::string text = Port::vformat(format, args);
  va_end(args);
  Report({Port_MsgReport::DEBUG_WARNING, "", "", 0, "", std::move(text)});
}

Port_MsgCapture::Port_MsgCapture() : m_pOuter(g_pCapture) { g_pCapture = this; }

Port_MsgCapture::~Port_MsgCapture() { g_pCapture = m_pOuter; }

UT_TIMESTAMP::UT_TIMESTAMP() : m_Seconds(std::time(nullptr)) {}

std::string UT_TIMESTAMP::getTimeStampString() const {
  std::tm parts{};
  gmtime_r(&m_Seconds, &parts);
  char text[32];
  std::strftime(text, sizeof text, "%Y-%m-%dT%H:%M:%SZ", &parts);
  return text;
}

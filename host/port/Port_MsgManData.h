#pragma once

#include "Lum_PlatformApi.h"

#include <string>
#include <vector>

// One report issued through the message manager.
struct LUM_PLATFORM_API Port_MsgReport {
  enum Severity { ERROR, DEBUG_WARNING };
  Severity severity;
  std::string subsystem; // empty for debug warnings
  std::string path;
  int line;
  std::string revision;
  std::string text;
};

// A message record: where a report comes from. Reports go to standard error
// unless the reporting thread has a live Port_MsgCapture, which collects them
// instead.
class LUM_PLATFORM_API Port_MsgManData {
public:
  static Port_MsgManData createObject(char const *subsystem, char const *path, int line,
                                      char const *revision);

  // Reports the formatted text as an error of this record's origin.
  void issueError(char const *format, ...) const;

  // Reports a debug warning that changes nothing.
  static void debugStub(char const *format, ...);

private:
  static void Report(Port_MsgReport report);
  Port_MsgManData(char const *subsystem, char const *path, int line, char const *revision);

  std::string m_Subsystem;
  std::string m_Path;
  int m_Line;
  std::string m_Revision;
};

// While alive, collects every report of the thread that made it, in issue
// order, instead of printing it. Captures nest: the thread's innermost one
// collects. A capture is used and destroyed by the thread that made it.
class LUM_PLATFORM_API Port_MsgCapture {
public:
  Port_MsgCapture();
  ~Port_MsgCapture();
  Port_MsgCapture(Port_MsgCapture const &) = delete;
  Port_MsgCapture &operator=(Port_MsgCapture const &) = delete;

  std::vector<Port_MsgReport> const &GetReports() const { return m_Reports; }
  void Clear() { m_Reports.clear(); }

private:
  friend class Port_MsgManData;
  std::vector<Port_MsgReport> m_Reports;
  Port_MsgCapture *m_pOuter;
};

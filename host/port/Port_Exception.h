#pragma once

#include "Lum_PlatformApi.h"

#include <cstddef>
#include <exception>
#include <string>
#include <string_view>

namespace Port {

// Base of every exception of the platform and of the library. It carries
// where it was thrown (subsystem, source path, revision, line), the object
// concerned and the message.
class LUM_PLATFORM_API Exception : public std::exception {
public:
  Exception(char const *subsystem, char const *file, char const *revision, int line,
            char const *objectName, char const *message, bool flag);
  ~Exception() override;

  std::string const &GetSubsystem() const { return m_Subsystem; }
  std::string const &GetFile() const { return m_File; }
  std::string const &GetRevision() const { return m_Revision; }
  int GetLine() const { return m_Line; }
  std::string const &GetObjectName() const { return m_ObjectName; }
  std::string const &GetMessage() const { return m_Message; }
  bool GetFlag() const { return m_Flag; }

  // One readable line with every field: "<subsystem> error at <file>:<line>
  // (<revision>): <<object>> <message>". The object name appears as
  // ShownName gives it; GetObjectName keeps it whole.
  char const *what() const noexcept override { return m_What.c_str(); }

  // Names longer than this are cut when a message quotes them.
  static constexpr std::size_t kMaxShownName = 256;
  // `name` as messages quote it: whole up to kMaxShownName bytes; longer, its
  // first bytes (never half a UTF-8 character) followed by "... (<n> bytes)".
  static std::string ShownName(std::string_view name);

private:
  std::string m_Subsystem;
  std::string m_File;
  std::string m_Revision;
  int m_Line;
  std::string m_ObjectName;
  std::string m_Message;
  bool m_Flag;
  std::string m_What;
};

} // namespace Port

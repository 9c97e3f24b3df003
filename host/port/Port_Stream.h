#pragma once

#include "Lum_PlatformApi.h"

#include <cstddef>
#include <cstdio>
#include <string>

namespace Port {

// Output stream of the portability layer.
class LUM_PLATFORM_API Stream {
public:
  Stream() = default;
  Stream(Stream const &) = delete;
  Stream &operator=(Stream const &) = delete;
  virtual ~Stream();

  virtual void Write(char const *data, std::size_t size) = 0;
  void Write(std::string const &text) { Write(text.data(), text.size()); }
};

// Writes to a C stream it does not own (standard output by default).
class LUM_PLATFORM_API FileStream : public Stream {
public:
  explicit FileStream(std::FILE *file = stdout) : m_pFile(file) {}
  void Write(char const *data, std::size_t size) override;

private:
  std::FILE *m_pFile;
};

// Collects everything written to it.
class LUM_PLATFORM_API StringStream : public Stream {
public:
  void Write(char const *data, std::size_t size) override { m_Text.append(data, size); }
  std::string const &GetText() const { return m_Text; }
  void Clear() { m_Text.clear(); }

private:
  std::string m_Text;
};

} // namespace Port

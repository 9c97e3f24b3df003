#include "Lum_MappedFile.h"

#include "Lum_ExceptionInvalidFormat.h"

#include <algorithm>
#include <cerrno>
#include <cstdint>
#include <cstring>
#include <fcntl.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <unistd.h>

namespace {

[[noreturn]] void Fail(std::string const &path, std::string const &what) {
  throw Lum_ExceptionInvalidFormat(__FILE__, __LINE__, path, 0, 0, "file", what);
}

// Closes the descriptor when the constructor is done with it.
struct Descriptor {
  int fd;
  ~Descriptor() {
    if (fd >= 0)
      ::close(fd);
  }
};

} // namespace

Lum_MappedFile::Lum_MappedFile(std::string const &path, std::size_t padding) {
  Descriptor const file{::open(path.c_str(), O_RDONLY | O_CLOEXEC)};
  if (file.fd < 0)
    Fail(path, std::string("cannot be read: ") + std::strerror(errno));
  struct stat status {};
  if (::fstat(file.fd, &status) != 0)
    Fail(path, std::string("cannot be read: ") + std::strerror(errno));
  if (!S_ISREG(status.st_mode))
    Fail(path, "cannot be read: not a regular file");
  auto const page = static_cast<std::size_t>(::sysconf(_SC_PAGESIZE));
  auto const size = static_cast<std::uint64_t>(status.st_size);
  if (size > SIZE_MAX - padding - page)
    Fail(path, "cannot be read: too large to map");
  m_Size = static_cast<std::size_t>(size);
  // Zero pages reserved for contents and padding, then the file mapped over
  // their start: what follows its end reads as zeros (never an empty mapping).
  m_Length = std::max<std::size_t>((m_Size + padding + page - 1) / page * page, page);
  void *reserved = ::mmap(nullptr, m_Length, PROT_READ, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
  if (reserved == MAP_FAILED)
    Fail(path, std::string("cannot be mapped: ") + std::strerror(errno));
  m_Base = static_cast<char *>(reserved);
  if (m_Size == 0)
    return;
  if (::mmap(reserved, m_Size, PROT_READ, MAP_PRIVATE | MAP_FIXED, file.fd, 0) == MAP_FAILED) {
    int const error = errno;
    ::munmap(reserved, m_Length);
    Fail(path, std::string("cannot be mapped: ") + std::strerror(error));
  }
  ::madvise(reserved, m_Size, MADV_SEQUENTIAL);
}

Lum_MappedFile::~Lum_MappedFile() { ::munmap(m_Base, m_Length); }

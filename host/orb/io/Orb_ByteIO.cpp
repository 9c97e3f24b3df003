// The buffered file writer and reader of design databases.

#include "Orb_ByteIO.h"

#include "Orb_Exception.h"
#include "Orb_FileOps.h"

#include <algorithm>
#include <cerrno>
#include <charconv>
#include <cstring>
#include <dirent.h>
#include <fcntl.h>
#include <memory>
#include <signal.h>
#include <sys/stat.h>
#include <system_error>
#include <unistd.h>

namespace {

// Exceptions name the design database code, where callers look for them.
char const *const kSource = "host/Orb_ModelIO";
constexpr std::size_t kBufferSize = std::size_t(1) << 16;

// The file a save replaces: `path`, or the file that its chain of symbolic
// links ends at (which may not exist yet). Empty with errno set when a link
// cannot be read or the chain does not end.
std::string ResolveLinks(std::string path) {
  for (int hop = 0; hop < 40; ++hop) {
    struct stat status {};
    if (::lstat(path.c_str(), &status) != 0 || !S_ISLNK(status.st_mode))
      return path;
    std::string link(static_cast<std::size_t>(status.st_size) + 1, '\0');
    for (;;) {
      ssize_t const length = ::readlink(path.c_str(), link.data(), link.size());
      if (length < 0)
        return std::string();
      if (static_cast<std::size_t>(length) < link.size()) {
        link.resize(static_cast<std::size_t>(length));
        break;
      }
      link.resize(link.size() * 2 + 64); // changed since lstat, or st_size 0
    }
    // A relative link is relative to the directory that holds it.
    std::size_t const slash = path.rfind('/');
    if ((!link.empty() && link.front() == '/') || slash == std::string::npos) {
      path = std::move(link);
    } else {
      path.resize(slash + 1);
      path += link;
    }
  }
  errno = ELOOP;
  return std::string();
}

// Removes the "<target>.tmp.<pid>.<n>" files of processes that are gone,
// left behind by saves killed midway. A process that still exists, even one
// we may not signal, keeps its files; anything that cannot be removed stays.
void RemoveStaleTemporaries(std::string const &target) {
  std::size_t const slash = target.rfind('/');
  std::string const directory = slash == std::string::npos ? "." : target.substr(0, slash + 1);
  std::string const prefix =
      (slash == std::string::npos ? target : target.substr(slash + 1)) + ".tmp.";
  std::unique_ptr<DIR, int (*)(DIR *)> dir(::opendir(directory.c_str()), &::closedir);
  if (!dir)
    return;
  pid_t const self = ::getpid();
  while (dirent const *entry = ::readdir(dir.get())) {
    std::string_view const name = entry->d_name;
    if (name.size() <= prefix.size() || name.compare(0, prefix.size(), prefix) != 0)
      continue;
    // "<pid>.<n>", both decimal, nothing more.
    char const *const first = name.data() + prefix.size();
    char const *const last = name.data() + name.size();
    pid_t pid = 0;
    auto const parsed = std::from_chars(first, last, pid);
    if (parsed.ec != std::errc() || pid <= 0 || pid == self || parsed.ptr == last ||
        *parsed.ptr != '.' || parsed.ptr + 1 == last)
      continue;
    if (!std::all_of(parsed.ptr + 1, last, [](char c) { return c >= '0' && c <= '9'; }))
      continue;
    if (::kill(pid, 0) == 0 || errno != ESRCH)
      continue;
    ::unlinkat(::dirfd(dir.get()), entry->d_name, 0);
  }
}

} // namespace

namespace Orb_IO {

std::string QuotePath(std::string_view path) { return "'" + std::string(path) + "'"; }

ByteWriter::ByteWriter(std::string const &path) : m_Path(path), m_Target(ResolveLinks(path)) {
  if (m_Target.empty())
    Refuse(std::string("cannot follow the symbolic link: ") + std::strerror(errno));
  struct stat status {};
  if (::stat(m_Target.c_str(), &status) == 0 && S_ISREG(status.st_mode))
    m_Mode = static_cast<int>(status.st_mode & 07777);
  RemoveStaleTemporaries(m_Target);
  // Before the file exists: a constructor that throws after it would leave
  // the file behind, since the destructor does not run.
  m_Buffer.reserve(kBufferSize);
  // O_EXCL with a fresh suffix on collision: a stale file of a crashed save
  // or a concurrent save to the same target is never reused. Private until
  // Commit gives it the replaced file's bits.
  for (unsigned attempt = 0; m_Fd < 0; ++attempt) {
    m_TempPath = m_Target + ".tmp." + std::to_string(::getpid()) + "." + std::to_string(attempt);
    m_Fd = ::open(m_TempPath.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC,
                  m_Mode < 0 ? 0666 : 0600);
    if (m_Fd < 0 && (errno != EEXIST || attempt == 100))
      Fail("cannot create the temporary file", errno);
  }
}

ByteWriter::~ByteWriter() {
  if (m_Fd >= 0)
    ::close(m_Fd);
  if (!m_Committed)
    ::unlink(m_TempPath.c_str());
}

void ByteWriter::Fail(char const *step, int error) const {
  std::string const message = "Cannot save design database " + QuotePath(m_Path) + ": " + step +
                              " " + QuotePath(m_TempPath) + ": " + std::strerror(error) + ".";
  throw Orb_Exception(kSource, __LINE__, m_Path.c_str(), message.c_str());
}

void ByteWriter::Refuse(std::string const &what) const {
  std::string const message =
      "Cannot save design database " + QuotePath(m_Path) + ": " + what + ".";
  throw Orb_Exception(kSource, __LINE__, m_Path.c_str(), message.c_str());
}

void ByteWriter::Raw(std::string_view data) {
  if (m_Buffer.size() + data.size() > kBufferSize)
    Flush();
  m_Buffer.append(data);
}

void ByteWriter::Num(std::uint64_t value) {
  char digits[24];
  digits[0] = ' ';
  auto const result = std::to_chars(digits + 1, digits + sizeof digits, value);
  Raw(std::string_view(digits, static_cast<std::size_t>(result.ptr - digits)));
}

void ByteWriter::Str(std::string_view text) {
  if (text.size() > kMaxString)
    Refuse("a string of " + std::to_string(text.size()) + " bytes exceeds the limit of " +
           std::to_string(kMaxString) + " bytes");
  Num(text.size());
  Raw(":");
  Raw(text);
}

void ByteWriter::Flush() {
  char const *data = m_Buffer.data();
  std::size_t left = m_Buffer.size();
  while (left > 0) {
    ssize_t const written = Orb_FileOps::Get().write(m_Fd, data, left);
    if (written < 0) {
      if (errno == EINTR)
        continue;
      Fail("cannot write", errno);
    }
    data += written;
    left -= static_cast<std::size_t>(written);
  }
  m_Buffer.clear();
}

void ByteWriter::Commit() {
  Flush();
  if (m_Mode >= 0 && ::fchmod(m_Fd, static_cast<mode_t>(m_Mode)) != 0)
    Fail("cannot set the permissions of", errno);
  if (Orb_FileOps::Get().fsync(m_Fd) != 0)
    Fail("cannot flush", errno);
  int const fd = m_Fd;
  m_Fd = -1;
  if (Orb_FileOps::Get().close(fd) != 0)
    Fail("cannot close", errno);
  if (Orb_FileOps::Get().rename(m_TempPath.c_str(), m_Target.c_str()) != 0)
    Fail("cannot rename", errno);
  m_Committed = true;
}

ByteReader::ByteReader(std::string const &path) : m_Path(path), m_Buffer(kBufferSize) {
  m_Fd = ::open(path.c_str(), O_RDONLY | O_CLOEXEC);
  if (m_Fd < 0)
    Refuse(std::string("cannot be opened: ") + std::strerror(errno));
  struct stat status {};
  if (::fstat(m_Fd, &status) == 0 && S_ISREG(status.st_mode))
    m_FileSize = static_cast<std::uint64_t>(status.st_size);
}

ByteReader::~ByteReader() {
  if (m_Fd >= 0)
    ::close(m_Fd);
}

bool ByteReader::Fill() {
  m_BufferOffset += m_Size;
  m_Pos = m_Size = 0;
  for (;;) {
    ssize_t const got = ::read(m_Fd, m_Buffer.data(), m_Buffer.size());
    if (got >= 0) {
      m_Size = static_cast<std::size_t>(got);
      return got > 0;
    }
    if (errno != EINTR)
      Refuse(std::string("cannot be read: ") + std::strerror(errno));
  }
}

void ByteReader::Refuse(std::string const &what) const {
  std::string const message = "Design database " + QuotePath(m_Path) + " " + what + ".";
  throw Orb_Exception(kSource, __LINE__, m_Path.c_str(), message.c_str());
}

void ByteReader::Truncated() const {
  Refuse("is truncated at byte " + std::to_string(m_BufferOffset + m_Pos));
}

void ByteReader::Corrupt(std::string const &what) const {
  Refuse("is corrupt at byte " + std::to_string(m_BufferOffset + m_Pos) + ": " + what);
}

char ByteReader::Tag() {
  int const c = Get();
  if (c < 0)
    Truncated();
  return static_cast<char>(c);
}

void ByteReader::Expect(char expected, char const *what) {
  int const c = Get();
  if (c < 0)
    Truncated();
  if (c != static_cast<unsigned char>(expected))
    Corrupt(std::string("expected ") + what);
}

std::uint64_t ByteReader::Digits() {
  // Most numbers lie whole in the buffer: up to 18 digits followed by a
  // non-digit there cannot overflow and need no refill. Anything else takes
  // the careful loop below from the same place.
  constexpr std::ptrdiff_t kSafeDigits = 18;
  if (m_Size - m_Pos > static_cast<std::size_t>(kSafeDigits)) {
    char const *const begin = m_Buffer.data() + m_Pos;
    char const *p = begin;
    std::uint64_t fast = 0;
    for (unsigned digit = 0;
         p - begin <= kSafeDigits && (digit = static_cast<unsigned char>(*p) - unsigned('0')) < 10;
         ++p)
      fast = fast * 10 + digit;
    if (p != begin && p - begin <= kSafeDigits) {
      m_Pos += static_cast<std::size_t>(p - begin);
      return fast;
    }
  }
  std::uint64_t value = 0;
  bool any = false;
  for (;;) {
    if (m_Pos == m_Size && !Fill())
      Truncated();
    char const c = m_Buffer[m_Pos];
    if (c < '0' || c > '9')
      break;
    auto const digit = static_cast<std::uint64_t>(c - '0');
    if (value > (UINT64_MAX - digit) / 10)
      Corrupt("number too large");
    value = value * 10 + digit;
    any = true;
    ++m_Pos;
  }
  if (!any)
    Corrupt("expected a number");
  return value;
}

std::uint64_t ByteReader::Num() {
  Expect(' ', "a field");
  return Digits();
}

void ByteReader::Str(std::string &out) {
  Expect(' ', "a field");
  std::uint64_t left = Digits();
  Expect(':', "':' after a string length");
  // Refused before any byte of it is kept: a corrupt length must not make
  // the open read and hold gigabytes.
  std::uint64_t const read = m_BufferOffset + m_Pos;
  if (left > kMaxString)
    Corrupt("a " + std::to_string(left) + "-byte string exceeds the limit of " +
            std::to_string(kMaxString) + " bytes");
  if (m_FileSize != UINT64_MAX && read <= m_FileSize && left > m_FileSize - read)
    Truncated();
  out.clear();
  // Appended as the bytes arrive: a corrupt length cannot make us allocate
  // more than the file holds.
  while (left > 0) {
    if (m_Pos == m_Size && !Fill())
      Truncated();
    std::size_t const take =
        static_cast<std::size_t>(std::min<std::uint64_t>(left, m_Size - m_Pos));
    out.append(m_Buffer.data() + m_Pos, take);
    m_Pos += take;
    left -= take;
  }
}

void ByteReader::Name(std::string &out) {
  Str(out);
  if (out.find('\0') != std::string::npos)
    Corrupt("NUL byte in a name");
}

} // namespace Orb_IO

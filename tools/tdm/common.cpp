#include "common.h"

#include "Lum_TdmModel.h"
#include "Lum_TdmVerifier.h"
#include "Lum_TypeLibraryLoader.h"

#include "Lum_Tlm.h"
#include "Orb_Exception.h"
#include "Orb_Model.h"
#include "Port_Exception.h"
#include "Port_MsgManData.h"

#include <cerrno>
#include <chrono>
#include <cstdio>
#include <filesystem>
#include <sys/stat.h>
#include <unistd.h>

namespace tdm {

void ApplyLibraryPath(CommonOptions const &options) {
  for (std::string const &directory : options.libPath)
    Lum_TlmCatalog::AddSearchDirectory(directory.c_str());
}

std::string OneLine(std::string const &text) {
  std::string line;
  line.reserve(text.size());
  for (char c : text) {
    if (c == '\n' || c == '\r' || c == '\t')
      c = ' ';
    if (c == ' ' && (line.empty() || line.back() == ' '))
      continue;
    line += c;
  }
  while (!line.empty() && line.back() == ' ')
    line.pop_back();
  return line;
}

std::string Describe(Port::Exception const &e, std::string const &path) {
  std::string message = e.GetMessage();
  // The path shows escaped, as the rest of the line shows it, not folded.
  if (std::string const shown = Escaped(path); shown != path)
    for (std::size_t at = message.find(path); at != std::string::npos;
         at = message.find(path, at + shown.size()))
      message.replace(at, path.size(), shown);
  message = OneLine(message);
  if (e.GetObjectName().empty() || e.GetObjectName() == path)
    return message;
  return Quoted(Port::Exception::ShownName(e.GetObjectName())) + ": " + message;
}

namespace {

// Appends `c`, a control byte as \n, \r, \t or \xNN, and with `quoting` a
// quote or backslash after a backslash.
void AppendEscaped(std::string &out, char const c, bool quoting) {
  auto const byte = static_cast<unsigned char>(c);
  if (quoting && (c == '"' || c == '\\')) {
    out += '\\';
    out += c;
  } else if (c == '\n') {
    out += "\\n";
  } else if (c == '\t') {
    out += "\\t";
  } else if (byte < 0x20 || byte == 0x7f) {
    char hex[8];
    std::snprintf(hex, sizeof hex, "\\x%02x", byte);
    out += hex;
  } else {
    out += c;
  }
}

} // namespace

std::string Quoted(std::string const &name) {
  std::string quoted = "\"";
  for (char const c : name)
    AppendEscaped(quoted, c, true);
  return quoted + "\"";
}

std::string Escaped(std::string const &text) {
  std::string escaped;
  escaped.reserve(text.size());
  for (char const c : text)
    AppendEscaped(escaped, c, false);
  return escaped;
}

void RequireRegularFile(std::string const &path) {
  struct stat status {};
  if (::stat(path.c_str(), &status) != 0 || S_ISREG(status.st_mode))
    return;
  char const *what = S_ISDIR(status.st_mode)    ? "a folder"
                     : S_ISFIFO(status.st_mode) ? "a FIFO"
                     : S_ISSOCK(status.st_mode) ? "a socket"
                                                : "a device or other special file";
  throw Failure(kExitUnreadable, path + ": not a regular file (" + what + ")");
}

std::string DesignPath(Orb_Design const *design) { return Lum_TdmVerifier::DesignPath(design); }

std::string ViewPath(Orb_View const *view) { return Lum_TdmVerifier::ViewPath(view); }

std::string BlockPath(Orb_Block const *block) { return Lum_TdmVerifier::BlockPath(block); }

// ---------------------------------------------------------------------------
// Progress

Progress::Progress(std::string what, CommonOptions const &options) : m_What(std::move(what)) {
  if (!options.quiet && ::isatty(STDERR_FILENO))
    m_Thread = std::thread([this] { Run(); });
}

Progress::~Progress() { Stop(); }

void Progress::Stop() {
  if (!m_Thread.joinable())
    return;
  {
    std::lock_guard<std::mutex> const lock(m_Mutex);
    m_Done = true;
  }
  m_Wake.notify_one();
  m_Thread.join();
  if (m_Shown)
    std::fprintf(stderr, "\r\033[K");
}

void Progress::Run() {
  using Clock = std::chrono::steady_clock;
  auto const start = Clock::now();
  std::unique_lock<std::mutex> lock(m_Mutex);
  // Nothing for the first second, then a refresh four times a second.
  if (m_Wake.wait_for(lock, std::chrono::seconds(1), [this] { return m_Done; }))
    return;
  do {
    auto const seconds =
        std::chrono::duration_cast<std::chrono::seconds>(Clock::now() - start).count();
    std::uint64_t const count = m_Count.load(std::memory_order_relaxed);
    // Until the first block counts, the file is being read.
    if (count == 0)
      std::fprintf(stderr, "\r\033[K%s: reading, %llds", m_What.c_str(),
                   static_cast<long long>(seconds));
    else
      std::fprintf(stderr, "\r\033[K%s: %llu blocks, %llds", m_What.c_str(),
                   static_cast<unsigned long long>(count), static_cast<long long>(seconds));
    std::fflush(stderr);
    m_Shown = true;
  } while (!m_Wake.wait_for(lock, std::chrono::milliseconds(250), [this] { return m_Done; }));
}

// ---------------------------------------------------------------------------
// Opening through the client model

namespace {

// A client model that counts what it loads, for the progress line.
class CountingModel : public Lum_TdmModel {
public:
  CountingModel(char const *path, Progress &progress)
      : Lum_TdmModel("tdm", "tdm", path), m_Progress(progress) {}

  void SyncEventSpecializeBlockOnLoad(Orb_Block *block) override {
    m_Progress.Count();
    Lum_TdmModel::SyncEventSpecializeBlockOnLoad(block);
  }
  void SyncEventSpecializeViewOnLoad(Orb_View *view) override { new OpenedView(this, view, false); }

private:
  Progress &m_Progress;
};

} // namespace

std::unique_ptr<Lum_TdmModel> OpenTyped(std::string const &path, CommonOptions const &options) {
  Progress progress("opening " + path, options);
  auto model = std::make_unique<CountingModel>(path.c_str(), progress);
  // The view's refusals are reported through the message manager before
  // they are thrown: keep them for the error text instead of printing them
  // apart.
  Port_MsgCapture capture;
  try {
    model->Open(path.c_str());
  } catch (Orb_Exception const &e) {
    // The host's own refusals (a missing, unreadable or corrupt file) say
    // what is wrong with the file.
    throw Failure(kExitUnreadable, path + ": " + Describe(e, path));
  } catch (Port::Exception const &e) {
    std::string text = path + ": cannot be opened: " + Describe(e, path);
    for (Port_MsgReport const &report : capture.GetReports())
      if (report.severity == Port_MsgReport::ERROR)
        text += " (" + OneLine(report.text) + ")";
    text += "; 'tdm check " + path + "' lists every problem";
    throw Failure(kExitUnreadable, text);
  }
  return model;
}

std::vector<Orb_View *> SelectViews(Lum_TdmModel const &model, std::string const &path,
                                    std::string const &onlyView) {
  std::vector<Orb_View *> views;
  std::string names;
  for (Orb_DesignMgr *designMgr : model.GetOrbModel()->GetDesignMgrs())
    for (Orb_Design *design : designMgr->GetDesigns())
      for (Orb_View *view : design->GetViews()) {
        names += (names.empty() ? "" : ", ") + ViewPath(view);
        if (onlyView.empty() || onlyView == view->GetName())
          views.push_back(view);
      }
  if (!onlyView.empty() && views.empty())
    throw Failure(kExitUsage, path + ": no view named " + Quoted(onlyView) +
                                  " (views: " + (names.empty() ? "none" : names) + ")");
  return views;
}

std::unique_ptr<Lum_TypeLibraryLoader> LoadLibraries(std::vector<std::string> const &files,
                                                     Lum_TypeLibraryLoadOptions const &options) {
  try {
    return std::make_unique<Lum_TypeLibraryLoader>(files, options);
  } catch (Port::Exception const &e) {
    throw Failure(kExitUnreadable, Describe(e));
  }
}

std::vector<std::string> KeepLibraries(Lum_TypeLibraryLoader const &libraries,
                                       std::string const &database) {
  std::filesystem::path const path(database);
  try {
    return libraries.Save(path.has_parent_path() ? path.parent_path().string() : ".");
  } catch (Port::Exception const &e) {
    throw Failure(kExitUnreadable,
                  "the database is saved, but a type library is not: " + Describe(e));
  }
}

} // namespace tdm

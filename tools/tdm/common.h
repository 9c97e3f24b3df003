#pragma once

// What the subcommands of tdm share: exit codes, the error that ends a
// command, common options, the progress line, names of objects as the
// output shows them, and opening a database through the client model.

#include "Lum_TdmView.h"

#include <atomic>
#include <condition_variable>
#include <cstdint>
#include <memory>
#include <mutex>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

class Lum_TdmModel;
class Lum_TlmLibrary;
class Lum_TypeLibraryLoader;
struct Lum_TypeLibraryLoadOptions;
class Orb_Block;
class Orb_Design;
class Orb_View;
namespace Port {
class Exception;
}

namespace tdm {

// The exit codes, as the help and the README document them.
enum ExitCode : int {
  kExitOk = 0,
  kExitProblems = 1,   // problems found (tdm check), or a binding that did not come back
  kExitUsage = 2,      // bad command line
  kExitUnreadable = 3, // a database or library that cannot be read (or a file not written)
};

// Ends the command: main prints the text on standard error, prefixed with
// "tdm <command>: error: ", and exits with the code. The text names the file
// and the object concerned.
class Failure : public std::runtime_error {
public:
  Failure(int code, std::string const &text) : std::runtime_error(text), m_Code(code) {}
  int GetCode() const { return m_Code; }

private:
  int m_Code;
};

// Options every subcommand takes.
struct CommonOptions {
  std::vector<std::string> libPath; // searched in this order, before LUM_TLM_PATH
  bool quiet = false;               // no progress line, no informational output
};

// Puts the --lib-path directories on the type library search path.
void ApplyLibraryPath(CommonOptions const &options);

// The exception as one line: "<object>: message", newlines folded into
// blanks; the object is left out when it is `path`, which the caller names
// already. Source locations are left out: they help no user.
std::string Describe(Port::Exception const &e, std::string const &path = std::string());

// Folds newlines and tabs into single blanks and trims both ends.
std::string OneLine(std::string const &text);

// Quoted for the output: "name" with control bytes shown as \n, \t, \xNN.
std::string Quoted(std::string const &name);

// The text with control bytes shown as \n, \t, \xNN (and nothing else
// changed), so that a path or message prints on one line.
std::string Escaped(std::string const &text);

// Throws Failure(kExitUnreadable) when something other than a regular file
// (a folder, a FIFO, a device) is at `path`: reading a FIFO with no writer
// would block, and saving over one would replace it. Nothing there passes.
void RequireRegularFile(std::string const &path);

// "manager/design", "manager/design/view", and a block as "top/child/...".
std::string DesignPath(Orb_Design const *design);
std::string ViewPath(Orb_View const *view);
std::string BlockPath(Orb_Block const *block);

// A line on standard error that tells how far a long operation got. It
// appears only when standard error is a terminal, the operation has run for
// more than a second and the user did not ask for --quiet, and it is
// cleared when the operation ends. Count() is cheap: it may be called per
// object from the working thread.
class Progress {
public:
  Progress(std::string what, CommonOptions const &options);
  ~Progress();
  Progress(Progress const &) = delete;
  Progress &operator=(Progress const &) = delete;

  void Count(std::uint64_t n = 1) { m_Count.fetch_add(n, std::memory_order_relaxed); }
  // Clears the line and shows no more; the destructor does it too.
  void Stop();

private:
  void Run();

  std::string m_What;
  std::atomic<std::uint64_t> m_Count{0};
  std::mutex m_Mutex;
  std::condition_variable m_Wake;
  bool m_Done = false;
  bool m_Shown = false;
  std::thread m_Thread;
};

// The view client of a database OpenTyped opened: a view whose library list
// a command may extend (rebinding to a library the view does not list yet).
// The library is one LoadLibrary gave, whose reference the view gives back.
class OpenedView : public Lum_TdmView {
public:
  using Lum_TdmView::Lum_TdmView;
  void AddLibrary(Lum_TlmLibrary const *library) const { SetLibrary(library); }
};

// Opens the database in a new client model, binding every typed block. A
// file that cannot be read, or a database that the model refuses, throws
// Failure(kExitUnreadable) naming the file and the object, with the message
// manager's reports of the open folded in. Its views are OpenedView.
std::unique_ptr<Lum_TdmModel> OpenTyped(std::string const &path, CommonOptions const &options);

// The views of the database (every design, in host order), those named
// `onlyView` alone when it is not empty. A name that matches no view throws
// Failure(kExitUsage) listing the views there are.
std::vector<Orb_View *> SelectViews(Lum_TdmModel const &model, std::string const &path,
                                    std::string const &onlyView);

// The type libraries of --lib files, cell libraries read now (see
// Lum_TypeLibraryLoader); one that cannot be loaded throws
// Failure(kExitUnreadable).
std::unique_ptr<Lum_TypeLibraryLoader> LoadLibraries(std::vector<std::string> const &files,
                                                     Lum_TypeLibraryLoadOptions const &options);

// Saves the libraries read now as .tlm files in the folder of the database
// at `database`, so that it opens again with --lib-path there; returns the
// files. One that cannot be saved throws Failure(kExitUnreadable).
std::vector<std::string> KeepLibraries(Lum_TypeLibraryLoader const &libraries,
                                       std::string const &database);

} // namespace tdm

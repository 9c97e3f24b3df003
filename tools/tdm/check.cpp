// tdm check: reads a design database at the host level, without binding it
// through the client model, and lists every problem that makes opening it
// fail, where a real open stops at the first. The library's verifier finds
// the problems with the open's own rules; this file only reports them,
// grouped by kind and by library:type block, with counts and examples.

#include "commands.h"

#include "Lum_TdmSchema.h"
#include "Lum_TdmVerifier.h"
#include "Orb_Model.h"
#include "Port_Exception.h"
#include "Port_MsgManData.h"

#include <cstdint>
#include <cstdio>
#include <map>
#include <string>
#include <vector>

namespace tdm {
namespace {

using Kind = Lum_TdmVerifier::Kind;
using Problem = Lum_TdmVerifier::Problem;

struct KindText {
  char const *title;
  char const *unit; // what the examples are, singular
};

KindText const &TextOf(Kind kind) {
  static KindText const texts[] = {
      {"design with a foreign design mark (TDS_DESIGN_TYPE)", "design"},
      {"view stamp too old (TDS_TDM_VERSION below 0.3: convert the design)", "view"},
      {"view stamp too new (TDS_TDM_VERSION above 3.1: written by newer software)", "view"},
      {"view without a device personality for its type libraries", "view"},
      {"type library that cannot be loaded", "view"},
      {"library not in the view's TDS_VIEW_TYPE_LIBS", "block"},
      {"type block missing from its library", "block"},
      {"connected pin that no type pin matches", "pin"},
      {"pin in the way of a type pin that opening would create", "pin"},
  };
  return texts[static_cast<int>(kind)];
}

constexpr std::size_t kExamples = 3;

struct Group {
  std::uint64_t count = 0;
  std::vector<std::string> examples;
  std::string detail;
};

// Problems by kind, then by group (library:type block, library, stamp...).
class Problems {
public:
  void Add(Kind kind, std::string const &key, std::string const &example) {
    Group &group = m_Groups[kind][key];
    ++group.count;
    ++m_Total;
    if (group.examples.size() < kExamples)
      group.examples.push_back(example);
  }
  void SetDetail(Kind kind, std::string const &key, std::string const &detail) {
    m_Groups[kind][key].detail = detail;
  }

  std::uint64_t Total() const { return m_Total; }

  void Print(std::string const &path) const {
    std::printf("%s: %llu problem%s that make%s opening fail\n", path.c_str(),
                static_cast<unsigned long long>(m_Total), m_Total == 1 ? "" : "s",
                m_Total == 1 ? "s" : "");
    for (auto const &[kind, groups] : m_Groups) {
      std::uint64_t count = 0;
      for (auto const &entry : groups)
        count += entry.second.count;
      KindText const &text = TextOf(kind);
      std::printf("%s: %llu\n", text.title, static_cast<unsigned long long>(count));
      for (auto const &[key, group] : groups) {
        std::string examples;
        for (std::string const &example : group.examples)
          examples += (examples.empty() ? "" : ", ") + example;
        if (group.count > group.examples.size())
          examples += ", ...";
        std::printf("  %s: %llu %s%s: %s\n", key.c_str(),
                    static_cast<unsigned long long>(group.count), text.unit,
                    group.count == 1 ? "" : "s", examples.c_str());
        if (!group.detail.empty())
          std::printf("    %s\n", group.detail.c_str());
      }
    }
  }

private:
  std::map<Kind, std::map<std::string, Group>> m_Groups;
  std::uint64_t m_Total = 0;
};

// The views that could not load a library, with the blocks they type from
// it, for the detail under the library's group.
struct LibraryUse {
  std::string view;
  std::uint64_t blocks = 0;
  std::vector<std::string> examples;
};

// Groups the verifier's problems as the report shows them.
class Report {
public:
  void Add(Problem const &problem) {
    switch (problem.kind) {
    case Kind::BlockOfUnloadableLibrary:
      for (LibraryUse &use : m_Uses[problem.key])
        if (use.view == problem.view) {
          if (++use.blocks <= kExamples)
            use.examples.push_back(problem.path);
          break;
        }
      return;
    case Kind::LibraryUnloadable:
      m_Errors.emplace(problem.key, problem.objectName.empty()
                                        ? OneLine(problem.message)
                                        : Quoted(Port::Exception::ShownName(problem.objectName)) +
                                              ": " + OneLine(problem.message));
      m_Uses[problem.key].push_back(LibraryUse{problem.view, 0, {}});
      break;
    default:
      break;
    }
    std::string key = problem.key;
    if (problem.kind == Kind::ForeignMark || problem.kind == Kind::StampTooOld ||
        problem.kind == Kind::StampTooNew)
      key = Quoted(key);
    std::string example = problem.path;
    if (!problem.mappedTo.empty())
      example += " (mapped to " + problem.mappedTo + ")";
    m_Problems.Add(problem.kind, key, example);
  }

  // The problems, with each unloadable library's error and the blocks that
  // each view types from it.
  Problems const &Finish() {
    for (auto const &[name, error] : m_Errors) {
      std::string detail = error;
      for (LibraryUse const &use : m_Uses[name]) {
        detail += "; " + use.view + " types " + std::to_string(use.blocks) + " block" +
                  (use.blocks == 1 ? "" : "s") + " from it";
        for (std::size_t i = 0; i < use.examples.size(); ++i)
          detail += (i ? ", " : ": ") + use.examples[i];
        if (use.blocks > use.examples.size())
          detail += ", ...";
      }
      m_Problems.SetDetail(Kind::LibraryUnloadable, name, detail);
    }
    return m_Problems;
  }

private:
  Problems m_Problems;
  std::map<std::string, std::string> m_Errors;
  std::map<std::string, std::vector<LibraryUse>> m_Uses;
};

} // namespace

int RunCheck(std::string const &path, CommonOptions const &options) {
  ApplyLibraryPath(options);
  Progress progress("checking " + path, options);
  // A model of its own, with no client model attached: nothing is bound.
  Orb_Model host("tdm-check", "tdm-check", path.c_str(), true);
  try {
    host.Open(path.c_str());
  } catch (Port::Exception const &e) {
    throw Failure(kExitUnreadable, path + ": " + Describe(e, path));
  }

  Report report;
  Lum_TdmVerifier verifier([&report](Problem const &problem) { report.Add(problem); },
                           [&progress] { progress.Count(); });
  {
    // Library loads may warn through the message manager; the report says
    // all that matters.
    Port_MsgCapture const capture;
    verifier.CheckModel(host);
  }
  progress.Stop();
  Problems const &problems = report.Finish();
  if (problems.Total() == 0) {
    if (!options.quiet)
      std::printf("%s: no problems: it opens (%llu view%s, %llu block%s checked)\n", path.c_str(),
                  static_cast<unsigned long long>(verifier.GetViewCount()),
                  verifier.GetViewCount() == 1 ? "" : "s",
                  static_cast<unsigned long long>(verifier.GetBlockCount()),
                  verifier.GetBlockCount() == 1 ? "" : "s");
    return kExitOk;
  }
  problems.Print(path);
  return kExitProblems;
}

} // namespace tdm

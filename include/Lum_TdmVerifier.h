#pragma once

#include "Lum_TdmTraits.h"

#include <cstdint>
#include <functional>
#include <string>
#include <vector>

class Orb_Block;
class Orb_Design;
class Orb_Model;
class Orb_View;

// Checks stored typed designs without binding them: applies the rules an
// open applies (the same rule code) and reports every problem that makes
// the open fail, where the open stops at the first. Each problem carries the
// exception the open would throw for it (class, object name, message), so
// that a caller can tell a user what the open will say.
//
// Nothing is bound and no client is made; the type libraries the views list
// are loaded (for their device personality) and given back, and the local
// library of a view is obtained from its host model.
class LUM_TDM_API Lum_TdmVerifier {
public:
  // Kinds of problems, in the order of a report.
  enum class Kind {
    ForeignMark,       // a design whose TDS_DESIGN_TYPE is not a user design's
    StampTooOld,       // a view stamped below 0.3
    StampTooNew,       // a view stamped above the current format
    NoDevice,          // a view with type libraries but no device personality
    LibraryUnloadable, // a type library of the view's list that cannot be loaded
    LibraryNotListed,  // a block typed from a library the view does not list
    TypeBlockMissing,  // a block whose type block its library lacks
    PinUnmatched,      // a connected pin that finds no type pin
    PinCollision,      // a pin in the way of a type pin that the open would create
    // Not a problem of its own: a typed block of a library that could not be
    // loaded (reported once as LibraryUnloadable for its view).
    BlockOfUnloadableLibrary,
  };

  struct Problem {
    Kind kind;
    // "manager/design/view" (empty for a design's problem).
    std::string view;
    // The object: "manager/design", the view, "<view>:top/child" for a block,
    // "<view>:top/child pin P" for a pin.
    std::string path;
    // What problems group by: the stored mark or stamp; "without
    // TDS_DEVICE_PM" (and/or TDS_DEVICE_PART); the library's name; or the
    // stored type, "library:type block".
    std::string key;
    // For a pin, the type pin name its TDS_BLOCK_PIN_MAP gives it, if any.
    std::string mappedTo;
    // The open's exception for it: class name, object name, message (empty
    // for BlockOfUnloadableLibrary).
    std::string exception;
    std::string objectName;
    std::string message;
  };
  using Report = std::function<void(Problem const &)>;

  // `report` gets each problem as it is found; `onBlock`, if any, is called
  // once per block looked at (a progress count).
  explicit Lum_TdmVerifier(Report report, std::function<void()> onBlock = {});

  // Every design of every design manager, in host order.
  void CheckModel(Orb_Model &host);
  // A design: its mark, then (for a user design) each view.
  void CheckDesign(Orb_Design *design);
  // A view: its stamp, then, when it has typed blocks, its library list and
  // each typed block with its pins.
  void CheckView(Orb_View *view);

  std::uint64_t GetViewCount() const { return m_Views; }
  std::uint64_t GetBlockCount() const { return m_Blocks; }

  // Reads the database file into a host model of its own and checks it;
  // reports of the message manager meanwhile are kept from the output. A
  // file that cannot be read throws the host's exception.
  static std::vector<Problem> CheckFile(std::string const &path);
  // Checks one view of a host model (whether a client model binds it or not).
  static std::vector<Problem> Check(Orb_View *view);

  // Objects as the problems name them: "manager/design",
  // "manager/design/view", and a block as "top/child/...".
  static std::string DesignPath(Orb_Design const *design);
  static std::string ViewPath(Orb_View const *view);
  static std::string BlockPath(Orb_Block const *block);

private:
  // Runs `check` on a verifier that collects, with the message manager's
  // reports kept from the output.
  static std::vector<Problem> Collect(std::function<void(Lum_TdmVerifier &)> const &check);

  Report m_Report;
  std::function<void()> m_OnBlock;
  std::uint64_t m_Views = 0;
  std::uint64_t m_Blocks = 0;
};

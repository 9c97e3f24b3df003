#pragma once

#include "Lum_TdmTraits.h"

#include "Orb_Templates.h"
#include "Port_String.h"

#include <cstdint>
#include <deque>
#include <memory>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

class Lum_TlmBlock;
class Lum_TlmLibrary;
class PM_PIC;

// Client of a host view. It stamps the view with the format version
// (TDS_TDM_VERSION), refuses to load views of too old or too new a format,
// and keeps the list of type libraries that the view's blocks draw from
// (TDS_VIEW_TYPE_LIBS), which it builds on first use, writes back at every
// commit and gives back when it is destroyed. A list whose building failed
// keeps the libraries loaded before the failure and is not built again; its
// view then never rewrites TDS_VIEW_TYPE_LIBS, so a save cannot drop the
// libraries after the failing one.
class LUM_TDM_API Lum_TdmView : public Orb_ViewT<Lum_TdmTraits> {
public:
  // On creation (isNew true) stamps the view 3.1 and removes
  // LUM_DONT_CREATE_UNUSED_PINS. On load reads the stamp: 0.0 to 0.2 and
  // unreadable stamps are too old, 3.2 and above or 4.0 and above too new;
  // either is reported through the message manager and then thrown as
  // Lum_ExceptionCorruptDatabase with the name of the design manager that
  // holds the view. A view without a stamp is accepted as version 0.0.
  Lum_TdmView(Lum_TdmModel *model, Orb_View *view, bool isNew);
  // Gives back every non-local library of the list, once per entry. Which
  // entries are local was noted when they entered the list: the libraries
  // themselves are not read, as they may already be gone.
  ~Lum_TdmView() override;

  // The current format: version 3, revision 1.
  static void GetTdmVersion(unsigned int &version, unsigned int &revision);
  // The format the view was loaded with (0.0 when it had no stamp), or the
  // current one for a view made in this session.
  void GetTdmLoadedDesignVersion(unsigned int &version, unsigned int &revision) const;

  // Appends the view's libraries, in list order, after what `libraries`
  // holds (a non-empty vector draws a debug warning).
  void GetLibraries(std::vector<Lum_TlmLibrary const *> &libraries) const;
  // The first library of exactly that name (case-sensitive), or null.
  Lum_TlmLibrary const *GetLibrary(Port::StringBase<char> name) const;
  // The local library if it is in the list, or null; never obtains it.
  Lum_TlmLibrary const *GetLocalLibrary() const;

  void Dbg() const { DbgImpl(); }

  void DebugDumpCallback(Port::Stream *stream, int indent) const override;

  // Commits the whole view: itself, its networks, its block tree and, when it
  // is a user design, its design. First every typed block is checked as the
  // next open would bind what the commit stores; a block it would refuse (a
  // connected pin that finds no type pin, or, unless the view carries
  // LUM_DONT_CREATE_UNUSED_PINS, a type pin it could not create because a
  // pin holds its name) throws Lum_ExceptionInvalidTypeBlock naming the pin,
  // with nothing written. Another failure leaves what was committed.
  virtual void CommitAll();
  virtual void TraverseAndCommitToOrb();
  // The local library, obtained from the type-library component and added at
  // the end of the list if it is not there yet.
  virtual Lum_TlmLibrary const *AddLocalLibrary() const;
  // The bytes of one view client: its class size plus what it owns outside
  // itself, both taken through their virtual slots.
  virtual std::uint64_t DbgMySize() const;
  virtual std::uint64_t DbgClassSize() const;
  virtual std::uint64_t DbgSecondarySize() const;
  // Measures the client objects under the view: every block with its pins,
  // every network with its signals, and the block signals that belong to no
  // network. Sets the counters (each one reset first) and returns the total
  // bytes. Pins, networks and signals without a client get one, which stays.
  // The view, its design, design manager and model are not counted.
  virtual std::uint64_t DbgGetSize(std::uint64_t &blockBytes, std::uint64_t &blockCount,
                                   std::uint64_t &pinBytes, std::uint64_t &pinCount,
                                   std::uint64_t &networkBytes, std::uint64_t &networkCount,
                                   std::uint64_t &signalBytes, std::uint64_t &signalCount) const;
  // Prints the measurement to the stream (null: the debug printer's own
  // output): the total, then per kind present its count, bytes, share of the
  // total (0 when the total is 0) and average size.
  virtual void DbgReportSize(Port::Stream *stream) const;

protected:
  // Adds a library to the list unless this very library is there already,
  // registering it with the type registry unless it is the local library.
  // Null throws Lum_ExceptionInvalidLibrary ("Null library pointer
  // specified.") and changes nothing.
  void SetLibrary(Lum_TlmLibrary const *library) const;

  // Builds the library list if needed, then writes the stamp and the list.
  virtual void CommitToOrb();
  // Loads a library of the list; by default from the type-library component.
  virtual Lum_TlmLibrary const *LoadLibrary(char const *name, PM_PIC const &personality) const;
  virtual void DbgImpl() const;

private:
  friend class Lum_TdmBlock;

  // The type block that a block's stored TDS_BLOCK_TYPE value resolved to
  // earlier in this view, or null. Blocks of one type resolve through the
  // libraries once; the type blocks live as long as the libraries of the
  // list, which the view holds until it is destroyed.
  Lum_TlmBlock const *FindTypeBlock(std::string_view storedType) const;
  void NoteTypeBlock(std::string_view storedType, Lum_TlmBlock const *typeBlock) const;

  std::vector<Lum_TlmLibrary const *> &GetLibraryList() const;
  void BuildLibraryList() const;
  void AppendLibrary(Lum_TlmLibrary const *library) const;
  void GetDevicePic(PM_PIC &personality) const;
  static bool IsLocalLibrary(Lum_TlmLibrary const *library);
  void CheckTdmVersion();
  void WriteTdmProperties();
  char const *GetDesignMgrName() const;

  std::uint32_t m_Version;
  std::uint32_t m_Revision;
  // Owned; null until the list is first needed (const operations build it).
  mutable std::unique_ptr<std::vector<Lum_TlmLibrary const *>> m_pLibrary;
  // Per entry of the list, whether it is the local library (never released).
  mutable std::vector<bool> m_LocalEntries;
  // Set when building the list failed: TDS_VIEW_TYPE_LIBS is left as stored.
  mutable bool m_LibraryListFailed;
  // The cache's keys view the strings of m_TypeBlockKeys, which never move,
  // so that a lookup needs no string of its own.
  mutable std::deque<std::string> m_TypeBlockKeys;
  mutable std::unordered_map<std::string_view, Lum_TlmBlock const *> m_TypeBlocks;
  // Set while a commit walks the view's blocks, all of which it checked
  // before writing anything.
  mutable bool m_CommitVerified = false;
};

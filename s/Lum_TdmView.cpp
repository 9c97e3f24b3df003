#include "Lum_TdmView.h"

#include "Lum_TdmBlock.h"
#include "Lum_TdmClient.h"
#include "Lum_TdmCommit.h"
#include "Lum_TdmDbg.h"
#include "Lum_TdmDesign.h"
#include "Lum_TdmLoadRules.h"
#include "Lum_TdmModel.h"
#include "Lum_TdmNetwork.h"
#include "Lum_TdmPin.h"
#include "Lum_TdmSignal.h"

#include "Lum_Exception.h"
#include "Lum_TdmSchema.h"
#include "Lum_Tlm.h"
#include "Lum_TlmTypeID.h"
#include "PM_PIC.h"
#include "Port_MsgManData.h"

#include <cstdint>
#include <string>
#include <vector>

namespace {

char const kSourcePath[] = "../s/Lum_TdmView";
char const kRevision[] = "$Revision: 1.1 $";

// Marks the version fields while the constructor runs.
constexpr std::uint32_t kUnsetVersion = 0xFFFF;

using Lum_TdmSchema::kDevicePart;
using Lum_TdmSchema::kDevicePm;
using Lum_TdmSchema::kDontCreateUnusedPins;
using Lum_TdmSchema::kFormatRevision;
using Lum_TdmSchema::kFormatVersion;
using Lum_TdmSchema::kTypeLibraries;
using Lum_TdmSchema::kVersion;

} // namespace

Lum_TdmView::Lum_TdmView(Lum_TdmModel *model, Orb_View *view, bool isNew)
    : Orb_ViewT<Lum_TdmTraits>(model, view), m_Version(kUnsetVersion), m_Revision(kUnsetVersion),
      m_LibraryListFailed(false) {
  if (isNew) {
    m_Version = kFormatVersion;
    m_Revision = kFormatRevision;
    WriteTdmProperties();
  } else {
    CheckTdmVersion();
  }
}

Lum_TdmView::~Lum_TdmView() {
  if (!m_pLibrary)
    return;
  // One release per entry: a library listed twice was loaded twice. The
  // libraries are not read here; an in-memory one may already be destroyed.
  std::vector<Lum_TlmLibrary const *> const &list = *m_pLibrary;
  for (std::size_t i = 0; i < list.size(); ++i)
    if (!m_LocalEntries[i])
      Lum_TlmLibrary::ReleaseLibrary(list[i]);
  m_pLibrary.reset();
}

void Lum_TdmView::GetTdmVersion(unsigned int &version, unsigned int &revision) {
  version = kFormatVersion;
  revision = kFormatRevision;
}

void Lum_TdmView::GetTdmLoadedDesignVersion(unsigned int &version, unsigned int &revision) const {
  version = m_Version;
  revision = m_Revision;
}

char const *Lum_TdmView::GetDesignMgrName() const {
  return GetOrbView()->GetParent()->GetParent()->GetName();
}

void Lum_TdmView::CheckTdmVersion() {
  Lum_TdmLoadRules::Stamp const stamp =
      Lum_TdmLoadRules::ReadStamp(GetPropertyByName(kVersion), m_Version, m_Revision);
  if (stamp == Lum_TdmLoadRules::Stamp::TooOld) {
    Port_MsgManData::createObject("Lum", kSourcePath, __LINE__, kRevision)
        .issueError("Tdm version is %d and the revision is %d. This is an old design that is no "
                    "longer supported by the software.  Please convert your design.\n",
                    static_cast<int>(m_Version), static_cast<int>(m_Revision));
    throw Lum_ExceptionCorruptDatabase("Lum", kSourcePath, kRevision, __LINE__, GetDesignMgrName(),
                                       Lum_TdmLoadRules::kOldStamp, false);
  }
  if (stamp == Lum_TdmLoadRules::Stamp::TooNew) {
    Port_MsgManData::createObject("Lum", kSourcePath, __LINE__, kRevision)
        .issueError("Tdm version is %d and the revision is %d.\nThis design was created by "
                    "software with a newer version than this software.\nPlease use this design "
                    "with the newer software.\n",
                    static_cast<int>(m_Version), static_cast<int>(m_Revision));
    throw Lum_ExceptionCorruptDatabase("Lum", kSourcePath, kRevision, __LINE__, GetDesignMgrName(),
                                       Lum_TdmLoadRules::kNewStamp, false);
  }
}

void Lum_TdmView::WriteTdmProperties() {
  if (GetPropertyByName(kDontCreateUnusedPins))
    DeleteProperty(kDontCreateUnusedPins);

  Port::StringBase<char> stamp;
  stamp.doFormat("%d.%d", kFormatVersion, kFormatRevision);
  Orb_Property *stampProperty = GetPropertyByName(kVersion);
  if (stampProperty && stampProperty->GetKind() == Orb_Property::STRING)
    stampProperty->SetStringValue(stamp.str());
  else
    CreatePropertyString(kVersion, stamp.c_str());

  // A list that failed to build lacks the libraries after the failing entry:
  // writing it would drop them from the database.
  if (!m_pLibrary || m_LibraryListFailed)
    return;
  Orb_Property *libraries = GetPropertyByName(kTypeLibraries);
  if (libraries && libraries->GetKind() == Orb_Property::STRING_LIST)
    libraries->ClearStrings();
  else
    libraries = CreatePropertyStringList(kTypeLibraries);
  for (Lum_TlmLibrary const *library : *m_pLibrary) {
    unsigned version = 0;
    unsigned revision = 0;
    library->GetTlmVersion(version, revision);
    Port::StringBase<char> entry;
    entry.doFormat("%s %d.%d", library->GetLibraryName(), static_cast<int>(version),
                   static_cast<int>(revision));
    for (Port::StringBase<char> const &qualifier :
         {library->GetFirstQualifier(), library->GetSecondQualifier()}) {
      if (!qualifier.empty()) {
        entry += ' ';
        entry += qualifier;
      }
    }
    libraries->AppendString(entry.str());
  }
}

// ---------------------------------------------------------------------------
// Library list

bool Lum_TdmView::IsLocalLibrary(Lum_TlmLibrary const *library) {
  return library && Port::StringBase<char>(library->GetLibraryName()) ==
                        Port::StringBase<char>(Lum_TlmLibrary::LOCAL_LIBRARY_NAME);
}

void Lum_TdmView::GetDevicePic(PM_PIC &personality) const {
  if (char const *missing = Lum_TdmLoadRules::MissingDevice(GetOrbView()))
    throw Lum_ExceptionInvalidLibrary("Lum", kSourcePath, kRevision, __LINE__, GetName(),
                                      Lum_TdmLoadRules::NoDeviceMessage(missing).c_str(), false);
  personality = PM_PIC(GetPropertyByName(kDevicePm)->GetStringValue(),
                       GetPropertyByName(kDevicePart)->GetStringValue(), nullptr);
}

void Lum_TdmView::AppendLibrary(Lum_TlmLibrary const *library) const {
  // Both lists grow together or not at all: the destructor reads one entry
  // of each per library.
  bool const isLocal = IsLocalLibrary(library);
  m_LocalEntries.reserve(m_pLibrary->size() + 1);
  m_pLibrary->reserve(m_pLibrary->size() + 1);
  m_pLibrary->push_back(library);
  m_LocalEntries.push_back(isLocal);
}

std::vector<Lum_TlmLibrary const *> &Lum_TdmView::GetLibraryList() const {
  if (m_pLibrary)
    return *m_pLibrary;
  // Stored before anything loads: AddLocalLibrary, called while building,
  // comes back here and must find this list. A failure leaves the list as
  // far as it got, counted as built.
  m_pLibrary = std::make_unique<std::vector<Lum_TlmLibrary const *>>();
  try {
    BuildLibraryList();
  } catch (...) {
    m_LibraryListFailed = true;
    throw;
  }
  return *m_pLibrary;
}

void Lum_TdmView::BuildLibraryList() const {
  // The personality is built only when a library has to be loaded.
  PM_PIC personality("", "", nullptr);
  bool havePersonality = false;
  for (std::string const &text :
       Lum_TdmLoadRules::LibraryEntries(GetPropertyByName(kTypeLibraries))) {
    std::string name;
    if (!Lum_TdmLoadRules::LibraryName(text, name)) {
      Port_MsgManData::debugStub("Warning:  view <%s> lists a type library without a name; the "
                                 "entry is ignored.\n",
                                 GetName());
      continue;
    }
    if (name == Lum_TlmLibrary::LOCAL_LIBRARY_NAME) {
      AddLocalLibrary();
      continue;
    }
    if (!havePersonality) {
      GetDevicePic(personality);
      havePersonality = true;
    }
    Lum_TlmLibrary const *library = LoadLibrary(name.c_str(), personality);
    if (!library)
      throw Lum_ExceptionInvalidLibrary("Lum", kSourcePath, kRevision, __LINE__, name.c_str(),
                                        "Null library pointer specified.", false);
    try {
      AppendLibrary(library);
    } catch (...) {
      // Not in the list, so the destructor would not give it back.
      Lum_TlmLibrary::ReleaseLibrary(library);
      throw;
    }
    Lum_Tlm::pTypeIDRegistry->RegisterTypeLibrary(library);
  }
}

void Lum_TdmView::SetLibrary(Lum_TlmLibrary const *library) const {
  if (!library)
    throw Lum_ExceptionInvalidLibrary("Lum", kSourcePath, kRevision, __LINE__, "",
                                      "Null library pointer specified.", false);
  std::vector<Lum_TlmLibrary const *> &list = GetLibraryList();
  for (Lum_TlmLibrary const *present : list)
    if (present == library)
      return;
  AppendLibrary(library);
  if (!m_LocalEntries.back())
    Lum_Tlm::pTypeIDRegistry->RegisterTypeLibrary(library);
}

Lum_TlmLibrary const *Lum_TdmView::LoadLibrary(char const *name, PM_PIC const &personality) const {
  return Lum_TlmLibrary::LoadLibrary(Port::StringBase<char>(name), personality);
}

Lum_TlmLibrary const *Lum_TdmView::AddLocalLibrary() const {
  if (Lum_TlmLibrary const *local = GetLocalLibrary())
    return local;
  PM_PIC personality("", "", nullptr);
  GetDevicePic(personality);
  Lum_TlmLibrary const *local =
      Lum_TlmLibrary::GetLocalLibrary(GetOrbView()->GetModel(), personality);
  SetLibrary(local);
  return local;
}

void Lum_TdmView::GetLibraries(std::vector<Lum_TlmLibrary const *> &libraries) const {
  if (!libraries.empty())
    Port_MsgManData::debugStub("Warning:  passed in vector in not empty.\n");
  std::vector<Lum_TlmLibrary const *> const &list = GetLibraryList();
  libraries.insert(libraries.end(), list.begin(), list.end());
}

Lum_TlmLibrary const *Lum_TdmView::GetLibrary(Port::StringBase<char> name) const {
  for (Lum_TlmLibrary const *library : GetLibraryList())
    if (library && Port::StringBase<char>(library->GetLibraryName()) == name)
      return library;
  return nullptr;
}

Lum_TlmLibrary const *Lum_TdmView::GetLocalLibrary() const {
  return GetLibrary(Port::StringBase<char>(Lum_TlmLibrary::LOCAL_LIBRARY_NAME));
}

Lum_TlmBlock const *Lum_TdmView::FindTypeBlock(std::string_view storedType) const {
  auto const found = m_TypeBlocks.find(storedType);
  return found == m_TypeBlocks.end() ? nullptr : found->second;
}

void Lum_TdmView::NoteTypeBlock(std::string_view storedType, Lum_TlmBlock const *typeBlock) const {
  if (m_TypeBlocks.count(storedType))
    return;
  m_TypeBlockKeys.emplace_back(storedType);
  m_TypeBlocks.emplace(m_TypeBlockKeys.back(), typeBlock);
}

// ---------------------------------------------------------------------------
// Commit

void Lum_TdmView::CommitToOrb() {
  GetLibraryList();
  WriteTdmProperties();
}

void Lum_TdmView::CommitAll() { TraverseAndCommitToOrb(); }

void Lum_TdmView::TraverseAndCommitToOrb() {
  // Nothing is written unless the next open takes every block as stored.
  Lum_TdmBlock *top = GetBlock();
  if (top)
    top->VerifyCommitTree();
  m_CommitVerified = true;
  try {
    CommitToOrb();
    Lum_TdmCommitEach<Lum_TdmNetwork>(GetContext(), Orb_Kind::Network, GetOrbView()->GetNetworks());
    if (top)
      top->TraverseAndCommitToOrb();
  } catch (...) {
    m_CommitVerified = false;
    throw;
  }
  m_CommitVerified = false;
  if (Lum_TdmDesign::IsUserDesign(*GetOrbView()->GetParent()))
    GetParent()->TraverseAndCommitToOrb();
}

// ---------------------------------------------------------------------------
// Diagnostics

std::uint64_t Lum_TdmView::DbgMySize() const { return DbgClassSize() + DbgSecondarySize(); }

std::uint64_t Lum_TdmView::DbgClassSize() const { return sizeof(Lum_TdmView); }

std::uint64_t Lum_TdmView::DbgSecondarySize() const { return 0; }

namespace {

// Adds one object of `bytes` to a kind's counters and to the total.
void Count(std::uint64_t bytes, std::uint64_t &kindBytes, std::uint64_t &kindCount,
           std::uint64_t &total) {
  kindBytes += bytes;
  ++kindCount;
  total += bytes;
}

} // namespace

std::uint64_t Lum_TdmView::DbgGetSize(std::uint64_t &blockBytes, std::uint64_t &blockCount,
                                      std::uint64_t &pinBytes, std::uint64_t &pinCount,
                                      std::uint64_t &networkBytes, std::uint64_t &networkCount,
                                      std::uint64_t &signalBytes,
                                      std::uint64_t &signalCount) const {
  blockBytes = blockCount = pinBytes = pinCount = 0;
  networkBytes = networkCount = signalBytes = signalCount = 0;
  std::uint64_t total = 0;
  Orb_Context *context = GetContext();
  Orb_BridgeHandle const pins = context->GetBridgeHandle(Orb_Kind::Pin);

  // The host's list of block clients, taken as this library's blocks without
  // a second copy.
  std::vector<Orb_BlockDerived *> blocks;
  Orb_ViewDerived::LoadAllBlocks(blocks);
  for (Orb_BlockDerived const *hostBlock : blocks) {
    auto const *block = static_cast<Lum_TdmBlock const *>(hostBlock);
    Count(block->DbgMySize(), blockBytes, blockCount, total);
    for (Orb_Pin *pin : block->GetPins())
      Count(Lum_TdmClient::Of<Lum_TdmPin>(context, pins, pin)->DbgMySize(), pinBytes, pinCount,
            total);
  }

  // Signals are counted through their networks.
  Orb_BridgeHandle const networks = context->GetBridgeHandle(Orb_Kind::Network);
  Orb_BridgeHandle const signals = context->GetBridgeHandle(Orb_Kind::Signal);
  for (Orb_Network *network : GetNetworks()) {
    Count(Lum_TdmClient::Of<Lum_TdmNetwork>(context, networks, network)->DbgMySize(), networkBytes,
          networkCount, total);
    for (Orb_Signal *signal : network->GetSignals())
      Count(Lum_TdmClient::Of<Lum_TdmSignal>(context, signals, signal)->DbgMySize(), signalBytes,
            signalCount, total);
  }
  return total;
}

void Lum_TdmView::DbgReportSize(Port::Stream *stream) const {
  std::uint64_t blockBytes = 0;
  std::uint64_t blockCount = 0;
  std::uint64_t pinBytes = 0;
  std::uint64_t pinCount = 0;
  std::uint64_t networkBytes = 0;
  std::uint64_t networkCount = 0;
  std::uint64_t signalBytes = 0;
  std::uint64_t signalCount = 0;
  std::uint64_t const total = DbgGetSize(blockBytes, blockCount, pinBytes, pinCount, networkBytes,
                                         networkCount, signalBytes, signalCount);

  char const rule[] = "==================================================================\n";
  Orb_Debug::Printf(stream, 0, rule);
  Orb_Debug::Printf(stream, 0, "Design <%s> View <%s> consumes %lU bytes of memory\n",
                    GetParent()->GetName(), GetName(), total);
  Orb_Debug::Printf(stream, 1, "%lU specialized objects\n",
                    blockCount + networkCount + signalCount + pinCount);
  // A derived class may report 0 bytes, so the total can be 0 even with
  // objects present: its share then prints as 0.
  auto const section = [&](char const *countFormat, char const *averageFormat, std::uint64_t bytes,
                           std::uint64_t count) {
    if (count == 0)
      return;
    std::uint64_t const share = total == 0 ? 0 : bytes * 100 / total;
    Orb_Debug::Printf(stream, 2, countFormat, count, bytes, share);
    Orb_Debug::Printf(stream, 3, averageFormat, bytes / count);
  };
  section("%lU blocks consume %lU bytes of memory (%lU%%)\n", "Average block size is %lU bytes\n",
          blockBytes, blockCount);
  section("%lU networks consume %lU bytes of memory (%lU%%)\n",
          "Average network size is %lU bytes\n", networkBytes, networkCount);
  section("%lU signals consume %lU bytes of memory (%lU%%)\n", "Average signal size is %lU bytes\n",
          signalBytes, signalCount);
  section("%lU pins consume %lU bytes of memory (%lU%%)\n", "Average pin size is %lU bytes\n",
          pinBytes, pinCount);
  Orb_Debug::Printf(stream, 0, rule);
}

void Lum_TdmView::DbgImpl() const {
  Lum_TdmDbgFrame<Lum_TdmView>(
      [this] {
        Orb_Debug::Printf("m_Version = <%d>, m_Revision = <%d>\n", static_cast<int>(m_Version),
                          static_cast<int>(m_Revision));
        // Reads the list as it stands: a dump never builds it.
        std::size_t const count = m_pLibrary ? m_pLibrary->size() : 0;
        Orb_Debug::Printf("(std::vector<const Lum_TlmLibrary *> *) m_pLibrary = <0x%x> (# = %d):\n",
                          reinterpret_cast<std::uintptr_t>(m_pLibrary.get()),
                          static_cast<int>(count));
        for (std::size_t i = 0; i < count; ++i) {
          Lum_TlmLibrary const *library = (*m_pLibrary)[i];
          Orb_Debug::Printf("  (Lum_TlmLibrary *) = <0x%x>, (%s)\n",
                            reinterpret_cast<std::uintptr_t>(library),
                            library ? library->GetLibraryName() : "");
        }
      },
      [this] { Orb_ViewDerived::Dbg(); });
}

void Lum_TdmView::DebugDumpCallback(Port::Stream *stream, int indent) const {
  Lum_TdmDbgCallbackFrame(stream, indent, "Lum_TdmView Data\n", [&] {
    Orb_Debug::Printf(stream, indent, "m_Version = <%d>\n", static_cast<int>(m_Version));
    Orb_Debug::Printf(stream, indent, "m_Revision = <%d>\n", static_cast<int>(m_Revision));
  });
}

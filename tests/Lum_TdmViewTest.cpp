// The view's format stamp, its type-library list and its memory report.

#include "Lum_TdmTestSupport.h"

#include "Lum_Exception.h"
#include "Lum_TlmTypeID.h"
#include "Port_Stream.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <array>
#include <cstdint>
#include <functional>
#include <string>

using namespace lumtest;
using ::testing::AllOf;
using ::testing::HasSubstr;
using ::testing::Not;

namespace {

// A view whose library loading a test can replace, and whose protected list
// operation it can call.
class HookedView : public Lum_TdmView {
public:
  using Lum_TdmView::Lum_TdmView;
  using Lum_TdmView::SetLibrary;
  std::function<Lum_TlmLibrary const *(char const *)> m_Loader;

protected:
  Lum_TlmLibrary const *LoadLibrary(char const *name, PM_PIC const &personality) const override {
    return m_Loader ? m_Loader(name) : Lum_TdmView::LoadLibrary(name, personality);
  }
};

using HookedModel = ClientModel<Lum_TdmBlock, HookedView>;

// The names of the libraries a view lists, in order.
std::string LibNames(Lum_TdmView *view) {
  std::vector<Lum_TlmLibrary const *> libraries;
  view->GetLibraries(libraries);
  return Names(libraries);
}

unsigned Registrations(char const *name) {
  return Lum_Tlm::pTypeIDRegistry->GetRegistrationCount(name);
}

// ---------------------------------------------------------------------------
// Stamp

class TdmViewStampTest : public ::testing::Test {
protected:
  TempDir m_Dir;
};

// A new view is stamped with the current format and drops the pin switch,
// even when it was put on the host view before the library saw it.
TEST_F(TdmViewStampTest, NewViewIsStamped) {
  Orb_Model host("h", "h", "", false);
  EarlierSubscriber first(&host);
  first.m_OnView = [](Orb_View *view) {
    view->CreatePropertyString("LUM_DONT_CREATE_UNUSED_PINS", "yes");
  };
  Lum_TdmModel model(&host);
  Orb_View *hostView = host.CreateDesignMgr("dm")->CreateDesign("d")->CreateView("v");
  auto *view = static_cast<Lum_TdmView *>(model.GetClient(hostView));
  ASSERT_NE(view, nullptr);
  EXPECT_EQ(PropertyValue(view, "TDS_TDM_VERSION"), "3.1");
  EXPECT_EQ(view->GetPropertyByName("LUM_DONT_CREATE_UNUSED_PINS"), nullptr);
  EXPECT_EQ(view->GetPropertyByName("TDS_VIEW_TYPE_LIBS"), nullptr) << "no list on creation";
  unsigned version = 0, revision = 0;
  view->GetTdmLoadedDesignVersion(version, revision);
  EXPECT_EQ(std::to_string(version) + "." + std::to_string(revision), "3.1");
  Lum_TdmView::GetTdmVersion(version, revision);
  EXPECT_EQ(std::to_string(version) + "." + std::to_string(revision), "3.1");
}

// A view loaded with an older stamp keeps it until its commit, which writes
// the current stamp; the loaded version stays what was read.
TEST_F(TdmViewStampTest, CommitRewritesAnOlderStamp) {
  TypedDesign design;
  design.m_pView->CreatePropertyString("TDS_TDM_VERSION", "2.5");
  design.m_pView->CreatePropertyString("LUM_DONT_CREATE_UNUSED_PINS", "");
  auto reopened = SaveAndReopen(design.Model(), m_Dir.File("d.odb"));
  Lum_TdmView *view = FirstView(*reopened);
  EXPECT_EQ(PropertyValue(view, "TDS_TDM_VERSION"), "2.5");
  EXPECT_NE(view->GetPropertyByName("LUM_DONT_CREATE_UNUSED_PINS"), nullptr);

  view->CommitAll();
  view->CommitAll();
  EXPECT_EQ(PropertyValue(view, "TDS_TDM_VERSION"), "3.1");
  EXPECT_EQ(view->GetPropertyByName("LUM_DONT_CREATE_UNUSED_PINS"), nullptr);
  unsigned version = 0, revision = 0;
  view->GetTdmLoadedDesignVersion(version, revision);
  EXPECT_EQ(version, 2u);
  EXPECT_EQ(revision, 5u);
  auto again = SaveAndReopen(*reopened, m_Dir.File("d2.odb"));
  EXPECT_EQ(PropertyValue(FirstView(*again), "TDS_TDM_VERSION"), "3.1");
}

// Each stored stamp is accepted with its numbers or refused as too old or
// too new: reported first, then thrown with the design manager's name, and
// the refused open leaves nothing.
TEST_F(TdmViewStampTest, LoadClassifiesTheStamp) {
  enum Outcome { ACCEPTED, TOO_OLD, TOO_NEW };
  struct Case {
    char const *stamp; // null: no stamp at all
    Outcome outcome;
    unsigned version, revision;
  } const cases[] = {
      {nullptr, ACCEPTED, 0, 0},
      {"0.2", TOO_OLD, 0, 2},
      {"0.3", ACCEPTED, 0, 3},
      {"2.9", ACCEPTED, 2, 9},
      {"3", ACCEPTED, 3, 0},
      {"3.1", ACCEPTED, 3, 1},
      {"3.2", TOO_NEW, 3, 2},
      {"4.0", TOO_NEW, 4, 0},
      {"-1.0", TOO_NEW, 0xFFFFFFFFu, 0},
      {"", TOO_OLD, 0, 0},
      {"abc", TOO_OLD, 0, 0},
      {"4294967296.0", TOO_OLD, 0, 0},
      {"99999999999999999999.1", TOO_OLD, 0, 0},
  };
  for (Case const &c : cases) {
    SCOPED_TRACE(c.stamp ? std::string("stamp <") + c.stamp + ">" : "no stamp");
    std::string const path = m_Dir.File("d.odb");
    {
      TypedDesign design;
      if (c.stamp)
        design.m_pView->CreatePropertyString("TDS_TDM_VERSION", c.stamp);
      else
        design.m_pView->DeleteProperty("TDS_TDM_VERSION");
      design.Model().Save(path.c_str());
    }
    Lum_TdmModel model("r", "r", "");
    Port_MsgCapture capture;
    if (c.outcome == ACCEPTED) {
      model.Open(path.c_str());
      unsigned version = 99, revision = 99;
      FirstView(model)->GetTdmLoadedDesignVersion(version, revision);
      EXPECT_EQ(version, c.version);
      EXPECT_EQ(revision, c.revision);
      EXPECT_TRUE(capture.GetReports().empty());
      continue;
    }
    bool const old = c.outcome == TOO_OLD;
    try {
      model.Open(path.c_str());
      ADD_FAILURE() << "stamp accepted";
    } catch (Lum_ExceptionCorruptDatabase const &e) {
      EXPECT_EQ(e.GetMessage(), old ? "Old design that requires conversion."
                                    : "New design that requires newer software.");
      EXPECT_EQ(e.GetObjectName(), "dm");
      EXPECT_EQ(e.GetFile(), "../s/Lum_TdmView");
    }
    ASSERT_EQ(capture.GetReports().size(), 1u);
    Port_MsgReport const &report = capture.GetReports().front();
    EXPECT_EQ(report.severity, Port_MsgReport::ERROR);
    EXPECT_EQ(report.subsystem, "Lum");
    EXPECT_EQ(report.path, "../s/Lum_TdmView");
    std::string const numbers = "Tdm version is " + std::to_string(static_cast<int>(c.version)) +
                                " and the revision is " +
                                std::to_string(static_cast<int>(c.revision)) + ".";
    EXPECT_EQ(report.text,
              numbers +
                  (old ? " This is an old design that is no longer supported by the "
                         "software.  Please convert your design.\n"
                       : "\nThis design was created by software with a newer version than "
                         "this software.\nPlease use this design with the newer software.\n"));
    EXPECT_EQ(model.GetClientCount(), 0u);
    EXPECT_TRUE(model.GetOrbModel()->GetDesignMgrs().empty());
  }
}

// ---------------------------------------------------------------------------
// Library list

class TdmViewLibraryTest : public ::testing::Test {
protected:
  TdmViewLibraryTest()
      : m_LibA("LIBA", 1, 2), m_LibB("LIBB", 2, 0, "fast"), m_LibC("LIBC", 3, 4, "", "rev2"),
        m_LibD("LIBD", 7, 11, "q1", "q2"), m_Design(std::make_unique<HookedModel>()) {}

  HookedView *View() { return static_cast<HookedView *>(m_Design.m_pView); }
  void SetLibs(std::vector<char const *> const &entries) {
    Orb_Property *libs = View()->CreatePropertyStringList("TDS_VIEW_TYPE_LIBS");
    for (char const *entry : entries)
      libs->AppendString(entry);
  }
  // Reopens the design so that the view builds its list from the property.
  HookedView *Reopen() {
    m_Reopened = std::make_unique<HookedModel>();
    std::string const path = m_Dir.File("d.odb");
    m_Design.Model().Save(path.c_str());
    m_Reopened->Open(path.c_str());
    return static_cast<HookedView *>(FirstView(*m_Reopened));
  }

  TempDir m_Dir;
  TestLibrary m_LibA;
  TestLibrary m_LibB;
  TestLibrary m_LibC;
  TestLibrary m_LibD;
  TypedDesign m_Design;
  std::unique_ptr<HookedModel> m_Reopened;
};

// Without TDS_VIEW_TYPE_LIBS the list is empty, needs no personality, and
// the first commit writes an empty list next to the stamp.
TEST_F(TdmViewLibraryTest, AbsentListIsEmpty) {
  View()->DeleteProperty("TDS_DEVICE_PM");
  EXPECT_EQ(View()->GetLibrary("LIBA"), nullptr);
  EXPECT_EQ(LibNames(View()), "");
  View()->CommitAll();
  Orb_Property const *written = View()->GetPropertyByName("TDS_VIEW_TYPE_LIBS");
  ASSERT_NE(written, nullptr);
  EXPECT_EQ(written->GetKind(), Orb_Property::STRING_LIST);
  EXPECT_TRUE(written->GetStrings().empty());
  EXPECT_EQ(PropertyValue(View(), "TDS_TDM_VERSION"), "3.1");
}

// Entries select libraries by their exact first field, leading blanks
// ignored; blank entries are skipped with a warning; the commit writes each
// library's current version and non-empty qualifiers.
TEST_F(TdmViewLibraryTest, ListIsReadByNameAndWrittenInFull) {
  SetLibs({"", "LIBA 9.9 old qualifiers", "  LIBB", "   ", "LIBC 3.4 x", "LIBD"});
  HookedView *view = Reopen();
  Port_MsgCapture capture;
  EXPECT_EQ(view->GetLibrary("LIBB"), m_LibB.Get());
  EXPECT_EQ(capture.GetReports().size(), 2u);
  for (char const *other : {"libb", "LIBB ", "LIB"})
    EXPECT_EQ(view->GetLibrary(other), nullptr) << other;
  view->CommitAll();
  EXPECT_EQ(ListValue(view, "TDS_VIEW_TYPE_LIBS"),
            "LIBA 1.2|LIBB 2.0 fast|LIBC 3.4 rev2|LIBD 7.11 q1 q2");
  EXPECT_EQ(LibNames(view), "LIBA,LIBB,LIBC,LIBD");
}

// A library listed twice is loaded, registered, written and released twice.
TEST_F(TdmViewLibraryTest, DuplicateEntryCountsTwice) {
  SetLibs({"LIBA", "LIBA"});
  unsigned const registered = Registrations("LIBA");
  HookedView *view = Reopen();
  EXPECT_EQ(LibNames(view), "LIBA,LIBA");
  EXPECT_EQ(Lum_TlmCatalog::GetReferenceCount("LIBA"), 2u);
  EXPECT_EQ(Registrations("LIBA"), registered + 2);
  view->CommitAll();
  EXPECT_EQ(ListValue(view, "TDS_VIEW_TYPE_LIBS"), "LIBA 1.2|LIBA 1.2");
  m_Reopened.reset();
  EXPECT_EQ(Lum_TlmCatalog::GetReferenceCount("LIBA"), 0u) << "both references given back";
}

// The local library is obtained for the design database, not loaded by
// name; it stands once in the list, is neither registered nor released, and
// its entry survives a commit and reopen.
TEST_F(TdmViewLibraryTest, LocalLibraryIsObtainedOnce) {
  char const *local = Lum_TlmLibrary::LOCAL_LIBRARY_NAME;
  SetLibs({"LIBA", local, local});
  HookedView *view = Reopen();
  view->m_Loader = [local](char const *name) {
    EXPECT_STRNE(name, local) << "the local library was loaded by name";
    return Lum_TlmLibrary::LoadLibrary(name, PM_PIC("pm1", "part1", nullptr));
  };
  std::vector<Lum_TlmLibrary const *> libraries;
  view->GetLibraries(libraries);
  EXPECT_EQ(Names(libraries), std::string("LIBA,") + local);
  EXPECT_EQ(view->GetLocalLibrary(), libraries.back());
  EXPECT_EQ(libraries.back(), Lum_TlmLibrary::GetLocalLibrary(view->GetOrbView()->GetModel(),
                                                              PM_PIC("", "", nullptr)));
  EXPECT_EQ(Registrations(local), 0u);
  view->CommitAll();
  EXPECT_EQ(ListValue(view, "TDS_VIEW_TYPE_LIBS"), std::string("LIBA 1.2|") + local + " 1.0");
}

// SetLibrary adds and registers a library once; a null library, given or
// loaded, is refused and stays out of the list.
TEST_F(TdmViewLibraryTest, NullLibraryIsRefused) {
  SetLibs({"LIBA"});
  HookedView *view = Reopen();
  view->m_Loader = [](char const *) -> Lum_TlmLibrary const * { return nullptr; };
  EXPECT_EQ(Failure([&] { view->GetLibrary("LIBA"); }),
            "InvalidLibrary|LIBA|Null library pointer specified.");
  unsigned const registered = Registrations("LIBB");
  view->SetLibrary(m_LibB.Get());
  view->SetLibrary(m_LibB.Get());
  EXPECT_EQ(Registrations("LIBB"), registered + 1);
  EXPECT_EQ(Failure([&] { view->SetLibrary(nullptr); }),
            "InvalidLibrary||Null library pointer specified.");
  EXPECT_EQ(LibNames(view), "LIBB");
}

// GetLibraries keeps what the caller's vector held, appends after it and
// warns. AddLocalLibrary appends the local library once; GetLocalLibrary
// never obtains it.
TEST_F(TdmViewLibraryTest, GetLibrariesAppendsWithWarningAndLocalIsAddedOnce) {
  SetLibs({"LIBC"});
  HookedView *view = Reopen();
  std::vector<Lum_TlmLibrary const *> libraries{m_LibA.Get(), m_LibB.Get()};
  Port_MsgCapture capture;
  view->GetLibraries(libraries);
  EXPECT_EQ(Names(libraries), "LIBA,LIBB,LIBC");
  ASSERT_EQ(capture.GetReports().size(), 1u);
  EXPECT_EQ(capture.GetReports()[0].severity, Port_MsgReport::DEBUG_WARNING);
  EXPECT_EQ(capture.GetReports()[0].text, "Warning:  passed in vector in not empty.\n");

  EXPECT_EQ(view->GetLocalLibrary(), nullptr);
  Lum_TlmLibrary const *local = view->AddLocalLibrary();
  ASSERT_NE(local, nullptr);
  EXPECT_EQ(view->AddLocalLibrary(), local);
  EXPECT_EQ(LibNames(view), std::string("LIBC,") + Lum_TlmLibrary::LOCAL_LIBRARY_NAME);
}

// A failure while the list is built keeps what entered it; the list is not
// built again, and what it holds is released with the view.
TEST_F(TdmViewLibraryTest, FailureMidListKeepsEarlierLibraries) {
  SetLibs({"LIBA", "NOSUCHLIB", "LIBC"});
  HookedView *view = Reopen();
  try {
    view->GetLibrary("LIBA");
    FAIL() << "a missing library was not reported";
  } catch (Lum_ExceptionInvalidLibrary const &e) {
    EXPECT_EQ(e.GetObjectName(), "NOSUCHLIB");
  }
  EXPECT_EQ(view->GetLibrary("LIBA"), m_LibA.Get()) << "the list counts as built";
  EXPECT_EQ(view->GetLibrary("LIBC"), nullptr);
  EXPECT_EQ(Lum_TlmCatalog::GetReferenceCount("LIBA"), 1u);
  EXPECT_EQ(Lum_TlmCatalog::GetReferenceCount("LIBC"), 0u);
  // The commit goes on but keeps the stored list: writing the partial list
  // would drop LIBC from the database.
  view->CommitAll();
  view->CommitAll();
  EXPECT_EQ(ListValue(view, "TDS_VIEW_TYPE_LIBS"), "LIBA|NOSUCHLIB|LIBC");
  EXPECT_EQ(PropertyValue(view, "TDS_TDM_VERSION"), "3.1");
  m_Reopened.reset();
  EXPECT_EQ(Lum_TlmCatalog::GetReferenceCount("LIBA"), 0u);
}

// A view outliving an in-memory library it loaded, and the local library,
// goes away without reading either.
TEST_F(TdmViewLibraryTest, ViewOutlivesItsLibraries) {
  auto doomed = std::make_unique<TestLibrary>("DOOMED", 1, 0);
  SetLibs({"DOOMED", Lum_TlmLibrary::LOCAL_LIBRARY_NAME, "LIBA"});
  HookedView *view = Reopen();
  EXPECT_EQ(LibNames(view), std::string("DOOMED,") + Lum_TlmLibrary::LOCAL_LIBRARY_NAME + ",LIBA");
  doomed.reset();
  m_Reopened.reset();
  EXPECT_EQ(Lum_TlmCatalog::GetReferenceCount("LIBA"), 0u);
}

// Loading needs the device personality; its absence names the property.
TEST_F(TdmViewLibraryTest, MissingPersonalityIsReported) {
  SetLibs({"LIBA"});
  View()->DeleteProperty("TDS_DEVICE_PART");
  HookedView *view = Reopen();
  EXPECT_EQ(Failure([&] { view->CommitAll(); }),
            "InvalidLibrary|netlist|The view has no TDS_DEVICE_PART property: the device "
            "personality is needed to load its type libraries.");
  EXPECT_EQ(ListValue(view, "TDS_VIEW_TYPE_LIBS"), "LIBA") << "a failed commit writes nothing";
}

// ---------------------------------------------------------------------------
// Memory report

// A block whose class size a test sets.
std::uint64_t g_BlockBytes = 0;
class SizedBlock : public Lum_TdmBlock {
public:
  using Lum_TdmBlock::Lum_TdmBlock;
  std::uint64_t DbgClassSize() const override { return g_BlockBytes; }
};

// A view whose measurement gives the counters a test sets.
class FixedSizeView : public Lum_TdmView {
public:
  using Lum_TdmView::Lum_TdmView;
  std::uint64_t DbgGetSize(std::uint64_t &blockBytes, std::uint64_t &blockCount,
                           std::uint64_t &pinBytes, std::uint64_t &pinCount,
                           std::uint64_t &networkBytes, std::uint64_t &networkCount,
                           std::uint64_t &signalBytes, std::uint64_t &signalCount) const override {
    std::uint64_t *const counters[] = {&blockBytes,   &blockCount,   &pinBytes,    &pinCount,
                                       &networkBytes, &networkCount, &signalBytes, &signalCount};
    for (std::size_t i = 0; i < 8; ++i)
      *counters[i] = m_Counters[i];
    return blockBytes + pinBytes + networkBytes + signalBytes;
  }
  std::array<std::uint64_t, 8> m_Counters{};
};

// A measurement as "total | blocks bytes/count | pins | networks | signals",
// the counters starting from values it must reset.
std::string Measure(Lum_TdmView const *view) {
  std::array<std::uint64_t, 8> c;
  c.fill(7);
  std::uint64_t const total = view->DbgGetSize(c[0], c[1], c[2], c[3], c[4], c[5], c[6], c[7]);
  std::string text = std::to_string(total);
  for (std::size_t i = 0; i < 8; i += 2)
    text += " | " + std::to_string(c[i]) + "/" + std::to_string(c[i + 1]);
  return text;
}

std::string Report(Lum_TdmView const *view) {
  Port::StringStream out;
  view->DbgReportSize(&out);
  return out.GetText();
}

std::string const kReportRule =
    "==================================================================\n";

// Blocks are measured by their class size, which a derived class can set; a
// class of 0 bytes prints a share of 0 instead of dividing by the total.
TEST(TdmViewSizeTest, BlocksOfOneClassSize) {
  struct Case {
    std::uint64_t bytes;
    char const *measured, *blocks;
  } const cases[] = {
      {32, "96 | 96/3 | 0/0 | 0/0 | 0/0",
       "3 blocks consume 96 bytes of memory (100%)\n      Average block size is 32 bytes\n"},
      {0, "0 | 0/3 | 0/0 | 0/0 | 0/0",
       "3 blocks consume 0 bytes of memory (0%)\n      Average block size is 0 bytes\n"},
  };
  for (Case const &c : cases) {
    g_BlockBytes = c.bytes;
    TypedDesign design(std::make_unique<ClientModel<SizedBlock>>());
    Lum_TdmBlock *top = design.m_pView->CreateTopBlock("top");
    top->CreateBlock("a", 0);
    top->CreateBlock("b", 0);
    EXPECT_EQ(Measure(design.m_pView), c.measured);
    EXPECT_THAT(Report(design.m_pView), HasSubstr(c.blocks));
  }
}

// A view with no blocks and no networks measures 0 and prints no section.
// Pins are counted through their blocks and signals through their networks
// (a signal in no network is not counted); what is reached without a client
// gets one, and a second measurement gives the same counters.
TEST(TdmViewSizeTest, MeasurementReachesEveryObjectOnce) {
  TypedDesign design;
  EXPECT_EQ(Measure(design.m_pView), "0 | 0/0 | 0/0 | 0/0 | 0/0");
  EXPECT_EQ(Report(design.m_pView), kReportRule +
                                        "Design <top> View <netlist> consumes 0 bytes of memory\n" +
                                        "  0 specialized objects\n" + kReportRule);
  Lum_TdmModel &model = design.Model();
  Lum_TdmBlock *top = design.m_pView->CreateTopBlock("top");
  Orb_Block *child = top->CreateBlock("c1", 0)->GetOrbBlock();
  child->CreatePin("q", Orb_Pin::PIN_INPUT);
  Orb_Pin *pin = top->CreatePin("p1", Orb_Pin::PIN_INPUT)->GetOrbPin();
  top->CreatePin("p2", Orb_Pin::PIN_OUTPUT);
  Orb_Signal *inNetwork = top->CreateSignal("s1")->GetOrbSignal();
  Orb_Signal *alone = top->CreateSignal("s2")->GetOrbSignal();
  Orb_Network *network = design.m_pView->CreateNetwork("n1")->GetOrbNetwork();
  network->AddSignal(inNetwork);
  design.m_pView->CreateNetwork("n2");
  for (Orb_Persistent *object :
       std::vector<Orb_Persistent *>{child, pin, inNetwork, alone, network})
    delete model.GetClient(object);

  std::string const expected = std::to_string(2 * sizeof(Lum_TdmBlock) + 3 * sizeof(Lum_TdmPin) +
                                              2 * sizeof(Lum_TdmNetwork) + sizeof(Lum_TdmSignal)) +
                               " | " + std::to_string(2 * sizeof(Lum_TdmBlock)) + "/2 | " +
                               std::to_string(3 * sizeof(Lum_TdmPin)) + "/3 | " +
                               std::to_string(2 * sizeof(Lum_TdmNetwork)) + "/2 | " +
                               std::to_string(sizeof(Lum_TdmSignal)) + "/1";
  EXPECT_EQ(Measure(design.m_pView), expected);
  for (Orb_Persistent *object : std::vector<Orb_Persistent *>{child, pin, inNetwork, network})
    EXPECT_NE(model.GetClient(object), nullptr) << object->GetName() << " was not specialized";
  EXPECT_EQ(model.GetClient(alone), nullptr) << "a signal in no network was reached";
  EXPECT_EQ(Measure(design.m_pView), expected);
}

// The report takes the view's measurement through its virtual slot and
// prints blocks, networks, signals and pins, each only when present, with
// truncated shares and averages.
TEST(TdmViewSizeTest, ReportPrintsThePresentKindsInOrder) {
  TypedDesign design(std::make_unique<ClientModel<Lum_TdmBlock, FixedSizeView>>());
  auto *view = static_cast<FixedSizeView *>(design.m_pView);
  view->m_Counters = {100, 3, 1044, 6, 7, 1, 40, 2};
  EXPECT_EQ(Report(view), kReportRule +
                              "Design <top> View <netlist> consumes 1191 bytes of memory\n"
                              "  12 specialized objects\n"
                              "    3 blocks consume 100 bytes of memory (8%)\n"
                              "      Average block size is 33 bytes\n"
                              "    1 networks consume 7 bytes of memory (0%)\n"
                              "      Average network size is 7 bytes\n"
                              "    2 signals consume 40 bytes of memory (3%)\n"
                              "      Average signal size is 20 bytes\n"
                              "    6 pins consume 1044 bytes of memory (87%)\n"
                              "      Average pin size is 174 bytes\n" +
                              kReportRule);

  view->m_Counters = {0, 0, 30, 2, 0, 0, 10, 1};
  EXPECT_THAT(Report(view), AllOf(HasSubstr("  3 specialized objects\n    1 signals consume"),
                                  Not(HasSubstr("blocks")), Not(HasSubstr("networks"))));
}

} // namespace

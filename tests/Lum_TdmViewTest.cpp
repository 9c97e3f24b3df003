// The view's format stamp, its type-library list and its memory report.

#include "Lum_TdmTestSupport.h"

#include "Lum_Exception.h"
#include "Lum_TdmSchema.h"
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
using ::testing::StartsWith;

namespace {

// A view whose library loading a test can replace, with SetLibrary made public.
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

class TdmViewStampTest : public ::testing::Test {
protected:
  TempDir m_Dir;
};

// A new view is stamped and drops the pin switch, even one set before the library saw it.
TEST_F(TdmViewStampTest, NewViewIsStamped) {
  Orb_Model host("h", "h", "", false);
  EarlierSubscriber first(&host);
  first.m_OnView = [](Orb_View *view) {
    view->CreatePropertyString(Lum_TdmSchema::kDontCreateUnusedPins, "yes");
  };
  Lum_TdmModel model(&host);
  Orb_View *hostView = host.CreateDesignMgr("dm")->CreateDesign("d")->CreateView("v");
  auto *view = static_cast<Lum_TdmView *>(model.GetClient(hostView));
  EXPECT_EQ(PropertyValue(view, Lum_TdmSchema::kVersion), "3.1");
  EXPECT_EQ(view->GetPropertyByName(Lum_TdmSchema::kDontCreateUnusedPins), nullptr);
  EXPECT_EQ(view->GetPropertyByName(Lum_TdmSchema::kTypeLibraries), nullptr);
}

// An older stamp stays until the commit, which writes the current one.
TEST_F(TdmViewStampTest, CommitRewritesAnOlderStamp) {
  TypedDesign design;
  design.m_pView->CreatePropertyString(Lum_TdmSchema::kVersion, "2.5");
  design.m_pView->CreatePropertyString(Lum_TdmSchema::kDontCreateUnusedPins, "");
  auto reopened = SaveAndReopen(design.Model(), m_Dir.File("d.odb"));
  Lum_TdmView *view = FirstView(*reopened);
  EXPECT_EQ(PropertyValue(view, Lum_TdmSchema::kVersion), "2.5");
  EXPECT_NE(view->GetPropertyByName(Lum_TdmSchema::kDontCreateUnusedPins), nullptr);
  view->CommitAll();
  EXPECT_EQ(view->GetPropertyByName(Lum_TdmSchema::kDontCreateUnusedPins), nullptr);
  unsigned version = 0, revision = 0;
  view->GetTdmLoadedDesignVersion(version, revision);
  EXPECT_EQ(version * 10 + revision, 25u);
  auto again = SaveAndReopen(*reopened, m_Dir.File("d2.odb"));
  EXPECT_EQ(PropertyValue(FirstView(*again), Lum_TdmSchema::kVersion), "3.1");
}

// Each stored stamp is accepted with its numbers, or reported and refused as too old or too new.
TEST_F(TdmViewStampTest, LoadClassifiesTheStamp) {
  std::string const old = "Old design that requires conversion.";
  std::string const young = "New design that requires newer software.";
  struct Case {
    char const *stamp; // null: no stamp at all
    int version, revision;
    std::string failure; // empty: accepted
  } const cases[] = {
      {nullptr, 0, 0, ""},  {"0.2", 0, 2, old},     {"0.3", 0, 3, ""},  {"3", 3, 0, ""},
      {"3.2", 3, 2, young}, {"-1.0", -1, 0, young}, {"abc", 0, 0, old}, {"4294967296.0", 0, 0, old},
  };
  for (Case const &c : cases) {
    SCOPED_TRACE(c.stamp ? c.stamp : "no stamp");
    std::string const path = m_Dir.File("d.odb");
    {
      TypedDesign design;
      if (c.stamp)
        design.m_pView->CreatePropertyString(Lum_TdmSchema::kVersion, c.stamp);
      else
        design.m_pView->DeleteProperty(Lum_TdmSchema::kVersion);
      design.Model().Save(path.c_str());
    }
    Lum_TdmModel model("r", "r", "");
    Port_MsgCapture capture;
    std::string const failure = Failure([&] { model.Open(path.c_str()); });
    std::string const numbers =
        std::to_string(c.version) + " and the revision is " + std::to_string(c.revision) + ".";
    if (c.failure.empty()) {
      EXPECT_EQ(failure, "no failure");
      unsigned version = 99, revision = 99;
      FirstView(model)->GetTdmLoadedDesignVersion(version, revision);
      EXPECT_EQ(std::to_string(version) + " and the revision is " + std::to_string(revision) + ".",
                numbers);
      EXPECT_TRUE(capture.GetReports().empty());
      continue;
    }
    EXPECT_EQ(failure, "CorruptDatabase|dm|" + c.failure);
    ASSERT_EQ(capture.GetReports().size(), 1u);
    EXPECT_EQ(capture.GetReports()[0].severity, Port_MsgReport::ERROR);
    EXPECT_EQ(capture.GetReports()[0].text,
              "Tdm version is " + numbers +
                  (c.failure == old
                       ? " This is an old design that is no longer supported by the "
                         "software.  Please convert your design.\n"
                       : "\nThis design was created by software with a newer version than "
                         "this software.\nPlease use this design with the newer software.\n"));
    EXPECT_EQ(model.GetClientCount() + HostObjectCount(model.GetOrbModel()), 0u);
  }
}

class TdmViewLibraryTest : public ::testing::Test {
protected:
  HookedView *View() { return static_cast<HookedView *>(m_Design.m_pView); }
  void SetLibs(std::vector<char const *> const &entries) {
    Orb_Property *libs = View()->CreatePropertyStringList(Lum_TdmSchema::kTypeLibraries);
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
  TestLibrary m_LibA{"LIBA", 1, 2}, m_LibB{"LIBB", 2, 0, "fast"}, m_LibC{"LIBC", 3, 4, "", "rev2"},
      m_LibD{"LIBD", 7, 11, "q1", "q2"};
  TypedDesign m_Design{std::make_unique<HookedModel>()};
  std::unique_ptr<HookedModel> m_Reopened;
};

// No TDS_VIEW_TYPE_LIBS: an empty list, no personality needed, an empty list written.
TEST_F(TdmViewLibraryTest, AbsentListIsEmpty) {
  View()->DeleteProperty(Lum_TdmSchema::kDevicePm);
  EXPECT_EQ(View()->GetLibrary("LIBA"), nullptr);
  View()->CommitAll();
  ASSERT_EQ(ListValue(View(), Lum_TdmSchema::kTypeLibraries), "");
  EXPECT_EQ(View()->GetPropertyByName(Lum_TdmSchema::kTypeLibraries)->GetKind(),
            Orb_Property::STRING_LIST);
}

// Entries match by exact first field; blanks warn; a duplicate counts twice; the commit writes
// current versions.
TEST_F(TdmViewLibraryTest, ListIsReadByNameAndWrittenInFull) {
  SetLibs({"", "LIBA 9.9 old qualifiers", "  LIBB", "   ", "LIBC 3.4 x", "LIBD", "LIBA"});
  unsigned const registered = Registrations("LIBA");
  HookedView *view = Reopen();
  Port_MsgCapture capture;
  EXPECT_EQ(view->GetLibrary("LIBB"), m_LibB.Get());
  EXPECT_EQ(capture.GetReports().size(), 2u);
  for (char const *other : {"libb", "LIBB ", "LIB"})
    EXPECT_EQ(view->GetLibrary(other), nullptr) << other;
  EXPECT_EQ(Lum_TlmCatalog::GetReferenceCount("LIBA"), 2u);
  EXPECT_EQ(Registrations("LIBA"), registered + 2);
  view->CommitAll();
  EXPECT_EQ(ListValue(view, Lum_TdmSchema::kTypeLibraries),
            "LIBA 1.2|LIBB 2.0 fast|LIBC 3.4 rev2|LIBD 7.11 q1 q2|LIBA 1.2");
  m_Reopened.reset();
  EXPECT_EQ(Lum_TlmCatalog::GetReferenceCount("LIBA"), 0u);
}

// A null library is refused; SetLibrary registers once; GetLibraries appends with a warning.
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
  std::vector<Lum_TlmLibrary const *> libraries{m_LibA.Get()};
  Port_MsgCapture capture;
  view->GetLibraries(libraries);
  EXPECT_EQ(Names(libraries), "LIBA,LIBB");
  ASSERT_EQ(capture.GetReports().size(), 1u);
  EXPECT_EQ(capture.GetReports()[0].text, "Warning:  passed in vector in not empty.\n");
  EXPECT_EQ(view->GetLocalLibrary(), nullptr);
  Lum_TlmLibrary const *local = view->AddLocalLibrary();
  EXPECT_EQ(view->AddLocalLibrary(), local);
  EXPECT_EQ(LibNames(view), std::string("LIBB,") + Lum_TlmLibrary::LOCAL_LIBRARY_NAME);
}

// A failure mid-list keeps what entered it, is not retried, and releases it with the view.
TEST_F(TdmViewLibraryTest, FailureMidListKeepsEarlierLibraries) {
  SetLibs({"LIBA", "NOSUCHLIB", "LIBC"});
  HookedView *view = Reopen();
  EXPECT_THAT(Failure([&] { view->GetLibrary("LIBA"); }), StartsWith("InvalidLibrary|NOSUCHLIB|"));
  EXPECT_EQ(view->GetLibrary("LIBA"), m_LibA.Get()) << "the list counts as built";
  EXPECT_EQ(view->GetLibrary("LIBC"), nullptr);
  EXPECT_EQ(Lum_TlmCatalog::GetReferenceCount("LIBA"), 1u);
  // The commit keeps the stored list: writing the partial one would drop LIBC.
  view->CommitAll();
  EXPECT_EQ(ListValue(view, Lum_TdmSchema::kTypeLibraries), "LIBA|NOSUCHLIB|LIBC");
  m_Reopened.reset();
  EXPECT_EQ(Lum_TlmCatalog::GetReferenceCount("LIBA"), 0u);
}

// The local library is obtained, not loaded by name, listed once and never registered; a view
// outliving its loaded libraries goes away without reading them.
TEST_F(TdmViewLibraryTest, ViewOutlivesItsLibraries) {
  char const *local = Lum_TlmLibrary::LOCAL_LIBRARY_NAME;
  auto doomed = std::make_unique<TestLibrary>("DOOMED", 1, 0);
  SetLibs({"DOOMED", local, local, "LIBA"});
  HookedView *view = Reopen();
  view->m_Loader = [local](char const *name) {
    EXPECT_STRNE(name, local) << "the local library was loaded by name";
    return Lum_TlmLibrary::LoadLibrary(name, PM_PIC("pm1", "part1", nullptr));
  };
  EXPECT_EQ(LibNames(view), std::string("DOOMED,") + local + ",LIBA");
  EXPECT_EQ(view->GetLocalLibrary(), Lum_TlmLibrary::GetLocalLibrary(view->GetOrbView()->GetModel(),
                                                                     PM_PIC("", "", nullptr)));
  EXPECT_EQ(Registrations(local), 0u);
  view->CommitAll();
  EXPECT_EQ(ListValue(view, Lum_TdmSchema::kTypeLibraries),
            std::string("DOOMED 1.0|") + local + " 1.0|LIBA 1.2");
  doomed.reset();
  m_Reopened.reset();
  EXPECT_EQ(Lum_TlmCatalog::GetReferenceCount("LIBA"), 0u);
}

// Loading needs the device personality; its absence names the property.
TEST_F(TdmViewLibraryTest, MissingPersonalityIsReported) {
  SetLibs({"LIBA"});
  View()->DeleteProperty(Lum_TdmSchema::kDevicePart);
  HookedView *view = Reopen();
  EXPECT_EQ(Failure([&] { view->CommitAll(); }),
            "InvalidLibrary|netlist|The view has no TDS_DEVICE_PART property: the device "
            "personality is needed to load its type libraries.");
  EXPECT_EQ(ListValue(view, Lum_TdmSchema::kTypeLibraries), "LIBA")
      << "a failed commit writes nothing";
}

// A block of class size 0.
class SizedBlock : public Lum_TdmBlock {
public:
  using Lum_TdmBlock::Lum_TdmBlock;
  std::uint64_t DbgClassSize() const override { return 0; }
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

// "total | blocks bytes/count | pins | networks | signals", counters starting non-zero.
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

// Blocks are measured by their (overridable) class size; a 0-byte class gives a 0% share.
TEST(TdmViewSizeTest, BlocksOfOneClassSize) {
  TypedDesign design(std::make_unique<ClientModel<SizedBlock>>());
  Lum_TdmBlock *top = design.m_pView->CreateTopBlock("top");
  top->CreateBlock("a", 0);
  top->CreateBlock("b", 0);
  EXPECT_EQ(Measure(design.m_pView), "0 | 0/3 | 0/0 | 0/0 | 0/0");
  EXPECT_THAT(Report(design.m_pView),
              HasSubstr("3 blocks consume 0 bytes of memory (0%)\n      Average block size is 0"));
}

// Empty measures 0; each object counted once via blocks/networks, lone signals not at all.
TEST(TdmViewSizeTest, MeasurementReachesEveryObjectOnce) {
  TypedDesign design;
  EXPECT_EQ(Measure(design.m_pView), "0 | 0/0 | 0/0 | 0/0 | 0/0");
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
  auto const b = sizeof(Lum_TdmBlock), p = sizeof(Lum_TdmPin), n = sizeof(Lum_TdmNetwork),
             g = sizeof(Lum_TdmSignal);
  std::string const expected = std::to_string(2 * b + 3 * p + 2 * n + g) + " | " +
                               std::to_string(2 * b) + "/2 | " + std::to_string(3 * p) + "/3 | " +
                               std::to_string(2 * n) + "/2 | " + std::to_string(g) + "/1";
  EXPECT_EQ(Measure(design.m_pView), expected);
  EXPECT_EQ(model.GetClient(alone), nullptr) << "a signal in no network was reached";
  EXPECT_EQ(Measure(design.m_pView), expected);
}

// The report uses the virtual measurement and prints only the kinds present, truncated.
TEST(TdmViewSizeTest, ReportPrintsThePresentKindsInOrder) {
  TypedDesign design(std::make_unique<ClientModel<Lum_TdmBlock, FixedSizeView>>());
  auto *view = static_cast<FixedSizeView *>(design.m_pView);
  view->m_Counters = {100, 3, 1044, 6, 7, 1, 40, 2};
  std::string const rule(66, '=');
  EXPECT_EQ(Report(view), rule +
                              "\nDesign <top> View <netlist> consumes 1191 bytes of memory\n"
                              "  12 specialized objects\n"
                              "    3 blocks consume 100 bytes of memory (8%)\n"
                              "      Average block size is 33 bytes\n"
                              "    1 networks consume 7 bytes of memory (0%)\n"
                              "      Average network size is 7 bytes\n"
                              "    2 signals consume 40 bytes of memory (3%)\n"
                              "      Average signal size is 20 bytes\n"
                              "    6 pins consume 1044 bytes of memory (87%)\n"
                              "      Average pin size is 174 bytes\n" +
                              rule + "\n");
  view->m_Counters = {0, 0, 30, 2, 0, 0, 10, 1};
  EXPECT_THAT(Report(view), AllOf(HasSubstr("  3 specialized objects\n    1 signals consume"),
                                  Not(HasSubstr("blocks")), Not(HasSubstr("networks"))));
}

} // namespace

// Pins, signals and networks: a loaded pin's type pin, and commits that
// write nothing.

#include "Lum_TdmTestSupport.h"

#include "Lum_TlmTypeID.h"

#include <gtest/gtest.h>

using namespace lumtest;

namespace {

// A canonical text of every property of an object.
std::string Properties(Orb_Persistent const *object) {
  std::string text;
  for (auto const &property : object->GetProperties()) {
    text += std::string(property->GetName()) + "=" + std::string(property->GetValue()) + ";";
    for (auto const &entry : property->GetStrings())
      text += "[" + entry + "]";
    for (auto const &member : property->GetMembers())
      text += "{" + std::string(member->GetName()) + "=" + std::string(member->GetValue()) + "}";
  }
  return text;
}

class TdmPinTest : public ::testing::Test {
protected:
  TdmPinTest() : m_Library("LIBP", 1, 0) {
    m_pTypeBlock = m_Library.AddTypeBlock("DFF", {"D", "Q"});
    m_pTop = m_Design.m_pView->CreateTopBlock("top");
  }

  TempDir m_Dir;
  TestLibrary m_Library;
  Lum_TlmBlock *m_pTypeBlock = nullptr;
  TypedDesign m_Design;
  Lum_TdmBlock *m_pTop = nullptr;
};

// A loaded pin has no type pin, and loading it gives its block a client.
TEST_F(TdmPinTest, LoadedPinBringsItsBlockClient) {
  m_pTop->CreatePin("D", Orb_Pin::PIN_INPUT)->SetTypePin(m_pTypeBlock->GetPinByName("D"));
  auto reopened = SaveAndReopen(m_Design.Model(), m_Dir.File("d.odb"));
  Orb_Block *top = FirstView(*reopened)->GetOrbView()->GetBlock();
  Orb_Pin *pin = top->GetPins().front();
  auto const *loaded = static_cast<Lum_TdmPin *>(reopened->GetClient(pin));
  EXPECT_EQ(loaded->GetTypePin(), nullptr);
  EXPECT_TRUE(loaded->IsTypeOf(Lum_TlmPinTypeID()));
  EXPECT_FALSE(loaded->IsTypeOf(Lum_TlmPinTypeID("LIBP", "DFF", "D")));

  // Discard both clients; specializing the pin alone brings the block back.
  delete reopened->GetClient(pin);
  delete reopened->GetClient(top);
  ASSERT_EQ(reopened->GetClient(top), nullptr);
  ASSERT_NE(reopened->Specialize(pin), nullptr);
  EXPECT_NE(reopened->GetClient(top), nullptr);
}

// Committing pins, signals and networks writes no property.
TEST_F(TdmPinTest, CommitWritesNothingForPinsSignalsNetworks) {
  Lum_TdmPin *pin = m_pTop->CreatePin("D", Orb_Pin::PIN_INPUT);
  pin->SetTypePin(m_pTypeBlock->GetPinByName("D"));
  pin->CreatePropertyString("USER", "kept");
  Lum_TdmSignal *signal = m_pTop->CreateSignal("s");
  Lum_TdmNetwork *network = m_Design.m_pView->CreateNetwork("n");
  pin->GetOrbPin()->ConnectInner(signal->GetOrbSignal());
  network->GetOrbNetwork()->AddSignal(signal->GetOrbSignal());

  pin->TraverseAndCommitToOrb();
  signal->TraverseAndCommitToOrb();
  network->TraverseAndCommitToOrb();
  m_Design.m_pView->CommitAll();
  EXPECT_EQ(Properties(pin->GetOrbObject()) + "|" + Properties(signal->GetOrbObject()) + "|" +
                Properties(network->GetOrbObject()),
            "USER=kept;||");
}

} // namespace

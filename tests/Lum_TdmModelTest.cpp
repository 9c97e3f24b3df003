// The client model: which client class each host event builds, with which
// creation flag, and how clients go away.

#include "Lum_TdmTestSupport.h"

#include <gtest/gtest.h>

using namespace lumtest;

namespace {

// Counts the client objects destroyed through the model's delete events.
class CountingModel : public Lum_TdmModel {
public:
  using Lum_TdmModel::Lum_TdmModel;
  void SyncEventDeleteBlock(Orb_Block *block) override {
    if (GetClient(block))
      ++m_BlocksDestroyed;
    Lum_TdmModel::SyncEventDeleteBlock(block);
  }
  int m_BlocksDestroyed = 0;
};

class TdmModelTest : public ::testing::Test {
protected:
  TempDir m_Dir;
};

// Every kind created through the host gets its client of the right class in
// the creation event, except design managers and networks, which the model
// builds only through the load event; opening a database builds every client
// through the load events.
TEST_F(TdmModelTest, EventsBuildTheClientClasses) {
  Lum_TdmModel model("m", "db", "");
  Orb_Model *host = model.GetOrbModel();
  Orb_DesignMgr *dm = host->CreateDesignMgr("dm");
  Orb_Design *design = dm->CreateDesign("d");
  Orb_View *view = design->CreateView("v");
  Orb_Block *top = view->CreateTopBlock("top");
  Orb_Pin *pin = top->CreateBlock("c", 0)->CreatePin("p", Orb_Pin::PIN_INPUT);
  Orb_Signal *signal = top->CreateSignal("s");
  Orb_Network *network = view->CreateNetwork("n");
  EXPECT_EQ(model.GetClient(dm), nullptr);
  EXPECT_EQ(model.GetClient(network), nullptr);
  EXPECT_NE(dynamic_cast<Lum_TdmDesign *>(model.GetClient(design)), nullptr);
  EXPECT_NE(dynamic_cast<Lum_TdmView *>(model.GetClient(view)), nullptr);
  EXPECT_NE(dynamic_cast<Lum_TdmBlock *>(model.GetClient(top)), nullptr);
  EXPECT_NE(dynamic_cast<Lum_TdmPin *>(model.GetClient(pin)), nullptr);
  EXPECT_NE(dynamic_cast<Lum_TdmSignal *>(model.GetClient(signal)), nullptr);
  EXPECT_NE(dynamic_cast<Lum_TdmDesignMgr *>(model.Specialize(dm)), nullptr);
  EXPECT_NE(dynamic_cast<Lum_TdmNetwork *>(model.Specialize(network)), nullptr);

  auto reopened = SaveAndReopen(model, m_Dir.File("d.odb"));
  EXPECT_EQ(reopened->GetClientCount(), 8u) << "one client per host object";
  Orb_View *loaded = FirstView(*reopened)->GetOrbView();
  EXPECT_NE(dynamic_cast<Lum_TdmDesignMgr *>(
                reopened->GetClient(reopened->GetOrbModel()->GetDesignMgrs().front())),
            nullptr);
  EXPECT_NE(dynamic_cast<Lum_TdmNetwork *>(reopened->GetClient(loaded->GetNetworks().front())),
            nullptr);
  EXPECT_NE(
      dynamic_cast<Lum_TdmSignal *>(reopened->GetClient(loaded->GetBlock()->GetSignals().front())),
      nullptr);
}

// Deleting a host block destroys its client once, and its children's; a
// host object without a client is deleted without any effect on clients.
TEST_F(TdmModelTest, DeleteEventsDestroyClientsOnce) {
  CountingModel model("m", "db", "");
  Orb_Model *host = model.GetOrbModel();
  Orb_View *view = host->CreateDesignMgr("dm")->CreateDesign("d")->CreateView("v");
  Orb_Block *top = view->CreateTopBlock("top");
  Orb_Block *child = top->CreateBlock("c", 0);
  child->CreateBlock("g", 0);
  child->CreatePin("p", Orb_Pin::PIN_INPUT);

  delete model.GetClient(child->GetBlocks().front()); // discarded client
  top->DeleteBlock(child);
  EXPECT_EQ(model.m_BlocksDestroyed, 1) << "only the child still had a client";
  EXPECT_NE(model.GetClient(top), nullptr);

  std::size_t const before = model.GetClientCount();
  Orb_Network *network = view->CreateNetwork("n"); // no client on create
  view->DeleteNetwork(network);
  EXPECT_EQ(model.GetClientCount(), before);
}

// Both constructors subscribe; a model over a caller's host model gets that
// host model's events and leaves it to the caller.
TEST_F(TdmModelTest, BothConstructorsSubscribe) {
  Lum_TdmModel own("name", "dbname", "path");
  EXPECT_TRUE(own.IsSubscribed());
  EXPECT_TRUE(own.OwnsOrbModel());

  Orb_Model host("h", "hdb", "", false);
  {
    Lum_TdmModel attached(&host);
    EXPECT_TRUE(attached.IsSubscribed());
    EXPECT_FALSE(attached.OwnsOrbModel());
    Orb_Design *design = host.CreateDesignMgr("dm")->CreateDesign("d");
    EXPECT_NE(attached.GetClient(design), nullptr);
  }
  EXPECT_EQ(host.GetDesignMgrs().size(), 1u) << "the caller's host model outlives the client model";
  EXPECT_TRUE(host.GetContexts().empty());
}

} // namespace

// The host model: its design managers' container, its companions, its
// contexts and its pools.

#include "Orb_Model.h"

#include "Orb_Derived.h"

#include <cassert>
#include <string>

// What a million-block design pays per object; and every kind fits a pool page.
static_assert(sizeof(void *) != 8 || sizeof(Orb_Persistent) == 24, "name, parent, slot, flags");
static_assert(sizeof(void *) != 8 || sizeof(Orb_Pin) == 32, "base and the outer side");
static_assert(sizeof(void *) != 8 || sizeof(Orb_Signal) == 40, "base and pin list");
static_assert(sizeof(void *) != 8 || sizeof(Orb_Block) == 72, "base, view, pins, inside");
#define ORB_KIND(Kind, shown)                                                                      \
  static_assert(sizeof(Orb_##Kind) <= Orb_ObjectPool::kMaxSlotSize, "Orb_" #Kind " fits a page");
#include "Orb_Kinds.def"

Orb_Model::Orb_Model(char const *name, char const *dbName, char const *path, bool readOnly)
    : m_Name(name ? name : ""), m_DbName(dbName ? dbName : ""), m_Path(path ? path : ""),
      m_ReadOnly(readOnly) {
  std::size_t const sizes[Orb_KindCount] = {
#define ORB_KIND(Kind, shown) sizeof(Orb_##Kind),
#include "Orb_Kinds.def"
  };
  for (unsigned k = 0; k < Orb_KindCount; ++k)
    m_Pools[k].SetSlotSize(sizes[k], this);
}

Orb_Model::~Orb_Model() {
  assert(m_Contexts.empty() && "Orb_Model destroyed while client models are attached");
  assert(m_HoldDepth == 0 && "Orb_Model destroyed while a deletion or an open is under way");
  // Companions may hold client models of their own host models; they go
  // before this model's objects.
  m_Companions.clear();
  m_LoadedCompanions.clear();
  // The pools go whole: objects are destroyed without giving back their
  // slots. Free leaves the containers alone, so the list can be walked as
  // it is.
  m_TearingDown = true;
  for (Orb_DesignMgr *designMgr : m_DesignMgrs.Items())
    Free(designMgr, false);
}

void Orb_Model::SetCompanion(std::string const &key,
                             std::unique_ptr<Orb_ModelCompanion> companion) {
  std::unique_ptr<Orb_ModelCompanion> &slot = m_Companions[key];
  if (m_pOpenJournal && slot) {
    auto before = m_pOpenJournal->liveBefore.find(key);
    // The one that was there before the open is kept for a refusal to restore.
    if (before != m_pOpenJournal->liveBefore.end() && before->second == slot.get())
      m_pOpenJournal->replaced.emplace(key, std::move(slot));
  }
  slot = std::move(companion);
}

Orb_ModelCompanion *Orb_Model::GetCompanion(std::string const &key) const {
  auto it = m_Companions.find(key);
  return it == m_Companions.end() ? nullptr : it->second.get();
}

void Orb_Model::RestoreCompanions(OpenJournal &journal) noexcept {
  for (auto it = m_Companions.begin(); it != m_Companions.end();) {
    std::string const &key = it->first;
    auto before = journal.liveBefore.find(key);
    if (before != journal.liveBefore.end() && before->second == it->second.get()) {
      ++it;
      continue;
    }
    std::unique_ptr<Orb_ModelCompanion> added = std::move(it->second);
    // A model that was waiting before the open and that this companion took
    // waits again.
    if (added && journal.waitingBefore.count(key) && !m_LoadedCompanions.count(key)) {
      try {
        if (std::unique_ptr<Orb_Model> taken = added->ReleaseTakenModel())
          m_LoadedCompanions.emplace(key, std::move(taken));
      } catch (...) {
        // Without memory to keep it, the model goes with its companion.
      }
    }
    added.reset();
    // Nothing removes a key during an open, so a replaced companion's slot is
    // still here to take it back.
    auto replaced = journal.replaced.find(key);
    if (replaced != journal.replaced.end()) {
      it->second = std::move(replaced->second);
      ++it;
    } else {
      it = m_Companions.erase(it);
    }
  }
}

std::unique_ptr<Orb_Model> Orb_Model::TakeLoadedCompanion(std::string const &key) {
  auto it = m_LoadedCompanions.find(key);
  if (it == m_LoadedCompanions.end())
    return nullptr;
  std::unique_ptr<Orb_Model> model = std::move(it->second);
  m_LoadedCompanions.erase(it);
  return model;
}

void Orb_Model::Attach(Orb_ModelDerived *context) { m_Contexts.push_back(context); }

void Orb_Model::Detach(Orb_ModelDerived *context) {
  m_Contexts.erase(std::remove(m_Contexts.begin(), m_Contexts.end(), context), m_Contexts.end());
  m_Subscribers.erase(std::remove(m_Subscribers.begin(), m_Subscribers.end(), context),
                      m_Subscribers.end());
}

void Orb_Model::Subscribe(Orb_ModelDerived *context) {
  if (std::find(m_Subscribers.begin(), m_Subscribers.end(), context) == m_Subscribers.end())
    m_Subscribers.push_back(context);
}

std::size_t Orb_Model::GetObjectCount(Orb_Kind kind) const {
  return m_ObjectCount[static_cast<unsigned>(kind)];
}

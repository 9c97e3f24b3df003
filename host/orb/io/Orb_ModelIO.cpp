// Opening a design database into a host model: all or nothing, with the
// rollback of a refused open.

#include "Orb_ModelIO.h"

#include "Orb_Derived.h"
#include "Orb_Exception.h"

#include <string>
#include <unordered_set>

using Orb_IO::QuotePath;

void Orb_Model::Open(char const *path) { Orb_ModelIO::Open(*this, path ? path : ""); }

void Orb_ModelIO::Open(Orb_Model &model, std::string const &path) {
  if (model.m_pOpenJournal)
    throw Orb_Exception(kSource, __LINE__, path.c_str(),
                        ("Cannot open design database " + QuotePath(path) + " into model " +
                         Quote(model.m_Name) + " while another open is under way.")
                            .c_str());
  Section section(model);
  {
    ByteReader in(path);
    Orb_ModelIO io(&in);
    io.ReadHeader();
    io.ReadModel(section);
    if (in.Get() >= 0)
      in.Corrupt("data after the end record");
  }
  // Two companions of one key cannot both be kept, and dropping either loses
  // data: refused before anything is loaded.
  for (auto const &entry : section.companions)
    if (model.GetCompanion(entry.first) || model.m_LoadedCompanions.count(entry.first))
      throw Orb_Exception(kSource, __LINE__, path.c_str(),
                          ("Design database " + QuotePath(path) + " carries companion " +
                           Quote(entry.first) + ", which model " + Quote(model.m_Name) +
                           " already has.")
                              .c_str());

  Orb_Model::OpenJournal journal;
  for (auto const &[key, companion] : model.m_Companions)
    journal.liveBefore.emplace(key, companion.get());
  for (auto const &entry : model.m_LoadedCompanions)
    journal.waitingBefore.insert(entry.first);
  std::vector<std::string> companionKeys;
  for (auto const &entry : section.companions)
    companionKeys.push_back(entry.first);

  std::vector<Orb_DesignMgr *> const loaded = Commit(section);
  model.m_pOpenJournal = &journal;
  try {
    for (auto &[key, companion] : section.companions)
      model.m_LoadedCompanions.emplace(key, std::move(companion));
    Orb_Model::FreeHold hold(model);
    for (Orb_DesignMgr *designMgr : loaded)
      model.AnnounceLoadTree(designMgr);
    // Index loop: a handler may subscribe another context.
    for (std::size_t i = 0; i < model.m_Subscribers.size(); ++i)
      model.m_Subscribers[i]->SyncEventSpecializeModelOnLoad(&model);
  } catch (...) {
    Rollback(model, loaded, companionKeys);
    model.RestoreCompanions(journal);
    model.m_pOpenJournal = nullptr;
    throw;
  }
  model.m_pOpenJournal = nullptr;
}

void Orb_ModelIO::FreeDesignMgrs(Orb_Model &model, Orb_Range<Orb_DesignMgr> designMgrs) {
  for (Orb_DesignMgr *designMgr : designMgrs)
    model.Free(designMgr);
}

std::vector<Orb_DesignMgr *> Orb_ModelIO::Commit(Section &section) {
  std::vector<Orb_DesignMgr *> loaded = section.designMgrs.Items().ToVector();
  // Names were checked against the model's when read. A failure undoes the
  // move: the section still owns them all and frees them.
  std::size_t added = 0;
  try {
    for (; added < loaded.size(); ++added)
      section.model.m_DesignMgrs.AddUnique(loaded[added]);
  } catch (...) {
    for (std::size_t i = 0; i < added; ++i)
      section.model.m_DesignMgrs.Remove(loaded[i]);
    throw;
  }
  section.designMgrs.Clear();
  return loaded;
}

void Orb_ModelIO::Rollback(Orb_Model &model, std::vector<Orb_DesignMgr *> const &loaded,
                           std::vector<std::string> const &companionKeys) {
  // A handler may itself have deleted a loaded design manager; its hold is
  // down, so such a one is gone from the list and from memory.
  std::unordered_set<Orb_DesignMgr *> const live(model.m_DesignMgrs.Items().begin(),
                                                 model.m_DesignMgrs.Items().end());
  for (Orb_DesignMgr *designMgr : loaded) {
    if (!live.count(designMgr))
      continue;
    try {
      model.Delete(designMgr);
    } catch (...) {
      // The handler's exception is the one the caller must see.
    }
  }
  for (std::string const &key : companionKeys)
    model.m_LoadedCompanions.erase(key);
}

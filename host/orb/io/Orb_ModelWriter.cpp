// Saving a host model and its companions as a design database (the format
// is in Orb_ModelIO.h).

#include "Orb_ModelIO.h"

#include "Orb_Exception.h"

#include <algorithm>
#include <string>

using Orb_IO::QuotePath;

void Orb_Model::Save(char const *path) const {
  std::string const target = path ? path : "";
  if (target.empty())
    throw Orb_Exception(
        Orb_ModelIO::kSource, __LINE__, m_Name.c_str(),
        ("Cannot save model " + Orb_ModelIO::Quote(m_Name) + ": no file path given.").c_str());
  if (m_ReadOnly)
    throw Orb_Exception(Orb_ModelIO::kSource, __LINE__, target.c_str(),
                        ("Cannot save design database " + QuotePath(target) + ": model " +
                         Orb_ModelIO::Quote(m_Name) + " is read-only.")
                            .c_str());
  Orb_ModelIO::Save(*this, target);
}

void Orb_ModelIO::Save(Orb_Model const &model, std::string const &path) {
  ByteWriter out(path);
  Orb_ModelIO io(&out);
  out.Raw(kMagic);
  out.Tag('V');
  out.Num(kFormatVersion);
  out.End();
  io.WriteModel(model);
  out.Commit();
}

void Orb_ModelIO::WriteModel(Orb_Model const &model, std::string_view const *companionKey) {
  auto const pins = static_cast<unsigned>(Orb_Kind::Pin);
  auto const signals = static_cast<unsigned>(Orb_Kind::Signal);
  if (m_PinNumber.size() < model.m_Pools[pins].IdLimit())
    m_PinNumber.resize(model.m_Pools[pins].IdLimit());
  if (m_SignalNumber.size() < model.m_Pools[signals].IdLimit())
    m_SignalNumber.resize(model.m_Pools[signals].IdLimit());

  m_pOut->Tag('M');
  m_pOut->Str(model.m_Name);
  m_pOut->Str(model.m_DbName);
  m_pOut->End();
  for (Orb_DesignMgr const *designMgr : model.m_DesignMgrs.Items())
    WriteDesignMgr(designMgr);

  // A companion read by Open that nobody claimed yet is kept as well; a live
  // companion of the same key wins.
  std::map<std::string_view, Orb_Model const *> companions;
  for (auto const &[key, companion] : model.m_Companions)
    if (Orb_Model const *companionModel = companion ? companion->GetModelToSave() : nullptr)
      companions.emplace(key, companionModel);
  for (auto const &[key, companionModel] : model.m_LoadedCompanions)
    companions.emplace(key, companionModel.get());
  // Open reads no companion section inside another: refuse rather than write
  // a database that cannot be opened again.
  if (companionKey && !companions.empty())
    m_pOut->Refuse("companion " + Quote(*companionKey) + " has companion " +
                   Quote(companions.begin()->first) + " of its own, and companions cannot nest");
  for (auto const &[key, companionModel] : companions) {
    m_pOut->Named('K', key);
    WriteModel(*companionModel, &key);
  }
  m_pOut->Tag('Z');
  m_pOut->End();
}

void Orb_ModelIO::WriteDesignMgr(Orb_DesignMgr const *designMgr) {
  m_pOut->Named('D', designMgr->GetNameString());
  WriteProperties(designMgr);
  for (Orb_Design const *design : designMgr->GetDesigns()) {
    m_pOut->Named('G', design->GetNameString());
    WriteProperties(design);
    for (Orb_View const *view : design->GetViews())
      WriteView(view);
    m_pOut->Raw("E\n");
  }
  m_pOut->Raw("E\n");
}

void Orb_ModelIO::WriteView(Orb_View const *view) {
  m_pOut->Named('W', view->GetNameString());
  WriteProperties(view);
  m_ViewPinBase = m_PinCount;
  m_ViewSignalBase = m_SignalCount;
  m_ViewSignals.clear();
  if (view->GetBlock())
    WriteBlock(view->GetBlock());
  for (std::size_t s = 0; s < m_ViewSignals.size(); ++s) {
    auto const pins = m_ViewSignals[s]->GetPins();
    auto const written = [this](Orb_Pin const *pin) {
      return m_PinNumber[pin->GetBridgeId()] > m_ViewPinBase;
    };
    auto const count = std::count_if(pins.begin(), pins.end(), written);
    if (count == 0)
      continue;
    m_pOut->Tag('C');
    m_pOut->Num(s);
    m_pOut->Num(static_cast<std::uint64_t>(count));
    for (Orb_Pin const *pin : pins)
      if (written(pin))
        m_pOut->Num(m_PinNumber[pin->GetBridgeId()] - m_ViewPinBase - 1);
    m_pOut->End();
  }
  for (Orb_Network const *network : view->GetNetworks()) {
    m_pOut->Tag('N');
    m_pOut->Str(network->GetNameString());
    auto const signals = network->GetSignals();
    auto const written = [this](Orb_Signal const *signal) {
      return m_SignalNumber[signal->GetBridgeId()] > m_ViewSignalBase;
    };
    m_pOut->Num(static_cast<std::uint64_t>(std::count_if(signals.begin(), signals.end(), written)));
    for (Orb_Signal const *signal : signals)
      if (written(signal))
        m_pOut->Num(m_SignalNumber[signal->GetBridgeId()] - m_ViewSignalBase - 1);
    m_pOut->End();
    WriteProperties(network);
  }
  m_pOut->Raw("E\n");
}

// Recursive: no block lies deeper than Orb_MaxBlockDepth.
void Orb_ModelIO::WriteBlock(Orb_Block const *block) {
  m_pOut->Named('B', block->GetNameString());
  WriteProperties(block);
  for (Orb_Pin const *pin : block->GetPins()) {
    m_PinNumber[pin->GetBridgeId()] = ++m_PinCount;
    m_pOut->Tag('I');
    m_pOut->Num(pin->GetDirection());
    m_pOut->Str(pin->GetNameString());
    m_pOut->End();
    WriteProperties(pin);
  }
  for (Orb_Signal const *signal : block->GetSignals()) {
    m_SignalNumber[signal->GetBridgeId()] = ++m_SignalCount;
    m_ViewSignals.push_back(signal);
    m_pOut->Named('S', signal->GetNameString());
    WriteProperties(signal);
  }
  for (Orb_Block const *child : block->GetBlocks())
    WriteBlock(child);
  m_pOut->Raw("E\n");
}

void Orb_ModelIO::WriteProperties(Orb_Persistent const *object) {
  for (auto const &property : object->GetProperties()) {
    switch (property->GetKind()) {
    case Orb_Property::STRING:
      m_pOut->Tag('P');
      m_pOut->Str(property->GetName());
      m_pOut->Str(property->GetValue());
      break;
    case Orb_Property::STRING_LIST:
      m_pOut->Tag('L');
      m_pOut->Str(property->GetName());
      m_pOut->Num(property->GetStrings().size());
      for (std::string const &value : property->GetStrings())
        m_pOut->Str(value);
      break;
    case Orb_Property::LIST:
      m_pOut->Tag('Q');
      m_pOut->Str(property->GetName());
      m_pOut->Num(property->GetMembers().size());
      for (auto const &member : property->GetMembers()) {
        m_pOut->Str(member->GetName());
        m_pOut->Str(member->GetValue());
      }
      break;
    }
    m_pOut->End();
  }
}

#pragma once

// Shared helpers of the host's own tests: a client model that records every
// event it receives and every client it destroys, in order.

#include "Orb_Debug.h"
#include "Orb_Templates.h"

#include <cstddef>
#include <functional>
#include <string>
#include <vector>

namespace HostTest {

// What happened, in order. It outlives the model and its clients, because
// the host base destroys the remaining clients after the derived model is
// gone and they still write here.
struct EventLog {
  std::vector<std::string> lines;

  void Add(std::string line) { lines.push_back(std::move(line)); }
  void Clear() { lines.clear(); }
  // All lines joined by "; ", for comparing a whole sequence at once.
  std::string Joined() const {
    std::string text;
    for (std::string const &line : lines)
      text += (text.empty() ? "" : "; ") + line;
    return text;
  }
};

// "kind name", as every log line names its object.
inline std::string Describe(Orb_Persistent const *object) {
  return std::string(Orb_KindName(object->GetKind())) + " " + object->GetName();
}

struct RecTraits;
class RecModel;
template <class Base, class Host> class RecClient;

struct RecTraits {
  using Model = RecModel;
  using DesignMgr = RecClient<Orb_DesignMgrT<RecTraits>, Orb_DesignMgr>;
  using Design = RecClient<Orb_DesignT<RecTraits>, Orb_Design>;
  using View = RecClient<Orb_ViewT<RecTraits>, Orb_View>;
  using Block = RecClient<Orb_BlockT<RecTraits>, Orb_Block>;
  using Pin = RecClient<Orb_PinT<RecTraits>, Orb_Pin>;
  using Signal = RecClient<Orb_SignalT<RecTraits>, Orb_Signal>;
  using Network = RecClient<Orb_NetworkT<RecTraits>, Orb_Network>;
};

using RecDesignMgr = RecTraits::DesignMgr;
using RecDesign = RecTraits::Design;
using RecView = RecTraits::View;
using RecBlock = RecTraits::Block;
using RecPin = RecTraits::Pin;
using RecSignal = RecTraits::Signal;
using RecNetwork = RecTraits::Network;

// Records its specialization and delete events as "create|load|delete kind
// name" and makes a RecClient in each specialization event. Subscribes to
// all events unless told not to.
class RecModel : public Orb_ModelT<RecTraits> {
public:
  explicit RecModel(EventLog *log, bool subscribe = true)
      : Orb_ModelT<RecTraits>("rec", "recdb", "", false), m_pLog(log) {
    if (subscribe)
      SetEventNotifyAll();
  }
  RecModel(EventLog *log, Orb_Model *model, bool subscribe = true)
      : Orb_ModelT<RecTraits>(model), m_pLog(log) {
    if (subscribe)
      SetEventNotifyAll();
  }

  EventLog *GetLog() const { return m_pLog; }

  // Runs in every specialization event before the client is made.
  std::function<void(Orb_Persistent *, bool create)> onSpecialize;
  // Runs inside every client's constructor, after the host base registered
  // it; may throw to test a failing constructor.
  std::function<void(Orb_Persistent *)> inClientConstructor;

#define HOSTTEST_EVENTS(Kind)                                                                      \
  void SyncEventSpecialize##Kind##OnCreate(Orb_##Kind *o) override {                               \
    Make<RecTraits::Kind>(o, true);                                                                \
  }                                                                                                \
  void SyncEventSpecialize##Kind##OnLoad(Orb_##Kind *o) override {                                 \
    Make<RecTraits::Kind>(o, false);                                                               \
  }                                                                                                \
  void SyncEventDelete##Kind(Orb_##Kind *o) override {                                             \
    m_pLog->Add("delete " + Describe(o));                                                          \
    delete GetClient(o);                                                                           \
  }
  HOSTTEST_EVENTS(DesignMgr)
  HOSTTEST_EVENTS(Design)
  HOSTTEST_EVENTS(View)
  HOSTTEST_EVENTS(Block)
  HOSTTEST_EVENTS(Pin)
  HOSTTEST_EVENTS(Signal)
  HOSTTEST_EVENTS(Network)
#undef HOSTTEST_EVENTS

private:
  template <class Client, class Host> void Make(Host *object, bool create) {
    m_pLog->Add((create ? "create " : "load ") + Describe(object));
    if (onSpecialize)
      onSpecialize(object, create);
    new Client(this, object, create);
  }

  EventLog *m_pLog;
};

// A client of any kind. It remembers how it was made and how many properties
// its host object had at that moment, and logs "~kind name" when destroyed;
// reading the name there proves the host object still exists.
template <class Base, class Host> class RecClient : public Base {
public:
  RecClient(RecModel *model, Host *object, bool create)
      : Base(model, object), m_pLog(model->GetLog()), m_Created(create),
        m_PropertiesAtBirth(object->GetProperties().size()) {
    if (model->inClientConstructor)
      model->inClientConstructor(object);
  }
  ~RecClient() override { m_pLog->Add("~" + Describe(this->GetOrbObject())); }

  void DebugDumpCallback(Port::Stream *stream, int indent) const override {
    Orb_Debug::Printf(stream, indent, "rec client (%s)\n", m_Created ? "created" : "loaded");
  }

  bool WasCreated() const { return m_Created; }
  std::size_t GetPropertiesAtBirth() const { return m_PropertiesAtBirth; }

private:
  EventLog *m_pLog;
  bool m_Created;
  std::size_t m_PropertiesAtBirth;
};

// Names of objects in order, blank-separated: one line shows a whole order.
template <class T> std::string Names(std::vector<T *> const &objects) {
  std::string text;
  for (T const *object : objects)
    text += (text.empty() ? "" : " ") + std::string(object->GetName());
  return text;
}

// A property holder's contents as "name=value" items: string lists as
// name[a,b], lists as name{m:v,m:v}.
inline std::string PropertiesOf(Orb_PropertyHolder const &holder) {
  std::string text;
  for (auto const &property : holder.GetProperties()) {
    text += (text.empty() ? "" : " ") + std::string(property->GetName());
    switch (property->GetKind()) {
    case Orb_Property::STRING:
      text += "=" + property->GetValue();
      break;
    case Orb_Property::STRING_LIST: {
      std::string items;
      for (std::string const &value : property->GetStrings())
        items += (items.empty() ? "" : ",") + value;
      text += "[" + items + "]";
      break;
    }
    case Orb_Property::LIST: {
      std::string items;
      for (auto const &member : property->GetMembers())
        items +=
            (items.empty() ? "" : ",") + std::string(member->GetName()) + ":" + member->GetValue();
      text += "{" + items + "}";
      break;
    }
    }
  }
  return text;
}

} // namespace HostTest

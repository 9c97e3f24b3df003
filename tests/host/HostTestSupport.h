#pragma once

// Shared helpers of the host's own tests: a client model that records every
// event it receives and every client it destroys, a dump of host objects,
// file helpers and exception capture.

#include "Orb_Debug.h"
#include "Orb_Exception.h"
#include "Orb_Templates.h"

#include <gtest/gtest.h>

#include <cstddef>
#include <cstdio>
#include <fstream>
#include <functional>
#include <iterator>
#include <memory>
#include <stdexcept>
#include <string>
#include <unistd.h>
#include <vector>

namespace HostTest {

// What happened, in order. It outlives the model and its clients: the host
// base destroys the remaining clients after the derived model is gone.
using EventLog = std::vector<std::string>;

// The items joined by `separator`, for comparing a whole sequence at once.
inline std::string Joined(std::vector<std::string> const &items, char const *separator = "; ") {
  std::string text;
  for (std::string const &item : items)
    text += (text.empty() ? "" : separator) + item;
  return text;
}

inline std::string Describe(Orb_Persistent const *object) {
  return std::string(Orb_KindName(object->GetKind())) + " " + object->GetName();
}

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

// Logs "create|load|delete kind name" (with " +properties" when the object
// already has some) and "load model name", makes a RecClient in each
// specialization event and runs the hooks. Subscribes to all events unless
// told not to.
class RecModel : public Orb_ModelT<RecTraits> {
public:
  explicit RecModel(EventLog *eventLog)
      : Orb_ModelT<RecTraits>("rec", "recdb", "", false), log(eventLog) {
    SetEventNotifyAll();
  }
  RecModel(EventLog *eventLog, Orb_Model *model, bool subscribe = true)
      : Orb_ModelT<RecTraits>(model), log(eventLog) {
    if (subscribe)
      SetEventNotifyAll();
  }

  EventLog *log;
  // The client of an object of this name, or the load event of a model of
  // this name, throws.
  std::string refuse;
  // Run after an object's load event made its client, and after its delete
  // event destroyed it.
  std::function<void(Orb_Persistent *)> onLoad, onDelete;
  void ThrowIfRefused(std::string const &name) const {
    if (name == refuse)
      throw std::runtime_error("refused " + name);
  }

  void SyncEventSpecializeModelOnLoad(Orb_Model *model) override {
    log->push_back(std::string("load model ") + model->GetName());
    ThrowIfRefused(model->GetName());
  }
#define HOSTTEST_EVENTS(Kind)                                                                      \
  void SyncEventSpecialize##Kind##OnCreate(Orb_##Kind *o) override {                               \
    Make<RecTraits::Kind>(o, true);                                                                \
  }                                                                                                \
  void SyncEventSpecialize##Kind##OnLoad(Orb_##Kind *o) override {                                 \
    Make<RecTraits::Kind>(o, false);                                                               \
  }                                                                                                \
  void SyncEventDelete##Kind(Orb_##Kind *o) override {                                             \
    log->push_back("delete " + Describe(o));                                                       \
    delete GetClient(o);                                                                           \
    if (onDelete)                                                                                  \
      onDelete(o);                                                                                 \
  }
#define ORB_KIND(Kind, shown) HOSTTEST_EVENTS(Kind)
#include "Orb_Kinds.def"
#undef HOSTTEST_EVENTS

private:
  // A template, so that the client classes are complete when it is made.
  template <class Client, class Host> void Make(Host *object, bool create) {
    log->push_back((create ? "create " : "load ") + Describe(object) +
                   (object->GetProperties().empty() ? "" : " +properties"));
    new Client(this, object, create);
    if (!create && onLoad)
      onLoad(object);
  }
};

// A client of any kind. It logs "~kind name" when destroyed; reading the
// name there proves the host object still exists.
template <class Base, class Host> class RecClient : public Base {
public:
  RecClient(RecModel *model, Host *object, bool create)
      : Base(model, object), m_pLog(model->log), m_Created(create) {
    // Thrown after the host base registered the client, which must undo that.
    model->ThrowIfRefused(std::string(object->GetNameString()));
  }
  ~RecClient() override { m_pLog->push_back("~" + Describe(this->GetOrbObject())); }

  void DebugDumpCallback(Port::Stream *stream, int indent) const override {
    Orb_Debug::Printf(stream, indent, "rec client (%s)\n", m_Created ? "created" : "loaded");
  }

private:
  EventLog *m_pLog;
  bool m_Created;
};

// Holds a model to save with its owner's; sets *freed when the owner destroys it.
struct TestCompanion : Orb_ModelCompanion {
  explicit TestCompanion(std::unique_ptr<Orb_Model> held, bool *flag = nullptr)
      : model(std::move(held)), freed(flag) {}
  ~TestCompanion() override {
    if (freed)
      *freed = true;
  }
  Orb_Model const *GetModelToSave() const override { return model.get(); }
  std::unique_ptr<Orb_Model> model;
  bool *freed;
};

// Host objects of every kind in the model, reachable or not.
inline std::size_t ObjectCount(Orb_Model const &model) {
  std::size_t count = 0;
  for (unsigned k = 0; k < Orb_KindCount; ++k)
    count += model.GetObjectCount(static_cast<Orb_Kind>(k));
  return count;
}

// Names of objects in order, blank-separated (a vector or a host range).
template <class Objects> std::string Names(Objects const &objects) {
  std::string text;
  for (auto const *object : objects)
    text += (text.empty() ? "" : " ") + std::string(object->GetNameString());
  return text;
}

// Properties as "name=value", string lists as name[a,b], lists as
// name{m:v,m:v}.
inline std::string PropertiesOf(Orb_PropertyHolder const &holder) {
  std::vector<std::string> properties;
  for (auto const &property : holder.GetProperties()) {
    std::vector<std::string> items = property->GetStrings();
    for (auto const &member : property->GetMembers())
      items.push_back(std::string(member->GetName()) + ":" + std::string(member->GetValue()));
    // By kind: STRING, STRING_LIST, LIST.
    char const *const opening[] = {"=", "[", "{"}, *const closing[] = {"", "]", "}"};
    properties.push_back(std::string(property->GetName()) + opening[property->GetKind()] +
                         std::string(property->GetValue()) + Joined(items, ",") +
                         closing[property->GetKind()]);
  }
  return Joined(properties, " ");
}

inline std::string PropertiesOf(Orb_Persistent const &object) {
  Orb_PropertyHolder const *holder = object.Properties();
  return holder ? PropertiesOf(*holder) : std::string();
}

// Path of a pin, signal or block through its blocks, as "top/u1/i".
inline std::string PathIn(Orb_Persistent const *object) {
  Orb_Persistent const *parent = object->GetParentObject();
  return parent && parent->GetKind() == Orb_Kind::Block ? PathIn(parent) + "/" + object->GetName()
                                                        : object->GetName();
}

// An object and everything below it, one line per object with its
// properties, direction and connections (a pin's outer signal after "->",
// its inner one after "=>"), children indented.
inline std::string Dump(Orb_Persistent const *object, std::size_t depth = 0) {
  std::string out = std::string(depth, ' ') + Describe(object);
  std::string const properties = PropertiesOf(*object);
  out += properties.empty() ? "" : " <" + properties + ">";
  std::vector<Orb_Persistent const *> children;
  auto add = [&children](auto const &items) {
    children.insert(children.end(), items.begin(), items.end());
  };
  if (auto const *designMgr = Orb_Cast<Orb_DesignMgr>(object))
    add(designMgr->GetDesigns());
  if (auto const *design = Orb_Cast<Orb_Design>(object))
    add(design->GetViews());
  if (auto const *view = Orb_Cast<Orb_View>(object)) {
    if (view->GetBlock())
      children.push_back(view->GetBlock());
    add(view->GetNetworks());
  }
  if (auto const *block = Orb_Cast<Orb_Block>(object)) {
    add(block->GetPins());
    add(block->GetSignals());
    add(block->GetBlocks());
  }
  if (auto const *pin = Orb_Cast<Orb_Pin>(object))
    out += std::string(" ") + Orb_PinDirectionName(pin->GetDirection()) +
           (pin->GetSignal() ? " -> " + PathIn(pin->GetSignal()) : "") +
           (pin->GetInnerSignal() ? " => " + PathIn(pin->GetInnerSignal()) : "");
  if (auto const *signal = Orb_Cast<Orb_Signal>(object))
    for (Orb_Pin const *pin : signal->GetPins())
      out += " <- " + PathIn(pin);
  if (auto const *network = Orb_Cast<Orb_Network>(object))
    for (Orb_Signal const *signal : network->GetSignals())
      out += " " + PathIn(signal);
  out += "\n";
  for (Orb_Persistent const *child : children)
    out += Dump(child, depth + 1);
  return out;
}

inline std::string Dump(Orb_Model const &model) {
  std::string out;
  for (Orb_DesignMgr const *designMgr : model.GetDesignMgrs())
    out += Dump(designMgr);
  return out;
}

inline std::string ReadBytes(std::string const &path) {
  std::ifstream in(path, std::ios::binary);
  return std::string(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
}

// The model saved to a file of this process and opened into a fresh model.
inline std::unique_ptr<Orb_Model> Reopened(Orb_Model const &model) {
  std::string const path = ::testing::TempDir() + "HostTest." + std::to_string(::getpid()) + ".db";
  model.Save(path.c_str());
  auto reopened = std::make_unique<Orb_Model>("reopened", "db", "", false);
  reopened->Open(path.c_str());
  std::remove(path.c_str());
  return reopened;
}

// The bytes of the model saved to a file of this process.
inline std::string SavedBytes(Orb_Model const &model) {
  std::string const path = ::testing::TempDir() + "HostTest." + std::to_string(::getpid()) + ".sav";
  model.Save(path.c_str());
  std::string bytes = ReadBytes(path);
  std::remove(path.c_str());
  return bytes;
}

// The top block of view dm/d/v.
inline Orb_Block *TopBlockOf(Orb_Model const &model, char const *dm, char const *d, char const *v) {
  return model.GetDesignMgrByName(dm)->GetDesignByName(d)->GetViewByName(v)->GetBlock();
}

// The object name and message of the E that `action` throws; a test failure
// when it throws nothing.
struct Thrown {
  std::string object, message;
};
template <class E = Orb_Exception, class Action> Thrown ThrownBy(Action &&action) {
  try {
    action();
  } catch (E const &e) {
    return {e.GetObjectName(), e.GetMessage()};
  }
  ADD_FAILURE() << "nothing thrown";
  return {};
}

} // namespace HostTest

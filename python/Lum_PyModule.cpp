// The Python module lumtdm (its compiled part, lumtdm._lumtdm): databases,
// the design hierarchy, types and typed queries, edits, dumps and the memory
// report, each object reached through a handle that raises StaleObjectError
// once its object is gone; the real formats are in Lum_PyFormats.cpp.

#include "Lum_PyDatabase.h"
#include "Lum_PyFormats.h"

#include "Lum_TdmBlock.h"
#include "Lum_TdmDesign.h"
#include "Lum_TdmDesignMgr.h"
#include "Lum_TdmNetwork.h"
#include "Lum_TdmPin.h"
#include "Lum_TdmSignal.h"
#include "Lum_TdmTypePinMap.h"
#include "Lum_TdmVerifier.h"
#include "Lum_TdmView.h"

#include "Lum_Exception.h"
#include "Lum_ExceptionInvalidFormat.h"
#include "Lum_Tlm.h"
#include "Lum_TlmTypeID.h"
#include "Orb_Debug.h"
#include "Orb_Exception.h"
#include "Port_MsgManData.h"
#include "Port_Stream.h"

#include <pybind11/pybind11.h>
#include <pybind11/stl.h>

#include <cstring>
#include <optional>
#include <unordered_map>

namespace py = pybind11;

namespace lumpy {

// Text as the library keeps it: bytes, shown to Python as str. Bytes that
// are not UTF-8 come and go as surrogate escapes, so that every name and
// value survives a round trip through Python.
struct Text {
  std::string value;
};

py::object ToPy(std::string_view text) {
  PyObject *object =
      PyUnicode_DecodeUTF8(text.data(), static_cast<Py_ssize_t>(text.size()), "surrogateescape");
  if (!object)
    throw py::error_already_set();
  return py::reinterpret_steal<py::object>(object);
}

} // namespace lumpy

namespace pybind11 {
namespace detail {
template <> struct type_caster<lumpy::Text> {
  PYBIND11_TYPE_CASTER(lumpy::Text, const_name("str"));
  bool load(handle source, bool /*convert*/) {
    if (!PyUnicode_Check(source.ptr()))
      return false;
    PyObject *bytes = PyUnicode_AsEncodedString(source.ptr(), "utf-8", "surrogateescape");
    if (!bytes) {
      PyErr_Clear();
      return false;
    }
    value.value.assign(PyBytes_AS_STRING(bytes), static_cast<std::size_t>(PyBytes_GET_SIZE(bytes)));
    Py_DECREF(bytes);
    return true;
  }
  static handle cast(lumpy::Text const &text, return_value_policy /*policy*/, handle /*parent*/) {
    return lumpy::ToPy(text.value).release();
  }
};
} // namespace detail
} // namespace pybind11

namespace lumpy {
namespace {

// ---------------------------------------------------------------------------
// Errors

// The exception classes, owned by the module.
PyObject *g_Error = nullptr;
PyObject *g_OrbError = nullptr;
PyObject *g_LumError = nullptr;
PyObject *g_CorruptDatabaseError = nullptr;
PyObject *g_DesignLoadError = nullptr;
PyObject *g_InvalidLibraryError = nullptr;
PyObject *g_InvalidTypeBlockError = nullptr;
PyObject *g_InvalidFormatError = nullptr;
PyObject *g_StaleObjectError = nullptr;

PyObject *MakeError(py::module_ &m, char const *name, PyObject *base, char const *doc) {
  std::string const full = std::string("lumtdm.") + name;
  PyObject *type = PyErr_NewExceptionWithDoc(full.c_str(), doc, base, nullptr);
  if (!type)
    throw py::error_already_set();
  m.add_object(name, py::handle(type));
  return type;
}

void Raise(PyObject *type, std::string const &text, std::string const &objectName,
           std::string const &message, std::string const &location) {
  py::object error = py::reinterpret_borrow<py::object>(type)(ToPy(text));
  error.attr("object_name") = ToPy(objectName);
  error.attr("message") = ToPy(message);
  error.attr("location") = ToPy(location);
  PyErr_SetObject(type, error.ptr());
}

void Raise(PyObject *type, Port::Exception const &e) {
  std::string text = e.GetMessage();
  while (!text.empty() && (text.back() == '\n' || text.back() == ' '))
    text.pop_back();
  std::string const message = text;
  if (!e.GetObjectName().empty())
    text = Port::Exception::ShownName(e.GetObjectName()) + ": " + text;
  Raise(type, text, e.GetObjectName(), message, e.what());
}

// The signature is pybind11's translator type.
void Translate(std::exception_ptr pointer) { // NOLINT(performance-unnecessary-value-param)
  try {
    if (pointer)
      std::rethrow_exception(pointer);
  } catch (StaleError const &e) {
    Raise(g_StaleObjectError, e.what(), "", e.what(), "");
  } catch (Lum_ExceptionInvalidFormat const &e) {
    Raise(g_InvalidFormatError, e);
  } catch (Lum_ExceptionCorruptDatabase const &e) {
    Raise(g_CorruptDatabaseError, e);
  } catch (Lum_ExceptionDesignLoad const &e) {
    Raise(g_DesignLoadError, e);
  } catch (Lum_ExceptionInvalidLibrary const &e) {
    Raise(g_InvalidLibraryError, e);
  } catch (Lum_ExceptionInvalidTypeBlock const &e) {
    Raise(g_InvalidTypeBlockError, e);
  } catch (Lum_Exception const &e) {
    Raise(g_LumError, e);
  } catch (Orb_Exception const &e) {
    Raise(g_OrbError, e);
  } catch (Port::Exception const &e) {
    Raise(g_Error, e);
  } catch (std::bad_alloc const &) {
    PyErr_SetString(PyExc_MemoryError, "out of memory");
  }
}

// Names are C strings to the library: a NUL would cut them short silently.
char const *CName(Text const &text) {
  if (text.value.find('\0') != std::string::npos)
    throw py::value_error("a name must not contain a NUL character");
  return text.value.c_str();
}

// Every call into the library holds the library lock; Locked wraps a plain
// function so that the lock is taken around it.
template <class R, class... A> auto Locked(R (*function)(A...)) {
  return [function](A... args) -> R {
    LibraryLock const lock;
    return function(std::forward<A>(args)...);
  };
}

// ---------------------------------------------------------------------------
// Handles and clients

using DesignMgrRef = Ref<Orb_DesignMgr>;
using DesignRef = Ref<Orb_Design>;
using ViewRef = Ref<Orb_View>;
using BlockRef = Ref<Orb_Block>;
using PinRef = Ref<Orb_Pin>;
using SignalRef = Ref<Orb_Signal>;
using NetworkRef = Ref<Orb_Network>;

py::object Wrap(DatabasePtr const &db, Orb_Persistent *object) {
  if (!object)
    return py::none();
  switch (object->GetKind()) {
  case Orb_Kind::DesignMgr:
    return py::cast(DesignMgrRef(db, object));
  case Orb_Kind::Design:
    return py::cast(DesignRef(db, object));
  case Orb_Kind::View:
    return py::cast(ViewRef(db, object));
  case Orb_Kind::Block:
    return py::cast(BlockRef(db, object));
  case Orb_Kind::Pin:
    return py::cast(PinRef(db, object));
  case Orb_Kind::Signal:
    return py::cast(SignalRef(db, object));
  case Orb_Kind::Network:
    return py::cast(NetworkRef(db, object));
  }
  return py::none();
}

// The client object of a host object, specialized when it has none (which
// may bind a block and so throw).
template <class Client, class T> Client *ClientOf(Ref<T> const &ref) {
  auto *client = static_cast<Client *>(ref.db->Model().Specialize(ref.Get()));
  if (!client)
    throw StaleError(ref.Describe() + " has no client object");
  return client;
}

Lum_TdmBlock *BlockClient(BlockRef const &ref) { return ClientOf<Lum_TdmBlock>(ref); }

std::shared_ptr<Handle> ViewHold(DatabasePtr const &db, Orb_View *view) {
  return std::make_shared<Handle>(db, view);
}

TypeLibraryRef LibraryOf(LibraryHold const &hold, Lum_TlmLibrary const *library) {
  return TypeLibraryRef{hold, library};
}

py::object TypeBlockOf(LibraryHold const &hold, Lum_TlmBlock const *block) {
  if (!block)
    return py::none();
  return py::cast(TypeBlockRef{hold, block});
}

py::object TypePinOf(LibraryHold const &hold, Lum_TlmPin const *pin) {
  if (!pin)
    return py::none();
  return py::cast(TypePinRef{hold, pin});
}

LibraryHold HoldOfBlock(BlockRef const &ref) {
  return LibraryHold{ViewHold(ref.db, ref.Get()->GetView()), nullptr};
}

// A type given as a TypeBlock, as "LIBRARY:TYPEBLOCK" or as None (untyped).
Lum_TlmBlockTypeID TypeIdOf(py::handle type) {
  if (type.is_none())
    return Lum_TlmBlockTypeID();
  if (py::isinstance<TypeBlockRef>(type)) {
    Lum_TlmBlock const *block = type.cast<TypeBlockRef const &>().Get();
    return Lum_TlmBlockTypeID(block->GetLibrary()->GetLibraryName(), block->GetName());
  }
  if (!PyUnicode_Check(type.ptr()))
    throw py::type_error("a type is a TypeBlock, 'LIBRARY:TYPEBLOCK' or None");
  std::string const tag = type.cast<Text>().value;
  std::size_t const colon = tag.find(':');
  if (colon == std::string::npos)
    throw py::value_error("a type is a TypeBlock, 'LIBRARY:TYPEBLOCK' or None, not '" + tag + "'");
  return Lum_TlmBlockTypeID(tag.substr(0, colon).c_str(), tag.substr(colon + 1).c_str());
}

Lum_TlmBlock const *TypeBlockArg(py::handle type) {
  return type.is_none() ? nullptr : type.cast<TypeBlockRef const &>().Get();
}

// The debug dump of a client object, as text.
template <class Client> std::string DumpOf(Client const *client) {
  Port::StringStream out;
  Port::Stream *previous = Orb_Debug::SetOutput(&out);
  try {
    client->Dbg();
  } catch (...) {
    Orb_Debug::SetOutput(previous);
    throw;
  }
  Orb_Debug::SetOutput(previous);
  return out.GetText();
}

std::string Dump(Handle const &ref) {
  Orb_Persistent *object = ref.Check();
  Orb_Context &model = ref.db->Model();
  switch (ref.kind) {
  case Orb_Kind::DesignMgr:
    return DumpOf(
        static_cast<Lum_TdmDesignMgr *>(model.Specialize(static_cast<Orb_DesignMgr *>(object))));
  case Orb_Kind::Design:
    return DumpOf(
        static_cast<Lum_TdmDesign *>(model.Specialize(static_cast<Orb_Design *>(object))));
  case Orb_Kind::View:
    return DumpOf(static_cast<Lum_TdmView *>(model.Specialize(static_cast<Orb_View *>(object))));
  case Orb_Kind::Block:
    return DumpOf(static_cast<Lum_TdmBlock *>(model.Specialize(static_cast<Orb_Block *>(object))));
  case Orb_Kind::Pin:
    return DumpOf(static_cast<Lum_TdmPin *>(model.Specialize(static_cast<Orb_Pin *>(object))));
  case Orb_Kind::Signal:
    return DumpOf(
        static_cast<Lum_TdmSignal *>(model.Specialize(static_cast<Orb_Signal *>(object))));
  case Orb_Kind::Network:
    return DumpOf(
        static_cast<Lum_TdmNetwork *>(model.Specialize(static_cast<Orb_Network *>(object))));
  }
  return std::string();
}

void Delete(Handle const &ref) {
  Orb_Persistent *object = ref.Check();
  switch (ref.kind) {
  case Orb_Kind::DesignMgr:
    ref.db->Model().GetOrbModel()->DeleteDesignMgr(static_cast<Orb_DesignMgr *>(object));
    break;
  case Orb_Kind::Design:
    static_cast<Orb_Design *>(object)->GetParent()->DeleteDesign(static_cast<Orb_Design *>(object));
    break;
  case Orb_Kind::View:
    static_cast<Orb_View *>(object)->GetParent()->DeleteView(static_cast<Orb_View *>(object));
    break;
  case Orb_Kind::Block: {
    auto *block = static_cast<Orb_Block *>(object);
    if (Orb_Block *parent = block->GetParent())
      parent->DeleteBlock(block);
    else
      block->GetView()->DeleteTopBlock();
    break;
  }
  case Orb_Kind::Pin:
    static_cast<Orb_Pin *>(object)->GetParent()->DeletePin(static_cast<Orb_Pin *>(object));
    break;
  case Orb_Kind::Signal:
    static_cast<Orb_Signal *>(object)->GetParent()->DeleteSignal(static_cast<Orb_Signal *>(object));
    break;
  case Orb_Kind::Network:
    static_cast<Orb_Network *>(object)->GetParent()->DeleteNetwork(
        static_cast<Orb_Network *>(object));
    break;
  }
}

// ---------------------------------------------------------------------------
// Properties

py::object PropertyValue(Orb_Property const *property) {
  switch (property->GetKind()) {
  case Orb_Property::STRING:
    return ToPy(property->GetValue());
  case Orb_Property::STRING_LIST: {
    py::list values;
    for (std::string const &value : property->GetStrings())
      values.append(ToPy(value));
    return std::move(values);
  }
  case Orb_Property::LIST: {
    py::list members;
    for (auto const &member : property->GetMembers())
      members.append(py::make_tuple(ToPy(member->GetName()), ToPy(member->GetValue())));
    return std::move(members);
  }
  }
  return py::none();
}

py::list PropertyNames(Handle const &ref) {
  py::list names;
  for (Orb_Property const *property : ref.Check()->GetProperties())
    names.append(ToPy(property->GetName()));
  return names;
}

py::object GetProperty(Handle const &ref, Text const &name) {
  Orb_Property const *property = ref.Check()->GetPropertyByName(CName(name));
  if (!property)
    throw py::key_error(name.value);
  return PropertyValue(property);
}

void SetProperty(Handle const &ref, Text const &name, py::handle value) {
  Orb_Persistent *object = ref.Check();
  char const *key = CName(name);
  if (PyUnicode_Check(value.ptr())) {
    std::string const text = value.cast<Text>().value;
    // Created with a placeholder, then given every byte (NULs included).
    object->CreatePropertyString(key, "")->SetStringValue(text);
    return;
  }
  if (py::isinstance<py::list>(value) || py::isinstance<py::tuple>(value)) {
    std::vector<std::string> strings;
    for (py::handle item : value) {
      if (!PyUnicode_Check(item.ptr()))
        throw py::type_error("a string list property takes only str items");
      strings.push_back(item.cast<Text>().value);
    }
    Orb_Property *list = object->CreatePropertyStringList(key);
    for (std::string &item : strings)
      list->AppendString(std::move(item));
    return;
  }
  throw py::type_error("a property value is a str or a list of str");
}

void DeleteProperty(Handle const &ref, Text const &name) {
  Orb_Persistent *object = ref.Check();
  if (!object->GetPropertyByName(CName(name)))
    throw py::key_error(name.value);
  object->DeleteProperty(CName(name));
}

// ---------------------------------------------------------------------------
// Lists of children

enum class ListKind {
  DesignMgrs,
  Designs,
  Views,
  Networks,
  Blocks,
  Pins,
  Signals,
  SignalPins,
  NetworkSignals
};

// The children of one kind of an object (or the design managers of a
// database), read afresh at each access.
struct ListRef {
  Handle owner; // its object is null for the database's design managers
  ListKind kind;
};

template <class F> auto WithRange(ListRef const &list, F const &f) {
  if (!list.owner.object) {
    return f(list.owner.db->Model().GetOrbModel()->GetDesignMgrs());
  }
  Orb_Persistent *object = list.owner.Check();
  switch (list.kind) {
  case ListKind::Designs:
    return f(static_cast<Orb_DesignMgr *>(object)->GetDesigns());
  case ListKind::Views:
    return f(static_cast<Orb_Design *>(object)->GetViews());
  case ListKind::Networks:
    return f(static_cast<Orb_View *>(object)->GetNetworks());
  case ListKind::Blocks:
    return f(static_cast<Orb_Block *>(object)->GetBlocks());
  case ListKind::Pins:
    return f(static_cast<Orb_Block *>(object)->GetPins());
  case ListKind::Signals:
    return f(static_cast<Orb_Block *>(object)->GetSignals());
  case ListKind::SignalPins:
    return f(static_cast<Orb_Signal *>(object)->GetPins());
  case ListKind::NetworkSignals:
    return f(static_cast<Orb_Network *>(object)->GetSignals());
  case ListKind::DesignMgrs:
    break;
  }
  return f(list.owner.db->Model().GetOrbModel()->GetDesignMgrs());
}

std::size_t ListSize(ListRef const &list) {
  return WithRange(list, [](auto const &range) { return range.size(); });
}

Orb_Persistent *ListAt(ListRef const &list, std::size_t index) {
  return WithRange(list, [index](auto const &range) -> Orb_Persistent * {
    return index < range.size() ? range[index] : nullptr;
  });
}

Orb_Persistent *ListFind(ListRef const &list, std::string const &name) {
  return WithRange(list, [&name](auto const &range) -> Orb_Persistent * {
    for (Orb_Persistent *item : range)
      if (item->GetNameString() == name)
        return item;
    return nullptr;
  });
}

// Lookup by name through the host's indexes where there is one.
Orb_Persistent *ListFindIndexed(ListRef const &list, Text const &name) {
  char const *key = CName(name);
  if (!list.owner.object)
    return list.owner.db->Model().GetOrbModel()->GetDesignMgrByName(key);
  Orb_Persistent *object = list.owner.Check();
  switch (list.kind) {
  case ListKind::Designs:
    return static_cast<Orb_DesignMgr *>(object)->GetDesignByName(key);
  case ListKind::Views:
    return static_cast<Orb_Design *>(object)->GetViewByName(key);
  case ListKind::Networks:
    return static_cast<Orb_View *>(object)->GetNetworkByName(key);
  case ListKind::Blocks:
    return static_cast<Orb_Block *>(object)->GetBlockByName(key);
  case ListKind::Pins:
    return static_cast<Orb_Block *>(object)->GetPinByName(key);
  case ListKind::Signals:
    return static_cast<Orb_Block *>(object)->GetSignalByName(key);
  default:
    return ListFind(list, name.value);
  }
}

ListRef ListOf(Handle const &owner, ListKind kind) {
  owner.Check();
  return ListRef{owner, kind};
}

struct ListIterator {
  ListRef list;
  std::size_t index = 0;
};

py::object ListIteratorNext(ListIterator &it) {
  // A database closed meanwhile ends the iteration.
  if (!it.list.owner.db->IsOpen())
    throw py::stop_iteration();
  Orb_Persistent *item = ListAt(it.list, it.index);
  if (!item)
    throw py::stop_iteration();
  ++it.index;
  return Wrap(it.list.owner.db, item);
}

py::object ListGetItem(ListRef const &list, py::handle key) {
  if (PyUnicode_Check(key.ptr())) {
    Text const name = key.cast<Text>();
    if (Orb_Persistent *item = ListFindIndexed(list, name))
      return Wrap(list.owner.db, item);
    throw py::key_error(name.value);
  }
  if (!PyLong_Check(key.ptr()))
    throw py::type_error("an object list takes an int index or a str name");
  auto index = key.cast<Py_ssize_t>();
  auto const size = static_cast<Py_ssize_t>(ListSize(list));
  if (index < 0)
    index += size;
  if (index < 0 || index >= size)
    throw py::index_error("list index out of range");
  return Wrap(list.owner.db, ListAt(list, static_cast<std::size_t>(index)));
}

bool ListContains(ListRef const &list, py::handle key) {
  if (PyUnicode_Check(key.ptr()))
    return ListFindIndexed(list, key.cast<Text>()) != nullptr;
  if (!py::isinstance<Handle>(key))
    return false;
  auto const &handle = key.cast<Handle const &>();
  if (handle.db != list.owner.db || !handle.IsLive())
    return false;
  return WithRange(list, [&handle](auto const &range) {
    for (Orb_Persistent *item : range)
      if (item == handle.object)
        return true;
    return false;
  });
}

// ---------------------------------------------------------------------------
// Walking every block of a view or of a subtree in pre-order

struct BlockWalk {
  // A block of the path down to the current one: its slot and deletion count
  // tell whether it still exists, without a handle's name and reference.
  struct Frame {
    Orb_Block *block;
    std::uint32_t id;
    std::uint32_t generation;
    std::size_t next;
  };
  DatabasePtr db;
  Orb_Block *root = nullptr;
  Handle rootHandle;
  std::vector<Frame> stack;
  bool started = false;
};

py::object BlockWalkNext(BlockWalk &walk) {
  if (!walk.db->IsOpen())
    throw py::stop_iteration();
  if (!walk.started) {
    walk.started = true;
    if (!walk.root)
      throw py::stop_iteration();
    walk.rootHandle.Check();
    walk.stack.push_back({walk.root, walk.rootHandle.id, walk.rootHandle.generation, 0});
    return py::cast(BlockRef(walk.rootHandle));
  }
  while (!walk.stack.empty()) {
    BlockWalk::Frame &frame = walk.stack.back();
    // A block deleted during the walk ends it with StaleObjectError.
    if (walk.db->Generation(Orb_Kind::Block, frame.id) != frame.generation)
      throw StaleError("the block walk is stale: a block it was in was deleted");
    auto const children = frame.block->GetBlocks();
    if (frame.next < children.size()) {
      Orb_Block *child = children[frame.next++];
      BlockRef ref(walk.db, child);
      walk.stack.push_back({child, ref.id, ref.generation, 0});
      return py::cast(std::move(ref));
    }
    walk.stack.pop_back();
  }
  throw py::stop_iteration();
}

BlockWalk WalkFrom(DatabasePtr const &db, Orb_Block *root) {
  BlockWalk walk;
  walk.db = db;
  walk.root = root;
  if (root)
    walk.rootHandle = Handle(db, root);
  return walk;
}

// ---------------------------------------------------------------------------
// Database-wide operations

void ForEachView(Database &db, void (*f)(Lum_TdmView *)) {
  TrackingModel &model = db.Model();
  for (Orb_DesignMgr *designMgr : model.GetOrbModel()->GetDesignMgrs().ToVector())
    for (Orb_Design *design : designMgr->GetDesigns().ToVector())
      for (Orb_View *view : design->GetViews().ToVector())
        f(static_cast<Lum_TdmView *>(model.Specialize(view)));
}

void CommitAll(Database &db) {
  db.Model();
  py::gil_scoped_release release;
  ForEachView(db, [](Lum_TdmView *view) { view->CommitAll(); });
}

void AddSearchDirectories(std::vector<std::string> const &directories) {
  for (std::string const &directory : directories) {
    std::string const path = ":" + Lum_TlmCatalog::GetSearchPath() + ":";
    if (path.find(":" + directory + ":") == std::string::npos)
      Lum_TlmCatalog::AddSearchDirectory(directory.c_str());
  }
}

DatabasePtr OpenDatabase(Text const &path, std::vector<std::string> const &libPath) {
  AddSearchDirectories(libPath);
  return std::make_shared<Database>(path.value, false);
}

DatabasePtr CreateDatabase(std::optional<Text> const &path,
                           std::vector<std::string> const &libPath) {
  AddSearchDirectories(libPath);
  return std::make_shared<Database>(path ? path->value : std::string(), true);
}

void SaveDatabase(DatabasePtr const &db, std::optional<Text> const &path, bool commit) {
  std::string const target = path ? path->value : db->GetPath();
  if (target.empty())
    throw py::value_error("the database has no path: give save() one");
  if (commit)
    CommitAll(*db);
  TrackingModel &model = db->Model();
  py::gil_scoped_release release;
  model.Save(target.c_str());
}

void CloseDatabase(DatabasePtr const &db) {
  py::gil_scoped_release release;
  db->Close();
}

py::object Lookup(DatabasePtr const &db, Text const &text) {
  std::string const &path = text.value;
  std::vector<std::string> parts;
  std::size_t start = 0;
  for (;;) {
    std::size_t const slash = path.find('/', start);
    parts.push_back(path.substr(start, slash - start));
    if (slash == std::string::npos)
      break;
    start = slash + 1;
  }
  auto const fail = [&path]() { return py::key_error("no object at path '" + path + "'"); };
  Orb_DesignMgr *designMgr = db->Model().GetOrbModel()->GetDesignMgrByName(parts[0].c_str());
  if (!designMgr)
    throw fail();
  if (parts.size() == 1)
    return Wrap(db, designMgr);
  Orb_Design *design = designMgr->GetDesignByName(parts[1].c_str());
  if (!design)
    throw fail();
  if (parts.size() == 2)
    return Wrap(db, design);
  Orb_View *view = design->GetViewByName(parts[2].c_str());
  if (parts.size() == 3) {
    if (view)
      return Wrap(db, view);
    // "view:network"
    for (std::size_t colon = parts[2].find(':'); colon != std::string::npos;
         colon = parts[2].find(':', colon + 1)) {
      Orb_View *owner = design->GetViewByName(parts[2].substr(0, colon).c_str());
      if (Orb_Network *network =
              owner ? owner->GetNetworkByName(parts[2].substr(colon + 1).c_str()) : nullptr)
        return Wrap(db, network);
    }
    throw fail();
  }
  if (!view)
    throw fail();
  // Blocks from the top block down; the last part may name a pin
  // ("block.pin") or a signal ("block:signal") instead.
  Orb_Block *block = nullptr;
  auto const child = [&view, &block](std::string const &name) -> Orb_Block * {
    if (!block) {
      Orb_Block *top = view->GetBlock();
      return top && top->GetNameString() == name ? top : nullptr;
    }
    return block->GetBlockByName(name.c_str());
  };
  for (std::size_t i = 3; i < parts.size(); ++i) {
    std::string const &name = parts[i];
    if (Orb_Block *next = child(name)) {
      block = next;
      continue;
    }
    if (i + 1 != parts.size())
      throw fail();
    for (std::size_t cut = name.find_first_of(".:"); cut != std::string::npos;
         cut = name.find_first_of(".:", cut + 1)) {
      Orb_Block *owner = child(name.substr(0, cut));
      if (!owner)
        continue;
      std::string const rest = name.substr(cut + 1);
      Orb_Persistent *found = name[cut] == '.'
                                  ? static_cast<Orb_Persistent *>(owner->GetPinByName(rest.c_str()))
                                  : owner->GetSignalByName(rest.c_str());
      if (found)
        return Wrap(db, found);
    }
    throw fail();
  }
  return Wrap(db, block);
}

// ---------------------------------------------------------------------------
// Views

py::dict CountByType(ViewRef const &ref) {
  Lum_TdmView *view = ClientOf<Lum_TdmView>(ref);
  TrackingModel &model = ref.db->Model();
  std::unordered_map<Lum_TlmBlock const *, std::size_t> counts;
  {
    py::gil_scoped_release release;
    std::vector<Orb_Block *> stack;
    if (Orb_Block *top = view->GetOrbView()->GetBlock())
      stack.push_back(top);
    while (!stack.empty()) {
      Orb_Block *block = stack.back();
      stack.pop_back();
      auto *client = static_cast<Lum_TdmBlock *>(model.Specialize(block));
      ++counts[client->GetTypeBlock()];
      for (Orb_Block *child : block->GetBlocks())
        stack.push_back(child);
    }
  }
  py::dict result;
  for (auto const &[typeBlock, count] : counts) {
    py::object key = typeBlock ? ToPy(typeBlock->GetUniqueTag().str()) : py::none();
    result[key] = count;
  }
  return result;
}

py::dict MemoryUsage(ViewRef const &ref) {
  Lum_TdmView *view = ClientOf<Lum_TdmView>(ref);
  std::uint64_t counters[8] = {};
  std::uint64_t const total = view->DbgGetSize(counters[0], counters[1], counters[2], counters[3],
                                               counters[4], counters[5], counters[6], counters[7]);
  char const *names[8] = {"block_bytes",   "block_count",   "pin_bytes",    "pin_count",
                          "network_bytes", "network_count", "signal_bytes", "signal_count"};
  py::dict result;
  for (unsigned i = 0; i < 8; ++i)
    result[names[i]] = counters[i];
  result["total_bytes"] = total;
  return result;
}

std::string MemoryReport(ViewRef const &ref) {
  Lum_TdmView *view = ClientOf<Lum_TdmView>(ref);
  Port::StringStream out;
  view->DbgReportSize(&out);
  return out.GetText();
}

py::list Libraries(ViewRef const &ref) {
  Lum_TdmView *view = ClientOf<Lum_TdmView>(ref);
  std::vector<Lum_TlmLibrary const *> libraries;
  view->GetLibraries(libraries);
  LibraryHold const hold{ViewHold(ref.db, ref.Get()), nullptr};
  py::list result;
  for (Lum_TlmLibrary const *library : libraries)
    result.append(py::cast(LibraryOf(hold, library)));
  return result;
}

py::object LibraryByName(ViewRef const &ref, Text const &name) {
  Lum_TdmView *view = ClientOf<Lum_TdmView>(ref);
  Lum_TlmLibrary const *library = view->GetLibrary(Port::StringBase<char>(CName(name)));
  if (!library)
    return py::none();
  return py::cast(LibraryOf(LibraryHold{ViewHold(ref.db, ref.Get()), nullptr}, library));
}

// ---------------------------------------------------------------------------
// Blocks

py::list BlockList(DatabasePtr const &db, std::vector<Lum_TdmBlock *> const &blocks) {
  py::list result;
  for (Lum_TdmBlock *block : blocks)
    result.append(Wrap(db, block->GetOrbBlock()));
  return result;
}

py::list ChildrenOfType(BlockRef const &ref, py::handle type) {
  Lum_TdmBlock *block = BlockClient(ref);
  std::vector<Lum_TdmBlock *> found;
  if (type.is_none() || py::isinstance<TypeBlockRef>(type))
    block->GetChildBlocksOfType(TypeBlockArg(type), found);
  else
    block->GetChildBlocksOfType(TypeIdOf(type), found);
  return BlockList(ref.db, found);
}

py::object PinOfType(BlockRef const &ref, py::handle typePin) {
  Lum_TlmPin const *pin = typePin.is_none() ? nullptr : typePin.cast<TypePinRef const &>().Get();
  Lum_TdmPin *found = BlockClient(ref)->GetPinOfType(pin);
  return found ? Wrap(ref.db, found->GetOrbPin()) : py::none();
}

py::dict PinMapOf(BlockRef const &ref) {
  Lum_TdmBlock *block = BlockClient(ref);
  py::dict result;
  for (std::size_t i = 0; i < block->GetPins().size(); ++i) {
    Lum_TdmPin const *pin = block->GetPin(i);
    Lum_TlmPin const *typePin = pin->GetTypePin();
    result[ToPy(pin->GetName())] = typePin ? ToPy(typePin->GetName()) : py::none();
  }
  return result;
}

void Rebind(BlockRef const &ref, py::handle type, py::handle pinMap) {
  Lum_TdmBlock *block = BlockClient(ref);
  Lum_TlmBlock const *typeBlock = TypeBlockArg(type);
  if (pinMap.is_none() || !typeBlock) {
    if (!pinMap.is_none() && !py::isinstance<py::dict>(pinMap))
      throw py::type_error("pin_map is a dict of design pin name to type pin (name)");
    block->SetTypeBlock(typeBlock);
    return;
  }
  if (!py::isinstance<py::dict>(pinMap))
    throw py::type_error("pin_map is a dict of design pin name to type pin (name)");
  Lum_TdmTypePinMap map;
  for (auto const &[key, value] : pinMap.cast<py::dict>()) {
    Text const pinName = key.cast<Text>();
    Lum_TlmPin const *typePin = nullptr;
    if (py::isinstance<TypePinRef>(value)) {
      typePin = value.cast<TypePinRef const &>().Get();
    } else if (!value.is_none()) {
      Text const typePinName = value.cast<Text>();
      typePin = typeBlock->GetPinByName(CName(typePinName));
      if (!typePin)
        throw py::key_error("type block " + typeBlock->GetUniqueTag().str() + " has no pin '" +
                            typePinName.value + "'");
    }
    map.SetPinMap(Port::StringBase<char>(CName(pinName)), typePin);
  }
  // Equal maps are shared through the database's pin map manager.
  Lum_TdmTypePinMap const *shared =
      ref.db->PinMaps().GetTypePinMap(typeBlock->GetUniqueTag(), &map);
  block->SetTypeBlock(typeBlock, *shared);
}

py::object CreateTypedBlock(BlockRef const &ref, Text const &name, TypeBlockRef const &type,
                            bool pins, bool graft) {
  Lum_TdmBlock *block = BlockClient(ref);
  Lum_TlmBlock const *typeBlock = type.Get();
  char const *childName = CName(name);
  Lum_TdmBlock *child = nullptr;
  {
    py::gil_scoped_release release;
    child = block->CreateTypedBlock(childName, typeBlock, graft, pins);
  }
  return Wrap(ref.db, child->GetOrbBlock());
}

// ---------------------------------------------------------------------------
// Checking

using Problem = Lum_TdmVerifier::Problem;

char const *ProblemKindName(Lum_TdmVerifier::Kind kind) {
  switch (kind) {
  case Lum_TdmVerifier::Kind::ForeignMark:
    return "foreign_mark";
  case Lum_TdmVerifier::Kind::StampTooOld:
    return "stamp_too_old";
  case Lum_TdmVerifier::Kind::StampTooNew:
    return "stamp_too_new";
  case Lum_TdmVerifier::Kind::NoDevice:
    return "no_device";
  case Lum_TdmVerifier::Kind::LibraryUnloadable:
    return "library_unloadable";
  case Lum_TdmVerifier::Kind::LibraryNotListed:
    return "library_not_listed";
  case Lum_TdmVerifier::Kind::TypeBlockMissing:
    return "type_block_missing";
  case Lum_TdmVerifier::Kind::PinUnmatched:
    return "pin_unmatched";
  case Lum_TdmVerifier::Kind::PinCollision:
    return "pin_collision";
  case Lum_TdmVerifier::Kind::BlockOfUnloadableLibrary:
    return "block_of_unloadable_library";
  }
  return "unknown";
}

std::vector<Problem> CheckFile(Text const &path, std::vector<std::string> const &libPath) {
  AddSearchDirectories(libPath);
  py::gil_scoped_release release;
  return Lum_TdmVerifier::CheckFile(path.value);
}

std::vector<Problem> CheckDatabase(DatabasePtr const &db) {
  Orb_Model *host = db->Model().GetOrbModel();
  std::vector<Problem> problems;
  py::gil_scoped_release release;
  Port_MsgCapture const quiet;
  Lum_TdmVerifier([&problems](Problem const &problem) {
    problems.push_back(problem);
  }).CheckModel(*host);
  return problems;
}

std::vector<Problem> CheckView(ViewRef const &ref) {
  Orb_View *view = ref.Get();
  py::gil_scoped_release release;
  return Lum_TdmVerifier::Check(view);
}

// ---------------------------------------------------------------------------
// Binding helpers

template <class T> std::string Repr(Ref<T> const &ref, char const *pythonName) {
  if (!ref.IsLive())
    return std::string("<lumtdm.") + pythonName + " '" + ref.name + "' (stale)>";
  return std::string("<lumtdm.") + pythonName + " '" + ref.name + "' at " + FullPath(ref.object) +
         ">";
}

// What every object of the hierarchy has.
template <class T>
py::class_<Ref<T>, Handle> Common(py::module_ &m, char const *name, char const *doc) {
  using R = Ref<T>;
  py::class_<R, Handle> c(m, name, doc, py::is_final());
  c.def_property_readonly("name",
                          Locked(+[](R const &r) { return ToPy(r.Get()->GetNameString()); }),
                          "The object's name.")
      .def_property_readonly("full_path",
                             Locked(+[](R const &r) { return ToPy(FullPath(r.Get())); }),
                             "The path from the design manager down, as Database.lookup takes it: "
                             "'mgr/design/view/top/child', a pin '<block path>.pin', a signal "
                             "'<block path>:signal', a network '<view path>:network'.")
      .def("__repr__", [name](R const &r) {
        LibraryLock const lock;
        return Repr(r, name);
      });
  return c;
}

} // namespace
} // namespace lumpy

using namespace lumpy;

PYBIND11_MODULE(_lumtdm, m) {
  m.doc() = "Typed design databases: the compiled part of the lumtdm package.";

  g_Error = MakeError(m, "Error", PyExc_Exception,
                      "Base of every error of the library and its platform. Carries object_name "
                      "(the object concerned), message and location (where it was raised).");
  g_OrbError = MakeError(m, "OrbError", g_Error,
                         "A host model failure: a duplicate or empty name, a database that cannot "
                         "be read, a failed save, misuse of an object.");
  g_LumError = MakeError(m, "LumError", g_Error, "Base of the typing library's errors.");
  g_CorruptDatabaseError =
      MakeError(m, "CorruptDatabaseError", g_LumError,
                "Stored or given typing is inconsistent: an unknown library or type block, pins "
                "that do not match, a bad pin map, a format stamp too old or too new.");
  g_DesignLoadError =
      MakeError(m, "DesignLoadError", g_LumError, "A design that this library did not make.");
  g_InvalidLibraryError = MakeError(m, "InvalidLibraryError", g_LumError,
                                    "A type library that is missing or cannot be read.");
  g_InvalidTypeBlockError = MakeError(m, "InvalidTypeBlockError", g_LumError,
                                      "A type block that is missing, null or unusable.");
  g_InvalidFormatError = MakeError(m, "InvalidFormatError", g_LumError,
                                   "A file of a real format (a cell library or a netlist) "
                                   "that cannot be read; object_name is its path.");
  g_StaleObjectError =
      MakeError(m, "StaleObjectError", g_Error,
                "A Python object whose library object is gone: deleted (by the script, a rebind "
                "or a graft) or its database closed.");
  py::register_exception_translator(&Translate);

  py::enum_<Orb_Pin::PIN_DIRECTION>(m, "Direction", "A pin's direction.")
      .value("INPUT", Orb_Pin::PIN_INPUT)
      .value("OUTPUT", Orb_Pin::PIN_OUTPUT)
      .value("BIDIRECTIONAL", Orb_Pin::PIN_BIDIRECTIONAL);

  py::class_<Handle>(m, "Object",
                     "Base of the objects of a design database. Its library object may go "
                     "(deleted, or the database closed); any use then raises StaleObjectError.")
      .def_property_readonly(
          "alive", Locked(+[](Handle const &h) { return h.IsLive(); }),
          "Whether the object still exists (False once deleted or its database closed).")
      .def_property_readonly(
          "database", [](Handle const &h) { return h.db; },
          "The Database it belongs to (closed or not).")
      .def_property_readonly(
          "kind", [](Handle const &h) { return std::string(Orb_KindName(h.kind)); },
          "The kind: 'design manager', 'design', 'view', 'block', 'pin', 'signal' or 'network'.")
      .def("dump", Locked(+[](Handle const &h) { return ToPy(Dump(h)); }),
           "The object's debug dump (its class, its typing and the host's dump) as text.")
      .def("delete", Locked(+[](Handle const &h) { Delete(h); }),
           "Deletes the object with everything it owns; their Python objects go stale.")
      .def("_property_names", Locked(+[](Handle const &h) { return PropertyNames(h); }))
      .def("_property_get",
           Locked(+[](Handle const &h, Text const &n) { return GetProperty(h, n); }))
      .def("_property_set", Locked(+[](Handle const &h, Text const &n, py::object const &v) {
             SetProperty(h, n, v);
           }))
      .def("_property_del", Locked(+[](Handle const &h, Text const &n) { DeleteProperty(h, n); }))
      .def(
          "__eq__",
          [](Handle const &a, py::object const &other) {
            if (!py::isinstance<Handle>(other))
              return false;
            auto const &b = other.cast<Handle const &>();
            return a.db == b.db && a.object == b.object && a.generation == b.generation;
          },
          "Two Python objects are equal when they stand for the same library object.")
      .def("__hash__",
           [](Handle const &h) { return std::hash<void const *>()(h.object) ^ h.generation; });

  // ---- lists
  py::class_<ListIterator>(m, "ObjectIterator",
                           "Iterates a list of objects; ends when the database is closed.",
                           py::is_final())
      .def("__iter__", [](py::object const &self) { return self; })
      .def("__next__", Locked(+[](ListIterator &it) { return ListIteratorNext(it); }));

  py::class_<ListRef>(m, "ObjectList",
                      "The children of one kind of an object, in host order, read afresh at "
                      "each use: len(), iteration, [index], [name] (KeyError when absent), "
                      "'name' in list, get(name).",
                      py::is_final())
      .def("__len__", Locked(+[](ListRef const &l) { return ListSize(l); }))
      .def("__iter__",
           [](ListRef const &l) {
             return ListIterator{l, 0};
           })
      .def("__getitem__",
           Locked(+[](ListRef const &l, py::object const &k) { return ListGetItem(l, k); }),
           "The child at an index (IndexError past the end) or of a name (KeyError when absent).")
      .def("__contains__",
           Locked(+[](ListRef const &l, py::object const &k) { return ListContains(l, k); }),
           "Whether a child has that name, or is that object.")
      .def("get", Locked(+[](ListRef const &l, Text const &name) {
             return Wrap(l.owner.db, ListFindIndexed(l, name));
           }),
           py::arg("name"), "The child of that name, or None.")
      .def("__repr__", Locked(+[](ListRef const &l) {
             py::list names;
             WithRange(l, [&names](auto const &range) {
               for (Orb_Persistent *item : range)
                 names.append(ToPy(item->GetNameString()));
               return 0;
             });
             return "<lumtdm.ObjectList " + py::repr(names).cast<std::string>() + ">";
           }));

  py::class_<BlockWalk>(m, "BlockWalk",
                        "Every block of a view or subtree in pre-order (a block, then each child's "
                        "subtree). Ends when the database is closed; raises StaleObjectError when "
                        "the block it is in is deleted.",
                        py::is_final())
      .def("__iter__", [](py::object const &self) { return self; })
      .def("__next__", Locked(+[](BlockWalk &w) { return BlockWalkNext(w); }));

  // ---- database
  py::class_<Database, DatabasePtr>(
      m, "Database",
      "An open design database (lumtdm.open or lumtdm.create). Use it as a context manager "
      "to close it at the end. Every object of it keeps it alive; closing it makes them "
      "stale.",
      py::is_final())
      .def_property_readonly(
          "path", [](Database const &d) { return ToPy(d.GetPath()); },
          "The file it was opened from or will be saved to by default ('' if none).")
      .def_property_readonly(
          "closed", [](Database const &d) { return !d.IsOpen(); }, "Whether it is closed.")
      .def_property_readonly("design_managers", Locked(+[](DatabasePtr const &d) {
                               d->Model();
                               Handle owner;
                               owner.db = d;
                               return ListRef{owner, ListKind::DesignMgrs};
                             }),
                             "The design managers.")
      .def_property_readonly("views", Locked(+[](DatabasePtr const &d) {
                               py::list views;
                               for (Orb_DesignMgr *mgr : d->Model().GetOrbModel()->GetDesignMgrs())
                                 for (Orb_Design *design : mgr->GetDesigns())
                                   for (Orb_View *view : design->GetViews())
                                     views.append(Wrap(d, view));
                               return views;
                             }),
                             "Every view of every design, in host order.")
      .def("create_design_manager", Locked(+[](DatabasePtr const &d, Text const &name) {
             return Wrap(d, d->Model().GetOrbModel()->CreateDesignMgr(CName(name)));
           }),
           py::arg("name"), "Creates a design manager. OrbError for a duplicate or empty name.")
      .def("lookup", Locked(+[](DatabasePtr const &d, Text const &p) { return Lookup(d, p); }),
           py::arg("path"),
           "The object at a full path (see Object.full_path); KeyError when there is none. "
           "Names that hold '/' cannot be reached by path: use the lists' [name].")
      .def("commit", Locked(+[](DatabasePtr const &d) { CommitAll(*d); }),
           "Commits every view: writes all typing into the properties that a save stores.")
      .def("save", Locked(+[](DatabasePtr const &d, std::optional<Text> const &path, bool commit) {
             SaveDatabase(d, path, commit);
           }),
           py::arg("path") = py::none(), py::arg("commit") = true,
           "Saves to `path`, or in place. Commits every view first unless commit=False (a "
           "save without commit would drop typing changes). The file is replaced atomically: "
           "a failed save (OrbError) leaves it as it was. Saving to another path does not "
           "change Database.path.")
      .def("close", Locked(+[](DatabasePtr const &d) { CloseDatabase(d); }),
           "Closes the database without saving; its objects go stale and its iterators end. "
           "Closing twice does nothing.")
      .def("__enter__", [](DatabasePtr const &d) { return d; })
      .def("__exit__", Locked(+[](DatabasePtr const &d, py::object const &, py::object const &,
                                  py::object const &) { CloseDatabase(d); }))
      .def("__repr__", [](Database const &d) {
        return "<lumtdm.Database '" + d.GetPath() + "'" + (d.IsOpen() ? "" : " (closed)") + ">";
      });

  // ---- hierarchy
  Common<Orb_DesignMgr>(m, "DesignManager", "A design manager: the designs of a database.")
      .def_property_readonly(
          "designs", Locked(+[](DesignMgrRef const &r) { return ListOf(r, ListKind::Designs); }),
          "Its designs.")
      .def("create_design", Locked(+[](DesignMgrRef const &r, Text const &name) {
             return Wrap(r.db, r.Get()->CreateDesign(CName(name)));
           }),
           py::arg("name"), "Creates a design (marked as a user design).");

  Common<Orb_Design>(m, "Design", "A design: its views.")
      .def_property_readonly("design_manager", Locked(+[](DesignRef const &r) {
                               return Wrap(r.db, r.Get()->GetParent());
                             }),
                             "The design manager that holds it.")
      .def_property_readonly("views",
                             Locked(+[](DesignRef const &r) { return ListOf(r, ListKind::Views); }),
                             "Its views.")
      .def_property_readonly(
          "is_user_design",
          Locked(+[](DesignRef const &r) { return Lum_TdmDesign::IsUserDesign(*r.Get()); }),
          "Whether the design is a user design (unmarked or marked TDS_DESIGN_TYPE_USER).")
      .def_property_readonly("is_type_block_design", Locked(+[](DesignRef const &r) {
                               return Lum_TdmDesign::IsTypeBlockDesign(*r.Get());
                             }),
                             "Whether the design holds type blocks.")
      .def("create_view", Locked(+[](DesignRef const &r, Text const &name) {
             return Wrap(r.db, r.Get()->CreateView(CName(name)));
           }),
           py::arg("name"), "Creates a view, stamped with the current format.");

  Common<Orb_View>(m, "View",
                   "A view: its top block, networks and type libraries (named by the string "
                   "list property TDS_VIEW_TYPE_LIBS and loaded for TDS_DEVICE_PM and "
                   "TDS_DEVICE_PART when first needed).")
      .def_property_readonly(
          "design", Locked(+[](ViewRef const &r) { return Wrap(r.db, r.Get()->GetParent()); }),
          "The design that holds it.")
      .def_property_readonly(
          "top_block", Locked(+[](ViewRef const &r) { return Wrap(r.db, r.Get()->GetBlock()); }),
          "The top block, or None.")
      .def_property_readonly(
          "networks", Locked(+[](ViewRef const &r) { return ListOf(r, ListKind::Networks); }),
          "Its networks.")
      .def("create_top_block", Locked(+[](ViewRef const &r, Text const &name) {
             return Wrap(r.db, r.Get()->CreateTopBlock(CName(name)));
           }),
           py::arg("name"), "Creates the top block; OrbError when there is one.")
      .def("create_network", Locked(+[](ViewRef const &r, Text const &name) {
             return Wrap(r.db, r.Get()->CreateNetwork(CName(name)));
           }),
           py::arg("name"), "Creates a network.")
      .def("blocks", Locked(+[](ViewRef const &r) { return WalkFrom(r.db, r.Get()->GetBlock()); }),
           "Every block of the view in pre-order, lazily.")
      .def("count_by_type", Locked(+[](ViewRef const &r) { return CountByType(r); }),
           "The number of blocks of the view per type: a dict from 'LIBRARY:TYPEBLOCK' (None "
           "for untyped blocks) to a count, computed in one pass in C++.")
      .def_property_readonly(
          "libraries", Locked(+[](ViewRef const &r) { return Libraries(r); }),
          "The view's type libraries, loading them if needed (InvalidLibraryError when one "
          "cannot be loaded).")
      .def("library", Locked(+[](ViewRef const &r, Text const &n) { return LibraryByName(r, n); }),
           py::arg("name"), "The view's type library of that name, or None.")
      .def_property_readonly(
          "loaded_version", Locked(+[](ViewRef const &r) {
            unsigned version = 0;
            unsigned revision = 0;
            ClientOf<Lum_TdmView>(r)->GetTdmLoadedDesignVersion(version, revision);
            return py::make_tuple(version, revision);
          }),
          "The format stamp (version, revision) the view was loaded or created with.")
      .def("commit", Locked(+[](ViewRef const &r) { ClientOf<Lum_TdmView>(r)->CommitAll(); }),
           "Writes the view's typing (stamp, library list, block types, pin maps) into properties.")
      .def("memory_report", Locked(+[](ViewRef const &r) { return MemoryReport(r); }),
           "The memory report of the view's client objects, as text.")
      .def("memory_usage", Locked(+[](ViewRef const &r) { return MemoryUsage(r); }),
           "The memory report's counters as a dict: block_bytes, block_count, pin_bytes, "
           "pin_count, network_bytes, network_count, signal_bytes, signal_count, total_bytes.");

  Common<Orb_Block>(m, "Block", "A block: its child blocks, pins and signals, and its type block.")
      .def_property_readonly(
          "view", Locked(+[](BlockRef const &r) { return Wrap(r.db, r.Get()->GetView()); }),
          "The view that holds it.")
      .def_property_readonly(
          "parent", Locked(+[](BlockRef const &r) { return Wrap(r.db, r.Get()->GetParent()); }),
          "The parent block, or None for a top block.")
      .def_property_readonly("children",
                             Locked(+[](BlockRef const &r) { return ListOf(r, ListKind::Blocks); }),
                             "Its child blocks.")
      .def_property_readonly(
          "pins", Locked(+[](BlockRef const &r) { return ListOf(r, ListKind::Pins); }), "Its pins.")
      .def_property_readonly(
          "signals", Locked(+[](BlockRef const &r) { return ListOf(r, ListKind::Signals); }),
          "Its signals.")
      .def("walk", Locked(+[](BlockRef const &r) { return WalkFrom(r.db, r.Get()); }),
           "The block and every block beneath it in pre-order, lazily.")
      .def_property_readonly("type_block", Locked(+[](BlockRef const &r) {
                               return TypeBlockOf(HoldOfBlock(r), BlockClient(r)->GetTypeBlock());
                             }),
                             "The type block it is bound to, or None.")
      .def_property_readonly("type_name", Locked(+[](BlockRef const &r) -> py::object {
                               Lum_TlmBlock const *typeBlock = BlockClient(r)->GetTypeBlock();
                               return typeBlock ? ToPy(typeBlock->GetName()) : py::none();
                             }),
                             "The name of its type block, or None (quicker than type_block.name).")
      .def_property_readonly("is_typed", Locked(+[](BlockRef const &r) {
                               return BlockClient(r)->GetTypeBlock() != nullptr;
                             }),
                             "Whether it is bound to a type block.")
      .def_property_readonly(
          "pin_map", Locked(+[](BlockRef const &r) { return PinMapOf(r); }),
          "Its pins' bindings: a dict from pin name to type pin name (None when untyped).")
      .def("is_type_of", Locked(+[](BlockRef const &r, py::object const &t) {
             return BlockClient(r)->IsTypeOf(TypeIdOf(t));
           }),
           py::arg("type"),
           "Whether it is of that type: a TypeBlock, 'LIBRARY:TYPEBLOCK', or None (untyped).")
      .def("first_child_of_type", Locked(+[](BlockRef const &r, py::object const &t) -> py::object {
             Lum_TdmBlock *found = BlockClient(r)->GetFirstChildBlockOfType(TypeIdOf(t));
             return found ? Wrap(r.db, found->GetOrbBlock()) : py::none();
           }),
           py::arg("type"), "The first child of that type (as is_type_of takes it), or None.")
      .def("children_of_type",
           Locked(+[](BlockRef const &r, py::object const &t) { return ChildrenOfType(r, t); }),
           py::arg("type"),
           "The children of that type, in host order: a TypeBlock (that very type block), "
           "'LIBRARY:TYPEBLOCK', or None (the untyped children).")
      .def("pin_of_type",
           Locked(+[](BlockRef const &r, py::object const &t) { return PinOfType(r, t); }),
           py::arg("type_pin"),
           "Its first pin bound to that TypePin (None: the first unbound pin), or None.")
      .def("create_block", Locked(+[](BlockRef const &r, Text const &name) {
             return Wrap(r.db, r.Get()->CreateBlock(CName(name)));
           }),
           py::arg("name"), "Creates an untyped child block.")
      .def("create_pin",
           Locked(+[](BlockRef const &r, Text const &name, Orb_Pin::PIN_DIRECTION direction) {
             return Wrap(r.db, r.Get()->CreatePin(CName(name), direction));
           }),
           py::arg("name"), py::arg("direction"), "Creates a pin (untyped).")
      .def("create_signal", Locked(+[](BlockRef const &r, Text const &name) {
             return Wrap(r.db, r.Get()->CreateSignal(CName(name)));
           }),
           py::arg("name"), "Creates a signal of this block.")
      .def("create_typed_block",
           Locked(+[](BlockRef const &r, Text const &name, TypeBlockRef const &t, bool pins,
                      bool graft) { return CreateTypedBlock(r, name, t, pins, graft); }),
           py::arg("name"), py::arg("type_block"), py::arg("pins") = true, py::arg("graft") = false,
           "Creates a child bound to a type block of one of the view's libraries, with one "
           "bound pin per type pin when pins is true, and the type block's hierarchy for the "
           "view's name copied beneath it when graft is true. CorruptDatabaseError for a type "
           "block of no library of the view.")
      .def("create_untyped_copy",
           Locked(+[](BlockRef const &r, Text const &name, TypeBlockRef const &t) {
             Lum_TdmBlock *child = BlockClient(r)->CreateUntypedBlock(CName(name), t.Get());
             return Wrap(r.db, child->GetOrbBlock());
           }),
           py::arg("name"), py::arg("type_block"),
           "Creates an untyped child copying a type block's pins (with their properties) and "
           "hierarchy, recording its origin in TDS_LIBRARY_ASSOC.")
      .def("rebind", Locked(+[](BlockRef const &r, py::object const &t, py::object const &map) {
             Rebind(r, t, map);
           }),
           py::arg("type_block"), py::arg("pin_map") = py::none(),
           "Binds the block to another type block (None unbinds). Without pin_map the pins are "
           "matched by name as a load does (missing pins are created); with pin_map, a dict "
           "from each design pin name to a type pin name or TypePin, every pin takes the type "
           "pin the map names (the map is stored through the database's pin map manager and "
           "committed as TDS_BLOCK_PIN_MAP). A failure leaves the binding as it was.")
      .def("unbind", Locked(+[](BlockRef const &r) { BlockClient(r)->SetTypeBlock(nullptr); }),
           "Unbinds the block and its pins.")
      .def("manifest_pins",
           Locked(+[](BlockRef const &r) { return BlockClient(r)->ManifestAllTypedPins(); }),
           "Creates the pins of its type block that it lacks and sorts its pins by name; True "
           "when it created any.")
      .def("normalize_pins", Locked(+[](BlockRef const &r) { BlockClient(r)->NormalizePins(); }),
           "Sorts its pins by name (byte order).");

  Common<Orb_Pin>(m, "Pin", "A pin of a block: direction, connections and type pin.")
      .def_property_readonly(
          "block", Locked(+[](PinRef const &r) { return Wrap(r.db, r.Get()->GetParent()); }),
          "The block it belongs to.")
      .def_property_readonly("direction",
                             Locked(+[](PinRef const &r) { return r.Get()->GetDirection(); }),
                             "Its Direction.")
      .def_property_readonly(
          "signal", Locked(+[](PinRef const &r) { return Wrap(r.db, r.Get()->GetSignal()); }),
          "Its outer signal (of its block's parent block), or None.")
      .def_property_readonly("inner_signal", Locked(+[](PinRef const &r) {
                               return Wrap(r.db, r.Get()->GetInnerSignal());
                             }),
                             "Its inner signal (of its own block), or None.")
      .def("connect", Locked(+[](PinRef const &r, std::optional<SignalRef> const &s) {
             Orb_Signal *signal = s ? s->Get() : nullptr;
             r.Get()->Connect(signal);
           }),
           py::arg("signal"),
           "Connects its outer side to a signal of its block's parent block (None "
           "disconnects). OrbError for any other signal.")
      .def("connect_inner", Locked(+[](PinRef const &r, std::optional<SignalRef> const &s) {
             Orb_Signal *signal = s ? s->Get() : nullptr;
             r.Get()->ConnectInner(signal);
           }),
           py::arg("signal"),
           "Connects its inner side to a signal of its own block (None disconnects).")
      .def_property_readonly(
          "type_pin", Locked(+[](PinRef const &r) {
            Lum_TdmPin *pin = ClientOf<Lum_TdmPin>(r);
            LibraryHold const hold{ViewHold(r.db, r.Get()->GetParent()->GetView()), nullptr};
            return TypePinOf(hold, pin->GetTypePin());
          }),
          "The type pin it stands for, or None.")
      .def_property_readonly("is_typed", Locked(+[](PinRef const &r) {
                               return ClientOf<Lum_TdmPin>(r)->GetTypePin() != nullptr;
                             }),
                             "Whether it is bound to a type pin.");

  Common<Orb_Signal>(m, "Signal", "A signal of a block: the pins it connects.")
      .def_property_readonly(
          "block", Locked(+[](SignalRef const &r) { return Wrap(r.db, r.Get()->GetParent()); }),
          "The block it belongs to.")
      .def_property_readonly(
          "pins", Locked(+[](SignalRef const &r) { return ListOf(r, ListKind::SignalPins); }),
          "The pins connected to it, from inside and outside, in connection order.")
      .def_property_readonly(
          "network", Locked(+[](SignalRef const &r) { return Wrap(r.db, r.Get()->GetNetwork()); }),
          "The network it belongs to, or None.");

  Common<Orb_Network>(m, "Network", "A network: signals of a view grouped.")
      .def_property_readonly(
          "view", Locked(+[](NetworkRef const &r) { return Wrap(r.db, r.Get()->GetParent()); }),
          "The view that holds it.")
      .def_property_readonly("signals", Locked(+[](NetworkRef const &r) {
                               return ListOf(r, ListKind::NetworkSignals);
                             }),
                             "Its signals.")
      .def("add",
           Locked(+[](NetworkRef const &r, SignalRef const &s) { r.Get()->AddSignal(s.Get()); }),
           py::arg("signal"), "Adds a signal of the same view, moving it out of any other network.")
      .def("remove",
           Locked(+[](NetworkRef const &r, SignalRef const &s) { r.Get()->RemoveSignal(s.Get()); }),
           py::arg("signal"), "Removes a signal; nothing happens when it is not a member.");

  // ---- types
  py::class_<TypeLibraryRef>(m, "TypeLibrary",
                             "A type library: its type blocks by name (len, iteration, [name], "
                             "'name' in library).",
                             py::is_final())
      .def_property_readonly(
          "name", Locked(+[](TypeLibraryRef const &l) { return ToPy(l.Get()->GetLibraryName()); }),
          "The library's name.")
      .def_property_readonly("version", Locked(+[](TypeLibraryRef const &l) {
                               unsigned version = 0;
                               unsigned revision = 0;
                               l.Get()->GetTlmVersion(version, revision);
                               return py::make_tuple(version, revision);
                             }),
                             "(version, revision).")
      .def_property_readonly("qualifiers", Locked(+[](TypeLibraryRef const &l) {
                               return py::make_tuple(ToPy(l.Get()->GetFirstQualifier().str()),
                                                     ToPy(l.Get()->GetSecondQualifier().str()));
                             }),
                             "Its two qualifiers (possibly empty).")
      .def_property_readonly("type_blocks", Locked(+[](TypeLibraryRef const &l) {
                               py::list blocks;
                               for (Lum_TlmBlock const *block : l.Get()->GetTypeBlocks())
                                 blocks.append(TypeBlockOf(l.hold, block));
                               return blocks;
                             }),
                             "Its type blocks in creation order.")
      .def("__len__",
           Locked(+[](TypeLibraryRef const &l) { return l.Get()->GetTypeBlocks().size(); }))
      .def("__iter__", Locked(+[](TypeLibraryRef const &l) {
             py::list blocks;
             for (Lum_TlmBlock const *block : l.Get()->GetTypeBlocks())
               blocks.append(TypeBlockOf(l.hold, block));
             return py::iter(blocks);
           }))
      .def("__getitem__", Locked(+[](TypeLibraryRef const &l, Text const &name) {
             Lum_TlmBlock const *block = l.Get()->GetTypeBlock(Port::StringBase<char>(CName(name)));
             if (!block)
               throw py::key_error(name.value);
             return TypeBlockOf(l.hold, block);
           }),
           "The type block of that name; KeyError when the library has none.")
      .def("__contains__", Locked(+[](TypeLibraryRef const &l, Text const &name) {
             return l.Get()->GetTypeBlock(Port::StringBase<char>(CName(name))) != nullptr;
           }),
           "Whether the library has a type block of that name.")
      .def("__eq__",
           [](TypeLibraryRef const &a, py::object const &b) {
             return py::isinstance<TypeLibraryRef>(b) &&
                    b.cast<TypeLibraryRef const &>().library == a.library;
           })
      .def("__hash__", [](TypeLibraryRef const &l) { return std::hash<void const *>()(l.library); })
      .def("__repr__", Locked(+[](TypeLibraryRef const &l) {
             return "<lumtdm.TypeLibrary '" + std::string(l.Get()->GetLibraryName()) + "'>";
           }));

  py::class_<TypeBlockRef>(m, "TypeBlock", "A type block: a block definition of a type library.",
                           py::is_final())
      .def_property_readonly(
          "name", Locked(+[](TypeBlockRef const &t) { return ToPy(t.Get()->GetName()); }),
          "Its name.")
      .def_property_readonly(
          "tag", Locked(+[](TypeBlockRef const &t) { return ToPy(t.Get()->GetUniqueTag().str()); }),
          "'LIBRARY:TYPEBLOCK', as count_by_type and is_type_of use it.")
      .def_property_readonly("library", Locked(+[](TypeBlockRef const &t) {
                               return LibraryOf(t.hold, t.Get()->GetLibrary());
                             }),
                             "The TypeLibrary that holds it.")
      .def_property_readonly("pins", Locked(+[](TypeBlockRef const &t) {
                               Lum_TlmBlock const *block = t.Get();
                               py::list pins;
                               for (std::size_t i = 0; i < block->GetPins().size(); ++i)
                                 pins.append(TypePinOf(t.hold, block->GetPin(i)));
                               return pins;
                             }),
                             "Its type pins in order.")
      .def("pin", Locked(+[](TypeBlockRef const &t, Text const &name) {
             return TypePinOf(t.hold, t.Get()->GetPinByName(CName(name)));
           }),
           py::arg("name"), "Its type pin of that name, or None.")
      .def("has_hierarchy", Locked(+[](TypeBlockRef const &t, Text const &view) {
             return t.Get()->HasHier(Port::StringBase<char>(CName(view)));
           }),
           py::arg("view_name"), "Whether it has a hierarchy for that view name (for grafts).")
      .def("__eq__",
           [](TypeBlockRef const &a, py::object const &b) {
             return py::isinstance<TypeBlockRef>(b) &&
                    b.cast<TypeBlockRef const &>().block == a.block;
           })
      .def("__hash__", [](TypeBlockRef const &t) { return std::hash<void const *>()(t.block); })
      .def("__repr__", Locked(+[](TypeBlockRef const &t) {
             return "<lumtdm.TypeBlock '" + t.Get()->GetUniqueTag().str() + "'>";
           }));

  py::class_<TypePinRef>(m, "TypePin", "A type pin: a pin of a type block.", py::is_final())
      .def_property_readonly("name",
                             Locked(+[](TypePinRef const &p) { return ToPy(p.Get()->GetName()); }),
                             "Its name.")
      .def_property_readonly("direction",
                             Locked(+[](TypePinRef const &p) { return p.Get()->GetDirection(); }),
                             "Its Direction.")
      .def_property_readonly("type_block", Locked(+[](TypePinRef const &p) {
                               return TypeBlockOf(p.hold, p.Get()->GetParent());
                             }),
                             "The type block it belongs to.")
      .def("__eq__",
           [](TypePinRef const &a, py::object const &b) {
             return py::isinstance<TypePinRef>(b) && b.cast<TypePinRef const &>().pin == a.pin;
           })
      .def("__hash__", [](TypePinRef const &p) { return std::hash<void const *>()(p.pin); })
      .def("__repr__", Locked(+[](TypePinRef const &p) {
             Lum_TlmPin const *pin = p.Get();
             return "<lumtdm.TypePin '" + pin->GetParent()->GetUniqueTag().str() + "." +
                    pin->GetName() + "'>";
           }));

  // ---- checking
  py::class_<Problem>(m, "Problem",
                      "A problem that makes opening a database fail, as the checking call finds "
                      "it without binding anything.",
                      py::is_final())
      .def_property_readonly(
          "kind", [](Problem const &p) { return std::string(ProblemKindName(p.kind)); },
          "foreign_mark, stamp_too_old, stamp_too_new, no_device, library_unloadable, "
          "library_not_listed, type_block_missing, pin_unmatched, pin_collision or "
          "block_of_unloadable_library.")
      .def_property_readonly(
          "path", [](Problem const &p) { return ToPy(p.path); },
          "The object: 'manager/design', the view, '<view>:top/child' for a block, "
          "'<view>:top/child pin P' for a pin.")
      .def_property_readonly(
          "view", [](Problem const &p) { return ToPy(p.view); },
          "The view's path ('' for a design's problem).")
      .def_property_readonly(
          "key", [](Problem const &p) { return ToPy(p.key); },
          "What problems group by: the stored mark or stamp, the library name, or the "
          "stored type 'library:type block'.")
      .def_property_readonly(
          "mapped_to", [](Problem const &p) { return ToPy(p.mappedTo); },
          "For a pin, the type pin its stored pin map names, if any.")
      .def_property_readonly(
          "exception", [](Problem const &p) { return ToPy(p.exception); },
          "The class of the exception the open would raise for it ('' if none).")
      .def_property_readonly(
          "object_name", [](Problem const &p) { return ToPy(p.objectName); },
          "That exception's object name.")
      .def_property_readonly(
          "message", [](Problem const &p) { return ToPy(p.message); }, "That exception's message.")
      .def("__repr__", [](Problem const &p) {
        return "<lumtdm.Problem " + std::string(ProblemKindName(p.kind)) + " at " + p.path + ">";
      });
  m.def("check", Locked(+[](Text const &path, std::vector<std::string> const &libPath) {
          return CheckFile(path, libPath);
        }),
        py::arg("path"), py::arg("lib_path") = std::vector<std::string>(),
        "Reads a database file without binding it and returns every Problem that makes "
        "opening it fail (an empty list when it opens). OrbError for a file that cannot be "
        "read.");
  py::class_<Database, DatabasePtr>(m.attr("Database"))
      .def("check", Locked(+[](DatabasePtr const &d) { return CheckDatabase(d); }),
           "Every Problem that would make opening this database, as it now stands, fail.");
  py::class_<ViewRef, Handle>(m.attr("View"))
      .def("check", Locked(+[](ViewRef const &r) { return CheckView(r); }),
           "Every Problem that would make opening this view, as it now stands, fail.");

  // ---- module functions
  m.def("open", Locked(+[](Text const &path, std::vector<std::string> const &libPath) {
          return OpenDatabase(path, libPath);
        }),
        py::arg("path"), py::arg("lib_path") = std::vector<std::string>(),
        "Opens a design database, binding every typed block. lib_path: folders searched for "
        "type libraries (<dir>/<personality>/<name>.tlm, then <dir>/<name>.tlm), added to the "
        "process-wide search path before LUM_TLM_PATH. Raises OrbError for a file that cannot "
        "be read and the typing errors for a database that cannot be bound; nothing stays "
        "open then.");
  m.def("create",
        Locked(+[](std::optional<Text> const &path, std::vector<std::string> const &libPath) {
          return CreateDatabase(path, libPath);
        }),
        py::arg("path") = py::none(), py::arg("lib_path") = std::vector<std::string>(),
        "Creates a new, empty database that save() writes to `path` (or to the path it is "
        "given).");
  m.def("load_library", Locked(+[](Text const &name, Text const &personality, Text const &part) {
          std::shared_ptr<Lum_TlmLibrary const> counted =
              LoadCounted(name.value, personality.value, part.value);
          Lum_TlmLibrary const *library = counted.get();
          return TypeLibraryRef{LibraryHold{nullptr, std::move(counted)}, library};
        }),
        py::arg("name"), py::arg("personality"), py::arg("part"),
        "Loads a type library by name for a device personality (as a view does), holding it "
        "while the returned object or its type blocks live. InvalidLibraryError when it "
        "cannot be found or read.");
  m.def("library_search_path", Locked(+[]() { return Lum_TlmCatalog::GetSearchPath(); }),
        "The folders added to the type library search path, joined by ':' (LUM_TLM_PATH follows).");
  m.def(
      "format_version",
      +[]() {
        unsigned version = 0;
        unsigned revision = 0;
        Lum_TdmView::GetTdmVersion(version, revision);
        return py::make_tuple(version, revision);
      },
      "The format stamp (version, revision) that new and committed views get.");
  BindFormats(m);
}

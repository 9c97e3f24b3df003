// Type libraries: the client model, the library, its type blocks and the
// local library of a design database. The catalog is in Lum_TlmCatalog.cpp.
#include "Lum_Tlm.h"

#include "Lum_Exception.h"
#include "Port_String.h"

#include <cstring>
#include <string>
#include <utility>

char const *const Lum_TlmLibrary::LOCAL_LIBRARY_NAME = "Lum_LocalLibrary";

namespace {

char const kSourcePath[] = "host/Lum_Tlm";
char const kRevision[] = "$Revision: 1.1 $";

std::string StringProperty(Orb_ClientObject const *object, char const *name) {
  Orb_Property const *property = object->GetPropertyByName(name);
  return property && property->GetKind() == Orb_Property::STRING ? std::string(property->GetValue())
                                                                 : std::string();
}

// The top block of a type block design's "type" view, or null. A block
// named otherwise than its design is no type block: its unique tag names the
// block, and a lookup of that tag, which goes by design, would not find it.
Orb_Block *TypeViewBlock(Orb_Design const *design) {
  Orb_View const *view = design ? design->GetViewByName(Lum_TlmNames::kTypeViewName) : nullptr;
  Orb_Block *block = view ? view->GetBlock() : nullptr;
  return block && block->GetNameString() == design->GetNameString() ? block : nullptr;
}

// Keeps a design database's local library: its own host model and the
// client model over it. The design's host model owns this companion and
// saves the library's host model with the database.
class LocalLibraryCompanion : public Orb_ModelCompanion {
public:
  // `taken`: the host model was a waiting one, taken from the design's model.
  LocalLibraryCompanion(std::unique_ptr<Orb_Model> host, std::unique_ptr<Lum_TlmModel> client,
                        Lum_TlmLibrary *library, bool taken)
      : m_pHost(std::move(host)), m_pClient(std::move(client)), m_pLibrary(library),
        m_Taken(taken) {}
  ~LocalLibraryCompanion() override {
    // The client model detaches from the host model, so it goes first.
    m_pClient.reset();
    m_pHost.reset();
  }

  Orb_Model const *GetModelToSave() const override { return m_pHost.get(); }
  Lum_TlmLibrary *GetLibrary() const { return m_pLibrary; }

  std::unique_ptr<Orb_Model> ReleaseTakenModel() override {
    if (!m_Taken)
      return nullptr;
    // The client model's objects go; the host model stays as it was read.
    m_pClient.reset();
    m_pLibrary = nullptr;
    return std::move(m_pHost);
  }

private:
  std::unique_ptr<Orb_Model> m_pHost;
  std::unique_ptr<Lum_TlmModel> m_pClient;
  Lum_TlmLibrary *m_pLibrary;
  bool m_Taken;
};

} // namespace

PM_PIC::PM_PIC(char const *personality, char const *part, char const * /*reserved*/)
    : m_Personality(personality ? personality : ""), m_Part(part ? part : "") {}

// ---------------------------------------------------------------------------
// Lum_TlmModel

Lum_TlmModel::Lum_TlmModel(char const *name, char const *dbName, char const *path, bool readOnly)
    : Orb_ModelT<Lum_TlmTraits>(name, dbName, path, readOnly) {
  SetEventNotifyAll();
}

Lum_TlmModel::Lum_TlmModel(Orb_Model *model) : Orb_ModelT<Lum_TlmTraits>(model) {
  SetEventNotifyAll();
}

Lum_TlmModel::~Lum_TlmModel() = default;

Lum_TlmLibrary *Lum_TlmModel::CreateLibrary(char const *name, unsigned version, unsigned revision,
                                            char const *firstQualifier,
                                            char const *secondQualifier) {
  if (!name || !*name || std::strpbrk(name, " :"))
    throw Lum_ExceptionInvalidLibrary(
        "Lum", kSourcePath, kRevision, __LINE__, name ? name : "",
        "A type library name must be non-empty and hold neither a space nor a \":\".", false);
  Lum_TlmLibrary *library = CreateDesignMgr(name);
  Port::StringBase<char> versionText;
  versionText.doFormat("%u.%u", version, revision);
  library->CreatePropertyString(Lum_TlmNames::kVersionProperty, versionText.c_str());
  if (firstQualifier && *firstQualifier)
    library->CreatePropertyString(Lum_TlmNames::kFirstQualifierProperty, firstQualifier);
  if (secondQualifier && *secondQualifier)
    library->CreatePropertyString(Lum_TlmNames::kSecondQualifierProperty, secondQualifier);
  return library;
}

Lum_TlmLibrary *Lum_TlmModel::GetLibrary() {
  auto const designMgrs = GetOrbModel()->GetDesignMgrs();
  return designMgrs.empty() ? nullptr
                            : static_cast<Lum_TlmLibrary *>(Specialize(designMgrs.front()));
}

void Lum_TlmModel::SyncEventSpecializeDesignMgr(Orb_DesignMgr *o) { new Lum_TlmLibrary(this, o); }
void Lum_TlmModel::SyncEventSpecializeDesign(Orb_Design *o) { new Lum_TlmDesign(this, o); }
void Lum_TlmModel::SyncEventSpecializeView(Orb_View *o) { new Lum_TlmView(this, o); }
void Lum_TlmModel::SyncEventSpecializeBlock(Orb_Block *o) { new Lum_TlmBlock(this, o); }
void Lum_TlmModel::SyncEventSpecializePin(Orb_Pin *o) { new Lum_TlmPin(this, o); }
void Lum_TlmModel::SyncEventSpecializeSignal(Orb_Signal *o) { new Lum_TlmSignal(this, o); }
void Lum_TlmModel::SyncEventSpecializeNetwork(Orb_Network *o) { new Lum_TlmNetwork(this, o); }

void Lum_TlmModel::SyncEventDeleteDesignMgr(Orb_DesignMgr *o) { delete GetClient(o); }
void Lum_TlmModel::SyncEventDeleteDesign(Orb_Design *o) { delete GetClient(o); }
void Lum_TlmModel::SyncEventDeleteView(Orb_View *o) { delete GetClient(o); }
void Lum_TlmModel::SyncEventDeleteBlock(Orb_Block *o) { delete GetClient(o); }
void Lum_TlmModel::SyncEventDeletePin(Orb_Pin *o) { delete GetClient(o); }
void Lum_TlmModel::SyncEventDeleteSignal(Orb_Signal *o) { delete GetClient(o); }
void Lum_TlmModel::SyncEventDeleteNetwork(Orb_Network *o) { delete GetClient(o); }

// ---------------------------------------------------------------------------
// Lum_TlmLibrary

Lum_TlmLibrary::Lum_TlmLibrary(Lum_TlmModel *model, Orb_DesignMgr *designMgr)
    : Orb_DesignMgrT<Lum_TlmTraits>(model, designMgr) {}

Lum_TlmLibrary::~Lum_TlmLibrary() { Lum_TlmCatalog::Unregister(this); }

void Lum_TlmLibrary::GetTlmVersion(unsigned &version, unsigned &revision) const {
  version = revision = 0;
  std::string const text = StringProperty(this, Lum_TlmNames::kVersionProperty);
  Port::sscanf(text.c_str(), "%u.%u", &version, &revision);
}

Port::StringBase<char> Lum_TlmLibrary::GetFirstQualifier() const {
  return Port::StringBase<char>(StringProperty(this, Lum_TlmNames::kFirstQualifierProperty));
}

Port::StringBase<char> Lum_TlmLibrary::GetSecondQualifier() const {
  return Port::StringBase<char>(StringProperty(this, Lum_TlmNames::kSecondQualifierProperty));
}

Lum_TlmBlock const *Lum_TlmLibrary::GetTypeBlock(Port::StringBase<char> const &name) const {
  Orb_Block *block = TypeViewBlock(GetOrbDesignMgr()->GetDesignByName(name.c_str()));
  return static_cast<Lum_TlmBlock *>(GetContext()->Specialize(block));
}

Lum_TlmBlock *Lum_TlmLibrary::GetTypeBlock(Port::StringBase<char> const &name) {
  return const_cast<Lum_TlmBlock *>(std::as_const(*this).GetTypeBlock(name));
}

std::vector<Lum_TlmBlock *> Lum_TlmLibrary::GetTypeBlocks() const {
  std::vector<Lum_TlmBlock *> blocks;
  for (Orb_Design *design : GetOrbDesignMgr()->GetDesigns())
    if (Orb_Block *block = TypeViewBlock(design))
      blocks.push_back(static_cast<Lum_TlmBlock *>(GetContext()->Specialize(block)));
  return blocks;
}

Lum_TlmBlock *Lum_TlmLibrary::CreateTypeBlock(char const *name) {
  if (!name || !*name || std::strchr(name, ':')) {
    std::string const message = std::string("A type block name must be non-empty and hold no ") +
                                "\":\" (library <" + Port::Exception::ShownName(GetLibraryName()) +
                                ">).";
    throw Lum_ExceptionInvalidTypeBlock("Lum", kSourcePath, kRevision, __LINE__, name ? name : "",
                                        message.c_str(), false);
  }
  Lum_TlmDesign *design = CreateDesign(name);
  try {
    design->CreatePropertyString(Lum_TlmNames::kDesignTypeProperty,
                                 Lum_TlmNames::kDesignTypeLibrary);
    return design->CreateView(Lum_TlmNames::kTypeViewName)->CreateTopBlock(name);
  } catch (...) {
    // Another subscriber refused the view or the block: leave no half-made
    // type block behind.
    GetOrbDesignMgr()->DeleteDesign(design->GetOrbDesign());
    throw;
  }
}

void Lum_TlmLibrary::Save(char const *path) const { GetOrbDesignMgr()->GetModel()->Save(path); }

// ---------------------------------------------------------------------------
// Local library

Lum_TlmLibrary *Lum_TlmLibrary::GetLocalLibrary(Orb_Model *model, PM_PIC const & /*personality*/) {
  if (!model)
    throw Lum_ExceptionInvalidLibrary("Lum", kSourcePath, kRevision, __LINE__, LOCAL_LIBRARY_NAME,
                                      "No design model given for the local library.", false);
  std::string const key = Lum_TlmNames::kLocalLibraryCompanion;
  if (auto *companion = dynamic_cast<LocalLibraryCompanion *>(model->GetCompanion(key)))
    return companion->GetLibrary();

  std::unique_ptr<Orb_Model> host = model->TakeLoadedCompanion(key);
  bool const taken = host != nullptr;
  std::unique_ptr<Lum_TlmModel> client;
  Lum_TlmLibrary *library = nullptr;
  if (host) {
    client = std::make_unique<Lum_TlmModel>(host.get());
    library = client->GetDesignMgrByName(LOCAL_LIBRARY_NAME);
    if (!library)
      throw Lum_ExceptionCorruptDatabase(
          "Lum", kSourcePath, kRevision, __LINE__, model->GetDbName(),
          "The design database's local library section holds no local library.", false);
  } else {
    host = std::make_unique<Orb_Model>(LOCAL_LIBRARY_NAME, model->GetDbName(), "", false);
    client = std::make_unique<Lum_TlmModel>(host.get());
    library = client->CreateLibrary(LOCAL_LIBRARY_NAME, 1, 0);
  }
  model->SetCompanion(key, std::make_unique<LocalLibraryCompanion>(
                               std::move(host), std::move(client), library, taken));
  return library;
}

// ---------------------------------------------------------------------------
// Designs and blocks

Lum_TlmDesign::Lum_TlmDesign(Lum_TlmModel *model, Orb_Design *design)
    : Orb_DesignT<Lum_TlmTraits>(model, design) {}

bool Lum_TlmDesign::IsTypeBlockDesign(Orb_Design const &design) {
  Orb_Property const *mark = design.GetPropertyByName(Lum_TlmNames::kDesignTypeProperty);
  return mark && mark->GetValue() != Lum_TlmNames::kDesignTypeUser;
}

Lum_TlmLibrary const *Lum_TlmBlock::GetLibrary() const {
  Orb_DesignMgr *designMgr = GetOrbBlock()->GetView()->GetParent()->GetParent();
  return static_cast<Lum_TlmLibrary *>(GetContext()->Specialize(designMgr));
}

Port::StringBase<char> Lum_TlmBlock::GetUniqueTag() const {
  Port::StringBase<char> tag(GetLibrary()->GetLibraryName());
  tag += ':';
  tag += GetName();
  return tag;
}

bool Lum_TlmBlock::HasHier(Port::StringBase<char> viewName) const {
  return GetHier(std::move(viewName)) != nullptr;
}

Orb_Block *Lum_TlmBlock::GetHier(Port::StringBase<char> viewName) const {
  if (viewName == Port::StringBase<char>(Lum_TlmNames::kTypeViewName))
    return nullptr;
  Orb_View const *view = GetOrbBlock()->GetView()->GetParent()->GetViewByName(viewName.c_str());
  return view ? view->GetBlock() : nullptr;
}

Lum_TlmBlock *Lum_TlmBlock::CreateHier(char const *viewName) {
  Lum_TlmDesign *design = GetView()->GetParent();
  return design->CreateView(viewName)->CreateTopBlock(GetName());
}

#include "Lum_TdmDesign.h"

#include "Lum_TdmDbg.h"
#include "Lum_TdmLoadRules.h"
#include "Lum_TdmModel.h"

#include "Lum_Exception.h"
#include "Lum_TdmSchema.h"
#include "Lum_Tlm.h"

#include <cstring>

namespace {

char const kSourcePath[] = "../s/Lum_TdmDesign";
char const kRevision[] = "$Revision: 1.1 $";

using Lum_TdmSchema::kDesignType;
using Lum_TdmSchema::kDesignTypeUser;

bool IsUserMark(Orb_Property const *mark) {
  return !mark || std::strcmp(mark->GetStringValue(), kDesignTypeUser) == 0;
}

// The mark as the dumps show it: an absent mark reads as a user design.
char const *ShownMark(Orb_Property const *mark) {
  return mark ? mark->GetStringValue() : kDesignTypeUser;
}

} // namespace

static_assert(sizeof(Lum_TdmDesign) == sizeof(Orb_DesignT<Lum_TdmTraits>),
              "Lum_TdmDesign adds no field to its host base");

Lum_TdmDesign::Lum_TdmDesign(Lum_TdmModel *model, Orb_Design *design, bool isNew)
    : Orb_DesignT<Lum_TdmTraits>(model, design) {
  if (isNew) {
    CommitToOrb();
  } else if (!IsUserMark(GetPropertyByName(kDesignType))) {
    throw Lum_ExceptionDesignLoad("Lum", kSourcePath, kRevision, __LINE__, GetName(),
                                  Lum_TdmLoadRules::kForeignDesign, false);
  }
}

Lum_TdmDesign::~Lum_TdmDesign() = default;

bool Lum_TdmDesign::IsUserDesign(Orb_Design const &design) {
  return IsUserMark(design.GetPropertyByName(kDesignType));
}

bool Lum_TdmDesign::IsUserDesign() const { return IsUserDesign(*GetOrbDesign()); }

bool Lum_TdmDesign::IsTypeBlockDesign(Orb_Design const &design) {
  return Lum_TlmDesign::IsTypeBlockDesign(design);
}

void Lum_TdmDesign::CommitToOrb() {
  if (!GetPropertyByName(kDesignType))
    CreatePropertyString(kDesignType, kDesignTypeUser);
}

void Lum_TdmDesign::TraverseAndCommitToOrb() { CommitToOrb(); }

std::uint64_t Lum_TdmDesign::DbgMySize() const { return DbgClassSize() + DbgSecondarySize(); }

std::uint64_t Lum_TdmDesign::DbgClassSize() const { return sizeof(Lum_TdmDesign); }

std::uint64_t Lum_TdmDesign::DbgSecondarySize() const { return 0; }

void Lum_TdmDesign::DbgImpl() const {
  Lum_TdmDbgFrame<Lum_TdmDesign>(
      [this] {
        Orb_Debug::Printf("Design type = <%s>\n", ShownMark(GetPropertyByName(kDesignType)));
      },
      [this] { Orb_DesignDerived::Dbg(); });
}

void Lum_TdmDesign::DebugDumpCallback(Port::Stream *stream, int indent) const {
  Lum_TdmDbgCallbackFrame(stream, indent, "Lum_TdmDesign Data\n", [&] {
    Orb_Debug::Printf(stream, indent, "Design type = <%s>\n",
                      ShownMark(GetPropertyByName(kDesignType)));
  });
}

#pragma once

#include "Lum_TdmTraits.h"

#include "Orb_Templates.h"

#include <cstdint>

// Client of a host design. A design made by this library is a user design,
// marked by the host property TDS_DESIGN_TYPE = "TDS_DESIGN_TYPE_USER"; a
// design without the property counts as one too.
class LUM_TDM_API Lum_TdmDesign : public Orb_DesignT<Lum_TdmTraits> {
public:
  // On creation (isNew true) marks the design unless it already carries a
  // mark. On load checks the mark: any value other than
  // "TDS_DESIGN_TYPE_USER" throws Lum_ExceptionDesignLoad ("Attempt to
  // specialize non-Tdm design.", object name: the design's name), and the
  // design gets no client; an absent mark is accepted and written at the
  // next commit.
  Lum_TdmDesign(Lum_TdmModel *model, Orb_Design *design, bool isNew);
  ~Lum_TdmDesign() override;

  // Whether the host design is a user design: no TDS_DESIGN_TYPE, or exactly
  // "TDS_DESIGN_TYPE_USER" (case-sensitive, whole value). No client needed.
  static bool IsUserDesign(Orb_Design const &design);
  bool IsUserDesign() const;
  // Whether the host design holds type blocks, as the type-library component
  // decides.
  static bool IsTypeBlockDesign(Orb_Design const &design);

  void Dbg() const { DbgImpl(); }

  void DebugDumpCallback(Port::Stream *stream, int indent) const override;

  // Commits the design's mark only; it does not walk the design's views.
  virtual void TraverseAndCommitToOrb();
  virtual std::uint64_t DbgMySize() const;
  virtual std::uint64_t DbgClassSize() const;
  virtual std::uint64_t DbgSecondarySize() const;

protected:
  // Adds the user mark when the design has none; an existing mark is never
  // overwritten.
  virtual void CommitToOrb();
  virtual void DbgImpl() const;
};

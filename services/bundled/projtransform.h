#pragma once

#include "services/bundled/projcrs.h"
#include "services/bundled/projoperation.h"
#include "services/bundled/projsession.h"
#include "services/crs.h"

#include <vector>

namespace kelm::ogc {

/// Between equal CRSs: copies the triples bit for bit.
class IdentityTransform final : public ct::IMathTransform {
  public:
    bool TransformPoints(const double* source, double* target, unsigned int nCount) override;
};

/// Between different heights of local CRSs, which nothing can convert: every call throws.
class RefusingTransform final : public ct::IMathTransform {
  public:
    /// @throw kelm::DataException if nCount is above 0
    bool TransformPoints(const double* source, double* target, unsigned int nCount) override;
};

/// Between compounds of the earth, by PROJ. Holds a PROJ context of its own.
class ProjTransform final : public ct::IMathTransform {
  public:
    /// Reports the operations that it may use. @throw kelm::DataException as ListOperations does
    ProjTransform(const ProjCRS& oSource, const ProjCRS& oTarget);

    /// All points of a call go through one operation, so that no step comes between them: one
    /// whose area of use holds them all, while no operation whose area holds any of them is more
    /// accurate. The target may be partly filled on a throw.
    /// @throw kelm::DataException if there is no such operation, if it lacks a grid file, or if a
    /// point is not finite, has no height on the earth or cannot be converted
    bool TransformPoints(const double* source, double* target, unsigned int nCount) override;

  private:
    const ProjOperation& ChooseOperation(const double* source, unsigned int nCount);

    ProjSession moSession;
    std::vector<ProjOperation> moOperations;
    PjPtr mpoToDegrees;  ///< map coordinates to longitude and latitude; null if no area is limited
    AreaOfUse moMapArea; ///< of the map CRS; of the one operation if that is unknown
};

} // namespace kelm::ogc

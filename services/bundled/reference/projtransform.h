#pragma once

#include "services/bundled/reference/proj/areaofuse.h"
#include "services/bundled/reference/proj/projoperation.h"
#include "services/bundled/reference/proj/projsession.h"
#include "services/bundled/reference/projcrs.h"
#include "services/crs.h"

#include <string>
#include <vector>

namespace kelm::ogc {

/// A transform between compounds of the earth, by PROJ. Holds a PROJ context of its own.
class ProjTransform final : public ct::IMathTransform {
  public:
    /// Reports the operations that it may use, and the unit of the heights. @throw
    /// kelm::DataException as ListOperations does
    ProjTransform(const ProjCRS& source, const ProjCRS& target);

    /// All points of a call go through one operation, so that no step comes between them. It is
    /// one whose area of use holds all of them, while no operation whose area holds any of them is
    /// more accurate; it is reported. The target may be partly filled on a throw.
    /// @throw kelm::DataException if there is no such operation, if it lacks a grid file, or if a
    /// point is not finite, has no height on the earth or cannot be converted
    bool TransformPoints(const double* source, double* target, unsigned int nCount) override;

  private:
    void ReportOperations() const;
    void ReportUnit(const CRSText& text, const PJ* map, const ProjCRS& compound);
    const ProjOperation& ChooseOperation(const double* source, unsigned int count);
    std::size_t FindCommon(const double* source, unsigned int count);
    std::vector<double> ConvertToDegrees(const double* source, unsigned int count);
    void Apply(const ProjOperation& operation, const double* source, double* target,
               unsigned int count);

    ProjSession moSession;
    std::vector<ProjOperation> moOperations;
    std::string moMapName;
    std::string moEllipsoid; ///< if ellipsoidal heights need a word on it, see WarnOfEllipsoid
    PjPtr mpoToDegrees;  ///< map coordinates to longitude and latitude; null if no area is limited
    AreaOfUse moMapArea; ///< of the map CRS; of the one operation if that is unknown
};

} // namespace kelm::ogc

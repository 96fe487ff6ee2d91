#pragma once

#include "services/bundled/reference/failurecount.h"
#include "services/bundled/reference/proj/areaofuse.h"
#include "services/bundled/reference/proj/projoperation.h"

#include <limits>
#include <string>
#include <vector>

namespace kelm::ogc {

/// How the points of a call lie to the areas of the operations.
struct AreaCensus {
    std::vector<std::size_t> moInside; ///< the number of points in the area of each operation
    double mdfFinest = std::numeric_limits<double>::infinity(); ///< best accuracy at any point
    FailureCount moOutside;                                     ///< points that no area holds

    /// @return for how many points each operation serves
    std::string GetText(const std::vector<ProjOperation>& operations) const;
};

/// Counts which areas hold which points. @param operations the most accurate first
/// @param mapArea the area of the map CRS, which serves too if there is only one operation
/// @param source  triples in the source CRS, for messages
/// @param degrees the same triples as longitude, latitude and an ignored third value
AreaCensus TakeCensus(const std::vector<ProjOperation>& operations, const AreaOfUse& mapArea,
                      const double* source, const std::vector<double>& degrees);

} // namespace kelm::ogc

#pragma once

#include <cstddef>
#include <cstdint>
#include <limits>

namespace kelm::store {

/// Features of a layer that follow each other in reading order, and what stands in front of them.
struct FeatureRun {
    static constexpr double MOST = std::numeric_limits<double>::max();

    std::int64_t mnFirst = 0; ///< id of the first feature
    std::int64_t mnLast = 0;  ///< id of the last feature
    std::int64_t mnFeatures = 0;
    std::int64_t mnShapes = 0;  ///< shapes of the layer in front of the run
    std::size_t mnPolygons = 0; ///< polygons in front of the run that are no triangles
    /// Box in plan of the shapes that can be delivered; its low corner is above the high one if
    /// there is none.
    double mdfLowX = MOST;
    double mdfLowY = MOST;
    double mdfHighX = -MOST;
    double mdfHighY = -MOST;
};

} // namespace kelm::store

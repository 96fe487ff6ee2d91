#pragma once

#include "tin/point.h"
#include "tin/triangle.h"

#include <cstddef>
#include <cstdint>
#include <cstdlib>

// The rules by which a set of triangles is divided. All arithmetic is in `float`.

namespace kelm::tin::index {

inline point2_t<float> CentroidOf(const Triangle& triangle) {
    point2_t<float> centroid;
    triangle.GetCenterXY(&centroid);
    return centroid;
}

inline float At(const point2_t<float>& p, Axis axis) {
    return axis == AX_X ? p.x : p.y;
}

/// A centroid exactly at the centre goes left, a NaN right.
inline bool IsLeft(float centroid, float center) {
    return center >= centroid;
}

inline Axis LongestAxis(const point2_t<float>& min, const point2_t<float>& max) {
    return max.x - min.x >= max.y - min.y ? AX_X : AX_Y;
}

/// Sum of the centroids of a growing set of triangles.
struct CentroidSum {
    point2_t<float> sum{0.0F, 0.0F};

    void Add(const point2_t<float>& centroid) {
        sum.x += centroid.x;
        sum.y += centroid.y;
    }

    /// @param center two values, x then y
    void GetMean(std::size_t count, float* center) const {
        const float r = 1.0F / static_cast<float>(count);
        center[AX_X] = r * sum.x;
        center[AX_Y] = r * sum.y;
    }
};

/// The axis on which `center` makes two sides of the more equal sizes; x if both do alike.
inline Axis BestAxis(const Triangle* triangles, const unsigned* first, const unsigned* last,
                     const float* center) {
    std::int64_t surplus[2] = {0, 0};
    for (const unsigned* id = first; id != last; ++id) {
        const point2_t<float> centroid = CentroidOf(triangles[*id]);
        surplus[AX_X] += IsLeft(centroid.x, center[AX_X]) ? 1 : -1;
        surplus[AX_Y] += IsLeft(centroid.y, center[AX_Y]) ? 1 : -1;
    }
    return std::abs(surplus[AX_X]) > std::abs(surplus[AX_Y]) ? AX_Y : AX_X;
}

} // namespace kelm::tin::index

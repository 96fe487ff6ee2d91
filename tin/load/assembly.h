#pragma once

#include "tin/load/weld.h"
#include "tin/point.h"
#include "tin/triangle.h"

#include <memory>
#include <optional>

namespace kelm::tin::load {

/// The arrays of a new surface, surface-local, with heights as stored.
struct Assembly {
    std::unique_ptr<point3_t<float>[]> vertices;
    unsigned vertexCount;
    std::unique_ptr<Triangle[]> triangles;
    unsigned triangleCount;
    point2_t<double> base; ///< map coordinates of the local origin
};

/// Makes the arrays of welded corners. Vertices come in the order of their corners.
/// @param welded not empty; each list is emptied as soon as it falls out of use, so that the large
/// ones do not coexist @param given the base; if there is none, the base is the first corner that
/// has a finite position, else the origin
/// @throw std::bad_alloc
Assembly Assemble(Welded& welded, const std::optional<point2_t<double>>& given);

/// @return box of the triangles in plan
aabb_t<point2_t<float>> ComputeBox(const Assembly& parts);

} // namespace kelm::tin::load

#pragma once

#include "containers/keypoint.h"
#include "tin/triangleid.h"

#include <vector>

namespace kelm::tin::load {

/// What is left of the corners of a load when those that agree within the tolerance of the octree
/// have become one.
struct Welded {
    std::vector<containers::KeyPoint<double>> corners; ///< the kept ones, in the order of the load
    std::vector<Triangle_Id> triangles;                ///< lead to kept corners
};

/// Welds a list of corners, with the octree where the hash cannot tell.
/// @param points not empty @param ids lead to points @return both lists are empty afterwards
/// @throw std::bad_alloc
Welded Weld(std::vector<containers::KeyPoint<double>>& points, std::vector<Triangle_Id>& ids);

/// Welds by the octree alone. Else as Weld.
Welded WeldByOctree(std::vector<containers::KeyPoint<double>>& points,
                    std::vector<Triangle_Id>& ids);

} // namespace kelm::tin::load

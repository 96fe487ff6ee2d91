#pragma once

#include "containers/keypoint.h"
#include "tin/triangleid.h"

#include <vector>

namespace kelm::tin::load {

/// Welds the corners of a load: corners that agree within the tolerance of the octree become one.
/// @param points not changed, and not empty @param ids lead to corners; on return to kept ones
/// @param keys one a corner; on return 1 for a kept corner and 0 for a dropped one
/// @return the number of kept corners @throw std::bad_alloc; ids and keys are then of no use
unsigned Weld(std::vector<containers::KeyPoint<double>>& points, std::vector<Triangle_Id>& ids,
              std::vector<unsigned>& keys);

} // namespace kelm::tin::load

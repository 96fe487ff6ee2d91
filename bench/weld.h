#pragma once

#include "containers/keypoint.h"

#include <vector>

namespace kelm::bench {

using Corners = std::vector<containers::KeyPoint<double>>;

/// For each corner the first one that it is one with; or, of a competitor, its number among the
/// distinct ones, by first appearance.
using StandIns = std::vector<unsigned>;

/// Corners are one if their bits are. Gives numbers.
StandIns WeldByMeshoptimizer(Corners& rCorners);

} // namespace kelm::bench

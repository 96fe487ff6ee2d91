#pragma once

#include "services/vectorlayer.h"

#include <vector>

namespace kelm::store {

/// What makes a vertex a repeat of the one before it: less than 1e-9 of distance on each axis, in
/// plan or with heights.
enum class Repeat { InPlan, InSpace };

/// @return the corners of a ring without repeats, not closed: the last one is no repeat of the
/// first
std::vector<ZARVertex> CleanRing(const std::vector<ZARVertex>& ring, Repeat repeat);

/// @return the corners and the first one once more
std::vector<ZARVertex> CloseRing(std::vector<ZARVertex> corners);

} // namespace kelm::store

#pragma once

#include "services/vectorlayer.h"

#include <vector>

namespace kelm::store {

/// Does the library cut this ring itself? Four vertices are a triangle, which it takes as it
/// stands.
/// @param vertices closed, four or more, all finite
bool IsTaken(const std::vector<ZARVertex>& vertices);

/// The same for corners of a ring that closes from its last corner to its first, three of which are
/// cut as any other ring.
bool IsCuttable(const std::vector<ZARVertex>& corners);

} // namespace kelm::store

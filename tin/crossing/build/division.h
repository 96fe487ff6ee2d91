#pragma once

#include "tin/crossing/build/reference.h"

#include <cstddef>

namespace kelm::tin::crossing {

/// Divides references between two sides of a node so that a segment seldom meets both.
///
/// The left side fills whole groups, or whole blocks if all fit one group, so that only the last of
/// them is not full. No side of a large set is smaller than a quarter, which bounds the depth. The
/// sides depend on the references alone.
/// @param count above one group, or above one block @param axes 3 to divide in space, 2 in plan
/// @return the size of the left side
std::size_t Divide(Reference* first, std::size_t count, unsigned axes);

} // namespace kelm::tin::crossing

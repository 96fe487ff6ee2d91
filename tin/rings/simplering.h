#pragma once

#include "tin/rings/meeting.h"

namespace kelm::tin::rings {

/// Is a ring simple: do no two edges meet that are not neighbours? By all pairs of edges.
bool TestSimpleByPairs(const Point* points, unsigned count);

/// The same verdict for every ring, by an index over the edges. @throw std::bad_alloc
bool TestSimpleByIndex(const Point* points, unsigned count);

/// The same verdict by the faster of the two. @throw std::bad_alloc
bool TestSimple(const Point* points, unsigned count);

} // namespace kelm::tin::rings

#pragma once

#include "services/rings/cutting/steplimit.h"
#include "services/rings/meeting.h"

#include <vector>

namespace kelm::rings {

/// Is a ring simple, by all pairs of its edges?
template <typename V>
bool IsSimpleByPairs(const V* points, unsigned count) {
    if (count < 4)
        return true;
    const unsigned last = count - 1;
    const V closing[2] = {points[last], points[0]};
    for (unsigned i = 0; i + 2 < count; ++i) {
        const V& a = points[i];
        const V& b = points[i + 1];
        // The closing edge is a neighbour of the first one.
        if (TestMeetsChain(a, b, points + i + 2, last - i - 2) ||
            (i > 0 && TestMeetsChain(a, b, closing, 1)))
            return false;
    }
    return true;
}

/// The same verdict for every ring, by an index over the edges.
/// @param limit after which it goes on without the index @throw std::bad_alloc
bool IsSimpleByIndex(const Point* points, unsigned count, StepLimit limit);

/// @return true if no two edges meet that are not neighbours. Touching is meeting; parallel edges
/// never meet, however much they overlap. @throw std::bad_alloc for a large ring
template <typename V>
bool IsSimple(const V* points, unsigned count) {
    const StepLimit limit = StepLimit::OfRing(count);
    if (limit.IsReached())
        return IsSimpleByPairs(points, count);
    std::vector<Point> corners;
    corners.reserve(count);
    for (unsigned i = 0; i < count; ++i)
        corners.push_back({points[i].x, points[i].y});
    return IsSimpleByIndex(corners.data(), count, limit);
}

} // namespace kelm::rings

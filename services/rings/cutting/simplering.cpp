#include "services/rings/cutting/simplering.h"

#include "services/rings/box.h"
#include "services/rings/cutting/alignededges.h"
#include "services/rings/cutting/edgetree.h"

#include <algorithm>

namespace kelm::rings {

namespace {

/// Coordinates of which no product overflows, and edges of which none vanishes.
bool TestIndexable(const Point* points, unsigned count) {
    const auto isShort = [](const Point& p, const Point& q) {
        return std::fabs(q.x - p.x) < 0x1p-100 && std::fabs(q.y - p.y) < 0x1p-100;
    };
    return std::all_of(points, points + count, TestBounded) &&
           std::adjacent_find(points, points + count, isShort) == points + count;
}

} // namespace

bool IsSimpleByIndex(const Point* points, unsigned count, StepLimit limit) {
    if (count < 4 || !TestIndexable(points, count))
        return IsSimpleByPairs(points, count);
    const unsigned last = count - 1;
    if (TestMeetsChain(points[last], points[0], points + 1, last - 2))
        return false;
    if (EdgeTree(points, last, limit).TestMeet() || TestAlignedMeet(points, last, limit))
        return false;
    return !limit.IsReached() || IsSimpleByPairs(points, count);
}

} // namespace kelm::rings

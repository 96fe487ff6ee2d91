#include "tin/rings/simplering.h"

#include "tin/rings/alignededges.h"
#include "tin/rings/edgetree.h"

#include <algorithm>

namespace kelm::tin::rings {

namespace {

/// Least corners for which the index is faster.
constexpr unsigned LEAST_INDEXED = 257;

/// Does the edge i of a ring meet an edge from i + 2 on? The closing edge is a neighbour of the
/// first one.
bool TestMeetsLater(const Point* points, unsigned count, unsigned i) {
    const unsigned last = count - 1;
    const Point closing[2] = {points[last], points[0]};
    const Point& a = points[i];
    const Point& b = points[i + 1];
    return TestMeetsChain(a, b, points + i + 2, last - i - 2) ||
           (i > 0 && TestMeetsChain(a, b, closing, 1));
}

/// Coordinates of which no product overflows, and edges of which none vanishes.
bool TestIndexable(const Point* points, unsigned count) {
    const auto isBounded = [](const Point& p) {
        return std::fabs(p.x) <= 0x1p400 && std::fabs(p.y) <= 0x1p400;
    };
    const auto isShort = [](const Point& p, const Point& q) {
        return std::fabs(q.x - p.x) < 0x1p-100 && std::fabs(q.y - p.y) < 0x1p-100;
    };
    return std::all_of(points, points + count, isBounded) &&
           std::adjacent_find(points, points + count, isShort) == points + count;
}

} // namespace

bool TestSimpleByPairs(const Point* points, unsigned count) {
    for (unsigned i = 0; i + 2 < count; ++i)
        if (TestMeetsLater(points, count, i))
            return false;
    return true;
}

bool TestSimpleByIndex(const Point* points, unsigned count) {
    if (count < 4 || !TestIndexable(points, count))
        return TestSimpleByPairs(points, count);
    const unsigned last = count - 1;
    return !TestMeetsChain(points[last], points[0], points + 1, last - 2) &&
           !EdgeTree(points, last).TestMeet() && !TestAlignedMeet(points, last);
}

bool TestSimple(const Point* points, unsigned count) {
    return count < LEAST_INDEXED ? TestSimpleByPairs(points, count)
                                 : TestSimpleByIndex(points, count);
}

} // namespace kelm::tin::rings

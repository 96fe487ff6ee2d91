#include "tin/rings/smallring.h"

#include <algorithm>

namespace kelm::tin::rings {

// The arrays are filled as far as there are corners.
SmallRing::SmallRing(const Point* points, unsigned count, bool isForward)
    : mbForward(isForward), mnPoints(count), mnLeft(count) {
    for (unsigned i = 0; i < count; ++i) {
        moRanks[i] = i;
        moBlockers[i] = NONE;
        moX[i] = points[GetPoint(i)].x;
        moY[i] = points[GetPoint(i)].y;
    }
}

/// A cursor that came by every corner twice since the last cut will find no ear.
bool SmallRing::Cut(std::vector<Triangle_Id>& oTriangles) {
    unsigned v = mnLeft - 1;
    unsigned tries = 0;
    while (mnLeft > 2) {
        if (tries++ == 2 * mnLeft)
            return false;
        const unsigned u = mnLeft <= v ? 0 : v;
        v = mnLeft <= u + 1 ? 0 : u + 1;
        const unsigned w = mnLeft <= v + 1 ? 0 : v + 1;
        if (!TestEar(u, v, w))
            continue;
        oTriangles.push_back({GetPoint(u), GetPoint(v), GetPoint(w)});
        Remove(v);
        tries = 0;
    }
    return true;
}

unsigned SmallRing::GetPoint(unsigned position) const {
    return mbForward ? moRanks[position] : mnPoints - 1 - moRanks[position];
}

void SmallRing::Remove(unsigned position) {
    moBlockers[moRanks[position == 0 ? mnLeft - 1 : position - 1]] = NONE;
    moBlockers[moRanks[position + 1 == mnLeft ? 0 : position + 1]] = NONE;
    const auto close = [&](auto& array) {
        std::copy(array.data() + position + 1, array.data() + mnLeft, array.data() + position);
    };
    close(moRanks);
    close(moX);
    close(moY);
    --mnLeft;
}

/// Is the corner at v one that can be cut off between its neighbours at u and w? Another corner in
/// the triangle forbids it, also one at the place of u, v or w: the test goes by position.
///
/// As long as the three are neighbours, corners only go. So one that was found inside forbids the
/// ear until it goes itself, and those passed over on the way to it need no second look.
bool SmallRing::TestEar(unsigned u, unsigned v, unsigned w) {
    const EarTriangle triangle(At(u), At(v), At(w));
    if (!triangle.TestConvex())
        return false;
    unsigned& blocker = moBlockers[moRanks[v]];
    unsigned at = w + 1;
    if (blocker != NONE) {
        const unsigned* const ranks = moRanks.data();
        at = static_cast<unsigned>(std::lower_bound(ranks, ranks + mnLeft, blocker) - ranks);
        if (at < mnLeft && ranks[at] == blocker)
            return false;
    }
    at = FindBlocker(triangle, at, u);
    if (at == u)
        return true;
    blocker = moRanks[at];
    return false;
}

/// @return position of the first corner inside the triangle, in ring order from one position up to
/// u; u if there is none
unsigned SmallRing::FindBlocker(const EarTriangle& triangle, unsigned from, unsigned u) const {
    if (from > u) {
        const unsigned at = FindInside(triangle, from, mnLeft);
        if (at != mnLeft)
            return at;
        from = 0;
    }
    return FindInside(triangle, from, u);
}

/// @return position of the first corner of first .. last-1 inside; last if there is none. Corners
/// are taken in blocks without a branch.
unsigned SmallRing::FindInside(const EarTriangle& triangle, unsigned first, unsigned last) const {
    constexpr unsigned BLOCK = 64;
    const double* const x = moX.data();
    const double* const y = moY.data();
    while (first < last) {
        const unsigned end = std::min(last, first + BLOCK);
        double inside = 0.0; // counted in double, for want of integer lanes of its width
#pragma omp simd reduction(+ : inside)
        for (unsigned i = first; i < end; ++i)
            inside += triangle.TestInside(x[i], y[i]) ? 1.0 : 0.0;
        if (inside != 0.0)
            break;
        first = end;
    }
    while (first < last && !triangle.TestInside(x[first], y[first]))
        ++first;
    return first;
}

} // namespace kelm::tin::rings

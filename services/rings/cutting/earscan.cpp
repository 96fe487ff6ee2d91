#include "services/rings/cutting/earscan.h"

#include <algorithm>

namespace kelm::rings {

/// @return position of the first corner whose rank is not below a bound
unsigned EarScan::FindPosition(unsigned rank) const {
    const unsigned* const ranks = moMemory.ranks;
    return static_cast<unsigned>(std::lower_bound(ranks, ranks + mnLeft, rank) - ranks);
}

void EarScan::Remove(unsigned position) {
    moMemory.blockers[moMemory.ranks[position == 0 ? mnLeft - 1 : position - 1]] = NONE;
    moMemory.blockers[moMemory.ranks[position + 1 == mnLeft ? 0 : position + 1]] = NONE;
    const auto close = [&](auto* array) {
        std::copy(array + position + 1, array + mnLeft, array + position);
    };
    close(moMemory.ranks);
    close(moMemory.x);
    close(moMemory.y);
    --mnLeft;
}

/// Is the corner at v one that can be cut off between its neighbours at u and w? Another corner in
/// the triangle forbids it, also one at the place of u, v or w: the test goes by position.
///
/// As long as the three are neighbours, corners only go. So one that was found inside forbids the
/// ear until it goes itself, and those passed over on the way to it need no second look.
bool EarScan::TestEar(unsigned u, unsigned v, unsigned w) {
    unsigned& blocker = moMemory.blockers[moMemory.ranks[v]];
    unsigned at = w + 1;
    if (blocker != NONE) {
        at = FindPosition(blocker);
        if (at < mnLeft && moMemory.ranks[at] == blocker)
            return false;
    }
    const EarTriangle triangle(At(u), At(v), At(w));
    if (!triangle.TestConvex())
        return false;
    at = FindBlocker(triangle, at, u);
    if (at == u)
        return true;
    blocker = moMemory.ranks[at];
    return false;
}

/// @return position of the first corner inside the triangle, in ring order from one position up to
/// u; u if there is none
unsigned EarScan::FindBlocker(const EarTriangle& triangle, unsigned from, unsigned u) const {
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
unsigned EarScan::FindInside(const EarTriangle& triangle, unsigned first, unsigned last) const {
    constexpr unsigned BLOCK = 64;
    const double* const x = moMemory.x;
    const double* const y = moMemory.y;
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

} // namespace kelm::rings

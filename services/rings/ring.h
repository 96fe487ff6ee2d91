#pragma once

#include <cmath>
#include <limits>

/// When a ring is simple and how it is cut: the rules that the library and the bundled store share.
/// A store must know them, because it cuts what the library would refuse although it is valid. A
/// point is any record with x and y. Not installed: the flags of a program must not reach this
/// arithmetic.
namespace kelm::rings {

/// Points that differ by less than this on both axes, in map units, are one.
template <typename T>
constexpr T REPEAT_TOLERANCE = T(1e-9);

template <typename V>
bool IsRepeat(const V& point, const V& predecessor) {
    const auto dx = point.x - predecessor.x;
    const auto dy = point.y - predecessor.y;
    constexpr auto tolerance = REPEAT_TOLERANCE<decltype(point.x + dx)>;
    return dx > -tolerance && tolerance > dx && dy > -tolerance && tolerance > dy;
}

/// Calls keep(i) for each point that is no repeat. A point is compared with its immediate
/// predecessor, kept or not, so that a chain of close points collapses to its first one.
template <typename V, typename Keep>
void VisitKept(const V* points, unsigned count, const Keep& keep) {
    keep(0U);
    V predecessor = points[0];
    for (unsigned i = 1; i < count; ++i) {
        const V point = points[i];
        if (!IsRepeat(point, predecessor))
            keep(i);
        predecessor = point;
    }
}

/// @return the area of the ring that closes from its last point to its first: positive if it is
/// counter-clockwise with y growing upward
template <typename T, typename V>
T ComputeSignedArea(const V* points, unsigned count) {
    T sum = T(0);
    for (unsigned i = 0; i < count; ++i) {
        const V& p = points[i];
        const V& q = points[i + 1 == count ? 0 : i + 1];
        sum += p.x * q.y - p.y * q.x;
    }
    return sum * T(0.5);
}

/// Does the segment A-B meet one of the segments between consecutive points of a chain? Ends count;
/// parallel segments never meet. Without a branch in the loop, so that pairs are tested side by
/// side.
template <typename T, typename V>
bool TestMeetsChain(const V& a, const V& b, const V* chain, unsigned segments) {
    const T rx = b.x - a.x;
    const T ry = b.y - a.y;
    T meets = T(0); // counted in T, for want of integer lanes of its width
#pragma omp simd reduction(+ : meets)
    for (unsigned j = 0; j < segments; ++j) {
        const T qx = chain[j + 1].x - chain[j].x;
        const T qy = chain[j + 1].y - chain[j].y;
        const T wx = a.x - chain[j].x;
        const T wy = a.y - chain[j].y;
        const T d = rx * qy - qx * ry;
        const T sign = std::copysign(T(1), d);
        const T size = std::fabs(d);
        const T s = (wy * qx - wx * qy) * sign;
        const T t = (wy * rx - wx * ry) * sign;
        const bool meet = !(std::numeric_limits<T>::epsilon() > size) & (T(0) <= s) & (s <= size) &
                          (T(0) <= t) & (t <= size);
        meets += meet ? T(1) : T(0);
    }
    return meets != T(0);
}

/// @return true if no two edges meet that are not neighbours. Touching is meeting; parallel edges
/// never meet, however much they overlap. The time is quadratic in the points.
template <typename T, typename V>
bool IsSimple(const V* points, unsigned count) {
    if (count < 4)
        return true;
    const unsigned last = count - 1;
    const V closing[2] = {points[last], points[0]};
    for (unsigned i = 0; i + 2 < count; ++i) {
        const V& a = points[i];
        const V& b = points[i + 1];
        // The closing edge is a neighbour of the first one.
        if (TestMeetsChain<T>(a, b, points + i + 2, last - i - 2) ||
            (i > 0 && TestMeetsChain<T>(a, b, closing, 1)))
            return false;
    }
    return true;
}

} // namespace kelm::rings

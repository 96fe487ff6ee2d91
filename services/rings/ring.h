#pragma once

/// When a ring is simple and how it is cut: the rules that the library and the bundled store share.
/// A store must know them, because it cuts what the library would refuse although it is valid. A
/// point is any record with x and y in double. Not installed: the flags of a program must not reach
/// this arithmetic.
namespace kelm::rings {

struct Point {
    double x;
    double y;
};

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

} // namespace kelm::rings

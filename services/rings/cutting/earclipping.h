#pragma once

#include "services/rings/cutting/earcutter.h"
#include "services/rings/cutting/earscan.h"

#include <vector>

namespace kelm::rings {

/// Most corners of a ring that is cut without an index, and without memory from the heap.
constexpr unsigned MOST_SCANNED = 256;

/// The corners of a ring counter-clockwise, by rank.
template <typename V>
struct CounterClockwise {
    const V* points;
    unsigned count;
    bool isForward;

    unsigned GetPoint(unsigned rank) const { return isForward ? rank : count - 1 - rank; }
    Point At(unsigned rank) const { return {points[GetPoint(rank)].x, points[GetPoint(rank)].y}; }
};

template <typename Corners, typename Clip>
bool ClipSmallRing(const Corners& corners, const Clip& clip) {
    double x[MOST_SCANNED];
    double y[MOST_SCANNED];
    unsigned ranks[MOST_SCANNED];
    unsigned blockers[MOST_SCANNED];
    EarScan scan({x, y, ranks, blockers});
    for (unsigned i = 0; i < corners.count; ++i)
        scan.Add(corners.At(i), i);
    return scan.Cut(0, clip);
}

template <typename Corners, typename Clip>
bool ClipLargeRing(const Corners& corners, StepLimit limit, const Clip& clip) {
    std::vector<Point> points;
    points.reserve(corners.count);
    for (unsigned i = 0; i < corners.count; ++i)
        points.push_back(corners.At(i));
    return EarCutter(points, limit).Cut(clip);
}

/// Clips the ears of a simple ring of three or more points, and calls clip(u, v, w) for each, in
/// counter-clockwise order. @return false if only corners too flat to cut off remain
/// @throw std::bad_alloc for a large ring
template <typename V, typename Clip>
bool ClipEars(const V* points, unsigned count, const Clip& clip) {
    const CounterClockwise<V> corners{points, count,
                                      ComputeSignedArea<double>(points, count) > 0.0};
    const auto clipPoints = [&](unsigned u, unsigned v, unsigned w) {
        clip(corners.GetPoint(u), corners.GetPoint(v), corners.GetPoint(w));
    };
    return count <= MOST_SCANNED ? ClipSmallRing(corners, clipPoints)
                                 : ClipLargeRing(corners, StepLimit::OfRing(count), clipPoints);
}

} // namespace kelm::rings

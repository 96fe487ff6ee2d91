#include "tin/octree2.h"

#include "tin/parallel/parallelblocks.h"
#include "tin/rules/extent.h"

#include <array>

namespace kelm::tin {

namespace {

using containers::KeyPoint;

constexpr int BOUNDS_THREADS = 4;

/// Keeps the finite points of the root's cell off its faces.
constexpr double MARGIN = 1.0;

/// Range of the finite points on each axis.
struct Extent3 {
    rules::Range<double> x;
    rules::Range<double> y;
    rules::Range<double> z;

    void Add(const KeyPoint<double>& p) {
        x.Add(p.x);
        y.Add(p.y);
        z.Add(p.z);
    }
    void Add(const Extent3& other) {
        x.Add(other.x.low, other.x.high);
        y.Add(other.y.low, other.y.high);
        z.Add(other.z.low, other.z.high);
    }
};

} // namespace

Octree2::Octree2(std::vector<KeyPoint<double>>& points, std::vector<unsigned>& keys) {
    moBounds = ComputeBounds(points);
    for (std::size_t i = 0; i < points.size(); ++i)
        keys[i] = Insert(keys[i], points[i]) ? 1 : 0;
}

Octree2::Box Octree2::ComputeBounds(const std::vector<KeyPoint<double>>& points) {
    std::array<Extent3, BOUNDS_THREADS> extents;
    parallel::ParallelBlocks(static_cast<unsigned>(points.size()), BOUNDS_THREADS,
                             [&](unsigned thread, unsigned begin, unsigned end) {
                                 for (unsigned i = begin; i < end; ++i)
                                     if (IsFinite(points[i]))
                                         extents[thread].Add(points[i]);
                             });
    for (const Extent3& extent : extents)
        extents[0].Add(extent);
    const auto& [x, y, z] = extents[0];
    if (x.low > x.high) // no point is finite
        return {{-MARGIN, -MARGIN, -MARGIN}, {MARGIN, MARGIN, MARGIN}};
    return {{x.low - MARGIN, y.low - MARGIN, z.low - MARGIN},
            {x.high + MARGIN, y.high + MARGIN, z.high + MARGIN}};
}

} // namespace kelm::tin

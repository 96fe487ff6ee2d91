#include "tin/octree2.h"

#include "tin/detail/parallelblocks.h"

#include <algorithm>
#include <array>

namespace kelm::tin {

namespace {

using containers::KeyPoint;

constexpr int BOUNDS_THREADS = 4;

/// Keeps the finite points of the root's cell off its faces.
constexpr double MARGIN = 1.0;

void Extend(containers::OctoTreeNode<double, unsigned>::Box& box, const KeyPoint<double>& p) {
    box.min = {std::min(box.min.x, p.x), std::min(box.min.y, p.y), std::min(box.min.z, p.z)};
    box.max = {std::max(box.max.x, p.x), std::max(box.max.y, p.y), std::max(box.max.z, p.z)};
}

} // namespace

Octree2::Octree2(std::vector<KeyPoint<double>>& points, std::vector<unsigned>& keys) {
    moBounds = ComputeBounds(points);
    for (std::size_t i = 0; i < points.size(); ++i)
        keys[i] = Insert(keys[i], points[i]) ? 1 : 0;
}

Octree2::Box Octree2::ComputeBounds(const std::vector<KeyPoint<double>>& points) {
    const auto first = std::find_if(points.begin(), points.end(), IsFinite);
    const KeyPoint<double> start = first == points.end() ? KeyPoint<double>{} : *first;
    std::array<Box, BOUNDS_THREADS> boxes;
    boxes.fill({start, start});
    detail::ParallelBlocks(static_cast<unsigned>(points.size()), BOUNDS_THREADS,
                           [&](unsigned thread, unsigned begin, unsigned end) {
                               for (unsigned i = begin; i < end; ++i)
                                   if (IsFinite(points[i]))
                                       Extend(boxes[thread], points[i]);
                           });
    for (const Box& box : boxes) {
        Extend(boxes[0], box.min);
        Extend(boxes[0], box.max);
    }
    const auto& [low, high] = boxes[0];
    return {{low.x - MARGIN, low.y - MARGIN, low.z - MARGIN},
            {high.x + MARGIN, high.y + MARGIN, high.z + MARGIN}};
}

} // namespace kelm::tin

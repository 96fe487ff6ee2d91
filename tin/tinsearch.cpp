#include "tin/tin.h"

#include "tin/aabbtree.h"
#include "tin/detail/leafwalk.h"
#include "tin/detail/parallelscan.h"
#include "tin/detail/pointprobe.h"

#include <limits>

namespace kelm::tin {

namespace {

constexpr float LOWEST = -std::numeric_limits<float>::max();

/// The height rule: the greatest wins, and a NaN replaces nothing.
void KeepHighest(const Triangle& triangle, float x, float y, float& height) {
    float h;
    if (triangle.GetHeight(x, y, h) && h > height)
        height = h;
}

} // namespace

bool Tin::GetHeight(const float& x, const float& y, float& height, const AabbTree* tree) const {
    if (!TestInside(moBBox, x, y))
        return false;
    float highest = LOWEST;
    if (tree != nullptr) {
        const detail::PointProbe probe(x, y);
        const auto holds = [=](const BBox<float, point2_t<float>>& box) { return probe.IsIn(box); };
        detail::VisitLeaves(tree->GetRoot(), holds, [&](const std::vector<unsigned>& leaves) {
            for (const unsigned id : leaves)
                if (holds(mpoTriangles[id].GetBBox()))
                    KeepHighest(mpoTriangles[id], x, y, highest);
        });
    } else {
        std::vector<unsigned> list;
        FindTrianglesByPoint(x, y, list, nullptr);
        for (const unsigned id : list)
            KeepHighest(mpoTriangles[id], x, y, highest);
    }
    height = highest;
    return height > LOWEST;
}

bool Tin::GetHeight(const double& x, const double& y, float& height, const AabbTree* tree) const {
    const float xf = static_cast<float>(x - mdfXBase);
    const float yf = static_cast<float>(y - mdfYBase);
    return GetHeight(xf, yf, height, tree);
}

void Tin::FindTrianglesByPoint(const float& x, const float& y, std::vector<unsigned>& result,
                               const AabbTree* tree) const {
    const detail::PointProbe probe(x, y);
    const auto isNear = [probe, triangles = mpoTriangles](unsigned id) {
        return probe.IsIn(triangles[id].GetBBox());
    };
    const auto holds = [this, isNear, x, y](unsigned id) {
        return isNear(id) && mpoTriangles[id].IsPointInsideLT(x, y);
    };
    if (tree == nullptr) {
        detail::ParallelScan(mnTriangles, mnThreads, holds, result, isNear);
        return;
    }
    tree->FindLeaves(x, y, result);
    std::vector<unsigned> inside;
    for (const unsigned id : result)
        if (holds(id))
            inside.push_back(id);
    result.swap(inside);
}

void Tin::FindTrianglesByRegion(const BBox<float, point2_t<float>>& region,
                                std::vector<unsigned>& result, const AabbTree* tree) const {
    if (tree != nullptr)
        tree->FindLeaves(region, result);
    else
        detail::ParallelScan(
            mnTriangles, mnThreads,
            [&](unsigned id) { return mpoTriangles[id].IsIntersected(region); }, result);
}

} // namespace kelm::tin

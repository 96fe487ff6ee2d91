#include "tin/heightgrid/survey.h"

#include "tin/parallel/parallelbatch.h"
#include "tin/rules/barycentric.h"
#include "tin/rules/exactplan.h"

#include <algorithm>
#include <cmath>
#include <limits>

namespace kelm::tin::heightgrid {

namespace {

constexpr double INFINITE = std::numeric_limits<double>::infinity();
constexpr Region EVERYWHERE{-INFINITE, INFINITE, -INFINITE, INFINITE};

/// A side of the grid, in cells. A NaN is one cell.
std::uint32_t ToCellCount(double cells) {
    return cells > 1.0 ? static_cast<std::uint32_t>(
                             std::min(cells, static_cast<double>(index::CellAxis::MOST)))
                       : 1U;
}

bool IsExact(const BBox<float, point2_t<float>>& box, const point3_t<float>& v0,
             const point3_t<float>& v1, const point3_t<float>& v2) {
    return box.min.x == std::min({v0.x, v1.x, v2.x}) && box.max.x == std::max({v0.x, v1.x, v2.x}) &&
           box.min.y == std::min({v0.y, v1.y, v2.y}) && box.max.y == std::max({v0.y, v1.y, v2.y});
}

bool IsFinite(const point3_t<float>& v) {
    return std::isfinite(v.x) && std::isfinite(v.y);
}

/// By the determinant and the vertices, whatever the box.
Holding FindHoldingByWeights(const point3_t<float>& v0, const point3_t<float>& v1,
                             const point3_t<float>& v2) {
    if (std::isnan(v0.z) || std::isnan(v1.z) || std::isnan(v2.z))
        return HOLDS_NOTHING; // the height is NaN, whatever the weights
    const rules::Barycentric barycentric(v0, v1, v2);
    const double det = barycentric.GetDeterminant();
    if (std::isfinite(det)) {
        const bool isLine = barycentric.IsFlat() &&
                            rules::GetTwiceArea({v0.x, v0.y}, {v1.x, v1.y}, {v2.x, v2.y}) == 0.0;
        return isLine ? HOLDS_NOTHING : HOLDS_PLAINLY;
    }
    // A determinant that is NaN makes every height NaN, and leaves the closed rule.
    const bool isClosed = IsFinite(v0) && IsFinite(v1) && IsFinite(v2);
    return std::isnan(det) && !isClosed ? HOLDS_NOTHING : HOLDS_ODDLY;
}

} // namespace

Holding FindHolding(const Triangle& triangle) {
    const BBox<float, point2_t<float>>& box = triangle.GetBBox();
    // A NaN bound holds no position.
    if (triangle.GetVertex(0) == nullptr || !(box.max.x >= box.min.x && box.max.y >= box.min.y))
        return HOLDS_NOTHING;
    const point3_t<float>& v0 = *triangle.GetVertex(0);
    const point3_t<float>& v1 = *triangle.GetVertex(1);
    const point3_t<float>& v2 = *triangle.GetVertex(2);
    const Holding holding = FindHoldingByWeights(v0, v1, v2);
    return holding == HOLDS_PLAINLY && !IsExact(box, v0, v1, v2) ? HOLDS_ODDLY : holding;
}

void BoxSizes::Add(const BBox<float, point2_t<float>>& box, const Region& region) {
    const double xFrom = std::max(static_cast<double>(box.min.x), region.xFrom);
    const double xTo = std::min(static_cast<double>(box.max.x), region.xTo);
    const double yFrom = std::max(static_cast<double>(box.min.y), region.yFrom);
    const double yTo = std::min(static_cast<double>(box.max.y), region.yTo);
    ++mnCount;
    mdfWidth += std::max(0.0, xTo - xFrom);
    mdfHeight += std::max(0.0, yTo - yFrom);
    moExtent.x.Add(xFrom, xTo);
    moExtent.y.Add(yFrom, yTo);
}

void BoxSizes::Add(const BoxSizes& other) {
    mnCount += other.mnCount;
    mdfWidth += other.mdfWidth;
    mdfHeight += other.mdfHeight;
    moExtent.x.Add(other.moExtent.x.low, other.moExtent.x.high);
    moExtent.y.Add(other.moExtent.y.low, other.moExtent.y.high);
}

index::CellFrame BoxSizes::ChooseFrame(double wanted) const {
    if (mnCount == 0)
        return {};
    // Least side of a cell, in mean boxes.
    constexpr double LEAST = 0.5;
    const double count = static_cast<double>(mnCount);
    const double across = (moExtent.x.high - moExtent.x.low) / (mdfWidth / count);
    const double along = (moExtent.y.high - moExtent.y.low) / (mdfHeight / count);
    const double side = std::max(LEAST, std::sqrt(across * along / wanted));
    const auto makeAxis = [](const rules::Range<double>& range, double cells) {
        const auto low = static_cast<float>(range.low);
        const auto high = static_cast<float>(range.high);
        return index::CellAxis(low, high, high > low ? ToCellCount(cells) : 1U);
    };
    // Where one axis takes fewer cells than its share, the other takes no more for it.
    return {makeAxis(moExtent.x, std::min(across / side, wanted)),
            makeAxis(moExtent.y, std::min(along / side, wanted))};
}

Survey::Survey(const Tin& tin, int threads, index::Meter& rMeter)
    : oHoldings(tin.GetTriangleCount()) {
    Triangle* triangles;
    unsigned count;
    tin.GetTriangleList(triangles, count);
    std::vector<Part> parts((count + std::size_t{BLOCK} - 1) / BLOCK);
    parallel::ParallelBatch(parts.size(), 1, threads, [&](std::size_t first, std::size_t last) {
        for (; first < last; ++first) {
            AddBlock(triangles, first, parts[first]);
            rMeter.Count();
        }
    });
    // In the order of the blocks, so that the sums are the same on any number of threads.
    for (const Part& part : parts) {
        oIds.insert(oIds.end(), part.oIds.begin(), part.oIds.end());
        oSizes.Add(part.oSizes);
    }
}

void Survey::AddBlock(const Triangle* triangles, std::size_t block, Part& rPart) {
    const std::size_t first = block * BLOCK;
    const std::size_t last = std::min(first + BLOCK, oHoldings.size());
    rPart.oIds.reserve(last - first);
    for (std::size_t i = first; i < last; ++i) {
        oHoldings[i] = FindHolding(triangles[i]);
        if (oHoldings[i] == HOLDS_NOTHING)
            continue;
        rPart.oIds.push_back(static_cast<unsigned>(i));
        rPart.oSizes.Add(triangles[i].GetBBox(), EVERYWHERE);
    }
}

} // namespace kelm::tin::heightgrid

#include "services/bundled/shapeids.h"

#include <algorithm>
#include <limits>

namespace kelm::store {

namespace {

constexpr std::int64_t knMostIds = std::int64_t{std::numeric_limits<int>::max()} + 1;

} // namespace

void ShapeIds::AddFeature(std::int64_t nFeature, std::size_t nFacets) {
    mbRising = mbRising && nFeature > mnLastFeature;
    mnLastFeature = std::max(mnLastFeature, nFeature);
    mnMostFacets = std::max(mnMostFacets, static_cast<std::int64_t>(nFacets));
    mnShapes += static_cast<std::int64_t>(nFacets);
}

void ShapeIds::Choose() {
    std::int64_t nFactor = 1;
    while (nFactor < mnMostFacets)
        nFactor *= 10;
    mnFactor = mbRising && mnLastFeature < knMostIds / nFactor ? nFactor : 0;
}

int ShapeIds::GetId(std::int64_t nFeature, std::size_t nFacet, std::int64_t nShape) const {
    const auto nPart = static_cast<std::int64_t>(nFacet);
    if (nShape > mnShapes)
        return -1;
    if (mnFactor == 0)
        return static_cast<int>(nShape);
    if (nFeature < 0 || nFeature > mnLastFeature || nPart >= mnFactor)
        return -1;
    return static_cast<int>(nFeature * mnFactor + nPart);
}

} // namespace kelm::store

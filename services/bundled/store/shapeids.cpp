#include "services/bundled/store/shapeids.h"

#include <algorithm>
#include <limits>

namespace kelm::store {

namespace {

constexpr std::int64_t MOST_IDS = std::int64_t{std::numeric_limits<int>::max()} + 1;

} // namespace

void ShapeIds::AddFeature(std::int64_t feature, std::size_t facets) {
    mbRising = mbRising && feature > mnLastFeature;
    mnLastFeature = std::max(mnLastFeature, feature);
    mnMostFacets = std::max(mnMostFacets, static_cast<std::int64_t>(facets));
    mnShapes += static_cast<std::int64_t>(facets);
}

void ShapeIds::Choose() {
    std::int64_t factor = 1;
    while (factor < mnMostFacets)
        factor *= 10;
    mnFactor = mbRising && mnLastFeature < MOST_IDS / factor ? factor : 0;
}

int ShapeIds::GetId(std::int64_t feature, std::size_t facet, std::int64_t shape) const {
    const auto part = static_cast<std::int64_t>(facet);
    if (shape > mnShapes)
        return -1;
    if (mnFactor == 0)
        return static_cast<int>(shape);
    if (feature < 0 || feature > mnLastFeature || part >= mnFactor)
        return -1;
    return static_cast<int>(feature * mnFactor + part);
}

void ShapeIds::Write(ByteWriter& bytes) const {
    bytes.Put(mnLastFeature);
    bytes.Put(mnShapes);
    bytes.Put(mnFactor);
}

bool ShapeIds::Read(ByteReader& bytes) {
    mnLastFeature = bytes.Get<std::int64_t>();
    mnShapes = bytes.Get<std::int64_t>();
    mnFactor = bytes.Get<std::int64_t>();
    return mnFactor == 0 || (mnFactor > 0 && mnLastFeature < MOST_IDS / mnFactor);
}

} // namespace kelm::store

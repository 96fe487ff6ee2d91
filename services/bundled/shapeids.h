#pragma once

#include <cstdint>

namespace kelm::store {

/// How the shapes of a layer are numbered. Feature ids have 64 bits and come in any order, a
/// feature can hold many facets, and a shape id is an int that no table may be needed for.
///
/// With feature ids that rise in reading order and are not too large, the shape id is
///     feature id * f + number of the facet in its feature, counted from 0,
/// where f is the least power of ten that no feature has more facets than: 1 if each has one, and
/// then the shape id is the feature id. With f = 100, shape 4702 is the third facet of feature 47.
/// Otherwise the shape id is the number of the shape in reading order, counted from 1. Either way
/// shape ids rise in reading order.
class ShapeIds {
  public:
    /// Takes note of the next feature in reading order.
    void AddFeature(std::int64_t nFeature, std::size_t nFacets);
    /// Chooses the numbering, behind the last feature.
    void Choose();

    /// @return f, or 0 if shapes are numbered in reading order
    std::int64_t GetFactor() const { return mnFactor; }
    /// @param nFacet  number of the facet in the feature, from 0
    /// @param nShape  number of the shape in the layer, from 1; one that Choose knew fits an int
    /// @return the shape id, or -1 if the layer held no such shape when it was opened
    int GetId(std::int64_t nFeature, std::size_t nFacet, std::int64_t nShape) const;

  private:
    bool mbRising = true;
    std::int64_t mnLastFeature = -1;
    std::int64_t mnMostFacets = 1;
    std::int64_t mnShapes = 0;
    std::int64_t mnFactor = 0;
};

} // namespace kelm::store

#pragma once

#include "services/bundled/store/runs/bytes.h"

#include <cstdint>

namespace kelm::store {

/// The rule that numbers the shapes of a layer.
///
/// Feature ids have 64 bits and come in any order, and a feature can hold many facets. A shape id
/// must fit in an int and must not need a lookup table.
///
/// If the feature ids rise in reading order and are not too large, the shape id is
///     feature id * f + number of the facet in its feature, counted from 0,
/// where f is the least power of ten such that no feature has more than f facets. If each feature
/// has one facet, f is 1 and the shape id is the feature id. With f = 100, shape 4702 is the third
/// facet of feature 47.
///
/// Otherwise the shape id is the number of the shape in reading order, counted from 1. Either way
/// shape ids rise in reading order.
class ShapeIds {
  public:
    /// Takes note of the next feature in reading order. @param facets the number of its facets
    void AddFeature(std::int64_t feature, std::size_t facets);
    /// Chooses the numbering. Called once, behind the last feature.
    void Choose();

    /// @return f, or 0 if shapes are numbered in reading order
    std::int64_t GetFactor() const { return mnFactor; }
    /// @param facet number of the facet in the feature, from 0
    /// @param shape number of the shape in the layer, from 1. The layer's shapes must be no more
    /// than an int counts
    /// @return the shape id, or -1 if the layer held no such shape when it was opened
    int GetId(std::int64_t feature, std::size_t facet, std::int64_t shape) const;

    void Write(ByteWriter& bytes) const;
    /// @return false if no layer has such ids
    bool Read(ByteReader& bytes);

  private:
    bool mbRising = true;
    std::int64_t mnLastFeature = -1;
    std::int64_t mnMostFacets = 1;
    std::int64_t mnShapes = 0;
    std::int64_t mnFactor = 0;
};

} // namespace kelm::store

#pragma once

#include "services/bundled/store/facets/facetlist.h"
#include "services/bundled/store/features/featurereader.h"

#include <cstdint>

namespace kelm::store {

/// A walk over the facets of a layer, in reading order.
class LayerWalk {
  public:
    /// @param dataset owns the layer, and outlives this walk. @throw kelm::DataException
    LayerWalk(Dataset& dataset, OGRLayer& layer) : moReader(dataset, layer) {}

    /// Goes back to the position in front of the first facet.
    void Restart();
    /// Goes to the position in front of a run, behind which Advance gives false. The facets must
    /// know which polygons are whole, and the reader must have runs.
    void Restart(const FeatureRun& run);
    /// Moves to the next facet. @return false behind the last one
    /// @throw kelm::DataException if the layer cannot be read on; Restart must come next
    bool Advance();

    // Questions about the facet that the last Advance has found.
    const Facet& GetFacet() const { return mbTriangle ? moTriangle : moFacets.Get(mnFacet); }
    /// @return the number of the facet in its feature, from 0
    std::size_t GetFacetNumber() const { return mnFacet; }
    /// @return the number of facets of its feature
    std::size_t GetFacetCount() const { return mbTriangle ? 1 : moFacets.GetCount(); }
    /// @return the polygons in front of its feature that are no triangles
    std::size_t GetPolygonsInFront() const { return moFacets.GetPolygonsInFront(); }
    /// @return the id of its feature
    std::int64_t GetFeature() const { return mnFeature; }

    /// @return the number of the facet in the layer, from 1
    std::int64_t GetShapes() const { return mnShapes; }
    FacetList& GetFacets() { return moFacets; }
    const FacetList& GetFacets() const { return moFacets; }
    FeatureReader& GetReader() { return moReader; }
    const FeatureReader& GetReader() const { return moReader; }

  private:
    bool ReadFeature();

    FeatureReader moReader;
    FacetList moFacets;
    Facet moTriangle;        ///< the only facet of a feature that is a triangle
    bool mbTriangle = false; ///< the feature is one
    std::size_t mnFacet = 0;
    std::int64_t mnFeature = 0;
    std::int64_t mnShapes = 0;
};

} // namespace kelm::store

#pragma once

#include "services/bundled/store/facets/facetfault.h"

#include <ogr_geometry.h>

#include <memory>
#include <vector>

namespace kelm::store {

/// One facet of a geometry, or the fault that stands in its place.
struct Facet {
    const OGRSimpleCurve* mpoRing = nullptr; ///< null if there is a fault
    FacetFault meFault = FacetFault::None;
};

/// The facets of one geometry, in reading order.
///
/// Polygons, multi polygons, triangles, TINs, polyhedral surfaces and collections of them, however
/// nested, give one facet for each polygon. Curved polygons are linearised. Anything else gives one
/// facet with a fault, so each geometry has at least one facet.
class FacetList {
  public:
    /// Replaces the list. @param geometry may be null; must outlive the list's contents
    void Assign(const OGRGeometry* geometry);
    void Clear();

    std::size_t GetCount() const { return moFacets.size(); }
    const Facet& Get(std::size_t number) const { return moFacets[number]; }

  private:
    void Visit(const OGRGeometry& geometry);
    void AddPolygon(const OGRCurvePolygon& polygon);
    void AddCurved(const OGRGeometry& curved);
    template <class Parts>
    void AddParts(const Parts& parts);
    void AddFault(FacetFault fault);

    std::vector<Facet> moFacets;
    /// Geometries still to be visited, the next one last: nesting costs no call depth.
    std::vector<const OGRGeometry*> moPending;
    std::vector<std::unique_ptr<OGRGeometry>> moLinearised;
};

} // namespace kelm::store

#pragma once

#include "services/bundled/store/facets/cutting/facetcutter.h"
#include "services/bundled/store/facets/facetfault.h"
#include "services/vectorlayer.h"

#include <ogr_geometry.h>

#include <deque>
#include <memory>
#include <utility>
#include <vector>

namespace kelm::store {

/// One facet of a geometry, or what stands in its place.
struct Facet {
    const OGRSimpleCurve* mpoRing = nullptr; ///< the outer ring that is stored, if there is one
    /// What is delivered in place of the ring; null if the ring is delivered as it is stored.
    const ZARVertex* mpVertices = nullptr;
    std::size_t mnVertices = 0;
    /// Why it cannot be used, told in the first walk over the layer. A ring without holes is
    /// delivered all the same, and the library refuses it.
    FacetFault meFault = FacetFault::None;
    bool mbDelivered = true;
    double mdfRefusedArea = 0.0; ///< in plan, of a polygon that cannot be used
    bool mbFlat = false;         ///< stored without heights

    void SetVertices(const ZARVertex* vertices, std::size_t count) {
        mpVertices = vertices;
        mnVertices = count;
    }
};

/// The facets of one geometry, in reading order.
///
/// Polygons, multi polygons, triangles, TINs, polyhedral surfaces and collections of them, however
/// nested, give one facet for each polygon. Curved polygons are linearised. A polygon that the
/// library would refuse although it is valid gives the facets that a FacetCutter makes of it.
/// Anything else gives one facet with a fault, so each geometry has at least one facet.
///
/// Which polygons are delivered as they are stored is found out in the first walk over a layer and
/// kept: a bit for each polygon that is no triangle.
class FacetList {
  public:
    /// Replaces the list. @param geometry may be null; must outlive the list's contents
    void Assign(const OGRGeometry* geometry);
    void Clear();
    /// Goes to the position behind so many polygons that are no triangles: 0 for the layer's first
    /// geometry.
    void Restart(std::size_t polygons);
    /// Empties the list for a geometry that is a triangle and is not listed here.
    void SkipTriangle() {
        if (!moFacets.empty())
            Clear();
        mnInFront = mnPolygon;
    }
    /// @return the polygons of the layer in front of the geometry that are no triangles
    std::size_t GetPolygonsInFront() const { return mnInFront; }

    /// @return a bit for each polygon of the layer that is no triangle: delivered as it is stored?
    const std::vector<bool>& GetWhole() const { return moWhole; }
    /// Takes the bits that an earlier walk over the layer has found.
    void SetWhole(std::vector<bool> whole) { moWhole = std::move(whole); }

    std::size_t GetCount() const { return moFacets.size(); }
    const Facet& Get(std::size_t number) const { return moFacets[number]; }

  private:
    void Visit(const OGRGeometry& geometry);
    void AddPolygon(const OGRCurvePolygon& polygon);
    void AddCurved(const OGRGeometry& curved);
    template <class Parts>
    void AddParts(const Parts& parts);
    void AddFault(FacetFault fault);
    bool IsWhole(const OGRCurvePolygon& polygon);
    void AddCut(const OGRCurvePolygon& polygon);

    std::vector<Facet> moFacets;
    std::deque<std::vector<ZARVertex>> moMade;
    FacetCutter moCutter;
    std::vector<bool> moWhole; ///< by number of the polygon: delivered as it is stored?
    std::size_t mnPolygon = 0; ///< those met since the start that are no triangles
    std::size_t mnInFront = 0; ///< of them, those in front of the geometry
    /// Geometries still to be visited, the next one last: nesting costs no call depth.
    std::vector<const OGRGeometry*> moPending;
    std::vector<std::unique_ptr<OGRGeometry>> moLinearised;
};

/// Copies what is delivered of a facet. @param vertices replaced @return None, or why nothing is
FacetFault ReadFacet(const Facet& facet, std::vector<ZARVertex>& vertices);

} // namespace kelm::store

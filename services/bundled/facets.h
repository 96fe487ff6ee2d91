#pragma once

#include "services/vectorlayer.h"

#include <ogr_geometry.h>

#include <memory>
#include <vector>

namespace kelm::store {

/// Why a facet cannot be delivered as a ring.
enum class FacetFault {
    None,
    NoGeometry, ///< the feature has none
    Empty,      ///< a geometry without a part or without a vertex
    Point,      ///< points, which bound no facet
    Line,       ///< lines, which bound no facet
    Curve,      ///< a curved polygon that cannot be linearised
    Holes,      ///< a polygon with inner rings
    FewCorners, ///< a ring that encloses nothing: fewer than three corners
    NotFinite   ///< an ordinate that is NaN or infinite
};

/// @return the fault in words, such as "a polygon with holes"
const char* GetFaultText(FacetFault eFault);

/// One facet of a geometry, or what stands in its place.
struct Facet {
    const OGRSimpleCurve* mpoRing = nullptr; ///< null if there is a fault
    FacetFault meFault = FacetFault::None;
};

/// The facets of one geometry, in reading order. Polygons, multi polygons, triangles, TINs,
/// polyhedral surfaces and collections of them, however nested, give one facet for each polygon;
/// curved polygons are linearised. Anything else gives one facet with a fault, so that each
/// geometry has one at least.
class FacetList {
  public:
    /// Replaces the list. @param poGeometry may be null; must outlive the list's contents
    void Assign(const OGRGeometry* poGeometry);
    void Clear();

    std::size_t GetCount() const { return moFacets.size(); }
    const Facet& Get(std::size_t nFacet) const { return moFacets[nFacet]; }

  private:
    void Visit(const OGRGeometry& oGeometry);
    void AddPolygon(const OGRCurvePolygon& oPolygon);
    void AddCurved(const OGRGeometry& oCurved);
    template <class Parts>
    void AddParts(const Parts& oParts);
    void AddFault(FacetFault eFault);

    std::vector<Facet> moFacets;
    /// Geometries still to be visited, the next one last: nesting costs no call depth.
    std::vector<const OGRGeometry*> moPending;
    std::vector<std::unique_ptr<OGRGeometry>> moLinearised;
};

/// Copies a ring in stored order and direction and closes it if it is not closed in plan. A ring
/// without heights gets 0. @param oVertices replaced @return None, FewCorners or NotFinite
FacetFault ReadRing(const OGRSimpleCurve& oRing, std::vector<ZARVertex>& oVertices);

} // namespace kelm::store

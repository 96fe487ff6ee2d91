#include "services/bundled/store/facets/facetlist.h"

#include "services/bundled/store/facets/cutting/takenring.h"
#include "services/bundled/store/facets/ring.h"
#include "services/bundled/store/features/vertices.h"
#include "services/bundled/store/gdal/gdalcall.h"

#include <algorithm>
#include <array>
#include <utility>

namespace kelm::store {

namespace {

/// A triangle that is stored as the library takes it.
bool IsTriangle(const OGRCurvePolygon& polygon, const OGRSimpleCurve& ring) {
    if (polygon.getNumInteriorRings() != 0 || ring.getNumPoints() != 4)
        return false;
    std::array<ZARVertex, 4> vertices;
    CopyVertices(ring, vertices.data());
    return IsClosedInSpace(vertices.front(), vertices.back());
}

/// A facet that is delivered as it is stored.
Facet CreateFacet(const OGRSimpleCurve& ring) {
    Facet facet;
    facet.mpoRing = &ring;
    facet.mbFlat = !ring.Is3D();
    return facet;
}

/// @return the rings that have points
FacetCutter::Polygon CopyRings(const OGRCurvePolygon& polygon) {
    FacetCutter::Polygon rings(1);
    CopyVertices(*polygon.getExteriorRingCurve()->toSimpleCurve(), rings.front());
    for (int hole = 0; hole < polygon.getNumInteriorRings(); ++hole)
        if (const OGRCurve* ring = polygon.getInteriorRingCurve(hole); !ring->IsEmpty())
            CopyVertices(*ring->toSimpleCurve(), rings.emplace_back());
    return rings;
}

/// A ring of three corners and one above or below the first is closed in plan. If the corners stand
/// upright, it is a quadrangle that is not closed.
bool IsOpenWall(const std::vector<ZARVertex>& vertices) {
    const ZARVertex& p = vertices[0];
    const ZARVertex& q = vertices[1];
    const ZARVertex& r = vertices[2];
    return vertices.size() == 4 && vertices[3].z != p.z &&
           (q.x - p.x) * (r.y - p.y) - (q.y - p.y) * (r.x - p.x) == 0.0;
}

} // namespace

void FacetList::Assign(const OGRGeometry* geometry) {
    Clear();
    mnInFront = mnPolygon;
    if (!geometry)
        return AddFault(FacetFault::NoGeometry);
    Visit(*geometry);
    while (!moPending.empty()) {
        const OGRGeometry* next = moPending.back();
        moPending.pop_back();
        Visit(*next);
    }
}

void FacetList::Clear() {
    moFacets.clear();
    moPending.clear();
    moLinearised.clear();
    moMade.clear();
}

void FacetList::Restart(std::size_t polygons) {
    Clear();
    mnPolygon = polygons;
}

void FacetList::Visit(const OGRGeometry& geometry) {
    switch (wkbFlatten(geometry.getGeometryType())) {
    case wkbPolygon:
    case wkbTriangle:
        return AddPolygon(*geometry.toCurvePolygon());
    case wkbCurvePolygon:
        return AddCurved(geometry);
    case wkbMultiPolygon:
    case wkbMultiSurface:
    case wkbGeometryCollection:
        return AddParts(*geometry.toGeometryCollection());
    case wkbPolyhedralSurface:
    case wkbTIN:
        return AddParts(*geometry.toPolyhedralSurface());
    default:
        return AddFault(geometry.getDimension() > 0 ? FacetFault::Line : FacetFault::Point);
    }
}

void FacetList::AddPolygon(const OGRCurvePolygon& polygon) {
    const OGRCurve* ring = polygon.getExteriorRingCurve();
    if (!ring || ring->IsEmpty())
        return AddFault(FacetFault::Empty);
    if (!IsTriangle(polygon, *ring->toSimpleCurve()) && !IsWhole(polygon))
        return AddCut(polygon);
    moFacets.push_back(CreateFacet(*ring->toSimpleCurve()));
}

bool FacetList::IsWhole(const OGRCurvePolygon& polygon) {
    if (mnPolygon == moWhole.size()) {
        std::vector<ZARVertex> vertices;
        const bool usable = ReadRing(*polygon.getExteriorRingCurve()->toSimpleCurve(), vertices) ==
                            FacetFault::None;
        moWhole.push_back(polygon.getNumInteriorRings() == 0 && usable && !IsOpenWall(vertices) &&
                          IsTaken(vertices));
    }
    return moWhole[mnPolygon++];
}

void FacetList::AddCut(const OGRCurvePolygon& polygon) {
    const OGRSimpleCurve* ring = polygon.getExteriorRingCurve()->toSimpleCurve();
    const FacetCutter::Polygon rings = CopyRings(polygon);
    if (!std::all_of(rings.begin(), rings.end(), AreFinite))
        return AddFault(FacetFault::NotFinite);
    const FacetFault fault = moCutter.Cut(rings, [&](std::vector<ZARVertex> made) {
        moMade.push_back(std::move(made));
        moFacets.push_back(CreateFacet(*ring));
        moFacets.back().SetVertices(moMade.back().data(), moMade.back().size());
    });
    if (fault == FacetFault::None)
        return;
    Facet facet = CreateFacet(*ring);
    facet.meFault = fault;
    facet.mbDelivered = rings.size() == 1;
    facet.mdfRefusedArea = moCutter.GetArea();
    moFacets.push_back(facet);
    // The reason was told. Later walks need not look for it again.
    moWhole[mnPolygon - 1] = rings.size() == 1;
}

void FacetList::AddCurved(const OGRGeometry& curved) {
    const GdalCall call;
    std::unique_ptr<OGRGeometry> linear(curved.getLinearGeometry());
    if (!linear || wkbFlatten(linear->getGeometryType()) != wkbPolygon)
        return AddFault(FacetFault::Curve);
    AddPolygon(*linear->toCurvePolygon());
    moLinearised.push_back(std::move(linear));
}

template <class Parts>
void FacetList::AddParts(const Parts& parts) {
    const int count = parts.getNumGeometries();
    if (count == 0)
        return AddFault(FacetFault::Empty);
    for (int part = count - 1; part >= 0; --part)
        moPending.push_back(parts.getGeometryRef(part));
}

void FacetList::AddFault(FacetFault fault) {
    Facet facet;
    facet.meFault = fault;
    facet.mbDelivered = false;
    moFacets.push_back(facet);
}

FacetFault ReadFacet(const Facet& facet, std::vector<ZARVertex>& vertices) {
    if (!facet.mbDelivered)
        return facet.meFault;
    if (facet.mpVertices == nullptr)
        return ReadRing(*facet.mpoRing, vertices);
    vertices.assign(facet.mpVertices, facet.mpVertices + facet.mnVertices);
    return FacetFault::None;
}

} // namespace kelm::store

#include "services/bundled/facets.h"

#include "services/bundled/gdalcall.h"

#include <cmath>
#include <utility>

namespace kelm::store {

namespace {

bool IsFinite(const ZARVertex& oVertex) {
    return std::isfinite(oVertex.x) && std::isfinite(oVertex.y) && std::isfinite(oVertex.z);
}

/// Heights take no part: a ring that ends above its start is closed in plan, and another vertex
/// would make a quadrangle of a triangle.
bool IsClosed(const std::vector<ZARVertex>& oVertices) {
    return oVertices.front().x == oVertices.back().x && oVertices.front().y == oVertices.back().y;
}

} // namespace

const char* GetFaultText(FacetFault eFault) {
    switch (eFault) {
    case FacetFault::NoGeometry:
        return "no geometry";
    case FacetFault::Empty:
        return "an empty geometry";
    case FacetFault::Point:
        return "points instead of a polygon";
    case FacetFault::Line:
        return "lines instead of a polygon";
    case FacetFault::Curve:
        return "a curved polygon that cannot be linearised";
    case FacetFault::Holes:
        return "a polygon with holes";
    case FacetFault::FewCorners:
        return "a ring of fewer than three corners";
    case FacetFault::NotFinite:
        return "an ordinate that is not a finite number";
    case FacetFault::None:
        break;
    }
    return "no fault";
}

void FacetList::Assign(const OGRGeometry* poGeometry) {
    Clear();
    if (!poGeometry)
        return AddFault(FacetFault::NoGeometry);
    Visit(*poGeometry);
    while (!moPending.empty()) {
        const OGRGeometry* poNext = moPending.back();
        moPending.pop_back();
        Visit(*poNext);
    }
}

void FacetList::Clear() {
    moFacets.clear();
    moPending.clear();
    moLinearised.clear();
}

void FacetList::Visit(const OGRGeometry& oGeometry) {
    switch (wkbFlatten(oGeometry.getGeometryType())) {
    case wkbPolygon:
    case wkbTriangle:
        return AddPolygon(*oGeometry.toCurvePolygon());
    case wkbCurvePolygon:
        return AddCurved(oGeometry);
    case wkbMultiPolygon:
    case wkbMultiSurface:
    case wkbGeometryCollection:
        return AddParts(*oGeometry.toGeometryCollection());
    case wkbPolyhedralSurface:
    case wkbTIN:
        return AddParts(*oGeometry.toPolyhedralSurface());
    default:
        return AddFault(oGeometry.getDimension() > 0 ? FacetFault::Line : FacetFault::Point);
    }
}

void FacetList::AddPolygon(const OGRCurvePolygon& oPolygon) {
    const OGRCurve* poRing = oPolygon.getExteriorRingCurve();
    if (!poRing || poRing->IsEmpty())
        AddFault(FacetFault::Empty);
    else if (oPolygon.getNumInteriorRings() > 0)
        AddFault(FacetFault::Holes);
    else
        moFacets.push_back({poRing->toSimpleCurve(), FacetFault::None});
}

void FacetList::AddCurved(const OGRGeometry& oCurved) {
    const GdalCall oCall;
    std::unique_ptr<OGRGeometry> poLinear(oCurved.getLinearGeometry());
    if (!poLinear || wkbFlatten(poLinear->getGeometryType()) != wkbPolygon)
        return AddFault(FacetFault::Curve);
    AddPolygon(*poLinear->toCurvePolygon());
    moLinearised.push_back(std::move(poLinear));
}

template <class Parts>
void FacetList::AddParts(const Parts& oParts) {
    const int nParts = oParts.getNumGeometries();
    if (nParts == 0)
        return AddFault(FacetFault::Empty);
    for (int nPart = nParts - 1; nPart >= 0; --nPart)
        moPending.push_back(oParts.getGeometryRef(nPart));
}

void FacetList::AddFault(FacetFault eFault) {
    moFacets.push_back({nullptr, eFault});
}

FacetFault ReadRing(const OGRSimpleCurve& oRing, std::vector<ZARVertex>& oVertices) {
    constexpr int nStride = sizeof(ZARVertex);
    oVertices.resize(static_cast<std::size_t>(oRing.getNumPoints()));
    ZARVertex* poFirst = oVertices.data();
    oRing.getPoints(&poFirst->x, nStride, &poFirst->y, nStride, &poFirst->z, nStride);
    for (const ZARVertex& oVertex : oVertices)
        if (!IsFinite(oVertex))
            return FacetFault::NotFinite;
    if (!IsClosed(oVertices))
        oVertices.push_back(oVertices.front());
    return oVertices.size() < 4 ? FacetFault::FewCorners : FacetFault::None;
}

} // namespace kelm::store

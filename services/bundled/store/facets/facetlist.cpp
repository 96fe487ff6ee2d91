#include "services/bundled/store/facets/facetlist.h"

#include "services/bundled/store/gdal/gdalcall.h"

#include <utility>

namespace kelm::store {

void FacetList::Assign(const OGRGeometry* geometry) {
    Clear();
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
        AddFault(FacetFault::Empty);
    else if (polygon.getNumInteriorRings() > 0)
        AddFault(FacetFault::Holes);
    else
        moFacets.push_back({ring->toSimpleCurve(), FacetFault::None});
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
    moFacets.push_back({nullptr, fault});
}

} // namespace kelm::store

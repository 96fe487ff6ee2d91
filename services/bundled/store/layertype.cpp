#include "services/bundled/store/layertype.h"

namespace kelm::store {

namespace {

constexpr int POINTS = 1;
constexpr int FACETS = 2;
constexpr int LINES = 3;

} // namespace

int GetDeclaredType(OGRLayer& layer) {
    switch (wkbFlatten(layer.GetGeomType())) {
    case wkbPoint:
    case wkbMultiPoint:
        return POINTS;
    case wkbLineString:
    case wkbMultiLineString:
    case wkbCircularString:
    case wkbCompoundCurve:
    case wkbMultiCurve:
        return LINES;
    default:
        return FACETS;
    }
}

void LayerType::Add(FacetFault fault) {
    if (fault == FacetFault::Line)
        mbLines = true;
    else if (fault == FacetFault::Point)
        mbPoints = true;
    else if (fault != FacetFault::NoGeometry)
        mbFacets = true;
}

int LayerType::Get(OGRLayer& layer) const {
    if (mbFacets)
        return FACETS;
    if (mbLines)
        return LINES;
    return mbPoints ? POINTS : GetDeclaredType(layer);
}

bool HoldsFacets(Dataset& dataset, OGRLayer& layer) {
    if (GetDeclaredType(layer) != FACETS)
        return false;
    LayerWalk walk(dataset, layer);
    LayerType type;
    walk.Restart();
    while (!type.HasFacets() && walk.Advance())
        type.Add(walk.GetFacet().meFault);
    return type.HasFacets();
}

} // namespace kelm::store

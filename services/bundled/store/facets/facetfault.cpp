#include "services/bundled/store/facets/facetfault.h"

namespace kelm::store {

const char* GetFaultText(FacetFault fault) {
    switch (fault) {
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
    case FacetFault::FewCorners:
        return "a ring of fewer than three corners";
    case FacetFault::NotFinite:
        return "an ordinate that is not a finite number";
    case FacetFault::Crosses:
        return "a ring that crosses itself or another ring";
    case FacetFault::NoArea:
        return "a polygon without area";
    case FacetFault::NotPlanar:
        return "an upright polygon that is not planar";
    case FacetFault::Uncut:
        return "a polygon that cannot be cut into triangles";
    case FacetFault::None:
        break;
    }
    return "no fault";
}

} // namespace kelm::store

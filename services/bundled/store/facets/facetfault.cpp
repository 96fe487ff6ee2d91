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

} // namespace kelm::store

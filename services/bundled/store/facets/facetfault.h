#pragma once

namespace kelm::store {

/// Why a facet cannot be used.
enum class FacetFault {
    None,
    NoGeometry, ///< the feature has no geometry
    Empty,      ///< a geometry without a part or without a vertex
    Point,      ///< points, which bound no facet
    Line,       ///< lines, which bound no facet
    Curve,      ///< a curved polygon that cannot be linearised
    FewCorners, ///< a ring that encloses nothing: fewer than three corners
    NotFinite,  ///< an ordinate that is NaN or infinite
    Crosses,    ///< a ring that crosses itself or another ring of its polygon
    NoArea,     ///< corners on one line
    NotPlanar,  ///< an upright polygon whose corners are not in one plane
    Uncut       ///< valid, but the library that cuts polygons has failed
};

/// @return the fault in words, such as "a ring that crosses itself"
const char* GetFaultText(FacetFault fault);

} // namespace kelm::store

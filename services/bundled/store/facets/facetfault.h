#pragma once

namespace kelm::store {

/// Why a facet cannot be delivered as a ring.
enum class FacetFault {
    None,
    NoGeometry, ///< the feature has no geometry
    Empty,      ///< a geometry without a part or without a vertex
    Point,      ///< points, which bound no facet
    Line,       ///< lines, which bound no facet
    Curve,      ///< a curved polygon that cannot be linearised
    Holes,      ///< a polygon with inner rings
    FewCorners, ///< a ring that encloses nothing: fewer than three corners
    NotFinite   ///< an ordinate that is NaN or infinite
};

/// @return the fault in words, such as "a polygon with holes"
const char* GetFaultText(FacetFault fault);

} // namespace kelm::store

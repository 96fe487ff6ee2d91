#pragma once

#include "services/bundled/reference/proj/projsession.h"

#include <string>

namespace kelm::ogc {

/// A unit of length.
struct HeightUnit {
    std::string moName = "metre";
    double mdfMetres = 1.0;
};

/// @return the unit of a CRS's heights: that of its last axis, or of its vertical part if it is a
/// compound
HeightUnit GetHeightUnit(ProjSession& session, const PJ* crs);

/// @param crs a vertical CRS, or one with ellipsoidal heights
/// @return the same CRS with heights in this unit; it has no code if that is another unit
/// @throw kelm::DataException if PROJ cannot make it
PjPtr SetHeightUnit(ProjSession& session, const PJ* crs, const HeightUnit& unit);

} // namespace kelm::ogc

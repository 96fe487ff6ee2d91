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

/// @param definition a vertical CRS, or one with ellipsoidal heights, as PROJJSON
/// @return the same CRS with heights in this unit. It has no code if the unit is another one
std::string SetHeightUnit(ProjSession& session, const std::string& definition,
                          const HeightUnit& unit);

} // namespace kelm::ogc

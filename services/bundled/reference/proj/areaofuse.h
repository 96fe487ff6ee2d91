#pragma once

#include "services/bundled/reference/proj/projsession.h"

#include <string>

namespace kelm::ogc {

/// A box of longitude and latitude in degrees. West is greater than east where the box crosses the
/// 180th meridian.
struct AreaOfUse {
    double mdfWest = -180.0;
    double mdfSouth = -90.0;
    double mdfEast = 180.0;
    double mdfNorth = 90.0;

    bool IsWorld() const;
    /// @return true if the position is in the area or no more than a hundredth of a degree beside
    /// it; false if it is not a number
    bool IsPointInside(double longitude, double latitude) const;
    /// @return true if the other area certainly lies in this one
    bool IsAreaInside(const AreaOfUse& other) const;
    /// @return square degrees
    double GetSize() const;
    std::string GetText() const;
};

/// Reads the area of use of a CRS or an operation. @param name set to the area's name, or null
/// @return false, with `area` unchanged, if PROJ knows none
bool ReadArea(ProjSession& session, const PJ* object, AreaOfUse& area, const char*& name);

} // namespace kelm::ogc

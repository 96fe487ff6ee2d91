#pragma once

#include "services/bundled/projcrs.h"
#include "services/bundled/projsession.h"

#include <string>
#include <vector>

namespace kelm::ogc {

/// A box of longitude and latitude in degrees. West is greater than east where the box crosses the
/// 180th meridian.
struct AreaOfUse {
    double mdfWest = -180.0;
    double mdfSouth = -90.0;
    double mdfEast = 180.0;
    double mdfNorth = 90.0;

    bool TestWorld() const;
    /// @return false for a position that is not a number
    bool TestPoint(double dfLongitude, double dfLatitude) const;
    /// @return true if the other area lies in this one for sure
    bool TestArea(const AreaOfUse& oOther) const;
    /// @return square degrees
    double GetSize() const;
    std::string GetText() const;
};

/// Reads the area of use of a CRS or an operation. @param pszName set to its name, or null
/// @return false, with nothing changed, if PROJ knows none
bool ReadArea(ProjSession& oSession, const PJ* po, AreaOfUse& oArea, const char*& pszName);

/// @return an operation from map coordinates to longitude and latitude in degrees, good enough to
/// tell areas of use. @throw kelm::DataException if there is none
PjPtr CreateToDegrees(ProjSession& oSession, const PJ* poMap);

/// One way to bring coordinates from one CRS to another.
struct ProjOperation {
    PjPtr mpo;                  ///< x is easting or longitude on both sides
    std::string moName;         ///< PROJ's name for it
    double mdfAccuracy;         ///< metres; infinite if unknown
    AreaOfUse moArea;           ///< where it applies
    std::string moAreaName;     ///< the same in words
    std::string moGrids;        ///< the grid files that it reads; may be empty
    std::string moMissingGrids; ///< those of them that are not installed

    bool TestUsable() const { return moMissingGrids.empty(); }
    std::string GetAccuracyText() const;
};

/// Lists the operations between two compounds, the most accurate first. Left out are those that
/// only guess (PROJ's ballpark operations) and those that a better one covers in its whole area,
/// even if a grid for the better one is missing.
/// @throw kelm::DataException if no operation can be used, naming the grids that are missing
std::vector<ProjOperation> ListOperations(ProjSession& oSession, const ProjCRS& oSource,
                                          const ProjCRS& oTarget);

} // namespace kelm::ogc

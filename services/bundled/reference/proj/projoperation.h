#pragma once

#include "services/bundled/reference/proj/areaofuse.h"
#include "services/bundled/reference/proj/projsession.h"

#include <string>
#include <vector>

namespace kelm::ogc {

/// One way to bring coordinates from one CRS to another.
struct ProjOperation {
    PjPtr mpo;                  ///< x is easting or longitude on both sides
    std::string moName;         ///< PROJ's name for it
    double mdfAccuracy;         ///< metres; infinite if unknown
    AreaOfUse moArea;           ///< where it applies
    std::string moAreaName;     ///< the same in words
    std::string moGrids;        ///< the grid files that it reads; may be empty
    std::string moMissingGrids; ///< those of them that are not installed

    bool IsUsable() const { return moMissingGrids.empty(); }
    std::string GetAccuracyText() const;
};

/// @return the operations of PROJ's list that are not mere guesses (PROJ's ballpark operations), in
/// its order. @param list may be null. @param heightsDiffer true if one of the two CRSs has
/// ellipsoidal heights and the other has not
std::vector<ProjOperation> DescribeOperations(ProjSession& session, const PJ_OBJ_LIST* list,
                                              bool heightsDiffer);

} // namespace kelm::ogc

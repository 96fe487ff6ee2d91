#pragma once

#include "services/bundled/reference/proj/areaofuse.h"
#include "services/bundled/reference/proj/projsession.h"

#include <string>
#include <vector>

namespace kelm::ogc {

/// One way to bring coordinates from one CRS to another.
struct ProjOperation {
    PjPtr mpo;                      ///< x is easting or longitude on both sides
    std::string moName;             ///< PROJ's name for it
    double mdfAccuracy;             ///< metres; infinite if unknown
    std::vector<AreaOfUse> moAreas; ///< where it applies
    std::string moAreaName;         ///< the largest of them in words
    std::string moSteps;            ///< PROJ's pipeline; empty if PROJ cannot write it
    std::string moGrids;            ///< the grid files that it reads; may be empty
    std::string moMissingGrids;     ///< those of them that are not installed

    bool IsUsable() const { return moMissingGrids.empty(); }
    /// @return true unless the accuracy is known to be too coarse for heights
    bool IsFine() const;
    std::string GetAccuracyText() const;
    /// @return a sentence for a message, if IsFine denies
    std::string GetCoarseText() const;
    /// @return true if a position is in one of the areas, see AreaOfUse
    bool IsPointInside(double longitude, double latitude) const;
    /// @return true if the areas of the other operation certainly lie in those of this one
    bool Covers(const ProjOperation& other) const;
    /// @return the size of the largest area in square degrees
    double GetSize() const;
    /// Takes over where another operation of the same steps applies, and its name if it has the
    /// largest area.
    void Merge(const ProjOperation& other);
};

/// What is asked of the operations between two CRSs.
struct OperationNeeds {
    /// One of the CRSs has ellipsoidal heights and the other has not: an operation must do
    /// something.
    bool mbHeightsDiffer;
    /// Horizontal grid shifts are short. Those that an operation takes back itself are left out,
    /// and their grids are not needed.
    bool mbShortShifts;
};

/// @return the operations of PROJ's list that are not mere guesses (PROJ's ballpark operations), in
/// its order. @param list may be null
std::vector<ProjOperation> DescribeOperations(ProjSession& session, const PJ_OBJ_LIST* list,
                                              const OperationNeeds& needs);

} // namespace kelm::ogc

#pragma once

#include "services/bundled/reference/proj/heightunit.h"
#include "services/bundled/reference/proj/projoperation.h"
#include "services/bundled/reference/proj/projsession.h"
#include "services/bundled/reference/projcrs.h"

#include <string>

namespace kelm::ogc {

/// @return true if the ellipsoid of a CRS has the size of that of WGS 84: the datum is then a
/// modern one, whose positions differ from those of WGS 84 by a few metres at most
bool IsGeocentricEllipsoid(ProjSession& session, const PJ* crs);

/// @return the name of a CRS's ellipsoid if IsGeocentricEllipsoid denies it, else empty
std::string FindOldEllipsoid(ProjSession& session, const PJ* crs);

/// Warns what ellipsoidal heights mean if the operation shifts the datum. An old datum came with
/// positions only, so it depends on the operation. @param map name of the CRS @param ellipsoid its
/// name, see FindOldEllipsoid
void WarnOfEllipsoid(const std::string& map, const std::string& ellipsoid,
                     const ProjOperation& operation);

/// Warns if the heights of a layer may be taken for another unit than the change of datum takes:
/// it goes by the height axis, and by metres without one. @param map the map CRS as PROJ has it
void WarnOfUnit(ProjSession& session, const CRSText& text, const PJ* map, const HeightUnit& unit);

} // namespace kelm::ogc

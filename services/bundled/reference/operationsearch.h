#pragma once

#include "services/bundled/reference/proj/projoperation.h"
#include "services/bundled/reference/proj/projsession.h"
#include "services/bundled/reference/projcrs.h"

#include <vector>

namespace kelm::ogc {

/// Lists the operations between two compounds, the most accurate first. Left out are those that
/// only guess (PROJ's ballpark operations). Also left out are those whose whole area a better
/// operation covers, even if a grid for the better one is missing. Those that are too coarse are in
/// the list, so that no other takes their place. A horizontal grid shift that is taken back is left
/// out of an operation, and its grid is not needed, if the CRS has an ellipsoid like that of WGS
/// 84: the shift is then a few metres long, over which the geoid rises by less than a millimetre.
/// @throw kelm::DataException if no operation is fine enough and has its grids, naming those that
/// are missing
std::vector<ProjOperation> ListOperations(ProjSession& session, const ProjCRS& source,
                                          const ProjCRS& target);

/// @return an operation from map coordinates to longitude and latitude in degrees, good enough to
/// tell areas of use. @throw kelm::DataException if there is none
PjPtr CreateToDegrees(ProjSession& session, const PJ* map);

} // namespace kelm::ogc

#pragma once

#include "services/bundled/store/facets/facetfault.h"
#include "services/vectorlayer.h"

#include <ogr_geometry.h>

#include <vector>

namespace kelm::store {

/// Copies the vertices of a ring in stored order and direction, and closes the ring if it is not
/// closed in plan. A ring without heights gets 0. @param vertices replaced
/// @return None, FewCorners or NotFinite
FacetFault ReadRing(const OGRSimpleCurve& ring, std::vector<ZARVertex>& vertices);

} // namespace kelm::store

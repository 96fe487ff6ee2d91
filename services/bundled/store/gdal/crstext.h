#pragma once

#include <ogr_spatialref.h>

#include <string>

namespace kelm::store {

/// @return the CRS as PROJJSON, since WKT loses the operations of some CRSs; empty if GDAL fails
std::string ExportCrs(const OGRSpatialReference& crs);

} // namespace kelm::store

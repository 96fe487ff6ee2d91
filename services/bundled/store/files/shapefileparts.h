#pragma once

#include <string>

class GDALDataset;

namespace kelm::store {

/// Holds the parts of an open Shapefile against each other. GDAL reads the records that the index
/// (.shx) lists, as far as the table (.dbf) has a row for each, and says nothing of others.
/// @return what is wrong, if records would be left out; else empty
std::string FindShapefileFault(GDALDataset& handle);

/// @return true if there is a CRS (.prj) that cannot be read. GDAL says nothing of it.
bool HasUnreadCrs(GDALDataset& handle);

} // namespace kelm::store

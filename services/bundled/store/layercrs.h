#pragma once

#include <string>

class OGRLayer;

namespace kelm::store {

/// Reads the CRS of a layer, and warns if GDAL cannot. @param subject the layer, for a message
/// @return the CRS as PROJJSON. Empty if the layer has none, or has one of the placeholders by
/// which a GeoPackage says that the CRS of its coordinates is not known
/// @throw kelm::DataException if the CRS cannot be written as PROJJSON
std::string ReadCrsText(OGRLayer& layer, const std::string& subject);

} // namespace kelm::store

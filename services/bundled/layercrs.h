#pragma once

#include <string>

class OGRLayer;

namespace kelm::store {

/// @return the CRS of a layer as WKT2:2019; empty if it has none, or a placeholder by which a
/// GeoPackage says that the CRS of its coordinates is not known. Warns if the CRS cannot be read.
/// @param subject the layer, for a message. @throw kelm::DataException if it cannot be written
std::string ReadCrsText(OGRLayer& oLayer, const std::string& subject);

} // namespace kelm::store

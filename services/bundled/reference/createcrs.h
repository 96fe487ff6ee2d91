#pragma once

#include "services/bundled/reference/projcrs.h"

#include <memory>
#include <string>

namespace kelm::ogc {

/// Reads a layer's CRS. @param definition WKT or PROJJSON; empty for a local CRS. @return a map CRS
/// @throw kelm::DataException if the text is no CRS or has no map coordinates
std::unique_ptr<ProjCRS> ReadCRS(const std::string& definition);

/// Joins a map CRS and a vertical datum. @throw kelm::DataException if there is no such CRS
std::unique_ptr<ProjCRS> CreateCompound(const ProjCRS& map, cs::DatumType datum);

} // namespace kelm::ogc

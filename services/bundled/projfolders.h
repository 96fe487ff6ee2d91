#pragma once

#include <string>
#include <vector>

namespace kelm::services {

/// @return the folders in which GDAL lets PROJ look for its data: those that the host has set by
/// OSRSetPROJSearchPaths, else PROJ's own. Safe to call from any thread
std::vector<std::string> GetProjFolders();

} // namespace kelm::services

#pragma once

#include <string>
#include <vector>

namespace kelm::services {

/// @return the folders in which GDAL lets PROJ look for its data: those that the host has set by
/// OSRSetPROJSearchPaths, else PROJ's own. For one thread at a time: in the second case GDAL reads
/// a text of PROJ's that the next question for it frees
std::vector<std::string> GetProjFolders();

} // namespace kelm::services

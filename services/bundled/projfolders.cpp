#include "services/bundled/projfolders.h"

#include <cpl_string.h>
#include <ogr_srs_api.h>

namespace kelm::services {

std::vector<std::string> GetProjFolders() {
    const CPLStringList folders(OSRGetPROJSearchPaths());
    return {folders.List(), folders.List() + folders.Count()};
}

} // namespace kelm::services

#include "services/bundled/projfolders.h"

#include <cpl_string.h>
#include <ogr_srs_api.h>

#include <mutex>

namespace kelm::services {

std::vector<std::string> GetProjFolders() {
    // Without folders of the host, GDAL reads a text that PROJ frees with the next question.
    static std::mutex mutex;
    const std::lock_guard<std::mutex> lock(mutex);
    const CPLStringList folders(OSRGetPROJSearchPaths());
    return {folders.List(), folders.List() + folders.Count()};
}

} // namespace kelm::services

#include "services/bundled/store/gdal/crstext.h"

#include <cpl_conv.h>

#include <memory>

namespace kelm::store {

std::string ExportCrs(const OGRSpatialReference& crs) {
    const char* const options[] = {"MULTILINE=NO", nullptr};
    char* raw = nullptr;
    const OGRErr error = crs.exportToPROJJSON(&raw, options);
    const std::unique_ptr<char, decltype(&CPLFree)> text(raw, CPLFree);
    return error == OGRERR_NONE && raw ? raw : "";
}

} // namespace kelm::store

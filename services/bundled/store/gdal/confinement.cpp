#include "services/bundled/store/gdal/confinement.h"

#include <cpl_conv.h>

#include <iterator>
#include <string>
#include <vector>

namespace kelm::store {

namespace {

constexpr const char* SETTINGS[] = {
    // The other XML parser fetches external entities by itself.
    "GML_PARSER=EXPAT",
    "GML_SKIP_RESOLVE_ELEMS=ALL",
    "GML_SKIP_CORRUPTED_FEATURES=NO",
    "GML_INVERT_AXIS_ORDER_IF_LAT_LONG=YES",
    "GML_CONSIDER_EPSG_AS_URN=AUTO",
    "GML_SWAP_COORDINATES=AUTO",
    // Without it the vertical part of a CRS is lost.
    "GML_REPORT_COMPD_CS=YES",
    "OGR_GEOMETRY_ACCEPT_UNCLOSED_RING=YES",
    "OGR_SQLITE_LOAD_EXTENSIONS=",
    "OGR_SQLITE_STATIC_VIRTUAL_OGR=NO",
    // Its virtual tables read files that the database names. OGR decodes the geometries itself.
    "SPATIALITE_LOAD=NO",
    "SHAPE_RESTORE_SHX=NO",
};

} // namespace

/// GDAL takes the first value of a key, so ours stand in front of the host's.
Confinement::Confinement(const char* rings) : moHost(CPLGetThreadLocalConfigOptions(), TRUE) {
    const std::string organize = std::string("OGR_ORGANIZE_POLYGONS=") + rings;
    std::vector<const char*> settings(std::begin(SETTINGS), std::end(SETTINGS));
    settings.push_back(organize.c_str());
    for (int i = 0; i < moHost.size(); ++i)
        settings.push_back(moHost[i]);
    settings.push_back(nullptr);
    CPLSetThreadLocalConfigOptions(settings.data());
}

Confinement::~Confinement() {
    CPLSetThreadLocalConfigOptions(moHost.List());
}

} // namespace kelm::store

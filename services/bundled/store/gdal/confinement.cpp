#include "services/bundled/store/gdal/confinement.h"

#include <cpl_conv.h>

#include <utility>

namespace kelm::store {

namespace {

constexpr std::pair<const char*, const char*> SETTINGS[] = {
    // The other XML parser fetches external entities by itself.
    {"GML_PARSER", "EXPAT"},
    {"GML_SKIP_RESOLVE_ELEMS", "ALL"},
    {"GML_SKIP_CORRUPTED_FEATURES", "NO"},
    {"GML_INVERT_AXIS_ORDER_IF_LAT_LONG", "YES"},
    {"GML_CONSIDER_EPSG_AS_URN", "AUTO"},
    {"GML_SWAP_COORDINATES", "AUTO"},
    // Without it the vertical part of a CRS is lost.
    {"GML_REPORT_COMPD_CS", "YES"},
    {"OGR_GEOMETRY_ACCEPT_UNCLOSED_RING", "YES"},
    {"OGR_SQLITE_LOAD_EXTENSIONS", ""},
    {"OGR_SQLITE_STATIC_VIRTUAL_OGR", "NO"},
    // Its virtual tables read files that the database names. OGR decodes the geometries itself.
    {"SPATIALITE_LOAD", "NO"},
    {"SHAPE_RESTORE_SHX", "NO"},
};

} // namespace

Confinement::Confinement(const char* rings) : moHost(CPLGetThreadLocalConfigOptions(), TRUE) {
    CPLStringList settings(moHost);
    for (const auto& [key, value] : SETTINGS)
        settings.SetNameValue(key, value);
    settings.SetNameValue("OGR_ORGANIZE_POLYGONS", rings);
    CPLSetThreadLocalConfigOptions(settings.List());
}

Confinement::~Confinement() {
    CPLSetThreadLocalConfigOptions(moHost.List());
}

} // namespace kelm::store

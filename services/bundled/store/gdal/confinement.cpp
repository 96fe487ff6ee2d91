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
    {"OGR_SQLITE_LOAD_EXTENSIONS", ""},
    {"OGR_SQLITE_STATIC_VIRTUAL_OGR", "NO"},
    // Its virtual tables read files that the database names. OGR decodes the geometries itself.
    {"SPATIALITE_LOAD", "NO"},
    {"SHAPE_RESTORE_SHX", "NO"},
};

} // namespace

Confinement::Confinement() {
    moSaved.reserve(std::size(SETTINGS));
    for (const auto& [key, value] : SETTINGS) {
        const char* old = CPLGetThreadLocalConfigOption(key, nullptr);
        moSaved.push_back({key, old != nullptr, old ? old : ""});
        CPLSetThreadLocalConfigOption(key, value);
    }
}

Confinement::~Confinement() {
    for (const Saved& saved : moSaved)
        CPLSetThreadLocalConfigOption(saved.mpszKey, saved.mbSet ? saved.moValue.c_str() : nullptr);
}

} // namespace kelm::store

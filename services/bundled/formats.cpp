#include "services/bundled/formats.h"

#include <cpl_conv.h>
#include <gdal_priv.h>

#include <algorithm>
#include <mutex>
#include <utility>

namespace kelm::store {

namespace {

constexpr std::pair<const char*, const char*> koSettings[] = {
    // The other XML parser fetches external entities by means of its own.
    {"GML_PARSER", "EXPAT"},
    {"GML_SKIP_RESOLVE_ELEMS", "ALL"},
    {"GML_SKIP_CORRUPTED_FEATURES", "NO"},
    {"OGR_SQLITE_LOAD_EXTENSIONS", ""},
    {"OGR_SQLITE_STATIC_VIRTUAL_OGR", "NO"},
    // Its virtual tables read files that the database names. OGR decodes the geometries itself.
    {"SPATIALITE_LOAD", "NO"},
    {"SHAPE_RESTORE_SHX", "NO"},
};

bool IsRegistered(const Format& oFormat) {
    return GetGDALDriverManager()->GetDriverByName(oFormat.mpszDriver) != nullptr;
}

} // namespace

const std::vector<Format>& GetFormats() {
    static const std::vector<Format> oFormats = {
        {"GPKG", "GeoPackage", {nullptr}, false, true},
        {"ESRI Shapefile", "ESRI Shapefile", {"AUTO_REPACK=NO", nullptr}},
        {"FlatGeobuf", "FlatGeobuf", {"VERIFY_BUFFERS=YES", nullptr}, true},
        {"GeoJSON", "GeoJSON", {"FEATURE_SERVER_PAGING=NO", "NATIVE_DATA=NO", nullptr}},
        // A schema beside the file may include others from anywhere; this path can never exist.
        {"GML", "GML", {"XSD=/dev/null/none", "DOWNLOAD_SCHEMA=NO", "WRITE_GFS=NO", nullptr}, true},
        {"DXF", "DXF", {nullptr}},
        {"OpenFileGDB", "File Geodatabase", {"LIST_ALL_TABLES=NO", nullptr}},
        {"SQLite", "SQLite", {"LIST_VIRTUAL_OGR=NO", "LIST_ALL_TABLES=NO", nullptr}, false, true},
    };
    return oFormats;
}

std::string GetFormatNames() {
    std::string names;
    for (const Format& oFormat : GetFormats())
        names.append(names.empty() ? "" : ", ").append(oFormat.mpszName);
    return names;
}

void RegisterFormats() {
    static std::once_flag oOnce;
    std::call_once(oOnce, [] {
        const std::vector<Format>& oFormats = GetFormats();
        if (!std::all_of(oFormats.begin(), oFormats.end(), IsRegistered))
            GDALAllRegister();
    });
}

Confinement::Confinement() {
    moSaved.reserve(std::size(koSettings));
    for (const auto& [pszKey, pszValue] : koSettings) {
        const char* pszOld = CPLGetThreadLocalConfigOption(pszKey, nullptr);
        moSaved.push_back({pszKey, pszOld != nullptr, pszOld ? pszOld : ""});
        CPLSetThreadLocalConfigOption(pszKey, pszValue);
    }
}

Confinement::~Confinement() {
    for (const Saved& oSaved : moSaved)
        CPLSetThreadLocalConfigOption(oSaved.mpszKey,
                                      oSaved.mbSet ? oSaved.moValue.c_str() : nullptr);
}

} // namespace kelm::store

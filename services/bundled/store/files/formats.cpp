#include "services/bundled/store/files/formats.h"

#include <gdal_priv.h>

#include <algorithm>
#include <mutex>

namespace kelm::store {

namespace {

bool IsRegistered(const Format& format) {
    return GetGDALDriverManager()->GetDriverByName(format.mpszDriver) != nullptr;
}

} // namespace

const std::vector<Format>& GetFormats() {
    static const std::vector<Format> FORMATS = {
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
    return FORMATS;
}

std::string GetFormatNames() {
    std::string names;
    for (const Format& format : GetFormats())
        names.append(names.empty() ? "" : ", ").append(format.mpszName);
    return names + ", LandXML";
}

void RegisterFormats() {
    static std::once_flag once;
    std::call_once(once, [] {
        const std::vector<Format>& formats = GetFormats();
        if (!std::all_of(formats.begin(), formats.end(), IsRegistered))
            GDALAllRegister();
    });
}

} // namespace kelm::store

#include "services/bundled/store/files/formats.h"

#include <cpl_conv.h>
#include <cpl_string.h>
#include <gdal_priv.h>
#include <ogrsf_frmts.h>

#include <cstring>
#include <mutex>

// A GDAL without one of these drivers, or with one as a plugin, still links.
#pragma weak RegisterOGRGeoPackage
#pragma weak RegisterOGRShape
#pragma weak RegisterOGRFlatGeobuf
#pragma weak RegisterOGRGeoJSON
#pragma weak RegisterOGRGML
#pragma weak RegisterOGRDXF
#pragma weak RegisterOGROpenFileGDB
#pragma weak RegisterOGRSQLite

namespace kelm::store {

namespace {

/// @return true if the host has said that this driver is not to be used
bool IsSkipped(const char* driver) {
    const char* const names = CPLGetConfigOption("GDAL_SKIP", "");
    const CPLStringList skipped(CSLTokenizeString2(names, std::strchr(names, ',') ? "," : " ", 0));
    const CPLStringList others(CSLTokenizeString2(CPLGetConfigOption("OGR_SKIP", ""), ",", 0));
    return skipped.FindString(driver) >= 0 || others.FindString(driver) >= 0;
}

void Register(const Format& format) {
    if (GetGDALDriverManager()->GetDriverByName(format.mpszDriver) != nullptr ||
        IsSkipped(format.mpszDriver))
        return;
    if (format.mpfnRegister != nullptr)
        format.mpfnRegister();
    else
        GDALAllRegister(); // loads plugins
}

} // namespace

const std::vector<Format>& GetFormats() {
    static const std::vector<Format> FORMATS = {
        {"GPKG",
         "GeoPackage",
         RegisterOGRGeoPackage,
         {nullptr},
         FT_Pages | FT_GeometryBytes,
         "",
         ReadRunsByQuery},
        {"ESRI Shapefile",
         "ESRI Shapefile",
         RegisterOGRShape,
         {"AUTO_REPACK=NO", nullptr},
         FT_None,
         "",
         ReadRunsByPosition},
        {"FlatGeobuf",
         "FlatGeobuf",
         RegisterOGRFlatGeobuf,
         {"VERIFY_BUFFERS=YES", nullptr},
         FT_ExactCount,
         "",
         ReadRunsByIndex},
        {"GeoJSON",
         "GeoJSON",
         RegisterOGRGeoJSON,
         {"FEATURE_SERVER_PAGING=NO", "NATIVE_DATA=NO", nullptr},
         FT_ReadsAhead},
        // A schema beside the file may include others from anywhere; this path can never exist.
        {"GML",
         "GML",
         RegisterOGRGML,
         {"XSD=/dev/null/none", "DOWNLOAD_SCHEMA=NO", "WRITE_GFS=NO", nullptr},
         FT_ExactCount | FT_SkipsDamaged},
        {"DXF", "DXF", RegisterOGRDXF, {nullptr}},
        // The format defines outer rings as clockwise and inner ones as counter-clockwise. GDAL
        // would compare all rings of a feature with each other, in the square of their number.
        {"OpenFileGDB",
         "File Geodatabase",
         RegisterOGROpenFileGDB,
         {"LIST_ALL_TABLES=NO", nullptr},
         FT_None,
         "ONLY_CCW"},
        {"SQLite",
         "SQLite",
         RegisterOGRSQLite,
         {"LIST_VIRTUAL_OGR=NO", "LIST_ALL_TABLES=NO", nullptr},
         FT_Pages},
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
    static std::mutex mutex;
    const std::lock_guard<std::mutex> lock(mutex);
    for (const Format& format : GetFormats())
        Register(format);
}

} // namespace kelm::store

#pragma once

#include <string>

namespace kelm::bench {

/// A vector format of GDAL that terrains are written in.
struct FileFormat {
    const char* pszDriver;
    const char* pszEnding;
};

constexpr FileFormat FILE_FORMATS[] = {
    {"GPKG", ".gpkg"}, {"FlatGeobuf", ".fgb"}, {"ESRI Shapefile", ".shp"}};

/// @return the file of a terrain in a folder, made anew unless a whole one is there
std::string GetTerrainFile(const std::string& sFolder, const std::string& sTerrain,
                           const FileFormat& format);

} // namespace kelm::bench

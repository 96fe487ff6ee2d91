#pragma once

#include <stdexcept>
#include <string>

namespace kelm::bench {

/// A vector format of GDAL that terrains are written in.
struct FileFormat {
    const char* pszDriver;
    const char* pszEnding;
};

constexpr FileFormat FILE_FORMATS[] = {
    {"GPKG", ".gpkg"}, {"FlatGeobuf", ".fgb"}, {"ESRI Shapefile", ".shp"}};

/// @return what GDAL gave, unless it is null
template <typename T>
T& Need(T* poObject, const std::string& sWhat) {
    if (poObject == nullptr)
        throw std::runtime_error("GDAL: no " + sWhat);
    return *poObject;
}

/// @return the file of a terrain in a folder, made anew unless a whole one is there
std::string GetTerrainFile(const std::string& sFolder, const std::string& sTerrain,
                           const FileFormat& format);

} // namespace kelm::bench

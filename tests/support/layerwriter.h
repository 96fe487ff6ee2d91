#pragma once

#include <ogr_core.h>

#include <cstdint>
#include <string>
#include <vector>

namespace kelm::test {

/// A layer to be written.
struct LayerText {
    /// Well-known texts, one a feature; an empty text is a feature without a geometry. Rings are
    /// written as they stand here, closed or not.
    std::vector<std::string> moGeometries;
    /// CRS as EPSG code, or any text that GDAL takes for a CRS; empty: none.
    std::string moCrs = "EPSG:32632";
    std::string moName = "facets";
    /// Feature ids; empty: those that the format gives.
    std::vector<std::int64_t> moIds;
    /// Declared type; any geometry with heights, unless the format knows no such layer.
    OGRwkbGeometryType meType = OGR_GT_SetZ(wkbUnknown);
    /// Layer creation options of the driver, such as "SPATIAL_INDEX=NO".
    std::vector<std::string> moOptions;
};

/// Writes layers into a new file. @param format short name of a GDAL driver @return path
/// @throw std::runtime_error with GDAL's reason
std::string WriteLayers(const std::string& path, const std::string& format,
                        const std::vector<LayerText>& oLayers);

/// Writes a file of one layer.
std::string WriteLayer(const std::string& path, const std::string& format, const LayerText& oLayer);

/// @return a triangle as well-known text, with heights z, z + 1 and z + 2, at (x, y)
std::string MakeTriangle(double dfX, double dfY, double dfZ);

} // namespace kelm::test

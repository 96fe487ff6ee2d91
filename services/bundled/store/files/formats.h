#pragma once

#include "services/bundled/store/runs/runreader.h"

#include <string>
#include <vector>

namespace kelm::store {

/// What is special in how a driver reads.
enum FormatTrait : unsigned {
    FT_None = 0,
    /// The driver knows the exact number of features. Such drivers can end a damaged file early
    /// without an error.
    FT_ExactCount = 1,
    /// A database of pages, all of one size. SQLite reads a torn last page as if zeros followed,
    /// which puts corners of geometries at the origin.
    FT_Pages = 2,
    /// For a feature that it cannot read the driver gives an error and null, and then reads on.
    FT_SkipsDamaged = 4,
    /// The driver reads features ahead, so an error need not belong to the feature that it gives.
    FT_ReadsAhead = 8,
    /// A query of SQL gives geometries as a GeoPackage stores them.
    FT_GeometryBytes = 16
};

/// A file format that the store opens.
struct Format {
    const char* mpszDriver; ///< GDAL's short name of the driver
    const char* mpszName;   ///< name for a person
    void (*mpfnRegister)(); ///< registers the driver; null if this GDAL does not have it built in
    /// Open options of the driver, ended by null.
    std::vector<const char*> moOptions;
    unsigned mnTraits = FT_None; ///< FormatTrait values, joined
    const char* mpszRings = "";  ///< see Confinement
    /// Makes the reader of runs; null if every read must begin with the first feature.
    std::unique_ptr<RunReader> (*mpfnRuns)(OGRLayer& layer) = nullptr;

    bool Has(FormatTrait trait) const { return (mnTraits & trait) != 0; }
};

/// The formats: GeoPackage, ESRI Shapefile, FlatGeobuf, GeoJSON, GML, DXF, File Geodatabase and
/// SQLite. A file is offered to them in this order. No other driver of GDAL ever sees a file,
/// because many of them open connections, or further files that the first one names.
const std::vector<Format>& GetFormats();

/// @return the names of all formats that the store reads, LandXML included, for a message
std::string GetFormatNames();

/// Registers the drivers of the formats that are not registered, and no others. A driver that the
/// host skips (GDAL_SKIP) stays out. To be called before each opening, since a host may destroy
/// GDAL's driver manager at any time. Safe to call from any thread.
void RegisterFormats();

} // namespace kelm::store

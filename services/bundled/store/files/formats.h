#pragma once

#include <string>
#include <vector>

namespace kelm::store {

/// A file format that the store opens.
struct Format {
    const char* mpszDriver; ///< GDAL's short name of the driver
    const char* mpszName;   ///< name for a person
    /// Open options of the driver, ended by null.
    std::vector<const char*> moOptions;
    /// True if the driver knows the exact number of features. Such drivers can end a damaged file
    /// early without an error.
    bool mbExactCount = false;
    /// True for a database of pages, all of one size. SQLite reads a torn last page as if zeros
    /// followed, which puts corners of geometries at the origin.
    bool mbPages = false;
};

/// The formats: GeoPackage, ESRI Shapefile, FlatGeobuf, GeoJSON, GML, DXF, File Geodatabase and
/// SQLite. A file is offered to them in this order. No other driver of GDAL ever sees a file,
/// because many of them open connections, or further files that the first one names.
const std::vector<Format>& GetFormats();

/// @return the names of all formats that the store reads, LandXML included, for a message
std::string GetFormatNames();

/// Registers GDAL's drivers, once a process and only if the host has not done it. Safe to call from
/// any thread.
void RegisterFormats();

} // namespace kelm::store

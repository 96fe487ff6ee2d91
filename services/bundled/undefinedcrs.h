#pragma once

#include <cstring>

namespace kelm::services {

/// @return true if this is the name of a CRS that stands for none; false for null
///
/// A GeoPackage gives layers without a CRS the srs ids -1 and 0, which have names. Later versions
/// of GDAL add words to these names. Files that were made from a GeoPackage keep them, a Shapefile
/// with underscores.
inline bool IsUndefinedCRS(const char* name) {
    for (const char* undefined :
         {"Undefined Cartesian SRS", "Undefined geographic SRS", "Undefined_Cartesian_SRS",
          "Undefined_geographic_SRS", "Undefined SRS"})
        if (name != nullptr && std::strncmp(name, undefined, std::strlen(undefined)) == 0)
            return true;
    return false;
}

} // namespace kelm::services

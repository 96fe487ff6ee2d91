#pragma once

#include <cstring>

namespace kelm::services {

/// Is this the name of a CRS that stands for none? A GeoPackage gives its layers without one the
/// srs ids -1 and 0. Later versions of GDAL add words to the names, and files of other formats that
/// were made from a GeoPackage carry them on, a Shapefile with underscores.
inline bool TestUndefinedCRS(const char* pszName) {
    for (const char* pszUndefined :
         {"Undefined Cartesian SRS", "Undefined geographic SRS", "Undefined_Cartesian_SRS",
          "Undefined_geographic_SRS", "Undefined SRS"})
        if (pszName != nullptr &&
            std::strncmp(pszName, pszUndefined, std::strlen(pszUndefined)) == 0)
            return true;
    return false;
}

} // namespace kelm::services

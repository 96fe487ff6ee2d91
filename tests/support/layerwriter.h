#pragma once

#include "services/reporting.h"

#include <gdal_priv.h>
#include <ogrsf_frmts.h>

#include <filesystem>
#include <stdexcept>
#include <string>
#include <vector>

namespace kelm::test {

/// A layer to be written.
struct LayerText {
    /// Well-known texts, whose rings need not be closed; an empty one is a feature without
    /// geometry.
    std::vector<std::string> moGeometries;
    OGRwkbGeometryType meType = OGR_GT_SetZ(wkbUnknown);
    std::string moCrs = "EPSG:32632"; ///< any text that GDAL takes for a CRS; empty: none
    std::vector<GIntBig> moIds = {};  ///< of the features; empty: those that the format gives
};

inline void AddFeatures(OGRLayer& oLayer, const LayerText& oText) {
    // One transaction where the format has such: it saves a write to disk a feature.
    bool bDone = oLayer.StartTransaction() == OGRERR_NONE;
    for (std::size_t n = 0; n < oText.moGeometries.size(); ++n) {
        const char* pszText = oText.moGeometries[n].c_str();
        OGRGeometry* poGeometry = nullptr;
        OGRGeometryFactory::createFromWkt(pszText, nullptr, &poGeometry);
        OGRFeature oFeature(oLayer.GetLayerDefn());
        oFeature.SetGeometryDirectly(poGeometry);
        oFeature.SetFID(oText.moIds.empty() ? OGRNullFID : oText.moIds[n]);
        bDone &= poGeometry || !*pszText;
        bDone &= oLayer.CreateFeature(&oFeature) == OGRERR_NONE;
    }
    if (!bDone || oLayer.CommitTransaction() != OGRERR_NONE)
        throw std::runtime_error(CPLGetLastErrorMsg());
}

inline GDALDatasetUniquePtr Create(const std::string& path, const char* pszFormat,
                                   CSLConstList papszOptions = nullptr) {
    GDALAllRegister();
    std::filesystem::remove_all(path);
    GDALDriver& oDriver = *GetGDALDriverManager()->GetDriverByName(pszFormat);
    return GDALDatasetUniquePtr(
        oDriver.Create(path.c_str(), 0, 0, 0, GDT_Unknown, const_cast<char**>(papszOptions)));
}

inline GDALDatasetUniquePtr OpenForUpdate(const std::string& path) {
    return GDALDatasetUniquePtr(GDALDataset::Open(path.c_str(), GDAL_OF_VECTOR | GDAL_OF_UPDATE));
}

/// Writes a new file of a layer "facets", and another if wanted. @param format short name of a GDAL
/// driver @return path @throw std::runtime_error with GDAL's reason
inline std::string WriteLayer(const std::string& path, const std::string& format,
                              const LayerText& oText, bool bTwice = false) {
    const GDALDatasetUniquePtr poDataset = Create(path, format.c_str());
    OGRSpatialReference oCrs;
    oCrs.SetFromUserInput(oText.moCrs.c_str());
    CPLStringList oOptions;
    if (format == "FlatGeobuf")
        oOptions.AddString("SPATIAL_INDEX=NO"); // or it sorts the features
    for (int n = 0; n <= int(bTwice); ++n)
        AddFeatures(*poDataset->CreateLayer(n == 0 ? "facets" : "others",
                                            oText.moCrs.empty() ? nullptr : &oCrs, oText.meType,
                                            oOptions.List()),
                    oText);
    return path;
}

/// @return a triangle as well-known text, clockwise, with heights z, z + 1 and z + 2, at (x, y)
inline std::string MakeTriangle(double dfX, double dfY, double dfZ) {
    return FormatString("POLYGON Z ((%f %f %f,%f %f %f,%f %f %f,%f %f %f))", dfX, dfY, dfZ, dfX,
                        dfY + 1, dfZ + 1, dfX + 1, dfY, dfZ + 2, dfX, dfY, dfZ);
}

} // namespace kelm::test

#pragma once

#include "services/reporting.h"
#include "services/vectorlayer.h"
#include "tests/support/gdaltranscript.h"
#include "tests/support/temporaryfolder.h"
#include "tin/tinreader.h"
#include "tin/tinreaderfactory.h"

#include <gdal_priv.h>
#include <ogrsf_frmts.h>

#include <array>
#include <memory>

namespace kelm::test {

using File = std::unique_ptr<_iobuf, decltype(&ZARClose)>;
using Ring = std::vector<std::array<double, 3>>;

inline File OpenFile(const std::string& path) {
    const HostCall oCall;
    return {ZAROpen(path.c_str(), "r"), ZARClose};
}

inline Ring ReadShape(ZARLayer_t* poLayer, int nId) {
    const ZARShape& oShape = *ZARGetShapeRef(poLayer, nId);
    Ring oRing;
    for (int n = 0; n < oShape.vertexCount; ++n)
        oRing.push_back({oShape.vertices[n].x, oShape.vertices[n].y, oShape.vertices[n].z});
    return oRing;
}

inline std::string GetCrs(ZARLayer_t* poLayer) {
    ProjInfo_t oInfo;
    ZARGetProjectionInfo(poLayer, &oInfo);
    return oInfo.definition;
}

inline std::unique_ptr<tin::TinReader> OpenReader(const std::string& path, int nLayer = 0,
                                                  ogc::cs::DatumType eDatum = ogc::cs::VD_Other) {
    const HostCall oCall;
    return std::unique_ptr<tin::TinReader>(
        tin::TinReaderFactory::CreateTinReader(path.c_str(), nLayer, 0.0, 1.0, eDatum));
}

/// @param survey of the layer, as GetSurvey gave it
inline std::unique_ptr<tin::TinReader> OpenSurveyed(const std::string& path,
                                                    const std::string& survey, int nLayer = 0,
                                                    const tin::Progress& oProgress = {}) {
    const HostCall oCall;
    return std::unique_ptr<tin::TinReader>(tin::TinReaderFactory::CreateTinReader(
        path.c_str(), nLayer, 0.0, 1.0, ogc::cs::VD_Other, {survey, oProgress}));
}

/// A layer to be written.
struct LayerText {
    /// Well-known texts, whose rings need not be closed; an empty one is a feature without
    /// geometry.
    std::vector<std::string> moGeometries;
    OGRwkbGeometryType meType = OGR_GT_SetZ(wkbUnknown);
    std::string moCrs = "EPSG:32632"; ///< any text that GDAL takes for a CRS; empty: none
    std::vector<GIntBig> moIds = {};  ///< of the features; empty: those that the format gives
};

/// @return null if the text is empty or no well-known text
inline OGRGeometryUniquePtr Parse(const std::string& text) {
    OGRGeometry* poGeometry = nullptr;
    OGRGeometryFactory::createFromWkt(text.c_str(), nullptr, &poGeometry);
    return OGRGeometryUniquePtr(poGeometry);
}

inline void AddFeatures(OGRLayer& oLayer, const LayerText& oText) {
    // One transaction where the format has such: it saves a write to disk a feature.
    bool bDone = oLayer.StartTransaction() == OGRERR_NONE;
    for (std::size_t n = 0; n < oText.moGeometries.size(); ++n) {
        OGRGeometryUniquePtr poGeometry = Parse(oText.moGeometries[n]);
        bDone &= poGeometry || oText.moGeometries[n].empty();
        OGRFeature oFeature(oLayer.GetLayerDefn());
        oFeature.SetGeometryDirectly(poGeometry.release());
        oFeature.SetFID(oText.moIds.empty() ? OGRNullFID : oText.moIds[n]);
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

/// @return a triangle as well-known text, clockwise, with heights z, z + 1 and z + 2, at (x, y)
inline std::string MakeTriangle(double dfX, double dfY, double dfZ) {
    return FormatString("POLYGON Z ((%f %f %f,%f %f %f,%f %f %f,%f %f %f))", dfX, dfY, dfZ, dfX,
                        dfY + 1, dfZ + 1, dfX + 1, dfY, dfZ + 2, dfX, dfY, dfZ);
}

/// A test with files in a folder, which its transcript calls ~.
struct FileTest : testing::Test {
    FileTest() { moTranscript.moFolder = moFolder.GetPath(""); }
    /// Writes a new file of a layer "facets", and another if wanted, without a word in the
    /// transcript. FlatGeobuf gets an index if the name begins with "indexed". @return its path
    /// @throw std::runtime_error with GDAL's reason
    std::string Write(const LayerText& oText, const char* pszFormat = "GPKG",
                      const std::string& name = "a.gpkg", bool bTwice = false) {
        const CPLErrorHandlerPusher oQuiet(CPLQuietErrorHandler);
        const GDALDatasetUniquePtr poDataset = Create(moFolder.GetPath(name), pszFormat);
        OGRSpatialReference oCrs;
        oCrs.SetFromUserInput(oText.moCrs.c_str());
        CPLStringList oOptions;
        if (EQUAL(pszFormat, "FlatGeobuf") && name.find("indexed") != 0)
            oOptions.AddString("SPATIAL_INDEX=NO"); // or it sorts the features
        for (int n = 0; n <= int(bTwice); ++n)
            AddFeatures(*poDataset->CreateLayer(n == 0 ? "facets" : "others",
                                                oText.moCrs.empty() ? nullptr : &oCrs, oText.meType,
                                                oOptions.List()),
                        oText);
        return moFolder.GetPath(name);
    }
    static void Execute(const std::string& path, const std::string& statement) {
        const CPLErrorHandlerPusher oQuiet(CPLQuietErrorHandler);
        const GDALDatasetUniquePtr poDataset = OpenForUpdate(path);
        poDataset->ReleaseResultSet(poDataset->ExecuteSQL(statement.c_str(), nullptr, nullptr));
    }
    TemporaryFolder moFolder;
    GdalTranscript moTranscript;
};

} // namespace kelm::test

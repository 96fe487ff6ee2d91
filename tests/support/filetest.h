#pragma once

#include "services/vectorlayer.h"
#include "tests/support/gdaltranscript.h"
#include "tests/support/layerwriter.h"
#include "tests/support/temporaryfolder.h"
#include "tin/tinreader.h"
#include "tin/tinreaderfactory.h"

#include <array>
#include <memory>

namespace kelm::test {

using File = std::unique_ptr<_iobuf, decltype(&ZARClose)>;
using Ring = std::vector<std::array<double, 3>>;

inline File OpenFile(const std::string& path) {
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
    return std::unique_ptr<tin::TinReader>(
        tin::TinReaderFactory::CreateTinReader(path.c_str(), nLayer, 0.0, 1.0, eDatum));
}

/// A test with files in a folder, which its transcript calls ~.
struct FileTest : testing::Test {
    FileTest() { moTranscript.moFolder = moFolder.GetPath(""); }
    /// Writes a layer without a word in the transcript. @return its path
    std::string Write(const LayerText& oText, const char* pszFormat = "GPKG",
                      const std::string& name = "a.gpkg", bool bTwice = false) {
        const CPLErrorHandlerPusher oQuiet(CPLQuietErrorHandler);
        return WriteLayer(moFolder.GetPath(name), pszFormat, oText, bTwice);
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

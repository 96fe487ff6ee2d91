#include "bench/terrainfile.h"

#include "bench/terrain.h"

#include <filesystem>
#include <stdexcept>

#include <ogrsf_frmts.h>

namespace kelm::bench {

namespace {

/// Three corners and the first again.
OGRPolygon* MakePolygon(const containers::KeyPoint<double>* poCorners) {
    auto* ring = new OGRLinearRing;
    for (const int i : {0, 1, 2, 0})
        ring->addPoint(poCorners[i].x, poCorners[i].y, poCorners[i].z);
    auto* polygon = new OGRPolygon;
    polygon->addRingDirectly(ring);
    return polygon;
}

void WriteLayer(OGRLayer& rLayer, const Terrain& oTerrain) {
    const auto corners = GetCorners(oTerrain);
    for (std::size_t i = 0; i < corners.size(); i += 3) {
        OGRFeature feature(rLayer.GetLayerDefn());
        feature.SetGeometryDirectly(MakePolygon(&corners[i]));
        if (rLayer.CreateFeature(&feature) != OGRERR_NONE)
            throw std::runtime_error("GDAL: a triangle was not written");
    }
}

/// Writes a terrain as polygons with heights.
void WriteFile(const std::string& sTerrain, const FileFormat& format, const std::string& sFile) {
    GDALDriver& driver =
        Need(GetGDALDriverManager()->GetDriverByName(format.pszDriver), format.pszDriver);
    const GDALDatasetUniquePtr file(driver.Create(sFile.c_str(), 0, 0, 0, GDT_Unknown, nullptr));
    OGRSpatialReference reference;
    reference.importFromEPSG(32616);
    OGRLayer& layer =
        Need(Need(file.get(), sFile).CreateLayer("terrain", &reference, wkbPolygon25D, nullptr),
             "layer");
    file->StartTransaction();
    WriteLayer(layer, *GetTerrain(sTerrain));
    file->CommitTransaction();
}

} // namespace

std::string GetTerrainFile(const std::string& sFolder, const std::string& sTerrain,
                           const FileFormat& format) {
    const std::filesystem::path folder = std::filesystem::path(sFolder) / sTerrain;
    const std::filesystem::path mark = folder / (format.pszEnding + std::string(".whole"));
    std::string file = (folder / ("terrain" + std::string(format.pszEnding))).string();
    if (!std::filesystem::exists(mark)) {
        std::filesystem::create_directories(folder);
        std::filesystem::remove(file);
        WriteFile(sTerrain, format, file);
        std::filesystem::create_directory(mark);
    }
    return file;
}

} // namespace kelm::bench

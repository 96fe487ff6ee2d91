#include "tests/support/filetest.h"

#include <thread>

using namespace kelm::ogc::cs;
using namespace kelm::test;
using namespace kelm::tin;

namespace {

std::unique_ptr<Tin> LoadTerrain(DatumType eOutput) {
    const auto reader = OpenReader(KELM_TIN_DATA_DIR "/jacksboro.gpkg", 0, VD_Orthometric);
    reader->SetOutputVerticalDatum(eOutput);
    return std::unique_ptr<Tin>(reader->Load(nullptr));
}

TEST(TinReaderTest, TheTerrainIsTheSameOnEveryThreadAndChangesItsDatum) {
    std::unique_ptr<Tin> again;
    std::thread other([&] { again = LoadTerrain(VD_Ellipsoidal); });
    const std::unique_ptr<Tin> surface = LoadTerrain(VD_Ellipsoidal);
    other.join();
    const std::unique_ptr<Tin> geoidal = LoadTerrain(VD_Orthometric);
    ASSERT_EQ(geoidal->GetTriangleCount(), 17619U);
    ASSERT_EQ(geoidal->GetVertexCount(), 8820U);
    for (unsigned i = 0; i < 8820; ++i) {
        const point3_t<float>&v = *surface->GetVertex(i), &w = *again->GetVertex(i);
        ASSERT_TRUE(v.x == w.x && v.y == w.y && v.z == w.z) << i;
        ASSERT_NEAR(geoidal->GetVertex(i)->z - v.z, 30.6F, 0.5F) << "EGM96 of the place";
    }
}

TEST(TinReaderTest, ALargeSurfaceInDegreesHasTheHeightsOfItsPartsNorthAndSouth) {
    const TemporaryFolder folder;
    for (const point2_t<double> at : {point2_t<double>{24.1, 60.2}, {-70.6, -45.7}}) {
        LayerText layer{{}, wkbPolygon25D, "EPSG:4326"};
        for (int i = 0; i < 400; ++i) {
            const double x = at.x + i * 0.002, y = at.y + i * 0.002;
            layer.moGeometries.push_back(
                FormatString("POLYGON Z ((%f %f 90,%f %f 80,%f %f %d,%f %f 90))", x, y, x + 0.001,
                             y, x, y + 0.001, i, x, y));
        }
        const auto reader =
            OpenReader(WriteLayer(folder.GetPath("a.gpkg"), "GPKG", layer), 0, VD_Ellipsoidal);
        reader->SetOutputVerticalDatum(VD_Orthometric);
        const std::unique_ptr<Tin> whole(reader->Load(nullptr)); // by a grid
        kelm::tin::BBox<double, point2_t<double>> window{};
        window.min = at;
        window.max = {at.x + 0.598, 90};
        const std::unique_ptr<Tin> part(reader->Load(&window)); // vertex by vertex
        ASSERT_TRUE(whole->GetVertexCount() == 1200 && part->GetVertexCount() == 900);
        for (unsigned i = 0; i < 900; ++i)
            ASSERT_NEAR(whole->GetVertex(i)->z, part->GetVertex(i)->z, 1e-3F) << at.y << ' ' << i;
    }
}

} // namespace

#include "tests/support/filetest.h"

#include <thread>

using namespace kelm::ogc::cs;
using namespace kelm::tin;

namespace {

std::unique_ptr<Tin> LoadTerrain(DatumType eOutput) {
    const auto reader =
        kelm::test::OpenReader(KELM_TIN_DATA_DIR "/jacksboro.gpkg", 0, VD_Orthometric);
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

} // namespace

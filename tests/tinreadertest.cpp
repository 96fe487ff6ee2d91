#include "tin/tinreader.h"
#include "services/exception.h"
#include "tests/support/layerwriter.h"
#include "tests/support/temporaryfolder.h"
#include "tests/support/warninglog.h"
#include "tin/aabbtree.h"
#include "tin/tinreaderfactory.h"

#include <gtest/gtest.h>
#include <ogrsf_frmts.h>
#include <proj.h>

#include <cmath>
#include <filesystem>
#include <memory>
#include <random>
#include <thread>

using namespace kelm::ogc::cs;
using namespace kelm::test;
using kelm::tin::Tin;
using kelm::tin::TinReader;

namespace {

const std::string TERRAIN = KELM_TIN_DATA_DIR "/jacksboro.gpkg";

using Surface = std::unique_ptr<Tin>;

std::unique_ptr<TinReader> Open(const std::string& path, DatumType eSource = VD_Orthometric) {
    return std::unique_ptr<TinReader>(
        kelm::tin::TinReaderFactory::CreateTinReader(path.c_str(), 0, 0.0, 1.0, eSource));
}

/// The corners of the terrain as GDAL gives them, three a triangle.
std::vector<point3_t<double>> ReadTerrain() {
    std::vector<point3_t<double>> corners;
    GDALAllRegister();
    const std::unique_ptr<GDALDataset> file(
        static_cast<GDALDataset*>(GDALOpenEx(TERRAIN.c_str(), GDAL_OF_VECTOR, {}, {}, {})));
    for (const auto& feature : *file->GetLayer(0)) {
        const OGRLinearRing* ring = feature->GetGeometryRef()->toPolygon()->getExteriorRing();
        for (int k = 0; k < 3; ++k)
            corners.push_back({ring->getX(k), ring->getY(k), ring->getZ(k)});
    }
    return corners;
}

/// Height of the plane of the triangle that holds the position, by Cramer's rule. @return NaN if
/// none holds it
double GetPlaneHeight(const std::vector<point3_t<double>>& corners, double x, double y) {
    for (std::size_t i = 0; i < corners.size(); i += 3) {
        const point3_t<double>&a = corners[i], &b = corners[i + 1], &c = corners[i + 2];
        const double det = (b.x - a.x) * (c.y - a.y) - (c.x - a.x) * (b.y - a.y);
        const double s = ((x - a.x) * (c.y - a.y) - (c.x - a.x) * (y - a.y)) / det;
        const double t = ((b.x - a.x) * (y - a.y) - (x - a.x) * (b.y - a.y)) / det;
        if (s >= 0 && t >= 0 && s + t <= 1)
            return a.z + s * (b.z - a.z) + t * (c.z - a.z);
    }
    return std::nan("");
}

/// PROJ called directly: from heights above the geoid to heights above the ellipsoid.
struct Geoid {
    PJ_CONTEXT* mpoContext = proj_context_create();
    PJ* mpo = proj_create(mpoContext, "+proj=pipeline +step +inv +proj=utm +zone=16 +ellps=WGS84 "
                                      "+step +proj=vgridshift +grids=egm96_15.gtx +multiplier=1 "
                                      "+step +proj=utm +zone=16 +ellps=WGS84");
    ~Geoid() {
        proj_destroy(mpo);
        proj_context_destroy(mpoContext);
    }
    double Raise(double x, double y, double z) const {
        return proj_trans(mpo, PJ_FWD, proj_coord(x, y, z, HUGE_VAL)).xyz.z;
    }
};

TEST(TinReaderTest, TheTerrainHasItsCountsAndItsHeightsInBothDatums) {
    const auto reader = Open(TERRAIN);
    EXPECT_EQ(reader->GetShapeCount(), 17619);
    const Surface geoidal(reader->Load(nullptr));
    reader->SetOutputVerticalDatum(VD_Ellipsoidal);
    const Surface ellipsoidal(reader->Load(nullptr));
    for (const Tin* surface : {geoidal.get(), ellipsoidal.get()}) {
        ASSERT_EQ(surface->GetTriangleCount(), 17619U);
        ASSERT_EQ(surface->GetVertexCount(), 8820U);
    }
    const std::vector<point3_t<double>> corners = ReadTerrain();
    const Geoid geoid;
    for (unsigned i = 0; i < corners.size(); ++i) {
        const point3_t<double>& c = corners[i];
        const auto k = static_cast<int>(i % 3);
        ASSERT_EQ(geoidal->GetTriangle(i / 3)->GetVertex(k)->z, static_cast<float>(c.z));
        // The geoid is interpolated between positions 100 m apart.
        ASSERT_NEAR(ellipsoidal->GetTriangle(i / 3)->GetVertex(k)->z, geoid.Raise(c.x, c.y, c.z),
                    1e-3);
    }
    const kelm::tin::AabbTree tree(geoidal.get()); // of both: they differ in heights alone
    std::mt19937 random(1);
    for (int i = 0; i < 500; ++i) {
        const double x = 738700.0 + static_cast<double>(random() % 13700000) / 1000.0;
        const double y = 4045200.0 + static_cast<double>(random() % 14000000) / 1000.0;
        const double expected = GetPlaneHeight(corners, x, y);
        float heights[2];
        const bool found[] = {geoidal->GetHeight(x, y, heights[0], &tree),
                              ellipsoidal->GetHeight(x, y, heights[1], &tree)};
        ASSERT_EQ(found[0], !std::isnan(expected));
        ASSERT_EQ(found[1], found[0]);
        if (!found[0])
            continue;
        // A position in float is a millimetre off, 14 km from the base, on slopes of up to 1.
        ASSERT_NEAR(heights[0], expected, 3e-3);
        ASSERT_NEAR(heights[1], geoid.Raise(x, y, expected), 5e-3);
    }
}

TEST(TinReaderTest, AWindowLoadsWhatMeetsIt) {
    const auto reader = Open(TERRAIN);
    kelm::tin::BBox<double, point2_t<double>> window;
    window.min = {744000, 4050000};
    window.max = {746000, 4053000};
    const Surface whole(reader->Load(nullptr));
    const Surface part(reader->Load(&window));
    EXPECT_LT(part->GetTriangleCount(), 3000U);
    for (double x = window.min.x; x <= window.max.x; x += 250)
        for (double y = window.min.y; y <= window.max.y; y += 250) {
            float expected = 0.0F, height = -1.0F;
            const bool found = whole->GetHeight(x, y, expected, nullptr);
            ASSERT_EQ(part->GetHeight(x, y, height, nullptr), found) << x << ' ' << y;
            ASSERT_NEAR(height, expected, 3e-3);
        }
    double xBase, yBase;
    part->GetXYBase(xBase, yBase);
    for (unsigned i = 0; i < part->GetTriangleCount(); ++i) {
        const auto& box = part->GetTriangle(i)->GetBBox();
        ASSERT_TRUE(double(box.min.x) + xBase < 746000.01 && double(box.max.x) + xBase > 743999.99);
        ASSERT_TRUE(double(box.min.y) + yBase < 4053000.01 &&
                    double(box.max.y) + yBase > 4049999.99);
    }
    window.max = {738000, 4060000};
    EXPECT_EQ(reader->Load(&window), nullptr);
}

TEST(TinReaderTest, ReadersOnTwoThreadsAgree) {
    Surface surfaces[2];
    const auto load = [](Surface& surface) {
        const auto reader = Open(TERRAIN, VD_Ellipsoidal);
        reader->SetOutputVerticalDatum(VD_Orthometric);
        surface.reset(reader->Load(nullptr));
    };
    std::thread other(load, std::ref(surfaces[0]));
    load(surfaces[1]);
    other.join();
    for (const Surface& surface : surfaces)
        ASSERT_EQ(surface->GetVertexCount(), 8820U);
    for (unsigned i = 0; i < 8820; ++i) {
        const point3_t<float>&v = *surfaces[0]->GetVertex(i), &w = *surfaces[1]->GetVertex(i);
        ASSERT_TRUE(v.x == w.x && v.y == w.y && v.z == w.z) << i;
    }
}

/// @return what becomes of a file: a number of triangles, or the message of a named exception
std::string GetOutcome(const std::string& path) {
    try {
        const auto reader = Open(path);
        const Surface surface(reader->Load(nullptr));
        return std::to_string(surface ? surface->GetTriangleCount() : 0);
    } catch (const kelm::Exception& e) {
        return e.what();
    }
}

/// @return well-known text of a ring, with heights 0 and the first corner repeated
std::string MakeRing(std::vector<point2_t<double>> ring) {
    ring.push_back(ring.front());
    std::string text;
    for (const point2_t<double>& p : ring)
        text += (text.empty() ? "" : ",") + std::to_string(p.x) + ' ' + std::to_string(p.y) + " 0";
    return "POLYGON Z ((" + text + "))";
}

TEST(TinReaderTest, AHostileFileEndsInASurfaceOrNullOrANamedException) {
    const TemporaryFolder folder;
    WarningLog log;
    std::vector<point2_t<double>> comb;
    for (int i = 0; i < 10000; ++i)
        comb.push_back({10.0 * i, i % 2 == 0 ? 0.0 : 1000.0});
    for (int i = 10000; i-- > 0;)
        comb.push_back({10.0 * i, i % 2 == 0 ? 1.0 : 1001.0});
    const std::string good = MakeTriangle(500000, 5000000, 3);
    const std::string bowTie = MakeRing({{0, 0}, {9, 9}, {9, 0}, {0, 9}});
    const std::string far = "POLYGON Z ((1e300 0 0,1.1e300 0 0,0 1e300 1e300,1e300 0 0))";
    struct Row {
        const char* name;
        const char* format;
        std::vector<std::string> geometries;
        const char* outcome;
    };
    for (const Row& row : {Row{"bowtie.gpkg", "GPKG", {good, bowTie}, "1"},
                           Row{"bowtie.shp", "ESRI Shapefile", {bowTie}, "0"},
                           Row{"far.gpkg", "GPKG", {good, far, far, good}, "4"},
                           Row{"comb.gpkg", "GPKG", {MakeRing(comb)}, "19998"}}) {
        LayerText layer;
        layer.moGeometries = row.geometries;
        layer.meType = wkbPolygon25D;
        const std::string path = WriteLayer(folder.GetPath(row.name), row.format, layer);
        EXPECT_EQ(GetOutcome(path), row.outcome) << row.name;
        const auto size = std::filesystem::file_size(path);
        for (unsigned cut = 8; cut-- > 0;) {
            std::filesystem::resize_file(path, size * cut / 8);
            const std::string outcome = GetOutcome(path);
            EXPECT_NE(outcome, row.outcome) << row.name << " cut to " << cut << "/8";
            EXPECT_NE(outcome.find(row.name), std::string::npos) << outcome;
        }
    }
    EXPECT_EQ(log.Count("Triangulate(): Polygon# 2 is ignored becasue it is not simple."), 1);
    for (const std::string number : {"NaN", "Infinity", "-Infinity", "1e400"})
        EXPECT_EQ(GetOutcome(folder.WriteFile("wild.geojson",
                                              R"({"type":"Polygon","coordinates":[[[0,0,0],[)" +
                                                  number + ",0,0],[0,1,0],[0,0,0]]]}")),
                  "0");
    EXPECT_EQ(log.Count("wild.geojson"), 4) << "refused, and said so";
}

} // namespace

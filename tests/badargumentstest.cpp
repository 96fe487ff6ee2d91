#include "services/exception.h"
#include "tests/support/layerwriter.h"
#include "tests/support/temporaryfolder.h"
#include "tin/aabbtree.h"
#include "tin/tin.h"
#include "tin/tinreader.h"
#include "tin/tinreaderfactory.h"

#include <gtest/gtest.h>

#include <cmath>
#include <limits>
#include <memory>

using namespace kelm::tin;
using kelm::DataException;
using kelm::ogc::cs::DatumType;

namespace {

constexpr double NaN = std::numeric_limits<double>::quiet_NaN();
constexpr double FAR = std::numeric_limits<double>::max();

class BadArgumentsTest : public testing::Test {
  protected:
    static std::unique_ptr<Tin> CreateSurface() {
        auto* vertices = new point3_t<float>[3] {
            {0, 0, 1}, {8, 0, 2}, {
                0, 8, 3
            }
        };
        return std::make_unique<Tin>(vertices, 3, new Triangle_Id[1]{{0, 1, 2}}, 1, 10.0, 20.0);
    }
    static std::unique_ptr<TinReader> Open(const char* name, int layer = 1, double scale = 1.0,
                                           int datum = 2002) {
        return std::unique_ptr<TinReader>(
            TinReaderFactory::CreateTinReader(name, layer, 0.0, scale, DatumType(datum)));
    }
};

TEST_F(BadArgumentsTest, TheReaderRefusesNamesLayersAndNumbers) {
    const kelm::test::TemporaryFolder folder;
    kelm::test::LayerText text;
    text.moGeometries = {kelm::test::MakeTriangle(0.0, 0.0, 5.0)};
    const std::string path =
        kelm::test::WriteLayer(folder.GetPath("good.geojson"), "GeoJSON", text);
    for (const std::string& name : {std::string(), folder.GetPath(""), std::string(5000, 'x'),
                                    std::string("%s%n%d"), std::string("/dev/null")})
        EXPECT_THROW(Open(name.c_str()), DataException) << name;
    EXPECT_THROW(Open(nullptr), DataException);
    for (const int layer : {2, 1000000, std::numeric_limits<int>::max()})
        EXPECT_THROW(Open(path.c_str(), layer), DataException) << layer;
    EXPECT_NE(Open(path.c_str(), std::numeric_limits<int>::min()), nullptr) << "the first layer";
    EXPECT_THROW(Open(path.c_str(), 1, 0.0), kelm::ParameterException);
    for (const int datum : {-1, 0, 1999, 3000, std::numeric_limits<int>::max()})
        EXPECT_THROW(Open(path.c_str(), 1, 1.0, datum), DataException) << datum;

    const auto reader = Open(path.c_str());
    EXPECT_THROW(reader->SetOutputVerticalDatum(DatumType(1000)), kelm::ParameterException);
    for (const auto& [low, high] :
         {std::pair{FAR, -FAR}, std::pair{NaN, 1.0}, std::pair{0.0, NaN}}) {
        BBox<double, point2_t<double>> window;
        window.min = {low, low};
        window.max = {high, high};
        EXPECT_EQ(std::unique_ptr<Tin>(reader->Load(&window)), nullptr);
    }
    EXPECT_NE(std::unique_ptr<Tin>(reader->Load(nullptr)), nullptr);
}

TEST_F(BadArgumentsTest, SurfacesTrianglesAndTreesRefuseNull) {
    point3_t<float> vertices[3] = {};
    EXPECT_THROW(Tin(vertices, 3, static_cast<Triangle_Id*>(nullptr), 1, 0.0, 0.0), DataException);
    EXPECT_THROW(AabbTree{nullptr}, kelm::ParameterException);
    EXPECT_THROW(Triangle(nullptr), DataException);
    Triangle triangle;
    EXPECT_THROW(triangle.SetVertices(nullptr), DataException);
    EXPECT_THROW(triangle.SetVertices(vertices, vertices, nullptr), DataException);
    const auto surface = CreateSurface();
    EXPECT_EQ(surface->GetVertex(3), nullptr);
    EXPECT_EQ(surface->GetTriangle(std::numeric_limits<unsigned>::max()), nullptr);
}

TEST_F(BadArgumentsTest, QueriesOfNothingFindNothing) {
    const auto surface = CreateSurface();
    AabbTree tree(surface.get());
    tree.SetCapacity(-5);
    tree.CreateTree(surface.get());
    const AabbTree rootless;
    float height = 0.0F;
    for (const AabbTree* index :
         {static_cast<const AabbTree*>(nullptr), static_cast<const AabbTree*>(&tree), &rootless}) {
        for (const double bad : {NaN, FAR, -FAR}) {
            EXPECT_FALSE(surface->GetHeight(bad, 21.0, height, index));
            EXPECT_FALSE(surface->GetHeight(11.0, bad, height, index));
            BBox<double, point2_t<double>> region;
            region.min = {bad, bad};
            region.max = {-bad, bad};
            // Without an index a NaN leaves its side of the region open.
            const std::unique_ptr<Tin> subset(surface->SubsetByRegion(region, index));
            EXPECT_TRUE(subset == nullptr || (std::isnan(bad) && index == nullptr));
        }
        for (const unsigned count : {0U, 1U, 2U}) {
            EXPECT_EQ(
                surface->SubsetByLineString(static_cast<point2_t<double>*>(nullptr), count, index),
                nullptr);
            EXPECT_EQ(
                surface->SubsetByLineString(static_cast<point2_t<float>*>(nullptr), count, index),
                nullptr);
        }
    }
    EXPECT_FALSE(surface->GetHeight(11.0, 21.0, height, &rootless));
    std::vector<int> cells;
    std::vector<float> heights;
    for (const int size : {0, -1, std::numeric_limits<int>::min()}) {
        EXPECT_EQ(surface->GetTriangle(0)->GetGridPoints(size, 9, cells, heights), 0U);
        EXPECT_EQ(surface->GetTriangle(0)->GetGridPointsNum(9, size), 0U);
    }
    EXPECT_GT(EstimateAabbTreeBytes(std::numeric_limits<unsigned>::max()), 0U);
}

} // namespace

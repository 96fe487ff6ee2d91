#include "services/exception.h"
#include "tests/scripted/readerfixture.h"
#include "tests/support/allocationcounter.h"
#include "tin/crossingtree.h"
#include "tin/heightgrid.h"
#include "tin/raster.h"
#include "tin/triangulate.h"

#include <omp.h>

#include <cmath>
#include <cstdio>

namespace {

struct AllocationFailureTest : ReaderTest {
    void SetUp() override {
        omp_set_num_threads(4);
        Recording::poTranscript = nullptr; // it would keep memory
        if (!kelm::tin::test::AllocationCounter::IS_ACTIVE)
            GTEST_SKIP() << "the operators of the sanitizer are in force";
    }

    /// Fails each request of an operation, which must give the undisturbed answer right after.
    template <typename Operation>
    static void FailEach(const Operation& operation) {
        const auto expected = operation();
        const long runs = kelm::tin::test::FailEachRequest([&] {
            try {
                EXPECT_EQ(operation(), expected);
            } catch (const kelm::Exception& e) {
                const std::string text = e.what();
                EXPECT_TRUE(text == "Octree2 error" || text.find("The format of") == 0) << text;
                throw std::bad_alloc();
            }
        });
        std::printf("%ld runs with a failed allocation\n", runs);
    }
};

// The services fail, too. Two shapes are left out, whose warnings are requests as well.
TEST_F(AllocationFailureTest, OpeningAndLoadingWithPolygonsAndADatumChange) {
    for (const unsigned vertices : {40U, 41U, 1001U}) { // the last are interpolated
        script.shapes = CreateStrip(vertices, 5);
        script.shapes[0][1].x += vertices == 41 ? 5e-10 : 0.0; // a near twin takes the octree
        script.shapes.push_back({});
        const double x = STRIP_X, y = STRIP_Y;
        script.shapes.push_back({{x, y, 0}, {x + 4, y + 4, 0}, {x + 4, y, 0}, {x, y + 4, 0}, {}});
        script.shapes.push_back({{x, y, 1}, {x + 9, y, 2}, {x + 5, y + 3, 3}, {x, y + 9, 4}, {}});
        for (Ring& ring : script.shapes)
            for (ZARVertex& v : ring) // on a line the grid has one row of nodes
                v.y = vertices == 1001 ? y : v.y;
        FailEach([&] {
            const Reader reader = Open(0.5, 2.0);
            reader->SetOutputVerticalDatum(DatumType(2001));
            return Summarise(Load(*reader));
        });
    }
}

// A tree asks for a node a corner.
TEST_F(AllocationFailureTest, OnlyNearTwinsAndWildCornersTakeTheOctree) {
    for (const double near : {0.0, 5e-10, HUGE_VAL}) {
        script.shapes = CreateStrip(3000, 5);
        script.shapes[1000][1].x += near; // behind what is hashed already
        const Reader reader = Open();
        const kelm::tin::test::AllocationCounter counter;
        const Surface surface = Load(*reader);
        EXPECT_EQ(surface->GetVertexCount(), near == HUGE_VAL ? 3001U : 3000U);
        EXPECT_EQ(surface->GetTriangleCount(), 2998U);
        EXPECT_EQ(kelm::tin::test::AllocationCounter::mnRequests > 3000, near != 0.0) << near;
    }
}

TEST_F(AllocationFailureTest, ARingThatIsLargeEnoughForAnIndex) {
    std::vector<ZARVertex> arc;
    for (int i = -1030; i <= 1030; ++i)
        arc.push_back({1.0 * i, 1.0 * i * i, 0});
    const ZARShape shape{arc.data(), static_cast<int>(arc.size())};
    FailEach([&] {
        std::vector<Triangle_Id> ids;
        return Triangulate(kelm::tin::Polygon<double>(&shape, PO_Undefined), ids) +
               static_cast<int>(ids.size());
    });
}

TEST_F(AllocationFailureTest, AReaderConvertsToTheDatumThatItTells) {
    const Reader reader = Open(0.0, 1.0, 2001);
    reader->SetOutputVerticalDatum(DatumType(2002));
    FailEach([&] {
        const int datum = reader->GetOutputVerticalDatum();
        const float height = Load(*reader)->GetVertex(0)->z;
        reader->SetOutputVerticalDatum(DatumType(2002 + 2005 - datum));
        return height == float(scripted::Convert(10, 20, 5, datum - 2001));
    });
}

TEST_F(AllocationFailureTest, SurfaceTreeCopiesSearchesAndSubsets) {
    script.shapes = CreateStrip(240, 50);
    const Surface loaded = Load(*Open());
    const Opened surface(*loaded);
    AabbTree tree;
    tree.SetCapacity(1);
    FailEach([&] {
        auto ids = std::make_unique<Triangle_Id[]>(9);
        const kelm::tin::Tin fromArrays(nullptr, 0, ids.get(), 9, 0.0, 0.0);
        static_cast<void>(ids.release());
        tree.CreateTree(&surface);
        return AabbTree(&surface).GetNodeCount() + tree.GetNodeCount();
    });
    for (const bool isIndexed : {false, true})
        FailEach([&] { return surface.Ask(isIndexed ? &tree : nullptr, 7); });
    const kelm::tin::test::AllocationCounter counter;
    float h;
    surface.GetHeight(30.0F, 20.0F, h, &tree);
    surface.GetLineIntersectHeight(point3_t<float>{0, 0, 0}, {900, 30, 900}, h, &tree);
    EXPECT_EQ(kelm::tin::test::AllocationCounter::mnRequests, 0) << "a query needs no memory";
}

TEST_F(AllocationFailureTest, ATreeThatIsBuiltInParts) {
    script.shapes = CreateStrip(20002, 50);
    for (const unsigned copies : {0U, 2500U}) { // no node may have more triangles but these
        script.shapes.insert(script.shapes.end(), copies, script.shapes[19000]);
        const Surface surface = Load(*Open());
        const auto build = [&] {
            AabbTree tree;
            tree.SetCapacity(2000);
            tree.CreateTree(surface.get());
            EXPECT_EQ(tree.GetCapacity(), copies == 0 ? 2000U : 2501U);
            return tree.GetNodeCount();
        };
        if (copies == 0)
            FailEach(build);
        const unsigned nodes = build();
        for (long n = 1; n < 50; ++n) { // the copies may be met first, and no request fails then
            const kelm::tin::test::AllocationCounter counter(n, n % 2 == 0);
            try {
                EXPECT_EQ(build(), nodes);
            } catch (const std::bad_alloc&) {
            }
            kelm::tin::test::AllocationCounter::mnFailFrom = LONG_MAX;
            EXPECT_EQ(build(), nodes);
            EXPECT_EQ(kelm::tin::test::AllocationCounter::mnBalance, 0) << "request " << n;
        }
    }
}

TEST_F(AllocationFailureTest, CrossingTreeAndBatchesOfLines) {
    script.shapes = CreateStrip(240, 50);
    const Surface surface = Load(*Open());
    surface->GetTriangle(3)->GetBBox().max.x += 1.0F; // kept apart
    const point3_t<double> lines[] = {{STRIP_X, STRIP_Y + 9, 900},
                                      {STRIP_X + 90, STRIP_Y, 600},
                                      {STRIP_X, STRIP_Y, 9000},
                                      {STRIP_X, STRIP_Y, 9000}};
    FailEach([&] {
        const kelm::tin::CrossingTree tree(*surface);
        float heights[4];
        EXPECT_EQ(tree.GetLineIntersectHeights(lines, 2, heights), 1U);
        EXPECT_EQ(surface->GetLineIntersectHeights(lines, 2, heights + 2, nullptr), 1U);
        EXPECT_TRUE(heights[0] == heights[2] && heights[1] != heights[1]);
        return heights[0];
    });
}

TEST_F(AllocationFailureTest, HeightGridBatchesAndRaster) {
    script.shapes = CreateStrip(240, 50);
    for (unsigned i = 0; i < 400; ++i) // copies, which no grid divides
        script.shapes.push_back(script.shapes[0]);
    const Surface surface = Load(*Open());
    const point2_t<double> positions[] = {{STRIP_X + 2, STRIP_Y + 9}, {STRIP_X + 300, STRIP_Y + 5}};
    for (const double turn : {0.0, 0.1})
        FailEach([&] {
            const kelm::tin::HeightGrid grid(*surface);
            float heights[2], same[2];
            EXPECT_EQ(grid.GetHeights(positions, 2, heights), 2U);
            EXPECT_EQ(surface->GetHeights(positions, 2, same, nullptr), 2U);
            EXPECT_TRUE(heights[0] == same[0] && heights[1] == same[1]);
            const kelm::tin::RasterFrame frame{9, 5, {STRIP_X, 99, turn, STRIP_Y, 0, 9}};
            std::vector<float> cells(45);
            return kelm::tin::RasterizeHeights(*surface, frame, cells.data(), 0,
                                               kelm::tin::ER_Closed);
        });
}

} // namespace

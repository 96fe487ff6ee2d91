#include "tests/scripted/readerfixture.h"

#include <algorithm>
#include <atomic>
#include <set>
#include <thread>

namespace {

class LoadTest : public ReaderTest {
  protected:
    /// @return number of triangles; 0 for no surface
    static unsigned Count(TinReader& reader, const Window& window) {
        const Surface surface = Load(reader, &window);
        return surface ? surface->GetTriangleCount() : 0;
    }
};

TEST_F(LoadTest, AWindowSelectsWholePolygonsAndTouchingCounts) {
    script.shapes = {Close({{0, 0, 0}, {10, 0, 0}, {0, 10, 0}}),
                     Close({{30, 0, 0}, {40, 0, 0}, {40, 10, 0}, {35, 12, 0}, {30, 10, 0}})};
    script.low = {0, 0, 0};
    script.high = {40, 12, 0};
    const Reader reader = Open();
    EXPECT_EQ(Load(*reader)->GetTriangleCount(), 4U);
    EXPECT_EQ(Count(*reader, MakeWindow(38, 1, 50, 2)), 3U) << "one edge crosses";
    EXPECT_EQ(Count(*reader, MakeWindow(10, -5, 30, 0)), 4U) << "touches two corners";
    EXPECT_EQ(Count(*reader, MakeWindow(6, 6, 29, 11)), 0U) << "meets the box of one, no polygon";
    EXPECT_EQ(Count(*reader, MakeWindow(40, 0, 50, 5)), 3U) << "touches the extents";
    script.calls.clear();
    for (const Window& window :
         {MakeWindow(40.000001, 0, 50, 5), MakeWindow(-9, 0, -1, 5), MakeWindow(0, 13, 9, 14),
          MakeWindow(0, -4, 9, -3), MakeWindow(NaN, 0, 9, 9), MakeWindow(0, NaN, 9, 9),
          MakeWindow(0, 0, NaN, 9), MakeWindow(0, 0, 9, NaN)})
        EXPECT_EQ(Count(*reader, window), 0U);
    EXPECT_TRUE(script.calls.empty()) << "none of these reads the layer";
}

TEST_F(LoadTest, AShapeOfFourVerticesIsTheTriangleOfItsFirstThree) {
    script.shapes = {{{{1, 2, 3}, {5, 2, 4}, {5, 5, 6}, {100, 100, 100}}}, // not closed
                     Close({{9, 0, 0}, {9, 1, 1}, {9, 2, 2}}),             // flat
                     Close({{7, 7, 1}, {7, 7, 1}, {8, 8, 2}})};            // twice the same corner
    const Reader reader = Open();
    const Window window = MakeWindow(0, 0, 50, 50);
    for (const Window* wanted : {static_cast<const Window*>(nullptr), &window}) {
        const Surface surface = Load(*reader, wanted);
        EXPECT_EQ(surface->GetTriangleCount(), 3U);
        EXPECT_EQ(surface->GetVertexCount(), 8U);
        EXPECT_EQ(surface->GetTriangle(0)->GetVertex(2), surface->GetVertex(2));
        EXPECT_EQ(surface->GetVertex(0)->x, 0.0F);
        EXPECT_EQ(surface->GetVertex(2)->y, 3.0F);
        EXPECT_EQ(surface->GetVertex(2)->z, 6.0F);
        EXPECT_EQ(surface->GetTriangle(2)->GetVertex(0), surface->GetTriangle(2)->GetVertex(1));
    }
    EXPECT_TRUE(script.warnings.empty());
}

TEST_F(LoadTest, WhatCannotBeUsedIsLeftOutAndNamed) {
    const Shape good = script.shapes[0];
    const Shape bowTie = Close({{0, 0, 0}, {9, 9, 0}, {9, 0, 0}, {0, 9, 0}});
    const Shape flat = Close({{0, 0, 0}, {1, 1, 0}, {2, 2, 0}, {3, 3, 0}});
    script.shapes = {good, bowTie, {good.ring, Shape::Throws}, flat, good};
    const Reader reader = Open();
    const Surface surface = Load(*reader);
    EXPECT_EQ(surface->GetTriangleCount(), 2U);
    EXPECT_EQ(surface->GetVertexCount(), 3U);
    const auto text = [](int id) {
        return "Triangulate(): Polygon# " + std::to_string(id) +
               " is ignored becasue it is not simple.\n tin/tinreader";
    };
    EXPECT_EQ(script.warnings, (std::vector<std::string>{text(110), text(130)}));
    script.shapes = {{good.ring, Shape::Null}, bowTie, {good.ring, Shape::Throws}};
    EXPECT_EQ(Load(*reader), nullptr);
    EXPECT_EQ(script.warnings.size(), 4U);
}

TEST_F(LoadTest, AFailedLoadLeavesTheReaderUsable) {
    script.shapes.push_back({{{900, 900, 0}, {901, 900, 0}, {900, 900, 0}}});
    const Reader reader = Open();
    const Window window = MakeWindow(0, 0, 50, 50);
    for (int i = 0; i < 2; ++i) // a lock left behind would stop the second
        EXPECT_STREQ(Catch<DataException>([&] { Load(*reader, &window); }).what(),
                     "3 points could not forma polygon");
    script.shapes.pop_back();
    EXPECT_EQ(Count(*reader, window), 1U);
}

// Of each run of repeats the first vertex gives the height.
TEST_F(LoadTest, CornersOfACompactedRingKeepTheirHeights) {
    script.shapes = {Close({{0, 0, 0},
                            {0, 5e-10, 1},
                            {10, 0, 2},
                            {10, 0, 3},
                            {10, 0, 4},
                            {10, 10, 5},
                            {10 + 9e-10, 10, 6},
                            {10, 10 + 9e-10, 7},
                            {0, 10, 8}})};
    const Surface surface = Load(*Open());
    EXPECT_EQ(surface->GetTriangleCount(), 2U);
    std::set<std::vector<float>> vertices;
    for (unsigned i = 0; i < surface->GetVertexCount(); ++i) {
        const point3_t<float>& v = *surface->GetVertex(i);
        const point3_t<float>& origin = *surface->GetVertex(0); // (0, 10)
        vertices.insert({v.x - origin.x, v.y - origin.y, v.z});
    }
    EXPECT_EQ(vertices,
              (std::set<std::vector<float>>{{0, -10, 0}, {10, -10, 2}, {10, 0, 5}, {0, 0, 8}}));
}

TEST_F(LoadTest, NeighboursShareVerticesUnlessTheirHeightsDiffer) {
    script.shapes = {Close({{0, 0, 0}, {9, 0, 1}, {0, 9, 2}}),
                     Close({{9, 0, 1}, {9, 9, 3}, {0, 9, 2.5}})};
    const Surface surface = Load(*Open());
    EXPECT_EQ(surface->GetVertexCount(), 5U);
    EXPECT_EQ(surface->GetTriangle(0)->GetVertex(1), surface->GetTriangle(1)->GetVertex(0));
    for (const unsigned triangles : {1000U, 1001U}) {
        script.shapes = CreateStrip(triangles + 2, [](unsigned i) { return 1.0 * i; });
        const Surface strip = Load(*Open());
        ASSERT_EQ(strip->GetTriangleCount(), triangles);
        ASSERT_EQ(strip->GetVertexCount(), triangles + 2);
        for (unsigned i = 0; i < triangles; ++i)
            for (unsigned k = 0; k < 3; ++k)
                ASSERT_EQ(strip->GetTriangle(i)->GetVertex(int(k)), strip->GetVertex(i + k));
    }
}

// The first load dwells on its shapes for the second to come in, which it must not.
TEST_F(LoadTest, LoadsOfTwoThreadsRunOneAfterTheOther) {
    script.shapes = CreateStrip(300, [](unsigned i) { return 1.0 * i; });
    std::atomic<int> started{0}, inside{0}, most{0};
    script.onShape = [&] {
        most = std::max(most.load(), ++inside);
        for (int i = 0; i < (started < 2 ? 1000 : 20); ++i)
            std::this_thread::yield();
        --inside;
    };
    const Reader reader = Open();
    const auto load = [&] {
        ++started;
        EXPECT_EQ(Load(*reader)->GetVertexCount(), 300U);
    };
    std::thread other(load);
    load();
    other.join();
    EXPECT_EQ(most, 1);
}

} // namespace

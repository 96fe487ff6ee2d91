#include "tests/scripted/readerfixture.h"
#include "tin/crossingtree.h"
#include "tin/heightgrid.h"
#include "tin/raster.h"

#include <atomic>
#include <cstring>
#include <thread>

namespace {

struct ThreadTest : ReaderTest {
    ThreadTest() { script.shapes = CreateStrip(1200, 50); }

    /// Runs the work on eight threads at once; its argument numbers them.
    template <typename Work>
    static void RunOnThreads(const Work& work) {
        std::vector<std::thread> threads;
        for (unsigned i = 0; i < 8; ++i)
            threads.emplace_back(work, i);
        for (std::thread& thread : threads)
            thread.join();
    }

    std::atomic<int> mnDifferent{0};
};

TEST_F(ThreadTest, QueriesOfEveryKindOnOneSurfaceAndTree) {
    constexpr unsigned PLACES = 60;
    const Surface loaded = Load(*Open());
    const Opened surface(*loaded);
    const AabbTree tree(&surface);
    for (const AabbTree* index : {static_cast<const AabbTree*>(nullptr), &tree}) {
        std::vector<double> table;
        for (unsigned place = 0; place < PLACES; ++place)
            table.push_back(surface.Ask(index, place));
        EXPECT_NE(table[5], table[6]);
        RunOnThreads([&](unsigned thread) {
            for (unsigned i = 0; i < 3 * PLACES; ++i) {
                const unsigned place = (i + 7 * thread) % PLACES;
                mnDifferent += surface.Ask(index, place) != table[place];
            }
        });
    }
    EXPECT_EQ(mnDifferent, 0);
}

TEST_F(ThreadTest, BuildsOfAabbTreesInParts) {
    script.shapes = CreateStrip(21000, 50);
    const Surface whole = Load(*Open());
    script.shapes.insert(script.shapes.end(), 9, script.shapes[15000]); // cannot be divided
    const Surface copies = Load(*Open());
    const AabbTree tree(whole.get()), raised(copies.get());
    RunOnThreads([&](unsigned thread) {
        const AabbTree own(thread % 2 == 0 ? whole.get() : copies.get());
        const AabbTree& same = thread % 2 == 0 ? tree : raised;
        mnDifferent += own.GetNodeCount() != same.GetNodeCount();
        mnDifferent += own.GetCapacity() != same.GetCapacity();
    });
    EXPECT_TRUE(mnDifferent == 0 && tree.GetCapacity() == 5 && raised.GetCapacity() == 10);
    EXPECT_NE(transcript.Take(), "");
}

TEST_F(ThreadTest, BatchesOnOneCrossingTreeAndSurface) {
    const Surface surface = Load(*Open());
    const AabbTree tree(surface.get());
    const kelm::tin::CrossingTree crossings(*surface);
    constexpr std::size_t COUNT = 3000;
    std::vector<point3_t<double>> lines;
    for (unsigned i = 0; i < COUNT; ++i)
        for (const double z : {900.0, 500.0})
            lines.push_back({STRIP_X + 1.5 * i + z / 20, STRIP_Y + i % 41, z});
    std::vector<float> wanted(COUNT);
    const auto found = surface->GetLineIntersectHeights(lines.data(), COUNT, wanted.data(), &tree);
    RunOnThreads([&](unsigned thread) {
        const int team = thread % 2 == 0 ? 1 : 3;
        std::vector<float> heights(COUNT);
        const kelm::tin::CrossingTree own(*surface, {team, 0, {}});
        for (const auto* index : {&crossings, &own}) {
            mnDifferent +=
                index->GetLineIntersectHeights(lines.data(), COUNT, heights.data(), team) != found;
            mnDifferent += std::memcmp(heights.data(), wanted.data(), 4 * COUNT) != 0;
        }
        mnDifferent += surface->GetLineIntersectHeights(lines.data(), COUNT, heights.data(), &tree,
                                                        team) != found;
        mnDifferent += std::memcmp(heights.data(), wanted.data(), 4 * COUNT) != 0;
    });
    EXPECT_TRUE(mnDifferent == 0 && found > 1000 && found < COUNT);
}

TEST_F(ThreadTest, BatchesOnOneHeightGridAndSurface) {
    const Surface surface = Load(*Open());
    const AabbTree tree(surface.get());
    const kelm::tin::HeightGrid grid(*surface);
    std::vector<point2_t<double>> positions;
    for (unsigned i = 0; i < 25000; ++i)
        positions.push_back({STRIP_X + 0.177 * i, STRIP_Y + i % 41});
    const kelm::tin::RasterFrame frame{300, 200, {STRIP_X, 14, 0, STRIP_Y, 0, 0.2}};
    std::vector<float> wanted(positions.size()), cells(300 * 200);
    const auto found = grid.GetHeights(positions.data(), positions.size(), wanted.data(), 1);
    const auto filled = RasterizeHeights(*surface, frame, cells.data(), 1);
    RunOnThreads([&](unsigned thread) {
        const int team = thread % 2 == 0 ? 1 : 3;
        std::vector<float> heights(positions.size(), -1.0F), same = heights, raster(cells.size());
        const kelm::tin::HeightGrid own(*surface, {team, 0, {}});
        mnDifferent +=
            own.GetHeights(positions.data(), positions.size(), heights.data(), team) != found;
        mnDifferent += grid.GetHeights(positions.data(), 5000, same.data(), team) == 0;
        mnDifferent += std::memcmp(heights.data(), wanted.data(), 4 * wanted.size()) != 0;
        mnDifferent += std::memcmp(same.data(), wanted.data(), 4 * 5000) != 0;
        mnDifferent += surface->GetHeights(positions.data(), positions.size(), same.data(), &tree,
                                           team) != found;
        mnDifferent += RasterizeHeights(*surface, frame, raster.data(), team) != filled;
    });
    EXPECT_TRUE(mnDifferent == 0 && found > 20000 && filled > 20000);
}

TEST_F(ThreadTest, LoadsOnOneReaderAndOnSeveral) {
    const Window window(500100, 4600000, 500900, 4600040);
    const Reader shared = Open();
    shared->SetOutputVerticalDatum(DatumType(2001));
    const double whole = Summarise(Load(*shared)), part = Summarise(Load(*shared, &window));
    EXPECT_NE(whole, part);
    RunOnThreads([&](unsigned thread) {
        const Reader own = Open();
        own->SetOutputVerticalDatum(DatumType(2001));
        for (unsigned i = 0; i < 3; ++i) {
            TinReader& reader = (i + thread) % 2 == 0 ? *shared : *own;
            mnDifferent += Summarise(Load(reader)) != whole;
            mnDifferent += Summarise(Load(reader, &window)) != part;
            mnDifferent += reader.GetShapeCount() != 1 || reader.EstimateLoadBytes() == 0;
        }
    });
    EXPECT_EQ(mnDifferent, 0);
}

struct Marker : kelm::tin::Triangle {
    using Triangle::GetGridPointIdx;
};

// Without the sanitizer a lost update shows now and then only.
TEST_F(ThreadTest, TrianglesMarkOneGrid) {
    constexpr unsigned ROUNDS = 100000;
    point3_t<float> corners[] = {{0, 0, 0}, {4, 0, 0}, {0, 4, 0}};
    Marker triangle;
    triangle.SetVertices(&corners[0], &corners[1], &corners[2]);
    unsigned counts[64] = {};
    int sums[64] = {}; // in another cache line
    RunOnThreads([&](unsigned) {
        double bary[3];
        for (unsigned i = 0; i < ROUNDS; ++i)
            triangle.GetGridPointIdx(1, 2, 5, 7, counts, sums, bary);
    });
    EXPECT_TRUE(counts[11] == 8 * ROUNDS && sums[11] == int(7 * 8 * ROUNDS));
}

} // namespace

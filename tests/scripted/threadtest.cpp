#include "tests/scripted/readerfixture.h"
#include "tin/aabbtree.h"

#include <array>
#include <atomic>
#include <thread>

using kelm::tin::AabbTree;

namespace {

constexpr unsigned THREADS = 8;
constexpr unsigned ROUNDS = 3;

/// Runs the work on all threads at once; its argument numbers them.
template <typename Work>
void RunOnThreads(const Work& work) {
    std::vector<std::thread> threads;
    for (unsigned i = 0; i < THREADS; ++i)
        threads.emplace_back(work, i);
    for (std::thread& thread : threads)
        thread.join();
}

using Answers = std::array<double, 8>;

double GetCount(const Surface& surface) {
    return surface ? surface->GetTriangleCount() + 1000.0 * surface->GetVertexCount() : -1.0;
}

/// One query of each kind, at a place along the strip.
Answers Ask(const Tin& surface, const AabbTree* tree, unsigned place) {
    Answers answers{};
    const double x = 500000.25 + 11.3 * place;
    const double y = 4600000.5 + place % 41;
    float height = 0.0F;
    answers[0] = surface.GetHeight(x, y, height, tree) ? double(height) : -1.0;
    answers[1] = surface.GetLineIntersectHeight(point3_t<double>{x, y, 900.0},
                                                point3_t<double>{x + 30.0, y, -900.0}, height, tree)
                     ? double(height)
                     : -1.0;
    answers[2] = GetCount(Surface(surface.SubsetByRegion(MakeWindow(x, y, x + 9, y + 9), tree)));
    const point2_t<double> path[] = {{x, y}, {x + 20.0, y + 5.0}, {x, y + 30.0}};
    answers[3] = GetCount(Surface(surface.SubsetByLineString(path, 3, tree)));
    std::vector<int> cells;
    std::vector<float> heights;
    answers[4] = surface.GetTriangle(place)->GetGridPoints(900, 90, cells, heights);
    answers[5] = surface.GetTriangle(place)->GetGridPointsNum(900, 90);
    std::vector<unsigned> leaves;
    if (tree != nullptr)
        tree->FindLeaves(11.3F * float(place), 1.0F, leaves);
    answers[6] = double(leaves.size());
    answers[7] = double(Tin(surface).GetVertex(place)->z);
    return answers;
}

struct ThreadTest : ReaderTest {
    ThreadTest() {
        script.shapes = CreateStrip(1200, [](unsigned i) { return 0.5 * (i % 50); });
    }
};

TEST_F(ThreadTest, QueriesOfEveryKindOnOneSurfaceAndTree) {
    constexpr unsigned PLACES = 60;
    const Surface surface = Load(*Open());
    const AabbTree tree(surface.get());
    for (const AabbTree* index : {static_cast<const AabbTree*>(nullptr), &tree}) {
        std::vector<Answers> table;
        for (unsigned place = 0; place < PLACES; ++place)
            table.push_back(Ask(*surface, index, place));
        EXPECT_GE(table[5][0], 0.0);
        EXPECT_GT(table[5][2], 0.0);
        std::atomic<int> different{0};
        RunOnThreads([&](unsigned thread) {
            for (unsigned i = 0; i < ROUNDS * PLACES; ++i) {
                const unsigned place = (i + 7 * thread) % PLACES;
                different += Ask(*surface, index, place) != table[place];
            }
        });
        EXPECT_EQ(different, 0);
    }
}

TEST_F(ThreadTest, LoadsOnOneReaderAndOnSeveral) {
    const Reader shared = Open();
    shared->SetOutputVerticalDatum(VD_Orthometric);
    const Window window = MakeWindow(500100, 4600000, 500900, 4600040);
    const double whole = GetCount(Load(*shared));
    const double part = GetCount(Load(*shared, &window));
    EXPECT_GT(whole, part);
    EXPECT_GT(part, 0.0);
    std::atomic<int> different{0};
    RunOnThreads([&](unsigned thread) {
        const Reader own = Open();
        own->SetOutputVerticalDatum(VD_Orthometric);
        for (unsigned i = 0; i < ROUNDS; ++i) {
            TinReader& reader = (i + thread) % 2 == 0 ? *shared : *own;
            different += GetCount(Load(reader)) != whole;
            different += GetCount(Load(reader, &window)) != part;
            different += reader.GetShapeCount() != 1198 || reader.EstimateLoadBytes() == 0;
        }
    });
    EXPECT_EQ(different, 0);
}

} // namespace

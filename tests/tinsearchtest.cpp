#include "tests/support/allocationcounter.h"
#include "tests/support/sheets.h"

#include <omp.h>

namespace kelm::tin::test {

namespace {

/// Sets the number of threads for its own life.
struct Threads {
    explicit Threads(int nThreads) { omp_set_num_threads(nThreads); }
    Threads(const Threads&) = delete;
    ~Threads() { omp_set_num_threads(mnBefore); }
    int mnBefore = omp_get_max_threads();
};

/// Compares both forms of the search and of the height with a loop over all triangles.
void ExpectFound(const OpenTin& tin, const AabbTree& tree, const Point2& p) {
    const auto holds = [&](const Triangle& t) { return t.IsPointInside(p.x, p.y); };
    const auto meets = [&](const Box& box) { return TestInside(box, p.x, p.y); };
    Indices scanned, walked;
    tin.FindTrianglesByPoint(p.x, p.y, scanned, nullptr);
    tin.FindTrianglesByPoint(p.x, p.y, walked, &tree);
    ASSERT_EQ(scanned, Filter(tin, tin.GetAll(), holds));
    ASSERT_EQ(walked, Filter(tin, CollectLeaves(tree.GetRoot(), meets), holds));
    ASSERT_EQ(Sorted(walked), scanned);
    float h, highest = TestInside(tin.GetBBox(), p.x, p.y) ? LOWEST : UNTOUCHED;
    for (const unsigned i : scanned)
        if (tin.GetTriangle(i)->GetHeight(p.x, p.y, h) && h > highest)
            highest = h;
    const bool isFound = highest != LOWEST && highest != UNTOUCHED;
    ASSERT_EQ(tin.GetHeight(p.x, p.y, h = UNTOUCHED, nullptr), isFound);
    ASSERT_EQ(h, highest);
    ASSERT_EQ(tin.GetHeight(p.x, p.y, h = UNTOUCHED, &tree), isFound);
    ASSERT_EQ(h, highest);
}

} // namespace

TEST(TinSearch, BothFormsFindTheSameOnAnyNumberOfThreads) {
    Random random;
    for (const int nThreads : {1, 2, 8})
        for (const Mesh& mesh : MakeMeshes(random)) {
            const Threads threads(nThreads);
            const OpenTin tin = mesh.MakeTin();
            const Threads changed(nThreads % 3 + 1); // raised, too
            const AabbTree tree(&tin);
            for (int i = 0; i < 2000 / nThreads && !HasFatalFailure(); ++i) {
                const Point2 p = MakePosition(tin, random);
                SCOPED_TRACE(testing::Message() << p.x << " " << p.y);
                ExpectFound(tin, tree, p);
            }
        }
}

TEST(TinSearch, RandomPositionsAndVerticesOfASheetAreFound) {
    Random random;
    const OpenTin tin = MakeSheet(30, 3, random).MakeTin();
    const AabbTree tree(&tin);
    for (unsigned i = 0; i < 20000; ++i) {
        const Point v = *tin.GetVertex(i % tin.GetVertexCount());
        float h;
        EXPECT_TRUE(tin.GetHeight(v.x, v.y, h, &tree) && h >= v.z);
        EXPECT_TRUE(tin.GetHeight(random.Between(5, 295), random.Between(5, 295), h, &tree));
    }
}

TEST(TinSearch, HeightIsUntouchedOutsideTheBoxAndLowestInAHole) {
    Mesh mesh;
    mesh.Add({0, 0, 1}, {4, 0, 5}, {0, 4, 1});
    mesh.Add({1, -1, -5}, {4, 4, -5}, {4, 4, 9}); // a wall
    const OpenTin tin = mesh.MakeTin(100000000.25, -2000);
    const AabbTree tree(&tin), rootless, *const indices[] = {nullptr, &tree, &rootless};
    for (const AabbTree* index : indices) {
        float h = UNTOUCHED;
        EXPECT_FALSE(tin.GetHeight(4.5F, 1.0F, h, index));
        EXPECT_FALSE(tin.GetHeight(NOT_A_NUMBER, 1.0F, h, index));
        EXPECT_EQ(h, UNTOUCHED);
        EXPECT_EQ(tin.GetHeight(100000001.5, -1999.0, h, index), index != &rootless);
        EXPECT_EQ(h, index == &rootless ? LOWEST : 2.25F);
        EXPECT_FALSE(tin.GetHeight(3.0F, 3.0F, h, index));
        EXPECT_EQ(h, LOWEST);
        EXPECT_FALSE(tin.GetHeight(2.0F, -1e-45F, h, index)); // the triangle's box decides
    }
    Indices list = {1, 0}; // a walk puts what stood there to the test, a scan keeps it
    tin.FindTrianglesByPoint(1, 1, list, &tree);
    EXPECT_EQ(list, (Indices{0, 0}));
    tin.FindTrianglesByPoint(1, 1, list, nullptr);
    EXPECT_EQ(list, (Indices{0, 0, 0}));
}

TEST(TinSearch, RegionsByLeavesOrByEdges) {
    Random random;
    for (const Mesh& mesh : MakeMeshes(random)) {
        const OpenTin tin = mesh.MakeTin();
        const AabbTree tree(&tin);
        for (int i = 0; i < 300; ++i) {
            Box region;
            region.min = MakePosition(tin, random);
            region.max = i % 3 == 0 ? region.min : MakePosition(tin, random); // inverted ones too
            const auto isMet = [&](const Triangle& t) { return t.IsIntersected(region); };
            const auto meets = [&](const Box& b) {
                return b.max.x >= region.min.x && region.max.x >= b.min.x &&
                       b.max.y >= region.min.y && region.max.y >= b.min.y;
            };
            Indices scanned, walked;
            tin.FindTrianglesByRegion(region, scanned, nullptr);
            tin.FindTrianglesByRegion(region, walked, &tree);
            ASSERT_EQ(scanned, Filter(tin, tin.GetAll(), isMet)) << i;
            ASSERT_EQ(walked, CollectLeaves(tree.GetRoot(), meets)) << i;
        }
    }
}

TEST(TinSearch, QueriesWithATreeAllocateNothing) {
    if (!AllocationCounter::IS_ACTIVE)
        GTEST_SKIP();
    Random random;
    const OpenTin tin = MakeMeshes(random)[3].MakeTin();
    const AabbTree tree(&tin);
    const AllocationCounter counter;
    for (int i = 0; i < 2000; ++i) {
        const auto [x, y] = MakePosition(tin, random);
        float h;
        tin.GetHeight(x, y, h, &tree);
        tin.GetLineIntersectHeight(Point{x, y, 99}, {x + 30, y, -99}, h, &tree);
        tin.GetHeight(-100.0F, y, h, nullptr);
    }
    EXPECT_EQ(counter.mnRequests, 0);
}

TEST(TinSearch, AFailedAllocationOfAWorkerReachesTheCaller) {
    if (!AllocationCounter::IS_ACTIVE)
        GTEST_SKIP();
    const Threads threads(2);
    Mesh stack;
    for (int i = 0; i < 100; ++i)
        stack.Add({0, 0, 0}, {4, 0, 1}, {0, 4, 1});
    const OpenTin tin = stack.MakeTin();
    float h;
    EXPECT_GT(FailEachRequest([&] { tin.GetHeight(1.0F, 1.0F, h, nullptr); }), 10);
}

} // namespace kelm::tin::test

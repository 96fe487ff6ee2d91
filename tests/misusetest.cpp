#include "tests/support/allocationcounter.h"
#include "tests/support/sheets.h"
#include "tests/support/transcript.h"
#include "tin/ray2.h"

// What headers let a caller write must not crash. Bad releases show under the address sanitizer.

namespace kelm::tin::test {
namespace {

Mesh MakeSmallSheet(unsigned triangles) {
    Mesh mesh;
    for (unsigned i = 0; i < triangles; ++i) {
        const auto x = static_cast<float>(i);
        mesh.Add({x, 0, 1}, {x + 1, 0, 2}, {x, 1, 3});
    }
    return mesh;
}

TEST(MisuseTest, ATreeOfAnotherNumberOfTrianglesIsRefusedByEveryQuery) {
    kelm::test::Transcript transcript;
    const OpenTin tin = MakeSmallSheet(20).MakeTin();
    const Point a{0.2F, 0.2F, 9}, b{0.3F, 0.2F, -9};
    const point3_t<double> mapA{0.2, 0.2, 9}, segment[] = {mapA, mapA};
    const point2_t<float> path[] = {{0, 0}, {9, 0.5F}};
    const point2_t<double> mapPath[] = {{0, 0}, {9, 0.5}};
    const auto mapBox = MakeBox(mapPath[0], mapPath[1]);
    for (const unsigned count : {19U, 21U}) {
        const OpenTin other = MakeSmallSheet(count).MakeTin();
        const AabbTree tree(&other);
        float h;
        Indices list;
        const std::function<void()> queries[] = {
            [&] { tin.GetHeight(0.2F, 0.2F, h, &tree); },
            [&] { tin.GetHeight(1e9, 0.2, h, &tree); }, // outside the surface too
            [&] { tin.GetLineIntersectHeight(a, b, h, &tree); },
            [&] { tin.GetLineIntersectHeight(mapA, mapA, h, &tree); },
            [&] { tin.GetHeights(mapPath, 1, &h, &tree); },
            [&] { tin.GetLineIntersectHeights(segment, 1, &h, &tree); },
            [&] { delete tin.SubsetByRegion(EVERYWHERE, &tree); },
            [&] { delete tin.SubsetByRegion(mapBox, &tree); },
            [&] { delete tin.SubsetByLineString(path, 2, &tree); },
            [&] { delete tin.SubsetByLineString(mapPath, 2, &tree); },
            [&] { tin.FindTrianglesByPoint(0.2F, 0.2F, list, &tree); },
            [&] { tin.FindTrianglesByRegion(EVERYWHERE, list, &tree); },
            [&] { tin.FindTrianglesByLine(a, b, list, &tree); }};
        for (const auto& query : queries)
            EXPECT_TRUE(transcript.Refuses(query));
    }
}

TEST(MisuseTest, AnIndexBeyondTheTrianglesIsRefused) {
    kelm::test::Transcript transcript;
    const OpenTin tin = MakeSmallSheet(3).MakeTin();
    for (const unsigned id : {3U, 4294967295U}) {
        const Indices list{0, id};
        EXPECT_TRUE(transcript.Refuses([&] { delete tin.Subset(list); }));
    }
    EXPECT_EQ(std::unique_ptr<Tin>(tin.Subset(Indices{2}))->GetTriangleCount(), 1U);
}

TEST(MisuseTest, TreesAndNodesMoveSwapAndStandInAVector) {
    const OpenTin small = MakeSmallSheet(7).MakeTin(), large = MakeSmallSheet(60).MakeTin();
    std::vector<AabbTree> trees;
    std::vector<AabbNode> nodes;
    AabbTree counter;
    for (unsigned i = 0; i < 9; ++i) {
        const OpenTin& tin = i % 2 == 0 ? small : large;
        trees.emplace_back(&tin);
        nodes.emplace_back();
        nodes.back().CreateChild(tin.GetTriangle(0), tin.GetAll(), &counter);
    }
    std::swap(trees[0], trees[1]);
    std::swap(nodes[0], nodes[1]);
    const auto choose = [&](bool first) {
        AabbTree one(&small), two(&large);
        return first ? std::move(one) : std::move(two);
    };
    trees[2] = choose(false);
    trees[4] = std::move(trees[3]);
    for (const unsigned i : {0U, 2U, 4U, 5U}) {
        EXPECT_EQ(GetAllLeaves(trees[i]), large.GetAll());
        EXPECT_EQ(trees[i].GetTriangleCount(), 60U);
    }
    EXPECT_EQ(GetAllLeaves(nodes[0]).size(), 60U);
    AabbTree left = std::move(trees[0]);
    EXPECT_TRUE(trees[0].GetRoot() == nullptr && trees[0].GetObjBytes() == 32);
    EXPECT_EQ(left.GetNodeCount(), trees[5].GetNodeCount());
    left.SetCapacity(99);
    trees[0] = std::move(left);
    EXPECT_EQ(trees[0].GetCapacity(), 99U);
    EXPECT_EQ(left.GetCapacity(), counter.GetCapacity()); // NOLINT(bugprone-use-after-move)
}

TEST(MisuseTest, ACopiedInnerNodeMayOutliveItsTree) {
    const OpenTin tin = MakeSmallSheet(60).MakeTin();
    auto tree = std::make_unique<AabbTree>(&tin);
    const AabbTree other(&tin);
    std::vector<AabbNode> copies;
    for (const AabbNode* node = tree->GetRoot()->GetLeft(); node; node = node->GetLeft())
        copies.push_back(*node);
    const Indices leaves = copies.back().GetLeaves();
    tree.reset();
    copies.pop_back();
    copies.clear();
    EXPECT_TRUE(!leaves.empty() && GetAllLeaves(other) == tin.GetAll());
}

TEST(MisuseTest, TheCrossingMayBeWrittenToAnEndOfTheSegment) {
    const OpenTin tin = MakeSmallSheet(7).MakeTin();
    const AabbTree tree(&tin);
    for (const AabbTree* index : {static_cast<const AabbTree*>(nullptr), &tree}) {
        Point a{0.25F, 0.25F, 9}, b{0.25F, 0.25F, -9};
        float h;
        ASSERT_TRUE(tin.GetLineIntersectHeight(a, b, h, index));
        EXPECT_TRUE(tin.GetLineIntersectHeight(a, b, b.z, index) && b.z == h);
        b.z = -9;
        EXPECT_TRUE(tin.GetLineIntersectHeight(a, b, a.z, index) && a.z == h);
    }
}

TEST(MisuseTest, ADefaultTriangleHoldsNothing) {
    Triangle unset;
    const OwnTriangle set({{-1, -1, 0}, {1, -1, 0}, {0, 1, 0}});
    EXPECT_TRUE(IsIntersectedBBox(set.GetBBox(), Point{0, 0, 1}, Point{-0.0F, -0.0F, -1}));
    unset.ComputeBBox();
    for (const float y : {0.0F, NOT_A_NUMBER})
        EXPECT_FALSE(set.IsIntersectedLine(NOT_A_NUMBER, y, 0, 2));
    float h = UNTOUCHED;
    const Tin tin(new Point[1]{}, 1, new Triangle[1], 1, 0, 0);
    EXPECT_FALSE(tin.GetHeight(0.0F, 0.0F, h, nullptr, ER_Closed));
    h = UNTOUCHED;
    std::vector<int> cells{1};
    std::vector<float> heights;
    EXPECT_FALSE(unset.GetHeight(0, 0, h) || unset.IsPointInside(0, 0) ||
                 unset.IsPointInsideLT(0, 0) || unset.IsIntersectedLine(-1, 0, 1, 0) ||
                 unset.IsIntersected(EVERYWHERE) || unset.IsIntersected(set) ||
                 set.IsIntersected(unset));
    EXPECT_EQ(unset.GetLineIntersectHeight({0, 0, 1}, {0, 0, -1}, h), IR_Disjoint);
    EXPECT_EQ(h, UNTOUCHED);
    EXPECT_TRUE(std::isnan(unset.GetCenterAt(AX_X)) && std::isnan(unset.GetCenterAt(AX_Y)));
    EXPECT_EQ(unset.GetGridPoints(4, 4, cells, heights) + unset.GetGridPointsNum(4, 4), 0U);
    EXPECT_EQ(unset.GetGridPointsCR(nullptr, 4, 4), 0U);
    for (const int i : {-1, 3, 2147483647})
        EXPECT_EQ(set.GetVertex(i), nullptr);
    point3_t<float>*list[3] = {}, *each[3] = {};
    set.GetVertexList(list);
    set.GetVertices(each[0], each[1], each[2]);
    for (int i = 0; i < 3; ++i)
        EXPECT_TRUE(set.GetVertex(i) == &set.corners[std::size_t(i)] &&
                    set.GetVertex(i) == list[i] && list[i] == each[i]);
    EXPECT_EQ(unset.GetVertex(0), nullptr);
}

TEST(MisuseTest, AssignmentOfACopyReleasesNothingAndAMoveReleasesWhatItReplaces) {
    const Mesh mesh = MakeSmallSheet(2);
    const OpenTin other = mesh.MakeTin(3, 4);
    OpenTin tin = mesh.MakeTin();
    point3_t<float>* vertices;
    Triangle* triangles;
    unsigned counts[2];
    tin.GetVertexList(vertices, counts[0]);
    tin.GetTriangleList(triangles, counts[1]);
    EXPECT_TRUE(counts[0] == 6 && counts[1] == 2);
    tin = other;
    delete[] vertices; // the former owner has let them go
    delete[] triangles;
    EXPECT_EQ(tin.GetTriangle(1), other.GetTriangle(1));
    tin = mesh.MakeTin();
    tin = mesh.MakeTin(5, 6); // the first one's arrays go
    double x, y;
    tin.GetXYBase(x, y);
    EXPECT_TRUE(x == 5 && y == 6 && tin.GetTriangleCount() == 2);
    OpenTin copy(tin);
    tin = std::move(copy); // both have the same arrays
    float h;
    EXPECT_TRUE(tin.GetVertex(5)->x >= 0 && !tin.GetHeight(-9.0F, -9.0F, h, nullptr));
}

TEST(MisuseTest, BothConstructorsRefuseNullOnlyWhereItIsNeeded) {
    kelm::test::Transcript transcript;
    Point vertices[3] = {{0, 0, 0}, {1, 0, 0}, {0, 1, 0}};
    Triangle triangles[1];
    Triangle* const noTriangles = nullptr;
    Triangle_Id* const noIds = nullptr;
    EXPECT_TRUE(transcript.Refuses([&] { Tin(nullptr, 1, triangles, 1, 0, 0); }));
    EXPECT_TRUE(transcript.Refuses([&] { Tin(vertices, 3, noTriangles, 1, 0, 0); }));
    EXPECT_TRUE(transcript.Refuses([&] { Tin(vertices, 3, noIds, 1, 0, 0); }));
    const Tin smallest(new Point[1]{{1, 2, 3}}, 1, new Triangle_Id[1]{{0, 0, 0}}, 1, 0, 0);
    EXPECT_EQ(smallest.GetTriangle(0)->GetVertex(2), smallest.GetVertex(0));
    for (const unsigned n : {0U, 1U}) {
        EXPECT_EQ(Tin(nullptr, n, noIds, 1 - n, 0, 0).GetTriangleCount(), 0U);
        EXPECT_EQ(Tin(nullptr, n, noTriangles, 1 - n, 0, 0).GetTriangleCount(), 0U);
    }
}

TEST(MisuseTest, TheNumberOfCellsSaturates) {
    const OwnTriangle triangle({{0, 0, 0}, {0x3p17F, 0, 0}, {0, 0x3p17F, 0}});
    EXPECT_EQ(triangle.GetGridPointsNum(1 << 15, 1 << 15), ((1U << 15) - 1) << 15);
    EXPECT_EQ(triangle.GetGridPointsNum(1 << 16, (1 << 16) + 1), 4294967295U); // one row is open
    EXPECT_EQ(triangle.GetGridPointsNum(1 << 17, 1 << 17), 4294967295U);
}

TEST(MisuseTest, AGridWalkThatRunsOutOfMemoryLeavesBothListsAsTheyWere) {
    if (!AllocationCounter::IS_ACTIVE)
        GTEST_SKIP() << "the operators of the sanitizer are in force";
    const OwnTriangle triangle({{0, 0, 0}, {90, 0, 0}, {0, 90, 0}});
    bool isDone = false;
    for (long request = 1; !isDone; ++request) {
        std::vector<int> cells{1, 2};
        std::vector<float> heights{3};
        const AllocationCounter counter(request);
        try {
            triangle.GetGridPoints(99, 99, cells, heights);
            isDone = true;
        } catch (const std::bad_alloc&) {
            EXPECT_TRUE(cells == std::vector<int>({1, 2}) && heights == std::vector<float>{3});
        }
    }
}

/// @return mappings of this process that ask for huge pages
long CountHugeMappings() {
    std::ifstream maps("/proc/self/smaps");
    long count = 0;
    for (std::string line; std::getline(maps, line);)
        count += line.find("VmFlags:") == 0 && line.find(" hg") != std::string::npos;
    return count;
}

TEST(MisuseTest, ALargeTreeLeavesNoPageOfTheHeapMarked) {
    const OpenTin tin = MakeSmallSheet(200000).MakeTin();
    const long before = CountHugeMappings();
    {
        const AabbTree tree(&tin);
        EXPECT_EQ(tree.GetTriangleCount(), 200000U);
    }
    EXPECT_EQ(CountHugeMappings(), before);
}

} // namespace
} // namespace kelm::tin::test

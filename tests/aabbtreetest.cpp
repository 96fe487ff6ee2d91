#include "services/exception.h"
#include "tests/support/allocationcounter.h"
#include "tests/support/model.h"
#include "tests/support/sheets.h"

#include <cmath>
#include <cpl_conv.h>
#include <cpl_error.h>
#include <pthread.h>

namespace kelm::tin::test {

namespace {

struct OpenNode : AabbNode {
    using AabbNode::ComputeBBox;
    using AabbNode::ComputeCenter;
    using AabbNode::Divide;
    using AabbNode::GetBestAxis;
    using AabbNode::GetLongestAxis;
};

void AppendNote(CPLErr, CPLErrorNum, const char* note) {
    *static_cast<std::string*>(CPLGetErrorHandlerUserData()) += note;
}

/// Triangles 100 wide and 3 high whose centroids are the given points.
OpenTin MakeTinAt(const std::vector<Point2>& centres) {
    Mesh mesh;
    for (const auto& [x, y] : centres)
        mesh.Add({x - 50, y - 1, 0}, {x + 50, y - 1, 0}, {x, y + 2, 0});
    return mesh.MakeTin();
}

/// Follows a built tree, dividing each list once more by the steps of a node. The capacity and the
/// nodes are counted along.
void ExpectDivided(const AabbNode* node, const Triangle* triangles, const Indices& list,
                   bool isBest, int& nCapacity, unsigned& nNodes) {
    ASSERT_NE(node, nullptr);
    ++nNodes;
    OpenNode step;
    step.ComputeBBox(triangles, list);
    const Box &box = node->GetBBox(), &expected = step.GetBBox();
    ASSERT_TRUE(box.min.x == expected.min.x && box.min.y == expected.min.y);
    ASSERT_TRUE(box.max.x == expected.max.x && box.max.y == expected.max.y);
    const int size = static_cast<int>(list.size());
    Indices left, right;
    if (size > nCapacity) {
        float center[2];
        step.ComputeCenter(triangles, list, center);
        const int x = isBest ? step.GetBestAxis(triangles, list, center) : step.GetLongestAxis();
        for (const int axis : {x, 1 - x})
            if (left.empty() || right.empty())
                step.Divide(triangles, list, Axis(axis), center, left, right);
        if (left.empty() || right.empty())
            nCapacity = size;
    }
    const bool isLeaf = size <= nCapacity;
    ASSERT_EQ(node->GetLeaves(), isLeaf ? list : Indices());
    ASSERT_EQ(node->GetLeaves().capacity(), node->GetLeaves().size());
    ASSERT_EQ(node->GetLeft() == nullptr && node->GetRight() == nullptr, isLeaf);
    if (isLeaf)
        return;
    ExpectDivided(node->GetLeft(), triangles, left, isBest, nCapacity, nNodes);
    ExpectDivided(node->GetRight(), triangles, right, isBest, nCapacity, nNodes);
}

} // namespace

TEST(AabbTree, FollowsTheStepsOfTheDivision) {
    Random random;
    for (const Mesh& mesh : MakeMeshes(random))
        for (const DivisionType eType : {DT_BestAxis, DT_LongestAxis, DivisionType(7)})
            for (int nCapacity : {5, 1, 0, -1, 64}) {
                const OpenTin tin = mesh.MakeTin();
                AabbTree tree;
                tree.GetInfo()->SetDivisionType(eType);
                tree.SetCapacity(nCapacity);
                tree.CreateTree(&tin);
                unsigned nodes = 0;
                ExpectDivided(tree.GetRoot(), tin.GetTriangle(0), tin.GetAll(), eType == 0,
                              nCapacity, nodes);
                EXPECT_EQ(static_cast<int>(tree.GetCapacity()), nCapacity);
                EXPECT_EQ(tree.GetObjBytes(), 64 * nodes + 4 * tin.GetTriangleCount() + 32);
            }
}

TEST(AabbTree, StepsOfTheDivision) {
    Random random;
    const OpenTin sheet = MakeSheet(9, 3, random).MakeTin();
    OpenNode node;
    EXPECT_EQ(node.GetLongestAxis(), AX_X); // a square
    model::F sum = 0.0F;
    Indices list, left, right = {9};
    for (const unsigned i : sheet.GetAll()) {
        const Triangle& t = *sheet.GetTriangle(i);
        sum = sum + ((model::F(t.GetVertex(0)->y) + t.GetVertex(1)->y) + t.GetVertex(2)->y) / 3.0F;
        list.push_back(i);
        float mean[2];
        node.ComputeCenter(sheet.GetTriangle(0), list, mean);
        ASSERT_EQ(mean[1], (model::F(1.0F) / static_cast<float>(list.size()) * sum).v) << i;
    }
    std::vector<Point2> centres(6, {0, 0});
    centres.resize(9, {0, 10});
    centres.push_back({1000, 10});
    const OpenTin tin = MakeTinAt(centres);
    const float center[2] = {100, 0}, nan[2] = {NOT_A_NUMBER, 0};
    EXPECT_EQ(node.GetBestAxis(tin.GetTriangle(0), tin.GetAll(), center), AX_Y); // 6:4, not 9:1
    EXPECT_EQ(node.GetBestAxis(tin.GetTriangle(0), {0, 9}, center), AX_X);       // 1:1 both
    node.Divide(tin.GetTriangle(0), tin.GetAll(), AX_Y, center, left, right);
    EXPECT_EQ(left.size(), 6U); // a centroid at the centre goes left
    node.Divide(tin.GetTriangle(0), tin.GetAll(), AX_X, nan, left, right);
    EXPECT_EQ(right, tin.GetAll());
}

TEST(AabbTree, RaisesItsCapacityForWhatCannotBeDivided) {
    std::vector<Point2> column, before(9, {0, 0}), behind;
    for (int i = 0; i < 8; ++i) {
        column.push_back({0, static_cast<float>(i)});
        before.push_back({static_cast<float>(100 + i), 0});
        behind.push_back({static_cast<float>(i), 0});
    }
    behind.insert(behind.end(), 9, {100, 0});
    CPLSetConfigOption("CPL_DEBUG", "TIN");
    const auto build = [](const std::vector<Point2>& centres, int nCapacity, std::string& notes) {
        const OpenTin tin = MakeTinAt(centres);
        AabbTree tree;
        tree.SetCapacity(nCapacity);
        CPLPushErrorHandlerEx(AppendNote, &notes);
        tree.CreateTree(&tin);
        CPLPopErrorHandler();
        return tree.GetNodeCount();
    };
    std::string notes;
    EXPECT_EQ(build(column, 5, notes), 3U); // wider than high, and divided on y all the same
    EXPECT_EQ(notes, "");
    EXPECT_EQ(build({{0, 0}, {9, 0}}, -1, notes), 3U);
    EXPECT_EQ(notes, "TIN: \n* AabbTree::mnCapacity is changing from -1 to 1 in CreateChild()\n");
    EXPECT_EQ(build(before, 5, notes), 3U); // the raise on the left keeps the right side whole
    EXPECT_EQ(build(behind, 5, notes), 5U); // but not the left one
    CPLSetConfigOption("CPL_DEBUG", nullptr);
}

TEST(AabbTree, HostileSetIsBuiltAndReleasedOnASmallStack) {
    std::vector<Point2> centres(100000, {1e3F, 1e3F});
    for (int i = 0; i < 100000; ++i)
        centres.push_back({std::ldexp(1e3F, i % 110), std::ldexp(1e3F, i / 110 % 110)});
    centres.insert(centres.end(), {{NOT_A_NUMBER, 9}, {HUGE_VALF, 9}, {9, NOT_A_NUMBER}});
    OpenTin tin = MakeTinAt(centres);
    const auto build = [](void* arg) -> void* {
        const AabbTree tree(static_cast<OpenTin*>(arg));
        const Indices all = CollectLeaves(tree.GetRoot(), [](const Box&) { return true; });
        EXPECT_EQ(Sorted(all), static_cast<OpenTin*>(arg)->GetAll());
        return nullptr;
    };
    pthread_attr_t attributes;
    pthread_attr_init(&attributes);
    pthread_attr_setstacksize(&attributes, std::size_t{512} * 1024);
    pthread_t thread;
    ASSERT_EQ(pthread_create(&thread, &attributes, build, &tin), 0);
    pthread_join(thread, nullptr);
}

TEST(AabbTree, RefusesNullAndBuildsAnew) {
    const OpenTin same = MakeTinAt(std::vector<Point2>(9, {50, 1}));
    const OpenTin few = MakeTinAt({{0, 0}, {9, 0}, {18, 0}});
    const Tin empty(nullptr, 0, new Triangle_Id[0], 0, 0, 0);
    AabbTree tree;
    tree.CreateTree(&same);
    EXPECT_THROW(tree.CreateTree(nullptr), ParameterException);
    EXPECT_THROW(AabbTree{nullptr}, ParameterException);
    Indices list = {3};
    tree.FindLeaves(100, 3, list); // the corner of the box, behind what stood there
    EXPECT_EQ(list, (Indices{3, 0, 1, 2, 3, 4, 5, 6, 7, 8}));
    tree.CreateTree(&few);
    EXPECT_TRUE(tree.GetCapacity() == 9 && tree.GetNodeCount() == 1 && tree.GetObjBytes() == 108);
    tree.CreateTree(&empty);
    EXPECT_TRUE(tree.GetRoot() == nullptr && tree.GetObjBytes() == 32);
}

TEST(AabbTree, DepthLimitAndEstimates) {
    EXPECT_EQ(EstimateAabbTreeBytes(0), 96U);
    EXPECT_EQ(EstimateAabbTreeBytes(7), 380U);
    EXPECT_EQ(EstimateAabbTreeBytes(100000), 4057184U);
    AabbTree tree;
    for (const int nCapacity : {0, 1, -1}) { // no overflow
        tree.SetCapacity(nCapacity);
        EXPECT_GE(tree.EstimateObjBytes(4294967295U), 4294967295U * std::uint64_t{4});
    }
    AabbTreeInfo info;
    EXPECT_FALSE(info.TestDeep());
    info.SetMaxTreeDeep(2);
    EXPECT_FALSE(info.TestDeep());
    info.AddDeep();
    EXPECT_TRUE(info.TestDeep());
}

TEST(AabbTree, AFailedAllocationLeavesNothingBehind) {
    if (!AllocationCounter::IS_ACTIVE)
        GTEST_SKIP();
    Random random;
    const OpenTin tin = MakeSheet(4, 3, random).MakeTin();
    EXPECT_GT(FailEachRequest([&] { const AabbTree tree(&tin); }), 10);
    AabbTree half; // is searched without harm
    EXPECT_THROW((AllocationCounter(15), half.CreateTree(&tin)), std::bad_alloc);
    Indices list;
    half.FindLeaves(20, 20, list);
}

} // namespace kelm::tin::test

#include "tests/support/gdaltranscript.h"
#include "tests/support/sheets.h"

namespace kelm::tin::test {
namespace {

/// Follows a built tree, dividing each list once more. Capacity, nodes, leaves and notes are kept.
void ExpectDivided(const AabbNode* node, const OpenTin& tin, const Indices& list, bool isBest,
                   int& nCapacity, unsigned& nNodes, Indices& leaves, std::string& rNotes) {
    ASSERT_NE(node, nullptr);
    ++nNodes;
    const auto size = static_cast<int>(list.size());
    float low[2] = {-LOWEST, -LOWEST}, high[2] = {LOWEST, LOWEST};
    Indices sides[2][2]; // by axis, then left and right
    int surplus[2];
    for (const int axis : {0, 1}) {
        float sum = 0;
        for (const unsigned id : list) {
            const Box& box = tin.GetTriangle(id)->GetBBox();
            low[axis] = std::min(low[axis], axis == 0 ? box.min.x : box.min.y);
            high[axis] = std::max(high[axis], axis == 0 ? box.max.x : box.max.y);
            sum += static_cast<float>(tin.GetTriangle(id)->GetCenterAt(Axis(axis)));
        }
        const auto mean = static_cast<double>(1.0F / static_cast<float>(size) * sum);
        for (const unsigned id : list)
            sides[axis][tin.GetTriangle(id)->GetCenterAt(Axis(axis)) <= mean ? 0 : 1].push_back(id);
        surplus[axis] = std::abs(2 * static_cast<int>(sides[axis][0].size()) - size);
    }
    const Point2 &min = node->GetBBox().min, &max = node->GetBBox().max;
    ASSERT_TRUE(min.x == low[0] && min.y == low[1] && max.x == high[0] && max.y == high[1]);
    const bool isX = isBest ? surplus[0] <= surplus[1] : high[0] - low[0] >= high[1] - low[1];
    const int first = isX ? 0 : 1, axis = surplus[first] < size ? first : 1 - first;
    if (size > nCapacity && surplus[axis] == size) { // cannot be divided
        rNotes += "TIN: \n* AabbTree::mnCapacity is changing from " + std::to_string(nCapacity) +
                  " to " + std::to_string(size) + " in CreateChild()\n\n";
        nCapacity = size;
    }
    const bool isLeaf = size <= nCapacity;
    ASSERT_EQ(node->GetLeaves(), isLeaf ? list : Indices());
    ASSERT_EQ(node->GetLeft() == nullptr && node->GetRight() == nullptr, isLeaf);
    leaves.insert(leaves.end(), node->GetLeaves().begin(), node->GetLeaves().end());
    if (isLeaf)
        return;
    for (const int side : {0, 1})
        ExpectDivided(side == 0 ? node->GetLeft() : node->GetRight(), tin, sides[axis][side],
                      isBest, nCapacity, nNodes, leaves, rNotes);
}

TEST(AabbTreeTest, DividesAtTheMeanCentroidEachTimeItIsBuilt) {
    Random random;
    AabbTree tree;
    kelm::test::GdalTranscript transcript;
    for (const Mesh& mesh : MakeMeshes(random))
        for (const DivisionType eType : {DT_BestAxis, DT_LongestAxis, DivisionType(7)})
            for (int nCapacity : {5, 1, 0, -1, 64}) {
                const OpenTin tin = mesh.MakeTin();
                tree.GetInfo()->SetDivisionType(eType);
                tree.SetCapacity(nCapacity);
                tree.CreateTree(&tin);
                unsigned nodes = 0;
                Indices leaves, walked;
                std::string notes;
                ExpectDivided(tree.GetRoot(), tin, tin.GetAll(), eType == DT_BestAxis, nCapacity,
                              nodes, leaves, notes);
                EXPECT_EQ(transcript.Take(), notes);
                tree.FindLeaves(EVERYWHERE, walked);
                tree.FindLeaves(EVERYWHERE, walked); // behind what stands in the list
                leaves.insert(leaves.end(), leaves.begin(), leaves.end());
                EXPECT_EQ(walked, leaves);
                BBox<float, point2_t<float>> corner;
                corner.min = corner.max = {mesh.vertices[0].x, mesh.vertices[0].y};
                Indices atPoint, inBox;
                tree.FindLeaves(corner.min.x, corner.min.y, atPoint);
                tree.FindLeaves(corner, inBox);
                EXPECT_EQ(atPoint, inBox);
                EXPECT_EQ(static_cast<int>(tree.GetCapacity()), nCapacity);
                EXPECT_EQ(tree.GetObjBytes(), 64 * nodes + 4 * tin.GetTriangleCount() + 32);
            }
    tree.CreateTree(std::make_unique<Tin>(nullptr, 0, new Triangle_Id[0], 0, 0, 0).get());
    EXPECT_TRUE(tree.GetRoot() == nullptr && tree.GetObjBytes() == 32);
    EXPECT_EQ(EstimateAabbTreeBytes(7), 380U);
    tree.SetCapacity(-1); // no overflow
    EXPECT_GE(tree.EstimateObjBytes(4294967295U), 4294967295U * std::uint64_t{4});
}

// Wrong releases show under the address sanitizer.
TEST(AabbNodeTest, OnlyTheTopOfABuildReleasesIt) {
    Random random;
    const OpenTin tin = MakeSheet(3, random).MakeTin();
    AabbTree tree(&tin);
    AabbNode* const left = tree.GetRoot()->GetLeft();
    *tree.GetRoot()->GetRight() = *left->GetLeft(); // now names nodes that lie before it
    AabbNode* leaf = left;
    while (leaf->GetLeft() != nullptr)
        leaf = leaf->GetLeft();
    *leaf = AabbNode();
    leaf->CreateChild(tin.GetTriangle(0), tin.GetAll(), &tree); // a top among the nodes of another
    EXPECT_EQ(GetAllLeaves(*leaf), tin.GetAll());
}

} // namespace
} // namespace kelm::tin::test

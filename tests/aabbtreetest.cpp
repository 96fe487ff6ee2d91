#include "tests/support/gdaltranscript.h"
#include "tests/support/oddsurfaces.h"

#include <omp.h>

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
    tree.SetCapacity(0); // no number of triangles is 0 of them
    EXPECT_EQ(tree.EstimateObjBytes(0), 96U);
    EXPECT_EQ(tree.EstimateObjBytes(1), (std::uint64_t{64} << 31U) + 4 + 32);
    tree.SetCapacity(-1); // no overflow
    EXPECT_GE(tree.EstimateObjBytes(4294967295U), 4294967295U * std::uint64_t{4});
}

void ExpectSame(const AabbNode* node, const AabbNode* wanted) {
    std::vector<std::pair<const AabbNode*, const AabbNode*>> pending{{node, wanted}};
    while (!pending.empty()) {
        std::tie(node, wanted) = pending.back();
        pending.pop_back();
        ASSERT_EQ(node == nullptr, wanted == nullptr);
        if (node == nullptr)
            continue;
        const Box &box = node->GetBBox(), &expected = wanted->GetBBox();
        ASSERT_TRUE(IsSameBits(box.min.x, expected.min.x) && IsSameBits(box.min.y, expected.min.y));
        ASSERT_TRUE(IsSameBits(box.max.x, expected.max.x) && IsSameBits(box.max.y, expected.max.y));
        ASSERT_EQ(node->GetLeaves(), wanted->GetLeaves());
        pending.emplace_back(node->GetLeft(), wanted->GetLeft());
        pending.emplace_back(node->GetRight(), wanted->GetRight());
    }
}

/// Surfaces that are large enough for a team.
std::vector<OddSurface> MakeLargeSurfaces(Random& random) {
    Mesh sheets;
    while (sheets.ids.size() < 40000) { // all over one place
        const auto first = static_cast<unsigned>(sheets.vertices.size());
        const Mesh sheet = MakeSheet(9, random);
        sheets.vertices.insert(sheets.vertices.end(), sheet.vertices.begin(), sheet.vertices.end());
        for (const Triangle_Id& id : sheet.ids)
            sheets.ids.push_back({id.id0 + first, id.id1 + first, id.id2 + first});
    }
    Mesh early = sheets, late = sheets, crowded = sheets, holed = sheets;
    for (unsigned i = 0; i < 70; ++i) {
        early.Add({1, 1, 0}, {2, 1, 0}, {1, 2, 0});
        late.Add({228, 228, 0}, {229, 228, 0}, {228, 229, 0});
        holed.vertices[random.Below(holed.vertices.size())].x = NOT_A_NUMBER;
    }
    late.ids.insert(late.ids.begin() + 77, 9, late.ids.back()); // two such sets, the first smaller
    late.Add({5, 5, 0}, {6, 5, 0}, {5, 6, 0});
    for (unsigned i = 0; i < 20000; ++i) {
        const float x = 3 + random.Between(0, 1e-3F), y = 3 + random.Between(0, 1e-3F);
        crowded.Add({x, y, 0}, {x + 1e-3F, y, 1}, {x, y + 1e-3F, 2});
    }
    const auto same = [](float) {
        return std::array<Point, 3>{Point{1, 1, 0}, Point{4, 2, 1}, Point{2, 5, 2}};
    };
    const auto peeled = [](float n) {
        const float x = std::exp2(std::fmod(n, 240.0F) - 120);
        return std::array<Point, 3>{Point{x, 0, 0}, Point{x * 1.25F, 0, 1}, Point{x, n, 2}};
    };
    return {{"sheets", sheets},
            {"one set early", early},
            {"one set late", late},
            {"crowded", crowded},
            {"NaN", holed},
            {"same", MakeEach(30000, same)},
            {"peeled", MakeEach(30000, peeled)}};
}

TEST(AabbTreeTest, IsTheSameOnAnyNumberOfThreads) {
    Random random;
    kelm::test::GdalTranscript transcript;
    const int before = omp_get_max_threads();
    for (const OddSurface& odd : MakeLargeSurfaces(random)) {
        const OpenTin tin = odd.oMesh.MakeTin();
        for (const int nCapacity : {5, 64, 0}) {
            AabbTree wanted;
            const auto build = [&](int nThreads, AabbTree& rTree) {
                omp_set_num_threads(nThreads);
                rTree.GetInfo()->SetDivisionType(nCapacity == 64 ? DT_BestAxis : DT_LongestAxis);
                rTree.SetCapacity(nCapacity);
                rTree.CreateTree(&tin);
                return transcript.Take();
            };
            const std::string notes = build(1, wanted);
            for (const int threads : {2, 3, 8}) {
                SCOPED_TRACE(odd.sName + ", capacity " + std::to_string(nCapacity) + ", threads " +
                             std::to_string(threads));
                AabbTree tree;
                EXPECT_EQ(build(threads, tree), notes);
                EXPECT_EQ(tree.GetCapacity(), wanted.GetCapacity());
                EXPECT_EQ(tree.GetNodeCount(), wanted.GetNodeCount());
                ExpectSame(tree.GetRoot(), wanted.GetRoot());
            }
        }
    }
    omp_set_num_threads(before);
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

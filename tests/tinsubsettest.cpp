#include "tests/support/allocationcounter.h"
#include "tests/support/sheets.h"

#include <map>

namespace kelm::tin::test {

namespace {

constexpr double BASE_X = 500, BASE_Y = -3;

/// Compares a subset, and releases it, with a renumbering by a sorted map.
void ExpectSubset(const Mesh& mesh, const Indices& list, const Tin* poSubset) {
    const std::unique_ptr<const Tin> subset(poSubset);
    ASSERT_EQ(subset == nullptr, list.empty());
    if (list.empty())
        return;
    std::map<unsigned, Point*> copies;
    for (const unsigned i : list)
        for (const unsigned id : {mesh.ids[i].id0, mesh.ids[i].id1, mesh.ids[i].id2})
            copies[id] = nullptr;
    ASSERT_EQ(subset->GetVertexCount(), copies.size());
    ASSERT_EQ(subset->GetTriangleCount(), list.size());
    unsigned next = 0;
    for (auto& [id, copy] : copies) {
        copy = subset->GetVertex(next++);
        const auto& [x, y, z] = mesh.vertices[id]; // z may be NaN
        ASSERT_TRUE(copy->x == x && copy->y == y && !(copy->z < z || copy->z > z));
    }
    for (next = 0; next < list.size(); ++next) {
        const Triangle_Id& id = mesh.ids[list[next]];
        Point* corners[3];
        subset->GetTriangle(next)->GetVertexList(corners);
        ASSERT_TRUE(corners[0] == copies[id.id0] && corners[1] == copies[id.id1]);
        ASSERT_EQ(corners[2], copies[id.id2]);
    }
    double x, y;
    subset->GetXYBase(x, y);
    EXPECT_TRUE(x == BASE_X && y == BASE_Y);
}

} // namespace

TEST(TinSubset, RenumbersListsAndMasksAndOutlivesItsSource) {
    Random random;
    for (const Mesh& mesh : MakeMeshes(random)) {
        std::unique_ptr<const OpenTin> source(new OpenTin(mesh.MakeTin(BASE_X, BASE_Y)));
        Indices list, selected;
        std::vector<unsigned char> mask;
        for (const unsigned i : source->GetAll()) {
            list.push_back(random.Below(source->GetTriangleCount())); // repeats too
            mask.push_back(static_cast<unsigned char>(random.Below(3)));
            if (mask[i] == 1)
                selected.push_back(i);
        }
        const Tin* byList = source->Subset(list);
        const Tin* byMask = source->Subset(mask);
        source.reset();
        ExpectSubset(mesh, list, byList);
        ExpectSubset(mesh, selected, byMask);
    }
}

TEST(TinSubset, OfRegionsAndLineStringsInBothFrames) {
    Random random;
    for (const Mesh& mesh : MakeMeshes(random)) {
        const OpenTin tin = mesh.MakeTin(BASE_X, BASE_Y);
        const AabbTree tree(&tin), *const indices[] = {&tree, nullptr};
        for (unsigned i = 0; i < 40; ++i) {
            const AabbTree* index = indices[i % 2];
            Indices list, met;
            Box region;
            BBox<double, point2_t<double>> mapRegion;
            std::vector<Point2> local;
            std::vector<point2_t<double>> map;
            for (unsigned k = 0; k < i % 7; ++k) { // whole, so that both frames hold them
                const unsigned x = random.Below(120), y = random.Below(120);
                local.push_back({static_cast<float>(x), static_cast<float>(y)});
                map.push_back({x + BASE_X, y + BASE_Y});
                if (k > 0) // a scan appends
                    tin.FindTrianglesByLine(local[k - 1], local[k], list, nullptr);
                (k == 0 ? region.min : region.max) = local[k];
                (k == 0 ? mapRegion.min : mapRegion.max) = map[k];
            }
            list = Sorted(list);
            list.erase(std::unique(list.begin(), list.end()), list.end());
            ExpectSubset(mesh, list, tin.SubsetByLineString(local.data(), i % 7, index));
            ExpectSubset(mesh, list, tin.SubsetByLineString(map.data(), i % 7, index));
            if (local.empty())
                continue;
            tin.FindTrianglesByRegion(region, met, index);
            ExpectSubset(mesh, met, tin.SubsetByRegion(region, index));
            if (local.size() > 1)
                ExpectSubset(mesh, met, tin.SubsetByRegion(mapRegion, index));
        }
    }
}

TEST(TinSubset, AFailedAllocationLeavesNothingBehind) {
    if (!AllocationCounter::IS_ACTIVE)
        GTEST_SKIP();
    Random random;
    const OpenTin tin = MakeSheet(6, 3, random).MakeTin();
    const point2_t<double> points[] = {{1, 1}, {50, 20}, {9, 50}};
    EXPECT_GT(FailEachRequest([&] { delete tin.SubsetByLineString(points, 3, nullptr); }), 10);
}

} // namespace kelm::tin::test

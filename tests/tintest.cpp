#include "tests/support/sheets.h"
#include "tin/ray2.h"

#include <cstring>
#include <omp.h>
#include <set>

namespace kelm::tin::test {
namespace {

std::size_t CountMissing(const Indices& list, const Indices& wanted) {
    return static_cast<std::size_t>(std::count_if(wanted.begin(), wanted.end(), [&](unsigned i) {
        return !std::binary_search(list.begin(), list.end(), i);
    }));
}

/// Compares the searches for a segment, for the next float from its start and for the region that
/// it spans with a loop over all triangles. @return how many line and region miss with the tree
std::size_t ExpectFound(const OpenTin& tin, const AabbTree& tree, const Point& a, const Point& b) {
    const Point2 p{a.x, a.y}, q{b.x, b.y}, at{std::nextafter(a.x, b.x), std::nextafter(a.y, b.y)};
    const Box region = MakeBox(Point2{std::min(p.x, q.x), std::min(p.y, q.y)},
                               Point2{std::max(p.x, q.x), std::max(p.y, q.y)});
    Indices held, touched, met;
    float h, height = TestInside(tin.GetBBox(), at.x, at.y) ? LOWEST : UNTOUCHED;
    float crossing = IsIntersectedBBox(tin.GetBBox(), a, b) ? LOWEST : UNTOUCHED;
    for (const unsigned i : tin.GetAll()) {
        const Triangle& t = *tin.GetTriangle(i);
        const bool holds = t.IsPointInside(at.x, at.y);
        const bool isTouched = t.IsIntersectedLine(p.x, p.y, q.x, q.y);
        held.insert(held.end(), holds, i);
        touched.insert(touched.end(), isTouched, i);
        met.insert(met.end(), t.IsIntersected(region), i);
        if (holds && t.GetHeight(at.x, at.y, h) && h > height)
            height = h;
        if (isTouched && t.GetLineIntersectHeight(a, b, h) == IR_Inside && h > crossing)
            crossing = h;
    }
    Indices byPoint[2], byLine[2], byRegion[2];
    for (const int k : {0, 1}) {
        const AabbTree* index = k == 0 ? nullptr : &tree;
        tin.FindTrianglesByPoint(at.x, at.y, byPoint[k], index);
        tin.FindTrianglesByLine(a, b, byLine[k], index);
        tin.FindTrianglesByRegion(region, byRegion[k], index);
        const bool isFound = tin.GetHeight(at.x, at.y, h = UNTOUCHED, index);
        EXPECT_TRUE(h == height && isFound == (h != LOWEST && h != UNTOUCHED));
        const bool isCrossed = tin.GetLineIntersectHeight(a, b, h = UNTOUCHED, index);
        EXPECT_EQ(isCrossed, h != LOWEST && h != UNTOUCHED);
        EXPECT_TRUE(h == crossing || byLine[k].size() < touched.size());
    }
    EXPECT_TRUE(byPoint[0] == held && byLine[0] == touched && byRegion[0] == met);
    for (Indices* list : {&byPoint[1], &byLine[1], &byRegion[1]})
        std::sort(list->begin(), list->end());
    EXPECT_TRUE(byPoint[1] == held && CountMissing(touched, byLine[1]) == 0);
    return CountMissing(byLine[1], touched) + CountMissing(byRegion[1], met);
}

constexpr double BASE_X = 500000.37, BASE_Y = 4649776.81;

/// Compares a surface, asked in map coordinates, with triangles of another.
void ExpectOnMap(const Tin& tin, const Tin& origin, const Indices& list, const Point& at) {
    double x, y;
    tin.GetXYBase(x, y);
    BBox<double, point3_t<double>> box;
    tin.GetRawBBox(box);
    const auto &low = tin.GetBBox().min, &high = tin.GetBBox().max;
    EXPECT_TRUE(x == BASE_X && y == BASE_Y && box.min.x == double(low.x) + x &&
                box.min.y == double(low.y) + y && box.max.x == double(high.x) + x &&
                box.max.y == double(high.y) + y && float(box.min.z) == low.z &&
                float(box.max.z) == high.z);
    const point3_t<double> a{x + double(at.x), y + double(at.y), 99}, b{a.x + 30, a.y, -99};
    const Point p{float(a.x - x), float(a.y - y), 99}, q{float(b.x - x), float(b.y - y), -99};
    float h, height = LOWEST, crossing = LOWEST, found = LOWEST;
    for (const unsigned i : list) {
        const Triangle& t = *origin.GetTriangle(i);
        if (t.GetHeight(p.x, p.y, h) && h > height)
            height = h;
        if (t.IsIntersectedLine(p.x, p.y, q.x, q.y) &&
            t.GetLineIntersectHeight(p, q, h) == IR_Inside && h > crossing)
            crossing = h;
    }
    tin.GetHeight(a.x, a.y, found, nullptr);
    EXPECT_EQ(found, height);
    tin.GetLineIntersectHeight(a, b, found = LOWEST, nullptr);
    EXPECT_EQ(found, crossing);
}

/// Compares a subset, and releases it, with the triangles of a list.
void ExpectSubset(const Mesh& mesh, const Tin& origin, const Indices& list, const Tin* poSubset) {
    const std::unique_ptr<const Tin> subset(poSubset);
    ASSERT_EQ(subset == nullptr, list.empty());
    if (list.empty())
        return;
    ExpectOnMap(*subset, origin, list, *subset->GetVertex(0));
    std::set<unsigned> used;
    for (const unsigned i : list)
        used.insert({mesh.ids[i].id0, mesh.ids[i].id1, mesh.ids[i].id2});
    ASSERT_EQ(subset->GetVertexCount(), used.size());
    for (unsigned k = 0; k < list.size(); ++k) {
        const Triangle_Id& t = mesh.ids[list[k]];
        for (const auto& [i, id] : {std::pair(0, t.id0), {1, t.id1}, {2, t.id2}}) {
            const Point* corner = subset->GetTriangle(k)->GetVertex(i);
            ASSERT_EQ(corner - subset->GetVertex(0), std::distance(used.begin(), used.find(id)));
            ASSERT_EQ(std::memcmp(corner, &mesh.vertices[id], sizeof *corner), 0);
        }
    }
}

TEST(TinSearchTest, TreeAndScanFindWhatALoopFindsOnAnyNumberOfThreads) {
    Random random;
    std::size_t missed = 0;
    for (const int nThreads : {1, 2, 8})
        for (const Mesh& mesh : MakeMeshes(random)) {
            omp_set_num_threads(nThreads);
            const OpenTin tin = mesh.MakeTin();
            omp_set_num_threads(nThreads % 3 + 1); // raised, too
            const AabbTree tree(&tin);
            const auto position = [&] { // often a vertex, or on an edge
                const Point& v = *tin.GetVertex(random.Below(tin.GetVertexCount()));
                const float steps[] = {0, 0, 5, random.Between(-12, 12)};
                return Point{v.x + steps[random.Below(4)], v.y + steps[random.Below(4)], v.z};
            };
            for (int i = 0; i < 2000 / nThreads && !testing::Test::HasFailure(); ++i) {
                const Point a = position(), b = position();
                const Point ends[] = {{b.x, b.y, a.z}, {a.x, b.y, 9}, {a.x, a.y, a.z - 30}};
                missed += ExpectFound(tin, tree, a, ends[random.Below(3)]);
            }
        }
    EXPECT_LT(missed, 300U); // a box test may lose what ends at the rim of a box
}

TEST(TinSubsetTest, OfCopiesTooRenumbersWhatIsListedMaskedOrFoundInMapCoordinates) {
    Random random;
    for (const Mesh& mesh : MakeMeshes(random))
        for (unsigned i = 0; i < 20; ++i) {
            OpenTin made = mesh.MakeTin(BASE_X, BASE_Y), assigned = Mesh(mesh).MakeTin();
            const OpenTin copy(made), moved(std::move(made));
            // A copy assignment does not release them.
            const std::unique_ptr<const Point[]> vertices(assigned.GetVertex(0));
            const std::unique_ptr<const Triangle[]> triangles(assigned.GetTriangle(0));
            assigned = moved;
            const OpenTin& tin = i % 4 == 0 ? copy : i % 4 == 1 ? moved : assigned;
            ExpectOnMap(tin, tin, tin.GetAll(), *tin.GetVertex(i));
            const AabbTree tree(&tin), *const index = i % 2 == 0 ? &tree : nullptr;
            Indices list, selected, line, met;
            std::vector<unsigned char> mask;
            for (const unsigned id : tin.GetAll()) {
                list.push_back(random.Below(tin.GetTriangleCount())); // repeats too
                mask.push_back(static_cast<unsigned char>(list[id] % 3));
                selected.insert(selected.end(), mask[id] == 1, id);
            }
            ExpectSubset(mesh, tin, list, tin.Subset(list));
            ExpectSubset(mesh, tin, selected, tin.Subset(mask));
            std::vector<Point2> local;
            std::vector<point2_t<double>> map;
            for (unsigned k = 0; k < 2 + i % 5; ++k) { // whole, so that both frames hold them
                const unsigned x = random.Below(120), y = random.Below(120);
                local.push_back({static_cast<float>(x), static_cast<float>(y)});
                map.push_back({BASE_X + x, BASE_Y + y});
                if (k > 0) // a scan appends
                    tin.FindTrianglesByLine(local[k - 1], local[k], line, nullptr);
            }
            const std::set<unsigned> once(line.begin(), line.end());
            ExpectSubset(mesh, tin, {once.begin(), once.end()},
                         tin.SubsetByLineString(map.data(), 2 + i % 5, index));
            tin.FindTrianglesByRegion(MakeBox(local[0], local[1]), met, index);
            ExpectSubset(mesh, tin, met, tin.SubsetByRegion(MakeBox(map[0], map[1]), index));
        }
}

// Leaks and double releases show under the address sanitizer.
TEST(TinTest, OwnsItsArraysUnlessACountIsZeroOrItIsACopy) {
    Point vertices[3] = {{1, 2, 3}, {4, 5, 6}, {7, 9, 9}};
    Triangle triangle;
    for (const unsigned n : {0U, 1U}) {
        const Tin tin(vertices, 3 * n, new Triangle_Id[1]{{0, 1, 2}}, 1 - n, 10.5, 20);
        const Tin ready(vertices, 3 * n, &triangle, 1 - n, 10.5, 20);
        EXPECT_TRUE(ready.GetObjBytes() == 88 && tin.GetObjBytes() == 88);
        EXPECT_TRUE(tin.GetVertex(0) == nullptr && tin.GetBBox().max.y == 0);
    }
    Mesh mesh;
    mesh.Add({3, 7, NOT_A_NUMBER}, {NOT_A_NUMBER, 2, -3}, {1.5F, NOT_A_NUMBER, 8});
    mesh.vertices.push_back({2, 50, 4}); // no triangle uses it
    OpenTin tin = mesh.MakeTin(BASE_X, BASE_Y), copy(tin);
    BBox<double, point3_t<double>> box;
    tin.GetRawBBox(box);
    EXPECT_TRUE(box.min.x == BASE_X + 1.5 && box.min.y == BASE_Y + 2 && box.min.z == -3);
    EXPECT_TRUE(box.max.x == BASE_X + 3 && box.max.y == BASE_Y + 50 && box.max.z == 8);
    float low, high;
    tin.SetHeightRange(4, -4);
    tin.GetHeightRange(low, high);
    tin.GetVertex(0)->x = -9;
    tin.ComputeTriBBox();
    EXPECT_TRUE(low == 4 && high == -4 && tin.GetTriangle(0)->GetBBox().min.x == -9);
    tin = copy; // goes on owning
    EXPECT_TRUE(copy.GetVertex(3) == tin.GetVertex(3) && tin.GetObjBytes() == 4 * 12 + 48 + 88);
}

} // namespace
} // namespace kelm::tin::test

#include "tin/crossingtree.h"
#include "tests/support/sheets.h"

#include <omp.h>

#include <cstring>
#include <memory>
#include <utility>

namespace kelm::tin::test {
namespace {

constexpr float INFINITE = std::numeric_limits<float>::infinity();

struct Segment {
    Point a, b;
};

unsigned GetBits(float value) {
    unsigned bits;
    std::memcpy(&bits, &value, sizeof bits);
    return bits;
}

Point Between(const Point& a, const Point& b, float t) {
    return {a.x + (b.x - a.x) * t, a.y + (b.y - a.y) * t, a.z + (b.z - a.z) * t};
}

/// A row of so many triangles, each of three corners that a function of its number and corner
/// gives.
template <typename Corner>
Mesh MakeRow(unsigned count, const Corner& corner) {
    Mesh mesh;
    for (unsigned i = 0; i < count; ++i)
        mesh.Add(corner(i, 0), corner(i, 1), corner(i, 2));
    return mesh;
}

/// Every coordinate of a mesh through x -> offset + scale x.
Mesh Move(Mesh mesh, float offset, float scale, float zScale) {
    for (Point& v : mesh.vertices)
        v = {offset + scale * v.x, offset + scale * v.y, zScale * v.z};
    return mesh;
}

/// Surfaces on which an index could go wrong, each by another rule.
std::vector<std::pair<const char*, Mesh>> MakeSurfaces(Random& random) {
    const auto any = [&](float low, float high) { return random.Between(low, high); };
    const auto pick = [&](std::initializer_list<float> values) {
        return values.begin()[random.Below(values.size())];
    };
    const Mesh sheet = MakeSheet(3, random), wild = MakeMeshes(random)[1];
    Mesh broken = wild, mixed = sheet;
    for (unsigned i = 0; i < 60; ++i) {
        Point& v = broken.vertices[random.Below(broken.vertices.size())];
        (i % 3 == 0 ? v.x : i % 3 == 1 ? v.y : v.z) = pick({NOT_A_NUMBER, INFINITE, -INFINITE});
    }
    for (unsigned i = 0; i < 300; ++i) {
        const Point at{any(0, 230), any(0, 230), any(0, 50)};
        mixed.Add(at, {at.x + any(-9, 9), at.y + any(-9, 9), at.z}, Between(at, at, 0));
        mixed.Add(at, {at.x, at.y, at.z + 9}, {at.x + any(-9, 9), at.y + any(-9, 9), at.z});
    }
    mixed.Add({-9e3F, -9e3F, 20}, {9e3F, -9e3F, 20}, {0, 9e3F, 30});
    const auto lattice = [&](unsigned, unsigned) {
        return Point{float(random.Below(5)), float(random.Below(5)), pick({0.0F, -0.0F, 1, 2})};
    };
    const auto roof = [&](unsigned, unsigned) {
        const float x = any(0, 100), y = any(0, 100);
        return Point{x, y, 50 - 0.5F * std::fabs(x - 50)};
    };
    const auto wall = [&](unsigned i, unsigned k) {
        const auto at = float(i) + float(k == 1);
        return Point{0.7F * at, 0.3F * at, any(0, 9)};
    };
    const auto sliver = [](unsigned i, unsigned k) {
        return Point{float(i) + float(k == 1), k == 0 ? 0 : k == 1 ? 5e6F : -5e6F, float(k)};
    };
    const auto needle = [&](unsigned i, unsigned k) {
        const float along = k == 2 ? 100 : 0, across = k == 1 ? any(0, 1e-3F) : 0;
        return Point{along + across + float(i % 9), along - across + float(i), 0.1F * along};
    };
    const auto tower = [](unsigned i, unsigned k) {
        const auto size = float(i);
        return Point{k == 0 ? -size : k == 1 ? size : 0, k == 2 ? size : -size, 2};
    };
    const auto crowd = [&](unsigned, unsigned) {
        return Point{std::exp2(any(-90, 8)), std::exp2(any(-90, 8)), any(0, 5)};
    };
    const auto edge = [&](unsigned, unsigned) {
        return Point{any(-1, 1) * 3e38F, pick({LOWEST, -LOWEST, 1e38F}), any(-1, 1) * 3e38F};
    };
    const auto tiny = [&](unsigned, unsigned) {
        return Point{any(0, 9) * 1e-38F, any(0, 9) * 1e-38F, any(0, 9) * 1e-38F};
    };
    const auto same = [](unsigned, unsigned k) {
        return k == 0 ? Point{1, 1, 0} : k == 1 ? Point{4, 2, 1} : Point{2, 5, 2};
    };
    return {{"a sheet", sheet},
            {"a regular sheet", MakeSheet(0, random)},
            {"a flat sheet", Move(sheet, 0, 1, 0)},
            {"far from the origin", Move(sheet, 4e6F, 1, 1)},
            {"large", Move(sheet, 0, 1e15F, 1e15F)},
            {"with holes, walls, repeats and slivers", wild},
            {"with corners that are NaN or infinite", broken},
            {"with walls and a large triangle over all", mixed},
            {"a lattice of whole numbers", MakeRow(300, lattice)},
            {"two planes", MakeRow(500, roof)},
            {"walls in one plane", MakeRow(500, wall)},
            {"slivers", MakeRow(300, sliver)},
            {"needles", MakeRow(300, needle)},
            {"a tower", MakeRow(300, tower)},
            {"a crowded corner", MakeRow(500, crowd)},
            {"at the end of the range", MakeRow(200, edge)},
            {"at its other end", MakeRow(200, tiny)},
            {"copies", MakeRow(200, same)},
            {"one triangle", MakeRow(1, same)},
            {"a wide column", MakeMeshes(random)[2]}};
}

/// A segment in some relation to a triangle, or to none.
Segment MakeSegment(const OpenTin& tin, Random& random) {
    const auto corner = [&] {
        return *tin.GetTriangle(random.Below(tin.GetTriangleCount()))->GetVertex(0);
    };
    const Triangle& one = *tin.GetTriangle(random.Below(tin.GetTriangleCount()));
    const Point v0 = *one.GetVertex(0), v1 = *one.GetVertex(1), v2 = *one.GetVertex(2);
    const auto& box = tin.GetBBox();
    const auto anywhere = [&] {
        return Point{random.Between(box.min.x, box.max.x), random.Between(box.min.y, box.max.y),
                     random.Between(box.min.z, box.max.z)};
    };
    // In the plane of the triangle, as far as rounding lets it: within, along an edge, or far out.
    const auto inPlane = [&] {
        const float reach = random.Below(2) == 0 ? 1.0F : 9.0F;
        return Between(Between(v0, v1, random.Between(-reach, reach)), v2,
                       random.Between(-reach, reach));
    };
    const float far = std::exp2(random.Between(0, 40)), lift = random.Between(-20, 20);
    const Point at = anywhere(), to = anywhere();
    const Point beside{at.x + random.Between(-9, 9), at.y + random.Between(-9, 9), at.z};
    const float odd[] = {0.0F, -0.0F, INFINITE, -INFINITE, NOT_A_NUMBER, -LOWEST, 1e-40F, v0.x};
    Point strange = beside;
    (random.Below(2) == 0 ? strange.x : strange.z) = odd[random.Below(std::size(odd))];
    const Segment kinds[] = {
        {at, to},                                               // long
        {at, beside},                                           // short
        {corner(), corner()},                                   // between corners
        {v0, v1},                                               // an edge
        {Between(v0, v1, -3), Between(v0, v1, 4)},              // along an edge
        {inPlane(), inPlane()},                                 // in a plane
        {{v0.x, v0.y, v0.z + lift}, {v1.x, v1.y, v1.z + lift}}, // above an edge
        {{at.x, at.y, at.z - 99}, {at.x, at.y, at.z + 99}},     // vertical
        {{v0.x, v0.y, -1}, {v0.x, v0.y, 99}},                   // through a corner
        {at, at},                                               // without a length
        {v0, v0},                                               // on a corner
        {{at.x, at.y, at.z}, {to.x, at.y, at.z}},               // along x
        {{v0.x, at.y, 1}, {v0.x, to.y, 1}},                     // along y, through a corner
        {{at.x - far, at.y - 0.5F * far, at.z}, to},            // from far outside
        {{at.x - far, at.y + far, at.z + far}, {at.x + far, at.y - far, at.z - far}},
        {strange, to},                             // odd values
        {{v0.x, v0.y, 0.0F}, {v1.x, v1.y, -0.0F}}, // at height zero
    };
    return kinds[random.Below(std::size(kinds))];
}

/// Asks both ways, one by one and as a batch. @return how many segments have a crossing
unsigned Compare(const OpenTin& tin, const CrossingTree& tree, unsigned count, Random& random) {
    std::vector<point3_t<double>> batch;
    std::vector<float> wanted;
    unsigned found = 0;
    for (unsigned i = 0; i < count; ++i) {
        const Segment s = MakeSegment(tin, random);
        float h = UNTOUCHED, expected = UNTOUCHED;
        const bool isFound = tin.GetLineIntersectHeight(s.a, s.b, expected, nullptr);
        EXPECT_EQ(tree.GetLineIntersectHeight(s.a, s.b, h), isFound);
        EXPECT_EQ(GetBits(h), GetBits(expected))
            << s.a.x << " " << s.a.y << " " << s.a.z << " to " << s.b.x << " " << s.b.y << " "
            << s.b.z << ": " << h << ", expected " << expected;
        found += isFound;
        wanted.push_back(isFound ? expected : NOT_A_NUMBER);
        for (const Point& p : {s.a, s.b})
            batch.push_back({double(p.x), double(p.y), double(p.z)});
    }
    std::vector<float> heights(count + 1, UNTOUCHED);
    EXPECT_EQ(tree.GetLineIntersectHeights(batch.data(), count, heights.data()), found);
    for (unsigned i = 0; i < count; ++i)
        EXPECT_TRUE(GetBits(heights[i]) == GetBits(wanted[i]) ||
                    (std::isnan(heights[i]) && std::isnan(wanted[i])));
    EXPECT_EQ(heights[count], UNTOUCHED);
    return found;
}

TEST(CrossingTreeTest, AnswersAsAScanOfAllTriangles) {
    Random random;
    const char* effort = std::getenv("TIN_TEST_EFFORT");
    const unsigned count = effort == nullptr ? 400 : unsigned(std::atoi(effort));
    const int threads = omp_get_max_threads();
    omp_set_num_threads(1); // a team for each small scan only costs time
    for (const auto& [name, mesh] : MakeSurfaces(random)) {
        SCOPED_TRACE(name);
        OpenTin tin = mesh.MakeTin();
        const unsigned found = Compare(tin, CrossingTree(tin), count, random);
        EXPECT_EQ(found > 0, std::strcmp(name, "at its other end") != 0);
        // Boxes that are out of date are part of the rule.
        for (unsigned i = 0; i < tin.GetTriangleCount(); i += 7)
            tin.GetTriangle(i)->GetVertex(0)->z += 3, tin.GetTriangle(i)->GetVertex(1)->x += 2;
        Compare(tin, CrossingTree(tin), count / 5, random);
    }
    omp_set_num_threads(threads);
}

/// Sheets side by side, so many that a build divides its work, with some walls in each.
Mesh MakeLargeSurface(Random& random) {
    Mesh large;
    for (float x = 0; x < 12 * 230; x += 230) {
        const auto first = static_cast<unsigned>(large.vertices.size());
        for (const Point& v : MakeSheet(3, random).vertices)
            large.vertices.push_back({v.x + x, v.y, v.z});
        for (const Triangle_Id& id : MakeSheet(3, random).ids)
            large.ids.push_back({id.id0 + first, id.id1 + first, id.id2 + first});
        for (unsigned i = 0; i < 90; ++i)
            large.Add({x, float(i), 0}, {x + 9, float(i), 0}, {x, float(i), 9});
    }
    return large;
}

int Note(double done, const char*, void* data) {
    static_cast<std::vector<double>*>(data)->push_back(done);
    return done < 0.5;
}

TEST(CrossingTreeTest, IsTheSameOnAnyNumberOfThreadsAndStopsWhenTold) {
    Random random;
    auto tin = std::make_unique<OpenTin>(MakeLargeSurface(random).MakeTin());
    std::vector<double> noted;
    EXPECT_THROW(CrossingTree(*tin, {2, 0, {Note, &noted}}), CancelledException);
    EXPECT_TRUE(noted.size() > 3 && std::is_sorted(noted.begin(), noted.end()));
    EXPECT_TRUE(noted.front() == 0 && noted.back() >= 0.5);

    CrossingTree one(*tin, {1, 0, {}}), moved(*tin, {3, 0, {}});
    EXPECT_EQ(one.GetObjBytes(), moved.GetObjBytes());
    EXPECT_LE(one.GetObjBytes(), CrossingTree::EstimateObjBytes(tin->GetTriangleCount()));
    EXPECT_GE(one.GetObjBytes(), 44 * std::uint64_t{tin->GetTriangleCount()});
    CrossingTree three = std::move(moved);
    for (const CrossingTree* tree : {&one, &three})
        EXPECT_GT(Compare(*tin, *tree, 300, random), 50U);
    const Point a{-9, 99, 60}, b{999, 99, 0};
    float h = UNTOUCHED, same = UNTOUCHED;
    EXPECT_FALSE(moved.GetLineIntersectHeight(a, b, h)); // NOLINT(bugprone-use-after-move)
    EXPECT_EQ(h, UNTOUCHED);
    tin.reset();
    EXPECT_TRUE(one.GetLineIntersectHeight(a, b, h));
    EXPECT_TRUE(three.GetLineIntersectHeight(a, b, same));
    EXPECT_EQ(h, same);
}

TEST(CrossingTreeTest, OfAnEmptySurfaceHasItsBoxAndNoCrossing) {
    const Tin empty(nullptr, 0, static_cast<Triangle*>(nullptr), 0, 0, 0);
    const CrossingTree tree(empty);
    for (const Point& b : {Point{1, 1, 1}, Point{9, 1, 1}, Point{-1, -1, -1}}) {
        float h = UNTOUCHED, wanted = UNTOUCHED;
        EXPECT_EQ(tree.GetLineIntersectHeight(Point{1, 1, 0}, b, h),
                  empty.GetLineIntersectHeight(Point{1, 1, 0}, b, wanted, nullptr));
        EXPECT_EQ(h, wanted);
    }
    EXPECT_EQ(tree.GetLineIntersectHeights(nullptr, 0, nullptr), 0U);
}

} // namespace
} // namespace kelm::tin::test

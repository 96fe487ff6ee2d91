#include "tin/crossingtree.h"
#include "tests/support/oddsurfaces.h"

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

Point Between(const Point& a, const Point& b, float t) {
    return {a.x + (b.x - a.x) * t, a.y + (b.y - a.y) * t, a.z + (b.z - a.z) * t};
}

/// Every coordinate of a mesh through x -> offset + scale x.
Mesh Move(Mesh mesh, float offset, float scale, float zScale) {
    for (Point& v : mesh.vertices)
        v = {offset + scale * v.x, offset + scale * v.y, zScale * v.z};
    return mesh;
}

/// The odd surfaces, and those that are odd for lines alone.
std::vector<OddSurface> MakeSurfaces(Random& random) {
    const auto any = [&](float low, float high) { return random.Between(low, high); };
    const auto pick = [&](std::initializer_list<float> values) {
        return values.begin()[random.Below(values.size())];
    };
    const Mesh sheet = MakeSheet(3, random);
    Mesh broken = MakeMeshes(random)[1], mixed = sheet;
    for (unsigned i = 0; i < 60; ++i) {
        Point& v = broken.vertices[random.Below(broken.vertices.size())];
        (i % 3 == 0 ? v.x : i % 3 == 1 ? v.y : v.z) = pick({NOT_A_NUMBER, INFINITE, -INFINITE});
    }
    for (unsigned i = 0; i < 300; ++i) {
        const Point at{any(0, 230), any(0, 230), any(0, 50)};
        mixed.Add(at, {at.x + any(-9, 9), at.y + any(-9, 9), at.z}, at);
        mixed.Add(at, {at.x, at.y, at.z + 9}, {at.x + any(-9, 9), at.y + any(-9, 9), at.z});
    }
    mixed.Add({-9e3F, -9e3F, 20}, {9e3F, -9e3F, 20}, {0, 9e3F, 30});
    std::vector<OddSurface> list = MakeOddSurfaces(random);
    list.push_back({"flat", Move(sheet, 0, 1, 0)});
    list.push_back({"far from the origin", Move(sheet, 4e6F, 1, 1)});
    list.push_back({"with corners that are NaN or infinite", broken});
    list.push_back({"with walls and a large triangle over all", mixed});
    const auto addEach = [&](const char* name, unsigned count, const auto& corner) {
        list.push_back({name, MakeEach(count, [&](float i) {
                            return std::array<Point, 3>{corner(i, 0), corner(i, 1), corner(i, 2)};
                        })});
    };
    addEach("a lattice of whole numbers", 300, [&](float, unsigned) {
        return Point{float(random.Below(5)), float(random.Below(5)), pick({0.0F, -0.0F, 1, 2})};
    });
    addEach("two planes", 500, [&](float, unsigned) {
        const float x = any(0, 100), y = any(0, 100);
        return Point{x, y, 50 - 0.5F * std::fabs(x - 50)};
    });
    addEach("walls in one plane", 500, [&](float i, unsigned k) {
        const float at = i + float(k == 1);
        return Point{0.7F * at, 0.3F * at, any(0, 9)};
    });
    addEach("needles", 300, [&](float i, unsigned k) {
        const float along = k == 2 ? 100 : 0, across = k == 1 ? any(0, 1e-3F) : 0;
        return Point{along + across + std::fmod(i, 9.0F), along - across + i, 0.1F * along};
    });
    addEach("at the end of the range", 200, [&](float, unsigned) {
        return Point{any(-1, 1) * 3e38F, pick({LOWEST, -LOWEST, 1e38F}), any(-1, 1) * 3e38F};
    });
    addEach("at its other end", 200, [&](float, unsigned) {
        return Point{any(0, 9) * 1e-38F, any(0, 9) * 1e-38F, any(0, 9) * 1e-38F};
    });
    return list;
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
    const Point before{v0.x + random.Between(-9, 9), v0.y + random.Between(-9, 9), v0.z + lift};
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
        {before, Between(before, v0, 3)},                       // past a corner
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

/// A segment past a corner or an edge of the first triangle, so near that rounding decides: through
/// it, to it, or nearly along an axis. Each of its components has a size of its own.
Segment MakeGrazing(const OpenTin& tin, Random& random) {
    const Triangle& one = *tin.GetTriangle(0);
    const int k = static_cast<int>(random.Below(3));
    const Point rim = Between(*one.GetVertex(k), *one.GetVertex((k + 1) % 3),
                              random.Below(2) == 0 ? 0 : random.Between(0, 1));
    const auto any = [&](float least, float most) {
        return std::exp2(random.Between(least, most)) * (random.Below(2) == 0 ? 1.0F : -1.0F);
    };
    const auto beside = [&](const Point& d, float t) {
        return Point{rim.x + t * d.x, rim.y + t * d.y, rim.z + t * d.z};
    };
    const Point through{any(-24, 8), any(-24, 8), any(-24, 8)};
    const Point along{any(-16, 4), any(-6, 8), any(-6, 8)};
    const Point tiny{any(-40, -18), any(-40, -18), any(-40, -18)};
    const Segment kinds[] = {
        {beside(through, random.Between(-1, 0)), beside(through, random.Between(0, 1))},
        {beside(through, 1), beside(tiny, 1)},
        {beside(along, -1), beside(along, 1)},
        {beside({along.y, along.x, along.z}, -1), beside({along.y, along.x, along.z}, 1)}};
    return kinds[random.Below(std::size(kinds))];
}

/// Asks both ways, one by one and as a batch. @return how many segments have a crossing
unsigned Compare(const OpenTin& tin, const CrossingTree& tree, unsigned count, Random& random,
                 Segment (*makeSegment)(const OpenTin&, Random&) = MakeSegment) {
    std::vector<point3_t<double>> batch;
    std::vector<float> wanted;
    unsigned found = 0;
    for (unsigned i = 0; i < count; ++i) {
        const Segment s = makeSegment(tin, random);
        float h = UNTOUCHED, expected = UNTOUCHED;
        const bool isFound = tin.GetLineIntersectHeight(s.a, s.b, expected, nullptr);
        EXPECT_EQ(tree.GetLineIntersectHeight(s.a, s.b, h), isFound);
        EXPECT_TRUE(IsSameBits(h, expected))
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
        EXPECT_TRUE(IsSameBits(heights[i], wanted[i]) ||
                    (std::isnan(heights[i]) && std::isnan(wanted[i])));
    EXPECT_EQ(heights[count], UNTOUCHED);
    return found;
}

/// A team for each small scan would only cost time.
struct OneThread {
    OneThread() { omp_set_num_threads(1); }
    ~OneThread() { omp_set_num_threads(most); }
    int most = omp_get_max_threads();
};

TEST(CrossingTreeTest, AnswersAsAScanOfAllTriangles) {
    const OneThread oneThread;
    Random random;
    const char* effort = std::getenv("TIN_TEST_EFFORT");
    const unsigned count = effort == nullptr ? 400 : unsigned(std::atoi(effort));
    unsigned found = 0, asked = 0;
    for (const OddSurface& odd : MakeSurfaces(random)) {
        if (odd.oMesh.ids.empty())
            continue;
        SCOPED_TRACE(odd.sName);
        OpenTin tin = odd.oMesh.MakeTin();
        odd.disturb(tin);
        found += Compare(tin, CrossingTree(tin), count, random);
        asked += count;
        // Boxes that are out of date are part of the rule.
        for (unsigned i = 0; i < tin.GetTriangleCount(); i += 7)
            tin.GetTriangle(i)->GetVertex(0)->z += 3, tin.GetTriangle(i)->GetVertex(1)->x += 2;
        const std::size_t before = GetHeapBytes();
        const CrossingTree tree(tin);
        EXPECT_LE(GetHeapBytes() - before, 1.05 * double(tree.GetObjBytes()) + 4096);
        Compare(tin, tree, count / 5, random);
    }
    EXPECT_GT(found, asked / 5);
}

// A triangle alone in its box is asked for where the box ends. Beside a large corner a small one is
// lost in the differences, and far from the origin so are the margins.
TEST(CrossingTreeTest, LosesNoCrossingAtTheFacesOfABox) {
    const OneThread oneThread;
    Random random;
    unsigned found = 0;
    for (unsigned n = 0; n < 3000; ++n) {
        const float origin = n % 3 == 0 ? 1000 : 0;
        const auto corner = [&] {
            const float size = std::exp2(random.Between(-8, 8));
            return Point{origin + size * random.Between(-1, 1),
                         origin + size * random.Between(-1, 1), size * random.Between(-1, 1)};
        };
        Mesh mesh;
        mesh.Add(corner(), corner(), corner());
        const OpenTin tin = mesh.MakeTin();
        found += Compare(tin, CrossingTree(tin), 200, random, MakeGrazing);
    }
    EXPECT_GT(found, 100000U);
}

/// Sheets side by side, so many that a build divides its work and a batch walks several lines in
/// turn, with some walls in each.
Mesh MakeLargeSurface(Random& random) {
    Mesh large;
    for (float x = 0; x < 50 * 230; x += 230) {
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

struct Notes {
    double dfStop;
    std::vector<double> done;
};

int Note(double done, const char*, void* data) {
    Notes& notes = *static_cast<Notes*>(data);
    notes.done.push_back(done);
    return done < notes.dfStop;
}

TEST(CrossingTreeTest, IsTheSameOnAnyNumberOfThreadsAndStopsWhenTold) {
    Random random;
    auto tin = std::make_unique<OpenTin>(MakeLargeSurface(random).MakeTin());
    Notes half{0.5, {}}, whole{2.0, {}};
    EXPECT_THROW(CrossingTree(*tin, {2, 0, {Note, &half}}), CancelledException);
    CrossingTree one(*tin, {1, 0, {}}), moved(*tin, {3, 0, {Note, &whole}});
    for (const Notes& notes : {half, whole})
        EXPECT_TRUE(notes.done.size() > 3 && std::is_sorted(notes.done.begin(), notes.done.end()));
    EXPECT_TRUE(half.done.front() == 0 && half.done.back() >= 0.5 && whole.done.back() == 1.0);

    EXPECT_EQ(one.GetObjBytes(), moved.GetObjBytes());
    EXPECT_LE(one.GetObjBytes(), CrossingTree::EstimateObjBytes(tin->GetTriangleCount()));
    EXPECT_GE(one.GetObjBytes(), 44 * std::uint64_t{tin->GetTriangleCount()});
    CrossingTree three = std::move(moved);
    for (const CrossingTree* tree : {&one, &three})
        EXPECT_GT(Compare(*tin, *tree, 300, random), 50U);
    const Point a{-9, 99, 60}, b{999, 99, 0};
    float h = UNTOUCHED, same = UNTOUCHED;
    const point3_t<double> ends[] = {{-9, 99, 60}, {999, 99, 0}};
    EXPECT_FALSE(moved.GetLineIntersectHeight(a, b, h)); // NOLINT(bugprone-use-after-move)
    EXPECT_FALSE(moved.GetLineIntersectHeight(ends[0], ends[1], h));
    EXPECT_EQ(h, UNTOUCHED);
    EXPECT_EQ(moved.GetLineIntersectHeights(ends, 1, &h), 0U);
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

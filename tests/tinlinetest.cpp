#include "tests/support/sheets.h"
#include "tin/ray2.h"

#include <array>

namespace kelm::tin::test {

namespace {

using Segment = std::array<Point, 2>;

/// Long, short, vertical or of length zero, along an edge, along an axis, beside the box.
Segment MakeSegment(const OpenTin& tin, Random& random) {
    const auto at = [&](const Point2& p) { return Point{p.x, p.y, random.Between(-20, 90)}; };
    const Point a = at(MakePosition(tin, random)), b = at(MakePosition(tin, random));
    const Triangle& t = *tin.GetTriangle(random.Below(tin.GetTriangleCount()));
    const Segment segments[] = {{a, b},
                                {a, {a.x + random.Between(-3, 3), a.y + random.Between(-3, 3), 9}},
                                {a, {a.x, a.y, b.z}},
                                {*t.GetVertex(0), *t.GetVertex(1)},
                                {a, {a.x, b.y, b.z}},
                                {*t.GetVertex(2), {a.x, t.GetVertex(2)->y, a.z}},
                                {Point{a.x - 999, a.y, a.z}, {b.x - 999, b.y, b.z}}};
    return segments[random.Below(7)];
}

/// The highest crossing, what stands for none, or UNTOUCHED beside the box.
float HighestOf(const OpenTin& tin, const Indices& list, const Segment& s) {
    float h, highest = IsIntersectedBBox(tin.GetBBox(), s[0], s[1]) ? LOWEST : UNTOUCHED;
    for (const unsigned i : list)
        if (tin.GetTriangle(i)->GetLineIntersectHeight(s[0], s[1], h) == IR_Inside && h > highest)
            highest = h;
    return highest;
}

} // namespace

TEST(TinLine, BothFormsFindWhatTheSegmentTouches) {
    Random random;
    unsigned grazing = 0, crossing = 0;
    for (const Mesh& mesh : MakeMeshes(random)) {
        const OpenTin tin = mesh.MakeTin();
        const AabbTree tree(&tin);
        for (int i = 0; i < 3000; ++i) {
            SCOPED_TRACE(i);
            const Segment s = MakeSegment(tin, random);
            const Point2 a{s[0].x, s[0].y}, b{s[1].x, s[1].y};
            const auto touches = [&](const Triangle& t) {
                return t.IsIntersectedLine(a.x, a.y, b.x, b.y);
            };
            const auto meets = [&](const Box& box) { return IsIntersectedBBox(box, a, b); };
            Indices walked, inPlan, scanned;
            tin.FindTrianglesByLine(s[0], s[1], walked, &tree);
            tin.FindTrianglesByLine(a, b, inPlan, &tree);
            tin.FindTrianglesByLine(a, b, scanned, nullptr);
            ASSERT_EQ(scanned, Filter(tin, tin.GetAll(), touches));
            ASSERT_EQ(walked, Filter(tin, CollectLeaves(tree.GetRoot(), meets), touches));
            ASSERT_EQ(inPlan, walked);
            const float expected = HighestOf(tin, scanned, s);
            const bool isFound = expected != LOWEST && expected != UNTOUCHED;
            float byScan = UNTOUCHED, byWalk = UNTOUCHED;
            ASSERT_EQ(tin.GetLineIntersectHeight(s[0], s[1], byScan, nullptr), isFound);
            tin.GetLineIntersectHeight(s[0], s[1], byWalk, &tree);
            ASSERT_EQ(byScan, expected);
            ASSERT_EQ(byWalk, HighestOf(tin, walked, s));
            grazing += Sorted(walked) != scanned;
            crossing += isFound;
        }
    }
    EXPECT_GT(crossing, 1000U);
    EXPECT_LT(grazing, 120U); // the box test may lose a segment that ends at the corner of a box
}

TEST(TinLine, TheHighestCrossingInBothFrames) {
    Mesh ridge; // as high as x up to 10, and down again
    ridge.Add({0, 0, 0}, {10, 0, 10}, {10, 10, 10});
    ridge.Add({10, 0, 10}, {20, 0, 0}, {10, 10, 10});
    const OpenTin tin = ridge.MakeTin(100000000.25, 7000);
    const AabbTree tree(&tin), rootless, *const indices[] = {nullptr, &tree};
    const point3_t<double> above{100000005.25, 7001, 9}, below{100000005.25, 7001, 0};
    for (const AabbTree* index : indices) {
        float h = UNTOUCHED;
        EXPECT_FALSE(tin.GetLineIntersectHeight(Point{-5, -1, 0}, {25, -1, 9}, h, index));
        EXPECT_EQ(h, UNTOUCHED);
        EXPECT_FALSE(tin.GetLineIntersectHeight(Point{0, 1, 11}, {20, 1, 11}, h, index));
        EXPECT_EQ(h, LOWEST);
        EXPECT_TRUE(tin.GetLineIntersectHeight(Point{0, 1, 6}, {20, 1, 2}, h, index));
        EXPECT_FLOAT_EQ(h, 5); // 6 - x / 5 meets x at 5, and then 20 - x lower
        EXPECT_TRUE(tin.GetLineIntersectHeight(Point{20, 1, 2}, {0, 1, 6}, h, index));
        EXPECT_FLOAT_EQ(h, 5);
        EXPECT_FALSE(tin.GetLineIntersectHeight(Point{5, 1, 9}, {5, 1, 5.01F}, h, index));
        EXPECT_TRUE(tin.GetLineIntersectHeight(above, below, h, index) && h == 5);
        EXPECT_FALSE(tin.GetLineIntersectHeight(above, below, h, &rootless));
    }
}

} // namespace kelm::tin::test

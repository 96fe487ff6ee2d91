#include "tests/support/sheets.h"
#include "tin/vector3.h"

namespace kelm::tin::test {
namespace {

/// Twice the area that three points span in plan. All oracles are exact for quarters.
float GetArea(const Point& a, const Point& b, const Point& c) {
    return (b.x - a.x) * (c.y - a.y) - (b.y - a.y) * (c.x - a.x);
}

/// Do two convex polygons, segments or points share a point in plan? By separating lines.
bool IsMet(const Corners& v, const Corners& w) {
    std::vector<std::pair<Point, Point>> lines = {{{}, {1, 0, 0}}, {{}, {0, 1, 0}}};
    for (const Corners& c : {v, w})
        for (std::size_t i = 0; i < c.size(); ++i)
            lines.emplace_back(c[i], c[(i + 1) % c.size()]);
    return std::none_of(lines.begin(), lines.end(), [&](const auto& line) {
        const auto isLess = [&](const Point& p, const Point& q) {
            return GetArea(line.first, line.second, p) < GetArea(line.first, line.second, q);
        };
        const auto [lowV, highV] = std::minmax_element(v.begin(), v.end(), isLess);
        const auto [lowW, highW] = std::minmax_element(w.begin(), w.end(), isLess);
        return isLess(*highV, *lowW) || isLess(*highW, *lowV);
    });
}

TEST(TriangleTest, JudgesAsExactArithmeticDoes) {
    Random random;
    const auto digit = [&] { return static_cast<float>(random.Below(6)); };
    const auto part = [&] { return static_cast<float>(random.Below(7)) / 4 - 0.25F; };
    const auto make = [&] { return Point{digit(), digit(), digit()}; };
    const auto move = [](const Point& p, float by, const Point& d) {
        return Point{p.x + by * d.x, p.y + by * d.y, p.z + by * d.z};
    };
    for (int i = 0; i < 60000; ++i) {
        const Point o = move(make(), 99, {0, 0, 1}), d1 = make(), d2 = make(), d = make();
        const OwnTriangle t({o, move(o, 1, d1), move(o, -1, d2)}), other({make(), make(), make()});
        const Corners &v = t.corners, &w = other.corners;
        const float l1 = part(), l2 = part(), at = part();
        const Point p = move(move(o, l1, d1), -l2, d2), q = move(move(o, part(), d1), -part(), d2);
        const bool isInside = l1 >= 0 && l2 >= 0 && l1 + l2 <= 1;
        // The segment along d meets the plane at p, after a part of its length.
        const bool isReached = (Vector3(d1) ^ Vector3(d2)) * Vector3(d) != 0 && at >= 0 && at <= 1;
        float h = UNTOUCHED;
        const auto relation = isInside ? IR_Inside : IR_Outside;
        ASSERT_EQ(t.GetLineIntersectHeight(move(p, -at, d), move(p, 1 - at, d), h),
                  isReached ? relation : IR_Disjoint);
        ASSERT_EQ(h, isReached && isInside ? p.z : UNTOUCHED);
        const bool isFlat = GetArea(v[0], v[1], v[2]) == 0, holds = isInside && !isFlat;
        ASSERT_EQ(t.GetHeight(p.x, p.y, h = UNTOUCHED), holds);
        ASSERT_EQ(h, holds ? p.z : UNTOUCHED);
        ASSERT_EQ(t.IsPointInside(p.x, p.y), holds);
        if (isFlat || GetArea(w[0], w[1], w[2]) == 0)
            continue;
        ASSERT_EQ(t.IsIntersectedLine(p.x, p.y, q.x, q.y), IsMet(v, {p, q}));
        ASSERT_EQ(t.IsIntersected(other), IsMet(v, w));
        // Slabs divide by the steps of an edge, which is exact for powers of two.
        const Point b = move(o, std::exp2(digit()), {1, 0, 0}), c = move(o, -4, {0, 1, 0});
        const Box box = MakeBox(Point2{w[0].x, w[0].y}, Point2{w[1].x, w[1].y});
        const Corners rim = {w[0], {w[1].x, w[0].y, 0}, w[1], {w[0].x, w[1].y, 0}};
        const bool meetsEdge = IsMet(rim, {o, b}) || IsMet(rim, {b, c}) || IsMet(rim, {c, o});
        ASSERT_EQ(OwnTriangle({o, b, c}).IsIntersected(box),
                  w[0].x <= w[1].x && w[0].y <= w[1].y && meetsEdge);
    }
}

TEST(TriangleTest, SumsInItsOrderAndLetsNotANumberPass) {
    float h;
    const OwnTriangle steep({{0, 0, 0x1p60F}, {4, 0, -0x1p60F}, {0, 4, 1}});
    EXPECT_TRUE(steep.GetHeight(1, 2, h) && h == 0.5F); // the third term last
    const OwnTriangle far({{0x1p24F, 0x1p24F, 0}, {1, 1, 0}, {-0x1p24F, -0x1p24F, 0}});
    EXPECT_TRUE(far.GetCenterAt(AX_X) == 0 && far.GetCenterAt(AX_Y) == 0);
    EXPECT_EQ(Vector3(1e16, -1e16, 1) * Vector3(1, 1, 1), 1); // the z term last
    const OwnTriangle low({{0, 0, -1}, {4, 0, -1}, {0, 4, -1}});
    // 2^24 + 1 is no float: the difference is 2^24, and the segment's end counts as 0.
    EXPECT_TRUE(low.GetLineIntersectHeight({1, 1, 0x1p24F}, {1, 1, -1}, h) == IR_Inside && h == 0);
    EXPECT_EQ(low.GetLineIntersectHeight({1, 1, NOT_A_NUMBER}, {1, 1, 0}, h), IR_Inside);
    // So little below the edge that the weights do not show it; the box does.
    EXPECT_TRUE(low.IsPointInsideLT(2, -1e-45F) && !low.IsPointInside(2, -1e-45F));
    EXPECT_TRUE(low.GetHeight(NOT_A_NUMBER, 1, h) && !low.IsPointInside(NOT_A_NUMBER, 1));
    for (const float top : {3e9F, 0x1p31F}) { // beyond any int
        const OwnTriangle huge({{-top, -top, 0}, {top, -top, 0}, {0, top, 0}});
        EXPECT_EQ(huge.GetGridPointsNum(4, 4), 16U);
        EXPECT_EQ(huge.GetGridPointsNum(70000, 70000), 4294967295U) << "of 4.9e9 cells";
    }
}

TEST(TriangleTest, ADeterminantCountsFromEpsilonOnInEitherSense) {
    float h;
    for (const float leg : {0x1p-26F, 0x1.fffffep-27F}) // times 2^-26: 2^-52, and the next below
        for (const float sign : {1.0F, -1.0F}) {
            const bool counts = leg == 0x1p-26F;
            const OwnTriangle t({{0, 0, 5}, {sign * 0x1p-26F, 0, 5}, {0, leg, 5}});
            EXPECT_EQ(t.GetHeight(0, 0, h), counts);
            EXPECT_EQ(t.GetLineIntersectHeight({0, 0, 5.5F}, {0, 0, 4.5F}, h),
                      counts ? IR_Inside : IR_Disjoint);
            // Too thin to hold a position: only its edges can be crossed.
            const OwnTriangle thin({{0, 0, 0}, {0, leg / 16, 0}, {sign * 0x1p-23F, 0, 0}});
            EXPECT_EQ(thin.IsIntersectedLine(-0x1p-23F, leg / 32, 0x1p-23F, leg / 32), counts);
        }
}

TEST(TriangleTest, VectorsAreSummedAndScaledByComponents) {
    const auto is = [](const Vector3& v, double x, double y, double z) {
        return v._x() == x && v._y() == y && v._z() == z;
    };
    const point3_t<double> p{1, 0, -1};
    Vector3 v(point3_t<double>{3, 4, 12}), w, unit(0, 3, 4), tiny(1e-310, 0, 0);
    w = p;
    unit.Normalize();
    tiny.Normalize(); // its length is zero
    EXPECT_TRUE(is(v + w, 4, 4, 11) && is(v + p, 4, 4, 11) && is(v ^ w, -4, 15, -4) &&
                is(v - w, 2, 4, 13) && is(v - p, 2, 4, 13) && v.Length() == 13 &&
                is(v * 2.0, 6, 8, 24) && is(v / 2.0, 1.5, 2, 6) && std::signbit((-(v - v)).x) &&
                is(unit, 0, 3 * (1 / 5.0), 4 * (1 / 5.0)) && tiny.x == 1e-310);
    v *= 0.5;
    point3_t<double> out;
    v.GetXYZ(&out);
    EXPECT_EQ(out.z, 6);
}

TEST(TriangleGridTest, ListsTheCellsThatExactArithmeticFinds) {
    Random random;
    for (int i = 0; i < 20000; ++i) {
        const auto quarter = [&] { return static_cast<float>(random.Below(64)) / 4 - 3; };
        const auto make = [&] { return Point{quarter(), quarter(), quarter()}; };
        const OwnTriangle t({make(), make(), make()});
        const int cols = static_cast<int>(random.Below(14)) - 1, rows = 11 - cols;
        const Box& box = t.GetBBox();
        const bool isOneColumn = std::max(0.0F, std::ceil(box.min.x)) ==
                                 std::min(static_cast<float>(cols - 1), std::floor(box.max.x));
        std::vector<int> expected, confirmed, cells; // column and row in turn
        std::vector<float> expectedHeights, heights;
        for (int row = 0; row < rows; ++row)
            for (int col = 0; col < cols; ++col) {
                const Point p{static_cast<float>(col), static_cast<float>(row), 0};
                float h;
                const bool isInside = t.GetHeight(p.x, p.y, h);
                // The row of the lowest corner is left out, but not in an extent of one column.
                if (isOneColumn ? !isInside : p.y <= box.min.y || !IsMet(t.corners, {p}))
                    continue;
                expected.insert(expected.end(), {col, row});
                if (!isInside)
                    continue;
                confirmed.insert(confirmed.end(), {col, row});
                expectedHeights.push_back(h);
            }
        ASSERT_EQ(t.GetGridPoints(cols, rows, cells, heights), expectedHeights.size());
        ASSERT_TRUE(cells == confirmed && heights == expectedHeights) << i;
        // What stood in the list before counts along, unless no range of the grid is covered.
        const auto sum = static_cast<unsigned>(cells.size());
        const unsigned both = t.GetGridPoints(cols, rows, cells, heights);
        ASSERT_TRUE(both == sum || (sum == 0 && both == 0)) << i;
        cells.resize(2 * t.GetGridPointsNum(cols, rows));
        t.GetGridPointsCR(cells.data(), cols, rows);
        ASSERT_EQ(cells, expected) << i;
    }
}

// From column 2^25 on only each fourth one is a float: the last column rounds beyond the grid.
TEST(TriangleGridTest, EndsAtTheLastColumnWhereColumnsAreNoFloats) {
    constexpr int LAST = 33554435;
    const OwnTriangle t({{0x1p25F - 8, 0, 1}, {0x1p25F + 64, 0, 1}, {0x1p25F - 8, 2, 1}});
    std::vector<int> expected, cells(24);
    for (int col = LAST - 11; col <= LAST; ++col)
        expected.insert(expected.end(), {col, 1});
    ASSERT_EQ(t.GetGridPointsNum(LAST + 1, 2), 12U);
    t.GetGridPointsCR(cells.data(), LAST + 1, 2);
    EXPECT_EQ(cells, expected);
    std::vector<float> heights;
    cells.clear();
    EXPECT_EQ(t.GetGridPoints(LAST + 1, 2, cells, heights), 12U);
    EXPECT_EQ(cells, expected);
}

} // namespace
} // namespace kelm::tin::test

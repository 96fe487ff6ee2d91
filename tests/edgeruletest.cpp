#include "tests/support/oddsurfaces.h"
#include "tin/heightgrid.h"
#include "tin/raster.h"

#ifndef __clang__ // g++ 12 sees no value where a number of Boost's has one
#pragma GCC diagnostic ignored "-Wmaybe-uninitialized"
#endif
#include <boost/multiprecision/cpp_int.hpp>

namespace kelm::tin::test {
namespace {

using Rational = boost::multiprecision::cpp_rational;

/// Twice the area of the triangle a-b-c.
Rational GetArea(const Point2& a, const Point2& b, const Point2& c) {
    const Rational ax(a.x), ay(a.y), bx(b.x), by(b.y), cx(c.x), cy(c.y);
    return (ax - cx) * (by - cy) - (ay - cy) * (bx - cx);
}

/// Does a triangle hold the position, edges included? If so, the exact height of its plane there.
bool IsHeld(const Triangle& t, const Point2& p, Rational& rHeight) {
    const Point &a = *t.GetVertex(0), &b = *t.GetVertex(1), &c = *t.GetVertex(2);
    const Rational u = GetArea({b.x, b.y}, {c.x, c.y}, p), v = GetArea({c.x, c.y}, {a.x, a.y}, p);
    const Rational w = GetArea({a.x, a.y}, {b.x, b.y}, p), sum = u + v + w;
    if (sum == 0 || !((u >= 0 && v >= 0 && w >= 0) || (u <= 0 && v <= 0 && w <= 0)))
        return false;
    rHeight = (u * Rational(a.z) + v * Rational(b.z) + w * Rational(c.z)) / sum;
    return true;
}

/// A position nearest to an edge of a sheet: its place along the edge, rounded to `float`, and
/// perhaps a step further.
Point2 MakeEdgePosition(const OpenTin& tin, Random& random) {
    const Triangle& t = *tin.GetTriangle(random.Below(tin.GetTriangleCount()));
    const Point a = *t.GetVertex(static_cast<int>(random.Below(3)));
    const Point b = *t.GetVertex(static_cast<int>(random.Below(3)));
    const double u = double(random.Between(0, 1));
    Point2 p{static_cast<float>(double(a.x) + u * (double(b.x) - double(a.x))),
             static_cast<float>(double(a.y) + u * (double(b.y) - double(a.y)))};
    if (random.Below(4) == 0)
        p.x = std::nextafter(p.x, random.Below(2) == 0 ? LOWEST : -LOWEST);
    return p;
}

struct Sheet {
    const char* name;
    Mesh mesh;
};

/// Sheets without gaps, the last one with another above and below it.
std::vector<Sheet> MakeGaplessSheets(Random& random) {
    struct Row {
        const char* name;
        float xScale, yScale, jitter;
    };
    std::vector<Sheet> sheets;
    for (const Row& row : {Row{"regular", 1, 1, 0},
                           {"jittered", 1, 1, 3},
                           {"huge", 7e6F, 3e6F, 3},
                           {"slivers", 1, 3e-5F, 3},
                           {"two sheets", 1, 1, 3}}) {
        Mesh mesh = MakeSheet(row.jitter, random);
        for (Point& v : mesh.vertices)
            v = {(v.x - 115) * row.xScale, (v.y - 115) * row.yScale, v.z};
        sheets.push_back({row.name, mesh});
    }
    Mesh& two = sheets.back().mesh;
    for (unsigned i = 0; i < 1058; ++i)
        two.ids.push_back({two.ids[i].id0 + 576, two.ids[i].id1 + 576, two.ids[i].id2 + 576});
    for (unsigned i = 0; i < 576; ++i)
        two.vertices.push_back(
            {two.vertices[i].x, two.vertices[i].y, two.vertices[i].z + random.Between(-9, 9)});
    return sheets;
}

/// Is the position held by exact arithmetic, which the first triangles near it tell?
bool IsInSheet(const OpenTin& tin, const AabbTree& tree, const Point2& p, Rational& rHighest) {
    Indices near;
    tree.FindLeaves(p.x, p.y, near);
    bool isHeld = false;
    for (const unsigned id : near) {
        Rational height;
        if (!IsHeld(*tin.GetTriangle(id), p, height))
            continue;
        rHighest = isHeld ? std::max(rHighest, height) : height;
        isHeld = true;
    }
    return isHeld;
}

/// Is a height the exact one, but for a few roundings in `double` and one to `float`?
bool IsNearest(float height, const Rational& exact) {
    constexpr double ROUNDINGS = 1e-12;
    const auto near = exact.convert_to<double>();
    return height >= static_cast<float>(near - ROUNDINGS) &&
           height <= static_cast<float>(near + ROUNDINGS);
}

/// A batch of a position between others close by, which is a run in a cell.
void ExpectRun(const HeightGrid& grid, const Point2& p, EdgeRule rule, bool isFound, float h) {
    std::vector<point2_t<double>> positions;
    for (const float step : {0.0F, -1e-6F, 0.0F, 1e-6F, 0.0F})
        positions.push_back({double(p.x * (1 + step)), double(p.y * (1 + step))});
    float heights[5];
    grid.GetHeights(positions.data(), 5, heights, 1, rule);
    for (const unsigned i : {0U, 2U, 4U})
        EXPECT_TRUE(isFound ? IsSameBits(heights[i], h) : std::isnan(heights[i]))
            << p.x << ", " << p.y << ", rule " << rule;
}

/// A raster of three cells around a position, of which the others lie in triangles.
void ExpectCells(const OpenTin& tin, const HeightGrid& grid, const Point2& p, float h,
                 bool isFound) {
    const double side = std::fabs(double(p.x)) * 1e-4;
    const RasterFrame frame{3, 1, {double(p.x) - 1.5 * side, side, 0, double(p.y), 0, 0}};
    float cells[3], same[3];
    RasterizeHeights(tin, frame, cells, 1, ER_Closed);
    RasterizeHeights(grid, frame, same, 1, ER_Closed);
    EXPECT_TRUE(isFound ? IsSameBits(cells[1], h) : std::isnan(cells[1])) << p.x << ", " << p.y;
    EXPECT_TRUE(isFound ? IsSameBits(same[1], h) : std::isnan(same[1])) << p.x << ", " << p.y;
}

// TIN_TEST_POSITIONS sets how many positions are tried on each sheet.
TEST(EdgeRule, ClosedMissesNoPositionOfAGaplessSheetAndNoneBesideIt) {
    Random random;
    const char* pszCount = std::getenv("TIN_TEST_POSITIONS");
    const int nCount = pszCount == nullptr ? 40000 : std::atoi(pszCount);
    std::printf("of %d positions   missed by ER_Float  by ER_Closed  beside the sheet\n", nCount);
    for (const auto& [name, mesh] : MakeGaplessSheets(random)) {
        const OpenTin tin = mesh.MakeTin();
        const AabbTree tree(&tin);
        const HeightGrid grid(tin);
        int nMissed = 0, nMissedClosed = 0, nBeside = 0;
        for (int i = 0; i < nCount && !testing::Test::HasFailure(); ++i) {
            const Point2 p = MakeEdgePosition(tin, random);
            float h = UNTOUCHED, closed = UNTOUCHED, byTree = UNTOUCHED;
            const bool isFound = grid.GetHeight(p.x, p.y, h);
            const bool isClosed = grid.GetHeight(p.x, p.y, closed, ER_Closed);
            ExpectRun(grid, p, ER_Float, isFound, h);
            ExpectRun(grid, p, ER_Closed, isClosed, closed);
            EXPECT_EQ(tin.GetHeight(p.x, p.y, byTree, &tree, ER_Closed), isClosed);
            EXPECT_TRUE(IsSameBits(closed, byTree) && (!isFound || IsSameBits(closed, h)));
            if (isFound)
                continue;
            ExpectCells(tin, grid, p, closed, isClosed);
            Rational exact;
            const bool isHeld = IsInSheet(tin, tree, p, exact);
            nMissed += isHeld;
            nMissedClosed += isHeld && !isClosed;
            nBeside += !isHeld;
            EXPECT_TRUE(isHeld || !isClosed) << p.x << ", " << p.y << " lies beside";
            EXPECT_TRUE(!isHeld || !isClosed || IsNearest(closed, exact)) << p.x << ", " << p.y;
        }
        std::printf("%-17s %19d %13d %17d\n", name, nMissed, nMissedClosed, nBeside);
        EXPECT_EQ(nMissedClosed, 0);
        EXPECT_TRUE(nMissed > 0 && nBeside > 0) << "the positions prove nothing";
    }
}

/// A triangle with an edge of 50 equal steps, through the origin or not, and a position: one of
/// those steps, or next to a small part of one from the origin. All are whole numbers, but for that
/// part.
Point2 MakeExactEdge(bool isThroughOrigin, Point* poCorners, Random& random) {
    const auto whole = [&](float most) { return std::floor(random.Between(-most, most)); };
    const Point2 step{whole(0x1p16F), whole(0x1p16F)};
    const auto go = [&](const Point2& from, float steps) {
        return Point2{from.x + steps * step.x, from.y + steps * step.y};
    };
    const float along = static_cast<float>(random.Below(51));
    const Point2 start =
        isThroughOrigin ? go({0, 0}, -along) : Point2{whole(0x1p22F), whole(0x1p22F)};
    const Point2 end = go(start, 50);
    poCorners[0] = {start.x, start.y, random.Between(0, 50)};
    poCorners[1] = {end.x, end.y, 9};
    poCorners[2] = {whole(0x1p22F), whole(0x1p22F), random.Between(0, 50)};
    if (!isThroughOrigin)
        return go(start, along);
    Point2 p = go({0, 0}, std::exp2(-static_cast<float>(random.Below(60))));
    const float sides[] = {p.x, LOWEST, -LOWEST};
    p.x = std::nextafter(p.x, sides[random.Below(3)]);
    return p;
}

// Where `double` does not tell: positions on an edge, or beside it by less than it resolves.
TEST(EdgeRule, ClosedHoldsWhatOneTriangleHoldsByExactArithmetic) {
    Random random;
    unsigned lost[2] = {0, 0};
    for (unsigned n = 0; n < 30000; ++n) {
        const bool isThroughOrigin = n % 2 == 0;
        Point corners[3];
        const Point2 p = MakeExactEdge(isThroughOrigin, corners, random);
        Mesh mesh;
        mesh.Add(corners[n % 3], corners[(n + 1) % 3], corners[(n + 2) % 3]);
        const OpenTin tin = mesh.MakeTin();
        float h = UNTOUCHED, closed = UNTOUCHED;
        Rational exact;
        const bool isFound = tin.GetHeight(p.x, p.y, h, nullptr);
        const bool isHeld = IsHeld(*tin.GetTriangle(0), p, exact);
        ASSERT_EQ(tin.GetHeight(p.x, p.y, closed, nullptr, ER_Closed), isFound || isHeld)
            << p.x << ", " << p.y;
        if (isFound || !isHeld)
            continue;
        ++lost[isThroughOrigin];
        EXPECT_TRUE(IsNearest(closed, exact)) << closed << ", not " << exact;
    }
    EXPECT_TRUE(lost[0] > 1000 && lost[1] > 1000) << lost[0] << ", " << lost[1];
}

} // namespace
} // namespace kelm::tin::test

#include "tests/support/oddsurfaces.h"
#include "tin/heightgrid.h"

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

/// The same sheet at another size, moved: regular, jittered, huge, and of slivers.
std::vector<Mesh> MakeGaplessSheets(Random& random) {
    std::vector<Mesh> sheets;
    for (const Point& change : {Point{1, 1, 0}, {1, 1, 3}, {7e6F, 3e6F, 3}, {1, 3e-5F, 3}}) {
        Mesh mesh = MakeSheet(change.z, random);
        for (Point& vertex : mesh.vertices)
            vertex = {vertex.x * change.x + 5, vertex.y * change.y - 100, vertex.z};
        sheets.push_back(mesh);
    }
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

// TIN_TEST_POSITIONS sets how many positions are tried on each sheet.
TEST(EdgeRule, ClosedMissesNoPositionOfAGaplessSheetAndNoneBesideIt) {
    Random random;
    const char* pszCount = std::getenv("TIN_TEST_POSITIONS");
    const int nCount = pszCount == nullptr ? 40000 : std::atoi(pszCount);
    for (const Mesh& mesh : MakeGaplessSheets(random)) {
        const OpenTin tin = mesh.MakeTin();
        const AabbTree tree(&tin);
        const HeightGrid grid(tin);
        int nLost = 0, nBeside = 0;
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
            Rational exact;
            const bool isHeld = IsInSheet(tin, tree, p, exact);
            ASSERT_EQ(isClosed, isHeld) << p.x << ", " << p.y;
            nLost += isHeld;
            nBeside += !isHeld;
            EXPECT_TRUE(!isHeld || std::fabs(double(closed) - exact.convert_to<double>()) < 1e-5);
        }
        std::printf("%d of %d positions are found by the closed rule alone, %d lie beside\n", nLost,
                    nCount, nBeside);
        EXPECT_TRUE(nLost > 0 && nBeside > 0) << "the positions prove nothing";
    }
}

} // namespace
} // namespace kelm::tin::test

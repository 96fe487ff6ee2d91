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
            EXPECT_EQ(tin.GetHeight(p.x, p.y, byTree, &tree, ER_Closed), isClosed);
            EXPECT_TRUE(IsSameBits(closed, byTree) && (!isFound || IsSameBits(closed, h)));
            if (isFound)
                continue;
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

} // namespace
} // namespace kelm::tin::test

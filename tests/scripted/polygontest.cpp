#include "tin/triangulate.h"

#include <gtest/gtest.h>

#include <cmath>

namespace {

using Ring = std::vector<point2_t<double>>;

const Ring SQUARE = {{0, 0}, {2, 0}, {2, 2}, {0, 2}};

/// The polygon of a ring that is given without its closing vertex.
kelm::tin::Polygon<double> Make(const Ring& ring, PolygonOrient orient = PO_Undefined) {
    std::vector<ZARVertex> vertices;
    for (const point2_t<double>& p : ring)
        vertices.push_back({p.x, p.y, 0});
    vertices.push_back({1e9, 1e9, 0}); // nobody looks at it
    const ZARShape shape{vertices.data(), static_cast<int>(vertices.size())};
    return {&shape, orient};
}

// A refusal before the first cut leaves the list alone, one for want of an ear empties it.
TEST(PolygonTest, ARingIsCutInTheOrderOfTheCursorOrRefused) {
    constexpr double tiny = 0x1p-26; // edges that cross with a product below 2^-52 are parallel
    for (const auto& [ring, outcome] : std::vector<std::pair<Ring, std::string>>{
             {SQUARE, "999 301 123 "},
             {{SQUARE.rbegin(), SQUARE.rend()}, "999 32 210 "},
             // After a cut the cursor stands behind the tip and has two rounds for the next ear.
             {{{3, 3}, {4, 5}, {3, 4}, {0, 3}, {4, 2}, {4, 3}}, "999 12 450 23 340 "},
             // A corner on the edge of an ear blocks it.
             {{{0, 0}, {4, 0}, {4, 2}, {4, 4}}, "999 12 230 "},
             {{{0, 0}, {1, 0}, {0, 0x1p-23}}, "999 201 "},
             {{{0, 0}, {1, 0}, {0, std::nextafter(0x1p-23, 0)}}, ""},
             {{{0, 0}, {3, 0}, {1, 0}, {2, 0}}, ""}, // parallel edges never meet
             {{{0, 0}, {1, 1}, {1, 0}, {0, 1}}, "999 "},
             {{{1, 1}, {1, 0}, {0, 1}, {0, 0}}, "999 "},
             {{{0, 0}, {tiny, tiny}, {tiny, 0}, {0, tiny}}, "999 "},
             {{{0, 0}, {tiny / 2, tiny / 2}, {tiny / 2, 0}, {0, tiny / 2}}, ""},
             {{{0, 0}, {4, 0}, {4, 4}, {2, 0}, {0, 4}}, "999 "}, // a vertex touches
             {{{0, 0}, {9, 0}, {9, 9}, {0, 0}}, "999 "},         // closed twice
             // Points within the tolerance, bounds excluded, of their predecessors are none.
             {{{0, 0}, {1e-9, 0}, {5, 5}}, ""},
             {{{0, 0}, {0, 1e-9}, {5, 5}}, ""},
             {{{0, 0}, {9e-10, -9e-10}, {18e-10, 0}, {0, 5}}, "999 "}}) {
        std::vector<Triangle_Id> ids{{9, 9, 9}};
        const int result = Triangulate(Make(ring), ids);
        EXPECT_EQ(result, ids.size() > 1 ? 0 : -1);
        std::string corners;
        for (const Triangle_Id& id : ids)
            corners += std::to_string(100 * id.id0 + 10 * id.id1 + id.id2) + ' ';
        EXPECT_EQ(corners, outcome) << ring[1].x << ' ' << ring[1].y;
    }
}

TEST(PolygonTest, ARingIsTurnedUnlessItIsAsAskedAndItsBoxHoldsRepeats) {
    for (const PolygonOrient orient : {PO_Undefined, PO_CounterClockwise, PO_Clockwise})
        EXPECT_EQ(Make(SQUARE, orient).GetSignedArea(), orient == PO_Clockwise ? -4.0 : 4.0);
    EXPECT_EQ(Make({{0, 0}, {1, 1}, {2, 2}}, PO_Clockwise).GetPoints()[0].x, 2.0);
    EXPECT_EQ(Make({{0, 0}, {2, 0}, {2 + 5e-10, 0}, {0, 2}}).GetBBox().max.x, 2 + 5e-10);
    EXPECT_TRUE(Make(SQUARE).IsPointInside(2, 1)) << "a point on an edge is left of it";
    EXPECT_FALSE(Make(SQUARE).IsPointInside(0, 1));
    for (const PolygonOrient orient : {PO_CounterClockwise, PO_Clockwise})
        for (const double x : {-1, 1, 3}) // at the height of two corners
            EXPECT_EQ(Make({{1, 0}, {2, 1}, {1, 2}, {0, 1}}, orient).IsPointInside(x, 1), x == 1);
    for (const double y : {0, 2})
        EXPECT_FALSE(Make(SQUARE).IsPointInside(3, y)) << "in line with an edge";
}

// A comb blocks almost every ear, again and again. All pairs of so many edges would take minutes.
TEST(PolygonTest, ARingOfBlockedEarsIsCoveredExactly) {
    Ring comb;
    for (int i = 0; i < 50000; ++i)
        comb.push_back({10.0 * i, i % 2 == 0 ? 0.0 : 1000.0});
    for (int i = 50000; i-- > 0;)
        comb.push_back({10.0 * i, i % 2 == 0 ? 1.0 : 1001.0});
    std::vector<Triangle_Id> ids;
    EXPECT_EQ(Triangulate(Make(comb), ids), 0);
    ASSERT_EQ(ids.size(), comb.size() - 2);
    double area = 0;
    for (const auto& [a, b, c] : ids) {
        const double part = Make({comb[a], comb[b], comb[c]}).GetSignedArea();
        EXPECT_GT(part, 0);
        area += part;
    }
    EXPECT_EQ(area, Make(comb).GetSignedArea());
    comb.back().y = -1; // the closing edge is crossed by no tooth, the one before it by one
    EXPECT_EQ(Triangulate(Make(comb), ids), -1);
}

} // namespace

#include "tin/detail/polygon.h"
#include "services/exception.h"
#include "tin/triangulate.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <ctime>
#include <random>

namespace {

using kelm::tin::Polygon;
using Ring = std::vector<point2_t<double>>;
using Triples = std::vector<std::vector<unsigned>>;

/// The polygon of a ring that is given without its closing vertex.
Polygon<double> Make(const Ring& ring, PolygonOrient orient = PO_Undefined) {
    std::vector<ZARVertex> vertices;
    for (const point2_t<double>& p : ring)
        vertices.push_back({p.x, p.y, 0});
    vertices.push_back({1e9, 1e9, 0}); // nobody looks at it
    const ZARShape shape{vertices.data(), static_cast<int>(vertices.size())};
    return Polygon<double>(&shape, orient);
}

const Triples EMPTIED(1), UNTOUCHED(2);

/// @return the triangles, or how a refusal has left the list
Triples Cut(const Ring& ring) {
    std::vector<Triangle_Id> ids{{7, 8, 9}};
    if (Triangulate(Make(ring), ids) != 0)
        return ids.empty() ? EMPTIED : UNTOUCHED;
    Triples triples;
    for (auto id = ids.begin() + 1; id != ids.end(); ++id)
        triples.push_back({id->id0, id->id1, id->id2});
    return triples;
}

const Ring SQUARE = {{0, 0}, {2, 0}, {2, 2}, {0, 2}};
const Ring BOW_TIE = {{0, 0}, {1, 1}, {1, 0}, {0, 1}};

Ring Scale(Ring ring, double factor) {
    for (point2_t<double>& p : ring)
        p = {p.x * factor, p.y * factor};
    return ring;
}

TEST(PolygonTest, TheRingLosesItsLastVertexAndRepeats) {
    try {
        Make({{0, 0}, {1, 0}});
        FAIL();
    } catch (const kelm::DataException& e) {
        EXPECT_STREQ(e.what(), "3 points could not forma polygon");
        EXPECT_EQ(e.GetSourcePath(), "tin/detail/polygon");
    }
    struct Row {
        Ring ring;
        unsigned points;
    };
    for (const Row& row :
         {Row{{{0, 0}, {1, 0}, {1, 1}}, 3},
          Row{{{0, 0}, {1e-9, 0}, {0, 0}}, 3}, // bounds are exclusive
          Row{{{0, 0}, {0, 1e-9}, {0, 0}}, 3}, Row{{{0, 0}, {-0.9e-9, 0.9e-9}, {0, 5}}, 2},
          Row{{{0, 0}, {9e-10, 0}, {18e-10, 0}, {27e-10, 0}}, 1}, // a chain
          Row{{{0, 0}, {9, 0}, {9, 9}, {0, 0}}, 4},               // last and first
          Row{{{3, 3}, {3, 3}, {3, 3}}, 1}})
        EXPECT_EQ(Make(row.ring).GetPointCount(), row.points);
    const Polygon<double> repeated = Make({{0, 0}, {2, 0}, {2 + 5e-10, 0}, {0, 2}});
    EXPECT_EQ(repeated.GetBBox().max.x, 2 + 5e-10) << "as read, repeats included";
    EXPECT_EQ(repeated.GetPoints()[2].y, 2.0);
    for (const PolygonOrient orient : {PO_Undefined, PO_CounterClockwise, PO_Clockwise}) {
        EXPECT_EQ(Make(SQUARE, orient).GetSignedArea(), orient == PO_Clockwise ? -4.0 : 4.0);
        EXPECT_EQ(Make({{0, 0}, {1, 1}, {2, 2}}, orient).GetPoints()[0].x,
                  orient == PO_Undefined ? 0.0 : 2.0);
    }
}

TEST(PolygonTest, TouchingAWindowIsMeetingIt) {
    const Ring diamond = {{5, 0}, {10, 5}, {5, 10}, {0, 5}};
    struct Row {
        double xMin, yMin, xMax, yMax;
        bool meets;
    };
    for (const Row& row : {Row{4, 4, 6, 6, true},       // inside
                           Row{-1, -1, 11, 11, true},   // around
                           Row{-1, 4.5, 11, 5.5, true}, // across
                           Row{7, 2, 20, 3, true},      // an edge alone crosses
                           Row{10, 5, 20, 20, true},    // touches a corner
                           Row{7.5, -9, 9, 2.5, true},  // touches an edge
                           Row{7.6, -9, 9, 2.5, false}, // in the box, clear of the ring
                           Row{0, 0, 2, 2, false}, Row{10.001, 0, 20, 9, false}})
        for (const PolygonOrient orient : {PO_Clockwise, PO_CounterClockwise}) {
            kelm::tin::BBox<double, point2_t<double>> window;
            window.min = {row.xMin, row.yMin};
            window.max = {row.xMax, row.yMax};
            EXPECT_EQ(Make(diamond, orient).IsIntersected(window), row.meets) << row.xMin;
        }
    const Polygon<double> square = Make(SQUARE);
    EXPECT_TRUE(square.IsPointInside(1, 1));
    EXPECT_TRUE(square.IsPointInside(2, 1)) << "a point on an edge is left of it";
    EXPECT_FALSE(square.IsPointInside(0, 1));
    EXPECT_TRUE(square.IsPointInside(1, 2)) << "upper ends are part of an edge";
    EXPECT_FALSE(square.IsPointInside(1, 0));
}

TEST(PolygonTest, OnlyEdgesThatMeetAndAreNoNeighboursForbidARing) {
    EXPECT_TRUE(Make(SQUARE).IsSimple());
    Ring bowTie = BOW_TIE;
    for (std::size_t start = 0; start < 4; ++start) {
        EXPECT_FALSE(Make(bowTie).IsSimple()) << start;
        std::rotate(bowTie.begin(), bowTie.begin() + 1, bowTie.end());
    }
    EXPECT_FALSE(Make({{0, 0}, {4, 0}, {4, 4}, {2, 0}, {0, 4}}).IsSimple()) << "a vertex touches";
    EXPECT_FALSE(Make({{0, 0}, {9, 0}, {9, 9}, {0, 0}}).IsSimple()) << "closed twice";
    EXPECT_TRUE(Make({{0, 0}, {3, 0}, {1, 0}, {2, 0}}).IsSimple()) << "parallels never meet";
    // Its edges cross with a product of twice the square of the scale; below 2^-52 is parallel.
    EXPECT_FALSE(Make(Scale(BOW_TIE, 0x1p-26)).IsSimple());
    EXPECT_TRUE(Make(Scale(BOW_TIE, 0x1p-27)).IsSimple());
}

TEST(PolygonTest, TrianglesComeInTheOrderOfTheCursor) {
    EXPECT_EQ(Cut(SQUARE), (Triples{{3, 0, 1}, {1, 2, 3}}));
    EXPECT_EQ(Cut({SQUARE.rbegin(), SQUARE.rend()}), (Triples{{0, 3, 2}, {2, 1, 0}}));
    // After a cut the cursor stands on the corner behind the tip.
    EXPECT_EQ(Cut({{0, 0}, {2, -1}, {4, 0}, {4, 2}, {0, 4}}),
              (Triples{{4, 0, 1}, {1, 2, 3}, {3, 4, 1}}));
    // A corner on the edge of an ear blocks it.
    EXPECT_EQ(Cut({{0, 0}, {4, 0}, {4, 2}, {4, 4}}), (Triples{{0, 1, 2}, {2, 3, 0}}));
}

TEST(PolygonTest, ARefusalEmptiesTheListOnlyWhenTheBudgetRunsOut) {
    EXPECT_EQ(Cut({{0, 0}, {1, 0}, {0, 0x1p-23}}), (Triples{{2, 0, 1}}));
    EXPECT_EQ(Cut({{0, 0}, {1, 0}, {0, std::nextafter(0x1p-23, 0)}}), EMPTIED);
    EXPECT_EQ(Cut({{0, 0}, {1, 1}, {2, 2}, {3, 3}}), EMPTIED);
    EXPECT_EQ(Cut(BOW_TIE), UNTOUCHED);
    EXPECT_EQ(Cut({{3, 3}, {3, 3}, {3, 3}}), UNTOUCHED) << "one point is left";
}

/// Twice the signed area, exact for coordinates below 2^20.
long long GetDoubledArea(const Ring& ring, const std::vector<unsigned>& ids) {
    long long sum = 0;
    for (std::size_t i = 0; i < ids.size(); ++i) {
        const point2_t<double>& p = ring[ids[i]];
        const point2_t<double>& q = ring[ids[(i + 1) % ids.size()]];
        sum += std::llround(p.x) * std::llround(q.y) - std::llround(p.y) * std::llround(q.x);
    }
    return sum;
}

void ExpectExactCover(const Ring& ring) {
    const Triples triples = Cut(ring);
    ASSERT_EQ(triples.size(), ring.size() - 2);
    long long sum = 0;
    for (const std::vector<unsigned>& triple : triples) {
        ASSERT_EQ(triple.size(), 3U) << "refused";
        ASSERT_GT(GetDoubledArea(ring, triple), 0);
        sum += GetDoubledArea(ring, triple);
    }
    std::vector<unsigned> all(ring.size());
    for (unsigned i = 0; i < all.size(); ++i)
        all[i] = i;
    EXPECT_EQ(sum, std::llabs(GetDoubledArea(ring, all)));
}

/// A quarter turn, the mirror image, the other sense, and another start.
void ExpectExactCoverHoweverItLies(Ring ring) {
    ExpectExactCover(ring);
    for (point2_t<double>& p : ring)
        p = {-p.y, p.x};
    ExpectExactCover(ring);
    for (point2_t<double>& p : ring)
        p.x = -p.x;
    ExpectExactCover(ring);
    std::reverse(ring.begin(), ring.end());
    std::rotate(ring.begin(), ring.begin() + 2, ring.end());
    ExpectExactCover(ring);
}

TEST(PolygonTest, TrianglesCoverARingExactly) {
    for (unsigned seed = 1; seed <= 300; ++seed) {
        SCOPED_TRACE(seed);
        std::mt19937 random(seed);
        const auto below = [&](unsigned n) { return static_cast<double>(random() % n); };
        const auto n = static_cast<unsigned>(3 + random() % 40);
        Ring star, wiggle; // the latter on few levels, so that many corners are in line
        for (unsigned i = 0; i < n; ++i) {
            const double angle = (i + below(1000) / 2000) * 2 * 3.141592653589793 / n;
            const double radius = 20000 + below(500000);
            star.push_back(
                {std::round(radius * std::cos(angle)), std::round(radius * std::sin(angle))});
            wiggle.push_back({5.0 * i + below(5), -1 - below(4)});
        }
        for (unsigned i = n; i-- > 0;)
            wiggle.push_back({5.0 * i + below(5), 1 + below(4)});
        ExpectExactCoverHoweverItLies(star);
        ExpectExactCoverHoweverItLies(wiggle);
    }
}

// A comb blocks almost every ear. Searching all corners again at each attempt takes the cube of
// their number, hundreds of times as long as the test of all pairs of edges.
TEST(PolygonTest, ManyBlockedEarsTakeLittleTime) {
    Ring comb;
    for (int i = 0; i < 2000; ++i)
        comb.push_back({10.0 * i, i % 2 == 0 ? 0.0 : 1000.0});
    for (int i = 2000; i-- > 0;)
        comb.push_back({10.0 * i, i % 2 == 0 ? 1.0 : 1001.0});
    const std::clock_t start = std::clock();
    EXPECT_TRUE(Make(comb).IsSimple());
    const std::clock_t middle = std::clock();
    ExpectExactCover(comb);
    EXPECT_LT(std::clock() - middle, 60 * (middle - start));
}

} // namespace

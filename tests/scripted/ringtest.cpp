#include "services/rings/cutting/earclipping.h"
#include "services/rings/cutting/simplering.h"
#include "tests/support/allocationcounter.h"
#include "tin/triangulate.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <limits>
#include <random>

namespace {

using kelm::rings::Point;
using Ring = std::vector<Point>;
using Corners = std::vector<std::array<unsigned, 3>>;

/// By all pairs.
bool TestSimple(const Ring& p) {
    const std::size_t n = p.size();
    for (std::size_t i = 0; i + 2 < n; ++i)
        for (std::size_t j = i + 2; j < n; ++j) {
            const Point a = p[i], b = p[i + 1], c = p[j], e = p[(j + 1) % n];
            const double d = (b.x - a.x) * (e.y - c.y) - (e.x - c.x) * (b.y - a.y);
            const double s = (a.y - c.y) * (e.x - c.x) - (a.x - c.x) * (e.y - c.y);
            const double t = (a.y - c.y) * (b.x - a.x) - (a.x - c.x) * (b.y - a.y);
            const double sign = d < 0 ? -1 : 1;
            if ((j + 1) % n != i && !(0x1p-52 > std::fabs(d)) && s * sign >= 0 &&
                s * sign <= d * sign && t * sign >= 0 && t * sign <= d * sign)
                return false;
        }
    return true;
}

double GetTurn(const Point& p, const Point& q, const Point& r) {
    return (q.x - p.x) * (r.y - p.y) - (r.x - p.x) * (q.y - p.y);
}

/// By the cursor that tries each corner against all others.
bool Cut(const Ring& p, bool isForward, Corners& rCorners) {
    std::vector<unsigned> left;
    for (unsigned i = 0; i < p.size(); ++i)
        left.push_back(isForward ? i : static_cast<unsigned>(p.size()) - 1 - i);
    std::size_t u = p.size() - 1;
    for (std::size_t tries = 0; left.size() > 2; ++tries) {
        if (tries == 2 * left.size())
            return false;
        const std::size_t n = left.size(), v = (u + 1) % n, w = (u + 2) % n;
        const Point a = p[left[u]], b = p[left[v]], c = p[left[w]];
        bool isEar = !(0x1p-23 > GetTurn(a, b, c));
        for (std::size_t i = 0; i < n && isEar; ++i)
            isEar = i == u || i == v || i == w || GetTurn(a, b, p[left[i]]) < 0 ||
                    GetTurn(b, c, p[left[i]]) < 0 || GetTurn(c, a, p[left[i]]) < 0;
        u = v;
        if (!isEar)
            continue;
        rCorners.push_back({left[(v + n - 1) % n], left[v], left[w]});
        left.erase(left.begin() + static_cast<std::ptrdiff_t>(v));
        u = v % left.size();
        tries = std::size_t(-1);
    }
    return true;
}

constexpr std::uint64_t SMALL = ~std::uint64_t{0};
constexpr std::uint64_t ENDLESS = SMALL - 1;

/// By one of the library's ways. @param steps of the index before it gives way, or SMALL for the
/// way of small rings
bool CutBy(std::uint64_t steps, const Ring& ring, bool isForward, Corners& rCorners) {
    const auto count = static_cast<unsigned>(ring.size());
    const kelm::rings::CounterClockwise<Point> corners{ring.data(), count, isForward};
    const auto clip = [&](unsigned u, unsigned v, unsigned w) {
        rCorners.push_back({corners.GetPoint(u), corners.GetPoint(v), corners.GetPoint(w)});
    };
    return steps == SMALL ? ClipSmallRing(corners, clip)
                          : ClipLargeRing(corners, kelm::rings::StepLimit(steps), clip);
}

struct RingTest : testing::Test {
    std::mt19937 moRandom{20};

    double Draw(double low, double high) {
        return std::uniform_real_distribution<double>(low, high)(moRandom);
    }
    unsigned Below(unsigned bound) { return static_cast<unsigned>(moRandom() % bound); }

    /// Corners of a lattice, on which touching edges, overlaps and repeats are common.
    Point OnLattice() { return {double(Below(7)), double(Below(7))}; }

    /// Corners in their order around a centre, moved to a lattice with `steps` steps a unit.
    Ring AroundCentre(unsigned corners, double steps) {
        Ring ring;
        for (unsigned i = 0; i < corners; ++i) {
            const double turn = 6.28318530717958 * i / corners, radius = Draw(3, 9);
            ring.push_back({std::round(radius * std::cos(turn) * steps) / steps,
                            std::round(radius * std::sin(turn) * steps) / steps});
        }
        return ring;
    }

    /// Two edges far apart on a slanted line, as near to it as rounding puts them. They may meet by
    /// the rounded rule; the others keep clear.
    Ring OnLine() {
        const double slope = Below(2) == 0 ? Draw(-2, 2) : -1 + Draw(-1, 1) * 0x1p-50;
        const double a = Draw(-95, -90), b = a + Draw(1, 5), c = 0, e = Draw(1, 5);
        Ring ring;
        const auto add = [&](double x, double above) { ring.push_back({x, x * slope + above}); };
        const auto addArc = [&](double from, double to, double height) {
            for (int i = 0; i <= 20; ++i)
                add(i < 20 ? from + (to - from) * i / 20 : to, height * i * (20 - i));
        };
        addArc(b, c, 0.3);
        addArc(e, a, -0.3);
        // A third edge is so little steeper that the two may fall apart into two sets of parallels.
        ring[31].y =
            ring[30].y + (ring[31].x - ring[30].x) * (slope - 0x1p-42 * (1 + Draw(-1, 1) * 0x1p-6));
        std::rotate(ring.begin(), ring.begin() + 10, ring.end()); // none is the closing edge
        return ring;
    }

    Ring Wild(unsigned corners) {
        static const double VALUES[] = {std::numeric_limits<double>::quiet_NaN(),
                                        HUGE_VAL,
                                        -HUGE_VAL,
                                        1e300,
                                        -1e300,
                                        1e-300,
                                        5e-324,
                                        -0.0,
                                        1e155,
                                        1e-9};
        Ring ring = AroundCentre(corners, 1);
        for (unsigned i = Below(3); i < 3; ++i)
            ring[Below(corners)].x = VALUES[Below(10)];
        return ring;
    }

    Ring Make(unsigned kind, unsigned corners) {
        if (kind == 0) {
            Ring ring = OnLine();
            for (int i = 0; i < 20 && TestSimple(ring); ++i)
                ring = OnLine();
            return ring;
        }
        if (kind == 1)
            return Wild(corners);
        if (kind == 2)
            return AroundCentre(corners, 1e3);
        if (kind == 3)
            return AroundCentre(corners, 1);
        Ring ring(corners);
        for (Point& p : ring)
            p = OnLattice();
        return ring;
    }
};

// The two cutters and both verdicts, against the rules as written; also for rings that cross
// themselves, whose remains are as odd as can be.
TEST_F(RingTest, AnIndexChangesNoVerdictAndNoTriangle) {
    unsigned simple[5] = {};
    unsigned cut[5] = {};
    for (unsigned i = 0; i < 20000; ++i) {
        const unsigned kind = i % 5;
        Ring ring = Make(kind, i % 500 < 5 ? 250 : 4 + Below(i % 3 == 0 ? 40 : 5));
        if (kind > 1 && i % 2 == 0) // as on a map
            for (Point& p : ring)
                p = {p.x + 738669.25, p.y + 4045105.5};
        const auto count = static_cast<unsigned>(ring.size());
        const bool isSimple = TestSimple(ring);
        simple[kind] += isSimple;
        ASSERT_EQ(kelm::rings::IsSimpleByPairs(ring.data(), count), isSimple) << i;
        for (const std::uint64_t steps : {std::uint64_t{0}, ENDLESS})
            ASSERT_EQ(IsSimpleByIndex(ring.data(), count, kelm::rings::StepLimit(steps)), isSimple)
                << i;
        for (const bool isForward : {false, true}) {
            Corners expected;
            const bool isCut = Cut(ring, isForward, expected);
            cut[kind] += isCut;
            for (const std::uint64_t steps : {SMALL, std::uint64_t{Below(200)}, ENDLESS}) {
                Corners corners;
                ASSERT_EQ(CutBy(steps, ring, isForward, corners), isCut) << i << ' ' << steps;
                ASSERT_EQ(corners, expected) << i << ' ' << steps;
            }
        }
    }
    for (unsigned kind = 0; kind < 5; ++kind) {
        EXPECT_GT(simple[kind], 100U) << kind;
        EXPECT_GT(cut[kind], 100U) << kind;
    }
    EXPECT_LT(simple[0], 3600U) << "too few edges met far apart";
}

TEST_F(RingTest, ASmallRingIsSetUpAndCutWithoutMemory) {
    if (!kelm::tin::test::AllocationCounter::IS_ACTIVE)
        GTEST_SKIP() << "the operators of the sanitizer are in force";
    ZARVertex square[] = {{0, 0, 0}, {2, 0, 0}, {2, 2, 0}, {0, 2, 0}, {0, 0, 0}};
    const ZARShape shape{square, 5};
    std::vector<Triangle_Id> ids;
    ids.reserve(2);
    const kelm::tin::test::AllocationCounter counter;
    EXPECT_EQ(Triangulate(kelm::tin::Polygon<double>(&shape, PO_Undefined), ids), 0);
    EXPECT_EQ(kelm::tin::test::AllocationCounter::mnRequests, 0);
}

} // namespace

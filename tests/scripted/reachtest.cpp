#include "tests/support/sheets.h"
#include "tin/crossing/build/links.h"
#include "tin/crossing/build/reference.h"
#include "tin/crossing/probe.h"

namespace kelm::tin::test {
namespace {

using namespace crossing;

/// The `float` nearest to `to` that is no further from `from`.
float RoundBack(double to, double from) {
    const auto near = static_cast<float>(to);
    return std::fabs(double(near) - from) > std::fabs(to - from)
               ? std::nextafter(near, static_cast<float>(from))
               : near;
}

/// How far outside a box, on each axis, a segment can be where it crosses a triangle of that box,
/// as docs/guide/exactness.md has it.
point3_t<double> GetFurthest(const Index& index, const Point& a, const Point& b) {
    constexpr double U = 0x1p-24;
    const double rise = std::fabs(double(b.z) - double(a.z));
    const double longest = std::max(
        {std::fabs(double(b.x) - double(a.x)), std::fabs(double(b.y) - double(a.y)), rise});
    const double above = std::max(std::fabs(double(a.z) - double(index.low)),
                                  std::fabs(double(a.z) - double(index.high)));
    const double all = 2 * longest + 2 * double(index.extent) + above;
    const double plan = 8.1 * U * all;
    return {plan, plan, 0x1p-15 * longest + 50.6 * U * all};
}

TEST(ReachTest, MeetsEveryBoxThatCanHoldACrossing) {
    Random random;
    const auto size = [&] { return std::exp2(random.Between(-20, 10)); };
    const auto any = [&] { return random.Below(2) == 0 ? size() : -size(); };
    for (unsigned n = 0; n < 100000 && !HasFailure(); ++n) {
        const Point a{any(), any(), any()}, b{a.x + any(), a.y + any(), a.z + any()};
        Index index;
        index.extent = size();
        index.low = a.z + any();
        index.high = index.low + size();
        const auto furthest = GetFurthest(index, a, b);
        Node node;
        for (unsigned lane = 0; lane < WIDTH; ++lane) {
            const double t = double(random.Between(0, 1));
            float planes[6];
            const auto setAxis = [&](unsigned axis, float from, float to, double distance) {
                const double at = double(from) + t * (double(to) - double(from));
                const bool isBelow = random.Below(2) == 0;
                const float face = RoundBack(isBelow ? at - distance : at + distance, at);
                planes[axis] = isBelow ? face - size() : face;
                planes[axis + 3] = isBelow ? face : face + size();
            };
            setAxis(0, a.x, b.x, furthest.x);
            setAxis(1, a.y, b.y, furthest.y);
            setAxis(2, a.z, b.z, furthest.z);
            SetBox(node, lane, planes);
        }
        SlabProbe probe;
        probe.Set(Reach(index, a, b), a, b);
        EXPECT_EQ(probe.Test(node), 0xFFU)
            << a.x << " " << a.y << " " << a.z << " to " << b.x << " " << b.y << " " << b.z;
    }
}

// Boxes at all distances, which the segment misses by the margin less what the test itself may
// lose.
TEST(ReachTest, MeetsEveryCrowdedBoxThatCanHoldACrossing) {
    constexpr double U = 0x1p-24;
    constexpr float INF = std::numeric_limits<float>::infinity();
    Random random;
    const auto any = [&] {
        return std::exp2(random.Between(-60, 10)) * (random.Below(2) == 0 ? 1.0F : -1.0F);
    };
    unsigned missed = 0;
    for (unsigned n = 0; n < 100000 && !HasFailure(); ++n) {
        const Point a{any(), any(), 0}, b{a.x + any(), a.y + any(), 0};
        Node node;
        for (unsigned lane = 0; lane < WIDTH; ++lane) {
            const double t = std::exp2(double(random.Between(-40, 0)));
            float planes[6] = {0, 0, 0, 0, 0, 0};
            const auto setAxis = [&](unsigned axis, float from, float to) {
                const double at = double(from) + t * (double(to) - double(from));
                const double most = 26.0 * U * std::fabs(at - double(from));
                const auto beside =
                    static_cast<float>(random.Below(2) == 0 ? at - most : at + most);
                const auto near = static_cast<float>(at);
                // `at` must be exact enough to be missed on purpose.
                const bool isBeside = std::fabs(double(beside) - at) <= most &&
                                      std::fabs(at - double(from)) > 0x1p-20 * std::fabs(at);
                missed += isBeside && double(beside) != at;
                planes[axis] = isBeside ? beside : std::nextafter(near, -INF);
                planes[axis + 3] = isBeside ? beside : std::nextafter(near, INF);
            };
            setAxis(0, a.x, b.x);
            setAxis(1, a.y, b.y);
            SetBox(node, lane, planes);
        }
        PlanProbe probe;
        probe.Set(a, b);
        EXPECT_EQ(probe.Test(node), 0xFFU) << a.x << " " << a.y << " to " << b.x << " " << b.y;
    }
    EXPECT_GT(missed, 100000U);
}

/// The height of the plane of a triangle.
double GetPlaneHeight(const Triangle& t, const Point2& p) {
    const Point &v0 = *t.GetVertex(0), &v1 = *t.GetVertex(1), &v2 = *t.GetVertex(2);
    const auto turn = [](const auto& a, const auto& b, const auto& c) {
        return (double(a.x) - double(c.x)) * (double(b.y) - double(c.y)) -
               (double(a.y) - double(c.y)) * (double(b.x) - double(c.x));
    };
    const double w0 = turn(v1, v2, p), w1 = turn(v2, v0, p), all = turn(v0, v1, v2);
    return double(v2.z) +
           (w0 * (double(v0.z) - double(v2.z)) + w1 * (double(v1.z) - double(v2.z))) / all;
}

// On a sliver the inside rule takes positions so far beside it that its plane leaves its heights.
TEST(ReachTest, BoundsThePlaneWhereverARuleTakesAPositionForInside) {
    Random random;
    unsigned beyond = 0;
    for (unsigned n = 0; n < 100000; ++n) {
        const auto any = [&] { return random.Between(-1, 1); };
        const Point a{any(), any(), 0}, b{any(), any(), 0};
        const float along = random.Between(0, 1), top = random.Between(-2e-3F, 2e-3F);
        const Point c{a.x + along * (b.x - a.x) + any() * 1e-3F,
                      a.y + along * (b.y - a.y) + any() * 1e-3F, top};
        const Point corners[] = {a, b, c};
        OwnTriangle t({corners[n % 3], corners[(n + 1) % 3], corners[(n + 2) % 3]});
        t.ComputeBBox();
        const Reference reference = CreateReference(t, n);
        const float u = random.Between(0, 1);
        const Point2 p{a.x + u * (b.x - a.x), a.y + u * (b.y - a.y)};
        float h;
        if (reference.kind != K_Tight || !t.GetHeight(p.x, p.y, h))
            continue;
        const double plane = GetPlaneHeight(t, p);
        beyond += plane < std::min(0.0, double(top)) || plane > std::max(0.0, double(top));
        EXPECT_TRUE(double(reference.low[2]) <= plane && plane <= double(reference.high[2]));
    }
    EXPECT_GT(beyond, 1000U);
}

} // namespace
} // namespace kelm::tin::test

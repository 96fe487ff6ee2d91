#include "tests/scripted/readerfixture.h"

#include <algorithm>
#include <random>

namespace {

/// Rounds where no optimiser can undo it.
double Round(double v) {
    const volatile float rounded = static_cast<float>(v);
    return static_cast<double>(rounded);
}

class HeightTest : public ReaderTest {
  protected:
    /// Loads a strip with these heights, whose plan must stay, and its datum changed unless there
    /// is no transform.
    template <typename Height>
    Surface LoadStrip(unsigned vertices, const Height& height, double offset, double scale,
                      const std::function<void(double*)>& transform) {
        script.shapes = CreateStrip(vertices, height);
        script.sources.clear();
        const Reader reader = Open(offset, scale, VD_Orthometric);
        if (transform) {
            script.transform = transform;
            reader->SetOutputVerticalDatum(VD_Ellipsoidal);
        }
        Surface surface = Load(*reader);
        EXPECT_EQ(surface->GetVertexCount(), vertices);
        for (unsigned i = 0; i < vertices; ++i) {
            const double x = STRIP_X + 3.7 * i;
            EXPECT_EQ(surface->GetVertex(i)->x, static_cast<float>(x - STRIP_X));
            EXPECT_EQ(surface->GetVertex(i)->y, 40.0F * static_cast<float>(i % 2));
        }
        EXPECT_EQ(script.sources.size(), transform ? 1U : 0U) << "one call for all points";
        return surface;
    }
};

TEST_F(HeightTest, TheFactorComesBeforeTheDatumAndPlanStays) {
    const Reader reader = Open(10.0, 2.0, VD_Orthometric);
    reader->SetOutputVerticalDatum(VD_Ellipsoidal);
    const Surface surface = Load(*reader);
    EXPECT_EQ(surface->GetVertex(0)->z, 31.0F);
    EXPECT_EQ(surface->GetVertex(1)->x, 4.0F);
    EXPECT_EQ(surface->GetVertex(2)->y, 3.0F);
    EXPECT_EQ(surface->GetBBox().max.z, 35.0F) << "the surface's box is made last";
}

TEST_F(HeightTest, TheFactorAloneIsOneFunctionOfEachHeight) {
    for (const unsigned vertices : {10000U, 10001U}) {
        const Surface surface = LoadStrip(
            vertices, [](unsigned i) { return 7.0 * i; }, 0.3, 0.1, nullptr);
        for (unsigned i = 0; i < vertices; ++i)
            ASSERT_EQ(surface->GetVertex(i)->z, static_cast<float>((7.0 * i + 0.3) * 0.1));
    }
}

TEST_F(HeightTest, FewPointsPassTheTransform) {
    const auto convert = [](double x, double y, double z) { return z * 1.1 + x * 1e-3 + y * 1e-6; };
    const Surface surface = LoadStrip(
        999, [](unsigned i) { return 1.0 * i; }, 0.3, 0.1,
        [&](double* p) { p[2] = convert(p[0], p[1], p[2]); });
    ASSERT_EQ(script.sources[0].size(), 3U * 999);
    for (unsigned i = 0; i < 999; ++i) {
        const point3_t<float>& v = *surface->GetVertex(i);
        ASSERT_EQ(v.z, static_cast<float>(
                           convert(double(v.x) + STRIP_X, double(v.y) + STRIP_Y, (i + 0.3) * 0.1)));
    }
}

// The transform here does not depend on x and y, so the grid's answer is a line between the values
// of its two levels, whose roundings to float show in the last bits.
TEST_F(HeightTest, ManyPointsAreInterpolatedBetweenRoundedNodes) {
    std::mt19937 random(1);
    std::vector<double> stored(1000);
    for (double& h : stored)
        h = 700.0 + static_cast<double>(random() % 500000) / 1024.0;
    const auto convert = [](double h) { return h * 1.1 + 0.1; };
    const Surface surface = LoadStrip(
        1000, [&](unsigned i) { return stored[i]; }, 0.3, 0.1,
        [&](double* p) { p[2] = convert(p[2]); });

    const auto elevate = [](double h) { return (Round(h) + 0.3) * 0.1; };
    const auto range = std::minmax_element(stored.begin(), stored.end());
    const double low = Round(elevate(*range.first));
    const double high = low + Round(Round(elevate(*range.second)) - low);
    const std::vector<double>& nodes = script.sources[0];
    // 3,696.3 by 40 map units in cells of 100, on two levels.
    ASSERT_EQ(nodes.size(), std::size_t{3} * 38 * 2 * 2);
    EXPECT_EQ(nodes[3], STRIP_X + 100.0);
    EXPECT_EQ(nodes[2], low);
    EXPECT_EQ(nodes.back(), high);
    const double a = Round(convert(low));
    const double b = Round(convert(high));
    for (unsigned i = 0; i < 1000; ++i) {
        const double part = (std::clamp(elevate(stored[i]), low, high) - low) / (high - low);
        const double h = part < 0.5 ? a + part * (b - a) : b - (1.0 - part) * (b - a);
        ASSERT_EQ(surface->GetVertex(i)->z, static_cast<float>(h)) << i;
    }
}

TEST_F(HeightTest, TheGridHasOneLevelAboveTheLowestOneUnitUpAtLeast) {
    for (const double range : {0.0, 0.5, 1.0, 250.0}) {
        const auto height = [=](unsigned i) { return i == 500 ? 8 + range : 8.0; };
        const Surface surface = LoadStrip(1000, height, 0, 1, [](double* p) {
            p[2] += (p[0] - STRIP_X) * 0.001 + (p[1] - STRIP_Y) * 0.02;
        });
        EXPECT_EQ(script.sources[0].back(), 8 + std::max(range, 1.0));
        for (unsigned i = 0; i < 1000; ++i) // a float of this size has steps of 3e-5 at most
            ASSERT_NEAR(surface->GetVertex(i)->z, height(i) + 0.0037 * i + 0.8 * (i % 2), 4e-5);
    }
}

} // namespace

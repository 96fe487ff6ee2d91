#include "services/interpgrid3d.h"
#include "tests/support/transcript.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <random>

namespace {

using Triple = std::array<double, 3>;
using Box = std::array<double, 9>; ///< low corner, high corner, spacing

double GetValue(const InterpGrid3D& oGrid, const Triple& p) {
    double dfValue = 0.0;
    oGrid.GetVal(p[0], p[1], p[2], &dfValue);
    return dfValue;
}

double GetField(const Triple& p) {
    const double u = p[0] - 738669.5, v = p[1] - 4045105.25, w = p[2] - 300.0;
    return 0.1 + 0.7 * u - 0.3 * v + 1.1 * w + 0.001 * u * v * w;
}

/// Linear but for two kinks, between the nodes, of which a grid must know.
double GetKinked(const Triple& p) {
    return std::abs(p[0] - 7.1) - 2 * std::abs(p[1] - 3.3) + 0.1 * p[2];
}

TEST(InterpGrid3DTest, GivesNodesExactlyAndAFieldThatIsTrilinearBetweenAndConstantOutside) {
    InterpGrid3D oGrid;
    EXPECT_TRUE(std::isnan(GetValue(oGrid, {}))) << "no nodes yet";
    const double x = 738669.5, y = 4045105.25, z = 300.0;
    const std::tuple<Box, unsigned, double (*)(const Triple&)> cases[] = {
        {{x, y, z, x + 250, y + 100, z + 250, 100, 100, 250}, 141 * 141 * 2, GetField},
        {{x, y, z, x + 20, y + 333, z + 0.25, 0.1, 0.1, 0.1}, 213 * 269 * 4, GetField},
        {{x, y, z, x, y + 1, z, 100, 100, 1}, 141, GetField},
        {{0, 0, 0, 10, 10, 9, 100, 100, 9}, 141 * 141 * 2, GetKinked}};
    std::mt19937 oRandom(4711);
    std::uniform_real_distribution<double> oPart(-0.5, 1.5);
    for (const auto& [oBox, nNodes, GetHeight] : cases) {
        std::apply([&](auto... v) { oGrid.LayoutGrid(v...); }, oBox);
        ASSERT_EQ(oGrid.GetNumGridPoints(), nNodes);
        std::vector<Triple> nodes(nNodes);
        oGrid.GetGridPositions(nodes[0].data());
        std::transform(nodes.begin(), nodes.end(), oGrid.GetArray(), GetHeight);
        for (unsigned i = 0; i < nNodes; ++i)
            ASSERT_EQ(GetValue(oGrid, nodes[i]), oGrid.GetArray()[i]);
        const Triple end{oBox[3], oBox[4], oBox[5]};
        ASSERT_EQ(nodes.back(), end);
        for (unsigned i = 0; i < 2000; ++i) {
            Triple p{}, inside{};
            for (unsigned k = 0; k < 3; ++k) {
                const double dfEnd = nodes.back()[k], dfFar = i < 50 ? HUGE_VAL : 1.0;
                p[k] = oBox[k] + dfFar * oPart(oRandom) * (dfEnd - oBox[k] + 1e-9);
                inside[k] = std::clamp(p[k], oBox[k], dfEnd);
            }
            ASSERT_NEAR(GetValue(oGrid, p), GetHeight(inside), 1e-8);
            p[i % 3] = std::nan("");
            ASSERT_TRUE(std::isnan(GetValue(oGrid, p)));
        }
    }
}

TEST(InterpGrid3DTest, RefusesWhatItCannotLayOutAndKeepsTheOldGrid) {
    kelm::test::Transcript oTranscript;
    InterpGrid3D oGrid;
    EXPECT_TRUE(oTranscript.Refuses([&] { oGrid.SetDimension(2); }));
    oGrid.LayoutGrid(0, 0, 0, 1, 1, 1, 1, 1, 1);
    for (const Box& oBox :
         {Box{0, 0, 3.4e38, 1, 1, -3.4e38, 1, 1, 1}, // of no finite height
          Box{0, std::nan(""), 0, 1, 1, 1, 1, 1, 1}, Box{-HUGE_VAL, 0, 0, 1, 1, 1, 1, 1, 1},
          Box{0, 0, 0, 1, 1, 1, 0, 1, 1}, Box{0, 0, 0, 1, 1, 1e9, 1, 1, 0.5},
          // 141 x 141 x 72012 nodes of three values: 2^32 and 44420 more.
          Box{0, 0, 0, 1, 1, 72011, 1, 1, 1}}) {
        const auto Layout = [&](auto... v) { oGrid.LayoutGrid(v...); };
        EXPECT_TRUE(oTranscript.Refuses([&] { std::apply(Layout, oBox); }));
    }
    EXPECT_EQ(oGrid.GetNumGridPoints(), 141U * 141U * 2U);
}

} // namespace

#include "services/interpgrid3d.h"
#include "tests/support/refusal.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <cmath>
#include <random>
#include <tuple>
#include <vector>

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

TEST(InterpGrid3D, GivesNodesExactlyAndAFieldThatIsTrilinearBetweenAndConstantOutside) {
    InterpGrid3D oGrid;
    EXPECT_TRUE(std::isnan(GetValue(oGrid, {}))) << "no nodes yet";
    const double x = 738669.5, y = 4045105.25, z = 300.0;
    const std::pair<Box, unsigned> cases[] = {
        {{x, y, z, x + 250, y + 100, z + 250, 100, 100, 250}, 4 * 2 * 2},
        {{x, y, z, x + 33.33, y + 0.55, z + 0.25, 0.1, 0.1, 0.1}, 335 * 7 * 4},
        {{x, y, z, x, y, z, 100, 100, 1}, 2 * 2 * 2}};
    std::mt19937 oRandom(4711);
    std::uniform_real_distribution<double> oPart(-0.5, 1.5);
    for (const auto& [oBox, nNodes] : cases) {
        std::apply([&](auto... v) { oGrid.LayoutGrid(v...); }, oBox);
        ASSERT_EQ(oGrid.GetNumGridPoints(), nNodes);
        std::vector<Triple> nodes(nNodes);
        oGrid.GetGridPositions(nodes[0].data());
        std::transform(nodes.begin(), nodes.end(), oGrid.GetArray(), GetField);
        for (unsigned i = 0; i < nNodes; ++i)
            ASSERT_EQ(GetValue(oGrid, nodes[i]), oGrid.GetArray()[i]);
        for (unsigned i = 0; i < 2000; ++i) {
            Triple p{}, inside{};
            for (unsigned k = 0; k < 3; ++k) {
                const double dfEnd = nodes.back()[k], dfFar = i < 50 ? HUGE_VAL : 1.0;
                p[k] = oBox[k] + dfFar * oPart(oRandom) * (dfEnd - oBox[k]);
                inside[k] = std::clamp(p[k], oBox[k], dfEnd);
            }
            ASSERT_NEAR(GetValue(oGrid, p), GetField(inside), 1e-8);
            p[i % 3] = std::nan("");
            ASSERT_TRUE(std::isnan(GetValue(oGrid, p)));
        }
    }
}

TEST(InterpGrid3D, RefusesWhatItCannotLayOutAndKeepsTheOldGrid) {
    InterpGrid3D oGrid;
    const std::string source = "services/bundled/interpgrid3d: ",
                      unusable = ", as it does if no vertex has a usable coordinate";
    EXPECT_EQ(kelm::test::GetRefusal([&] { oGrid.SetDimension(2); }),
              source + "nDimension=2!1: InterpGrid3D holds one value a node");
    oGrid.LayoutGrid(0, 0, 0, 1, 1, 1, 1, 1, 1);
    for (const auto& [oBox, reason] : std::vector<std::pair<Box, std::string>>{
             {{0, 0, 3.4e38, 1, 1, -3.4e38, 1, 1, 1}, // of no finite height
              "along z the box runs from 3.4e+38 to -3.4e+38" + unusable},
             {{0, std::nan(""), 0, 1, 1, 1, 1, 1, 1},
              "along y the box runs from nan to 1" + unusable},
             {{-HUGE_VAL, 0, 0, 1, 1, 1, 1, 1, 1},
              "along x the box runs from -inf to 1" + unusable},
             {{0, 0, 0, 1, 1, 1, 0, 1, 1}, "along x the spacing is 0"},
             {{0, 0, 0, 1e9, 1, 1, 0.5, 1, 1},
              "along x there are too many nodes: 0 to 1e+09 in steps of 0.5"},
             {{1e300, 0, 0, 1e300, 1, 1, 1, 1, 1},
              "along x the spacing 1 is lost in the rounding of 1e+300 to 1e+300"},
             // 2^32 values and 12854 more
             {{0, 0, 0, 26754, 26754, 1, 1, 1, 1},
              "the box needs 26755 x 26755 x 2 nodes; the most is 1431655765"}}) {
        const auto Layout = [&](auto... v) { oGrid.LayoutGrid(v...); };
        EXPECT_EQ(kelm::test::GetRefusal([&, &oWanted = oBox] { std::apply(Layout, oWanted); }),
                  source + "InterpGrid3D: " + reason);
    }
    EXPECT_EQ(oGrid.GetNumGridPoints(), 8U);
}

} // namespace

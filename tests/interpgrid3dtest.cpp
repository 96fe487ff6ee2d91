#include "services/interpgrid3d.h"
#include "services/exception.h"

#include <gtest/gtest.h>

#include <cmath>
#include <functional>
#include <limits>
#include <random>
#include <vector>

namespace {

constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();
constexpr double kInf = std::numeric_limits<double>::infinity();

struct Box {
    double low[3];
    double high[3];
    double spacing[3];
};

void Layout(InterpGrid3D& oGrid, const Box& oBox) {
    oGrid.SetDimension(1);
    oGrid.LayoutGrid(oBox.low[0], oBox.low[1], oBox.low[2], oBox.high[0], oBox.high[1],
                     oBox.high[2], oBox.spacing[0], oBox.spacing[1], oBox.spacing[2]);
}

std::vector<double> GetPositions(const InterpGrid3D& oGrid) {
    std::vector<double> positions(std::size_t{3} * oGrid.GetNumGridPoints());
    oGrid.GetGridPositions(positions.data());
    return positions;
}

using Field = std::function<double(double, double, double)>;

void Fill(InterpGrid3D& oGrid, const Field& oField) {
    const std::vector<double> positions = GetPositions(oGrid);
    for (std::size_t i = 0; 3 * i < positions.size(); ++i)
        oGrid.GetArray()[i] = oField(positions[3 * i], positions[3 * i + 1], positions[3 * i + 2]);
}

double GetValue(const InterpGrid3D& oGrid, double x, double y, double z) {
    double dfValue = 0.0;
    oGrid.GetVal(x, y, z, &dfValue);
    return dfValue;
}

const Box kBox{{738669.5, 4045105.25, 300.0}, {738919.5, 4045205.25, 550.0}, {100.0, 100.0, 250.0}};

} // namespace

TEST(InterpGrid3D, NodesStartAtTheLowCornerAndCoverTheBox) {
    InterpGrid3D oGrid;
    Layout(oGrid, kBox);
    // 250 wide: nodes at 0, 100, 200, 300. 100 deep: 0, 100. 250 tall: 0, 250.
    ASSERT_EQ(oGrid.GetNumGridPoints(), 4U * 2U * 2U);
    const std::vector<double> positions = GetPositions(oGrid);
    EXPECT_EQ(positions[3], 738769.5); // x runs fastest
    EXPECT_EQ(positions[4], 4045105.25);
    EXPECT_EQ(positions[3 * 4 + 1], 4045205.25);
    EXPECT_EQ(positions[3 * 8 + 2], 550.0);
    EXPECT_EQ(GetValue(oGrid, 738700.0, 4045200.0, 400.0), 0.0);
}

TEST(InterpGrid3D, GivesNodesExactlyAndIsTrilinearBetween) {
    InterpGrid3D oGrid;
    Box oBox = kBox;
    oBox.spacing[0] = 0.1; // node positions that are not exact
    oBox.high[0] = oBox.low[0] + 33.33;
    Layout(oGrid, oBox);
    std::mt19937 oRandom(4711);
    std::uniform_real_distribution<double> oPart(0.0, 1.0);
    Fill(oGrid, [&](double, double, double) { return oPart(oRandom); });
    const std::vector<double> positions = GetPositions(oGrid);
    for (std::size_t i = 0; 3 * i < positions.size(); ++i)
        ASSERT_EQ(GetValue(oGrid, positions[3 * i], positions[3 * i + 1], positions[3 * i + 2]),
                  oGrid.GetArray()[i]);

    const Field oTrilinear = [](double x, double y, double z) {
        const double u = x - 738669.5, v = y - 4045105.25, w = z - 300.0;
        return 2.0 + 0.5 * u - 0.25 * v + w + 0.001 * u * v * w;
    };
    Layout(oGrid, kBox);
    Fill(oGrid, oTrilinear);
    for (int i = 0; i < 2000; ++i) { // up to the last node, 50 beyond the box
        const double x = kBox.low[0] + 300.0 * oPart(oRandom);
        const double y = kBox.low[1] + 100.0 * oPart(oRandom);
        const double z = kBox.low[2] + 250.0 * oPart(oRandom);
        ASSERT_NEAR(GetValue(oGrid, x, y, z), oTrilinear(x, y, z), 1e-8);
    }
    Fill(oGrid, [](double, double, double) { return 0.1; });
    EXPECT_EQ(GetValue(oGrid, 738701.7, 4045133.3, 333.3), 0.1);
}

TEST(InterpGrid3D, ClampsOutsideAndAnswersNaNForNaN) {
    InterpGrid3D oGrid;
    EXPECT_TRUE(std::isnan(GetValue(oGrid, 0.0, 0.0, 0.0))); // no nodes yet
    Layout(oGrid, kBox);
    Fill(oGrid, [](double x, double y, double z) { return x + 1e-3 * y + 1e3 * z; });
    const double dfLow = GetValue(oGrid, kBox.low[0], kBox.low[1], kBox.low[2]);
    const double dfTop = GetValue(oGrid, kBox.low[0] + 300.0, kBox.high[1], kBox.high[2]);
    for (const double dfFar : {1e-9, 1e9, 1e300, kInf}) {
        EXPECT_EQ(GetValue(oGrid, kBox.low[0] - dfFar, kBox.low[1] - dfFar, kBox.low[2] - dfFar),
                  dfLow);
        EXPECT_EQ(GetValue(oGrid, 738969.5 + dfFar, kBox.high[1] + dfFar, kBox.high[2] + dfFar),
                  dfTop);
    }
    EXPECT_TRUE(std::isnan(GetValue(oGrid, kNaN, 0.0, 0.0)));
    EXPECT_TRUE(std::isnan(GetValue(oGrid, 0.0, kNaN, 0.0)));
    EXPECT_TRUE(std::isnan(GetValue(oGrid, 0.0, 0.0, kNaN)));
}

TEST(InterpGrid3D, ABoxWithoutWidthStillAnswers) {
    InterpGrid3D oGrid;
    Layout(oGrid, {{5.0, 6.0, 7.0}, {5.0, 6.0, 7.0}, {100.0, 100.0, 1.0}});
    ASSERT_EQ(oGrid.GetNumGridPoints(), 8U);
    Fill(oGrid, [](double, double, double z) { return z + 30.0; });
    EXPECT_EQ(GetValue(oGrid, 5.0, 6.0, 7.0), 37.0);
}

TEST(InterpGrid3D, RefusesWhatItCannotLayOutAndKeepsTheOldGrid) {
    InterpGrid3D oGrid;
    EXPECT_THROW(oGrid.SetDimension(2), kelm::ParameterException);
    Layout(oGrid, kBox);
    const std::vector<Box> boxes = {
        // The height range of a surface without a single finite height.
        {{0, 0, 3.4028235e38}, {1, 1, -3.4028235e38}, {100, 100, 1}},
        {{0, kNaN, 0}, {1, 1, 1}, {100, 100, 1}},
        {{-kInf, 0, 0}, {1, 1, 1}, {100, 100, 1}},
        {{0, 0, 0}, {1, 1, kInf}, {100, 100, kInf}},
        {{-1e308, 0, 0}, {1e308, 1, 1}, {100, 100, 1}},
        {{0, 0, 0}, {1, 1, 1}, {0, 100, 1}},
        {{0, 0, 0}, {1, 1, 1}, {100, -100, 1}},
        {{0, 0, 0}, {1, 1, 1}, {100, 100, kNaN}},
        {{1e300, 0, 0}, {1e300, 1, 1}, {100, 100, 1}},
        // 26755 x 26755 x 2 nodes of three values each: 2^32 and 12854 more.
        {{0, 0, 0}, {2675400, 2675400, 1}, {100, 100, 1}},
        {{0, 0, 0}, {1e12, 1e12, 1}, {1e-3, 1e-3, 1}},
    };
    for (std::size_t i = 0; i < boxes.size(); ++i) {
        EXPECT_THROW(Layout(oGrid, boxes[i]), kelm::DataException) << "box " << i;
        EXPECT_EQ(oGrid.GetNumGridPoints(), 16U);
    }
}

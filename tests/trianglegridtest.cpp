#include "tests/support/model.h"
#include "tests/support/sheets.h"

#include <cmath>

namespace kelm::tin::test {

namespace {

using Cells = std::vector<int>; ///< column and row in turn

struct GridTriangle : Triangle {
    using Triangle::GetGridPointIdx;
    using Triangle::Sweepline;
    explicit GridTriangle(const model::Corners& c) : corners(c) {
        SetVertices(&corners[0], &corners[1], &corners[2]);
    }
    GridTriangle(const GridTriangle&) = delete;

    Cells List(int cols, int rows) const {
        Cells cells(2 * GetGridPointsNum(cols, rows) + 2, -1);
        EXPECT_EQ(2 * GetGridPointsCR(cells.data(), cols, rows) + 2, cells.size());
        EXPECT_EQ(cells.back(), -1); // no more is written than was counted
        cells.resize(cells.size() - 2);
        return cells;
    }
    /// By integers, for corners in quarters: is the cell inside, edges included?
    bool TestCell(int col, int row) const {
        int x[3], y[3];
        for (unsigned i = 0; i < 3; ++i) {
            x[i] = static_cast<int>(4 * corners[i].x) - 4 * col;
            y[i] = static_cast<int>(4 * corners[i].y) - 4 * row;
        }
        const auto [least, greatest] = std::minmax(
            {x[0] * y[1] - x[1] * y[0], x[1] * y[2] - x[2] * y[1], x[2] * y[0] - x[0] * y[2]});
        return least >= 0 || greatest <= 0;
    }
    model::Corners corners;
};

} // namespace

TEST(TriangleGrid, ListsTheCellsThatIntegersFind) {
    EXPECT_EQ(GridTriangle({{{0, 0, 0}, {2, 0, 0}, {0, 2, 0}}}).List(9, 9),
              (Cells{0, 1, 1, 1, 0, 2}));
    Random random;
    for (int i = 0; i < 20000; ++i) {
        const auto quarter = [&] { return static_cast<float>(random.Below(64)) / 4 - 3; };
        const auto make = [&] { return Point{quarter(), quarter(), quarter()}; };
        const GridTriangle t({make(), make(), make()});
        const int cols = static_cast<int>(random.Below(14)) - 1, rows = 11 - cols;
        const Box& box = t.GetBBox();
        const auto toInt = [](float f) { return static_cast<int>(std::floor(f)); };
        const int left = std::max(0, -toInt(-box.min.x)),
                  right = std::min(cols - 1, toInt(box.max.x));
        const int low = std::max(0, -toInt(-box.min.y)),
                  high = std::min(rows - 1, toInt(box.max.y));
        Cells expected, confirmed{8, 8}, cells{8, 8}; // an entry before, which is counted
        std::vector<float> expectedHeights, heights;
        for (int row = low; row <= high; ++row)
            for (int col = left; col <= right; ++col) {
                const float x = static_cast<float>(col), y = static_cast<float>(row);
                const auto height = model::GetHeight(t.corners, x, y);
                // The row of the lowest corner is left out, but not in an extent of one column.
                if (left == right ? !height : y == box.min.y || !t.TestCell(col, row))
                    continue;
                expected.insert(expected.end(), {col, row});
                if (!height)
                    continue;
                confirmed.insert(confirmed.end(), {col, row});
                expectedHeights.push_back(*height);
            }
        ASSERT_EQ(t.List(cols, rows), expected) << i;
        const unsigned count = t.GetGridPoints(cols, rows, cells, heights);
        ASSERT_TRUE(cells == confirmed && heights == expectedHeights) << i;
        ASSERT_EQ(count, left > right || low > high ? 0 : cells.size() / 2) << i;
    }
}

TEST(TriangleGrid, CrossingsAreRoundedOnce) {
    Random random;
    for (int i = 0; i < 20000; ++i) {
        const auto make = [&] { return Point{random.Between(0, 99), random.Between(0, 99), 0}; };
        const GridTriangle t({make(), make(), make()});
        const float y = random.Between(0, 99);
        std::vector<float> expected;
        float xs[2];
        for (const auto& [s, e] : {std::pair(0U, 2U), {1, 0}, {2, 1}}) {
            const Point &start = t.corners[s], &end = t.corners[e];
            const model::D dx(model::F(end.x) - start.x), dy(model::F(end.y) - start.y);
            const model::D up(model::F(y) - start.y), x(model::F(start.x));
            if ((y > start.y) != (y > end.y))
                expected.push_back(static_cast<float>((dx * up / dy + x).v));
        }
        std::sort(expected.begin(), expected.end());
        ASSERT_EQ(t.Sweepline(xs, y), static_cast<int>(expected.size())) << i;
        ASSERT_TRUE(std::equal(expected.begin(), expected.end(), xs)) << i;
    }
}

TEST(TriangleGrid, HostileCoordinatesStayInTheGrid) {
    Random random;
    const float values[] = {NOT_A_NUMBER, HUGE_VALF, LOWEST, -LOWEST, 0x1p31F, -3e9F, 0, 2, 5};
    for (int i = 0; i < 50000; ++i) {
        const auto any = [&] { return Point{values[random.Below(9)], values[random.Below(9)], 0}; };
        const GridTriangle triangle({any(), any(), any()});
        Cells cells = triangle.List(4, 4);
        std::vector<float> heights;
        triangle.GetGridPoints(4, 4, cells, heights);
        for (const int c : cells)
            ASSERT_TRUE(c >= 0 && c < 4) << i;
    }
    const GridTriangle huge({{{-3e9F, -3e9F, 0}, {3e9F, -3e9F, 0}, {0, 3e9F, 0}}});
    EXPECT_EQ(huge.GetGridPointsNum(4, 4), 16U);
}

TEST(TriangleGrid, ThreadsMarkOneGrid) {
    const GridTriangle triangle({{{0, 0, 0}, {4, 0, 0}, {0, 4, 0}}});
    unsigned counts[20] = {};
    int sums[20] = {};
#pragma omp parallel for num_threads(2)
    for (int id = 0; id < 4000000; ++id) {
        double bary[3];
        triangle.GetGridPointIdx(1, 2, 5, id % 8, counts, sums, bary);
        triangle.GetGridPointIdx(4, 3, 5, id % 8, counts, sums, bary); // outside
    }
    EXPECT_TRUE(counts[11] == 4000000 && sums[11] == 14000000) << counts[11] << " " << sums[11];
    EXPECT_EQ(counts[19], 0U);
}

} // namespace kelm::tin::test

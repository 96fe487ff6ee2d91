#include "tin/triangle.h"

#include "tin/rules/barycentric.h"

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <limits>
#include <utility>

namespace kelm::tin {

namespace {

/// Conversion of a whole `float` to `int` that saturates; `nan` takes the place of a NaN.
int ToInt(float v, int nan) {
    if (std::isnan(v))
        return nan;
    // 2^31 is a float, the largest int is not.
    if (v >= 2147483648.0F)
        return std::numeric_limits<int>::max();
    if (v < -2147483648.0F)
        return std::numeric_limits<int>::min();
    return static_cast<int>(v);
}

/// Most cells that a result counts.
constexpr std::uint64_t MOST_CELLS = std::numeric_limits<unsigned>::max();

unsigned Saturate(std::uint64_t cells) {
    return static_cast<unsigned>(std::min(cells, MOST_CELLS));
}

/// Cells of a run that is not empty.
std::uint64_t GetLength(int first, int last) {
    return static_cast<std::uint64_t>(std::int64_t{last} - first) + 1;
}

/// Abscissa at which the edge from start to end crosses the horizontal line at y.
float CrossingAt(const point3_t<float>& start, const point3_t<float>& end, float y) {
    const double dx = static_cast<double>(end.x - start.x);
    const double dy = static_cast<double>(end.y - start.y);
    const double up = static_cast<double>(y - start.y);
    return static_cast<float>(dx * up / dy + static_cast<double>(start.x));
}

} // namespace

int Triangle::GetGridExtent(int cols, int rows, int& xMin, int& yMin, int& xMax, int& yMax) const {
    constexpr int LOWEST = std::numeric_limits<int>::min();
    constexpr int HIGHEST = std::numeric_limits<int>::max();
    // A NaN side fails one of the tests below.
    xMin = ToInt(std::ceil(bbox.min.x), HIGHEST);
    yMin = ToInt(std::ceil(bbox.min.y), HIGHEST);
    xMax = ToInt(std::floor(bbox.max.x), LOWEST);
    yMax = ToInt(std::floor(bbox.max.y), LOWEST);
    if (xMax < 0 || cols <= xMin || yMax < 0 || rows <= yMin || xMin > xMax || yMin > yMax)
        return -1;
    if (cols < 1 || rows < 1)
        return -1;
    xMin = std::max(xMin, 0);
    xMax = std::min(xMax, cols - 1);
    yMin = std::max(yMin, 0);
    yMax = std::min(yMax, rows - 1);
    return 0;
}

int Triangle::Sweepline(float* xs, float y) const {
    if (!IsSet())
        return 0;
    static constexpr int EDGES[3][2] = {{0, 2}, {1, 0}, {2, 1}};
    int crossings = 0;
    for (const auto& edge : EDGES) {
        const point3_t<float>& start = *vertices[edge[0]];
        const point3_t<float>& end = *vertices[edge[1]];
        const float p = start.y;
        const float q = end.y;
        if ((y > p && q >= y) || (y > q && p >= y))
            xs[crossings++] = CrossingAt(start, end, y);
    }
    if (crossings == 2 && xs[0] > xs[1])
        std::swap(xs[0], xs[1]);
    return crossings;
}

void Triangle::GetGridPoint(int col, int row, std::vector<int>& points, std::vector<float>& heights,
                            double* bary) const {
    if (GetBarycentricCoord(static_cast<float>(col), static_cast<float>(row), bary[0], bary[1],
                            bary[2]) != 0)
        return;
    AddGridPoint(col, row, points, heights, bary);
}

void Triangle::AddGridPoint(int col, int row, std::vector<int>& points, std::vector<float>& heights,
                            const double* bary) const {
    points.push_back(col);
    points.push_back(row);
    heights.push_back(GetWeightedHeight(bary[0], bary[1], bary[2]));
}

void Triangle::GetGridPointIdx(int col, int row, unsigned stride, int id, unsigned* counts,
                               int* sums, double* bary) const {
    if (GetBarycentricCoord(static_cast<float>(col), static_cast<float>(row), bary[0], bary[1],
                            bary[2]) != 0)
        return;
    const unsigned idx = static_cast<unsigned>(row) * stride + static_cast<unsigned>(col);
#pragma omp atomic update
    counts[idx] += 1U;
#pragma omp atomic update
    sums[idx] += id;
}

/// Walks the rows of the extent: `single(col, row)` for the one cell of a row in an extent of one
/// column, `run(first, last, row)` for the columns between the two edges. False if there is no
/// extent.
template <typename Single, typename Run>
bool Triangle::WalkGrid(int cols, int rows, Single&& single, Run&& run) const {
    int xMin;
    int yMin;
    int xMax;
    int yMax;
    if (GetGridExtent(cols, rows, xMin, yMin, xMax, yMax) != 0)
        return false;
    const float fMin = static_cast<float>(xMin);
    const float fMax = static_cast<float>(xMax);
    for (int row = yMin; row <= yMax; ++row) {
        if (xMin == xMax) {
            single(xMin, row);
            continue;
        }
        float xs[2];
        if (Sweepline(xs, static_cast<float>(row)) != 2 || xs[0] > fMax || fMin > xs[1])
            continue;
        const float x1 = fMin > xs[0] ? fMin : xs[0];
        const float x2 = xs[1] > fMax ? fMax : xs[1];
        // A NaN crossing, which only infinite coordinates give, makes an empty run. fMax can stand
        // beyond xMax where whole floats are sparser than integers.
        const int first = ToInt(std::ceil(x1), std::numeric_limits<int>::max());
        const int last = std::min(ToInt(std::floor(x2), std::numeric_limits<int>::min()), xMax);
        if (first <= last)
            run(first, last, row);
    }
    return true;
}

/// Adds the cells of a run that lie inside. What a row shares is computed once.
void Triangle::AddGridRun(rules::Barycentric& barycentric, int first, int last, int row,
                          std::vector<int>& points, std::vector<float>& heights) const {
    if (barycentric.IsFlat())
        return;
    barycentric.SetRow(static_cast<float>(row));
    double bary[3];
    for (int col = first; col <= last; ++col)
        if (barycentric.GetWeights(static_cast<float>(col), bary[0], bary[1], bary[2]))
            AddGridPoint(col, row, points, heights, bary);
}

unsigned Triangle::GetGridPoints(int cols, int rows, std::vector<int>& points,
                                 std::vector<float>& heights) const {
    if (!IsSet())
        return 0U;
    const std::size_t pointsBefore = points.size();
    const std::size_t heightsBefore = heights.size();
    rules::Barycentric barycentric(*vertices[0], *vertices[1], *vertices[2]);
    double bary[3];
    const auto add = [&](int col, int row) { GetGridPoint(col, row, points, heights, bary); };
    const auto addRun = [&](int first, int last, int row) {
        AddGridRun(barycentric, first, last, row, points, heights);
    };
    try {
        return WalkGrid(cols, rows, add, addRun) ? Saturate(points.size() / 2) : 0U;
    } catch (...) {
        points.resize(pointsBefore);
        heights.resize(heightsBefore);
        throw;
    }
}

unsigned Triangle::GetGridPointsCR(int* points, int cols, int rows) const {
    std::uint64_t count = 0;
    const auto write = [&](int first, int last, int row) {
        const std::uint64_t end = std::min(count + GetLength(first, last), MOST_CELLS);
        for (int col = first; count < end; ++col, ++count) {
            points[2 * count] = col;
            points[2 * count + 1] = row;
        }
    };
    const auto confirm = [&](int col, int row) {
        if (IsPointInsideLT(static_cast<float>(col), static_cast<float>(row)))
            write(col, col, row);
    };
    WalkGrid(cols, rows, confirm, write);
    return static_cast<unsigned>(count);
}

unsigned Triangle::GetGridPointsNum(int cols, int rows) const {
    std::uint64_t count = 0;
    const auto add = [&](int first, int last, int) { count += GetLength(first, last); };
    const auto confirm = [&](int col, int row) {
        if (IsPointInsideLT(static_cast<float>(col), static_cast<float>(row)))
            ++count;
    };
    WalkGrid(cols, rows, confirm, add);
    return Saturate(count);
}

} // namespace kelm::tin

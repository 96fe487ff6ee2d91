#include "tin/load/heightconversion.h"

#include "services/interpgrid3d.h"
#include "tin/parallel/parallelblocks.h"
#include "tin/rules/extent.h"
#include "tin/rules/frame.h"

#include <algorithm>
#include <cstddef>
#include <memory>

namespace kelm::tin::load {

namespace {

/// Vertex count above which the elevation factor alone is worth a team.
constexpr unsigned PARALLEL_ABOVE = 10000;

constexpr double GRID_SPACING = 100.0; ///< map units, in x and y; the grid may choose less
constexpr float LEAST_Z_SPACING = 1.0F;

using Values = std::unique_ptr<double[]>;

/// Three values a point, unset.
Values CreateTriples(unsigned count) {
    return Values(new double[3 * std::size_t{count}]);
}

/// Kept out of line: merged into a vectorised loop, g++ 12 has dropped the rounding.
[[gnu::noinline]] float RoundToFloat(double v) {
    return static_cast<float>(v);
}

} // namespace

void ApplyFactor(const HeightColumn& column, const ElevationFactor& factor) {
    const auto apply = [&](unsigned, unsigned first, unsigned last) {
        for (unsigned i = first; i < last; ++i)
            column.vertices[i].z = static_cast<float>(factor.Get(column.vertices[i].z));
    };
    parallel::ParallelBlocks(column.count, parallel::GetTeamAbove(PARALLEL_ABOVE, column.count),
                             apply);
}

void ConvertFewHeights(const HeightColumn& column, const ElevationFactor& factor,
                       ogc::ct::IMathTransform& transform) {
    const rules::Frame frame(column.base.x, column.base.y);
    Values source = CreateTriples(column.count);
    for (unsigned i = 0; i < column.count; ++i) {
        const point3_t<float>& vertex = column.vertices[i];
        const point3_t<double> map = frame.ToMap(vertex);
        double* triple = &source[3 * std::size_t{i}];
        triple[0] = map.x;
        triple[1] = map.y;
        triple[2] = factor.Get(vertex.z);
    }
    const Values target = CreateTriples(column.count);
    transform.TransformPoints(source.get(), target.get(), column.count);
    source.reset();
    for (unsigned i = 0; i < column.count; ++i)
        column.vertices[i].z = static_cast<float>(target[3 * std::size_t{i} + 2]);
}

void ConvertManyHeights(const HeightColumn& column, const aabb_t<point2_t<float>>& window,
                        const ElevationFactor& factor, ogc::ct::IMathTransform& transform) {
    rules::Range<float> range;
    for (unsigned i = 0; i < column.count; ++i)
        range.Add(RoundToFloat(factor.Get(column.vertices[i].z)));
    InterpGrid3D grid;
    BuildGrid(window, column.base, range.low, range.high, transform, grid);
    const rules::Frame frame(column.base.x, column.base.y);
    const auto interpolate = [&](unsigned, unsigned first, unsigned last) {
        for (unsigned i = first; i < last; ++i) {
            point3_t<float>& vertex = column.vertices[i];
            const point3_t<double> map = frame.ToMap(vertex);
            double height;
            grid.GetVal(map.x, map.y, factor.Get(vertex.z), &height);
            vertex.z = static_cast<float>(height);
        }
    };
    parallel::ParallelBlocks(column.count, omp_get_max_threads(), interpolate);
}

void BuildGrid(const aabb_t<point2_t<float>>& window, const point2_t<double>& base, float zMin,
               float zMax, ogc::ct::IMathTransform& transform, InterpGrid3D& grid) {
    const float range = zMax - zMin;
    const float zSpacing = LEAST_Z_SPACING > range ? LEAST_Z_SPACING : range;
    const rules::Frame frame(base.x, base.y);
    const point2_t<double> low = frame.ToMap(window.min);
    const point2_t<double> high = frame.ToMap(window.max);
    grid.SetDimension(1);
    grid.LayoutGrid(low.x, low.y, static_cast<double>(zMin), high.x, high.y,
                    static_cast<double>(zMax), GRID_SPACING, GRID_SPACING,
                    static_cast<double>(zSpacing));
    const unsigned count = grid.GetNumGridPoints();
    Values positions = CreateTriples(count);
    grid.GetGridPositions(positions.get());
    const Values target = CreateTriples(count);
    transform.TransformPoints(positions.get(), target.get(), count);
    positions.reset();
    double* values = grid.GetArray();
    for (unsigned i = 0; i < count; ++i)
        values[i] = static_cast<double>(RoundToFloat(target[3 * std::size_t{i} + 2]));
}

} // namespace kelm::tin::load

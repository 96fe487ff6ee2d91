#include "tin/tinreader.h"

#include "services/interpgrid3d.h"
#include "services/reporting.h"
#include "tin/detail/parallelblocks.h"

#include <cstddef>
#include <limits>
#include <memory>

namespace kelm::tin {

namespace {

/// Vertex count from which heights are interpolated in a grid.
constexpr unsigned GRID_FROM = 1000;

/// Vertex count above which the elevation factor alone is worth a team.
constexpr unsigned PARALLEL_ABOVE = 10000;

constexpr double GRID_SPACING = 100.0; ///< map units, in x and y
constexpr float LEAST_Z_SPACING = 1.0F;

using Values = std::unique_ptr<double[]>;

/// Three values a point, unset.
Values CreateTriples(unsigned count) {
    return Values(new double[3 * std::size_t{count}]);
}

double ToMap(float local, double base) {
    return static_cast<double>(local) + base;
}

/// Do map coordinates look like degrees? One cell of the grid then spans the surface many times
/// over, and what it gives between its nodes has little to do with the datum.
bool LooksLikeDegrees(double xMin, double yMin, double xMax, double yMax) {
    return xMin >= -360.0 && xMax <= 360.0 && yMin >= -90.0 && yMax <= 90.0;
}

/// Kept out of line: merged into a vectorised loop, g++ 12 has dropped the rounding.
[[gnu::noinline]] float RoundToFloat(double v) {
    return static_cast<float>(v);
}

} // namespace

bool TinReader::HeightConvert(const aabb_t<point2_t<float>>* poWindow, point3_t<float>* poPoints,
                              unsigned int nCount) const {
    if (nCount >= GRID_FROM)
        return HeightConvertManyPoints(poWindow, poPoints, nCount);
    return HeightConvertFewPoints(poPoints, nCount);
}

bool TinReader::HeightConvertSimple(const aabb_t<point2_t<float>>*, point3_t<float>* poPoints,
                                    unsigned int nCount) const {
    detail::ParallelBlocks(nCount, detail::GetTeamAbove(PARALLEL_ABOVE, nCount),
                           [this, poPoints](unsigned, unsigned first, unsigned last) {
                               for (unsigned i = first; i < last; ++i)
                                   poPoints[i].z = static_cast<float>(GetElevation(poPoints[i].z));
                           });
    return false;
}

bool TinReader::HeightConvertFewPoints(point3_t<float>* poPoints, unsigned int nCount) const {
    Values source = CreateTriples(nCount);
    for (unsigned i = 0; i < nCount; ++i) {
        double* triple = &source[3 * std::size_t{i}];
        triple[0] = ToMap(poPoints[i].x, mdfXBase);
        triple[1] = ToMap(poPoints[i].y, mdfYBase);
        triple[2] = GetElevation(poPoints[i].z);
    }
    const Values target = CreateTriples(nCount);
    mpoTransform->TransformPoints(source.get(), target.get(), nCount);
    source.reset();
    for (unsigned i = 0; i < nCount; ++i)
        poPoints[i].z = static_cast<float>(target[3 * std::size_t{i} + 2]);
    return false;
}

bool TinReader::HeightConvertManyPoints(const aabb_t<point2_t<float>>* poWindow,
                                        point3_t<float>* poPoints, unsigned int nCount) const {
    float fZMin = std::numeric_limits<float>::max();
    float fZMax = -std::numeric_limits<float>::max();
    for (unsigned i = 0; i < nCount; ++i) {
        const float h = RoundToFloat(GetElevation(poPoints[i].z));
        if (h < fZMin)
            fZMin = h;
        if (h > fZMax)
            fZMax = h;
    }
    InterpGrid3D oGrid;
    BuildInterpGridForWindow(poWindow, fZMin, fZMax, oGrid);
    detail::ParallelBlocks(
        nCount, omp_get_max_threads(), [&](unsigned, unsigned first, unsigned last) {
            for (unsigned i = first; i < last; ++i) {
                point3_t<float>& p = poPoints[i];
                double out;
                oGrid.GetVal(ToMap(p.x, mdfXBase), ToMap(p.y, mdfYBase), GetElevation(p.z), &out);
                p.z = static_cast<float>(out);
            }
        });
    return false;
}

void TinReader::BuildInterpGridForWindow(const aabb_t<point2_t<float>>* poWindow, float fZMin,
                                         float fZMax, InterpGrid3D& oGrid) const {
    const float range = fZMax - fZMin;
    const float fZSpacing = LEAST_Z_SPACING > range ? LEAST_Z_SPACING : range;
    oGrid.SetDimension(1);
    oGrid.LayoutGrid(ToMap(poWindow->min.x, mdfXBase), ToMap(poWindow->min.y, mdfYBase),
                     static_cast<double>(fZMin), ToMap(poWindow->max.x, mdfXBase),
                     ToMap(poWindow->max.y, mdfYBase), static_cast<double>(fZMax), GRID_SPACING,
                     GRID_SPACING, static_cast<double>(fZSpacing));
    if (LooksLikeDegrees(ToMap(poWindow->min.x, mdfXBase), ToMap(poWindow->min.y, mdfYBase),
                         ToMap(poWindow->max.x, mdfXBase), ToMap(poWindow->max.y, mdfYBase)))
        tellus::Warning::Warn("Heights are interpolated between positions 100 map units apart, and "
                              "the coordinates look like degrees: use a projected layer to change "
                              "the vertical datum of a large surface.",
                              "tin/tinreader", __LINE__);
    const unsigned n = oGrid.GetNumGridPoints();
    Values positions = CreateTriples(n);
    oGrid.GetGridPositions(positions.get());
    const Values target = CreateTriples(n);
    mpoTransform->TransformPoints(positions.get(), target.get(), n);
    positions.reset();
    double* values = oGrid.GetArray();
    for (unsigned i = 0; i < n; ++i)
        values[i] = static_cast<double>(RoundToFloat(target[3 * std::size_t{i} + 2]));
}

} // namespace kelm::tin

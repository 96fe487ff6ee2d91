#include "tin/raster.h"

#include "tin/heightgrid.h"
#include "tin/parallel/parallelbatch.h"
#include "tin/raster/band.h"
#include "tin/rules/frame.h"
#include "tin/tin.h"

#include <atomic>
#include <cmath>
#include <vector>

namespace kelm::tin {

namespace {

/// Cells that are worth a thread.
constexpr std::size_t SMALLEST = 20000;

point2_t<double> GetCentre(const RasterFrame& frame, std::size_t column, std::size_t row) {
    const double* t = frame.adfTransform;
    const double col = static_cast<double>(column) + 0.5;
    const double line = static_cast<double>(row) + 0.5;
    return {t[0] + col * t[1] + line * t[2], t[3] + col * t[4] + line * t[5]};
}

/// Does x depend on the column alone, and rise with it, and y on the row alone?
bool IsUpright(const RasterFrame& frame) {
    const double* t = frame.adfTransform;
    return t[1] > 0.0 && t[2] == 0.0 && t[4] == 0.0 && std::isfinite(t[0] + t[1]) &&
           std::isfinite(t[3] + t[5]);
}

raster::Sheet MakeSheet(const Tin& surface, const RasterFrame& frame, float* cells, int threads) {
    double xBase;
    double yBase;
    surface.GetXYBase(xBase, yBase);
    const rules::Frame local(xBase, yBase);
    const BBox<float, point3_t<float>>& box = surface.GetBBox();
    raster::Sheet sheet{
        surface.GetTriangle(0),
        {},
        raster::Axis(frame.nColumns,
                     [&](std::size_t i) { return local.ToLocal(GetCentre(frame, i, 0)).x; }),
        raster::Axis(frame.nRows,
                     [&](std::size_t i) { return local.ToLocal(GetCentre(frame, 0, i)).y; }),
        std::vector<std::pair<unsigned, unsigned>>(surface.GetTriangleCount()),
        cells};
    sheet.oBBox.min = {box.min.x, box.min.y};
    sheet.oBBox.max = {box.max.x, box.max.y};
    parallel::ParallelBatch(
        surface.GetTriangleCount(), SMALLEST, threads, [&](std::size_t first, std::size_t last) {
            for (; first < last; ++first)
                sheet.oRowRanges[first] = sheet.FindRows(sheet.poTriangles[first]);
        });
    return sheet;
}

/// @return about how many bands: each of them looks at the rows of all triangles
std::size_t CountBands(const RasterFrame& frame, int threads) {
    constexpr std::size_t BANDS_A_THREAD = 4;
    const std::size_t cells = std::size_t{frame.nColumns} * frame.nRows;
    const auto team = static_cast<std::size_t>(parallel::GetTeamForBatch(cells, SMALLEST, threads));
    return team == 1 ? 1 : std::min<std::size_t>(frame.nRows, team * BANDS_A_THREAD);
}

} // namespace

std::size_t RasterizeHeights(const Tin& surface, const RasterFrame& frame, float* cells,
                             int threads, EdgeRule eRule) {
    if (frame.nColumns == 0 || frame.nRows == 0)
        return 0;
    if (!IsUpright(frame))
        return RasterizeHeights(HeightGrid(surface, {threads, 0, {}}), frame, cells, threads,
                                eRule);
    const raster::Sheet sheet = MakeSheet(surface, frame, cells, threads);
    const std::size_t bands = CountBands(frame, threads);
    std::atomic<std::size_t> found{0};
    parallel::ParallelBatch(bands, 1, threads, [&](std::size_t first, std::size_t last) {
        const std::size_t from = frame.nRows * first / bands;
        const std::size_t to = frame.nRows * last / bands;
        found += raster::Band(sheet, from, to).Fill(eRule);
    });
    return found;
}

std::size_t RasterizeHeights(const HeightGrid& grid, const RasterFrame& frame, float* cells,
                             int threads, EdgeRule eRule) {
    std::atomic<std::size_t> found{0};
    const auto fill = [&](std::size_t first, std::size_t last) {
        std::vector<point2_t<double>> positions(frame.nColumns);
        for (; first < last; ++first) {
            for (std::size_t col = 0; col < frame.nColumns; ++col)
                positions[col] = GetCentre(frame, col, first);
            found += grid.GetHeights(positions.data(), positions.size(),
                                     cells + first * positions.size(), 1, eRule);
        }
    };
    const std::size_t smallest = frame.nColumns == 0 ? 1 : SMALLEST / frame.nColumns + 1;
    parallel::ParallelBatch(frame.nRows, smallest, threads, fill);
    return found;
}

} // namespace kelm::tin

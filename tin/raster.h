#pragma once

#include "tin/edgerule.h"
#include "tin/tinexport.h"

#include <cstddef>

namespace kelm::tin {

class HeightGrid;
class Tin;

/// The cells of a raster: their number, and the affine transform that leads from columns and rows
/// to map coordinates, as GDAL has it (`GDALDataset::GetGeoTransform`). The centre of a cell is at
///
///     x = t[0] + (column + 0.5) * t[1] + (row + 0.5) * t[2]
///     y = t[3] + (column + 0.5) * t[4] + (row + 0.5) * t[5]
///
/// in `double`, from the left. A plain value.
struct RasterFrame {
    unsigned nColumns = 0;
    unsigned nRows = 0;
    double adfTransform[6] = {0.0, 1.0, 0.0, 0.0, 0.0, 1.0};
};

/// Sets each cell to the height at its centre, as GetHeight tells it in map coordinates, to the
/// bit, and to NaN where there is none.
///
/// A surface is walked triangle by triangle, which takes no index and little memory. Under a
/// transform that turns or mirrors the columns a HeightGrid is built first.
/// @param cells nColumns * nRows values of the caller's, row by row @param threads most threads; 0
/// for the runtime's default
/// @return the number of heights found
/// @throw std::bad_alloc
KELM_TIN_EXPORT std::size_t RasterizeHeights(const Tin& surface, const RasterFrame& frame,
                                             float* cells, int threads = 0,
                                             EdgeRule eRule = ER_Float);
/// The same by an index that is there already: for a raster of few cells a triangle.
KELM_TIN_EXPORT std::size_t RasterizeHeights(const HeightGrid& grid, const RasterFrame& frame,
                                             float* cells, int threads = 0,
                                             EdgeRule eRule = ER_Float);

} // namespace kelm::tin

// Writes a terrain as a raster of heights, a GeoTIFF in the CRS of its layer:
//
//     terrain_raster terrain.gpkg heights.tif --cell 20
//
// A cell holds the height at its centre. Where sheets lie above each other it holds the greatest
// height. Where there is no surface it holds the no-data value.

#include "command.h"
#include "terrain.h"

#include <tin/aabbtree.h>

#include <cmath>
#include <filesystem>
#include <limits>

using namespace kelm::tin;

namespace {

/// Lower than every height, so that a plain maximum finds the greatest height of a cell.
constexpr float NO_DATA = std::numeric_limits<float>::lowest();

/// Rows of cells from north to south. The sides of cells lie at whole multiples of the cell size.
struct Grid {
    double cell; ///< side in map units
    double left; ///< western side of the first column, in cells
    double top;  ///< northern side of the first row, in cells
    int cols;
    int rows;
    std::vector<float> heights;
    GDALProgressFunc progress;
};

Grid MakeGrid(const Tin& terrain, double cell) {
    BBox<double, point3_t<double>> box;
    terrain.GetRawBBox(box);
    const double left = std::floor(box.min.x / cell);
    const double top = std::ceil(box.max.y / cell);
    const double cols = std::max(1.0, std::ceil(box.max.x / cell) - left);
    const double rows = std::max(1.0, top - std::floor(box.min.y / cell));
    // Grid coordinates are float. On a longer side they could not tell 1/256 of a cell apart.
    if (!(cols <= 65536.0 && rows <= 65536.0))
        throw std::runtime_error("the cells are too small: more than 65536 on a side");
    const auto count = static_cast<std::size_t>(cols * rows);
    return {cell,
            left,
            top,
            static_cast<int>(cols),
            static_cast<int>(rows),
            std::vector<float>(count, NO_DATA),
            count > 10'000'000 ? GDALTermProgress : GDALDummyProgress};
}

/// The terrain in grid coordinates: x is the column and y is the row. The centre of a cell has
/// whole coordinates.
std::unique_ptr<Tin> MoveToGrid(const Tin& terrain, const Grid& grid) {
    double xBase;
    double yBase;
    terrain.GetXYBase(xBase, yBase);
    const unsigned vertexCount = terrain.GetVertexCount();
    const unsigned triangleCount = terrain.GetTriangleCount();
    auto vertices = std::make_unique<point3_t<float>[]>(vertexCount);
    for (unsigned i = 0; i < vertexCount; ++i) {
        const point3_t<float>& from = *terrain.GetVertex(i);
        const double col = (xBase + static_cast<double>(from.x)) / grid.cell - grid.left - 0.5;
        const double row = grid.top - (yBase + static_cast<double>(from.y)) / grid.cell - 0.5;
        vertices[i] = {static_cast<float>(col), static_cast<float>(row), from.z};
    }
    auto ids = std::make_unique<Triangle_Id[]>(triangleCount);
    for (unsigned i = 0; i < triangleCount; ++i) {
        const auto find = [&triangle = *terrain.GetTriangle(i),
                           first = terrain.GetVertex(0)](int k) {
            return static_cast<unsigned>(triangle.GetVertex(k) - first);
        };
        ids[i] = {find(0), find(1), find(2)};
    }
    return std::make_unique<Tin>(vertices.release(), vertexCount, ids.release(), triangleCount, 0.0,
                                 0.0);
}

/// Walks triangles first to last - 1 on all threads. Triangles may share a cell. The order in which
/// they come does not matter, since the greatest height counts.
void FillCells(const Tin& sheet, unsigned first, unsigned last, Grid& grid) {
    std::exception_ptr failure; // an exception must not leave the parallel loop
#pragma omp parallel for schedule(dynamic, 16)
    for (unsigned t = first; t < last; ++t) {
        try {
            std::vector<int> cells;
            std::vector<float> heights;
            sheet.GetTriangle(t)->GetGridPoints(grid.cols, grid.rows, cells, heights);
#pragma omp critical
            for (std::size_t i = 0; i < heights.size(); ++i) {
                const auto row = static_cast<std::size_t>(cells[2 * i + 1]);
                float& cell = grid.heights[row * static_cast<std::size_t>(grid.cols) +
                                           static_cast<std::size_t>(cells[2 * i])];
                cell = std::max(cell, heights[i]);
            }
        } catch (...) {
#pragma omp critical
            failure = std::current_exception();
        }
    }
    if (failure)
        std::rethrow_exception(failure);
}

void Fill(const Tin& sheet, Grid& grid) {
    const unsigned count = sheet.GetTriangleCount();
    const unsigned block = count / 100 + 1;
    for (unsigned first = 0; first < count; first += block) {
        FillCells(sheet, first, std::min(first + block, count), grid);
        grid.progress(0.5 * first / count, nullptr, nullptr);
    }
}

/// Rounding can put a centre that lies on an inner edge outside the triangles on both sides. Such a
/// cell has surface all around, and gets the mean of four heights close by.
void CloseGaps(const Tin& sheet, Grid& grid) {
    const AabbTree tree(&sheet);
    const auto find = [&](float x, float y, float& height) {
        return sheet.GetHeight(x, y, height, &tree);
    };
    constexpr float BESIDE = 1.0f / 256.0f;
    float* cell = grid.heights.data();
    for (int row = 0; row < grid.rows; ++row)
        for (int col = 0; col < grid.cols; ++col, ++cell) {
            if (*cell != NO_DATA)
                continue;
            const auto x = static_cast<float>(col);
            const auto y = static_cast<float>(row);
            float a, b, c, d;
            if (find(x - BESIDE, y - BESIDE, a) && find(x + BESIDE, y + BESIDE, b) &&
                find(x - BESIDE, y + BESIDE, c) && find(x + BESIDE, y - BESIDE, d))
                *cell = (a + b + c + d) / 4.0f;
        }
}

/// GDAL prints the reason of a failure on standard error. The last tile is written when the file is
/// closed, and that can fail too.
void Write(Grid& grid, const OGRSpatialReference& crs, const std::string& name) {
    const char* options[] = {"TILED=YES", "COMPRESS=DEFLATE", "PREDICTOR=3", nullptr};
    double place[] = {grid.left * grid.cell, grid.cell, 0.0, grid.top * grid.cell, 0.0, -grid.cell};
    CPLErrorReset();
    GDALDatasetUniquePtr file(GetGDALDriverManager()->GetDriverByName("GTiff")->Create(
        name.c_str(), grid.cols, grid.rows, 1, GDT_Float32, const_cast<char**>(options)));
    if (file) {
        file->SetGeoTransform(place);
        file->SetSpatialRef(crs.IsEmpty() ? nullptr : &crs);
        GDALRasterBand& band = *file->GetRasterBand(1);
        band.SetNoDataValue(static_cast<double>(NO_DATA));
        GDALRasterIOExtraArg extra;
        INIT_RASTERIO_EXTRA_ARG(extra);
        extra.pProgressData = GDALCreateScaledProgress(0.5, 1.0, grid.progress, nullptr);
        extra.pfnProgress = GDALScaledProgress;
        if (band.RasterIO(GF_Write, 0, 0, grid.cols, grid.rows, grid.heights.data(), grid.cols,
                          grid.rows, GDT_Float32, 0, 0, &extra) == CE_None)
            file->FlushCache();
        GDALDestroyScaledProgress(extra.pProgressData);
        file.reset();
    }
    if (CPLGetLastErrorType() >= CE_Failure)
        throw std::runtime_error("cannot write " + name);
}

} // namespace

int main(int argc, char** argv) {
    Layer layer;
    std::string raster;
    double cell = 0.0;
    CLI::App app("A raster of the heights of a terrain.", "terrain_raster");
    AddLayerOptions(app, layer);
    app.add_option("raster", raster, "GeoTIFF to write")->required();
    app.add_option("--cell", cell, "Side of a cell, in map units")->required();
    return RunCommand(app, argc, argv, [&] {
        if (!(cell > 0.0))
            throw CLI::ValidationError("--cell", "must be above 0");
        std::error_code missing;
        if (std::filesystem::equivalent(layer.file, raster, missing))
            throw CLI::ValidationError("raster", "this file is read");
        const std::unique_ptr<Tin> terrain = LoadTerrain(layer);
        Grid grid = MakeGrid(*terrain, cell);
        const std::unique_ptr<Tin> sheet = MoveToGrid(*terrain, grid);
        Fill(*sheet, grid);
        CloseGaps(*sheet, grid);
        Write(grid, ReadCrs(layer), raster);
    });
}

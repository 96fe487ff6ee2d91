// Writes a terrain as a raster of heights, a GeoTIFF in the CRS of its layer:
//
//     terrain_raster terrain.gpkg heights.tif --cell 20
//
// A cell holds the height at its centre. Where sheets lie above each other it holds the greatest
// height. Where there is no surface it holds NaN, which is the no-data value. A centre on the edge
// of two triangles is never missed.

#include "command.h"
#include "terrain.h"

#include <tin/raster.h>

#include <cmath>
#include <filesystem>
#include <limits>

using namespace kelm::tin;

namespace {

/// Rows of cells from north to south. The sides of cells lie at whole multiples of the cell size.
struct Grid {
    RasterFrame frame;
    std::vector<float> heights;
};

Grid MakeGrid(const Tin& terrain, double cell) {
    BBox<double, point3_t<double>> box;
    terrain.GetRawBBox(box);
    const double left = std::floor(box.min.x / cell);
    const double top = std::ceil(box.max.y / cell);
    const double cols = std::max(1.0, std::ceil(box.max.x / cell) - left);
    const double rows = std::max(1.0, top - std::floor(box.min.y / cell));
    if (!(cols <= 65536.0 && rows <= 65536.0))
        throw std::runtime_error("the cells are too small: more than 65536 on a side");
    return {{static_cast<unsigned>(cols),
             static_cast<unsigned>(rows),
             {left * cell, cell, 0.0, top * cell, 0.0, -cell}},
            std::vector<float>(static_cast<std::size_t>(cols * rows))};
}

/// GDAL prints the reason of a failure on standard error. The last tile is written when the file is
/// closed, and that can fail too.
void Write(Grid& grid, const OGRSpatialReference& crs, const std::string& name) {
    const char* options[] = {"TILED=YES", "COMPRESS=DEFLATE", "PREDICTOR=3", nullptr};
    const auto cols = static_cast<int>(grid.frame.nColumns);
    const auto rows = static_cast<int>(grid.frame.nRows);
    CPLErrorReset();
    GDALDatasetUniquePtr file(GetGDALDriverManager()->GetDriverByName("GTiff")->Create(
        name.c_str(), cols, rows, 1, GDT_Float32, const_cast<char**>(options)));
    if (file) {
        file->SetGeoTransform(grid.frame.adfTransform);
        file->SetSpatialRef(crs.IsEmpty() ? nullptr : &crs);
        GDALRasterBand& band = *file->GetRasterBand(1);
        band.SetNoDataValue(std::numeric_limits<double>::quiet_NaN());
        GDALRasterIOExtraArg extra;
        INIT_RASTERIO_EXTRA_ARG(extra);
        extra.pfnProgress = grid.heights.size() > 10'000'000 ? GDALTermProgress : GDALDummyProgress;
        if (band.RasterIO(GF_Write, 0, 0, cols, rows, grid.heights.data(), cols, rows, GDT_Float32,
                          0, 0, &extra) == CE_None)
            file->FlushCache();
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
        RasterizeHeights(*terrain, grid.frame, grid.heights.data(), 0, ER_Closed);
        Write(grid, ReadCrs(layer), raster);
    });
}

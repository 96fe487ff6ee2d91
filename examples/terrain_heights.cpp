// Opens a terrain, prints what is known of it before and after the load, and prints heights at
// positions:
//
//     terrain_heights terrain.gpkg --source orthometric --output ellipsoidal --at 745000,4052000
//     terrain_heights terrain.gpkg --stdin < positions.csv > heights.txt
//
// Heights go to standard output, one line for each position, in the unit of the stored heights
// times the scale. "off the surface" stands where there is none. All else goes to standard error.

#include "command.h"
#include "terrain.h"

#include <tin/heightgrid.h>

#include <sys/resource.h>

#include <cmath>
#include <optional>

using namespace kelm::ogc::cs;
using namespace kelm::tin;

namespace {

struct Options {
    HeightOptions heights;
    std::optional<DatumType> output; ///< none: the same as the source
    std::vector<double> window;
    std::vector<double> positions; ///< x and y in turn
    bool readStdin = false;
};

void DefineOptions(CLI::App& app, Options& options) {
    const CLI::CheckedTransformer datums(std::map<std::string, DatumType>{
        {"other", VD_Other}, {"orthometric", VD_Orthometric}, {"ellipsoidal", VD_Ellipsoidal}});
    app.add_option("--source", options.heights.source, "Vertical datum of the stored heights")
        ->transform(datums);
    app.add_option("--output", options.output, "Vertical datum of the answers; else as --source")
        ->transform(datums);
    app.add_option("--offset", options.heights.offset,
                   "A stored height h counts as (h + offset) * scale");
    app.add_option("--scale", options.heights.scale, "See --offset");
    app.add_option("--window", options.window, "xmin,ymin,xmax,ymax: load what meets this box")
        ->delimiter(',')
        ->expected(4);
    app.add_option("--at", options.positions, "x,y in map coordinates; can be repeated")
        ->delimiter(',');
    app.add_flag("--stdin", options.readStdin, "Read positions from a CSV with columns x and y");
}

/// A byte count for printf, which has no format for std::uint64_t.
using Bytes = unsigned long long;

/// The most memory that the process has held so far.
Bytes GetPeakBytes() {
    rusage usage{};
    getrusage(RUSAGE_SELF, &usage);
    return static_cast<Bytes>(usage.ru_maxrss) * 1024;
}

void PrintLayer(const TinReader& reader, const OGRSpatialReference& crs) {
    const BBox<double, point3_t<double>>& box = reader.GetBBox();
    const auto shapes = static_cast<unsigned>(reader.GetShapeCount());
    std::fprintf(stderr, "%u shapes, CRS %s\n", shapes, crs.IsEmpty() ? "none" : crs.GetName());
    std::fprintf(stderr, "x %.3f to %.3f, y %.3f to %.3f, area %.0f, heights %.3f to %.3f\n",
                 box.min.x, box.max.x, box.min.y, box.max.y, reader.GetArea(), box.min.z,
                 box.max.z);
    std::fprintf(stderr, "expected bytes: load %zu, surface %zu, index %llu\n",
                 reader.EstimateLoadBytes(), reader.EstimateObjBytes_Tin(),
                 Bytes{HeightGrid::EstimateObjBytes(shapes)});
}

std::unique_ptr<Tin> Load(TinReader& reader, const std::vector<double>& sides) {
    BBox<double, point2_t<double>> window;
    if (!sides.empty()) {
        window.min = {sides[0], sides[1]};
        window.max = {sides[2], sides[3]};
    }
    return LoadTerrain(reader, sides.empty() ? nullptr : &window);
}

void PrintHeights(const HeightGrid& index, const std::vector<point2_t<double>>& positions) {
    std::vector<float> heights(positions.size());
    index.GetHeights(positions.data(), positions.size(), heights.data());
    for (const float height : heights)
        if (std::isnan(height))
            std::puts("off the surface");
        else
            std::printf("%.3f\n", static_cast<double>(height));
}

/// @throw std::runtime_error for a text that is no number
double GetNumber(const OGRFeature& row, const char* column) {
    const char* text = row.GetFieldAsString(column);
    if (CPLGetValueType(text) == CPL_VALUE_STRING)
        throw std::runtime_error("standard input, position " + std::to_string(row.GetFID()) + ": " +
                                 column + " is no number: \"" + text + "\"");
    return CPLAtof(text);
}

void PrintHeightsOfStdin(const HeightGrid& index) {
    const GDALDatasetUniquePtr csv(GDALDataset::Open("CSV:/vsistdin/", GDAL_OF_VECTOR));
    OGRLayer* layer = csv ? csv->GetLayer(0) : nullptr;
    if (!layer || layer->GetLayerDefn()->GetFieldIndex("x") < 0 ||
        layer->GetLayerDefn()->GetFieldIndex("y") < 0)
        throw std::runtime_error("standard input is no CSV with the columns x and y");
    std::vector<point2_t<double>> positions;
    for (const OGRFeatureUniquePtr& row : *layer)
        positions.push_back({GetNumber(*row, "x"), GetNumber(*row, "y")});
    PrintHeights(index, positions);
}

void Run(const Layer& layer, const Options& options) {
    if (options.positions.size() % 2 != 0)
        throw CLI::ValidationError("--at", "a position is a pair x,y");
    const std::unique_ptr<TinReader> reader = OpenTerrain(layer, options.heights);
    reader->SetOutputVerticalDatum(options.output.value_or(options.heights.source));
    PrintLayer(*reader, ReadCrs(layer));

    const Bytes before = GetPeakBytes();
    const std::unique_ptr<Tin> surface = Load(*reader, options.window);
    const Bytes load = GetPeakBytes() - before;
    const HeightGrid index(*surface);
    std::fprintf(stderr, "%u vertices, %u triangles\n", surface->GetVertexCount(),
                 surface->GetTriangleCount());
    std::fprintf(stderr, "measured bytes: load %llu, surface %llu, index %llu\n", load,
                 Bytes{surface->GetObjBytes()}, Bytes{index.GetObjBytes()});

    std::vector<point2_t<double>> positions;
    for (std::size_t i = 0; i < options.positions.size(); i += 2)
        positions.push_back({options.positions[i], options.positions[i + 1]});
    PrintHeights(index, positions);
    if (options.readStdin)
        PrintHeightsOfStdin(index);
}

} // namespace

int main(int argc, char** argv) {
    Layer layer;
    Options options;
    CLI::App app(
        "Heights of a terrain at map positions, a line each, in the unit of the layer times the "
        "scale. The vertical datum of the layer is \"other\" unless --source names it.",
        "terrain_heights");
    AddLayerOptions(app, layer);
    DefineOptions(app, options);
    return RunCommand(app, argc, argv, [&] { Run(layer, options); });
}

#include <tin/tinreader.h>
#include <tin/tinreaderfactory.h>

#include <algorithm>
#include <cstdio>
#include <exception>
#include <memory>
#include <vector>

using namespace kelm::tin;

namespace {

constexpr double CELL = 2000.0;   // side of a cell in metres
constexpr double LEFT = 738000.0; // western side of the first column
constexpr double TOP = 4060000.0; // northern side of the first row
constexpr int COLS = 8;
constexpr int ROWS = 8;
constexpr float NO_DATA = -9999.0f;

/// The same triangles in grid coordinates: x counts columns and y counts rows. The centre of a cell
/// has whole coordinates.
std::unique_ptr<Tin> MoveToGrid(const Tin& terrain) {
    double xBase;
    double yBase;
    terrain.GetXYBase(xBase, yBase);
    auto vertices = std::make_unique<point3_t<float>[]>(terrain.GetVertexCount());
    for (unsigned i = 0; i < terrain.GetVertexCount(); ++i) {
        const point3_t<float>& v = *terrain.GetVertex(i);
        const double col = (xBase + static_cast<double>(v.x) - LEFT) / CELL - 0.5;
        const double row = (TOP - yBase - static_cast<double>(v.y)) / CELL - 0.5;
        vertices[i] = {static_cast<float>(col), static_cast<float>(row), v.z};
    }
    auto ids = std::make_unique<Triangle_Id[]>(terrain.GetTriangleCount());
    const point3_t<float>* first = terrain.GetVertex(0);
    for (unsigned i = 0; i < terrain.GetTriangleCount(); ++i) {
        const Triangle& t = *terrain.GetTriangle(i);
        ids[i] = {static_cast<unsigned>(t.GetVertex(0) - first),
                  static_cast<unsigned>(t.GetVertex(1) - first),
                  static_cast<unsigned>(t.GetVertex(2) - first)};
    }
    return std::make_unique<Tin>(vertices.release(), terrain.GetVertexCount(), ids.release(),
                                 terrain.GetTriangleCount(), 0.0, 0.0);
}

std::vector<float> MakeRaster(const Tin& sheet) {
    std::vector<float> raster(COLS * ROWS, NO_DATA);
    std::vector<int> cells; // column and row of each cell, in turn
    std::vector<float> heights;
    for (unsigned i = 0; i < sheet.GetTriangleCount(); ++i)
        sheet.GetTriangle(i)->GetGridPoints(COLS, ROWS, cells, heights);
    for (std::size_t i = 0; i < heights.size(); ++i) {
        float& cell = raster[static_cast<std::size_t>(cells[2 * i + 1] * COLS + cells[2 * i])];
        cell = std::max(cell, heights[i]);
    }
    return raster;
}

} // namespace

int main(int argc, char** argv) {
    try {
        const std::unique_ptr<TinReader> reader(TinReaderFactory::CreateTinReader(
            argc > 1 ? argv[1] : "", 0, 0.0, 1.0, kelm::ogc::cs::VD_Other));
        const std::unique_ptr<Tin> terrain(reader->Load(nullptr));
        const std::vector<float> raster = MakeRaster(*MoveToGrid(*terrain));
        for (std::size_t i = 0; i < raster.size(); ++i)
            std::printf("%9.2f%s", static_cast<double>(raster[i]), (i + 1) % COLS ? "" : "\n");
    } catch (const std::exception& failure) {
        std::fprintf(stderr, "%s\n", failure.what());
        return 1;
    }
    return 0;
}

// Answers of the C++ interface, for a comparison with those of the package:
//
//     answers FILE POSITIONS SEGMENTS RASTER > ANSWERS
//
// POSITIONS and SEGMENTS hold `double` coordinates, two and six a query; RASTER is the side of the
// cells, from the north-western corner of the surface's box on, 64 by 64. ANSWERS gets a `float`
// for each query and each cell: of positions, of segments, of the raster.

#include <tin/aabbtree.h>
#include <tin/raster.h>
#include <tin/tinreader.h>
#include <tin/tinreaderfactory.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <iterator>
#include <limits>
#include <memory>
#include <vector>

using namespace kelm::tin;

namespace {

template <typename T>
std::vector<T> ReadAll(const char* name) {
    std::ifstream file(name, std::ios::binary);
    const std::vector<char> bytes(std::istreambuf_iterator<char>(file), {});
    std::vector<T> values(bytes.size() / sizeof(T));
    std::copy_n(bytes.data(), values.size() * sizeof(T), reinterpret_cast<char*>(values.data()));
    return values;
}

void Write(const std::vector<float>& values) {
    std::fwrite(values.data(), sizeof(float), values.size(), stdout);
}

} // namespace

int main(int, char** arguments) {
    const std::unique_ptr<TinReader> reader(
        TinReaderFactory::CreateTinReader(arguments[1], 0, 0.0, 1.0, kelm::ogc::cs::VD_Other));
    const std::unique_ptr<Tin> surface(reader->Load(nullptr));
    const AabbTree tree(surface.get());
    const auto ask = [&](const auto& queries, auto find) {
        std::vector<float> heights;
        for (const auto& query : queries) {
            float h;
            heights.push_back(find(query, h) ? h : std::numeric_limits<float>::quiet_NaN());
        }
        Write(heights);
    };
    struct Segment {
        point3_t<double> a;
        point3_t<double> b;
    };
    ask(ReadAll<point2_t<double>>(arguments[2]),
        [&](const auto& p, float& h) { return surface->GetHeight(p.x, p.y, h, &tree); });
    ask(ReadAll<Segment>(arguments[3]), [&](const Segment& s, float& h) {
        return surface->GetLineIntersectHeight(s.a, s.b, h, nullptr);
    });
    BBox<double, point3_t<double>> box;
    surface->GetRawBBox(box);
    const double side = std::atof(arguments[4]);
    std::vector<float> cells(std::size_t{64} * 64);
    RasterizeHeights(*surface, {64, 64, {box.min.x, side, 0.0, box.max.y, 0.0, -side}},
                     cells.data());
    Write(cells);
}

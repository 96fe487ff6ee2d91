#include <tin/aabbtree.h>
#include <tin/tinreader.h>
#include <tin/tinreaderfactory.h>

#include <cstdio>
#include <exception>
#include <memory>

using namespace kelm::tin;

namespace {

void Print(const char* what, const Tin* subset) {
    if (subset)
        std::printf("%-24s %5u triangles, %5u vertices\n", what, subset->GetTriangleCount(),
                    subset->GetVertexCount());
    else
        std::printf("%-24s nothing\n", what);
}

} // namespace

int main(int argc, char** argv) {
    try {
        const std::unique_ptr<TinReader> reader(TinReaderFactory::CreateTinReader(
            argc > 1 ? argv[1] : "", 0, 0.0, 1.0, kelm::ogc::cs::VD_Other));
        const std::unique_ptr<Tin> terrain(reader->Load(nullptr));
        const AabbTree tree(terrain.get());

        // A subset is a new surface. It shares nothing with the terrain; the caller deletes it.
        BBox<double, point2_t<double>> region;
        region.min = {744000.0, 4051000.0};
        region.max = {746000.0, 4053000.0};
        const std::unique_ptr<Tin> exact(terrain->SubsetByRegion(region, nullptr));
        Print("region, exact", exact.get());
        const std::unique_ptr<Tin> quick(terrain->SubsetByRegion(region, &tree));
        Print("region, by whole leaves", quick.get());

        const point2_t<double> route[] = {
            {741000.0, 4048000.0}, {745000.0, 4052000.0}, {745000.0, 4056000.0}};
        const std::unique_ptr<Tin> strip(terrain->SubsetByLineString(route, 3, &tree));
        Print("along a route", strip.get());

        region.min.x += 100000.0;
        region.max.x += 100000.0;
        const std::unique_ptr<Tin> none(terrain->SubsetByRegion(region, nullptr));
        Print("a region far away", none.get());
    } catch (const std::exception& failure) {
        std::fprintf(stderr, "%s\n", failure.what());
        return 1;
    }
    return 0;
}

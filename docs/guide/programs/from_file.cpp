#include <tin/aabbtree.h>
#include <tin/tinreader.h>
#include <tin/tinreaderfactory.h>

#include <cstdio>
#include <exception>
#include <memory>

using namespace kelm::tin;

int main(int argc, char** argv) {
    try {
        // Layer 0 is the first layer that holds polygons. Offset 0 and scale 1 keep heights as they
        // are stored. Heights of VD_Other are never converted.
        const std::unique_ptr<TinReader> reader(TinReaderFactory::CreateTinReader(
            argc > 1 ? argv[1] : "", 0, 0.0, 1.0, kelm::ogc::cs::VD_Other));
        const auto& extents = reader->GetBBox();
        std::printf("%d shapes, x %.0f to %.0f, y %.0f to %.0f\n", reader->GetShapeCount(),
                    extents.min.x, extents.max.x, extents.min.y, extents.max.y);

        const std::unique_ptr<Tin> terrain(reader->Load(nullptr));
        if (!terrain) {
            std::puts("no polygon gave a triangle");
            return 1;
        }
        const AabbTree tree(terrain.get());
        float height;
        if (terrain->GetHeight(745000.0, 4052000.0, height, &tree))
            std::printf("%.3f m at 745000, 4052000\n", static_cast<double>(height));

        // Each polygon that meets the window is loaded whole, so the surface reaches beyond it.
        BBox<double, point2_t<double>> window;
        window.min = {744000.0, 4051000.0};
        window.max = {746000.0, 4053000.0};
        const std::unique_ptr<Tin> part(reader->Load(&window));
        std::printf("%u triangles in all, %u in the window\n", terrain->GetTriangleCount(),
                    part ? part->GetTriangleCount() : 0);
    } catch (const std::exception& failure) {
        std::fprintf(stderr, "%s\n", failure.what());
        return 1;
    }
    return 0;
}

#include <tin/aabbtree.h>
#include <tin/tinreader.h>
#include <tin/tinreaderfactory.h>

#include <cstdio>
#include <exception>
#include <memory>

using namespace kelm::tin;

namespace {

void PrintSight(const Tin& terrain, const AabbTree& tree, const point3_t<double>& eye,
                const point3_t<double>& target) {
    float height;
    if (terrain.GetLineIntersectHeight(eye, target, height, &tree))
        std::printf("to %.0f m: meets the ground, at its highest at %.3f m\n", target.z,
                    static_cast<double>(height));
    else
        std::printf("to %.0f m: clear\n", target.z);
}

void PrintProfile(const Tin& terrain, const AabbTree& tree, const point3_t<double>& a,
                  const point3_t<double>& b) {
    for (int i = 0; i <= 4; ++i) {
        const double t = i / 4.0;
        const double x = a.x + t * (b.x - a.x);
        const double y = a.y + t * (b.y - a.y);
        float height;
        if (terrain.GetHeight(x, y, height, &tree))
            std::printf("%.0f, %.0f: %.3f m\n", x, y, static_cast<double>(height));
        else
            std::printf("%.0f, %.0f: no surface\n", x, y);
    }
}

} // namespace

int main(int argc, char** argv) {
    try {
        const std::unique_ptr<TinReader> reader(TinReaderFactory::CreateTinReader(
            argc > 1 ? argv[1] : "", 0, 0.0, 1.0, kelm::ogc::cs::VD_Other));
        const std::unique_ptr<Tin> terrain(reader->Load(nullptr));
        const AabbTree tree(terrain.get());

        const point3_t<double> eye{741000.0, 4048000.0, 860.0};
        PrintSight(*terrain, tree, eye, {750000.0, 4056000.0, 500.0});
        PrintSight(*terrain, tree, eye, {750000.0, 4056000.0, 1500.0});
        PrintProfile(*terrain, tree, eye, {750000.0, 4056000.0, 0.0});
    } catch (const std::exception& failure) {
        std::fprintf(stderr, "%s\n", failure.what());
        return 1;
    }
    return 0;
}

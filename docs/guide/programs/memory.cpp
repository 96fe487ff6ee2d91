#include <tin/aabbtree.h>
#include <tin/tinreader.h>
#include <tin/tinreaderfactory.h>

#include <cstdio>
#include <exception>
#include <memory>

using namespace kelm::tin;

int main(int argc, char** argv) {
    try {
        const std::unique_ptr<TinReader> reader(TinReaderFactory::CreateTinReader(
            argc > 1 ? argv[1] : "", 0, 0.0, 1.0, kelm::ogc::cs::VD_Other));
        const auto shapes = static_cast<unsigned>(reader->GetShapeCount());
        std::printf("expected: load %zu, surface %zu, index %llu bytes\n",
                    reader->EstimateLoadBytes(), reader->EstimateObjBytes_Tin(),
                    static_cast<unsigned long long>(EstimateAabbTreeBytes(shapes)));
        if (reader->EstimateLoadBytes() > 64u * 1024 * 1024) {
            std::puts("too large: load it window by window");
            return 1;
        }

        const std::unique_ptr<Tin> terrain(reader->Load(nullptr));
        const AabbTree tree(terrain.get());
        std::printf("held: surface %llu, index %llu bytes\n",
                    static_cast<unsigned long long>(terrain->GetObjBytes()),
                    static_cast<unsigned long long>(tree.GetObjBytes()));
    } catch (const std::exception& failure) {
        std::fprintf(stderr, "%s\n", failure.what());
        return 1;
    }
    return 0;
}

#include <services/exception.h>
#include <tin/aabbtree.h>
#include <tin/tinreader.h>
#include <tin/tinreaderfactory.h>

#include <cstdio>
#include <exception>
#include <memory>

using namespace kelm::ogc::cs;
using namespace kelm::tin;

namespace {

float GetHeight(TinReader& reader, DatumType datum) {
    reader.SetOutputVerticalDatum(datum); // for all later loads
    const std::unique_ptr<Tin> terrain(reader.Load(nullptr));
    const AabbTree tree(terrain.get());
    float height = 0.0f;
    terrain->GetHeight(745000.0, 4052000.0, height, &tree);
    return height;
}

} // namespace

int main(int argc, char** argv) {
    try {
        const char* file = argc > 1 ? argv[1] : "";
        const std::unique_ptr<TinReader> reader(
            TinReaderFactory::CreateTinReader(file, 0, 0.0, 1.0, VD_Orthometric));
        std::printf("above the geoid:     %.2f m\n",
                    static_cast<double>(GetHeight(*reader, VD_Orthometric)));
        std::printf("above the ellipsoid: %.2f m\n",
                    static_cast<double>(GetHeight(*reader, VD_Ellipsoidal)));

        // A stored height counts as (height + offset) * scale. Here that turns metres into feet.
        const std::unique_ptr<TinReader> feet(
            TinReaderFactory::CreateTinReader(file, 0, 0.0, 1.0 / 0.3048, VD_Other));
        std::printf("in feet:             %.2f ft\n",
                    static_cast<double>(GetHeight(*feet, VD_Other)));

        // Heights of no known reference are never converted.
        feet->SetOutputVerticalDatum(VD_Ellipsoidal);
    } catch (const kelm::ParameterException& failure) {
        std::printf("refused (%s): %s\n", failure.GetParameter().c_str(), failure.what());
    } catch (const std::exception& failure) {
        std::fprintf(stderr, "%s\n", failure.what());
        return 1;
    }
    return 0;
}

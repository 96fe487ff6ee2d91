#include <tin/heightgrid.h>
#include <tin/tinreader.h>
#include <tin/tinreaderfactory.h>

#include <cmath>
#include <cstdio>
#include <exception>
#include <memory>
#include <vector>

using namespace kelm::tin;

int main(int argc, char** argv) {
    try {
        const std::unique_ptr<TinReader> reader(TinReaderFactory::CreateTinReader(
            argc > 1 ? argv[1] : "", 0, 0.0, 1.0, kelm::ogc::cs::VD_Other));
        const std::unique_ptr<Tin> terrain(reader->Load(nullptr));
        const HeightGrid index(*terrain); // has copies of all it needs; the terrain may go

        std::vector<point2_t<double>> positions;
        for (int i = 0; i < 1000000; ++i)
            positions.push_back({740000.0 + 0.012 * i, 4047000.0 + 0.011 * i});
        std::vector<float> heights(positions.size());
        const std::size_t found =
            index.GetHeights(positions.data(), positions.size(), heights.data());

        float highest = 0.0f;
        for (const float height : heights)
            highest = std::fmax(highest, height); // passes over NaN, which marks a miss
        std::printf("%zu of %zu positions have a height, the highest is %.3f m\n", found,
                    positions.size(), static_cast<double>(highest));
    } catch (const std::exception& failure) {
        std::fprintf(stderr, "%s\n", failure.what());
        return 1;
    }
    return 0;
}

#include <tin/raster.h>
#include <tin/tinreader.h>
#include <tin/tinreaderfactory.h>

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

        // Eight columns and rows of 2000 m, from the north-western corner on.
        const RasterFrame frame{8, 8, {738000.0, 2000.0, 0.0, 4060000.0, 0.0, -2000.0}};
        std::vector<float> cells(std::size_t{frame.nColumns} * frame.nRows);
        RasterizeHeights(*terrain, frame, cells.data());

        for (std::size_t i = 0; i < cells.size(); ++i)
            std::printf("%9.2f%s", static_cast<double>(cells[i]),
                        (i + 1) % frame.nColumns ? "" : "\n");
    } catch (const std::exception& failure) {
        std::fprintf(stderr, "%s\n", failure.what());
        return 1;
    }
    return 0;
}

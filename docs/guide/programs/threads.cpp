#include <tin/aabbtree.h>
#include <tin/tinreader.h>
#include <tin/tinreaderfactory.h>

#include <cstdio>
#include <exception>
#include <memory>
#include <thread>
#include <vector>

using namespace kelm::tin;

namespace {

/// Counts the positions with a height in the rows first, first + n and so on of a raster.
void CountRows(const Tin& terrain, const AabbTree& tree, int first, int n, unsigned& found) {
    for (int row = first; row < 1000; row += n)
        for (int col = 0; col < 1000; ++col) {
            float height;
            found +=
                terrain.GetHeight(740000.0 + 10.0 * col, 4047000.0 + 10.0 * row, height, &tree);
        }
}

} // namespace

int main(int argc, char** argv) {
    try {
        const std::unique_ptr<TinReader> reader(TinReaderFactory::CreateTinReader(
            argc > 1 ? argv[1] : "", 0, 0.0, 1.0, kelm::ogc::cs::VD_Other));
        const std::unique_ptr<Tin> terrain(reader->Load(nullptr));
        const AabbTree tree(terrain.get());

        // All threads share one surface and one index, since queries only read.
        constexpr int THREADS = 4;
        std::vector<unsigned> found(THREADS);
        std::vector<std::thread> threads;
        for (int i = 0; i < THREADS; ++i)
            threads.emplace_back([&, i] {
                CountRows(*terrain, tree, i, THREADS, found[static_cast<std::size_t>(i)]);
            });
        for (std::thread& thread : threads)
            thread.join();
        std::printf("%u of 1000000 positions have a height\n",
                    found[0] + found[1] + found[2] + found[3]);
    } catch (const std::exception& failure) {
        std::fprintf(stderr, "%s\n", failure.what());
        return 1;
    }
    return 0;
}

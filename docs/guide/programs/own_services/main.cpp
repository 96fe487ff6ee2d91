#include <tin/tinreader.h>
#include <tin/tinreaderfactory.h>

#include <cstdio>
#include <exception>
#include <memory>

using namespace kelm::tin;

int main() {
    for (const char* name : {"memory", "no such place"}) {
        try {
            const std::unique_ptr<TinReader> reader(
                TinReaderFactory::CreateTinReader(name, 0, 0.0, 1.0, kelm::ogc::cs::VD_Other));
            const std::unique_ptr<Tin> terrain(reader->Load(nullptr));
            float height;
            if (terrain->GetHeight(75.0, 25.0, height, nullptr))
                std::printf("%.1f m\n", static_cast<double>(height));
        } catch (const std::exception& failure) {
            std::printf("%s\n", failure.what());
        }
    }
    return 0;
}

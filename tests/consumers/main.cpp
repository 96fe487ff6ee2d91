// A program of somebody else: it sees every public header, some through others, under that
// program's warnings, loads the terrain named on its command line and prints a height.

#include <services/exception.h>
#include <services/interpgrid3d.h>
#include <services/reporting.h>
#include <services/vectorlayer.h>
#include <tin/aabbtree.h>
#include <tin/octree2.h>
#include <tin/ray2.h>
#include <tin/tinreader.h>
#include <tin/tinreaderfactory.h>
#include <tin/triangulate.h>
#include <tin/vector3.h>

#include <cstdio>
#include <memory>

using namespace kelm::tin;

static void PrintHeight(const char* file) {
    const std::unique_ptr<TinReader> reader(
        TinReaderFactory::CreateTinReader(file, 0, 0.0, 1.0, kelm::ogc::cs::VD_Other));
    const std::unique_ptr<Tin> terrain(reader->Load(nullptr));
    const AabbTree tree(terrain.get());
    float height;
    if (!terrain->GetHeight(745000.0, 4052000.0, height, &tree))
        throw kelm::DataException("no surface there", "main", "PrintHeight", 0);
    std::printf("%.3f m\n", static_cast<double>(height));
}

int main(int argc, char** argv) {
    // An exception of the library has to be caught by its class, across the shared object's border.
    try {
        PrintHeight("no such file");
    } catch (const kelm::DataException&) {
        PrintHeight(argc > 1 ? argv[1] : "");
        return 0;
    }
    return 1;
}

// The bytes of a file, in memory, through the store and the reader: a surface, null or a documented
// exception. The first byte chooses the format.

#include "fuzz/bytes.h"
#include "services/bundled/store/files/opendataset.h"
#include "services/bundled/store/landxml/landxmlfile.h"
#include "services/bundled/store/storefile.h"
#include "services/exception.h"
#include "services/vectorlayer.h"
#include "tin/tinreader.h"

#include <cpl_vsi.h>

#include <memory>
#include <sstream>
#include <string>

namespace {

constexpr const char* FOLDER = "/vsimem/fuzz";

void Write(const std::string& name, const std::uint8_t* data, std::size_t size) {
    auto* bytes = const_cast<GByte*>(data);
    if (VSILFILE* file = VSIFileFromMemBuffer(name.c_str(), bytes, size, FALSE))
        VSIFCloseL(file);
}

/// Formats of several files: each is an id of one byte, a length of two, and its bytes.
template <typename Name>
void WriteParts(fuzz::Bytes& rBytes, const Name& getName) {
    while (!rBytes.IsEmpty()) {
        const unsigned id = rBytes.Take<std::uint8_t>();
        const std::size_t length = rBytes.Take<std::uint16_t>();
        const std::uint8_t* from = nullptr;
        const std::size_t taken = rBytes.Skip(length, from);
        Write(getName(id), from, taken);
    }
}

/// @return the name to open
std::string WriteFile(fuzz::Bytes& rBytes, unsigned format) {
    static const char* const ENDINGS[] = {"gpkg", "fgb",    "geojson", "gml",
                                          "dxf",  "sqlite", "shp",     "gdb"};
    static const char* const SHAPE_PARTS[] = {".shp", ".shx", ".dbf", ".prj"};
    std::string name = std::string(FOLDER) + "/input." + ENDINGS[format];
    if (format == 6)
        WriteParts(rBytes, [](unsigned id) {
            return std::string(FOLDER) + "/input" + SHAPE_PARTS[id % 4];
        });
    else if (format == 7)
        WriteParts(rBytes, [&](unsigned id) {
            const std::string number = std::to_string(id / 4 % 10);
            const char* const endings[] = {".gdbtable", ".gdbtablx", ".gdbindexes", ".spx"};
            return name + "/a0000000" + number + endings[id % 4];
        });
    else
        Write(name, rBytes.GetNext(), rBytes.GetSize());
    return name;
}

/// LandXML is read from a stream, without GDAL.
std::unique_ptr<_iobuf> Open(fuzz::Bytes& rBytes) {
    using namespace kelm::store;
    const unsigned format = rBytes.TakeFrom(0, 8);
    if (format < 8)
        return std::make_unique<StoreFile>(OpenDataset(WriteFile(rBytes, format), "input"));
    const auto* text = reinterpret_cast<const char*>(rBytes.GetNext());
    std::istringstream stream(std::string(text, rBytes.GetSize()));
    return std::make_unique<landxml::LandXmlFile>(stream, "input");
}

void Load(fuzz::Bytes& rBytes) {
    using namespace kelm;
    std::unique_ptr<_iobuf, decltype(&ZARClose)> file(Open(rBytes).release(), &ZARClose);
    ZARLayer_t* layer = ZARGetLayer(file.get(), 1);
    if (layer == nullptr || ZARGetLayerType(layer, 0) == 0)
        return;
    tin::TinReader reader(layer, 0.0, 2.0, ogc::cs::VD_Ellipsoidal);
    static_cast<void>(file.release());
    tin::BBox<double, point2_t<double>> window;
    window.max = {10.0, 10.0};
    for (const auto* wanted : {static_cast<decltype(&window)>(nullptr), &window}) {
        const std::unique_ptr<tin::Tin> surface(reader.Load(wanted));
        fuzz::Require(!surface || surface->GetTriangleCount() > 0);
    }
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::Bytes bytes(data, size);
    try {
        Load(bytes);
    } catch (const kelm::Exception& e) {
        fuzz::Require(e.what()[0] != '\0');
    }
    VSIRmdirRecursive(FOLDER);
    return 0;
}

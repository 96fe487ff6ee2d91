// The bytes of a file, in memory, through the store and the reader: a surface, null or a documented
// exception. Or those of a geometry of a GeoPackage, which GDAL must read alike if the store takes
// it. The first byte chooses the format.

#include "fuzz/bytes.h"
#include "services/bundled/store/features/geometrybytes.h"
#include "services/bundled/store/files/opendataset.h"
#include "services/bundled/store/landxml/landxmlfile.h"
#include "services/bundled/store/storefile.h"
#include "services/exception.h"
#include "services/vectorlayer.h"
#include "tin/tinreader.h"

#include <cpl_vsi.h>
#include <dlfcn.h>
#include <ogr_geometry.h>
#include <ogr_srs_api.h>

#include <array>
#include <memory>
#include <sstream>
#include <string>

namespace {

constexpr const char* FOLDER = "/vsimem/fuzz";

/// Formats behind those that GDAL reads.
constexpr unsigned LANDXML = 8;
constexpr unsigned GEOMETRY = 9;

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
std::unique_ptr<_iobuf> Open(fuzz::Bytes& rBytes, unsigned format) {
    using namespace kelm::store;
    if (format < LANDXML)
        return std::make_unique<StoreFile>(OpenDataset(WriteFile(rBytes, format), "input"));
    const auto* text = reinterpret_cast<const char*>(rBytes.GetNext());
    std::istringstream stream(std::string(text, rBytes.GetSize()));
    return std::make_unique<landxml::LandXmlFile>(stream, "input");
}

void Load(fuzz::Bytes& rBytes, unsigned format) {
    using namespace kelm;
    std::unique_ptr<_iobuf, decltype(&ZARClose)> file(Open(rBytes, format).release(), &ZARClose);
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

/// GDAL must read the same triangle from behind the header.
void TestGeometry(const std::uint8_t* bytes, std::size_t size) {
    std::array<ZARVertex, 4> vertices;
    bool isFlat = false;
    if (!kelm::store::ReadTriangleBytes(bytes, size, vertices, isFlat))
        return;
    const std::size_t behind = isFlat ? 13 + 4 * 16 : 13 + 4 * 24;
    OGRGeometry* read = nullptr;
    fuzz::Require(OGRGeometryFactory::createFromWkb(bytes + (size - behind), nullptr, &read,
                                                    behind) == OGRERR_NONE);
    const OGRGeometryUniquePtr geometry(read);
    fuzz::Require(wkbFlatten(geometry->getGeometryType()) == wkbPolygon &&
                  bool(geometry->Is3D()) != isFlat);
    const OGRLinearRing* ring = geometry->toPolygon()->getExteriorRing();
    fuzz::Require(ring != nullptr && ring->getNumPoints() == 4);
    for (int i = 0; i < 4; ++i) {
        const ZARVertex wanted{ring->getX(i), ring->getY(i), isFlat ? 0.0 : ring->getZ(i)};
        fuzz::Require(std::memcmp(&vertices.at(static_cast<unsigned>(i)), &wanted, sizeof wanted) ==
                      0);
    }
}

} // namespace

/// In place of GDAL's own: its list of all CRSs is always the same, and takes PROJ as long as a
/// hundred other inputs.
OSRCRSInfo** OSRGetCRSInfoListFromDatabase(const char* authority,
                                           const OSRCRSListParameters* parameters, int* count) {
    static int all = 0;
    static OSRCRSInfo** const list = [&] {
        void* own = dlsym(RTLD_NEXT, "OSRGetCRSInfoListFromDatabase");
        return reinterpret_cast<decltype(&OSRGetCRSInfoListFromDatabase)>(own)(authority,
                                                                               parameters, &all);
    }();
    *count = all;
    return list;
}
void OSRDestroyCRSInfoList(OSRCRSInfo** /*list*/) {}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::Bytes bytes(data, size);
    const unsigned format = bytes.TakeFrom(0, GEOMETRY);
    if (format == GEOMETRY) {
        TestGeometry(bytes.GetNext(), bytes.GetSize());
        return 0;
    }
    try {
        Load(bytes, format);
    } catch (const kelm::Exception& e) {
        fuzz::Require(e.what()[0] != '\0');
    }
    VSIRmdirRecursive(FOLDER);
    return 0;
}

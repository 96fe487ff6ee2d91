// A layer of triangles in memory, opened by a survey that may have been altered, and walked by
// windows. An unaltered survey must give what a walk over the whole layer gives.

#include "fuzz/bytes.h"
#include "services/bundled/store/files/formats.h"
#include "services/bundled/store/files/opendataset.h"
#include "services/bundled/store/runs/bytes.h"
#include "services/bundled/store/storefile.h"
#include "services/exception.h"
#include "services/vectorlayer.h"

#include <gdal_priv.h>
#include <ogrsf_frmts.h>

#include <algorithm>
#include <array>
#include <memory>
#include <string>
#include <vector>

namespace {

using kelm::store::ByteReader;
using kelm::store::ByteWriter;
using Ring = std::vector<double>;
using Shapes = std::vector<std::pair<int, Ring>>;
using File = std::unique_ptr<_iobuf, decltype(&ZARClose)>;

constexpr const char* FOLDER = "/vsimem/window";

/// Small whole numbers, so that boxes and windows touch.
double TakeNumber(fuzz::Bytes& rBytes) {
    return rBytes.Take<std::int8_t>() / 8;
}

using Triangle = std::array<double, 6>;
struct Layer {
    unsigned format = ~0U;
    std::vector<Triangle> triangles;
    bool operator==(const Layer& other) const {
        return format == other.format && triangles == other.triangles;
    }
};
constexpr const char* DRIVERS[] = {"FlatGeobuf", "ESRI Shapefile", "GPKG"};
constexpr const char* ENDINGS[] = {"fgb", "shp", "gpkg"};
constexpr unsigned GEOPACKAGE = 2;

Layer TakeLayer(fuzz::Bytes& rBytes) {
    const unsigned kind = rBytes.TakeFrom(0, 15);
    Layer layer;
    layer.format = kind == 15 ? GEOPACKAGE : kind % 2;
    layer.triangles.resize(rBytes.TakeFrom(1, 60));
    for (Triangle& triangle : layer.triangles)
        for (double& v : triangle)
            v = TakeNumber(rBytes);
    return layer;
}

std::string GetName(unsigned format) {
    return std::string(FOLDER) + "/a." + ENDINGS[format];
}

GDALDatasetUniquePtr CreateFile(unsigned format) {
    GDALDriver* driver = GetGDALDriverManager()->GetDriverByName(DRIVERS[format]);
    GDALDatasetUniquePtr file(
        driver->Create(GetName(format).c_str(), 0, 0, 0, GDT_Unknown, nullptr));
    const char* const options[] = {"SPATIAL_INDEX=NO", nullptr};
    file->CreateLayer("a", nullptr, wkbPolygon25D,
                      const_cast<char**>(format == GEOPACKAGE ? options : nullptr));
    return file;
}

/// The tables of an empty GeoPackage take far longer to make than to copy.
GDALDatasetUniquePtr CreateGeoPackage() {
    static const std::vector<GByte> empty = [] {
        CreateFile(GEOPACKAGE).reset();
        vsi_l_offset size = 0;
        const GByte* bytes = VSIGetMemFileBuffer(GetName(GEOPACKAGE).c_str(), &size, FALSE);
        return std::vector<GByte>(bytes, bytes + size);
    }();
    const std::string name = GetName(GEOPACKAGE);
    VSILFILE* file = VSIFOpenL(name.c_str(), "wb");
    VSIFWriteL(empty.data(), 1, empty.size(), file);
    VSIFCloseL(file);
    return GDALDatasetUniquePtr(
        GDALDataset::Open(name.c_str(), GDAL_OF_VECTOR | GDAL_OF_UPDATE, nullptr));
}

void AddFeature(OGRLayer& rLayer, const Triangle& triangle) {
    auto ring = std::make_unique<OGRLinearRing>();
    for (std::size_t i = 0; i < triangle.size(); i += 2)
        ring->addPoint(triangle.at(i), triangle.at(i + 1), static_cast<double>(i / 2));
    ring->closeRings();
    auto polygon = std::make_unique<OGRPolygon>();
    polygon->addRingDirectly(ring.release());
    OGRFeature feature(rLayer.GetLayerDefn());
    feature.SetGeometryDirectly(polygon.release());
    fuzz::Require(rLayer.CreateFeature(&feature) == OGRERR_NONE);
}

void WriteLayer(const Layer& layer) {
    VSIRmdirRecursive(FOLDER);
    const GDALDatasetUniquePtr file =
        layer.format == GEOPACKAGE ? CreateGeoPackage() : CreateFile(layer.format);
    file->StartTransaction();
    for (const Triangle& triangle : layer.triangles)
        AddFeature(*file->GetLayer(0), triangle);
    file->CommitTransaction();
}

File Open(const std::string& name) {
    return {new kelm::store::StoreFile(kelm::store::OpenDataset(name, "input")), &ZARClose};
}

Shapes Walk(ZARLayer_t* layer) {
    Shapes shapes;
    for (int id = ZARGetNext(layer, -1); id != -1; id = ZARGetNext(layer, id))
        try {
            const ZARShape& shape = *ZARGetShapeRef(layer, id);
            shapes.emplace_back(id, Ring());
            for (int i = 0; i < shape.vertexCount; ++i)
                shapes.back().second.insert(shapes.back().second.end(),
                                            {shape.vertices[i].x, shape.vertices[i].y});
        } catch (const kelm::DataException&) {
            continue;
        }
    return shapes;
}

bool Meets(const Ring& ring, const ZARVertex& low, const ZARVertex& high) {
    double box[] = {ring[0], ring[1], ring[0], ring[1]};
    for (std::size_t i = 0; i < ring.size(); i += 2) {
        box[0] = std::min(box[0], ring[i]);
        box[1] = std::min(box[1], ring[i + 1]);
        box[2] = std::max(box[2], ring[i]);
        box[3] = std::max(box[3], ring[i + 1]);
    }
    return box[0] <= high.x && box[2] >= low.x && box[1] <= high.y && box[3] >= low.y;
}

/// Walks by windows. @param all the shapes of the layer; null if the survey may not be its own
void TestWindows(ZARLayer_t* layer, const Shapes* all, fuzz::Bytes& rBytes) {
    for (unsigned rest = rBytes.TakeFrom(1, 4); rest > 0; --rest) {
        const ZARVertex low{TakeNumber(rBytes), TakeNumber(rBytes), 0.0};
        const ZARVertex high{low.x + TakeNumber(rBytes), low.y + TakeNumber(rBytes), 0.0};
        ZARSetWindow(layer, &low, &high);
        const Shapes found = Walk(layer);
        if (all == nullptr)
            continue;
        fuzz::Require(std::includes(all->begin(), all->end(), found.begin(), found.end()));
        for (const auto& shape : *all)
            fuzz::Require(!Meets(shape.second, low, high) ||
                          std::binary_search(found.begin(), found.end(), shape));
    }
}

/// Alters the content of a survey and mends its checksum. @return is it still the same?
bool Alter(std::string& rSurvey, fuzz::Bytes& rBytes) {
    ByteReader reader(rSurvey);
    const std::string writer(reader.GetText());
    static_cast<void>(reader.Get<std::uint64_t>());
    std::string content(reader.GetText());
    const std::string before = content;
    for (unsigned rest = rBytes.TakeFrom(0, 6); rest > 0; --rest) {
        const std::size_t at = rBytes.Take<std::uint16_t>() % content.size();
        content[at] = static_cast<char>(rBytes.Take<std::uint8_t>());
    }
    ByteWriter framed;
    framed.Put(writer);
    framed.Put(kelm::store::ComputeChecksum(content));
    framed.Put(content);
    rSurvey = framed.GetBytes();
    return content == before;
}

/// A file that is written, and what a walk over its whole layer gives.
struct Written {
    Layer layer;
    Shapes all;
    std::string survey;
};

/// Many inputs alter the survey or the windows alone, so the last file stays for the next input.
const Written& GetWritten(Layer&& layer) {
    static Written written;
    if (written.layer == layer)
        return written;
    kelm::store::RegisterFormats();
    written = {};
    WriteLayer(layer);
    const File file = Open(GetName(layer.format));
    ZARLayer_t* opened = ZARGetLayer(file.get(), 1);
    written.all = Walk(opened);
    fuzz::Require(written.all.size() == layer.triangles.size());
    written.survey = ZARGetSurvey(opened);
    written.layer = std::move(layer);
    return written;
}

void Run(fuzz::Bytes& rBytes) {
    const Written& written = GetWritten(TakeLayer(rBytes));
    std::string survey = written.survey;
    const bool isOwn = Alter(survey, rBytes);
    const File file = Open(GetName(written.layer.format));
    const int segment = ZARSetSurvey(file.get(), survey);
    TestWindows(ZARGetLayer(file.get(), segment), isOwn ? &written.all : nullptr, rBytes);
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::Bytes bytes(data, size);
    try {
        Run(bytes);
    } catch (const kelm::DataException& e) {
        fuzz::Require(e.what()[0] != '\0');
    } catch (const std::bad_alloc&) { // an altered survey can tell of any number of features
    }
    return 0;
}

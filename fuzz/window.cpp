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

OGRGeometryUniquePtr TakeTriangle(fuzz::Bytes& rBytes) {
    auto* ring = new OGRLinearRing;
    for (int i = 0; i < 3; ++i)
        ring->addPoint(TakeNumber(rBytes), TakeNumber(rBytes), i);
    ring->closeRings();
    auto polygon = std::make_unique<OGRPolygon>();
    polygon->addRingDirectly(ring);
    return OGRGeometryUniquePtr(polygon.release());
}

/// @return the name of the file
std::string WriteLayer(fuzz::Bytes& rBytes) {
    const bool isShape = rBytes.TakeFrom(0, 1) == 1;
    std::string name = std::string(FOLDER) + (isShape ? "/a.shp" : "/a.fgb");
    GDALDriver* driver =
        GetGDALDriverManager()->GetDriverByName(isShape ? "ESRI Shapefile" : "FlatGeobuf");
    const GDALDatasetUniquePtr file(driver->Create(name.c_str(), 0, 0, 0, GDT_Unknown, nullptr));
    OGRLayer* layer = file->CreateLayer("a", nullptr, wkbPolygon25D, nullptr);
    for (unsigned rest = rBytes.TakeFrom(1, 60); rest > 0; --rest) {
        OGRFeature feature(layer->GetLayerDefn());
        feature.SetGeometryDirectly(TakeTriangle(rBytes).release());
        fuzz::Require(layer->CreateFeature(&feature) == OGRERR_NONE);
    }
    return name;
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

void Run(fuzz::Bytes& rBytes) {
    kelm::store::RegisterFormats();
    const std::string name = WriteLayer(rBytes);
    const File whole = Open(name);
    ZARLayer_t* layer = ZARGetLayer(whole.get(), 1);
    const Shapes all = Walk(layer);
    std::string survey = ZARGetSurvey(layer);
    const bool isOwn = Alter(survey, rBytes);
    const File file = Open(name);
    const int segment = ZARSetSurvey(file.get(), survey);
    TestWindows(ZARGetLayer(file.get(), segment), isOwn ? &all : nullptr, rBytes);
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
    VSIRmdirRecursive(FOLDER);
    return 0;
}

// Services of a host: one layer in memory instead of files, no coordinate reference systems, and a
// log on standard output.

#include <services/crs.h>
#include <services/exception.h>
#include <services/reporting.h>
#include <services/vectorlayer.h>

#include <cstdarg>
#include <cstdio>
#include <memory>
#include <string>
#include <vector>

using kelm::DataException;

namespace {

/// The library passes only the layer to some functions. They find the file behind it.
struct Layer : ZARLayer_t {
    _iobuf* file = nullptr;
};

} // namespace

struct _iobuf {
    std::vector<std::vector<ZARVertex>> rings; ///< each closed: its last vertex repeats the first
    Layer layer;
    ZARShape shape{};
};

_iobuf* ZAROpen(const char* name, const char*) {
    if (std::string(name) != "memory")
        throw DataException(std::string("no such terrain: ") + name, "services", "ZAROpen", 0);
    auto file = std::make_unique<_iobuf>();
    file->rings = {{{0, 0, 10}, {100, 0, 20}, {100, 100, 30}, {0, 0, 10}},
                   {{0, 0, 10}, {100, 100, 30}, {0, 100, 20}, {0, 0, 10}}};
    file->layer.shapeCount = static_cast<int>(file->rings.size());
    file->layer.shapeCountValid = 1;
    file->layer.file = file.get();
    return file.release();
}

void ZARClose(_iobuf* file) {
    delete file;
}

int ZARSegCount(_iobuf*, int) {
    return 1;
}

int ZARSegNext(_iobuf*, int, int after) {
    return after < 1 ? 1 : 0;
}

ZARLayer_t* ZARGetLayer(_iobuf* file, int segment) {
    return segment == 1 ? &file->layer : nullptr;
}

int ZARGetLayerType(ZARLayer_t*, int) {
    return 2; // polygons
}

int ZARGetProjectionInfo(ZARLayer_t*, ProjInfo_t* info) {
    info->definition.clear();
    return 0;
}

int ZARGetExtents(ZARLayer_t*, ZARVertex* low, ZARVertex* high) {
    *low = {0, 0, 10};
    *high = {100, 100, 30};
    return 0;
}

/// Shapes are numbered from 0.
int ZARGetNext(ZARLayer_t* layer, int id) {
    return id + 1 < layer->shapeCount ? id + 1 : -1;
}

_iobuf* ZARLayer2fp(ZARLayer_t* layer) {
    return static_cast<Layer*>(layer)->file;
}

ZARShape* ZARGetShapeRef(ZARLayer_t* layer, int id) {
    _iobuf& file = *ZARLayer2fp(layer);
    std::vector<ZARVertex>& ring = file.rings.at(static_cast<std::size_t>(id));
    file.shape = {ring.data(), static_cast<int>(ring.size())};
    return &file.shape;
}

namespace kelm::ogc {

cs::ICRS::~ICRS() = default;
ct::IMathTransform::~IMathTransform() = default;
IProjInfoFactory::~IProjInfoFactory() = default;

namespace {

/// A local CRS: heights are never converted.
class LocalCRS : public cs::ICRS {
  public:
    int GetDimension() const override { return 2; }
    cs::ICRS* GetHorizontalCRS() const override { return const_cast<LocalCRS*>(this); }
};

class NoTransform : public ct::IMathTransform {
  public:
    bool TransformPoints(const double*, double*, unsigned) override {
        throw DataException("heights are not converted here", "services", "TransformPoints", 0);
    }
};

class LocalFactory : public IProjInfoFactory {
  public:
    cs::ICRS* CreateCRS(ProjInfo_t*) override { return new LocalCRS; }
};

} // namespace

IProjInfoFactory* ProjectionEngine::GetProjInfoFactory(const PEType&) {
    static LocalFactory factory;
    return &factory;
}

bool utils::IsCRSLocal(const cs::ICRS*) {
    return true;
}

cs::ICRS* utils::CreateCompoundCS(cs::ICRS*, cs::DatumType, cs::LinearUnitType) {
    return new LocalCRS;
}

ct::IMathTransform* utils::CreateCRSTransform(const cs::ICRS*, const cs::ICRS*, double) {
    return new NoTransform;
}

} // namespace kelm::ogc

std::string FormatString(const char* format, ...) {
    va_list arguments;
    va_start(arguments, format);
    va_list measured;
    va_copy(measured, arguments);
    std::string text(static_cast<std::size_t>(std::vsnprintf(nullptr, 0, format, measured)), '\0');
    va_end(measured);
    std::vsnprintf(text.data(), text.size() + 1, format, arguments);
    va_end(arguments);
    return text;
}

void kelm::tellus::Warning::Warn(const std::string& text, const char*, unsigned) {
    std::printf("warning: %s\n", text.c_str());
}

void kelm::tellus::Report::AddInfo(const std::string& text) {
    std::printf("note: %s\n", text.c_str());
}

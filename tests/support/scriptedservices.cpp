#include "tests/support/scriptedservices.h"

#include "services/reporting.h"

#include <algorithm>
#include <cstdarg>
#include <cstdio>
#include <memory>
#include <mutex>

using namespace kelm::ogc;
using namespace scripted;

namespace {

std::unique_ptr<Script> poScript;
std::mutex oRecords;

template <typename T>
void Record(std::vector<T>& list, T entry) {
    const std::lock_guard<std::mutex> lock(oRecords);
    list.push_back(std::move(entry));
}

/// Books a call. @throw Failure if it is the one that the script lets fail
void Book(const char* name) {
    const std::lock_guard<std::mutex> lock(oRecords);
    poScript->calls.emplace_back(name);
    if (static_cast<int>(poScript->calls.size()) - 1 == poScript->failingCall)
        throw Failure();
}

/// A call of a service that may throw. @return what the service is to return
template <typename Answer>
auto Call(const char* name, const Answer& answer) {
    const Serving serving;
    Book(name);
    return answer();
}

struct CRS : cs::ICRS {
    explicit CRS(int dimension) : mnDimension(dimension) { ++poScript->objects; }
    ~CRS() override { --poScript->objects; }
    int GetDimension() const override {
        return Call("GetDimension", [this] { return mnDimension; });
    }
    ICRS* GetHorizontalCRS() const override { return const_cast<CRS*>(this); }
    int mnDimension;
};

struct Transform : ct::IMathTransform {
    Transform() { ++poScript->objects; }
    ~Transform() override { --poScript->objects; }
    bool TransformPoints(const double* source, double* target, unsigned int nCount) override {
        return Call("TransformPoints", [=] {
            const std::vector<double> triples(source, source + 3 * std::size_t{nCount});
            Record(poScript->sources, triples);
            std::copy(triples.begin(), triples.end(), target);
            for (unsigned i = 0; i < nCount; ++i)
                poScript->transform(target + 3 * std::size_t{i});
            return false;
        });
    }
};

struct Factory : IProjInfoFactory {
    cs::ICRS* CreateCRS(ProjInfo_t* poInfo) override {
        return Call("CreateCRS", [=] {
            const bool filled = poInfo->definition == "scripted";
            return poScript->hasCRS && filled ? new CRS(poScript->dimension) : nullptr;
        });
    }
};

} // namespace

Script& scripted::NewScript() {
    poScript = std::make_unique<Script>();
    return *poScript;
}

struct _iobuf {
    struct Layer : ZARLayer_t {
        _iobuf* file;
    } layer;
    std::vector<ZARVertex> ring; ///< of the shape handed out last: the next one takes its place
    ZARShape shape;
};

_iobuf* ZAROpen(const char*, const char*) {
    return Call("ZAROpen", [] {
        const int count = static_cast<int>(poScript->shapes.size());
        ++poScript->openFiles;
        auto* file = new _iobuf{};
        file->layer = {{poScript->recordedCount.value_or(count), poScript->isCountValid}, file};
        return file;
    });
}

void ZARClose(_iobuf* file) {
    delete file;
    --poScript->openFiles;
}

int ZARSegCount(_iobuf*, int) {
    return Call("ZARSegCount", [] { return poScript->segmentCount; });
}

int ZARSegNext(_iobuf*, int, int) {
    return Call("ZARSegNext", [] { return Script::FIRST_SEGMENT; });
}

ZARLayer_t* ZARGetLayer(_iobuf* file, int) {
    return Call("ZARGetLayer", [=] { return poScript->hasLayer ? &file->layer : nullptr; });
}

int ZARGetLayerType(ZARLayer_t*, int) {
    return Call("ZARGetLayerType", [] { return poScript->layerType; });
}

int ZARGetProjectionInfo(ZARLayer_t*, ProjInfo_t* info) {
    return Call("ZARGetProjectionInfo", [=] { return info->definition = "scripted", -1; });
}

int ZARGetExtents(ZARLayer_t*, ZARVertex* low, ZARVertex* high) {
    return Call("ZARGetExtents", [=] { return *low = poScript->low, *high = poScript->high, -1; });
}

int ZARGetNext(ZARLayer_t*, int id) {
    return Call("ZARGetNext", [=] {
        const int next = id == -1 ? Script::GetId(0) : id + Script::GetId(1) - Script::GetId(0);
        return next < Script::GetId(static_cast<int>(poScript->shapes.size())) ? next : -1;
    });
}

ZARShape* ZARGetShapeRef(ZARLayer_t* layer, int id) {
    return Call("ZARGetShapeRef", [=] {
        if (poScript->onShape)
            poScript->onShape();
        const int position = (id - Script::GetId(0)) / (Script::GetId(1) - Script::GetId(0));
        const Shape& shape = poScript->shapes.at(static_cast<std::size_t>(position));
        if (shape.state == Shape::Throws)
            throw Failure();
        _iobuf& file = *ZARLayer2fp(layer);
        file.ring = shape.ring;
        file.shape = {file.ring.data(), static_cast<int>(file.ring.size())};
        return shape.state == Shape::Null ? nullptr : &file.shape;
    });
}

_iobuf* ZARLayer2fp(ZARLayer_t* layer) {
    return static_cast<_iobuf::Layer*>(layer)->file;
}

cs::ICRS::~ICRS() = default;
ct::IMathTransform::~IMathTransform() = default;
IProjInfoFactory::~IProjInfoFactory() = default;

IProjInfoFactory* ProjectionEngine::GetProjInfoFactory(const PEType&) {
    static Factory factory;
    return &factory;
}

bool utils::IsCRSLocal(const cs::ICRS*) {
    return Call("IsCRSLocal", [] { return poScript->isLocal; });
}

cs::ICRS* utils::CreateCompoundCS(cs::ICRS*, cs::DatumType eDatum, cs::LinearUnitType) {
    return Call("CreateCompoundCS", [=] {
        Record(poScript->compounds, static_cast<int>(eDatum));
        return new CRS(3);
    });
}

ct::IMathTransform* utils::CreateCRSTransform(const cs::ICRS*, const cs::ICRS*, double) {
    return Call("CreateCRSTransform", [] { return new Transform; });
}

std::string FormatString(const char* pszFormat, ...) {
    char text[1024];
    va_list arguments;
    va_start(arguments, pszFormat);
    std::vsnprintf(text, sizeof text, pszFormat, arguments);
    va_end(arguments);
    return text;
}

void kelm::tellus::Warning::Warn(const std::string& text, const char* sourcePath, unsigned) {
    const Serving serving;
    Record(poScript->warnings, text + ' ' + sourcePath);
}

void kelm::tellus::Report::AddInfo(const std::string& text) {
    const Serving serving;
    Record(poScript->notes, text);
}

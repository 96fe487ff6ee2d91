#include "tests/support/scriptedservices.h"

#include "services/crs.h"

#include <new>

using namespace kelm::ogc;
using scripted::Script;

namespace {

/// Opens a function that may throw, with a request for a test of failed allocations to fail.
Script& Call() {
    ::operator delete(::operator new(1));
    return *Script::poCurrent;
}

struct CRS : cs::ICRS {
    CRS(int dimension, int datum) : mnDimension(dimension), mnDatum(datum) {}
    int GetDimension() const override { return Call(), mnDimension; }
    ICRS* GetHorizontalCRS() const override { return const_cast<CRS*>(this); }
    int mnDimension, mnDatum;
};

struct Transform : ct::IMathTransform {
    explicit Transform(int rise) : mnRise(rise) {}
    bool TransformPoints(const double* source, double* target, unsigned int nCount) override {
        Call();
        for (unsigned i = 0; i < nCount; ++i, source += 3, target += 3)
            target[2] = scripted::Convert(source[0], source[1], source[2], mnRise);
        return false;
    }
    int mnRise;
};

} // namespace

struct _iobuf : ZARLayer_t {
    ZARShape shape;
};

_iobuf* ZAROpen(const char*, const char*) {
    return new _iobuf{Call().record, {}};
}
void ZARClose(_iobuf* file) {
    delete file;
}
int ZARSegCount(_iobuf*, int) {
    return Call().segmentCount;
}
int ZARSegNext(_iobuf*, int, int) {
    return Call(), 3;
}
ZARLayer_t* ZARGetLayer(_iobuf* file, int) {
    return Call().hasLayer ? file : nullptr;
}
int ZARGetLayerType(ZARLayer_t*, int) {
    return Call().layerType;
}
int ZARGetProjectionInfo(ZARLayer_t*, ProjInfo_t*) {
    return Call(), -1;
}
int ZARGetExtents(ZARLayer_t*, ZARVertex* low, ZARVertex* high) {
    return Call(), *low = {-1e6, -1e6, -3}, *high = {1e6, 9e6, 9}, -1;
}
int ZARGetNext(ZARLayer_t*, int id) {
    const int next = id == -1 ? 100 : id + 10;
    return next < 100 + 10 * static_cast<int>(Script::poCurrent->shapes.size()) ? next : -1;
}
ZARShape* ZARGetShapeRef(ZARLayer_t* layer, int id) {
    auto& ring = Script::poCurrent->shapes.at(static_cast<std::size_t>(id - 100) / 10);
    if (ring.size() == 1)
        throw id; // of no standard class, on which no caller may rely
    ZARShape& shape = ZARLayer2fp(layer)->shape;
    shape = {ring.data(), static_cast<int>(ring.size())};
    return ring.empty() ? nullptr : &shape;
}
_iobuf* ZARLayer2fp(ZARLayer_t* layer) {
    return static_cast<_iobuf*>(layer);
}

cs::ICRS::~ICRS() = default;
ct::IMathTransform::~IMathTransform() = default;
IProjInfoFactory::~IProjInfoFactory() = default;

IProjInfoFactory* ProjectionEngine::GetProjInfoFactory(const PEType&) {
    static struct : IProjInfoFactory {
        cs::ICRS* CreateCRS(ProjInfo_t*) override {
            return Call().dimension > 0 ? new CRS(Call().dimension, 0) : nullptr;
        }
    } factory;
    return &factory;
}
bool utils::IsCRSLocal(const cs::ICRS*) {
    return Call().isLocal;
}
cs::ICRS* utils::CreateCompoundCS(cs::ICRS*, cs::DatumType eDatum, cs::LinearUnitType) {
    return eDatum == cs::VD_Other ? throw eDatum : new CRS(3, eDatum);
}
ct::IMathTransform* utils::CreateCRSTransform(const cs::ICRS* a, const cs::ICRS* b, double) {
    return new Transform(static_cast<const CRS*>(b)->mnDatum - static_cast<const CRS*>(a)->mnDatum);
}

#include "tin/tinreader.h"

#include "services/exception.h"
#include "services/reporting.h"
#include "services/vectorlayer.h"
#include "tin/detail/polygon.h"
#include "tin/load/assembly.h"
#include "tin/load/cornerlist.h"
#include "tin/load/weld.h"
#include "tin/triangulate.h"

#include <memory>

namespace kelm::tin {

namespace {

using containers::KeyPoint;
using Window = BBox<double, point2_t<double>>;

/// Holds a mutex for a scope.
class ScopedLock {
  public:
    explicit ScopedLock(const threading::Mutex& rMutex) : mrMutex(rMutex) { mrMutex.Lock(); }
    ScopedLock(const ScopedLock&) = delete;
    ScopedLock& operator=(const ScopedLock&) = delete;
    ~ScopedLock() { mrMutex.Unlock(); }

  private:
    const threading::Mutex& mrMutex;
};

/// The shape, or null if the store cannot deliver it. A store that throws has told why.
const ZARShape* FindShape(ZARLayer_t* layer, int id) {
    const ZARShape* shape = nullptr;
    try {
        shape = ZARGetShapeRef(layer, id);
    } catch (...) {
        return nullptr;
    }
    if (shape == nullptr)
        tellus::Warning::Warn(FormatString("Shape# %d is ignored because the store has none.", id),
                              "tin/tinreader", __LINE__);
    return shape;
}

} // namespace

Tin* TinReader::Load(const Window* poWindow) {
    if (mnShapeCount < 1 || (poWindow != nullptr && !TestOverlap(*poWindow, moBBox)))
        return nullptr;
    const ScopedLock lock(moMutex);
    load::CornerList corners(mnShapeCount);
    for (int id = ZARGetNext(mpLayer, -1); id != -1; id = ZARGetNext(mpLayer, id))
        ReadShape(id, poWindow, corners);
    return CreateTin(corners.GetPoints(), corners.GetIds());
}

void TinReader::ReadShape(int id, const Window* poWindow, load::CornerList& rCorners) const {
    const ZARShape* shape = FindShape(mpLayer, id);
    if (shape == nullptr)
        return;
    const Polygon<double> polygon(shape, PO_Undefined);
    if (poWindow != nullptr && !polygon.IsIntersected(*poWindow))
        return;
    if (shape->vertexCount == 4) {
        rCorners.AddTriangle(*shape);
        return;
    }
    load::CornerList::Ring& ring = rCorners.GetEmptyRing();
    if (Triangulate(polygon, ring.triangles) != 0) {
        tellus::Warning::Warn(
            FormatString("Triangulate(): Polygon# %d is ignored becasue it is not simple.\n", id),
            "tin/tinreader", __LINE__);
        return;
    }
    detail::FindRingVertices(*shape, ring.vertices);
    rCorners.AddRing(*shape, ring);
}

Tin* TinReader::CreateTin(std::vector<KeyPoint<double>>& oPoints, std::vector<Triangle_Id>& oIds) {
    if (oPoints.empty() || oIds.empty())
        return nullptr;
    std::vector<unsigned> oKeys(oPoints.size());
    unsigned nVertices;
    try {
        nVertices = load::Weld(oPoints, oIds, oKeys);
    } catch (...) {
        throw Exception("Octree2 error", "tin/tinreader", __PRETTY_FUNCTION__, __LINE__);
    }
    load::Assembly parts = load::Assemble(oPoints, oIds, oKeys, nVertices);
    mdfXBase = parts.base.x;
    mdfYBase = parts.base.y;
    const aabb_t<point2_t<float>> oBox = load::ComputeBox(parts);
    (this->*mpfnHeightConvert)(&oBox, parts.vertices.get(), nVertices);
    auto surface =
        std::make_unique<Tin>(parts.vertices.get(), parts.vertexCount, parts.triangles.get(),
                              parts.triangleCount, mdfXBase, mdfYBase);
    static_cast<void>(parts.vertices.release());
    static_cast<void>(parts.triangles.release());
    return surface.release();
}

} // namespace kelm::tin

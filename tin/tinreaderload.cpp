#include "tin/tinreader.h"

#include "services/reporting.h"
#include "services/vectorlayer.h"
#include "tin/detail/polygon.h"
#include "tin/triangulate.h"

#include <algorithm>
#include <stdexcept>

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

/// Corners and triangles that a load has gathered; no corner is shared yet. The lists grow by a
/// fixed step rather than by a factor, since the first reservation fits a layer of triangles.
class TinReader::Corners {
  public:
    explicit Corners(int nShapeCount) {
        moIds.reserve(static_cast<std::size_t>(nShapeCount));
        moPoints.reserve(3 * static_cast<std::size_t>(nShapeCount));
    }

    /// The triangle of a shape's first three vertices.
    void AddTriangle(const ZARShape& oShape) {
        if (moPoints.size() + 3 > moPoints.capacity())
            moPoints.reserve(moPoints.capacity() + POINT_STEP);
        if (moIds.size() >= moIds.capacity())
            moIds.reserve(moIds.capacity() + ID_STEP);
        Add(oShape.vertices[0], oShape.vertices[1], oShape.vertices[2]);
    }

    /// Triangles over the ring of a shape, whose point numbers lead to shape vertices by
    /// `vertices`.
    void AddTriangles(const ZARShape& oShape, const std::vector<Triangle_Id>& oTriangles,
                      const std::vector<unsigned>& vertices) {
        const std::size_t n = oTriangles.size();
        if (moPoints.size() + 3 * n > moPoints.capacity())
            moPoints.reserve(moPoints.capacity() + std::max(3 * n, POINT_STEP));
        if (moIds.size() + n >= moIds.capacity())
            moIds.reserve(moIds.capacity() + std::max(n, ID_STEP));
        for (const Triangle_Id& id : oTriangles)
            Add(oShape.vertices[vertices[id.id0]], oShape.vertices[vertices[id.id1]],
                oShape.vertices[vertices[id.id2]]);
    }

    std::vector<KeyPoint<double>> moPoints;
    std::vector<Triangle_Id> moIds;

  private:
    static constexpr std::size_t POINT_STEP = 10000;
    static constexpr std::size_t ID_STEP = 5000;
    static constexpr std::size_t MOST_CORNERS = 2147483647;

    void Add(const ZARVertex& a, const ZARVertex& b, const ZARVertex& c) {
        if (moPoints.size() > MOST_CORNERS - 3)
            throw std::length_error("the corners of a load are limited to 2147483647");
        const auto first = static_cast<std::uint32_t>(moPoints.size());
        for (const ZARVertex* vertex : {&a, &b, &c})
            moPoints.push_back({vertex->x, vertex->y, vertex->z});
        moIds.push_back({first, first + 1, first + 2});
    }
};

Tin* TinReader::Load(const Window* poWindow) {
    if (mnShapeCount < 1 || (poWindow != nullptr && !TestOverlap(*poWindow, moBBox)))
        return nullptr;
    const ScopedLock lock(moMutex);
    Corners corners(mnShapeCount);
    for (int id = ZARGetNext(mpLayer, -1); id != -1; id = ZARGetNext(mpLayer, id))
        ReadShape(id, poWindow, corners);
    return CreateTin(corners.moPoints, corners.moIds);
}

void TinReader::ReadShape(int id, const Window* poWindow, Corners& rCorners) const {
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
    std::vector<Triangle_Id> triangles;
    if (Triangulate(polygon, triangles) != 0) {
        tellus::Warning::Warn(
            FormatString("Triangulate(): Polygon# %d is ignored becasue it is not simple.\n", id),
            "tin/tinreader", __LINE__);
        return;
    }
    rCorners.AddTriangles(*shape, triangles, detail::FindRingVertices(*shape));
}

} // namespace kelm::tin

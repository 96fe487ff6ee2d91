// A polygon ring: refused, or cut into triangles that cover it exactly; alike with an index and
// without.

#include "fuzz/bytes.h"
#include "services/exception.h"
#include "tin/rings/earcutter.h"
#include "tin/rings/simplering.h"
#include "tin/rings/smallring.h"
#include "tin/triangulate.h"

#include <algorithm>
#include <cmath>

using fuzz::Require;
using kelm::tin::Polygon;
namespace rings = kelm::tin::rings;

namespace {

std::int64_t GetTurn(const point2_t<double>& p, const point2_t<double>& q,
                     const point2_t<double>& r) {
    const auto whole = [](double v) { return static_cast<std::int64_t>(v); };
    return whole(q.x - p.x) * whole(r.y - p.y) - whole(q.y - p.y) * whole(r.x - p.x);
}

bool IsWhole(double v) {
    return std::fabs(v) < 1e6 && std::floor(v) == v;
}

/// For whole coordinates, in exact arithmetic.
void TestAreas(const Polygon<double>& oPolygon, const std::vector<Triangle_Id>& oTriangles) {
    const point2_t<double>* points = oPolygon.GetPoints();
    const auto isWhole = [](const point2_t<double>& p) { return IsWhole(p.x) && IsWhole(p.y); };
    if (!std::all_of(points, points + oPolygon.GetPointCount(), isWhole))
        return;
    std::int64_t ring = 0;
    for (unsigned i = 0; i < oPolygon.GetPointCount(); ++i)
        ring +=
            GetTurn({0.0, 0.0}, points[i], points[i + 1 == oPolygon.GetPointCount() ? 0 : i + 1]);
    std::int64_t sum = 0;
    for (const Triangle_Id& id : oTriangles) {
        const std::int64_t area = GetTurn(points[id.id0], points[id.id1], points[id.id2]);
        Require(area > 0);
        sum += area;
    }
    Require(sum == std::abs(ring));
}

/// Also for rings that cross themselves.
void TestIndex(const Polygon<double>& oPolygon) {
    const point2_t<double>* points = oPolygon.GetPoints();
    const unsigned count = oPolygon.GetPointCount();
    Require(rings::TestSimpleByIndex(points, count) == rings::TestSimpleByPairs(points, count));
    if (count < 3)
        return;
    std::vector<Triangle_Id> small;
    std::vector<Triangle_Id> large;
    const bool isCut = rings::SmallRing(points, count, true).Cut(small);
    Require(rings::EarCutter(points, count, true).Cut(large) == isCut);
    const auto isSame = [](const Triangle_Id& a, const Triangle_Id& b) {
        return a.id0 == b.id0 && a.id1 == b.id1 && a.id2 == b.id2;
    };
    Require(std::equal(small.begin(), small.end(), large.begin(), large.end(), isSame));
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::Bytes bytes(data, size);
    const auto orient = static_cast<PolygonOrient>(static_cast<int>(bytes.TakeFrom(0, 2)) - 1);
    fuzz::Coordinates<double> coordinates(bytes, 4e-10);
    std::vector<ZARVertex> ring;
    while (!bytes.IsEmpty() && ring.size() < 200)
        ring.push_back({coordinates.Take(), coordinates.Take(), 0.0});
    ZARShape shape{};
    shape.vertices = ring.data();
    shape.vertexCount = static_cast<int>(ring.size());
    try {
        const Polygon<double> polygon(&shape, orient);
        std::vector<unsigned> vertices;
        kelm::tin::detail::FindRingVertices(shape, vertices);
        Require(orient != PO_Undefined || vertices.size() == polygon.GetPointCount());
        TestIndex(polygon);
        std::vector<Triangle_Id> triangles;
        if (Triangulate(polygon, triangles) == 0) {
            Require(triangles.size() + 2 == polygon.GetPointCount());
            for (const Triangle_Id& id : triangles)
                Require(id.id0 < polygon.GetPointCount() && id.id1 < polygon.GetPointCount() &&
                        id.id2 < polygon.GetPointCount());
            TestAreas(polygon, triangles);
        } else {
            Require(triangles.empty());
        }
        kelm::tin::BBox<double, point2_t<double>> window;
        window.min = {ring[0].x, ring[1].y};
        window.max = {ring[2].x, ring[3].y};
        static_cast<void>(polygon.IsIntersected(window));
    } catch (const kelm::DataException&) {
        Require(ring.size() < 4);
    }
    return 0;
}

// A polygon ring: refused, or cut into triangles that cover it exactly; alike with an index and
// without.

#include "fuzz/bytes.h"
#include "services/exception.h"
#include "services/rings/cutting/earclipping.h"
#include "services/rings/cutting/simplering.h"
#include "tin/triangulate.h"

#include <algorithm>
#include <array>
#include <cmath>

using fuzz::Require;
using kelm::tin::Polygon;
namespace rings = kelm::rings;

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

using Corners = std::vector<std::array<unsigned, 3>>;

/// Also for rings that cross themselves. @param few steps after which the index gives way
void TestIndex(const std::vector<rings::Point>& points, std::size_t few) {
    const auto count = static_cast<unsigned>(points.size());
    const rings::StepLimit limits[] = {rings::StepLimit(few), rings::StepLimit(~std::size_t{0})};
    const bool isSimple = rings::IsSimpleByPairs(points.data(), count);
    for (const rings::StepLimit& steps : limits)
        Require(rings::IsSimpleByIndex(points.data(), count, steps) == isSimple);
    if (count < 3)
        return;
    const rings::CounterClockwise<rings::Point> corners{points.data(), count, true};
    const auto addTo = [](Corners& list) {
        list.clear();
        return [&](unsigned u, unsigned v, unsigned w) { list.push_back({u, v, w}); };
    };
    static Corners scanned; // these keep their memory from input to input
    static Corners indexed;
    const bool isCut = rings::ClipSmallRing(corners, addTo(scanned));
    for (const rings::StepLimit& steps : limits) {
        Require(rings::ClipLargeRing(corners, steps, addTo(indexed)) == isCut);
        Require(scanned == indexed);
    }
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::Bytes bytes(data, size);
    const auto orient = static_cast<PolygonOrient>(static_cast<int>(bytes.TakeFrom(0, 2)) - 1);
    fuzz::Coordinates<double> coordinates(bytes, 4e-10);
    std::vector<ZARVertex> ring;
    while (!bytes.IsEmpty() && ring.size() < 100)
        ring.push_back({coordinates.Take(), coordinates.Take(), 0.0});
    ZARShape shape{};
    shape.vertices = ring.data();
    shape.vertexCount = static_cast<int>(ring.size());
    try {
        const Polygon<double> polygon(&shape, orient);
        std::vector<unsigned> vertices;
        kelm::tin::detail::FindRingVertices(shape, vertices);
        Require(orient != PO_Undefined || vertices.size() == polygon.GetPointCount());
        std::vector<rings::Point> points;
        for (unsigned i = 0; i < polygon.GetPointCount(); ++i)
            points.push_back({polygon.GetPoints()[i].x, polygon.GetPoints()[i].y});
        TestIndex(points, size % 64);
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

#include "tin/load/assembly.h"

#include "services/memory/largepages.h"
#include "tin/parallel/parallelblocks.h"
#include "tin/rules/extent.h"
#include "tin/rules/frame.h"

#include <cmath>

namespace kelm::tin::load {

namespace {

using Points = std::vector<containers::KeyPoint<double>>;
using Vertices = std::unique_ptr<point3_t<float>[]>;
using Triangles = std::unique_ptr<Triangle[]>;

/// Triangle count above which their set-up is worth a team.
constexpr unsigned PARALLEL_ABOVE = 1000;

template <typename V>
void ReleaseMemory(std::vector<V>& list) {
    std::vector<V>().swap(list);
}

/// Indices of the kept corners, in rising order.
std::vector<unsigned> FindKept(const std::vector<unsigned>& keys, unsigned count) {
    std::vector<unsigned> kept;
    memory::ReserveLarge(kept, count);
    for (unsigned i = 0; i < keys.size(); ++i)
        if (keys[i] == 1)
            kept.push_back(i);
    return kept;
}

point2_t<double> FindBase(const Points& points, const std::vector<unsigned>& kept) {
    for (const unsigned corner : kept)
        if (std::isfinite(points[corner].x) && std::isfinite(points[corner].y))
            return {points[corner].x, points[corner].y};
    return {0.0, 0.0};
}

Vertices CreateVertices(const Points& points, const std::vector<unsigned>& kept,
                        const point2_t<double>& base) {
    const rules::Frame frame(base.x, base.y);
    Vertices vertices = memory::CreateLargeArray<point3_t<float>>(kept.size());
    for (std::size_t j = 0; j < kept.size(); ++j) {
        const auto& [x, y, z] = points[kept[j]];
        vertices[j] = frame.ToLocal(point3_t<double>{x, y, z});
    }
    return vertices;
}

/// Turns the marks of kept corners into their positions among the kept.
void NumberKept(std::vector<unsigned>& keys) {
    keys[0] = 0;
    for (std::size_t i = 1; i < keys.size(); ++i)
        keys[i] += keys[i - 1];
}

/// @param numbers vertex number of each kept corner
Triangles CreateTriangles(const std::vector<Triangle_Id>& ids, const std::vector<unsigned>& numbers,
                          point3_t<float>* vertices) {
    const auto count = static_cast<unsigned>(ids.size());
    Triangles triangles(new Triangle[count]);
    const auto setUp = [&](unsigned, unsigned first, unsigned last) {
        for (unsigned i = first; i < last; ++i)
            triangles[i].SetVertices(&vertices[numbers[ids[i].id0]], &vertices[numbers[ids[i].id1]],
                                     &vertices[numbers[ids[i].id2]]);
    };
    parallel::ParallelBlocks(count, parallel::GetTeamAbove(PARALLEL_ABOVE, count), setUp);
    return triangles;
}

} // namespace

Assembly Assemble(Points& points, std::vector<Triangle_Id>& ids, std::vector<unsigned>& keys,
                  unsigned kept, const std::optional<point2_t<double>>& given) {
    std::vector<unsigned> keptCorners = FindKept(keys, kept);
    const point2_t<double> base = given ? *given : FindBase(points, keptCorners);
    Vertices vertices = CreateVertices(points, keptCorners, base);
    ReleaseMemory(keptCorners);
    ReleaseMemory(points);
    NumberKept(keys);
    const auto triangleCount = static_cast<unsigned>(ids.size());
    Triangles triangles = CreateTriangles(ids, keys, vertices.get());
    ReleaseMemory(ids);
    ReleaseMemory(keys);
    return {std::move(vertices), kept, std::move(triangles), triangleCount, base};
}

aabb_t<point2_t<float>> ComputeBox(const Assembly& parts) {
    rules::Extent<float> extent;
    for (unsigned i = 0; i < parts.triangleCount; ++i)
        extent.Add(parts.triangles[i].GetBBox());
    return {extent.GetMin(), extent.GetMax()};
}

} // namespace kelm::tin::load

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

point2_t<double> FindBase(const Points& corners) {
    for (const auto& corner : corners)
        if (std::isfinite(corner.x) && std::isfinite(corner.y))
            return {corner.x, corner.y};
    return {0.0, 0.0};
}

Vertices CreateVertices(const Points& corners, const point2_t<double>& base) {
    const rules::Frame frame(base.x, base.y);
    Vertices vertices = memory::CreateLargeArray<point3_t<float>>(corners.size());
    for (std::size_t i = 0; i < corners.size(); ++i)
        vertices[i] = frame.ToLocal(point3_t<double>{corners[i].x, corners[i].y, corners[i].z});
    return vertices;
}

Triangles CreateTriangles(const std::vector<Triangle_Id>& ids, point3_t<float>* vertices) {
    const auto count = static_cast<unsigned>(ids.size());
    Triangles triangles(new Triangle[count]);
    const auto setUp = [&](unsigned, unsigned first, unsigned last) {
        for (unsigned i = first; i < last; ++i)
            triangles[i].SetVertices(&vertices[ids[i].id0], &vertices[ids[i].id1],
                                     &vertices[ids[i].id2]);
    };
    parallel::ParallelBlocks(count, parallel::GetTeamAbove(PARALLEL_ABOVE, count), setUp);
    return triangles;
}

} // namespace

Assembly Assemble(Welded& welded, const std::optional<point2_t<double>>& given) {
    const point2_t<double> base = given ? *given : FindBase(welded.corners);
    const auto vertexCount = static_cast<unsigned>(welded.corners.size());
    Vertices vertices = CreateVertices(welded.corners, base);
    ReleaseMemory(welded.corners);
    const auto triangleCount = static_cast<unsigned>(welded.triangles.size());
    Triangles triangles = CreateTriangles(welded.triangles, vertices.get());
    ReleaseMemory(welded.triangles);
    return {std::move(vertices), vertexCount, std::move(triangles), triangleCount, base};
}

aabb_t<point2_t<float>> ComputeBox(const Assembly& parts) {
    rules::Extent<float> extent;
    for (unsigned i = 0; i < parts.triangleCount; ++i)
        extent.Add(parts.triangles[i].GetBBox());
    return {extent.GetMin(), extent.GetMax()};
}

} // namespace kelm::tin::load

#include "tin/tinreader.h"

#include "services/exception.h"
#include "tin/detail/cornerhash.h"
#include "tin/detail/parallelblocks.h"
#include "tin/octree2.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <memory>
#include <numeric>

namespace kelm::tin {

namespace {

using containers::KeyPoint;

/// Triangle count above which their set-up is worth a team.
constexpr unsigned PARALLEL_ABOVE = 1000;

template <typename V>
void ReleaseMemory(std::vector<V>& list) {
    std::vector<V>().swap(list);
}

/// The kept corner that stands for a corner. A kept one stands for itself. For a dropped one it is
/// the point of the leaf that its search reaches; if a later split has led that search away from
/// the point it is a twin of, it is the twin of lowest index. There is one: a held point stays.
unsigned FindStandIn(const Octree2& oTree, const std::vector<KeyPoint<double>>& oPoints,
                     const std::vector<unsigned>& oKeys, unsigned corner) {
    if (oKeys[corner] == 1)
        return corner;
    const auto* leaf = static_cast<const Octree2::Node*>(oTree.FindLeaf(oPoints[corner]));
    if (leaf == nullptr || !Octree2::IsTwin(leaf->moPoint, oPoints[corner]))
        leaf = oTree.FindTwin(oPoints[corner]);
    return leaf->mnKey;
}

template <typename StandIn>
void Renumber(std::vector<Triangle_Id>& oIds, const StandIn& getStandIn) {
    detail::ParallelBlocks(
        static_cast<unsigned>(oIds.size()), omp_get_max_threads(),
        [&](unsigned, unsigned first, unsigned last) {
            for (unsigned i = first; i < last; ++i)
                for (std::uint32_t* id : {&oIds[i].id0, &oIds[i].id1, &oIds[i].id2})
                    *id = getStandIn(*id);
        });
}

/// Welds where no octree is needed. @return the number of kept corners, 0 if one is
unsigned WeldByHash(const std::vector<KeyPoint<double>>& oPoints, std::vector<Triangle_Id>& oIds,
                    std::vector<unsigned>& oKeys) {
    std::vector<unsigned> standIns(oPoints.size());
    if (!detail::CornerHash::FindStandIns(oPoints, standIns))
        return 0;
    unsigned kept = 0;
    for (unsigned i = 0; i < oKeys.size(); ++i) {
        oKeys[i] = standIns[i] == i ? 1 : 0;
        kept += oKeys[i];
    }
    Renumber(oIds, [&](unsigned corner) { return standIns[corner]; });
    return kept;
}

/// Welds the corners: oKeys becomes 1 for a kept corner and 0 for a dropped one, and each triangle
/// refers to kept corners only. @return the number of kept corners
unsigned Weld(std::vector<KeyPoint<double>>& oPoints, std::vector<Triangle_Id>& oIds,
              std::vector<unsigned>& oKeys) {
    if (const unsigned kept = WeldByHash(oPoints, oIds, oKeys); kept != 0)
        return kept;
    std::iota(oKeys.begin(), oKeys.end(), 0U);
    const Octree2 tree(oPoints, oKeys);
    Renumber(oIds, [&](unsigned corner) { return FindStandIn(tree, oPoints, oKeys, corner); });
    return static_cast<unsigned>(tree.GetPointCount());
}

/// Map position of the surface's origin: the first kept corner that has a finite one.
point2_t<double> FindBase(const std::vector<KeyPoint<double>>& oPoints,
                          const std::vector<unsigned>& oKept) {
    for (const unsigned corner : oKept)
        if (std::isfinite(oPoints[corner].x) && std::isfinite(oPoints[corner].y))
            return {oPoints[corner].x, oPoints[corner].y};
    return {0.0, 0.0};
}

/// Indices of the kept corners, in rising order.
std::vector<unsigned> FindKept(const std::vector<unsigned>& oKeys, unsigned count) {
    std::vector<unsigned> kept;
    kept.reserve(count);
    for (unsigned i = 0; i < oKeys.size(); ++i)
        if (oKeys[i] == 1)
            kept.push_back(i);
    return kept;
}

/// Turns the marks of kept corners into their positions among the kept.
void NumberKept(std::vector<unsigned>& oKeys) {
    oKeys[0] = 0;
    for (std::size_t i = 1; i < oKeys.size(); ++i)
        oKeys[i] += oKeys[i - 1];
}

using Vertices = std::unique_ptr<point3_t<float>[]>;
using Triangles = std::unique_ptr<Triangle[]>;

/// Narrows the kept corners relative to the base, in the order of the corner list.
Vertices CreateVertices(const std::vector<KeyPoint<double>>& oPoints,
                        const std::vector<unsigned>& oKept, const point2_t<double>& base) {
    Vertices vertices(new point3_t<float>[oKept.size()]);
    for (std::size_t j = 0; j < oKept.size(); ++j) {
        const KeyPoint<double>& c = oPoints[oKept[j]];
        vertices[j] = {static_cast<float>(c.x - base.x), static_cast<float>(c.y - base.y),
                       static_cast<float>(c.z)};
    }
    return vertices;
}

/// @param numbers vertex number of each kept corner
Triangles CreateTriangles(const std::vector<Triangle_Id>& oIds,
                          const std::vector<unsigned>& numbers, point3_t<float>* vertices) {
    const auto count = static_cast<unsigned>(oIds.size());
    Triangles triangles(new Triangle[count]);
    const auto setUp = [&](unsigned, unsigned first, unsigned last) {
        for (unsigned i = first; i < last; ++i)
            triangles[i].SetVertices(&vertices[numbers[oIds[i].id0]],
                                     &vertices[numbers[oIds[i].id1]],
                                     &vertices[numbers[oIds[i].id2]]);
    };
    detail::ParallelBlocks(count, detail::GetTeamAbove(PARALLEL_ABOVE, count), setUp);
    return triangles;
}

aabb_t<point2_t<float>> ComputeBox(const Triangle* triangles, unsigned count) {
    constexpr float highest = std::numeric_limits<float>::max();
    aabb_t<point2_t<float>> box{{highest, highest}, {-highest, -highest}};
    for (unsigned i = 0; i < count; ++i) {
        const BBox<float, point2_t<float>>& other = triangles[i].GetBBox();
        box.min = {std::min(box.min.x, other.min.x), std::min(box.min.y, other.min.y)};
        box.max = {std::max(box.max.x, other.max.x), std::max(box.max.y, other.max.y)};
    }
    return box;
}

} // namespace

Tin* TinReader::CreateTin(std::vector<KeyPoint<double>>& oPoints, std::vector<Triangle_Id>& oIds) {
    if (oPoints.empty() || oIds.empty())
        return nullptr;
    std::vector<unsigned> oKeys(oPoints.size());
    unsigned nVertices;
    try {
        nVertices = Weld(oPoints, oIds, oKeys);
    } catch (...) {
        throw Exception("Octree2 error", "tin/tinreader", __PRETTY_FUNCTION__, __LINE__);
    }
    // Each list is given back as soon as it falls out of use, so that the large ones do not
    // coexist.
    std::vector<unsigned> oKept = FindKept(oKeys, nVertices);
    const point2_t<double> base = FindBase(oPoints, oKept);
    Vertices poVertices = CreateVertices(oPoints, oKept, base);
    mdfXBase = base.x;
    mdfYBase = base.y;
    ReleaseMemory(oKept);
    ReleaseMemory(oPoints);

    NumberKept(oKeys);
    const auto nTriangles = static_cast<unsigned>(oIds.size());
    Triangles poTriangles = CreateTriangles(oIds, oKeys, poVertices.get());
    ReleaseMemory(oIds);
    ReleaseMemory(oKeys);

    const aabb_t<point2_t<float>> oBox = ComputeBox(poTriangles.get(), nTriangles);
    (this->*mpfnHeightConvert)(&oBox, poVertices.get(), nVertices);
    auto surface = std::make_unique<Tin>(poVertices.get(), nVertices, poTriangles.get(), nTriangles,
                                         mdfXBase, mdfYBase);
    static_cast<void>(poVertices.release());
    static_cast<void>(poTriangles.release());
    return surface.release();
}

} // namespace kelm::tin

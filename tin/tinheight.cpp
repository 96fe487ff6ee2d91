#include "tin/tin.h"

#include "tin/aabbtree.h"
#include "tin/index/leafwalk.h"
#include "tin/index/pointprobe.h"
#include "tin/index/search.h"
#include "tin/parallel/parallelbatch.h"
#include "tin/rules/exactplan.h"
#include "tin/rules/frame.h"

#include <atomic>
#include <limits>

namespace kelm::tin {

namespace {

/// Heights by a tree that are worth a thread.
constexpr std::size_t SMALLEST = 4000;
/// Triangles that a scan passes in the time of so many heights by a tree.
constexpr std::size_t TRIANGLES_SCANNED = 500;

using Search = index::Search<AabbTree>;

/// The greatest height of the triangles whose box holds the position.
/// @param askTriangle askTriangle(triangle, h) tells whether the triangle has one
template <typename AskTriangle>
rules::Highest FindHighest(const Search& search, const Triangle* triangles, float x, float y,
                           const AskTriangle& askTriangle) {
    const index::PointProbe probe(x, y);
    const auto isNear = [=](unsigned id) { return probe.IsIn(triangles[id].GetBBox()); };
    const auto ask = [&](rules::Highest& highest, unsigned id) {
        float h;
        if (isNear(id) && askTriangle(triangles[id], h))
            highest.Add(h);
    };
    const auto walk = [&](const AabbNode* root, rules::Highest& highest) {
        const auto holds = [=](const BBox<float, point2_t<float>>& box) { return probe.IsIn(box); };
        index::VisitLeaves(root, holds, [&](const std::vector<unsigned>& leaves) {
            for (const unsigned id : leaves)
                ask(highest, id);
        });
    };
    return search.FindHighest(walk, ask, isNear);
}

bool GetClosedHeight(const Triangle& triangle, float x, float y, float& h) {
    return triangle.GetVertex(0) != nullptr &&
           rules::GetClosedHeight(*triangle.GetVertex(0), *triangle.GetVertex(1),
                                  *triangle.GetVertex(2), {x, y}, h);
}

} // namespace

/// @param most threads of a scan
bool Tin::FindHeight(const point2_t<float>& position, float& height, const AabbTree* tree, int most,
                     EdgeRule eRule) const {
    const auto [x, y] = position;
    if (!TestInside(moBBox, x, y))
        return false;
    const Search search(tree, mnTriangles, most);
    rules::Highest highest =
        FindHighest(search, mpoTriangles, x, y, [x = x, y = y](const Triangle& triangle, float& h) {
            return triangle.GetHeight(x, y, h);
        });
    if (eRule == ER_Closed && !highest.IsFound())
        highest = FindHighest(search, mpoTriangles, x, y,
                              [x = x, y = y](const Triangle& triangle, float& h) {
                                  return GetClosedHeight(triangle, x, y, h);
                              });
    height = highest.Get();
    return highest.IsFound();
}

bool Tin::GetHeight(const float& x, const float& y, float& height, const AabbTree* tree) const {
    return GetHeight(x, y, height, tree, ER_Float);
}

bool Tin::GetHeight(const float& x, const float& y, float& height, const AabbTree* tree,
                    EdgeRule eRule) const {
    TestTree(tree);
    return FindHeight({x, y}, height, tree, mnThreads, eRule);
}

bool Tin::GetHeight(const double& x, const double& y, float& height, const AabbTree* tree) const {
    return GetHeight(x, y, height, tree, ER_Float);
}

bool Tin::GetHeight(const double& x, const double& y, float& height, const AabbTree* tree,
                    EdgeRule eRule) const {
    const point2_t<float> local = rules::Frame(mdfXBase, mdfYBase).ToLocal(point2_t<double>{x, y});
    return GetHeight(local.x, local.y, height, tree, eRule);
}

std::size_t Tin::GetHeights(const point2_t<double>* positions, std::size_t count, float* heights,
                            const AabbTree* tree, int threads, EdgeRule eRule) const {
    TestTree(tree);
    const rules::Frame frame(mdfXBase, mdfYBase);
    std::atomic<std::size_t> found{0};
    const auto find = [&](std::size_t first, std::size_t last) {
        std::size_t foundHere = 0;
        for (; first < last; ++first) {
            if (FindHeight(frame.ToLocal(positions[first]), heights[first], tree, 1, eRule))
                ++foundHere;
            else
                heights[first] = std::numeric_limits<float>::quiet_NaN();
        }
        found += foundHere;
    };
    const std::size_t weight = tree == nullptr ? mnTriangles / TRIANGLES_SCANNED + 1 : 1;
    parallel::ParallelBatch(count, SMALLEST / weight + 1, threads, find);
    return found;
}

} // namespace kelm::tin

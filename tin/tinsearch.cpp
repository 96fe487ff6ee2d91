#include "tin/tin.h"

#include "services/exception.h"
#include "services/reporting.h"
#include "tin/aabbtree.h"
#include "tin/index/pointprobe.h"
#include "tin/index/search.h"

namespace kelm::tin {

namespace {

using index::Search;

} // namespace

/// A tree without a root leads to no triangle, so it needs no refusal.
void Tin::TestTree(const AabbTree* tree) const {
    if (tree == nullptr || tree->GetTriangleCount() == mnTriangles || tree->GetRoot() == nullptr)
        return;
    throw ParameterException(
        "tree", ParameterException::PT_Invalid, FormatString("%u", tree->GetTriangleCount()),
        FormatString("%u", mnTriangles),
        FormatString("The tree is not of this surface: it was built over %u triangles and the "
                     "surface has %u",
                     tree->GetTriangleCount(), mnTriangles),
        "tin/tin", __PRETTY_FUNCTION__, __LINE__);
}

void Tin::FindTrianglesByPoint(const float& x, const float& y, std::vector<unsigned>& result,
                               const AabbTree* tree) const {
    TestTree(tree);
    const index::PointProbe probe(x, y);
    const auto isNear = [probe, triangles = mpoTriangles](unsigned id) {
        return probe.IsIn(triangles[id].GetBBox());
    };
    const auto holds = [&](unsigned id) {
        return isNear(id) && mpoTriangles[id].IsPointInsideLT(x, y);
    };
    const auto findLeaves = [&](const AabbNode& root, std::vector<unsigned>& list) {
        root.FindLeaves(x, y, list);
    };
    Search(tree, mnTriangles, mnThreads).List(findLeaves, holds, holds, result, isNear);
}

void Tin::FindTrianglesByRegion(const BBox<float, point2_t<float>>& region,
                                std::vector<unsigned>& result, const AabbTree* tree) const {
    TestTree(tree);
    const auto meets = [&](unsigned id) { return mpoTriangles[id].IsIntersected(region); };
    const auto findLeaves = [&](const AabbNode& root, std::vector<unsigned>& list) {
        root.FindLeaves(region, list);
    };
    Search(tree, mnTriangles, mnThreads).List(findLeaves, index::KeepAll(), meets, result);
}

} // namespace kelm::tin

#include "tin/tin.h"

#include "services/exception.h"
#include "services/reporting.h"
#include "tin/aabbtree.h"
#include "tin/index/leafwalk.h"
#include "tin/index/pointprobe.h"
#include "tin/index/search.h"
#include "tin/rules/frame.h"

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

bool Tin::GetHeight(const float& x, const float& y, float& height, const AabbTree* tree) const {
    TestTree(tree);
    if (!TestInside(moBBox, x, y))
        return false;
    const index::PointProbe probe(x, y);
    const auto isNear = [probe, triangles = mpoTriangles](unsigned id) {
        return probe.IsIn(triangles[id].GetBBox());
    };
    const auto ask = [&](rules::Highest& highest, unsigned id) {
        float h;
        if (isNear(id) && mpoTriangles[id].GetHeight(x, y, h))
            highest.Add(h);
    };
    const auto walk = [&](const AabbNode* root, rules::Highest& highest) {
        const auto holds = [=](const BBox<float, point2_t<float>>& box) { return probe.IsIn(box); };
        index::VisitLeaves(root, holds, [&](const std::vector<unsigned>& leaves) {
            for (const unsigned id : leaves)
                ask(highest, id);
        });
    };
    const rules::Highest highest =
        Search(tree, mnTriangles, mnThreads).FindHighest(walk, ask, isNear);
    height = highest.Get();
    return highest.IsFound();
}

bool Tin::GetHeight(const double& x, const double& y, float& height, const AabbTree* tree) const {
    const point2_t<float> local = rules::Frame(mdfXBase, mdfYBase).ToLocal(point2_t<double>{x, y});
    return GetHeight(local.x, local.y, height, tree);
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

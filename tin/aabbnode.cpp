#include "tin/aabbtree.h"

#include "services/reporting.h"
#include "tin/index/division.h"
#include "tin/index/leafwalk.h"
#include "tin/index/nodeblocks.h"
#include "tin/index/segmentprobe.h"
#include "tin/index/treebuilder.h"

#include <algorithm>
#include <utility>

namespace kelm::tin {

namespace {

using Box = BBox<float, point2_t<float>>;

/// Appends the lists of all leaves below a node whose boxes pass a test.
template <typename Meets>
void AppendLeaves(const AabbNode* node, const Meets& meets, std::vector<unsigned>& list) {
    index::VisitLeaves(node, meets, [&](const std::vector<unsigned>& leaves) {
        list.insert(list.end(), leaves.begin(), leaves.end());
    });
}

} // namespace

/// What a build writes: the fields of the nodes, and the counts and the capacity of the tree.
struct AabbNode::Site {
    AabbTree& rTree;

    void CountNode() { rTree.IncreaseNodeCount(); }
    bool IsLeaf(int size) const { return rTree.TestCapacity(size); }
    void RaiseCapacity(int size) {
        tellus::Report::AddInfo(
            FormatString("\n* AabbTree::mnCapacity is changing from %d to %d in CreateChild()\n",
                         static_cast<int>(rTree.GetCapacity()), size));
        rTree.SetCapacity(size);
    }
    static void SetBox(AabbNode& rNode, const rules::Extent<float>& extent) {
        rNode.moBBox.min = extent.GetMin();
        rNode.moBBox.max = extent.GetMax();
    }
    static void SetLeaves(AabbNode& rNode, const unsigned* first, const unsigned* last) {
        rNode.moLeaves.assign(first, last);
    }
    static void SetChildren(AabbNode& rNode, AabbNode* pair) { rNode.mpoLeft = pair; }
};

AabbNode::AabbNode(AabbNode&& other) noexcept {
    *this = std::move(other);
}

AabbNode& AabbNode::operator=(AabbNode&& other) noexcept {
    std::swap(mpoLeft, other.mpoLeft);
    std::swap(mpoBlocks, other.mpoBlocks);
    std::swap(moBBox, other.moBBox);
    std::swap(moLeaves, other.moLeaves);
    return *this;
}

AabbNode::~AabbNode() {
    index::NodeBlocks<AabbNode>::Release(mpoBlocks);
}

void AabbNode::CreateChild(const Triangle* triangles, const std::vector<unsigned>& list,
                           AabbTree* tree) {
    Build(triangles, list, *tree);
}

void AabbNode::Build(const Triangle* triangles, std::vector<unsigned> order, AabbTree& rTree) {
    const bool isBest = rTree.GetDivisionType() == DT_BestAxis;
    index::SpanDivider divider(triangles, std::move(order), isBest);
    index::TreeBuilder<AabbNode, Site>(std::move(divider), Site{rTree}, mpoBlocks).Build(*this);
}

void AabbNode::FindLeaves(float x, float y, std::vector<unsigned>& list) const {
    AppendLeaves(
        this, [=](const Box& box) { return TestInside(box, x, y); }, list);
}

void AabbNode::FindLeaves(const Box& box, std::vector<unsigned>& list) const {
    AppendLeaves(
        this, [&](const Box& node) { return TestOverlap(node, box); }, list);
}

template <typename P>
void AabbNode::FindLeavesByLine(const P& a, const P& b, std::vector<unsigned>& out) const {
    const index::SegmentProbe probe(a, b);
    AppendLeaves(
        this, [&](const Box& box) { return probe.IsMet(box); }, out);
}

template KELM_TIN_EXPORT void AabbNode::FindLeavesByLine(const point2_t<float>&,
                                                         const point2_t<float>&,
                                                         std::vector<unsigned>&) const;
template KELM_TIN_EXPORT void AabbNode::FindLeavesByLine(const point3_t<float>&,
                                                         const point3_t<float>&,
                                                         std::vector<unsigned>&) const;

void AabbNode::AddLeaves(std::vector<unsigned>& list, float, float) const {
    list.insert(list.end(), moLeaves.begin(), moLeaves.end());
}

void AabbNode::AddLeaves(std::vector<unsigned>& list, const Box&) const {
    list.insert(list.end(), moLeaves.begin(), moLeaves.end());
}

void AabbNode::ComputeBBox(const Triangle* triangles, const std::vector<unsigned>& list) {
    rules::Extent<float> extent;
    for (const unsigned id : list)
        extent.Add(triangles[id].GetBBox());
    Site::SetBox(*this, extent);
}

void AabbNode::ComputeCenter(const Triangle* triangles, const std::vector<unsigned>& list,
                             float* center) const {
    index::CentroidSum sum;
    for (const unsigned id : list)
        sum.Add(index::CentroidOf(triangles[id]));
    sum.GetMean(list.size(), center);
}

Axis AabbNode::GetLongestAxis() const {
    return index::LongestAxis(moBBox.min, moBBox.max);
}

Axis AabbNode::GetBestAxis(const Triangle* triangles, const std::vector<unsigned>& list,
                           const float* center) const {
    return index::BestAxis(triangles, list.data(), list.data() + list.size(), center);
}

DivisionSide AabbNode::WhichSide(const Triangle* triangle, Axis axis, const float* center) const {
    const float centroid = index::At(index::CentroidOf(*triangle), axis);
    return index::IsLeft(centroid, center[axis]) ? DS_Left : DS_Right;
}

void AabbNode::Divide(const Triangle* triangles, const std::vector<unsigned>& list, Axis axis,
                      const float* center, std::vector<unsigned>& left,
                      std::vector<unsigned>& right) const {
    left.clear();
    right.clear();
    for (const unsigned id : list)
        (WhichSide(&triangles[id], axis, center) == DS_Left ? left : right).push_back(id);
}

} // namespace kelm::tin

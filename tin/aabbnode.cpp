#include "tin/aabbtree.h"

#include "services/reporting.h"
#include "tin/detail/leafwalk.h"
#include "tin/detail/nodeblocks.h"
#include "tin/detail/segmentprobe.h"

#include <algorithm>
#include <cstdlib>
#include <limits>

namespace kelm::tin {

namespace {

using Box = BBox<float, point2_t<float>>;

constexpr float HIGHEST = std::numeric_limits<float>::max();

/// Box around the stored boxes of a growing set of triangles.
struct Extent {
    point2_t<float> min{HIGHEST, HIGHEST};
    point2_t<float> max{-HIGHEST, -HIGHEST};

    void Add(const Box& box) {
        if (min.x > box.min.x)
            min.x = box.min.x;
        if (min.y > box.min.y)
            min.y = box.min.y;
        if (box.max.x > max.x)
            max.x = box.max.x;
        if (box.max.y > max.y)
            max.y = box.max.y;
    }
};

/// Sum of the centroids of a growing set of triangles.
struct CentroidSum {
    point2_t<float> sum{0.0F, 0.0F};

    void Add(const point2_t<float>& centroid) {
        sum.x += centroid.x;
        sum.y += centroid.y;
    }

    void GetMean(std::size_t count, float* center) const {
        const float r = 1.0F / static_cast<float>(count);
        center[AX_X] = r * sum.x;
        center[AX_Y] = r * sum.y;
    }
};

point2_t<float> CentroidOf(const Triangle& triangle) {
    point2_t<float> centroid;
    triangle.GetCenterXY(&centroid);
    return centroid;
}

float At(const point2_t<float>& p, Axis axis) {
    return axis == AX_X ? p.x : p.y;
}

/// The rule of every split: a centroid exactly at the centre goes left, a NaN right.
DivisionSide SideOf(float centroid, float center) {
    return center >= centroid ? DS_Left : DS_Right;
}

Axis LongestAxis(const point2_t<float>& min, const point2_t<float>& max) {
    return max.x - min.x >= max.y - min.y ? AX_X : AX_Y;
}

/// Difference in size of the two sides that `center` makes of the list on each axis.
Axis BestAxis(const Triangle* triangles, const unsigned* first, const unsigned* last,
              const float* center) {
    std::int64_t surplus[2] = {0, 0};
    for (const unsigned* id = first; id != last; ++id) {
        const point2_t<float> centroid = CentroidOf(triangles[*id]);
        surplus[AX_X] += SideOf(centroid.x, center[AX_X]) == DS_Left ? 1 : -1;
        surplus[AX_Y] += SideOf(centroid.y, center[AX_Y]) == DS_Left ? 1 : -1;
    }
    return std::abs(surplus[AX_X]) > std::abs(surplus[AX_Y]) ? AX_Y : AX_X;
}

} // namespace

/// One build of a subtree. It divides one array of indices in place, and each division gathers at
/// once what the two sides need for their own: their boxes, and their centroid sums in their own
/// order. A stack of its own keeps the depth of a tree off the caller's.
class AabbNode::Builder {
  public:
    Builder(const Triangle* triangles, const std::vector<unsigned>& list, AabbTree& rTree)
        : mpoTriangles(triangles), moOrder(list), mrTree(rTree) {}

    void Build(AabbNode& rTop) {
        Span span{0, moOrder.size(), {}, {}};
        for (const unsigned id : moOrder)
            span.Add(mpoTriangles[id], CentroidOf(mpoTriangles[id]));
        BuildLeftwards(rTop, span);
        while (!moPending.empty()) {
            const Pending next = moPending.back();
            moPending.pop_back();
            BuildLeftwards(*next.poNode, next.oSpan);
        }
    }

  private:
    /// A stretch of the index array, with what was gathered over it.
    struct Span {
        std::size_t first;
        std::size_t last;
        Extent oExtent;
        CentroidSum oSum;

        std::size_t Size() const { return last - first; }
        void Add(const Triangle& triangle, const point2_t<float>& centroid) {
            oExtent.Add(triangle.GetBBox());
            oSum.Add(centroid);
        }
    };

    /// A right child yet to be built.
    struct Pending {
        AabbNode* poNode;
        Span oSpan;
    };

    /// Builds a node, then its left child and so on; the right children wait.
    void BuildLeftwards(AabbNode& rTop, Span span) {
        for (AabbNode* node = &rTop;;) {
            mrTree.IncreaseNodeCount();
            node->moBBox.min = span.oExtent.min;
            node->moBBox.max = span.oExtent.max;
            Span left;
            Span right;
            if (mrTree.TestCapacity(static_cast<int>(span.Size()))) {
                KeepLeaf(*node, span);
                return;
            }
            if (!Divide(span, left, right)) {
                RaiseCapacity(*node, span);
                return;
            }
            node->mpoLeft = moBlocks.MakePair();
            node->mpoRight = node->mpoLeft + 1;
            moPending.push_back({node->mpoRight, right});
            node = node->mpoLeft;
            span = left;
        }
    }

    void KeepLeaf(AabbNode& rNode, const Span& span) const {
        rNode.moLeaves.assign(moOrder.data() + span.first, moOrder.data() + span.last);
    }

    void RaiseCapacity(AabbNode& rNode, const Span& span) {
        const int size = static_cast<int>(span.Size());
        tellus::Report::AddInfo(
            FormatString("\n* AabbTree::mnCapacity is changing from %d to %d in CreateChild()\n",
                         static_cast<int>(mrTree.GetCapacity()), size));
        KeepLeaf(rNode, span);
        mrTree.SetCapacity(size);
    }

    /// Divides on the axis of the division type, or else on the other one, at the same centre.
    /// False if neither leaves a triangle on both sides.
    bool Divide(const Span& span, Span& left, Span& right) {
        float center[2];
        span.oSum.GetMean(span.Size(), center);
        const Axis axis = mrTree.GetDivisionType() == DT_BestAxis
                              ? BestAxis(mpoTriangles, moOrder.data() + span.first,
                                         moOrder.data() + span.last, center)
                              : LongestAxis(span.oExtent.min, span.oExtent.max);
        return DivideAt(span, axis, center, left, right) ||
               DivideAt(span, axis == AX_X ? AX_Y : AX_X, center, left, right);
    }

    /// The left side keeps its order at the front of the stretch, the right side behind it.
    bool DivideAt(const Span& span, Axis axis, const float* center, Span& left, Span& right) {
        if (moRight.empty())
            moRight.resize(span.Size());
        left = Span{span.first, span.first, {}, {}};
        right = Span{0, 0, {}, {}};
        const float split = center[axis];
        for (std::size_t i = span.first; i != span.last; ++i) {
            const unsigned id = moOrder[i];
            const Triangle& triangle = mpoTriangles[id];
            const point2_t<float> centroid = CentroidOf(triangle);
            if (SideOf(At(centroid, axis), split) == DS_Left) {
                left.Add(triangle, centroid);
                moOrder[left.last++] = id;
            } else {
                right.Add(triangle, centroid);
                moRight[right.last++] = id;
            }
        }
        std::copy_n(moRight.begin(), right.last, moOrder.begin() + std::ptrdiff_t(left.last));
        right.first = left.last;
        right.last = span.last;
        return left.Size() != 0 && right.Size() != 0;
    }

    const Triangle* mpoTriangles;
    std::vector<unsigned> moOrder;
    std::vector<unsigned>
        moRight; ///< right side of the division at hand; as long as the first list
    std::vector<Pending> moPending;
    Blocks moBlocks;
    AabbTree& mrTree;
};

AabbNode::~AabbNode() {
    if (mpoLeft != nullptr)
        Blocks::ReleaseBelow(mpoLeft);
}

void AabbNode::CreateChild(const Triangle* triangles, const std::vector<unsigned>& list,
                           AabbTree* tree) {
    Builder(triangles, list, *tree).Build(*this);
}

void AabbNode::FindLeaves(float x, float y, std::vector<unsigned>& list) const {
    detail::VisitLeaves(
        this, [=](const Box& box) { return TestInside(box, x, y); },
        [&](const std::vector<unsigned>& leaves) {
            list.insert(list.end(), leaves.begin(), leaves.end());
        });
}

void AabbNode::FindLeaves(const Box& box, std::vector<unsigned>& list) const {
    detail::VisitLeaves(
        this, [&](const Box& node) { return TestOverlap(node, box); },
        [&](const std::vector<unsigned>& leaves) {
            list.insert(list.end(), leaves.begin(), leaves.end());
        });
}

template <typename P>
void AabbNode::FindLeavesByLine(const P& a, const P& b, std::vector<unsigned>& out) const {
    const detail::SegmentProbe probe(a, b);
    detail::VisitLeaves(
        this, [&](const Box& box) { return probe.IsMet(box); },
        [&](const std::vector<unsigned>& leaves) {
            out.insert(out.end(), leaves.begin(), leaves.end());
        });
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
    Extent extent;
    for (const unsigned id : list)
        extent.Add(triangles[id].GetBBox());
    moBBox.min = extent.min;
    moBBox.max = extent.max;
}

void AabbNode::ComputeCenter(const Triangle* triangles, const std::vector<unsigned>& list,
                             float* center) const {
    CentroidSum sum;
    for (const unsigned id : list)
        sum.Add(CentroidOf(triangles[id]));
    sum.GetMean(list.size(), center);
}

Axis AabbNode::GetLongestAxis() const {
    return LongestAxis(moBBox.min, moBBox.max);
}

Axis AabbNode::GetBestAxis(const Triangle* triangles, const std::vector<unsigned>& list,
                           const float* center) const {
    return BestAxis(triangles, list.data(), list.data() + list.size(), center);
}

DivisionSide AabbNode::WhichSide(const Triangle* triangle, Axis axis, const float* center) const {
    return SideOf(At(CentroidOf(*triangle), axis), center[axis]);
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

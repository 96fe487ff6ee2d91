#pragma once

#include "tin/index/division.h"
#include "tin/index/nodeblocks.h"
#include "tin/rules/extent.h"

#include <algorithm>
#include <utility>
#include <vector>

namespace kelm::tin::index {

/// One build of a tree over triangles.
///
/// It divides one array of indices in place. Each division gathers what its two sides need for
/// their own: their boxes, and the sums of their centroids, each in the order of the side. A stack
/// of its own keeps the depth of a tree off the caller's.
///
/// @tparam Site what a build writes to: CountNode(), IsLeaf(n), RaiseCapacity(n) for the tree,
/// SetBox(node, extent), SetLeaves(node, first, last), SetChildren(node, pair) for a node
template <typename Node, typename Site>
class NodeBuilder {
  public:
    /// @param order the indices of the triangles, ascending
    /// @param bestAxis is the axis of a division chosen by BestAxis, or by LongestAxis?
    NodeBuilder(const Triangle* triangles, std::vector<unsigned> order, bool bestAxis, Site site,
                NodeBlock*& firstBlock)
        : mpoTriangles(triangles), moOrder(std::move(order)), mbBestAxis(bestAxis), moSite(site),
          moBlocks(firstBlock) {}

    /// Builds the tree below its top, depth first, left before right.
    /// @throw std::bad_alloc; what was built so far is linked
    void Build(Node& top) {
        Span span{0, moOrder.size(), {}, {}};
        for (const unsigned id : moOrder)
            span.Add(mpoTriangles[id], CentroidOf(mpoTriangles[id]));
        BuildLeftwards(top, span);
        while (!moPending.empty()) {
            const auto [node, rest] = moPending.back();
            moPending.pop_back();
            BuildLeftwards(*node, rest);
        }
    }

  private:
    /// A stretch of the index array, with what was gathered over it.
    struct Span {
        std::size_t first;
        std::size_t last;
        rules::Extent<float> extent;
        CentroidSum sum;

        std::size_t Size() const { return last - first; }
        void Add(const Triangle& triangle, const point2_t<float>& centroid) {
            extent.Add(triangle.GetBBox());
            sum.Add(centroid);
        }
    };

    /// Builds a node, then its left child and so on; the right children wait.
    void BuildLeftwards(Node& top, Span span) {
        for (Node* node = &top;;) {
            moSite.CountNode();
            moSite.SetBox(*node, span.extent);
            const int size = static_cast<int>(span.Size());
            Span left;
            Span right;
            const bool isSmall = moSite.IsLeaf(size);
            if (isSmall || !Divide(span, left, right)) {
                // An indivisible set is a leaf, whatever the capacity.
                if (!isSmall)
                    moSite.RaiseCapacity(size);
                moSite.SetLeaves(*node, moOrder.data() + span.first, moOrder.data() + span.last);
                return;
            }
            Node* pair = moBlocks.MakePair();
            moSite.SetChildren(*node, pair);
            moPending.emplace_back(pair + 1, right);
            node = pair;
            span = left;
        }
    }

    /// Divides on the axis of choice, or else on the other one, at the same centre.
    /// @return false if neither leaves a triangle on both sides
    bool Divide(const Span& span, Span& left, Span& right) {
        float center[2];
        span.sum.GetMean(span.Size(), center);
        const Axis axis = ChooseAxis(span, center);
        return DivideAt(span, axis, center, left, right) ||
               DivideAt(span, axis == AX_X ? AX_Y : AX_X, center, left, right);
    }

    Axis ChooseAxis(const Span& span, const float* center) const {
        if (!mbBestAxis)
            return LongestAxis(span.extent.GetMin(), span.extent.GetMax());
        const unsigned* order = moOrder.data();
        return BestAxis(mpoTriangles, order + span.first, order + span.last, center);
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
            if (IsLeft(At(centroid, axis), split)) {
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
    std::vector<unsigned> moRight;                 ///< right side of the division at hand
    std::vector<std::pair<Node*, Span>> moPending; ///< right children yet to be built
    bool mbBestAxis;
    Site moSite;
    NodeBlocks<Node> moBlocks;
};

} // namespace kelm::tin::index

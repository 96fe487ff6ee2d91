#pragma once

#include "tin/index/spandivider.h"

#include <utility>
#include <vector>

namespace kelm::tin::index {

/// Builds nodes on one thread.
///
/// A stack of its own keeps the depth of a tree off the caller's.
///
/// @tparam Site what a build writes to: CountNode(), IsLeaf(n), RaiseCapacity(n) for the tree,
/// SetBox(node, extent), SetLeaves(node, first, last), SetChildren(node, pair) for a node
/// @tparam Pairs has MakePair(), as NodeBlocks
template <typename Node, typename Site, typename Pairs>
class NodeBuilder {
  public:
    NodeBuilder(SpanDivider& rDivider, Site& rSite, Pairs& rPairs)
        : mrDivider(rDivider), mrSite(rSite), mrPairs(rPairs) {}

    /// Builds all nodes from one on, depth first, left before right.
    /// @throw std::bad_alloc; what was built so far is linked
    void Build(Node& rTop, const Span& span) {
        moPending.emplace_back(&rTop, span);
        while (!moPending.empty()) {
            const auto [node, rest] = moPending.back();
            moPending.pop_back();
            BuildLeftwards(*node, rest);
        }
    }

    /// Builds a node without those below it.
    /// @return the left of its two children, which are yet to be built; null for a leaf
    Node* BuildOne(Node& rNode, const Span& span, Span& rLeft, Span& rRight) {
        mrSite.CountNode();
        mrSite.SetBox(rNode, span.extent);
        const int size = static_cast<int>(span.Size());
        const bool isSmall = mrSite.IsLeaf(size);
        if (isSmall || !mrDivider.Divide(span, rLeft, rRight)) {
            // An indivisible set is a leaf, whatever the capacity.
            if (!isSmall)
                mrSite.RaiseCapacity(size);
            const unsigned* order = mrDivider.GetOrder();
            mrSite.SetLeaves(rNode, order + span.first, order + span.last);
            return nullptr;
        }
        Node* pair = mrPairs.MakePair();
        mrSite.SetChildren(rNode, pair);
        return pair;
    }

  private:
    /// Builds a node, then its left child and so on; the right children wait.
    void BuildLeftwards(Node& rTop, Span span) {
        Span left;
        Span right;
        for (Node* node = &rTop; (node = BuildOne(*node, span, left, right)) != nullptr;) {
            moPending.emplace_back(node + 1, right);
            span = left;
        }
    }

    SpanDivider& mrDivider;
    Site& mrSite;
    Pairs& mrPairs;
    std::vector<std::pair<Node*, Span>> moPending; ///< right children yet to be built
};

} // namespace kelm::tin::index

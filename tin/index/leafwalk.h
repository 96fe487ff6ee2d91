#pragma once

#include "tin/index/prefetch.h"

#include <array>
#include <cstddef>
#include <vector>

namespace kelm::tin::index {

/// Nodes that a walk has yet to visit, last in first out. The common depth needs no allocation.
template <typename Node>
class PendingNodes {
  public:
    bool IsEmpty() const { return mnLocal == 0; }

    void Push(const Node* node) {
        if (mnLocal < maoLocal.size())
            maoLocal[mnLocal++] = node;
        else
            moMore.push_back(node);
    }

    const Node* Pop() {
        if (moMore.empty())
            return maoLocal[--mnLocal];
        const Node* node = moMore.back();
        moMore.pop_back();
        return node;
    }

  private:
    std::array<const Node*, 48> maoLocal;
    std::size_t mnLocal = 0;
    std::vector<const Node*> moMore;
};

/// Asks for what a walk needs next if it enters the node: most of its time is waiting for memory.
template <typename Node>
void PrefetchBelow(const Node* node) {
    Prefetch(node->GetLeft());
    Prefetch(node->GetRight());
    Prefetch(node->GetLeaves().data());
}

/// Calls visit(list) for every leaf that can be reached from the root through boxes for which
/// meets(box) holds, depth first, left before right. A null root has no leaves; a node has both
/// children or none.
template <typename Node, typename Meets, typename Visit>
void VisitLeaves(const Node* root, const Meets& meets, const Visit& visit) {
    if (root == nullptr || !meets(root->GetBBox()))
        return;
    PendingNodes<Node> pending;
    for (const Node* node = root;;) {
        const Node* left = node->GetLeft();
        const Node* right = node->GetRight();
        bool goesLeft = false;
        bool goesRight = false;
        if (left == nullptr) {
            visit(node->GetLeaves());
        } else {
            PrefetchBelow(left);
            PrefetchBelow(right);
            goesLeft = meets(left->GetBBox());
            goesRight = meets(right->GetBBox());
        }
        if (goesLeft) {
            if (goesRight)
                pending.Push(right);
            node = left;
        } else if (goesRight) {
            node = right;
        } else if (pending.IsEmpty()) {
            return;
        } else {
            node = pending.Pop();
        }
    }
}

} // namespace kelm::tin::index

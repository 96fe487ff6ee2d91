#pragma once

#include "tin/aabbtree.h"
#include "tin/detail/prefetch.h"

#include <array>
#include <vector>

namespace kelm::tin::detail {

/// Nodes that a walk has yet to visit, last in first out. The common depth needs no allocation.
class PendingNodes {
  public:
    bool IsEmpty() const { return mnLocal == 0; }

    void Push(const AabbNode* poNode) {
        if (mnLocal < mao.size())
            mao[mnLocal++] = poNode;
        else
            moMore.push_back(poNode);
    }

    const AabbNode* Pop() {
        if (moMore.empty())
            return mao[--mnLocal];
        const AabbNode* poNode = moMore.back();
        moMore.pop_back();
        return poNode;
    }

  private:
    std::array<const AabbNode*, 48> mao;
    std::size_t mnLocal = 0;
    std::vector<const AabbNode*> moMore;
};

/// Asks for what a walk needs next if it enters the node: most of its time is waiting for memory.
inline void PrefetchBelow(const AabbNode* poNode) {
    Prefetch(poNode->GetLeft());
    Prefetch(poNode->GetRight());
    Prefetch(poNode->GetLeaves().data());
}

/// Calls visit(list) for every leaf that can be reached from poRoot through boxes for which
/// meets(box) holds, depth first, left before right. A null root has no leaves; a node has both
/// children or none.
template <typename Meets, typename Visit>
void VisitLeaves(const AabbNode* poRoot, const Meets& meets, const Visit& visit) {
    if (poRoot == nullptr || !meets(poRoot->GetBBox()))
        return;
    PendingNodes pending;
    for (const AabbNode* node = poRoot;;) {
        const AabbNode* left = node->GetLeft();
        const AabbNode* right = node->GetRight();
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

} // namespace kelm::tin::detail

#pragma once

#include "tin/aabbtree.h"

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

/// Calls visit(list) for every leaf that can be reached from poRoot through boxes for which
/// meets(box) holds, depth first, left before right. A null root has no leaves; neither has a
/// child that a build stopped by a failed allocation never made.
template <typename Meets, typename Visit>
void VisitLeaves(const AabbNode* poRoot, const Meets& meets, const Visit& visit) {
    const auto enters = [&](const AabbNode* poNode) {
        return poNode != nullptr && meets(poNode->GetBBox());
    };
    if (!enters(poRoot))
        return;
    PendingNodes pending;
    for (const AabbNode* node = poRoot;;) {
        const AabbNode* left = node->GetLeft();
        const AabbNode* right = node->GetRight();
        if (left == nullptr && right == nullptr)
            visit(node->GetLeaves());
        const bool goesRight = enters(right);
        if (enters(left)) {
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

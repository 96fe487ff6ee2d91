#pragma once

#include "containers/keypoint.h"

namespace kelm::containers {

/// Node of an OctoTree: a leaf holds one point under its key, an inner node holds children only.
template <typename T, typename K>
class OctoTreeNode {
  public:
    /// Bounds of a cell.
    struct Box {
        KeyPoint<T> min;
        KeyPoint<T> max;
    };

    OctoTreeNode() = default;
    OctoTreeNode(const OctoTreeNode&) = delete;
    OctoTreeNode& operator=(const OctoTreeNode&) = delete;
    virtual ~OctoTreeNode() = default;

    bool IsLeaf() const {
        for (const OctoTreeNode* child : mpoChild)
            if (child != nullptr)
                return false;
        return true;
    }

    K mnKey = K(-1);
    KeyPoint<T> moPoint{T(-1), T(-1), T(-1)};
    Box moBox{{T(-1), T(-1), T(-1)}, {T(-1), T(-1), T(-1)}};
    /// By octant number: 4 for the high side in y, plus 2 in x, plus 1 in z.
    OctoTreeNode* mpoChild[8] = {};
};

} // namespace kelm::containers

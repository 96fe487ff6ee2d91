#pragma once

#include "containers/keypoint.h"
#include "containers/octotree.h"
#include "tin/tinexport.h"

#include <vector>

namespace kelm::tin {

/// Octree that welds the corners of a load, in map coordinates, heights included.
///
/// A tree is made whole by its constructor and is then only searched.
class KELM_TIN_EXPORT Octree2 : public containers::OctoTree<double, unsigned> {
  public:
    /// Inserts all points in order. @param points not empty; not changed @param keys at the call
    /// the key of each point; on return 1 if the point is held and 0 if it was dropped
    /// @throw std::bad_alloc
    Octree2(std::vector<containers::KeyPoint<double>>& points, std::vector<unsigned>& keys);

  private:
    /// Cell around all finite points, with a margin of 1.0 on every side.
    static Box ComputeBounds(const std::vector<containers::KeyPoint<double>>& points);
};

static_assert(sizeof(containers::OctoTreeNode<double, unsigned>) == 152 && sizeof(Octree2) <= 80,
              "an estimate accounts 152 bytes for a node and 80 for the tree");

} // namespace kelm::tin

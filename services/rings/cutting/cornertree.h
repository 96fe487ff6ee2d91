#pragma once

#include "services/rings/cutting/steplimit.h"
#include "services/rings/ear.h"

#include <array>
#include <vector>

namespace kelm::rings {

/// Tree of boxes over the corners of a ring that are left to cut off.
class CornerTree {
  public:
    static constexpr unsigned NONE = 0xFFFFFFFFU;

    struct Item {
        Point at; ///< without NaN, and so near the origin that no product overflows
        unsigned corner;
    };
    using Three = std::array<unsigned, 3>;

    /// @param corners bound of the corners' numbers @throw std::bad_alloc
    explicit CornerTree(unsigned corners) : moLeaves(corners) {}

    /// Holds these corners and no others. @throw std::bad_alloc
    void Build(std::vector<Item> oItems);

    /// Drops a corner that it holds.
    void Remove(unsigned corner);

    /// @param rLimit counts the nodes that are visited
    /// @return a corner inside a triangle other than the triangle's own; NONE without one
    unsigned FindInside(const EarTriangle& triangle, const Three& own, StepLimit& rLimit) const;

  private:
    struct Query;
    struct Node {
        Box box;
        OrientedBox slanted; ///< for corners that are nearly on one line
        unsigned first;      ///< items from here
        unsigned count;      ///< that are left, below the node
    };

    Node Fit(unsigned first, unsigned last) const;
    OrientedBox FitSlanted(unsigned first, unsigned last) const;
    Point FindAxis(unsigned first, unsigned last) const;
    void Fill(unsigned node, unsigned first, unsigned last);
    void Halve(const Node& node, unsigned middle, unsigned last);
    unsigned FindBelow(unsigned node, const Query& query) const;
    unsigned FindInLeaf(const Node& node, const Query& query) const;

    std::vector<Item> moItems;      ///< of a leaf side by side, those that are left first
    std::vector<Node> moNodes;      ///< the children of k are 2 k and 2 k + 1, the root is 1
    std::vector<unsigned> moLeaves; ///< by corner
    unsigned mnFirstLeaf = 1;
    Point moOrigin{};      ///< of slanted boxes
    double mdfSlack = 0.0; ///< of slanted boxes
};

} // namespace kelm::rings

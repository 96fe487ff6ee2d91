#pragma once

#include "tin/crossing/layout.h"

#include <cstddef>
#include <vector>

namespace kelm::tin::crossing {

/// Makes the upper nodes over nodes of blocks from divisions in two: each takes up to eight parts,
/// the largest of which are divided first.
class Links {
  public:
    /// @param lefts as Builder has them
    explicit Links(const Array<unsigned>& lefts) : mrLefts(lefts) {}

    /// Adds a tree. @param place of its first division @return the number of its root
    unsigned AddTree(std::size_t place, unsigned groups, unsigned firstGroup, unsigned allGroups);
    /// Makes the nodes, with the boxes of all that is below. @throw std::bad_alloc
    Array<UpperNode> CreateNodes(const Array<Node>& groupNodes, unsigned allGroups) const;

  private:
    struct Part {
        std::size_t place;
        unsigned groups;
        unsigned firstGroup;
    };
    struct Children {
        unsigned numbers[WIDTH];
        unsigned count;
    };

    unsigned Divide(const Part& whole, Part* parts) const;

    const Array<unsigned>& mrLefts;
    std::vector<Part> moWaiting;
    std::vector<Children> moChildren;
};

/// Sets the box of a child. @param planes low x, y, z, then high x, y, z
void SetBox(Node& rNode, unsigned child, const float* planes);
/// The box of no child.
void ClearBox(Node& rNode, unsigned child);

} // namespace kelm::tin::crossing

#include "tin/crossing/build/links.h"

#include <algorithm>

namespace kelm::tin::crossing {

namespace {

/// The box around all children of a node.
void ComputeBox(const Node& node, float* planes) {
    for (unsigned axis = 0; axis < 3; ++axis) {
        planes[axis] = *std::min_element(node.planes[axis], node.planes[axis] + WIDTH);
        planes[axis + 3] = *std::max_element(node.planes[axis + 3], node.planes[axis + 3] + WIDTH);
    }
}

} // namespace

void SetBox(Node& rNode, unsigned child, const float* planes) {
    for (unsigned plane = 0; plane < 6; ++plane)
        rNode.planes[plane][child] = planes[plane];
}

void ClearBox(Node& rNode, unsigned child) {
    constexpr float INFINITE = std::numeric_limits<float>::infinity();
    constexpr float NOTHING[] = {INFINITE, INFINITE, INFINITE, -INFINITE, -INFINITE, -INFINITE};
    SetBox(rNode, child, NOTHING);
}

unsigned Links::AddTree(std::size_t place, unsigned groups, unsigned firstGroup,
                        unsigned allGroups) {
    if (groups == 1)
        return firstGroup;
    const auto root = static_cast<unsigned>(moWaiting.size());
    moWaiting.push_back({place, groups, firstGroup});
    for (std::size_t next = root; next < moWaiting.size(); ++next) {
        Part parts[WIDTH];
        Children children{{}, Divide(moWaiting[next], parts)};
        for (unsigned k = 0; k < children.count; ++k) {
            const bool isGroup = parts[k].groups == 1;
            children.numbers[k] =
                isGroup ? parts[k].firstGroup : allGroups + static_cast<unsigned>(moWaiting.size());
            if (!isGroup)
                moWaiting.push_back(parts[k]);
        }
        moChildren.push_back(children);
    }
    return allGroups + root;
}

unsigned Links::Divide(const Part& whole, Part* parts) const {
    unsigned count = 1;
    parts[0] = whole;
    const auto isLess = [](const Part& a, const Part& b) { return a.groups < b.groups; };
    while (count < WIDTH) {
        Part& largest = *std::max_element(parts, parts + count, isLess);
        if (largest.groups == 1)
            break;
        const unsigned left = mrLefts[largest.place];
        parts[count++] = {largest.place + 2 * std::size_t{left}, largest.groups - left,
                          largest.firstGroup + left};
        largest = {largest.place + 1, left, largest.firstGroup};
    }
    return count;
}

Array<UpperNode> Links::CreateNodes(const Array<Node>& groupNodes, unsigned allGroups) const {
    Array<UpperNode> nodes(moChildren.size());
    // Children stand behind their parents.
    for (std::size_t i = moChildren.size(); i-- > 0;)
        for (unsigned k = 0; k < WIDTH; ++k) {
            const Children& children = moChildren[i];
            const bool isThere = k < children.count;
            const unsigned number = isThere ? children.numbers[k] : 0;
            nodes[i].children[k] = number;
            if (!isThere) {
                ClearBox(nodes[i].boxes, k);
                continue;
            }
            float planes[6];
            ComputeBox(number < allGroups ? groupNodes[number] : nodes[number - allGroups].boxes,
                       planes);
            SetBox(nodes[i].boxes, k, planes);
        }
    return nodes;
}

} // namespace kelm::tin::crossing

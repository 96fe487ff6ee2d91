#include "services/rings/cutting/cornertree.h"

#include <algorithm>

namespace kelm::rings {

namespace {

constexpr unsigned LEAF_CORNERS = 8;

} // namespace

struct CornerTree::Query {
    const EarTriangle& triangle;
    Box reach;
    const Three& own;
    StepLimit& rLimit;

    bool TestOutside(const Point& low, const Point& high) const {
        return low.x > reach.high.x || reach.low.x > high.x || low.y > reach.high.y ||
               reach.low.y > high.y || triangle.TestOutside(low, high);
    }
    bool TestInside(const Item& item) const {
        return triangle.TestInside(item.at.x, item.at.y) && item.corner != own[0] &&
               item.corner != own[1] && item.corner != own[2];
    }
};

void CornerTree::Build(std::vector<Item> oItems) {
    moItems = std::move(oItems);
    const auto count = static_cast<unsigned>(moItems.size());
    mnFirstLeaf = 1;
    while (mnFirstLeaf * LEAF_CORNERS < count)
        mnFirstLeaf *= 2;
    moNodes.resize(2 * std::size_t{mnFirstLeaf});
    Fill(1, 0, count);
}

void CornerTree::Fill(unsigned node, unsigned first, unsigned last) {
    Box box;
    for (unsigned i = first; i < last; ++i)
        box.Add(moItems[i].at);
    moNodes[node] = {box.low, box.high, first, last - first};
    if (node >= mnFirstLeaf) {
        for (unsigned i = first; i < last; ++i)
            moLeaves[moItems[i].corner] = node;
        return;
    }
    const unsigned middle = first + (last - first) / 2;
    Halve(moNodes[node], middle, last);
    Fill(2 * node, first, middle);
    Fill(2 * node + 1, middle, last);
}

/// Puts the lower items first, on the longer axis of the node.
void CornerTree::Halve(const Node& node, unsigned middle, unsigned last) {
    const auto at = [&](unsigned i) { return moItems.begin() + static_cast<std::ptrdiff_t>(i); };
    if (node.high.x - node.low.x > node.high.y - node.low.y)
        std::nth_element(at(node.first), at(middle), at(last),
                         [](const Item& a, const Item& b) { return a.at.x < b.at.x; });
    else
        std::nth_element(at(node.first), at(middle), at(last),
                         [](const Item& a, const Item& b) { return a.at.y < b.at.y; });
}

void CornerTree::Remove(unsigned corner) {
    const Node& leaf = moNodes[moLeaves[corner]];
    unsigned at = leaf.first;
    while (moItems[at].corner != corner)
        ++at;
    std::swap(moItems[at], moItems[leaf.first + leaf.count - 1]);
    for (unsigned node = moLeaves[corner]; node > 0; node /= 2)
        --moNodes[node].count;
}

unsigned CornerTree::FindInside(const EarTriangle& triangle, const Three& own,
                                StepLimit& rLimit) const {
    Query query{triangle, triangle.GetReach(), own, rLimit};
    return FindBelow(1, query);
}

unsigned CornerTree::FindBelow(unsigned node, Query& rQuery) const {
    const Node& at = moNodes[node];
    rQuery.rLimit.Count(1);
    if (at.count == 0 || rQuery.TestOutside(at.low, at.high))
        return NONE;
    if (node >= mnFirstLeaf)
        return FindInLeaf(at, rQuery);
    const unsigned corner = FindBelow(2 * node, rQuery);
    return corner != NONE ? corner : FindBelow(2 * node + 1, rQuery);
}

unsigned CornerTree::FindInLeaf(const Node& node, const Query& query) const {
    for (unsigned i = node.first; i < node.first + node.count; ++i)
        if (query.TestInside(moItems[i]))
            return moItems[i].corner;
    return NONE;
}

} // namespace kelm::rings

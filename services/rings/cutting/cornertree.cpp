#include "services/rings/cutting/cornertree.h"

#include <algorithm>
#include <utility>

namespace kelm::rings {

namespace {

constexpr unsigned LEAF_CORNERS = 8;

} // namespace

struct CornerTree::Query {
    const EarTriangle& triangle;
    Box reach;
    const Three& own;
    const Point& origin;
    StepLimit& limit;

    bool TestOutside(const Node& node) const {
        const auto& [low, high] = node.box;
        return low.x > reach.high.x || reach.low.x > high.x || low.y > reach.high.y ||
               reach.low.y > high.y || triangle.TestOutside(low, high) ||
               triangle.TestOutside(node.slanted, origin);
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
    Box box;
    for (const Item& item : moItems)
        box.Add(item.at);
    moOrigin = moItems[0].at;
    mdfSlack = 0x1p-44 * std::max(box.GetSize().x, box.GetSize().y);
    moNodes.assign(2 * std::size_t{mnFirstLeaf}, Node{box, {{1.0, 0.0}, box, 0.0}, 0, 0});
    Fill(1, 0, count);
}

void CornerTree::Fill(unsigned node, unsigned first, unsigned last) {
    moNodes[node] = Fit(first, last);
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

CornerTree::Node CornerTree::Fit(unsigned first, unsigned last) const {
    Box box;
    for (unsigned i = first; i < last; ++i)
        box.Add(moItems[i].at);
    return {box, FitSlanted(first, last), first, last - first};
}

OrientedBox CornerTree::FitSlanted(unsigned first, unsigned last) const {
    const Point axis = FindAxis(first, last);
    Box extent;
    for (unsigned i = first; i < last; ++i) {
        const Point p = Subtract(moItems[i].at, moOrigin);
        extent.Add(Point{Dot(axis, p), Cross(axis, p)});
    }
    return {axis, extent, mdfSlack};
}

/// @return direction from the first item to the one farthest from it
Point CornerTree::FindAxis(unsigned first, unsigned last) const {
    Point axis{1.0, 0.0};
    double square = 0x1p-900; // below, its root has few digits
    for (unsigned i = first + 1; i < last; ++i) {
        const Point r = Subtract(moItems[i].at, moItems[first].at);
        if (const double other = Dot(r, r); other > square) {
            square = other;
            axis = r;
        }
    }
    const double length = std::sqrt(square);
    return square > 0x1p-900 ? Point{axis.x / length, axis.y / length} : axis;
}

/// Puts the lower items first, on the longer axis of the node.
void CornerTree::Halve(const Node& node, unsigned middle, unsigned last) {
    const auto at = [&](unsigned i) { return moItems.begin() + static_cast<std::ptrdiff_t>(i); };
    if (node.box.GetSize().x > node.box.GetSize().y)
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
    return FindBelow(1, {triangle, triangle.GetReach(), own, moOrigin, rLimit});
}

unsigned CornerTree::FindBelow(unsigned node, const Query& query) const {
    const Node& at = moNodes[node];
    query.limit.Count(1);
    if (at.count == 0 || query.TestOutside(at))
        return NONE;
    if (node >= mnFirstLeaf)
        return FindInLeaf(at, query);
    const unsigned corner = FindBelow(2 * node, query);
    return corner != NONE ? corner : FindBelow(2 * node + 1, query);
}

unsigned CornerTree::FindInLeaf(const Node& node, const Query& query) const {
    for (unsigned i = node.first; i < node.first + node.count; ++i)
        if (query.TestInside(moItems[i]))
            return moItems[i].corner;
    return NONE;
}

} // namespace kelm::rings

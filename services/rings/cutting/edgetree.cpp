#include "services/rings/cutting/edgetree.h"

#include <algorithm>

namespace kelm::rings {

namespace {

constexpr unsigned MOST_LEAF_EDGES = 8;

/// Least gap between boxes that are apart, in parts of their size together.
constexpr double LEAST_GAP = 0x1p-5;

/// So many parts of their size are more than rounding moves an edge across another.
constexpr double LEAST_LEAN = 0x1p-40;

Point GetDirection(const Edge& edge) {
    return Subtract(edge.to, edge.from);
}

} // namespace

EdgeTree::EdgeTree(const Point* points, unsigned edges, StepLimit& rLimit)
    : moLimit(rLimit), moOrigin(points[0]) {
    Box box;
    moEdges.reserve(edges);
    for (unsigned i = 0; i < edges; ++i) {
        moEdges.push_back({points[i], points[i + 1], i});
        box.Add(points[i]);
        box.Add(points[i + 1]);
    }
    mdfSlack = 0x1p-44 * std::max(box.GetSize().x, box.GetSize().y);
    moNodes.reserve(edges / 2 + 2);
    Build(0, edges);
}

unsigned EdgeTree::Build(unsigned first, unsigned last) {
    const auto node = static_cast<unsigned>(moNodes.size());
    moNodes.push_back(Fit(first, last));
    if (last - first > MOST_LEAF_EDGES) {
        const unsigned middle = first + (last - first) / 2;
        Halve(first, middle, last);
        Build(first, middle);
        moNodes[node].right = Build(middle, last);
    }
    return node;
}

EdgeTree::Node EdgeTree::Fit(unsigned first, unsigned last) const {
    const Point axis = FindAxis(first, last);
    Box box; // x along the axis, y across it
    for (unsigned i = first; i < last; ++i)
        for (const Point& end : {moEdges[i].from, moEdges[i].to}) {
            const Point p = Subtract(end, moOrigin);
            box.Add(Point{Dot(axis, p), Cross(axis, p)});
        }
    return {{axis, box, mdfSlack}, FindLean(axis, first, last), first, last};
}

/// @return direction of the longest edge
Point EdgeTree::FindAxis(unsigned first, unsigned last) const {
    Point axis{0.0, 0.0};
    double square = 0.0;
    for (unsigned i = first; i < last; ++i) {
        const Point r = GetDirection(moEdges[i]);
        if (const double other = Dot(r, r); other > square) {
            square = other;
            axis = r;
        }
    }
    const double length = std::sqrt(square);
    return {axis.x / length, axis.y / length};
}

double EdgeTree::FindLean(const Point& axis, unsigned first, unsigned last) const {
    double square = 0.0;
    for (unsigned i = first; i < last; ++i) {
        const Point r = GetDirection(moEdges[i]);
        const double across = Cross(axis, r);
        square = std::max(square, across * across / Dot(r, r));
    }
    return 2.0 * std::sqrt(square) + LEAST_LEAN;
}

/// Puts the edges with the lower midpoints first, on the axis on which they spread further.
void EdgeTree::Halve(unsigned first, unsigned middle, unsigned last) {
    Box box;
    const auto getMiddle = [](const Edge& edge) {
        return Point{edge.from.x + edge.to.x, edge.from.y + edge.to.y};
    };
    for (unsigned i = first; i < last; ++i)
        box.Add(getMiddle(moEdges[i]));
    const Point size = box.GetSize();
    const auto at = [&](unsigned i) { return moEdges.begin() + static_cast<std::ptrdiff_t>(i); };
    if (size.x > size.y)
        std::nth_element(at(first), at(middle), at(last), [&](const Edge& a, const Edge& b) {
            return getMiddle(a).x < getMiddle(b).x;
        });
    else
        std::nth_element(at(first), at(middle), at(last), [&](const Edge& a, const Edge& b) {
            return getMiddle(a).y < getMiddle(b).y;
        });
}

bool EdgeTree::TestWithin(unsigned node) {
    const unsigned right = moNodes[node].right;
    if (right == 0)
        return TestEdges(moNodes[node], moNodes[node]);
    return TestWithin(node + 1) || TestWithin(right) || TestBetween(node + 1, right);
}

bool EdgeTree::TestBetween(unsigned node, unsigned other) {
    const Node& a = moNodes[node];
    const Node& b = moNodes[other];
    moLimit.Count(1);
    if (moLimit.IsReached() || TestApart(a, b))
        return false;
    if (a.right == 0 && b.right == 0)
        return TestEdges(a, b);
    // Nodes of one level have nearly as many edges.
    if (b.right == 0 || (a.right != 0 && a.last - a.first >= b.last - b.first))
        return TestBetween(node + 1, other) || TestBetween(a.right, other);
    return TestBetween(node, other + 1) || TestBetween(node, b.right);
}

bool EdgeTree::TestEdges(const Node& node, const Node& other) {
    for (unsigned i = node.first; i < node.last; ++i) {
        const Edge& a = moEdges[i];
        const Point r = GetDirection(a);
        double meets = 0.0; // counted in double, for want of integer lanes of its width
#pragma omp simd reduction(+ : meets)
        for (unsigned j = other.first; j < other.last; ++j)
            meets += TestMeeting(a.from, r, moEdges[j].from, moEdges[j].to) ? 1.0 : 0.0;
        if (meets != 0.0 && TestMeetsStranger(a, other))
            return true;
    }
    moLimit.Count(node.last - node.first);
    return false;
}

/// Does an edge meet one of a leaf that does not follow it, nor it that?
bool EdgeTree::TestMeetsStranger(const Edge& edge, const Node& leaf) const {
    const auto first = moEdges.begin() + static_cast<std::ptrdiff_t>(leaf.first);
    const auto last = moEdges.begin() + static_cast<std::ptrdiff_t>(leaf.last);
    return std::any_of(first, last, [&](const Edge& other) {
        return edge.number - other.number + 1U > 2U &&
               TestMeeting(edge.from, GetDirection(edge), other.from, other.to);
    });
}

/// Are the boxes apart on an axis of one of them (Gottschalk, Lin and Manocha 1996)?
///
/// A gap beside one box is enough if it is wider than the lines of its edges lean into, over the
/// size of both boxes: then the other box lies on one side of all these lines.
bool EdgeTree::TestApart(const Node& node, const Node& other) {
    const OrientedBox& a = node.box;
    const OrientedBox& b = other.box;
    const Point d = Subtract(b.center, a.center);
    const double c = std::fabs(Dot(a.axis, b.axis));
    const double s = std::fabs(Cross(a.axis, b.axis));
    const double besideA =
        std::fabs(Cross(a.axis, d)) - a.halfAcross - b.halfAlong * s - b.halfAcross * c;
    const double besideB =
        std::fabs(Cross(b.axis, d)) - b.halfAcross - a.halfAlong * s - a.halfAcross * c;
    const double alongA =
        std::fabs(Dot(a.axis, d)) - a.halfAlong - b.halfAlong * c - b.halfAcross * s;
    const double alongB =
        std::fabs(Dot(b.axis, d)) - b.halfAlong - a.halfAlong * c - a.halfAcross * s;
    const double size = std::fabs(d.x) + std::fabs(d.y) +
                        2.0 * (a.halfAlong + a.halfAcross + b.halfAlong + b.halfAcross);
    return std::max({besideA, besideB, alongA, alongB}) >= LEAST_GAP * size ||
           besideA >= node.lean * size || besideB >= other.lean * size;
}

} // namespace kelm::rings

#pragma once

#include "services/rings/cutting/steplimit.h"
#include "services/rings/meeting.h"
#include "services/rings/orientedbox.h"

#include <vector>

namespace kelm::rings {

/// Edge of a chain of points, with its number in the chain.
struct Edge {
    Point from;
    Point to;
    unsigned number;
};

/// Oriented boxes over the edges of a chain, halved again and again. It finds two edges that meet
/// without a look at pairs that stand apart.
///
/// Boxes are apart if they leave a gap of 1/32 of the size of both together, or a smaller one along
/// which the edges of one box run. Edges in boxes apart by the first may still meet by the rounded
/// rule, but only if they are nearly parallel and nearly on one line: TestAlignedMeet sees to
/// these. docs/guide/rings.md has the proof.
class EdgeTree {
  public:
    /// @param points corner coordinates, bounded as IsSimpleByIndex sees to @param edges 1 or
    /// more, one less than the points @throw std::bad_alloc
    EdgeTree(const Point* points, unsigned edges, StepLimit& rLimit);

    /// @return true if it finds edges that meet and do not follow each other, before the limit
    bool TestMeet() { return TestWithin(0); }

  private:
    struct Node {
        OrientedBox box;    ///< from the first point of the chain on, along the longest edge
        double lean;        ///< twice the largest sine between an edge and the axis
        unsigned first;     ///< edges from here
        unsigned last;      ///< to before here
        unsigned right = 0; ///< the right child; the left one is next to the node. 0 for a leaf
    };

    unsigned Build(unsigned first, unsigned last);
    Node Fit(unsigned first, unsigned last) const;
    Point FindAxis(unsigned first, unsigned last) const;
    double FindLean(const Point& axis, unsigned first, unsigned last) const;
    void Halve(unsigned first, unsigned middle, unsigned last);
    bool TestWithin(unsigned node);
    bool TestBetween(unsigned node, unsigned other);
    bool TestEdges(const Node& node, const Node& other);
    bool TestMeetsStranger(const Edge& edge, const Node& leaf) const;
    static bool TestApart(const Node& node, const Node& other);

    StepLimit& moLimit;
    std::vector<Edge> moEdges;
    std::vector<Node> moNodes;
    Point moOrigin;
    double mdfSlack; ///< of boxes
};

} // namespace kelm::rings

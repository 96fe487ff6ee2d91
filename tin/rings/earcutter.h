#pragma once

#include "tin/rings/cornertree.h"
#include "tin/rings/numberset.h"
#include "tin/triangleid.h"

#include <optional>
#include <vector>

namespace kelm::tin::rings {

/// Cuts the ears off a large ring, in the order of a cursor that goes around it.
///
/// A corner that is no ear stays none until a neighbour goes, or the corner that was found inside
/// its triangle. So the cursor stops only at candidates: corners of which this happened since they
/// were tested. If none is left, no round of the cursor can find an ear.
class EarCutter {
  public:
    /// @param points ring of `count` points, at least 3 @param isForward are they
    /// counter-clockwise? @throw std::bad_alloc
    EarCutter(const Point* points, unsigned count, bool isForward);

    /// Appends the triangles. @return false if it ran out of ears @throw std::bad_alloc
    bool Cut(std::vector<Triangle_Id>& oTriangles);

  private:
    static constexpr unsigned NONE = CornerTree::NONE;

    struct Corner {
        Point at;
        unsigned previous;
        unsigned next;
        unsigned blocker = NONE; ///< corner inside the triangle of this one and its neighbours
        unsigned waiting = NONE; ///< the first corner that has this one as blocker
        unsigned before = NONE;  ///< corners that have the same blocker, in a list
        unsigned behind = NONE;
    };

    EarTriangle GetTriangle(unsigned tip) const;
    unsigned GetPoint(unsigned corner) const { return mbForward ? corner : mnPoints - 1 - corner; }
    bool TestEar(unsigned tip);
    unsigned FindBlocker(unsigned tip) const;
    void Wait(unsigned tip, unsigned blocker);
    void StopWaiting(unsigned tip);
    void Remove(unsigned tip);
    void Release(unsigned blocker);
    void BuildTree(unsigned first);

    bool mbForward;
    unsigned mnPoints;
    unsigned mnLeft;
    unsigned mnIndexed;            ///< corners in the tree when it was built
    std::vector<Corner> moCorners; ///< counter-clockwise
    NumberSet moCandidates;
    std::optional<CornerTree> moTree; ///< none if coordinates are not bounded
};

} // namespace kelm::tin::rings

#pragma once

#include "services/rings/cutting/cornertree.h"
#include "services/rings/cutting/earscan.h"
#include "services/rings/cutting/numberset.h"

#include <vector>

namespace kelm::rings {

/// Cuts the ears off a large ring, in the order of a cursor that goes around it.
///
/// A corner that is no ear stays none until a neighbour goes, or the corner that was found inside
/// its triangle. So the cursor stops only at candidates: corners of which this happened since they
/// were tested. If none is left, no round of the cursor can find an ear.
class EarCutter {
  public:
    /// @param points counter-clockwise, at least 3; their number is their rank
    /// @param limit after which it goes on without the tree @throw std::bad_alloc
    EarCutter(const std::vector<Point>& points, StepLimit limit);

    /// Calls clip(u, v, w) with the ranks of each ear's corners.
    /// @return false if it ran out of ears @throw std::bad_alloc
    template <typename Clip>
    bool Cut(const Clip& clip) {
        unsigned tip = 0;
        while (mbIndexed && mnLeft > 2 && !moLimit.IsReached()) {
            tip = moCandidates.FindAround(tip);
            if (tip == NONE)
                return false;
            if (!TestEar(tip))
                continue;
            const unsigned next = moCorners[tip].next;
            clip(moCorners[tip].previous, tip, next);
            Remove(tip);
            tip = moCorners[next].next; // the cursor steps over the corner behind the ear
        }
        return mnLeft == 2 || Scan(tip, clip);
    }

  private:
    static constexpr unsigned NONE = CornerTree::NONE;

    struct Corner {
        Point at;
        unsigned previous;
        unsigned next;           ///< NONE for a corner that is cut off
        unsigned blocker = NONE; ///< corner inside the triangle of this one and its neighbours
        unsigned waiting = NONE; ///< the first corner that has this one as blocker
        unsigned before = NONE;  ///< corners that have the same blocker, in a list
        unsigned behind = NONE;
    };

    EarTriangle GetTriangle(unsigned tip) const;
    bool TestEar(unsigned tip);
    void Wait(unsigned tip, unsigned blocker);
    void StopWaiting(unsigned tip);
    void Remove(unsigned tip);
    void Release(unsigned blocker);
    void BuildTree(unsigned first);

    /// Goes on from a corner without the tree.
    template <typename Clip>
    bool Scan(unsigned first, const Clip& clip) {
        std::vector<double> x(mnLeft);
        std::vector<double> y(mnLeft);
        std::vector<unsigned> ranks(mnLeft);
        std::vector<unsigned> blockers(moCorners.size());
        EarScan scan({x.data(), y.data(), ranks.data(), blockers.data()});
        for (unsigned i = 0; i < moCorners.size(); ++i)
            if (moCorners[i].next != NONE)
                scan.Add(moCorners[i].at, i);
        return scan.Cut(first, clip);
    }

    unsigned mnLeft;
    unsigned mnIndexed = 0;        ///< corners in the tree when it was built
    bool mbIndexed;                ///< the tree takes only bounded coordinates
    std::vector<Corner> moCorners; ///< by rank
    NumberSet moCandidates;
    CornerTree moTree;
    StepLimit moLimit;
};

} // namespace kelm::rings

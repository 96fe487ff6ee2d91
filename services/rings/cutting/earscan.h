#pragma once

#include "services/rings/ear.h"

#include <cstddef>

namespace kelm::rings {

/// Cuts ears in the order of a cursor that goes around the ring, and looks for corners in an ear
/// one after the other. The whole cutting takes time quadratic in the corners.
class EarScan {
  public:
    /// Where the corners stand, each array long enough for all. Coordinates have two arrays, so
    /// that a loop tests several at once.
    struct Memory {
        double* x;
        double* y;
        unsigned* ranks;    ///< places in the whole ring, ascending
        unsigned* blockers; ///< by rank of the tip: rank of a corner inside its ear
    };

    /// Without corners. @param memory is used as long as this exists
    explicit EarScan(const Memory& memory) : moMemory(memory) {}

    /// Adds a corner behind the others, which are counter-clockwise.
    void Add(const Point& at, unsigned rank) {
        moMemory.x[mnLeft] = at.x;
        moMemory.y[mnLeft] = at.y;
        moMemory.ranks[mnLeft++] = rank;
        moMemory.blockers[rank] = NONE;
    }

    /// Calls clip(u, v, w) with the ranks of each ear's corners. A cursor that came by every corner
    /// twice since the last cut will find no ear.
    /// @param first rank of the corner that is tried first, one of those added
    /// @return false if it ran out of ears
    template <typename Clip>
    bool Cut(unsigned first, const Clip& clip) {
        const unsigned* const ranks = moMemory.ranks;
        unsigned tries = 0;
        for (unsigned v = FindPosition(first); mnLeft > 2; v = v + 1 < mnLeft ? v + 1 : 0) {
            if (tries++ == 2 * mnLeft)
                return false;
            const unsigned u = (v == 0 ? mnLeft : v) - 1;
            const unsigned w = v + 1 == mnLeft ? 0 : v + 1;
            if (!TestEar(u, v, w))
                continue;
            clip(ranks[u], ranks[v], ranks[w]);
            Remove(v);
            v = v < mnLeft ? v : 0; // the cursor steps over the corner behind the ear
            tries = 0;
        }
        return true;
    }

  private:
    static constexpr unsigned NONE = 0xFFFFFFFFU;

    Point At(unsigned position) const { return {moMemory.x[position], moMemory.y[position]}; }
    unsigned FindPosition(unsigned rank) const;
    void Remove(unsigned position);
    bool TestEar(unsigned u, unsigned v, unsigned w);
    unsigned FindBlocker(const EarTriangle& triangle, unsigned from, unsigned u) const;
    unsigned FindInside(const EarTriangle& triangle, unsigned first, unsigned last) const;

    Memory moMemory;
    unsigned mnLeft = 0;
};

} // namespace kelm::rings

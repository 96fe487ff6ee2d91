#pragma once

#include "tin/rings/ear.h"
#include "tin/triangleid.h"

#include <array>
#include <vector>

namespace kelm::tin::rings {

/// Cuts the ears off a ring of few corners, in the order of a cursor that goes around it. A try
/// takes time linear in the corners. It needs no memory but for the triangles.
class SmallRing {
  public:
    static constexpr unsigned MOST_CORNERS = 256;

    /// @param points ring of `count` points, 3 to MOST_CORNERS @param isForward are they
    /// counter-clockwise?
    SmallRing(const Point* points, unsigned count, bool isForward);

    /// Appends the triangles. @return false if it ran out of ears @throw std::bad_alloc
    bool Cut(std::vector<Triangle_Id>& oTriangles);

  private:
    static constexpr unsigned NONE = 0xFFFFFFFFU;
    template <typename T>
    using Array = std::array<T, MOST_CORNERS>;

    Point At(unsigned position) const { return {moX[position], moY[position]}; }
    unsigned GetPoint(unsigned position) const;
    void Remove(unsigned position);
    bool TestEar(unsigned u, unsigned v, unsigned w);
    unsigned FindBlocker(const EarTriangle& triangle, unsigned from, unsigned u) const;
    unsigned FindInside(const EarTriangle& triangle, unsigned first, unsigned last) const;

    bool mbForward;
    unsigned mnPoints;
    unsigned mnLeft;
    // By position, of the corners that are left. Coordinates stand in two arrays, so that a loop
    // tests several at once.
    Array<double> moX;
    Array<double> moY;
    Array<unsigned> moRanks;    ///< places in the whole ring, ascending
    Array<unsigned> moBlockers; ///< by rank of the tip: rank of a corner inside its ear
};

} // namespace kelm::tin::rings

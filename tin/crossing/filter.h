#pragma once

#include "tin/crossing/lanes.h"
#include "tin/crossing/layout.h"
#include "tin/point.h"

#include <algorithm>
#include <cmath>

namespace kelm::tin::crossing {

/// Leaves out triangles of a block that a segment certainly does not cross: the numerators of the
/// rule in `float`, each compared with a bound on its rounding. docs/guide/exactness.md proves it.
class Filter {
  public:
    Filter() = default;
    /// @param isUsable if not, every triangle passes
    Filter(const point3_t<float>& a, const point3_t<float>& b, bool isUsable)
        : moOrigin(a), moA(Fill(a)), moD(Fill({b.x - a.x, b.y - a.y, b.z - a.z})),
          mfLength(std::max({std::fabs(b.x - a.x), std::fabs(b.y - a.y), std::fabs(b.z - a.z)})),
          mbUsable(isUsable) {}

    /// @return a bit for each triangle that the segment may cross
    unsigned Test(const Block& block) const {
        const float distance = GetDistance(block);
        if (!mbUsable || !(distance < 0x1p41F))
            return 0xFFU;
        const float edge = mfLength * block.extent;
        const float sum = 8.0F * (distance + 3.0F * mfLength);
        const Float4 beside = Fill4(0x1p-21F * (edge * sum) + LEAST);
        const Float4 beyond = Fill4(0x1p-22F * (block.extent * block.extent * sum) + LEAST);
        return TestFour(block, 0, beside, beyond) | TestFour(block, 4, beside, beyond) << 4;
    }

  private:
    static constexpr float LEAST = 0x1p-100F; ///< covers what underflows

    static Point4 Fill(const point3_t<float>& p) { return {Fill4(p.x), Fill4(p.y), Fill4(p.z)}; }
    static Point4 Load(const Block& block, unsigned corner, unsigned lane) {
        const auto& from = block.corners[corner];
        return {Load4(from[0] + lane), Load4(from[1] + lane), Load4(from[2] + lane)};
    }

    /// At least the sum of the distances on the three axes to any corner in the block.
    float GetDistance(const Block& block) const {
        return (std::fabs(moOrigin.x - block.corners[0][0][0]) +
                std::fabs(moOrigin.y - block.corners[0][1][0])) +
               (std::fabs(moOrigin.z - block.corners[0][2][0]) + 4.0F * block.extent);
    }

    /// The names are those of Moeller and Trumbore.
    unsigned TestFour(const Block& block, unsigned lane, Float4 beside, Float4 beyond) const {
        const Point4 v0 = Load(block, 0, lane);
        const Point4 e1 = Load(block, 1, lane) - v0;
        const Point4 e2 = Load(block, 2, lane) - v0;
        const Point4 s = moA - v0;
        const Point4 p = Cross(moD, e2);
        const Point4 q = Cross(s, e1);
        const Float4 det = Dot(p, e1);
        const Float4 u = Dot(s, p);
        const Float4 v = Dot(q, moD);
        const Float4 w = (det - u) - v;
        const Float4 none = Fill4(0.0F);
        // The line leaves two edges on different sides.
        const Mask4 misses =
            ((none - beside) > Least(Least(u, v), w)) & (Greatest(Greatest(u, v), w) > beside);
        // The plane lies before the start of the segment or behind its end.
        const Float4 t = Turn(Dot(q, e2), det);
        const Mask4 ends = ((none - beyond) > t) | (t > Size(det) + beyond);
        return GetBits(misses | ends) ^ 0xFU;
    }

    point3_t<float> moOrigin;
    Point4 moA;
    Point4 moD;
    float mfLength = 0.0F;
    bool mbUsable = false;
};

} // namespace kelm::tin::crossing

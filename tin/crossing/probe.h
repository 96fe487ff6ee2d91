#pragma once

#include "tin/crossing/lanes.h"
#include "tin/crossing/layout.h"
#include "tin/crossing/reach.h"
#include "tin/point.h"

#include <limits>

namespace kelm::tin::crossing {

/// A segment to be tested against the boxes of nodes: the slab test in space, with boxes that are
/// widened by the reach of the segment.
class SlabProbe {
  public:
    void Set(const Reach& reach, const point3_t<float>& a, const point3_t<float>& b) {
        SetAxis(0, a.x, b.x - a.x, reach.x);
        SetAxis(1, a.y, b.y - a.y, reach.y);
        SetAxis(2, a.z, b.z - a.z, reach.z);
    }

    /// @return a bit for each child whose box the segment may meet
    unsigned Test(const Node& node) const { return TestFour(node, 0) | TestFour(node, 4) << 4; }

  private:
    struct Axis {
        unsigned near; ///< number of the plane that the segment meets first
        unsigned far;
        Float4 nearOrigin; ///< the start of the segment, moved by the margin
        Float4 farOrigin;
        Float4 inverse;
    };

    void SetAxis(unsigned axis, float origin, float direction, float margin) {
        const float inverse = 1.0F / direction;
        const bool isBackward = 0.0F > inverse;
        const float shift = isBackward ? -margin : margin;
        maoAxes[axis] = {isBackward ? axis + 3 : axis, isBackward ? axis : axis + 3,
                         Fill4(origin + shift), Fill4(origin - shift), Fill4(inverse)};
    }

    unsigned TestFour(const Node& node, unsigned lane) const {
        Float4 low = Fill4(0.0F);
        Float4 high = Fill4(1.0F);
        for (const Axis& axis : maoAxes) {
            const Float4 near = Load4(node.planes[axis.near] + lane) - axis.nearOrigin;
            const Float4 far = Load4(node.planes[axis.far] + lane) - axis.farOrigin;
            // A NaN, of zero and infinity, must leave the interval open.
            low = Greatest(near * axis.inverse, low);
            high = Least(far * axis.inverse, high);
        }
        return GetBits(low > high) ^ 0xFU;
    }

    Axis maoAxes[3];
};

/// A segment to be tested against boxes in plan, with a margin that is a share of the distance of a
/// box from the start of the segment. So boxes that crowd near the start are told apart, however
/// small they are. A test costs more than that of SlabProbe.
class PlanProbe {
  public:
    void Set(const point3_t<float>& a, const point3_t<float>& b) {
        SetAxis(0, a.x, b.x - a.x);
        SetAxis(1, a.y, b.y - a.y);
    }

    /// @return as above
    unsigned Test(const Node& node) const { return TestFour(node, 0) | TestFour(node, 4) << 4; }

  private:
    /// docs/guide/exactness.md proves it.
    static constexpr float MARGIN = 0x1p-19F;
    static constexpr float LEAST = 0x1p-100F; ///< so that no margin underflows

    struct Axis {
        Float4 origin;
        Float4 inverse;
        bool isBackward;
    };

    void SetAxis(unsigned axis, float origin, float direction) {
        const float inverse = 1.0F / direction;
        maoAxes[axis] = {Fill4(origin), Fill4(inverse), 0.0F > inverse};
    }

    unsigned TestFour(const Node& node, unsigned lane) const {
        Float4 first = Fill4(0.0F);
        Float4 last = Fill4(1.0F);
        Mask4 isMissed = Load4(node.planes[0] + lane) > Load4(node.planes[3] + lane); // no child
        for (unsigned i = 0; i < 2; ++i) {
            const Axis& axis = maoAxes[i];
            const Float4 low = Load4(node.planes[i] + lane) - axis.origin;
            const Float4 high = Load4(node.planes[i + 3] + lane) - axis.origin;
            const Float4 margin = Fill4(MARGIN) * Greatest(Size(low), Size(high)) + Fill4(LEAST);
            const Float4 from = low - margin;
            const Float4 to = high + margin;
            // A NaN must leave the interval open, as in SlabProbe.
            first = Greatest((axis.isBackward ? to : from) * axis.inverse, first);
            last = Least((axis.isBackward ? from : to) * axis.inverse, last);
        }
        return GetBits(isMissed | (first > last)) ^ 0xFU;
    }

    Axis maoAxes[2];
};

/// A segment to be tested by its box in plan alone, by the comparisons that open the rule itself.
/// So it needs no margin, and holds for ends that are infinite or NaN.
class BoxProbe {
  public:
    BoxProbe() = default;
    BoxProbe(const point3_t<float>& a, const point3_t<float>& b);

    /// @return as above
    unsigned Test(const Node& node) const;

  private:
    float mafLow[2];
    float mafHigh[2];
};

} // namespace kelm::tin::crossing

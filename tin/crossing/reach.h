#pragma once

#include "tin/crossing/layout.h"
#include "tin/point.h"

namespace kelm::tin::crossing {

/// How far a box must be widened before a segment that misses it is known to cross nothing in it.
/// docs/guide/exactness.md proves the figures.
struct Reach {
    /// @param a,b ends of the segment, surface-local
    Reach(const Index& index, const point3_t<float>& a, const point3_t<float>& b);

    float x = 0.0F;
    float y = 0.0F;
    float z = 0.0F;
    /// Do the margins hold? If not, the box of the segment in plan is all that can be tested.
    bool isBounded = false;
    bool isFilterable = false; ///< does the filter of crossings work in the range of its floats?
};

} // namespace kelm::tin::crossing

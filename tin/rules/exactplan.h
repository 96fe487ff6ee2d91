#pragma once

#include "tin/point.h"

namespace kelm::tin::rules {

/// Twice the area of the triangle a-b-c in plan, positive if it turns to the left. The sign is that
/// of the exact value, zero included; the value is within a few units of the last place of a
/// `double` (Shewchuk 1997). All coordinates must be finite.
double GetTwiceArea(const point2_t<float>& a, const point2_t<float>& b, const point2_t<float>& c);

/// The closed rule: does the triangle hold the position by exact arithmetic, edges and vertices
/// included? A triangle without area in plan, or with a coordinate that is not finite, holds none.
/// @param h the height of the plane, within the heights of the vertices; untouched on false
bool GetClosedHeight(const point3_t<float>& v0, const point3_t<float>& v1,
                     const point3_t<float>& v2, const point2_t<float>& position, float& h);

} // namespace kelm::tin::rules

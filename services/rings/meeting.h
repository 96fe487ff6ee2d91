#pragma once

#include "services/rings/ring.h"

#include <cmath>
#include <limits>

namespace kelm::rings {

/// Does the segment from a along r meet the one from c to e? Ends count; segments whose directions
/// have a product below 2^-52 are parallel and never meet. Which segment comes first changes no
/// bit of the verdict. Without a branch, so that loops test pairs side by side.
template <typename V>
bool TestMeeting(const V& a, const Point& r, const V& c, const V& e) {
    const double qx = e.x - c.x;
    const double qy = e.y - c.y;
    const double wx = a.x - c.x;
    const double wy = a.y - c.y;
    const double d = r.x * qy - qx * r.y;
    const double sign = std::copysign(1.0, d);
    const double size = std::fabs(d);
    const double s = (wy * qx - wx * qy) * sign;
    const double t = (wy * r.x - wx * r.y) * sign;
    return !(std::numeric_limits<double>::epsilon() > size) & (0.0 <= s) & (s <= size) &
           (0.0 <= t) & (t <= size);
}

/// Does the segment A-B meet one of the segments between consecutive points of a chain?
template <typename V>
bool TestMeetsChain(const V& a, const V& b, const V* chain, unsigned segments) {
    const Point r{b.x - a.x, b.y - a.y};
    double meets = 0.0; // counted in double, for want of integer lanes of its width
#pragma omp simd reduction(+ : meets)
    for (unsigned j = 0; j < segments; ++j)
        meets += TestMeeting(a, r, chain[j], chain[j + 1]) ? 1.0 : 0.0;
    return meets != 0.0;
}

} // namespace kelm::rings

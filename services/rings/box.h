#pragma once

#include "services/rings/ring.h"

#include <algorithm>
#include <cmath>
#include <limits>

namespace kelm::rings {

/// Box that grows with each point, for coordinates that are numbers.
struct Box {
    Point low{std::numeric_limits<double>::max(), std::numeric_limits<double>::max()};
    Point high{-std::numeric_limits<double>::max(), -std::numeric_limits<double>::max()};

    template <typename V>
    void Add(const V& point) {
        low = {std::min(low.x, point.x), std::min(low.y, point.y)};
        high = {std::max(high.x, point.x), std::max(high.y, point.y)};
    }
    Point GetSize() const { return {high.x - low.x, high.y - low.y}; }
};

/// No product of such coordinates overflows.
inline bool TestBounded(const Point& p) {
    return std::fabs(p.x) <= 0x1p400 && std::fabs(p.y) <= 0x1p400;
}

} // namespace kelm::rings

#include "tin/crossing/reach.h"

#include <algorithm>
#include <cmath>

namespace kelm::tin::crossing {

namespace {

constexpr float LEAST = 0x1p-100F; ///< so that no margin underflows
constexpr float MOST = 0x1p100F;   ///< so that no reciprocal does
constexpr float MOST_FILTERABLE = 0x1p40F;

} // namespace

Reach::Reach(const Index& index, const point3_t<float>& a, const point3_t<float>& b) {
    const float plan = std::max(std::fabs(b.x - a.x), std::fabs(b.y - a.y));
    const float rise = std::fabs(b.z - a.z);
    const float above = std::max(std::fabs(a.z - index.low), std::fabs(a.z - index.high));
    const float longest = std::max(plan, rise);
    const float total = 2.0F * longest + above + 2.0F * index.extent;
    // A maximum can lose a NaN, a sum cannot.
    const float sum = total + std::fabs(b.x - a.x) + std::fabs(b.y - a.y) + rise;
    isBounded = sum < MOST;
    isFilterable = sum < MOST_FILTERABLE;
    const float side = 0x1p-20F * total + LEAST;
    x = side + 0x1p-23F * std::fabs(a.x);
    y = side + 0x1p-23F * std::fabs(a.y);
    z = 0x1p-17F * total + 0x1p-15F * longest + 0x1p-22F * std::fabs(a.z) + LEAST;
}

} // namespace kelm::tin::crossing

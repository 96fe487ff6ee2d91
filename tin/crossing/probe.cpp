#include "tin/crossing/probe.h"

#include <algorithm>

namespace kelm::tin::crossing {

BoxProbe::BoxProbe(const point3_t<float>& a, const point3_t<float>& b)
    : mafLow{std::min(a.x, b.x), std::min(a.y, b.y)}, mafHigh{std::max(a.x, b.x),
                                                              std::max(a.y, b.y)} {}

unsigned BoxProbe::Test(const Node& node) const {
    unsigned bits = 0;
    for (unsigned k = 0; k < WIDTH; ++k) {
        bool isMissed = node.planes[0][k] > std::numeric_limits<float>::max();
        for (unsigned axis = 0; axis < 2; ++axis)
            isMissed |=
                node.planes[axis][k] > mafHigh[axis] || mafLow[axis] > node.planes[axis + 3][k];
        bits |= (isMissed ? 0U : 1U) << k;
    }
    return bits;
}

} // namespace kelm::tin::crossing

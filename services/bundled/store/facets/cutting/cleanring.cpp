#include "services/bundled/store/facets/cutting/cleanring.h"

#include "services/rings/ring.h"

#include <cmath>

namespace kelm::store {

namespace {

bool IsRepeat(const ZARVertex& vertex, const ZARVertex& predecessor, Repeat repeat) {
    return rings::IsRepeat(vertex, predecessor) &&
           (repeat == Repeat::InPlan ||
            std::fabs(vertex.z - predecessor.z) < rings::REPEAT_TOLERANCE<double>);
}

} // namespace

std::vector<ZARVertex> CleanRing(const std::vector<ZARVertex>& ring, Repeat repeat) {
    std::vector<ZARVertex> corners;
    for (const ZARVertex& vertex : ring)
        if (corners.empty() || !IsRepeat(vertex, corners.back(), repeat))
            corners.push_back(vertex);
    while (corners.size() > 1 && IsRepeat(corners.back(), corners.front(), repeat))
        corners.pop_back();
    return corners;
}

std::vector<ZARVertex> CloseRing(std::vector<ZARVertex> corners) {
    corners.push_back(ZARVertex(corners.front()));
    return corners;
}

} // namespace kelm::store

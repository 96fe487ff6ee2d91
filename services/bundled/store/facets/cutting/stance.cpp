#include "services/bundled/store/facets/cutting/stance.h"

#include <algorithm>
#include <cmath>
#include <tuple>

namespace kelm::store {

namespace {

/// The greatest distance of a corner from the plane of an upright polygon, by the polygon's length
/// in plan: 10 cm for a wall of ten metres.
constexpr double PLANAR_TOLERANCE = 0.01;
/// The same for walls whose plan is nothing but rounding, and their area in plan by the square of
/// the length.
constexpr double ROUNDING_TOLERANCE = 1e-6;

double ComputeDistance(const ZARVertex& p, const ZARVertex& q) {
    return std::hypot(q.x - p.x, q.y - p.y);
}

const ZARVertex& FindFarthest(const std::vector<ZARVertex>& corners, const ZARVertex& from) {
    return *std::max_element(corners.begin(), corners.end(),
                             [&](const ZARVertex& p, const ZARVertex& q) {
                                 return ComputeDistance(from, p) < ComputeDistance(from, q);
                             });
}

/// @return the area in plan, twice, with its sign
double ComputeTwiceArea(const std::vector<ZARVertex>& corners) {
    double sum = 0.0;
    const ZARVertex& from = corners.front();
    for (std::size_t i = 1; i + 1 < corners.size(); ++i)
        sum += (corners[i].x - from.x) * (corners[i + 1].y - from.y) -
               (corners[i].y - from.y) * (corners[i + 1].x - from.x);
    return sum;
}

/// Does a corner stand above another one?
bool HasCornerAbove(std::vector<ZARVertex> corners) {
    std::sort(corners.begin(), corners.end(), [](const ZARVertex& p, const ZARVertex& q) {
        return std::tie(p.x, p.y, p.z) < std::tie(q.x, q.y, q.z);
    });
    return std::adjacent_find(corners.begin(), corners.end(),
                              [](const ZARVertex& p, const ZARVertex& q) {
                                  return p.x == q.x && p.y == q.y && p.z != q.z;
                              }) != corners.end();
}

} // namespace

Stance::Stance(const std::vector<ZARVertex>& corners) {
    const ZARVertex& from = FindFarthest(corners, corners.front());
    const ZARVertex& to = FindFarthest(corners, from);
    const double dx = to.x - from.x;
    const double dy = to.y - from.y;
    mdfLength = ComputeDistance(from, to);
    mbAlongX = std::fabs(dx) >= std::fabs(dy);
    for (const ZARVertex& corner : corners)
        mdfAside =
            std::max(mdfAside, std::fabs(dx * (corner.y - from.y) - dy * (corner.x - from.x)));
    mdfAside = mdfLength > 0.0 ? mdfAside / mdfLength : 0.0;
    mbFolded = std::fabs(ComputeTwiceArea(corners)) <= ROUNDING_TOLERANCE * mdfLength * mdfLength &&
               HasCornerAbove(corners);
}

bool Stance::IsExactlyUpright() const {
    return mdfAside <= ROUNDING_TOLERANCE * mdfLength;
}

bool Stance::IsUpright() const {
    return mdfAside <= PLANAR_TOLERANCE * mdfLength;
}

bool HasAreaInSpace(const std::vector<ZARVertex>& corners) {
    double x = 0.0;
    double y = 0.0;
    double z = 0.0;
    const ZARVertex& from = corners.front();
    for (std::size_t i = 1; i + 1 < corners.size(); ++i) {
        const ZARVertex p{corners[i].x - from.x, corners[i].y - from.y, corners[i].z - from.z};
        const ZARVertex q{corners[i + 1].x - from.x, corners[i + 1].y - from.y,
                          corners[i + 1].z - from.z};
        x += p.y * q.z - p.z * q.y;
        y += p.z * q.x - p.x * q.z;
        z += p.x * q.y - p.y * q.x;
    }
    return x != 0.0 || y != 0.0 || z != 0.0;
}

} // namespace kelm::store

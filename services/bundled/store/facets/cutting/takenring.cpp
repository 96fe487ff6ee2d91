#include "services/bundled/store/facets/cutting/takenring.h"

#include "services/rings/cutting/earclipping.h"
#include "services/rings/cutting/simplering.h"

#include <algorithm>
#include <cmath>
#include <limits>

namespace kelm::store {

namespace {

double ComputeTurn(const ZARVertex& p, const ZARVertex& q, const ZARVertex& r) {
    return (q.x - p.x) * (r.y - p.y) - (q.y - p.y) * (r.x - p.x);
}

double ComputeSize(const std::vector<ZARVertex>& corners) {
    double size = 0.0;
    for (const ZARVertex& corner : corners)
        size = std::max({size, std::fabs(corner.x - corners.front().x),
                         std::fabs(corner.y - corners.front().y)});
    return size;
}

/// Is the ring convex, and so clearly that the library's own tests cannot fail? The smallest of all
/// triangles between corners of a convex ring is one of three consecutive corners, so each ear is
/// large enough if those are; and no other corner is in one.
bool IsClearlyConvex(const std::vector<ZARVertex>& corners) {
    const double size = ComputeSize(corners);
    const double rounding = 32 * std::numeric_limits<double>::epsilon() * size * size;
    const std::size_t count = corners.size();
    double direction = 0.0;
    int turnsOfX = 0;
    for (std::size_t i = 0; i < count; ++i) {
        const ZARVertex& p = corners[i];
        const ZARVertex& q = corners[(i + 1) % count];
        const ZARVertex& r = corners[(i + 2) % count];
        const double turn = ComputeTurn(p, q, r);
        if (i == 0)
            direction = turn;
        if (!(std::fabs(turn) > rings::LEAST_TURN + rounding) || (turn > 0) != (direction > 0))
            return false;
        turnsOfX += (q.x > p.x) != (r.x > q.x);
    }
    // A ring that winds around twice changes its direction in x more than twice. The library goes
    // by the area for the direction, and far from the origin a small area can have the wrong sign.
    const double area =
        rings::ComputeSignedArea<double>(corners.data(), static_cast<unsigned>(count));
    return turnsOfX <= 2 && (area > 0) == (direction > 0);
}

} // namespace

bool IsCuttable(const std::vector<ZARVertex>& corners) {
    const auto count = static_cast<unsigned>(corners.size());
    const auto ignore = [](unsigned, unsigned, unsigned) {};
    return IsClearlyConvex(corners) || (rings::IsSimple(corners.data(), count) &&
                                        rings::ClipEars(corners.data(), count, ignore));
}

bool IsTaken(const std::vector<ZARVertex>& vertices) {
    if (vertices.size() == 4)
        return true;
    std::vector<ZARVertex> corners;
    rings::VisitKept(vertices.data(), static_cast<unsigned>(vertices.size()) - 1U,
                     [&](unsigned i) { corners.push_back(vertices[i]); });
    return corners.size() >= 3 && IsCuttable(corners);
}

} // namespace kelm::store

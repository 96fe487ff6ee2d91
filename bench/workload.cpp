#include "bench/workload.h"

#include "bench/random.h"
#include "bench/terrain.h"
#include "tin/aabbtree.h"

#include <algorithm>
#include <cmath>

namespace kelm::bench {

namespace {

constexpr unsigned RASTER = 1000;

/// Cell of a raster of 1000 x 1000 over 224 x 224 cells of 10 m.
constexpr float FINE = 2.24F;

/// Positions of row-major cells over a box, from a row on and round again.
Positions MakeRows(const point2_t<float>& low, const point2_t<float>& high, unsigned side,
                   unsigned start) {
    Positions positions(std::size_t{RASTER} * RASTER);
    const auto at = [side](float from, float to, unsigned i) {
        return from + (static_cast<float>(i) + 0.5F) / static_cast<float>(side) * (to - from);
    };
    for (unsigned i = 0; i < RASTER * RASTER; ++i) {
        const unsigned row = (start + i / side) % side;
        positions[i] = {at(low.x, high.x, i % side), at(low.y, high.y, row)};
    }
    return positions;
}

Positions MakePositions(const std::string& sTerrain, const std::string& sOrder) {
    const auto surface = GetSurface(sTerrain);
    const point2_t<float> low{surface->GetBBox().min.x, surface->GetBBox().min.y};
    const point2_t<float> high{surface->GetBBox().max.x, surface->GetBBox().max.y};
    if (sOrder == "scanline")
        return MakeRows(low, high, RASTER, 0);
    if (sOrder == "fine") {
        const auto side = static_cast<unsigned>((high.x - low.x) / FINE);
        return MakeRows(low, high, side, side / 2);
    }
    Random random(3);
    Positions positions(std::size_t{RASTER} * RASTER);
    for (point2_t<float>& p : positions)
        p = {low.x + random.Unit() * (high.x - low.x), low.y + random.Unit() * (high.y - low.y)};
    return positions;
}

Segments MakeSegments(const std::string& sTerrain, unsigned nPercent) {
    const auto surface = GetSurface(sTerrain);
    const tin::AabbTree tree(surface.get());
    const auto& box = surface->GetBBox();
    const float length = static_cast<float>(nPercent) / 100.0F *
                         std::max(box.max.x - box.min.x, box.max.y - box.min.y);
    Random random(5);
    const auto anywhere = [&](float low, float high) { return low + random.Unit() * (high - low); };
    Segments segments(nPercent > 10 ? 2000 : 20000);
    for (Segment& segment : segments) {
        const auto ground = [&](point3_t<float>& p) {
            return surface->GetHeight(p.x, p.y, p.z, &tree);
        };
        do {
            const float turn = 6.2831853F * random.Unit();
            segment.a = {anywhere(box.min.x, box.max.x), anywhere(box.min.y, box.max.y), 0.0F};
            segment.b = {segment.a.x + length * std::cos(turn),
                         segment.a.y + length * std::sin(turn), 0.0F};
        } while (!ground(segment.a) || !ground(segment.b));
        segment.a.z += 1.0F;
        segment.b.z += 1.0F + 0.05F * length * random.Unit();
    }
    return segments;
}

} // namespace

std::shared_ptr<const Positions> GetPositions(const std::string& sTerrain,
                                              const std::string& sOrder) {
    return Recall<Positions>(sTerrain + "/" + sOrder, [&] {
        return std::make_shared<Positions>(MakePositions(sTerrain, sOrder));
    });
}

std::shared_ptr<const Segments> GetSegments(const std::string& sTerrain, unsigned nPercent) {
    return Recall<Segments>(sTerrain + "/" + std::to_string(nPercent), [&] {
        return std::make_shared<Segments>(MakeSegments(sTerrain, nPercent));
    });
}

Difference Compare(const std::vector<float>& oAnswers, const std::vector<float>& oOurs,
                   float fTolerance) {
    Difference difference;
    for (std::size_t i = 0; i < oOurs.size(); ++i) {
        if ((oAnswers[i] > NO_HEIGHT) != (oOurs[i] > NO_HEIGHT)) {
            ++difference.nFound;
            continue;
        }
        const float distance = std::fabs(oAnswers[i] - oOurs[i]);
        difference.nHeight += distance > fTolerance ? 1 : 0;
        difference.fMost = std::max(difference.fMost, distance);
    }
    return difference;
}

} // namespace kelm::bench

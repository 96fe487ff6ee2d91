#pragma once

#include "tin/point.h"

#include <memory>
#include <string>
#include <vector>

namespace kelm::bench {

/// Height of a position or segment without one.
constexpr float NO_HEIGHT = -1e30F;

using Positions = std::vector<point2_t<float>>;

/// A million positions in the box of a terrain, surface-local. "scanline": row by row over a raster
/// of 1000 x 1000. "fine": row by row too, as many to a triangle on any fractal terrain as the
/// former has at 100k, from the middle row on and again from the first. "random": anywhere.
std::shared_ptr<const Positions> GetPositions(const std::string& sTerrain,
                                              const std::string& sOrder);

struct Segment {
    point3_t<float> a;
    point3_t<float> b;
};

using Segments = std::vector<Segment>;

/// Lines of sight: segments whose length in plan is nPercent of the longer side of the terrain's
/// box, from 1 m above the ground to 1 m and up to 5 % of the length above it.
std::shared_ptr<const Segments> GetSegments(const std::string& sTerrain, unsigned nPercent);

/// How two lists of answers differ.
struct Difference {
    std::size_t nFound = 0;  ///< one has a height, the other has none
    std::size_t nHeight = 0; ///< both have one, and they lie further apart than the tolerance
    float fMost = 0.0F;      ///< greatest distance of two heights, in metres

    std::size_t GetSum() const { return nFound + nHeight; }
};

/// @param fTolerance greatest distance of equal heights, in metres
Difference Compare(const std::vector<float>& oAnswers, const std::vector<float>& oOurs,
                   float fTolerance);

} // namespace kelm::bench

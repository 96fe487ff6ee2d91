#pragma once

#include "containers/keypoint.h"
#include "tin/tin.h"

#include <memory>
#include <string>
#include <vector>

namespace kelm::bench {

/// A terrain as plain arrays, from which each competitor makes what it needs.
struct Terrain {
    std::string sName;
    std::vector<point3_t<float>> oVertices; ///< relative to the base; heights in metres
    std::vector<Triangle_Id> oTriangles;
    double dfXBase = 500000.0;
    double dfYBase = 4649776.0;
};

/// A terrain by name, the one asked for last kept in memory.
///
/// "10k", "100k", "1M", "4M" and the like (a number, `k` or `M`): about so many triangles of a
/// fractal terrain, nodes 10 m apart with 3 m of jitter, in row order; with "-shuffled" behind it
/// the same triangles in random order, with "-same" as many copies of one triangle, with "-crowded"
/// vertices that crowd towards a corner of the box by powers of two; with "-vertical", "-tower",
/// "-slivers" or "-far" as many vertical triangles in a diagonal, growing triangles over one point,
/// slivers ten thousand kilometres long side by side, or triangles of which each spans the range of
/// `float`. "jacksboro": the real one.
/// With "-grid" behind any of these x and y are those of a raster of RASTER_SIDE cells a side over
/// the whole terrain.
/// @throw std::invalid_argument for any other name
std::shared_ptr<const Terrain> GetTerrain(const std::string& sName);

/// Cells a side of the raster that "-grid" stretches a terrain over.
constexpr int RASTER_SIDE = 2000;

/// The library's surface over a terrain, the one asked for last kept in memory.
std::shared_ptr<const tin::Tin> GetSurface(const std::string& sName);

/// Three corners a triangle in map coordinates, as a file gives them.
std::vector<containers::KeyPoint<double>> GetCorners(const Terrain& oTerrain);

/// Keeps the object of its type that was made last, so that benchmarks in turn share it.
template <typename T, typename Make>
std::shared_ptr<const T> Recall(const std::string& sName, const Make& make) {
    static std::string sLast;
    static std::shared_ptr<const T> poLast;
    if (poLast == nullptr || sLast != sName) {
        poLast.reset();
        poLast = make();
        sLast = sName;
    }
    return poLast;
}

} // namespace kelm::bench

#pragma once

#include "tin/point.h"

#include <memory>
#include <vector>

namespace kelm::bench {

/// Corners in map coordinates, counter-clockwise; the last is joined with the first.
using Ring = std::vector<point2_t<double>>;

/// A competitor that tests rings for being simple and cuts them into triangles. A new one is one
/// name below and one source file.
template <typename Peer>
class RingCutter {
  public:
    static const char* GetName();

    /// Brings the rings into the form that the competitor works on; not timed.
    explicit RingCutter(const std::vector<Ring>& oRings);
    RingCutter(const RingCutter&) = delete;
    RingCutter& operator=(const RingCutter&) = delete;
    ~RingCutter();

    /// Cuts a ring. @return the number of triangles; 0 for a ring that is refused
    std::size_t Cut(std::size_t nRing);
    /// @return area of the triangles of the last cut
    double GetCutArea() const;

  private:
    struct State;
    std::unique_ptr<State> mpoState;
};

struct OurRings;  ///< Polygon and Triangulate, as a load calls them
struct GeosRings; ///< isSimple, then PolygonTriangulator
struct CgalRings; ///< constrained Delaunay; a crossing of two edges throws

} // namespace kelm::bench

#pragma once

#include <geos_c.h>

#include <array>
#include <memory>
#include <vector>

namespace kelm::store {

/// A corner in the plane in which a polygon is cut.
struct PlanePoint {
    double x;
    double y;
};

/// The rings of a polygon, the outer one first. A ring closes from its last point to its first.
using PlaneRings = std::vector<std::vector<PlanePoint>>;

/// Numbers of three corners, counted over all rings of the polygon from 0.
using CornerTriple = std::array<unsigned, 3>;

/// Cuts polygons with holes into triangles, by GEOS: it decides by exact signs at any scale, and
/// its constrained triangulation adds no corner. The time is about linear in the corners of a map's
/// polygons, and quadratic in those of a comb.
class PlaneCutter {
  public:
    enum class Outcome { Done, NoArea, Crosses, Failed };

    PlaneCutter();
    PlaneCutter(const PlaneCutter&) = delete;
    PlaneCutter& operator=(const PlaneCutter&) = delete;

    /// @param rings three points or more in each. A hole may touch other rings at points
    /// @param triangles replaced, counter-clockwise, none of them without area
    Outcome Cut(const PlaneRings& rings, std::vector<CornerTriple>& triangles);
    /// @return the area of the last polygon; of one that crosses itself the area of its convex
    /// hull, since lobes to the left and to the right would cancel each other
    double GetArea() const { return mdfArea; }

  private:
    struct Finish {
        void operator()(GEOSContextHandle_HS* context) const { GEOS_finish_r(context); }
    };
    struct Destroy {
        GEOSContextHandle_t mpContext;
        void operator()(GEOSGeometry* geometry) const { GEOSGeom_destroy_r(mpContext, geometry); }
    };
    using Geometry = std::unique_ptr<GEOSGeometry, Destroy>;
    /// One corner as GEOS takes it. Its height is the number of the corner, which GEOS passes on.
    struct Corner {
        double x;
        double y;
        double mdfNumber;
    };
    using CornerRings = std::vector<std::vector<Corner>>;

    void SetCorners(const PlaneRings& rings);
    bool IsOnEdge(const Corner& corner, const Corner& from, const Corner& to) const;
    void FindOnEdge(const Corner& from, const Corner& to, std::vector<Corner>& found) const;
    void SplitEdges();
    Geometry Own(GEOSGeometry* geometry) const;
    Geometry CreateRing(const std::vector<Corner>& corners) const;
    Geometry CreatePolygon() const;
    double ComputeArea(const GEOSGeometry* geometry) const;
    bool IsWithoutArea() const;
    Outcome GetFault(const GEOSGeometry* polygon);
    bool ReadTriangles(const GEOSGeometry* parts, std::vector<CornerTriple>& triangles) const;
    CornerTriple ReadTriangle(const GEOSGeometry* part) const;
    bool AddTriangle(CornerTriple triple, std::vector<CornerTriple>& triangles, double& sum) const;

    std::unique_ptr<GEOSContextHandle_HS, Finish> mpoContext;
    CornerRings moRings;           ///< split where a corner of another edge lies on an edge
    std::vector<Corner> moCorners; ///< of all rings, by number
    std::vector<Corner> moByX;     ///< the same, in ascending order of x
    double mdfArea = 0.0;
};

} // namespace kelm::store

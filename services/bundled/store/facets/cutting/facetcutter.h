#pragma once

#include "services/bundled/store/facets/cutting/planecutter.h"
#include "services/bundled/store/facets/facetfault.h"
#include "services/vectorlayer.h"

#include <functional>
#include <vector>

namespace kelm::store {

/// Makes rings that the library takes from a polygon that it would refuse although it is valid.
///
/// Repeated corners are dropped, and a ring that ends within 1e-9 of its start is closed. If the
/// library takes what is left, it gets that ring. Otherwise the polygon is cut into triangles: in
/// plan, or, if it stands upright, in its own plane. Corners keep the bits of their coordinates and
/// heights.
class FacetCutter {
  public:
    using Polygon = std::vector<std::vector<ZARVertex>>;
    /// Takes a closed ring.
    using Add = std::function<void(std::vector<ZARVertex>)>;

    /// @param polygon the rings, the outer one first, closed or not, all finite
    /// @return None, or why nothing was added
    FacetFault Cut(const Polygon& polygon, const Add& add);
    /// @return the area in plan of the polygon that was refused last
    double GetArea() const { return mdfArea; }

  private:
    /// The direction in which a polygon is looked at.
    enum class View { Plan, AlongY, AlongX };

    FacetFault CutWhole(const Polygon& polygon, const Add& add);
    FacetFault CutInViews(const Polygon& polygon, const Add& add);
    FacetFault CutInView(const Polygon& polygon, View view, const Add& add);
    PlaneRings Project(const Polygon& polygon, View view);
    void AddTriangles(const Add& add) const;

    PlaneCutter moPlaneCutter;
    std::vector<ZARVertex> moCorners; ///< of all rings of the present view
    std::vector<CornerTriple> moTriangles;
    double mdfArea = 0.0;
};

} // namespace kelm::store

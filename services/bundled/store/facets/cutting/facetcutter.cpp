#include "services/bundled/store/facets/cutting/facetcutter.h"

#include "services/bundled/store/facets/cutting/cleanring.h"
#include "services/bundled/store/facets/cutting/stance.h"
#include "services/bundled/store/facets/cutting/takenring.h"

#include <utility>

namespace kelm::store {

namespace {

FacetFault GetFault(PlaneCutter::Outcome outcome) {
    switch (outcome) {
    case PlaneCutter::Outcome::NoArea:
        return FacetFault::NoArea;
    case PlaneCutter::Outcome::Crosses:
        return FacetFault::Crosses;
    case PlaneCutter::Outcome::Failed:
        return FacetFault::Uncut;
    case PlaneCutter::Outcome::Done:
        break;
    }
    return FacetFault::None;
}

/// Holes of fewer than three corners enclose nothing and are left out.
FacetCutter::Polygon CleanRings(const FacetCutter::Polygon& polygon, Repeat repeat) {
    FacetCutter::Polygon clean;
    for (const std::vector<ZARVertex>& ring : polygon) {
        std::vector<ZARVertex> corners = CleanRing(ring, repeat);
        if (clean.empty() || corners.size() >= 3)
            clean.push_back(std::move(corners));
    }
    return clean;
}

} // namespace

FacetFault FacetCutter::Cut(const Polygon& polygon, const Add& add) {
    mdfArea = 0.0;
    const Polygon clean = CleanRings(polygon, Repeat::InSpace);
    if (clean.front().size() < 3)
        return FacetFault::FewCorners;
    return clean.size() == 1 ? CutWhole(clean, add) : CutInViews(clean, add);
}

/// A polygon without holes may need no more than to be cleaned.
FacetFault FacetCutter::CutWhole(const Polygon& polygon, const Add& add) {
    const std::vector<ZARVertex>& outer = polygon.front();
    if (!HasAreaInSpace(outer) && outer.size() == 3)
        return FacetFault::NoArea;
    if (outer.size() == 3)
        return add(CloseRing(outer)), FacetFault::None;
    std::vector<ZARVertex> corners = CleanRing(outer, Repeat::InPlan);
    if (corners.size() >= 3 && IsCuttable(corners))
        return add(CloseRing(std::move(corners))), FacetFault::None;
    return CutInViews(polygon, add);
}

/// A polygon is looked at in plan, as the library does. One that stands upright is folded there, or
/// shows what rounding has made of it.
FacetFault FacetCutter::CutInViews(const Polygon& polygon, const Add& add) {
    const Stance stance(polygon.front());
    if (stance.IsVertical())
        return FacetFault::NoArea;
    const View upright = stance.RunsAlongX() ? View::AlongY : View::AlongX;
    if (stance.IsExactlyUpright() && CutInView(polygon, upright, add) == FacetFault::None)
        return FacetFault::None;
    const FacetFault inPlan = CutInView(polygon, View::Plan, add);
    if (inPlan == FacetFault::None)
        return FacetFault::None;
    if (stance.IsUpright()) {
        const FacetFault aside = CutInView(polygon, upright, add);
        return aside == FacetFault::NoArea ? inPlan : aside;
    }
    if (!stance.IsFolded())
        return inPlan;
    mdfArea = 0.0;
    return FacetFault::NotPlanar;
}

FacetFault FacetCutter::CutInView(const Polygon& polygon, View view, const Add& add) {
    const bool inPlan = view == View::Plan;
    const PlaneRings rings = Project(inPlan ? CleanRings(polygon, Repeat::InPlan) : polygon, view);
    if (rings.front().size() < 3)
        return FacetFault::NoArea;
    const PlaneCutter::Outcome outcome = moPlaneCutter.Cut(rings, moTriangles);
    if (inPlan)
        mdfArea = moPlaneCutter.GetArea();
    if (outcome == PlaneCutter::Outcome::Done)
        AddTriangles(add);
    return GetFault(outcome);
}

PlaneRings FacetCutter::Project(const Polygon& polygon, View view) {
    PlaneRings rings;
    moCorners.clear();
    for (const std::vector<ZARVertex>& ring : polygon) {
        rings.emplace_back();
        for (const ZARVertex& corner : ring) {
            moCorners.push_back(corner);
            rings.back().push_back({view == View::AlongX ? corner.y : corner.x,
                                    view == View::Plan ? corner.y : corner.z});
        }
    }
    return rings;
}

void FacetCutter::AddTriangles(const Add& add) const {
    for (const CornerTriple& triple : moTriangles)
        add(CloseRing({moCorners[triple[0]], moCorners[triple[1]], moCorners[triple[2]]}));
}

} // namespace kelm::store

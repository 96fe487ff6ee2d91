#include "services/bundled/store/facets/cutting/planecutter.h"

#include <algorithm>
#include <cmath>
#include <new>

namespace kelm::store {

namespace {

/// A polygon with no more than this share of its box is taken for a line that was rounded.
constexpr double LEAST_SHARE = 1e-12;
/// The areas of the triangles add up to that of the polygon, but for this share.
constexpr double AREA_TOLERANCE = 1e-6;

void Ignore(const char*, void*) {}

} // namespace

PlaneCutter::PlaneCutter() : mpoContext(GEOS_init_r()) {
    if (!mpoContext)
        throw std::bad_alloc();
    GEOSContext_setNoticeMessageHandler_r(mpoContext.get(), Ignore, nullptr);
    GEOSContext_setErrorMessageHandler_r(mpoContext.get(), Ignore, nullptr);
}

PlaneCutter::Outcome PlaneCutter::Cut(const PlaneRings& rings,
                                      std::vector<CornerTriple>& triangles) {
    triangles.clear();
    SetCorners(rings);
    const Geometry polygon = CreatePolygon();
    if (!polygon)
        return Outcome::Failed;
    mdfArea = ComputeArea(polygon.get());
    if (GEOSisValidDetail_r(mpoContext.get(), polygon.get(),
                            GEOSVALID_ALLOW_SELFTOUCHING_RING_FORMING_HOLE, nullptr, nullptr) != 1)
        return GetFault(polygon.get());
    if (IsWithoutArea())
        return Outcome::NoArea;
    SplitEdges();
    const Geometry split = CreatePolygon();
    const Geometry parts =
        Own(GEOSConstrainedDelaunayTriangulation_r(mpoContext.get(), split.get()));
    return parts && ReadTriangles(parts.get(), triangles) ? Outcome::Done : Outcome::Failed;
}

void PlaneCutter::SetCorners(const PlaneRings& rings) {
    moRings.clear();
    moCorners.clear();
    for (const std::vector<PlanePoint>& ring : rings) {
        moRings.emplace_back();
        for (const PlanePoint& point : ring) {
            moCorners.push_back({point.x, point.y, static_cast<double>(moCorners.size())});
            moRings.back().push_back(moCorners.back());
        }
    }
}

bool PlaneCutter::IsOnEdge(const Corner& corner, const Corner& from, const Corner& to) const {
    const auto isAt = [&](const Corner& end) { return corner.x == end.x && corner.y == end.y; };
    return corner.y >= std::min(from.y, to.y) && corner.y <= std::max(from.y, to.y) &&
           !isAt(from) && !isAt(to) &&
           GEOSOrientationIndex_r(mpoContext.get(), from.x, from.y, to.x, to.y, corner.x,
                                  corner.y) == 0;
}

/// @param found replaced by the corners within the edge, in the edge's direction
void PlaneCutter::FindOnEdge(const Corner& from, const Corner& to,
                             std::vector<Corner>& found) const {
    found.clear();
    const auto isBefore = [](const Corner& corner, double x) { return corner.x < x; };
    const double last = std::max(from.x, to.x);
    for (auto at = std::lower_bound(moByX.begin(), moByX.end(), std::min(from.x, to.x), isBefore);
         at != moByX.end() && at->x <= last; ++at)
        if (IsOnEdge(*at, from, to))
            found.push_back(*at);
    std::sort(found.begin(), found.end(), [&](const Corner& one, const Corner& other) {
        return std::fabs(one.x - from.x) + std::fabs(one.y - from.y) <
               std::fabs(other.x - from.x) + std::fabs(other.y - from.y);
    });
}

/// GEOS 3.11 fails if a ring touches an edge of another one within. It does not if the edge has a
/// corner there.
void PlaneCutter::SplitEdges() {
    if (moRings.size() < 2)
        return;
    moByX = moCorners;
    std::sort(moByX.begin(), moByX.end(),
              [](const Corner& one, const Corner& other) { return one.x < other.x; });
    std::vector<Corner> found;
    for (std::vector<Corner>& ring : moRings) {
        std::vector<Corner> split;
        for (std::size_t i = 0; i < ring.size(); ++i) {
            split.push_back(ring[i]);
            FindOnEdge(ring[i], ring[i + 1 == ring.size() ? 0 : i + 1], found);
            split.insert(split.end(), found.begin(), found.end());
        }
        ring.swap(split);
    }
}

PlaneCutter::Geometry PlaneCutter::Own(GEOSGeometry* geometry) const {
    return Geometry(geometry, {mpoContext.get()});
}

PlaneCutter::Geometry PlaneCutter::CreateRing(const std::vector<Corner>& corners) const {
    std::vector<Corner> closed = corners;
    closed.push_back(corners.front());
    GEOSCoordSequence* sequence = GEOSCoordSeq_copyFromBuffer_r(
        mpoContext.get(), &closed.front().x, static_cast<unsigned>(closed.size()), 1, 0);
    return Own(sequence ? GEOSGeom_createLinearRing_r(mpoContext.get(), sequence) : nullptr);
}

/// @return null if memory runs out
PlaneCutter::Geometry PlaneCutter::CreatePolygon() const {
    Geometry shell = CreateRing(moRings.front());
    std::vector<Geometry> holes;
    for (std::size_t ring = 1; ring < moRings.size(); ++ring)
        holes.push_back(CreateRing(moRings[ring]));
    if (!shell || std::any_of(holes.begin(), holes.end(), [](const Geometry& g) { return !g; }))
        return Own(nullptr);
    std::vector<GEOSGeometry*> given;
    given.reserve(holes.size());
    for (Geometry& hole : holes)
        given.push_back(hole.release());
    return Own(GEOSGeom_createPolygon_r(mpoContext.get(), shell.release(), given.data(),
                                        static_cast<unsigned>(given.size())));
}

double PlaneCutter::ComputeArea(const GEOSGeometry* geometry) const {
    double area = 0.0;
    return GEOSArea_r(mpoContext.get(), geometry, &area) == 1 ? area : 0.0;
}

bool PlaneCutter::IsWithoutArea() const {
    const auto [left, right] =
        std::minmax_element(moCorners.begin(), moCorners.end(),
                            [](const Corner& one, const Corner& other) { return one.x < other.x; });
    const auto [low, high] =
        std::minmax_element(moCorners.begin(), moCorners.end(),
                            [](const Corner& one, const Corner& other) { return one.y < other.y; });
    return mdfArea <= LEAST_SHARE * (right->x - left->x) * (high->y - low->y);
}

PlaneCutter::Outcome PlaneCutter::GetFault(const GEOSGeometry* polygon) {
    const Geometry hull = Own(GEOSConvexHull_r(mpoContext.get(), polygon));
    mdfArea = hull ? ComputeArea(hull.get()) : mdfArea;
    return hull && IsWithoutArea() ? Outcome::NoArea : Outcome::Crosses;
}

/// @return false if the triangles do not cover the polygon
bool PlaneCutter::ReadTriangles(const GEOSGeometry* parts,
                                std::vector<CornerTriple>& triangles) const {
    const int count = GEOSGetNumGeometries_r(mpoContext.get(), parts);
    double sum = 0.0;
    for (int part = 0; part < count; ++part)
        if (!AddTriangle(ReadTriangle(GEOSGetGeometryN_r(mpoContext.get(), parts, part)), triangles,
                         sum))
            return false;
    return std::fabs(sum - mdfArea) <= AREA_TOLERANCE * mdfArea;
}

CornerTriple PlaneCutter::ReadTriangle(const GEOSGeometry* part) const {
    CornerTriple triple{};
    const GEOSCoordSequence* sequence =
        GEOSGeom_getCoordSeq_r(mpoContext.get(), GEOSGetExteriorRing_r(mpoContext.get(), part));
    for (unsigned corner = 0; corner < 3; ++corner) {
        double number = 0.0;
        GEOSCoordSeq_getZ_r(mpoContext.get(), sequence, corner, &number);
        const bool known = number >= 0.0 && number < static_cast<double>(moCorners.size());
        triple[corner] =
            known ? static_cast<unsigned>(number) : static_cast<unsigned>(moCorners.size());
    }
    return triple;
}

/// @return false if the triangle has a corner that the polygon has not
bool PlaneCutter::AddTriangle(CornerTriple triple, std::vector<CornerTriple>& triangles,
                              double& sum) const {
    if (*std::max_element(triple.begin(), triple.end()) >= moCorners.size())
        return false;
    const Corner& p = moCorners[triple[0]];
    const Corner& q = moCorners[triple[1]];
    const Corner& r = moCorners[triple[2]];
    const int turn = GEOSOrientationIndex_r(mpoContext.get(), p.x, p.y, q.x, q.y, r.x, r.y);
    if (turn < 0)
        std::swap(triple[1], triple[2]);
    if (turn != 0)
        triangles.push_back(triple);
    sum += std::fabs((q.x - p.x) * (r.y - p.y) - (q.y - p.y) * (r.x - p.x)) / 2;
    return true;
}

} // namespace kelm::store

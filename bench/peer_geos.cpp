#include "bench/rings.h"

#include <geos/geom/Coordinate.h>
#include <geos/geom/CoordinateArraySequence.h>
#include <geos/geom/Geometry.h>
#include <geos/geom/GeometryFactory.h>
#include <geos/geom/LinearRing.h>
#include <geos/geom/Polygon.h>
#include <geos/triangulate/polygon/PolygonTriangulator.h>

#include <utility>

namespace kelm::bench {

template <>
struct RingCutter<GeosRings>::State {
    geos::geom::GeometryFactory::Ptr poFactory = geos::geom::GeometryFactory::create();
    std::vector<std::unique_ptr<geos::geom::Polygon>> oPolygons;
    std::unique_ptr<geos::geom::Geometry> poTriangles;
};

template <>
const char* RingCutter<GeosRings>::GetName() {
    return "GEOS";
}

template <>
RingCutter<GeosRings>::RingCutter(const std::vector<Ring>& oRings) : mpoState(new State) {
    for (const Ring& ring : oRings) {
        std::vector<geos::geom::Coordinate> points;
        for (const point2_t<double>& p : ring)
            points.emplace_back(p.x, p.y);
        points.push_back(points.front());
        auto sequence =
            std::make_unique<geos::geom::CoordinateArraySequence>(std::move(points), 2U);
        mpoState->oPolygons.push_back(mpoState->poFactory->createPolygon(
            mpoState->poFactory->createLinearRing(std::move(sequence))));
    }
}

template <>
RingCutter<GeosRings>::~RingCutter() = default;

template <>
std::size_t RingCutter<GeosRings>::Cut(std::size_t nRing) {
    const geos::geom::Polygon& polygon = *mpoState->oPolygons[nRing];
    if (!polygon.isSimple())
        return 0;
    mpoState->poTriangles = geos::triangulate::polygon::PolygonTriangulator::triangulate(&polygon);
    return mpoState->poTriangles->getNumGeometries();
}

template <>
double RingCutter<GeosRings>::GetCutArea() const {
    return mpoState->poTriangles->getArea();
}

} // namespace kelm::bench

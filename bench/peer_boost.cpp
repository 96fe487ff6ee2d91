#include "bench/peers.h"
#include "bench/plane.h"

// Boost's own headers include deprecated ones.
#define BOOST_ALLOW_DEPRECATED_HEADERS
#include <boost/geometry.hpp>
#include <boost/geometry/geometries/box.hpp>
#include <boost/geometry/geometries/point_xy.hpp>
#include <boost/geometry/geometries/segment.hpp>
#include <boost/geometry/index/rtree.hpp>
#include <boost/iterator/function_output_iterator.hpp>

#include <algorithm>
#include <utility>
#include <vector>

namespace kelm::bench {

namespace {

namespace geometry = boost::geometry;
using Point = geometry::model::d2::point_xy<float>;
using Box = geometry::model::box<Point>;
using Value = std::pair<Box, unsigned>;
using RTree = geometry::index::rtree<Value, geometry::index::quadratic<16>>;

/// The highest of height(v0, v1, v2, h) over the triangles whose box meets a shape.
template <typename Shape, typename Height>
bool GetHighest(const RTree& oTree, const Terrain& oTerrain, const Shape& oShape,
                const Height& height, float& rHighest) {
    bool isFound = false;
    const auto keep = [&](const Value& value) {
        const Triangle_Id& ids = oTerrain.oTriangles[value.second];
        double h;
        if (!height(Widen(oTerrain.oVertices[ids.id0]), Widen(oTerrain.oVertices[ids.id1]),
                    Widen(oTerrain.oVertices[ids.id2]), h))
            return;
        if (!isFound || static_cast<float>(h) > rHighest)
            rHighest = static_cast<float>(h);
        isFound = true;
    };
    oTree.query(geometry::index::intersects(oShape), boost::make_function_output_iterator(keep));
    return isFound;
}

} // namespace

template <>
struct Index<Boost>::Input {
    std::shared_ptr<const Terrain> poTerrain;
    std::vector<Value> oBoxes;
};

template <>
struct Index<Boost>::Tree {
    std::shared_ptr<const Terrain> poTerrain;
    RTree oTree;
};

template <>
const char* Index<Boost>::GetName() {
    return "Boost R-tree";
}

template <>
std::shared_ptr<const Index<Boost>::Input>
Index<Boost>::Prepare(const std::shared_ptr<const Terrain>& poTerrain) {
    auto input = std::make_shared<Input>(Input{poTerrain, {}});
    input->oBoxes.reserve(poTerrain->oTriangles.size());
    for (unsigned i = 0; i < poTerrain->oTriangles.size(); ++i) {
        const Triangle_Id& ids = poTerrain->oTriangles[i];
        const point3_t<float>& a = poTerrain->oVertices[ids.id0];
        const point3_t<float>& b = poTerrain->oVertices[ids.id1];
        const point3_t<float>& c = poTerrain->oVertices[ids.id2];
        const Point low(std::min({a.x, b.x, c.x}), std::min({a.y, b.y, c.y}));
        const Point high(std::max({a.x, b.x, c.x}), std::max({a.y, b.y, c.y}));
        input->oBoxes.emplace_back(Box(low, high), i);
    }
    return input;
}

// The constructor from a range packs (Leutenegger, Lopez and Edgington 1997).
template <>
Index<Boost>::Index(const Input& oInput)
    : mpoTree(new Tree{oInput.poTerrain, RTree(oInput.oBoxes)}) {}

template <>
Index<Boost>::~Index() = default;

template <>
bool Index<Boost>::GetHeight(float x, float y, float& h) const {
    const double px = static_cast<double>(x);
    const double py = static_cast<double>(y);
    return GetHighest(
        mpoTree->oTree, *mpoTree->poTerrain, Point(x, y),
        [=](const auto& v0, const auto& v1, const auto& v2, double& height) {
            return GetPlaneHeight(v0, v1, v2, px, py, height);
        },
        h);
}

template <>
bool Index<Boost>::GetLineIntersectHeight(const point3_t<float>& a, const point3_t<float>& b,
                                          float& h) const {
    const point3_t<double> start = Widen(a);
    const point3_t<double> direction = Widen(b) - start;
    return GetHighest(
        mpoTree->oTree, *mpoTree->poTerrain,
        geometry::model::segment<Point>(Point(a.x, a.y), Point(b.x, b.y)),
        [&](const auto& v0, const auto& v1, const auto& v2, double& height) {
            return GetCrossingHeight(v0, v1, v2, start, direction, height);
        },
        h);
}

} // namespace kelm::bench

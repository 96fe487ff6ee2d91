#include "bench/peers.h"
#include "bench/plane.h"

#include <CGAL/AABB_traits.h>
#include <CGAL/AABB_tree.h>
#include <CGAL/AABB_triangle_primitive.h>
#include <CGAL/Simple_cartesian.h>
#include <boost/iterator/function_output_iterator.hpp>

#include <vector>

// Simple_cartesian<double>: an exact kernel found the same and took longer. Listing the triangles
// that a vertical segment meets and looking the highest up took less than first_intersection, and
// less than letting CGAL construct the crossings.

namespace kelm::bench {

namespace {

using Kernel = CGAL::Simple_cartesian<double>;
using Triangles = std::vector<Kernel::Triangle_3>;
using Primitive = CGAL::AABB_triangle_primitive<Kernel, Triangles::const_iterator>;
using CgalTree = CGAL::AABB_tree<CGAL::AABB_traits<Kernel, Primitive>>;

Kernel::Point_3 ToPoint(const point3_t<float>& v) {
    return {static_cast<double>(v.x), static_cast<double>(v.y), static_cast<double>(v.z)};
}

point3_t<double> FromPoint(const Kernel::Point_3& p) {
    return {p.x(), p.y(), p.z()};
}

/// The highest of height(v0, v1, v2, h) over the triangles that the segment meets.
template <typename Height>
bool GetHighest(const CgalTree& oTree, const Kernel::Segment_3& oSegment, const Height& height,
                float& rHighest) {
    bool isFound = false;
    const auto keep = [&](Triangles::const_iterator triangle) {
        double h;
        if (!height(FromPoint(triangle->vertex(0)), FromPoint(triangle->vertex(1)),
                    FromPoint(triangle->vertex(2)), h))
            return;
        if (!isFound || static_cast<float>(h) > rHighest)
            rHighest = static_cast<float>(h);
        isFound = true;
    };
    oTree.all_intersected_primitives(oSegment, boost::make_function_output_iterator(keep));
    return isFound;
}

} // namespace

template <>
struct Index<Cgal>::Input {
    Triangles oTriangles;
};

template <>
struct Index<Cgal>::Tree {
    explicit Tree(const Triangles& oTriangles) : oTree(oTriangles.begin(), oTriangles.end()) {
        oTree.build();
        dfBottom = oTree.bbox().zmin() - 1.0;
        dfTop = oTree.bbox().zmax() + 1.0;
    }

    CgalTree oTree;
    double dfBottom;
    double dfTop;
};

template <>
const char* Index<Cgal>::GetName() {
    return "CGAL";
}

template <>
std::shared_ptr<const Index<Cgal>::Input>
Index<Cgal>::Prepare(const std::shared_ptr<const Terrain>& poTerrain) {
    auto input = std::make_shared<Input>();
    input->oTriangles.reserve(poTerrain->oTriangles.size());
    for (const Triangle_Id& triangle : poTerrain->oTriangles)
        input->oTriangles.emplace_back(ToPoint(poTerrain->oVertices[triangle.id0]),
                                       ToPoint(poTerrain->oVertices[triangle.id1]),
                                       ToPoint(poTerrain->oVertices[triangle.id2]));
    return input;
}

template <>
Index<Cgal>::Index(const Input& oInput) : mpoTree(new Tree(oInput.oTriangles)) {}

template <>
Index<Cgal>::~Index() = default;

template <>
bool Index<Cgal>::GetHeight(float x, float y, float& h) const {
    const double px = static_cast<double>(x);
    const double py = static_cast<double>(y);
    const Kernel::Segment_3 plumb({px, py, mpoTree->dfBottom}, {px, py, mpoTree->dfTop});
    return GetHighest(
        mpoTree->oTree, plumb,
        [=](const auto& v0, const auto& v1, const auto& v2, double& height) {
            return GetPlaneHeight(v0, v1, v2, px, py, height);
        },
        h);
}

template <>
bool Index<Cgal>::GetLineIntersectHeight(const point3_t<float>& a, const point3_t<float>& b,
                                         float& h) const {
    const point3_t<double> start = Widen(a);
    const point3_t<double> direction = Widen(b) - start;
    return GetHighest(
        mpoTree->oTree, {ToPoint(a), ToPoint(b)},
        [&](const auto& v0, const auto& v1, const auto& v2, double& height) {
            return GetCrossingHeight(v0, v1, v2, start, direction, height);
        },
        h);
}

} // namespace kelm::bench

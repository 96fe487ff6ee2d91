#include "bench/rings.h"

#include <CGAL/Constrained_Delaunay_triangulation_2.h>
#include <CGAL/Exact_predicates_inexact_constructions_kernel.h>
#include <CGAL/Triangulation_face_base_with_info_2.h>

namespace kelm::bench {

namespace {

using Kernel = CGAL::Exact_predicates_inexact_constructions_kernel;
using FaceBase = CGAL::Constrained_triangulation_face_base_2<
    Kernel, CGAL::Triangulation_face_base_with_info_2<bool, Kernel>>;
using Structure =
    CGAL::Triangulation_data_structure_2<CGAL::Triangulation_vertex_base_2<Kernel>, FaceBase>;
using Triangulation =
    CGAL::Constrained_Delaunay_triangulation_2<Kernel, Structure,
                                               CGAL::No_constraint_intersection_tag>;

/// Marks the faces that can be reached from outside without crossing an edge of the ring.
void MarkOutside(Triangulation& rTriangulation) {
    for (const auto face : rTriangulation.all_face_handles())
        face->info() = false;
    std::vector<Triangulation::Face_handle> pending{rTriangulation.infinite_face()};
    pending.front()->info() = true;
    while (!pending.empty()) {
        const auto face = pending.back();
        pending.pop_back();
        for (int i = 0; i < 3; ++i) {
            const auto neighbor = face->neighbor(i);
            if (neighbor->info() || face->is_constrained(i))
                continue;
            neighbor->info() = true;
            pending.push_back(neighbor);
        }
    }
}

} // namespace

template <>
struct RingCutter<CgalRings>::State {
    std::vector<std::vector<Kernel::Point_2>> oRings;
    Triangulation oTriangulation;
};

template <>
const char* RingCutter<CgalRings>::GetName() {
    return "CGAL";
}

template <>
RingCutter<CgalRings>::RingCutter(const std::vector<Ring>& oRings) : mpoState(new State) {
    for (const Ring& ring : oRings) {
        auto& points = mpoState->oRings.emplace_back();
        for (const point2_t<double>& p : ring)
            points.emplace_back(p.x, p.y);
    }
}

template <>
RingCutter<CgalRings>::~RingCutter() = default;

template <>
std::size_t RingCutter<CgalRings>::Cut(std::size_t nRing) {
    const std::vector<Kernel::Point_2>& points = mpoState->oRings[nRing];
    Triangulation& triangulation = mpoState->oTriangulation;
    triangulation.clear();
    try {
        triangulation.insert_constraint(points.begin(), points.end(), true);
    } catch (const Triangulation::Intersection_of_constraints_exception&) {
        return 0;
    }
    MarkOutside(triangulation);
    std::size_t count = 0;
    for (const auto face : triangulation.finite_face_handles())
        count += face->info() ? 0U : 1U;
    return count;
}

template <>
double RingCutter<CgalRings>::GetCutArea() const {
    double area = 0.0;
    for (const auto face : mpoState->oTriangulation.finite_face_handles())
        if (!face->info())
            area += mpoState->oTriangulation.triangle(face).area();
    return area;
}

} // namespace kelm::bench

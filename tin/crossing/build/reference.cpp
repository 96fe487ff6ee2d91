#include "tin/crossing/build/reference.h"

#include "tin/vector3.h"

#include <algorithm>
#include <cmath>

namespace kelm::tin::crossing {

namespace {

static_assert(sizeof(Reference) == 32, "two loads of four lanes");

using Corner = point3_t<float>;

/// The edge as the rule takes it.
Vector3 GetEdge(const Corner& from, const Corner& to) {
    return {static_cast<double>(to.x - from.x), static_cast<double>(to.y - from.y),
            static_cast<double>(to.z - from.z)};
}

double GetSize(const Vector3& v) {
    return std::max({std::fabs(v.x), std::fabs(v.y), std::fabs(v.z)});
}

bool IsFinite(const Vector3& v) {
    return std::isfinite(v.x + v.y + v.z);
}

bool IsSame(const BBox<float, point2_t<float>>& a, const BBox<float, point2_t<float>>& b) {
    return a.min.x == b.min.x && a.min.y == b.min.y && a.max.x == b.max.x && a.max.y == b.max.y;
}

/// Is the plane no wall and are the edges not too near to one line, so that the height of a
/// crossing is bound to the triangle?
bool IsTight(const Vector3& e1, const Vector3& e2, double side) {
    constexpr double STEEPEST = 8.0;
    const Vector3 normal = e1 ^ e2;
    const double area = std::fabs(normal.z);
    return area > 0x1p-8 * GetSize(e1) * GetSize(e2) && area > 0x1p-12 * side * side &&
           std::fabs(normal.x) < STEEPEST * area && std::fabs(normal.y) < STEEPEST * area;
}

} // namespace

Reference CreateReference(const Triangle& triangle, unsigned id) {
    const Corner* corners[] = {triangle.GetVertex(0), triangle.GetVertex(1), triangle.GetVertex(2)};
    Reference reference{{0.0F, 0.0F, 0.0F}, id, {0.0F, 0.0F, 0.0F}, K_Dropped};
    if (corners[0] == nullptr)
        return reference;
    const Vector3 e1 = GetEdge(*corners[0], *corners[1]);
    const Vector3 e2 = GetEdge(*corners[0], *corners[2]);
    if (!IsFinite(e1) || !IsFinite(e2))
        return reference;
    Triangle copy = triangle;
    copy.ComputeBBox();
    const auto& box = copy.GetBBox();
    const auto [low, high] = std::minmax({corners[0]->z, corners[1]->z, corners[2]->z});
    const double side = static_cast<double>(std::max(box.max.x - box.min.x, box.max.y - box.min.y));
    const float rim = 0x1p-6F * (high - low);
    // A box that is infinite both ways would have no centre to be sorted by.
    const bool isTight = std::isfinite(rim) && IsTight(e1, e2, side);
    reference = {{box.min.x, box.min.y, isTight ? low - rim : low},
                 id,
                 {box.max.x, box.max.y, isTight ? high + rim : high},
                 isTight ? K_Tight : K_Loose};
    if (!IsSame(box, triangle.GetBBox()))
        reference.kind = K_Stale;
    return reference;
}

} // namespace kelm::tin::crossing

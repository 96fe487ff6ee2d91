#include "tin/triangle.h"

#include "services/exception.h"
#include "services/memory/largepages.h"
#include "tin/ray2.h"
#include "tin/rules/barycentric.h"
#include "tin/vector3.h"

#include <algorithm>
#include <cfloat>
#include <cmath>
#include <limits>

static_assert(FLT_EVAL_METHOD == 0, "a float expression must be rounded to float at each step");

namespace kelm::tin {

namespace {

using rules::EPSILON;
using rules::IsDegenerate;
using rules::Widen;

/// Difference in `float`, component by component, then widened.
Vector3 Difference(const point3_t<float>& a, const point3_t<float>& b) {
    return {Widen(a.x - b.x), Widen(a.y - b.y), Widen(a.z - b.z)};
}

/// Does the segment A-B cross the segment P-Q in plan? Ends count; parallel segments never cross.
/// There is no branch, since no processor can predict which bound of an edge fails.
inline bool IsIntersectedSegment(const float& ax, const float& ay, const float& bx, const float& by,
                                 const float& px, const float& py, const float& qx,
                                 const float& qy) {
    const double rx = Widen(bx - ax);
    const double ry = Widen(by - ay);
    const double sx = Widen(qx - px);
    const double sy = Widen(qy - py);
    const double wx = Widen(ax - px);
    const double wy = Widen(ay - py);
    const double den = rx * sy - sx * ry;
    const double sign = std::copysign(1.0, den);
    const double size = std::fabs(den);
    const double t = sign * (wy * sx - wx * sy);
    const double u = sign * (wy * rx - wx * ry);
    // A NaN passes the first three tests and fails the last two: the segments do not cross.
    return !(EPSILON > size) & !(0.0 > t) & !(t > size) & (u >= 0.0) & (size >= u);
}

} // namespace

void* Triangle::operator new[](std::size_t bytes) {
    void* const array = ::operator new[](bytes);
    memory::AdviseLargePages(array, bytes);
    return array;
}

Triangle::Triangle() : vertices{nullptr, nullptr, nullptr} {}

Triangle::Triangle(point3_t<float>** list) : Triangle() {
    SetVertices(list);
}

void Triangle::SetVertices(point3_t<float>* const a, point3_t<float>* const b,
                           point3_t<float>* const c) {
    if (a == nullptr || b == nullptr || c == nullptr)
        throw DataException("vertices must be non-null", "", "", 0);
    vertices[0] = a;
    vertices[1] = b;
    vertices[2] = c;
    ComputeBBox();
}

void Triangle::SetVertices(point3_t<float>* const* const list) {
    if (list == nullptr)
        SetVertices(nullptr, nullptr, nullptr);
    SetVertices(list[0], list[1], list[2]);
}

void Triangle::ComputeBBox() {
    if (!IsSet())
        return;
    const point3_t<float>& v0 = *vertices[0];
    const point3_t<float>& v1 = *vertices[1];
    const point3_t<float>& v2 = *vertices[2];
    bbox.min = {std::min(std::min(v0.x, v1.x), v2.x), std::min(std::min(v0.y, v1.y), v2.y)};
    bbox.max = {std::max(std::max(v0.x, v1.x), v2.x), std::max(std::max(v0.y, v1.y), v2.y)};
}

void Triangle::GetVertices(point3_t<float>*& a, point3_t<float>*& b, point3_t<float>*& c) const {
    a = vertices[0];
    b = vertices[1];
    c = vertices[2];
}

void Triangle::GetVertexList(point3_t<float>** const list) const {
    std::copy(vertices, vertices + 3, list);
}

double Triangle::GetCenterAt(Axis axis) const {
    float center[2];
    GetCenterXY(center);
    return Widen(center[axis]);
}

void Triangle::GetCenterXY(float* out) const {
    out[AX_X] = out[AX_Y] = std::numeric_limits<float>::quiet_NaN();
    if (!IsSet())
        return;
    const point3_t<float>& v0 = *vertices[0];
    const point3_t<float>& v1 = *vertices[1];
    const point3_t<float>& v2 = *vertices[2];
    out[AX_X] = ((v0.x + v1.x) + v2.x) / 3.0F;
    out[AX_Y] = ((v0.y + v1.y) + v2.y) / 3.0F;
}

void Triangle::GetCenterXY(point2_t<float>* out) const {
    float center[2];
    GetCenterXY(center);
    *out = {center[AX_X], center[AX_Y]};
}

int Triangle::GetBarycentricCoord(float x, float y, double& l0, double& l1, double& l2) const {
    if (!IsSet())
        return -1;
    rules::Barycentric barycentric(*vertices[0], *vertices[1], *vertices[2]);
    if (barycentric.IsFlat())
        return -1;
    barycentric.SetRow(y);
    return barycentric.GetWeights(x, l0, l1, l2) ? 0 : -1;
}

float Triangle::GetWeightedHeight(double l0, double l1, double l2) const {
    return rules::GetWeightedHeight(vertices[0]->z, vertices[1]->z, vertices[2]->z, l0, l1, l2);
}

bool Triangle::GetHeight(float x, float y, float& h) const {
    double l0;
    double l1;
    double l2;
    if (GetBarycentricCoord(x, y, l0, l1, l2) != 0)
        return false;
    h = GetWeightedHeight(l0, l1, l2);
    return true;
}

bool Triangle::IsPointInside(float x, float y) const {
    return TestInside(bbox, x, y) && IsPointInsideLT(x, y);
}

bool Triangle::IsPointInsideLT(float x, float y) const {
    double l0;
    double l1;
    double l2;
    return GetBarycentricCoord(x, y, l0, l1, l2) == 0;
}

IntersectRelation Triangle::GetLineIntersectHeight(const point3_t<float>& a,
                                                   const point3_t<float>& b, float& h) const {
    if (!IsSet())
        return IR_Disjoint;
    const point3_t<float>& v0 = *vertices[0];
    const Vector3 e1 = Difference(*vertices[1], v0);
    const Vector3 e2 = Difference(*vertices[2], v0);
    const Vector3 d = Difference(b, a);
    const Vector3 p = d ^ e2;
    const double det = p * e1;
    if (IsDegenerate(det))
        return IR_Disjoint;
    const double inv = 1.0 / det;
    const Vector3 s = Difference(a, v0);
    const Vector3 q = s ^ e1;
    const double t = (q * e2) * inv;
    if (0.0 > t || t > 1.0)
        return IR_Disjoint;
    const double u = (s * p) * inv;
    if (0.0 > u || u > 1.0)
        return IR_Outside;
    const double v = (q * d) * inv;
    if (0.0 > v || v > 1.0 || v + u > 1.0)
        return IR_Outside;
    h = static_cast<float>(d.z * t + Widen(a.z));
    return IR_Inside;
}

bool Triangle::IsIntersectedLine(float x1, float y1, float x2, float y2) const {
    if (bbox.min.x > std::max(x1, x2) || std::min(x1, x2) > bbox.max.x ||
        bbox.min.y > std::max(y1, y2) || std::min(y1, y2) > bbox.max.y || !IsSet())
        return false;
    if (IsPointInside(x1, y1) || IsPointInside(x2, y2))
        return true;
    bool isCrossed = false;
    for (int i = 0; i < 3; ++i) {
        const point3_t<float>& from = *vertices[i];
        const point3_t<float>& to = *vertices[(i + 1) % 3];
        isCrossed |= IsIntersectedSegment(from.x, from.y, to.x, to.y, x1, y1, x2, y2);
    }
    return isCrossed;
}

bool Triangle::IsIntersected(const BBox<float, point2_t<float>>& box) const {
    return IsSet() && (IsIntersectedBBox(box, *vertices[0], *vertices[1]) ||
                       IsIntersectedBBox(box, *vertices[1], *vertices[2]) ||
                       IsIntersectedBBox(box, *vertices[2], *vertices[0]));
}

bool Triangle::IsIntersected(const Triangle& other) const {
    if (!IsSet() || !other.IsSet())
        return false;
    if (IsPointInside(other.vertices[0]->x, other.vertices[0]->y) ||
        other.IsPointInside(vertices[0]->x, vertices[0]->y))
        return true;
    for (int i = 0; i < 3; ++i) {
        const point3_t<float>& a = *other.vertices[i];
        const point3_t<float>& b = *other.vertices[(i + 1) % 3];
        for (int j = 0; j < 3; ++j) {
            const point3_t<float>& p = *vertices[j];
            const point3_t<float>& q = *vertices[(j + 1) % 3];
            if (IsIntersectedSegment(a.x, a.y, b.x, b.y, p.x, p.y, q.x, q.y))
                return true;
        }
    }
    return false;
}

} // namespace kelm::tin

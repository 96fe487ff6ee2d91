#pragma once

#include "tin/triangle.h"

#include <algorithm>
#include <array>
#include <optional>

/// The arithmetic of triangles once more, for comparison by bits. Each step is rounded by a store
/// to a volatile variable, so that no compiler can contract or reorder it, whatever its flags.
namespace kelm::tin::test::model {

template <typename T>
struct Step {
    T v;
    Step(T value) {
        volatile T rounded = value;
        v = rounded;
    }
    explicit operator Step<double>() const { return static_cast<double>(v); }
    friend Step operator+(Step a, Step b) { return a.v + b.v; }
    friend Step operator-(Step a, Step b) { return a.v - b.v; }
    friend Step operator*(Step a, Step b) { return a.v * b.v; }
    friend Step operator/(Step a, Step b) { return a.v / b.v; }
};
using F = Step<float>;
using D = Step<double>;
using Corners = std::array<point3_t<float>, 3>;

/// The height at a position, if the weights make it an inner one.
inline std::optional<float> GetHeight(const Corners& c, F x, F y) {
    const F x0 = c[0].x, y0 = c[0].y, x1 = c[1].x, y1 = c[1].y, x2 = c[2].x, y2 = c[2].y;
    const D det((x0 - x2) * (y1 - y2) - (x1 - x2) * (y0 - y2));
    const D l0 = D((x2 - x1) * (y - y2) + (x - x2) * (y1 - y2)) / det;
    const D l1 = D((y2 - y0) * (x - x2) + (y - y2) * (x0 - x2)) / det, l2 = (D(1.0) - l0) - l1;
    const auto [least, greatest] = std::minmax({l0.v, l1.v, l2.v});
    if (std::abs(det.v) < 0x1p-52 || least < 0.0 || greatest > 1.0)
        return std::nullopt;
    const D z0(F(c[0].z)), z1(F(c[1].z)), z2(F(c[2].z));
    return static_cast<float>(((z1 * l1 + z0 * l0) + z2 * l2).v);
}

using Vector = std::array<D, 3>;

inline Vector Difference(const point3_t<float>& a, const point3_t<float>& b) {
    return {D(F(a.x) - b.x), D(F(a.y) - b.y), D(F(a.z) - b.z)};
}
inline D Dot(const Vector& a, const Vector& b) {
    return (a[1] * b[1] + a[0] * b[0]) + a[2] * b[2];
}
inline Vector Cross(const Vector& a, const Vector& b) {
    return {a[1] * b[2] - a[2] * b[1], a[2] * b[0] - a[0] * b[2], a[0] * b[1] - a[1] * b[0]};
}

inline IntersectRelation GetCrossing(const Corners& c, const point3_t<float>& a,
                                     const point3_t<float>& b, float& h) {
    const Vector e1 = Difference(c[1], c[0]), e2 = Difference(c[2], c[0]), d = Difference(b, a);
    const Vector s = Difference(a, c[0]), p = Cross(d, e2), q = Cross(s, e1);
    const D det = Dot(p, e1), inv = D(1.0) / det;
    const D t = Dot(q, e2) * inv, u = Dot(s, p) * inv, v = Dot(q, d) * inv;
    if (std::abs(det.v) < 0x1p-52 || t.v < 0 || t.v > 1)
        return IR_Disjoint;
    if (std::min(u.v, v.v) < 0 || std::max(u.v, v.v) > 1 || (u + v).v > 1)
        return IR_Outside;
    h = static_cast<float>((d[2] * t + D(F(a.z))).v);
    return IR_Inside;
}

/// Does the segment from a to b cross an edge in plan, or end inside?
inline bool TestLine(const Corners& c, const point3_t<float>& a, const point3_t<float>& b) {
    bool touches = GetHeight(c, a.x, a.y) || GetHeight(c, b.x, b.y);
    for (unsigned i = 0; i < 3; ++i) {
        const Vector r = Difference(c[(i + 1) % 3], c[i]), s = Difference(b, a);
        const Vector w = Difference(c[i], a);
        const D den = r[0] * s[1] - s[0] * r[1];
        const double sign = den.v < 0 ? -1 : 1;
        const double t = (w[1] * s[0] - w[0] * s[1]).v * sign;
        const double u = (w[1] * r[0] - w[0] * r[1]).v * sign;
        touches |=
            std::abs(den.v) >= 0x1p-52 && std::min(t, u) >= 0 && std::max(t, u) <= sign * den.v;
    }
    return touches;
}

} // namespace kelm::tin::test::model

#pragma once

#include "tin/point.h"

#include <algorithm>

namespace kelm::bench {

// What a user of a general index writes for the triangle itself: plainly, in `double`.

/// A vertex widened.
inline point3_t<double> Widen(const point3_t<float>& v) {
    return {static_cast<double>(v.x), static_cast<double>(v.y), static_cast<double>(v.z)};
}

inline point3_t<double> operator-(const point3_t<double>& a, const point3_t<double>& b) {
    return {a.x - b.x, a.y - b.y, a.z - b.z};
}

inline point3_t<double> Cross(const point3_t<double>& a, const point3_t<double>& b) {
    return {a.y * b.z - a.z * b.y, a.z * b.x - a.x * b.z, a.x * b.y - a.y * b.x};
}

inline double Dot(const point3_t<double>& a, const point3_t<double>& b) {
    return a.x * b.x + a.y * b.y + a.z * b.z;
}

/// Height of the triangle at a position. @return false, with h untouched, outside
inline bool GetPlaneHeight(const point3_t<double>& v0, const point3_t<double>& v1,
                           const point3_t<double>& v2, double x, double y, double& h) {
    const double det = (v1.y - v2.y) * (v0.x - v2.x) + (v2.x - v1.x) * (v0.y - v2.y);
    const double n0 = (v1.y - v2.y) * (x - v2.x) + (v2.x - v1.x) * (y - v2.y);
    const double n1 = (v2.y - v0.y) * (x - v2.x) + (v0.x - v2.x) * (y - v2.y);
    const double n2 = det - n0 - n1;
    if (det == 0.0 || (det > 0.0 ? std::min({n0, n1, n2}) < 0.0 : std::max({n0, n1, n2}) > 0.0))
        return false;
    h = (n0 * v0.z + n1 * v1.z + n2 * v2.z) / det;
    return true;
}

/// Crossing of the segment from a along d with the triangle (Moeller and Trumbore 1997).
/// @param h height of the segment there @return false, with h untouched, if there is none
inline bool GetCrossingHeight(const point3_t<double>& v0, const point3_t<double>& v1,
                              const point3_t<double>& v2, const point3_t<double>& a,
                              const point3_t<double>& d, double& h) {
    const point3_t<double> e1 = v1 - v0;
    const point3_t<double> e2 = v2 - v0;
    const point3_t<double> p = Cross(d, e2);
    const double det = Dot(p, e1);
    if (det == 0.0)
        return false;
    const point3_t<double> s = a - v0;
    const point3_t<double> q = Cross(s, e1);
    const double inverse = 1.0 / det;
    const double t = Dot(q, e2) * inverse;
    const double u = Dot(s, p) * inverse;
    const double v = Dot(q, d) * inverse;
    if (t < 0.0 || t > 1.0 || u < 0.0 || v < 0.0 || u + v > 1.0)
        return false;
    h = a.z + t * d.z;
    return true;
}

} // namespace kelm::bench

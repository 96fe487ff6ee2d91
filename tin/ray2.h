#pragma once

#include "tin/bbox.h"
#include "tin/point.h"

#include <type_traits>

namespace kelm::tin {

/// Ray in the plane with the values that a slab test needs, prepared at construction. The second
/// argument of a constructor is a direction, not an end point. A plain value.
template <typename T>
class Ray2 {
  public:
    Ray2(const point2_t<T>& rOrigin, const point2_t<T>& rDir)
        : origin(rOrigin), dir(rDir), dirInv{T(1) / rDir.x, T(1) / rDir.y},
          // From the reciprocal, so that -0 counts as negative.
          sign{T(0) > dirInv.x ? 1 : 0, T(0) > dirInv.y ? 1 : 0} {}

    /// Takes x and y of both points. For `float` only.
    template <typename U = T, typename = std::enable_if_t<std::is_same_v<U, float>>>
    Ray2(const point3_t<float>& rOrigin, const point3_t<float>& rDir)
        : Ray2(point2_t<float>{rOrigin.x, rOrigin.y}, point2_t<float>{rDir.x, rDir.y}) {}

    point2_t<T> GetOrigin() const { return origin; }
    point2_t<T> GetDirInv() const { return dirInv; }
    /// @param axis 0 for x or 1 for y. @return 1 if the reciprocal of the direction is negative
    int GetSign(int axis) const { return sign[axis]; }

  private:
    point2_t<T> origin;
    point2_t<T> dir;
    point2_t<T> dirInv;
    int sign[2];
};

namespace detail {

/// Narrows the interval of a segment to one slab; false once it is empty. If the direction is 0 and
/// the origin lies on a side, the product is NaN. Both comparisons are plain greater-than tests, so
/// that a NaN does not shrink the interval.
template <typename T>
inline bool ClipToSlab(T low, T high, T origin, T dirInv, int sign, T& tMin, T& tMax) {
    const T tNear = ((sign == 1 ? high : low) - origin) * dirInv;
    const T tFar = ((sign == 1 ? low : high) - origin) * dirInv;
    if (tNear > tMin)
        tMin = tNear;
    if (tMax > tFar)
        tMax = tFar;
    return !(tMin > tMax);
}

/// The slab test (Kay and Kajiya 1986, with the reciprocals and signs of Williams et al. 2005) of
/// the segment from a ray's origin to the end of its direction.
template <typename T, typename P>
inline bool TestSegment(const BBox<T, P>& box, const Ray2<T>& ray) {
    const point2_t<T> origin = ray.GetOrigin();
    const point2_t<T> dirInv = ray.GetDirInv();
    T tMin = T(0);
    T tMax = T(1);
    return ClipToSlab(box.min.x, box.max.x, origin.x, dirInv.x, ray.GetSign(0), tMin, tMax) &&
           ClipToSlab(box.min.y, box.max.y, origin.y, dirInv.y, ray.GetSign(1), tMin, tMax);
}

/// The ray of the segment from a to b in plan, to be tested against many boxes.
template <typename P>
inline Ray2<float> CreateSegmentRay(const P& a, const P& b) {
    return {point2_t<float>{a.x, a.y}, point2_t<float>{b.x - a.x, b.y - a.y}};
}

} // namespace detail

/// True if the segment from a to b meets the box in plan, touching included; z takes no part. A
/// segment of length zero acts as a point. Surface-local `float` throughout. Instances: 2-D box
/// with 2-D or 3-D points, 3-D box with 3-D points.
template <typename B, typename P>
inline bool IsIntersectedBBox(const BBox<float, B>& box, const P& a, const P& b) {
    return detail::TestSegment(box, detail::CreateSegmentRay(a, b));
}

} // namespace kelm::tin

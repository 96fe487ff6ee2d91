#pragma once

#include "tin/point.h"
#include "tin/tinexport.h"

namespace kelm::tin {

/// Axis-aligned box. `min` holds the lowest value on every axis, `max` the highest. Nothing puts
/// them in order, and an inverted box is not an error. There is no empty state: a default box is
/// the point at the origin.
///
/// Exactly four instances exist, all made in the library.
template <typename T, typename P>
class BBox {
  public:
    BBox() = default;
    BBox(const BBox&) = default;
    BBox& operator=(const BBox&) = default;
    virtual ~BBox() = default;

    P min{};
    P max{};
};

extern template class KELM_TIN_EXPORT BBox<float, point2_t<float>>;
extern template class KELM_TIN_EXPORT BBox<float, point3_t<float>>;
extern template class KELM_TIN_EXPORT BBox<double, point2_t<double>>;
extern template class KELM_TIN_EXPORT BBox<double, point3_t<double>>;

/// True if the position lies in the box in plan, its edges included. A NaN is not in any box: each
/// comparison is written so that a NaN fails it. All tests of a point in a box use this one.
template <typename T, typename P>
inline bool TestInside(const BBox<T, P>& box, T x, T y) {
    return x >= box.min.x && box.max.x >= x && y >= box.min.y && box.max.y >= y;
}

/// True if the two boxes share a point in plan, touching included; a NaN fails. The rule of every
/// box test of the system.
template <typename T, typename P, typename Q>
inline bool TestOverlap(const BBox<T, P>& box, const BBox<T, Q>& other) {
    return box.max.x >= other.min.x && other.max.x >= box.min.x && box.max.y >= other.min.y &&
           other.max.y >= box.min.y;
}

} // namespace kelm::tin

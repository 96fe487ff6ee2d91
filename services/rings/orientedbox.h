#pragma once

#include "services/rings/box.h"

namespace kelm::rings {

inline double Dot(const Point& a, const Point& b) {
    return a.x * b.x + a.y * b.y;
}

inline double Cross(const Point& a, const Point& b) {
    return a.x * b.y - a.y * b.x;
}

inline Point Subtract(const Point& a, const Point& b) {
    return {a.x - b.x, a.y - b.y};
}

/// Box along an axis. Its places are relative to an origin that its owner keeps.
struct OrientedBox {
    /// @param direction of length about 1 @param extent of what the box holds: x along the axis, y
    /// across it @param slack by which it is wider on each side: more than rounding moves a side
    OrientedBox(const Point& direction, const Box& extent, double slack)
        : axis(direction), halfAlong(extent.GetSize().x / 2 + slack),
          halfAcross(extent.GetSize().y / 2 + slack) {
        const double u = extent.low.x + extent.GetSize().x / 2;
        const double v = extent.low.y + extent.GetSize().y / 2;
        center = {axis.x * u - axis.y * v, axis.y * u + axis.x * v};
    }

    Point center{};
    Point axis;
    double halfAlong;  ///< to both sides
    double halfAcross; ///< to both sides
};

} // namespace kelm::rings

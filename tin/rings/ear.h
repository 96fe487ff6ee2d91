#pragma once

#include "tin/point.h"

namespace kelm::tin::rings {

using Point = point2_t<double>;

/// Least turn of an ear, 2^-23: twice its area, in squared map units.
constexpr double LEAST_TURN = 1.1920928955078125e-7;

/// Triangle of three corners, with its edges at hand. A corner is inside unless it lies right of an
/// edge: edges and corners are inside, without tolerance.
class EarTriangle {
  public:
    EarTriangle(const Point& p, const Point& q, const Point& r)
        : moSides{{p, q.x - p.x, q.y - p.y}, {q, r.x - q.x, r.y - q.y}, {r, p.x - r.x, p.y - r.y}} {
    }

    /// Does Q turn left by at least that of an ear?
    bool TestConvex() const {
        const Side& pq = moSides[0];
        const Side& rp = moSides[2];
        return !(LEAST_TURN > pq.dx * (-rp.dy) - pq.dy * (-rp.dx));
    }

    bool TestInside(const Point& at) const {
        return !(moSides[0].GetTurn(at.x, at.y) < 0.0) & !(moSides[1].GetTurn(at.x, at.y) < 0.0) &
               !(moSides[2].GetTurn(at.x, at.y) < 0.0);
    }

    /// Is each place of a box outside? False may mean that none could tell it at once.
    bool TestOutside(const Point& low, const Point& high) const {
        return moSides[0].TestRight(low, high) || moSides[1].TestRight(low, high) ||
               moSides[2].TestRight(low, high);
    }

  private:
    struct Side {
        Point from;
        double dx;
        double dy;

        double GetTurn(double x, double y) const {
            return dx * (y - from.y) - (x - from.x) * dy;
        }
        /// Rounding keeps order, so that a computed turn grows or falls with x as the exact one
        /// does, and with y: no place of the box has a larger one than this corner.
        bool TestRight(const Point& low, const Point& high) const {
            return GetTurn(dy > 0.0 ? low.x : high.x, dx > 0.0 ? high.y : low.y) < 0.0;
        }
    };

    Side moSides[3];
};

} // namespace kelm::tin::rings

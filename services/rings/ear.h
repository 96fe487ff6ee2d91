#pragma once

#include "services/rings/orientedbox.h"

namespace kelm::rings {

/// Least turn of an ear, 2^-23: twice its area, in squared map units.
constexpr double LEAST_TURN = 1.1920928955078125e-7;

/// The triangle that a corner Q of a counter-clockwise ring makes with its neighbours P and R.
class EarTriangle {
  public:
    EarTriangle(const Point& p, const Point& q, const Point& r)
        : moPQ{p, q.x - p.x, q.y - p.y}, moQR{q, r.x - q.x, r.y - q.y}, moRP{r, p.x - r.x,
                                                                             p.y - r.y} {}

    double GetTurn() const { return moPQ.dx * -moRP.dy - moPQ.dy * -moRP.dx; }

    /// Does Q turn left as much as an ear must?
    bool TestConvex() const { return !(LEAST_TURN > GetTurn()); }

    /// Edges and corners are inside, without tolerance.
    bool TestInside(double x, double y) const {
        const double pq = moPQ.GetTurn(x, y);
        const double qr = moQR.GetTurn(x, y);
        const double rp = moRP.GetTurn(x, y);
        return !(pq < 0.0) & !(qr < 0.0) & !(rp < 0.0);
    }

    /// Is no place of a box inside, for that of one side all are outside? For coordinates whose
    /// products do not overflow.
    bool TestOutside(const Point& low, const Point& high) const {
        return moPQ.TestOutside(low, high) || moQR.TestOutside(low, high) ||
               moRP.TestOutside(low, high);
    }

    /// The same for a box relative to an origin. It may tell of too few boxes.
    bool TestOutside(const OrientedBox& box, const Point& origin) const {
        return moPQ.TestOutside(box, origin) || moQR.TestOutside(box, origin) ||
               moRP.TestOutside(box, origin);
    }

    /// @return a box that holds all places inside. It is larger than the triangle, since far beyond
    /// the tip of a needle rounding moves places inside; docs/guide/rings.md has the proof.
    Box GetReach() const {
        Box box;
        for (const Side* side : {&moPQ, &moQR, &moRP})
            box.Add(side->from);
        const double size = std::max(box.GetSize().x, box.GetSize().y);
        const double part = 0x1p-48 * size * size / GetTurn();
        const double reach =
            part <= 0.5 ? 2.0 * part * size : std::numeric_limits<double>::infinity();
        return {{box.low.x - reach, box.low.y - reach}, {box.high.x + reach, box.high.y + reach}};
    }

  private:
    struct Side {
        Point from;
        double dx;
        double dy;

        double GetTurn(double x, double y) const { return dx * (y - from.y) - (x - from.x) * dy; }

        /// Rounding keeps order. So the computed turn grows or falls with x alone and with y alone
        /// as the exact one does, and no place of the box has a larger one than this corner.
        bool TestOutside(const Point& low, const Point& high) const {
            return GetTurn(dy > 0.0 ? low.x : high.x, dx > 0.0 ? high.y : low.y) < 0.0;
        }

        /// Is the largest turn negative, by more than rounding changes it?
        bool TestOutside(const OrientedBox& box, const Point& origin) const {
            const Point direction{dx, dy};
            const Point to{origin.x - from.x + box.center.x, origin.y - from.y + box.center.y};
            const double largest = Cross(direction, to) +
                                   std::fabs(Cross(direction, box.axis)) * box.halfAlong +
                                   std::fabs(Dot(direction, box.axis)) * box.halfAcross;
            const double reach = std::fabs(to.x) + std::fabs(to.y) + box.halfAlong + box.halfAcross;
            return largest < -0x1p-48 * (std::fabs(dx) + std::fabs(dy)) * reach;
        }
    };

    Side moPQ;
    Side moQR;
    Side moRP;
};

} // namespace kelm::rings

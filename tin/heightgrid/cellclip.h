#pragma once

#include "tin/heightgrid/survey.h"
#include "tin/rules/barycentric.h"
#include "tin/triangle.h"

#include <cmath>
#include <limits>

namespace kelm::tin::heightgrid {

/// Tells which parts of the plan a triangle certainly holds no position of, neither by the inside
/// rule nor by the closed one.
///
/// The numerators of the weights are computed in `double` over a part, and compared beyond twice of
/// what rounding to `float` can do to them and to the determinant.
class CellClip {
  public:
    explicit CellClip(const Triangle& triangle)
        : CellClip(*triangle.GetVertex(0), *triangle.GetVertex(1), *triangle.GetVertex(2)) {}

    bool Misses(const Region& part) const {
        const double xFrom = part.xFrom - mdfX2;
        const double xTo = part.xTo - mdfX2;
        const double yFrom = part.yFrom - mdfY2;
        const double yTo = part.yTo - mdfY2;
        const double reachX = std::fmax(std::fabs(xFrom), std::fabs(xTo));
        const double reachY = std::fmax(std::fabs(yFrom), std::fabs(yTo));
        const auto most = [&](double x, double y) {
            return x * (x > 0.0 ? xTo : xFrom) + y * (y > 0.0 ? yTo : yFrom);
        };
        const double doubt0 = GetDoubt(reachX * std::fabs(mdfY12), reachY * std::fabs(mdfX12));
        const double doubt1 = GetDoubt(reachX * std::fabs(mdfY02), reachY * std::fabs(mdfX02));
        const double rest = mdfDet + most(mdfY02 - mdfY12, mdfX12 - mdfX02);
        return most(mdfY12, -mdfX12) < -(doubt0 + mdfDoubt) ||
               most(-mdfY02, mdfX02) < -(doubt1 + mdfDoubt) ||
               rest < -2.0 * (doubt0 + doubt1 + mdfDoubt);
    }

  private:
    CellClip(const point3_t<float>& v0, const point3_t<float>& v1, const point3_t<float>& v2)
        : mdfX2(rules::Widen(v2.x)), mdfY2(rules::Widen(v2.y)), mdfX02(rules::Widen(v0.x) - mdfX2),
          mdfY02(rules::Widen(v0.y) - mdfY2), mdfX12(rules::Widen(v1.x) - mdfX2),
          mdfY12(rules::Widen(v1.y) - mdfY2) {
        mdfDet = mdfX02 * mdfY12 - mdfX12 * mdfY02;
        mdfDoubt = GetDoubt(std::fabs(mdfX02 * mdfY12), std::fabs(mdfX12 * mdfY02));
        if (std::fabs(mdfDet) <= mdfDoubt)
            mdfDoubt = std::numeric_limits<double>::infinity();
        if (mdfDet < 0.0)
            Turn();
    }

    /// A bound on the error of a difference of two products of differences in `float`: three
    /// roundings a product and one behind, of 2^-24 each, and what underflows.
    static double GetDoubt(double a, double b) { return 0x1p-21 * (a + b) + 0x1p-120; }

    void Turn() {
        for (double* value : {&mdfX02, &mdfY02, &mdfX12, &mdfY12, &mdfDet})
            *value = -*value;
    }

    double mdfX2;
    double mdfY2;
    double mdfX02; ///< these, and the determinant, turned so that it is positive
    double mdfY02;
    double mdfX12;
    double mdfY12;
    double mdfDet;
    double mdfDoubt; ///< of the determinant; infinite if its sign is in doubt
};

} // namespace kelm::tin::heightgrid

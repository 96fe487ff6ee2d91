#pragma once

#include "tin/point.h"

#include <limits>

namespace kelm::tin::rules {

/// Below this a determinant is no divisor: the configuration is degenerate.
constexpr double EPSILON = std::numeric_limits<double>::epsilon();

inline double Widen(float v) {
    return static_cast<double>(v);
}

inline bool IsDegenerate(double det) {
    return det > -EPSILON && EPSILON > det;
}

/// The height rule: what the weights make of the heights of the vertices.
inline float GetWeightedHeight(float z0, float z1, float z2, double l0, double l1, double l2) {
    return static_cast<float>((Widen(z1) * l1 + Widen(z0) * l0) + Widen(z2) * l2);
}

/// The inside rule, of numerators whose signs are changed if that of the determinant is.
/// @param l0,l1 numerators, and then the weights
inline bool DivideWeights(double det, double& l0, double& l1, double& l2) {
    l0 /= det;
    l1 /= det;
    l2 = (1.0 - l0) - l1;
    return !(l0 > 1.0 || 0.0 > l0 || l1 > 1.0 || 0.0 > l1 || l2 > 1.0 || 0.0 > l2);
}

/// The inside rule: barycentric weights of positions in one triangle, in plan, row by row.
///
/// Differences, products and numerators are `float`, so that what a triangle and a row share is
/// computed once without a change of any bit; the numerators are widened and divided in `double`.
class Barycentric {
  public:
    Barycentric(const point3_t<float>& v0, const point3_t<float>& v1, const point3_t<float>& v2)
        : mfX2(v2.x), mfY2(v2.y), mfA0(v1.y - v2.y), mfB0(v2.x - v1.x), mfA1(v2.y - v0.y),
          mfB1(v0.x - v2.x), mdfDet(Widen((v0.x - v2.x) * mfA0 - (v1.x - v2.x) * (v0.y - v2.y))) {}

    /// Does the triangle have no area in plan? It then holds no position.
    bool IsFlat() const { return IsDegenerate(mdfDet); }

    double GetDeterminant() const { return mdfDet; }

    void SetRow(float y) {
        mfRow0 = mfB0 * (y - mfY2);
        mfRow1 = (y - mfY2) * mfB1;
    }

    /// Weights at x in the row. @return true if the position is inside; else the outputs are of no
    /// use. Comparisons stand so that a NaN weight passes each bound.
    bool GetWeights(float x, double& l0, double& l1, double& l2) const {
        l0 = Widen(mfRow0 + (x - mfX2) * mfA0) / mdfDet;
        if (l0 > 1.0 || 0.0 > l0)
            return false;
        l1 = Widen(mfA1 * (x - mfX2) + mfRow1) / mdfDet;
        if (l1 > 1.0 || 0.0 > l1)
            return false;
        l2 = (1.0 - l0) - l1;
        return !(l2 > 1.0 || 0.0 > l2);
    }

  private:
    float mfX2;
    float mfY2;
    float mfA0;
    float mfB0;
    float mfA1;
    float mfB1;
    double mdfDet;
    float mfRow0 = 0.0F;
    float mfRow1 = 0.0F;
};

} // namespace kelm::tin::rules

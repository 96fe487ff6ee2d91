#pragma once

#include "tin/point.h"
#include "tin/tinexport.h"

namespace kelm::tin {

/// Vector of three `double`, for 3-D arithmetic on vertex data. A plain value.
///
/// The operations are compiled in the library, so that a program's compiler flags cannot change
/// their order or contract them.
class KELM_TIN_EXPORT Vector3 {
  public:
    /// Leaves the components unset.
    Vector3() = default;
    Vector3(const double& dfX, const double& dfY, const double& dfZ);
    Vector3(const point3_t<float>& p);
    Vector3(const point3_t<double>& p);
    Vector3(const Vector3&) = default;
    Vector3& operator=(const Vector3&) = default;
    Vector3& operator=(const point3_t<double>& p);
    ~Vector3() = default;

    Vector3 operator*(const double& s) const;
    /// Dot product, summed as (y term + x term) + z term.
    double operator*(const Vector3& b) const;
    Vector3 operator-(const Vector3& b) const;
    Vector3 operator-(const point3_t<double>& b) const;
    /// Flips the sign bit of each component, so +0 becomes -0.
    Vector3 operator-() const;
    Vector3 operator+(const Vector3& b) const;
    Vector3 operator+(const point3_t<double>& b) const;
    /// Divides each component; division by zero gives IEEE infinities or NaN.
    Vector3 operator/(double s) const;
    /// Cross product.
    Vector3 operator^(const Vector3& b) const;
    void operator*=(const double& s);

    /// Square root of (x x + y y) + z z, unscaled: it can overflow or underflow.
    double Length() const;
    /// Multiplies by the reciprocal of the length. A vector whose length is at or below the
    /// smallest normal `double` stays as it is.
    void Normalize();

    void GetXYZ(point3_t<double>* out) const;
    double _x() const { return x; }
    double _y() const { return y; }
    double _z() const { return z; }

    double x;
    double y;
    double z;
};

} // namespace kelm::tin

#include "tin/vector3.h"

#include <cmath>
#include <limits>

namespace kelm::tin {

Vector3::Vector3(const double& dfX, const double& dfY, const double& dfZ)
    : x(dfX), y(dfY), z(dfZ) {}

Vector3::Vector3(const point3_t<float>& p)
    : x(static_cast<double>(p.x)), y(static_cast<double>(p.y)), z(static_cast<double>(p.z)) {}

Vector3::Vector3(const point3_t<double>& p) : x(p.x), y(p.y), z(p.z) {}

Vector3& Vector3::operator=(const point3_t<double>& p) {
    x = p.x;
    y = p.y;
    z = p.z;
    return *this;
}

Vector3 Vector3::operator*(const double& s) const {
    return {x * s, y * s, z * s};
}

double Vector3::operator*(const Vector3& b) const {
    return (y * b.y + x * b.x) + z * b.z;
}

Vector3 Vector3::operator-(const Vector3& b) const {
    return {x - b.x, y - b.y, z - b.z};
}

Vector3 Vector3::operator-(const point3_t<double>& b) const {
    return {x - b.x, y - b.y, z - b.z};
}

Vector3 Vector3::operator-() const {
    return {-x, -y, -z};
}

Vector3 Vector3::operator+(const Vector3& b) const {
    return {x + b.x, y + b.y, z + b.z};
}

Vector3 Vector3::operator+(const point3_t<double>& b) const {
    return {x + b.x, y + b.y, z + b.z};
}

Vector3 Vector3::operator/(double s) const {
    return {x / s, y / s, z / s};
}

Vector3 Vector3::operator^(const Vector3& b) const {
    return {y * b.z - z * b.y, z * b.x - x * b.z, x * b.y - y * b.x};
}

void Vector3::operator*=(const double& s) {
    x *= s;
    y *= s;
    z *= s;
}

double Vector3::Length() const {
    return std::sqrt((x * x + y * y) + z * z);
}

void Vector3::Normalize() {
    const double length = Length();
    if (length <= std::numeric_limits<double>::min())
        return;
    const double r = 1.0 / length;
    *this *= r;
}

void Vector3::GetXYZ(point3_t<double>* out) const {
    out->x = x;
    out->y = y;
    out->z = z;
}

} // namespace kelm::tin

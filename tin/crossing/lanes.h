#pragma once

#ifdef __SSE2__
#include <emmintrin.h>
#else
#include <cmath>
#include <cstring>
#endif

// Four floats side by side: the instructions of SSE2, or loops of the same operations where there
// are none.

namespace kelm::tin::crossing {

#ifdef __SSE2__

struct Float4 {
    __m128 v;
};
struct Mask4 {
    __m128 v;
};

inline Float4 Load4(const float* p) {
    return {_mm_loadu_ps(p)};
}
inline void Store4(float* p, Float4 a) {
    _mm_storeu_ps(p, a.v);
}
inline Float4 Fill4(float value) {
    return {_mm_set1_ps(value)};
}
inline Float4 operator+(Float4 a, Float4 b) {
    return {_mm_add_ps(a.v, b.v)};
}
inline Float4 operator-(Float4 a, Float4 b) {
    return {_mm_sub_ps(a.v, b.v)};
}
inline Float4 operator*(Float4 a, Float4 b) {
    return {_mm_mul_ps(a.v, b.v)};
}
/// @return b where one of both is NaN
inline Float4 Least(Float4 a, Float4 b) {
    return {_mm_min_ps(a.v, b.v)};
}
inline Float4 Greatest(Float4 a, Float4 b) {
    return {_mm_max_ps(a.v, b.v)};
}
inline Float4 Size(Float4 a) {
    return {_mm_andnot_ps(_mm_set1_ps(-0.0F), a.v)};
}
/// @return a, with its sign changed where b is negative
inline Float4 Turn(Float4 a, Float4 b) {
    return {_mm_xor_ps(a.v, _mm_and_ps(_mm_set1_ps(-0.0F), b.v))};
}
/// False for a NaN, as all comparisons here.
inline Mask4 operator>(Float4 a, Float4 b) {
    return {_mm_cmpgt_ps(a.v, b.v)};
}
inline Mask4 operator&(Mask4 a, Mask4 b) {
    return {_mm_and_ps(a.v, b.v)};
}
inline Mask4 operator|(Mask4 a, Mask4 b) {
    return {_mm_or_ps(a.v, b.v)};
}
/// @return a bit a lane, the first lane lowest
inline unsigned GetBits(Mask4 a) {
    return static_cast<unsigned>(_mm_movemask_ps(a.v));
}

#else

struct Float4 {
    float v[4];
};
struct Mask4 {
    unsigned v;
};

template <typename Operation>
inline Float4 ForEach(Float4 a, const Float4& b, const Operation& operation) {
    for (int i = 0; i < 4; ++i)
        a.v[i] = operation(a.v[i], b.v[i]);
    return a;
}
inline Float4 Load4(const float* p) {
    Float4 a;
    std::memcpy(a.v, p, sizeof a.v);
    return a;
}
inline void Store4(float* p, const Float4& a) {
    std::memcpy(p, a.v, sizeof a.v);
}
inline Float4 Fill4(float value) {
    return {{value, value, value, value}};
}
inline Float4 operator+(const Float4& a, const Float4& b) {
    return ForEach(a, b, [](float x, float y) { return x + y; });
}
inline Float4 operator-(const Float4& a, const Float4& b) {
    return ForEach(a, b, [](float x, float y) { return x - y; });
}
inline Float4 operator*(const Float4& a, const Float4& b) {
    return ForEach(a, b, [](float x, float y) { return x * y; });
}
/// @return b where one of both is NaN
inline Float4 Least(const Float4& a, const Float4& b) {
    return ForEach(a, b, [](float x, float y) { return x < y ? x : y; });
}
inline Float4 Greatest(const Float4& a, const Float4& b) {
    return ForEach(a, b, [](float x, float y) { return x > y ? x : y; });
}
inline Float4 Size(const Float4& a) {
    return ForEach(a, a, [](float x, float) { return std::fabs(x); });
}
/// @return a, with its sign changed where b is negative
inline Float4 Turn(const Float4& a, const Float4& b) {
    return ForEach(a, b, [](float x, float y) { return std::signbit(y) ? -x : x; });
}
/// False for a NaN, as all comparisons here.
inline Mask4 operator>(const Float4& a, const Float4& b) {
    Mask4 mask{0};
    for (unsigned i = 0; i < 4; ++i)
        mask.v |= (a.v[i] > b.v[i] ? 1U : 0U) << i;
    return mask;
}
inline Mask4 operator&(Mask4 a, Mask4 b) {
    return {a.v & b.v};
}
inline Mask4 operator|(Mask4 a, Mask4 b) {
    return {a.v | b.v};
}
/// @return a bit a lane, the first lane lowest
inline unsigned GetBits(Mask4 a) {
    return a.v;
}

#endif

/// Three coordinates of four points.
struct Point4 {
    Float4 x;
    Float4 y;
    Float4 z;
};

inline Point4 operator-(const Point4& a, const Point4& b) {
    return {a.x - b.x, a.y - b.y, a.z - b.z};
}
inline Point4 Cross(const Point4& a, const Point4& b) {
    return {a.y * b.z - a.z * b.y, a.z * b.x - a.x * b.z, a.x * b.y - a.y * b.x};
}
inline Float4 Dot(const Point4& a, const Point4& b) {
    return (a.y * b.y + a.x * b.x) + a.z * b.z;
}

} // namespace kelm::tin::crossing

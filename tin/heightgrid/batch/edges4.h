#pragma once

#ifdef __SSE2__

#include "tin/heightgrid/record.h"
#include "tin/rules/barycentric.h"

#include <emmintrin.h>

namespace kelm::tin::heightgrid {

/// Four positions.
struct Plan4 {
    __m128 x;
    __m128 y;
};

inline __m128 LoadPair(const Record& record, std::uint8_t a, std::uint8_t b) {
    const auto* first = reinterpret_cast<const __m64*>(record.GetValues(a));
    const auto* second = reinterpret_cast<const __m64*>(record.GetValues(b));
    return _mm_loadh_pi(_mm_loadl_pi(_mm_setzero_ps(), first), second);
}

/// @return the positions of one corner of the four triangles of a group
inline Plan4 LoadCorners(const Record& record, unsigned group, unsigned corner) {
    const std::uint8_t* places = record.GetPlaces(group, corner);
    const __m128 low = LoadPair(record, places[0], places[1]);
    const __m128 high = LoadPair(record, places[2], places[3]);
    return {_mm_shuffle_ps(low, high, _MM_SHUFFLE(2, 0, 2, 0)),
            _mm_shuffle_ps(low, high, _MM_SHUFFLE(3, 1, 3, 1))};
}

/// The positions of the corners of four triangles.
struct Corners4 {
    Corners4(const Record& record, unsigned group)
        : v0(LoadCorners(record, group, 0)), v1(LoadCorners(record, group, 1)),
          v2(LoadCorners(record, group, 2)) {}
    Plan4 v0;
    Plan4 v1;
    Plan4 v2;
};

/// Four boxes in plan.
struct Box4 {
    __m128 xLow;
    __m128 yLow;
    __m128 xHigh;
    __m128 yHigh;

    __m128 Holds(__m128 x, __m128 y) const {
        return _mm_and_ps(_mm_and_ps(_mm_cmple_ps(xLow, x), _mm_cmple_ps(x, xHigh)),
                          _mm_and_ps(_mm_cmple_ps(yLow, y), _mm_cmple_ps(y, yHigh)));
    }
};

/// A box is the least and the greatest coordinate of the corners, none of which is a NaN.
inline Box4 MakeBoxes(const Corners4& c) {
    return {_mm_min_ps(_mm_min_ps(c.v0.x, c.v1.x), c.v2.x),
            _mm_min_ps(_mm_min_ps(c.v0.y, c.v1.y), c.v2.y),
            _mm_max_ps(_mm_max_ps(c.v0.x, c.v1.x), c.v2.x),
            _mm_max_ps(_mm_max_ps(c.v0.y, c.v1.y), c.v2.y)};
}

/// Numerators of two weights, with their signs changed if the determinant is negative.
struct Weights4 {
    __m128 w0;
    __m128 w1;
};

inline __m128 GetSize(__m128 v) {
    return _mm_andnot_ps(_mm_set1_ps(-0.0F), v);
}

/// Twice the bound on the error of a sum of two products of differences: three roundings a product
/// and one behind, of 2^-24 each, and what underflows.
inline __m128 GetDoubt(__m128 a, __m128 b) {
    return _mm_add_ps(_mm_mul_ps(_mm_add_ps(GetSize(a), GetSize(b)), _mm_set1_ps(0x1p-21F)),
                      _mm_set1_ps(0x1p-120F));
}

/// What the inside rule needs of four triangles, or of one four times. All values are computed as
/// by rules::Barycentric, to the bit, the signs of zeros included.
struct Edges4 {
    __m128 x2;
    __m128 y2;
    __m128 a0;
    __m128 b0;
    __m128 a1;
    __m128 b1;
    __m128 sign; ///< of the determinant
    __m128 size; ///< of the determinant

    Weights4 Weigh(__m128 x, __m128 y) const {
        const __m128 px = _mm_sub_ps(x, x2);
        const __m128 py = _mm_sub_ps(y, y2);
        const __m128 n0 = _mm_add_ps(_mm_mul_ps(b0, py), _mm_mul_ps(px, a0));
        const __m128 n1 = _mm_add_ps(_mm_mul_ps(a1, px), _mm_mul_ps(py, b1));
        return {_mm_xor_ps(n0, sign), _mm_xor_ps(n1, sign)};
    }
    /// A mask of those that do not hold the position by exact arithmetic, as far as rounding leaves
    /// no doubt.
    __m128 Exclude(__m128 x, __m128 y) const {
        const __m128 px = _mm_sub_ps(x, x2);
        const __m128 py = _mm_sub_ps(y, y2);
        const __m128 doubt0 = GetDoubt(_mm_mul_ps(b0, py), _mm_mul_ps(px, a0));
        const __m128 doubt1 = GetDoubt(_mm_mul_ps(a1, px), _mm_mul_ps(py, b1));
        const __m128 doubt = GetDoubt(_mm_mul_ps(b1, a0), _mm_mul_ps(b0, a1));
        const Weights4 weights = Weigh(x, y);
        const __m128 beyond = _mm_sub_ps(_mm_add_ps(weights.w0, weights.w1), size);
        const __m128 doubts = _mm_add_ps(_mm_add_ps(doubt0, doubt1), doubt);
        const __m128 isOutside =
            _mm_or_ps(_mm_or_ps(_mm_cmplt_ps(_mm_add_ps(weights.w0, doubt0), _mm_setzero_ps()),
                                _mm_cmplt_ps(_mm_add_ps(weights.w1, doubt1), _mm_setzero_ps())),
                      _mm_cmpgt_ps(beyond, _mm_add_ps(doubts, doubts)));
        return _mm_and_ps(isOutside, _mm_cmpgt_ps(size, doubt));
    }
    __m128 IsFlat() const {
        return _mm_cmplt_ps(size, _mm_set1_ps(static_cast<float>(rules::EPSILON)));
    }
};

inline Edges4 MakeEdges(const Corners4& c) {
    Edges4 edges;
    edges.x2 = c.v2.x;
    edges.y2 = c.v2.y;
    edges.a0 = _mm_sub_ps(c.v1.y, c.v2.y);
    edges.b0 = _mm_sub_ps(c.v2.x, c.v1.x);
    edges.a1 = _mm_sub_ps(c.v2.y, c.v0.y);
    edges.b1 = _mm_sub_ps(c.v0.x, c.v2.x);
    const __m128 det = _mm_sub_ps(_mm_mul_ps(edges.b1, edges.a0), _mm_mul_ps(edges.b0, edges.a1));
    edges.sign = _mm_and_ps(det, _mm_set1_ps(-0.0F));
    edges.size = _mm_xor_ps(det, edges.sign);
    return edges;
}

/// Bound on the sum of two numerators inside a triangle.
inline __m128 GetMostOfSum(__m128 size) {
    return _mm_mul_ps(size, _mm_set1_ps(1.0F + 0x1p-20F));
}

/// A mask without those that the inside rule certainly refuses: the numerators are compared with
/// the determinant instead of divided by it. A NaN stays.
inline __m128 TestWeights(const Weights4& weights, __m128 mostOfSum) {
    return _mm_and_ps(_mm_cmpnlt_ps(_mm_min_ps(weights.w0, weights.w1), _mm_setzero_ps()),
                      _mm_cmpngt_ps(_mm_add_ps(weights.w0, weights.w1), mostOfSum));
}

} // namespace kelm::tin::heightgrid

#endif

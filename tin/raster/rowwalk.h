#pragma once

#include "tin/bbox.h"
#include "tin/rules/barycentric.h"
#include "tin/rules/highest.h"
#include "tin/triangle.h"

#include <algorithm>
#include <cmath>
#include <cstddef>

#ifdef __SSE2__
#include <emmintrin.h>
#endif

namespace kelm::tin::raster {

/// One triangle on one row of cells: adds its heights to the cells whose centre it holds.
///
/// Four cells at a time go through the same steps of the inside rule as one does alone, so that the
/// bits are the same.
class RowWalk {
  public:
    /// @param box of the triangle, as far as it lies in that of the surface
    RowWalk(const Triangle& triangle, const BBox<float, point2_t<float>>& box)
        : mrV0(*triangle.GetVertex(0)), mrV1(*triangle.GetVertex(1)), mrV2(*triangle.GetVertex(2)),
          moBarycentric(mrV0, mrV1, mrV2), mfLow(box.min.x), mfHigh(box.max.x) {
#ifdef __SSE2__
        mfDeterminant = static_cast<float>(moBarycentric.GetDeterminant());
        mbFinite = IsFinite();
#endif
    }

    bool IsFlat() const {
        return moBarycentric.IsFlat();
    }
    bool IsFinite() const {
        return std::isfinite(moBarycentric.GetDeterminant());
    }

    void SetRow(float y) {
        moBarycentric.SetRow(y);
#ifdef __SSE2__
        const float up = y - mrV2.y;
        mfRow0 = (mrV2.x - mrV1.x) * up;
        mfRow1 = up * (mrV0.x - mrV2.x);
#endif
    }

    /// @param xs,cells the centres and heights of a whole row @param count its length @param
    /// first,last columns from first to last - 1
    void Add(const float* xs, float* cells, std::size_t count, std::size_t first,
             std::size_t last) const {
#ifdef __SSE2__
        if (count >= 4) {
            for (; first < last; first += 4) {
                const std::size_t start = std::min(first, count - 4);
                AddFour(xs + start, cells + start);
            }
            return;
        }
#endif
        for (; first < last && first < count; ++first)
            AddOne(xs[first], cells[first]);
    }

  private:
    void AddOne(float x, float& rCell) const {
        double l0;
        double l1;
        double l2;
        if (!(x >= mfLow && mfHigh >= x) || !moBarycentric.GetWeights(x, l0, l1, l2))
            return;
        const float h = rules::GetWeightedHeight(mrV0.z, mrV1.z, mrV2.z, l0, l1, l2);
        if (h > rCell)
            rCell = h;
    }

#ifdef __SSE2__
    void AddFour(const float* xs, float* cells) const {
        const __m128 x = _mm_loadu_ps(xs);
        const __m128 right = _mm_sub_ps(x, _mm_set1_ps(mrV2.x));
        const __m128 n0 =
            _mm_add_ps(_mm_set1_ps(mfRow0), _mm_mul_ps(right, _mm_set1_ps(mrV1.y - mrV2.y)));
        const __m128 n1 =
            _mm_add_ps(_mm_mul_ps(_mm_set1_ps(mrV2.y - mrV0.y), right), _mm_set1_ps(mfRow1));
        const __m128 inBox =
            _mm_and_ps(_mm_cmpge_ps(x, _mm_set1_ps(mfLow)), _mm_cmple_ps(x, _mm_set1_ps(mfHigh)));
        if (mbFinite &&
            _mm_movemask_ps(_mm_andnot_ps(_mm_or_ps(IsNegative(n0), IsNegative(n1)), inBox)) == 0)
            return;
        const __m128 heights = _mm_movelh_ps(
            GetHeights(_mm_cvtps_pd(n0), _mm_cvtps_pd(n1)),
            GetHeights(_mm_cvtps_pd(_mm_movehl_ps(n0, n0)), _mm_cvtps_pd(_mm_movehl_ps(n1, n1))));
        const __m128 before = _mm_loadu_ps(cells);
        const __m128 higher = _mm_and_ps(inBox, _mm_cmpgt_ps(heights, before));
        _mm_storeu_ps(cells, _mm_or_ps(_mm_and_ps(higher, heights), _mm_andnot_ps(higher, before)));
    }
    /// @return mask of the weights that are below 0, for a finite determinant: a quotient has the
    /// sign that those of its parts tell, and is 0 only if the numerator is
    __m128 IsNegative(__m128 numerator) const {
        const __m128 sign = _mm_and_ps(_mm_set1_ps(mfDeterminant), _mm_set1_ps(-0.0F));
        return _mm_cmplt_ps(_mm_xor_ps(numerator, sign), _mm_setzero_ps());
    }
    /// @return two heights in the low half; NaN, which is above nothing, outside the triangle
    __m128 GetHeights(__m128d n0, __m128d n1) const {
        const __m128d one = _mm_set1_pd(1.0);
        const __m128d det = _mm_set1_pd(moBarycentric.GetDeterminant());
        const __m128d l0 = _mm_div_pd(n0, det);
        const __m128d l1 = _mm_div_pd(n1, det);
        const __m128d l2 = _mm_sub_pd(_mm_sub_pd(one, l0), l1);
        const auto z = [](float height) { return _mm_set1_pd(rules::Widen(height)); };
        const __m128d height =
            _mm_add_pd(_mm_add_pd(_mm_mul_pd(z(mrV1.z), l1), _mm_mul_pd(z(mrV0.z), l0)),
                       _mm_mul_pd(z(mrV2.z), l2));
        const auto isOut = [&](__m128d l) {
            return _mm_or_pd(_mm_cmpgt_pd(l, one), _mm_cmplt_pd(l, _mm_setzero_pd()));
        };
        const __m128d out = _mm_or_pd(_mm_or_pd(isOut(l0), isOut(l1)), isOut(l2));
        return _mm_cvtpd_ps(_mm_or_pd(height, out)); // all bits set are a NaN
    }

    float mfRow0 = 0.0F;
    float mfRow1 = 0.0F;
    float mfDeterminant;
    bool mbFinite;
#endif

    const point3_t<float>& mrV0;
    const point3_t<float>& mrV1;
    const point3_t<float>& mrV2;
    rules::Barycentric moBarycentric;
    float mfLow;
    float mfHigh;
};

} // namespace kelm::tin::raster

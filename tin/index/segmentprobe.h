#pragma once

#include "tin/bbox.h"
#include "tin/point.h"
#include "tin/ray2.h"

#ifdef __SSE2__
#include <emmintrin.h>
#endif

namespace kelm::tin::index {

/// A segment to be tested against many boxes in plan: IsIntersectedBBox with both ends of both
/// slabs worked out at once, by the same operations on the same floats.
class SegmentProbe {
  public:
#ifdef __SSE2__
    template <typename P>
    SegmentProbe(const P& a, const P& b) {
        const Ray2<float> ray = detail::CreateSegmentRay(a, b);
        const point2_t<float> origin = ray.GetOrigin();
        const point2_t<float> dirInv = ray.GetDirInv();
        mOrigin = _mm_setr_ps(origin.x, origin.y, origin.x, origin.y);
        mDirInv = _mm_setr_ps(dirInv.x, dirInv.y, dirInv.x, dirInv.y);
        mBackward = _mm_castsi128_ps(
            _mm_setr_epi32(-ray.GetSign(0), -ray.GetSign(1), -ray.GetSign(0), -ray.GetSign(1)));
    }

    bool IsMet(const BBox<float, point2_t<float>>& box) const {
        const __m128 bounds = _mm_setr_ps(box.min.x, box.min.y, box.max.x, box.max.y);
        const __m128 t = _mm_mul_ps(_mm_sub_ps(bounds, mOrigin), mDirInv);
        const __m128 crossed = _mm_shuffle_ps(t, t, _MM_SHUFFLE(1, 0, 3, 2));
        // Near ends in the low two lanes, far ends in the high two.
        const __m128 ends = _mm_or_ps(_mm_and_ps(mBackward, crossed), _mm_andnot_ps(mBackward, t));
        // Both give the second operand for a NaN, which must leave the interval open.
        const __m128 low = _mm_max_ps(ends, _mm_setzero_ps());
        const __m128 high = _mm_min_ps(ends, _mm_set1_ps(1.0F));
        // Empty once any near end lies beyond any far end.
        const __m128 nears = _mm_shuffle_ps(low, low, _MM_SHUFFLE(1, 0, 1, 0));
        const __m128 fars = _mm_shuffle_ps(high, high, _MM_SHUFFLE(2, 3, 3, 2));
        return _mm_movemask_ps(_mm_cmpgt_ps(nears, fars)) == 0;
    }

  private:
    __m128 mOrigin;
    __m128 mDirInv;
    __m128 mBackward; ///< all bits of an axis set where the segment runs against it
#else
    template <typename P>
    SegmentProbe(const P& a, const P& b) : mRay(detail::CreateSegmentRay(a, b)) {}

    bool IsMet(const BBox<float, point2_t<float>>& box) const {
        return detail::TestSegment(box, mRay);
    }

  private:
    Ray2<float> mRay;
#endif
};

} // namespace kelm::tin::index

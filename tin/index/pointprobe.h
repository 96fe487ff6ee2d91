#pragma once

#include "tin/bbox.h"
#include "tin/point.h"

#ifdef __SSE2__
#include <emmintrin.h>
#endif

namespace kelm::tin::index {

/// A position to be tested against many boxes: TestInside with its four comparisons made at once.
///
/// With the signs of the high corner flipped on both sides, all four read "position >= bound"; a
/// NaN fails each, as it does there.
class PointProbe {
  public:
#ifdef __SSE2__
    PointProbe(float x, float y)
        : mFlip(_mm_setr_ps(0.0F, 0.0F, -0.0F, -0.0F)),
          mPosition(_mm_xor_ps(_mm_setr_ps(x, y, x, y), mFlip)) {}

    bool IsIn(const BBox<float, point2_t<float>>& box) const {
        const __m128 bounds = _mm_setr_ps(box.min.x, box.min.y, box.max.x, box.max.y);
        return _mm_movemask_ps(_mm_cmpge_ps(mPosition, _mm_xor_ps(bounds, mFlip))) == 0xF;
    }

  private:
    __m128 mFlip;
    __m128 mPosition;
#else
    PointProbe(float x, float y) : mfX(x), mfY(y) {}

    bool IsIn(const BBox<float, point2_t<float>>& box) const {
        return TestInside(box, mfX, mfY);
    }

  private:
    float mfX;
    float mfY;
#endif
};

} // namespace kelm::tin::index

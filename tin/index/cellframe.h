#pragma once

#include "tin/bbox.h"
#include "tin/point.h"

#include <algorithm>
#include <cstddef>
#include <cstdint>

#ifdef __SSE2__
#include <emmintrin.h>
#endif

namespace kelm::tin::index {

/// The cells of one axis.
///
/// The number of a cell never falls while the coordinate rises, since no step of its computation
/// does. So a position between two bounds has a cell between the cells of the bounds, however they
/// were rounded. A coordinate beyond the axis, or NaN, has a cell at its end.
class CellAxis {
  public:
    /// Most cells: `float` tells so many apart.
    static constexpr std::uint32_t MOST = 1U << 22;

    CellAxis() = default;
    CellAxis(float low, float high, std::uint32_t count)
        : mfLow(low), mfScale(high > low ? static_cast<float>(count / (static_cast<double>(high) -
                                                                       static_cast<double>(low)))
                                         : 0.0F),
          mfLast(static_cast<float>(count - 1)), mnCount(count) {}

    std::uint32_t GetCount() const { return mnCount; }

    std::uint32_t Find(float v) const {
        // A NaN fails the first comparison.
        const float scaled = (v - mfLow) * mfScale;
        const float risen = scaled > 0.0F ? scaled : 0.0F;
        return static_cast<std::uint32_t>(static_cast<std::int32_t>(std::min(risen, mfLast)));
    }

#ifdef __SSE2__
    /// The cells of four coordinates, as Find tells each.
    __m128i Find4(__m128 v) const {
        const __m128 scaled = _mm_mul_ps(_mm_sub_ps(v, _mm_set1_ps(mfLow)), _mm_set1_ps(mfScale));
        // The second one stands where the first is a NaN.
        const __m128 risen = _mm_max_ps(scaled, _mm_setzero_ps());
        return _mm_cvttps_epi32(_mm_min_ps(risen, _mm_set1_ps(mfLast)));
    }
#endif

    /// Bounds of the positions of a cell, as far as they lie from low to high: rounding may put
    /// some of them up to 2^-22 of their distance from the axis' origin out of place.
    void GetBounds(std::uint32_t cell, double low, double high, double& from, double& to) const {
        constexpr double SLACK = 1.0 / (1 << 20);
        const double origin = static_cast<double>(mfLow);
        const double width = 1.0 / static_cast<double>(mfScale);
        from = low;
        to = high;
        if (cell > 0)
            from = std::max(low, origin + cell * width * (1.0 - SLACK));
        if (cell + 1 < mnCount)
            to = std::min(high, origin + (cell + 1) * width * (1.0 + SLACK));
    }

  private:
    float mfLow = 0.0F;
    float mfScale = 0.0F;
    float mfLast = 0.0F;
    std::uint32_t mnCount = 1;
};

/// First and last cell on both axes.
struct CellRange {
    std::uint32_t firstCol;
    std::uint32_t lastCol;
    std::uint32_t firstRow;
    std::uint32_t lastRow;

    std::uint64_t GetCount() const {
        return (std::uint64_t{lastCol} - firstCol + 1) * (std::uint64_t{lastRow} - firstRow + 1);
    }
};

/// A grid of cells over the plan. Cells count by row, then column.
struct CellFrame {
    CellAxis cols;
    CellAxis rows;

    std::size_t GetCount() const { return std::size_t{cols.GetCount()} * rows.GetCount(); }
    std::size_t GetNumber(std::uint32_t col, std::uint32_t row) const {
        return std::size_t{row} * cols.GetCount() + col;
    }
    std::size_t Find(float x, float y) const { return GetNumber(cols.Find(x), rows.Find(y)); }
    /// Every position that the box holds has its cell in this range.
    CellRange Find(const BBox<float, point2_t<float>>& box) const {
        return {cols.Find(box.min.x), cols.Find(box.max.x), rows.Find(box.min.y),
                rows.Find(box.max.y)};
    }
};

} // namespace kelm::tin::index

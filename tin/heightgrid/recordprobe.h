#pragma once

#include "tin/heightgrid/record.h"
#include "tin/rules/barycentric.h"
#include "tin/rules/exactplan.h"
#include "tin/rules/highest.h"

#include <algorithm>
#include <cstdint>

#ifdef __SSE2__
#include <emmintrin.h>
#endif

namespace kelm::tin::heightgrid {

/// A position that is put to the triangles of lists.
class RecordProbe {
  public:
    RecordProbe(float x, float y) : mfX(x), mfY(y) {}

    /// Adds the heights of the triangles of a list that hold the position, in the list's order.
    void Ask(const Record& record, rules::Highest& highest) const {
        std::uint64_t left = FindCandidates(record);
        for (; left != 0; left &= left - 1)
            AskTriangle(record, static_cast<unsigned>(__builtin_ctzll(left)), highest);
    }
    /// The same by the closed rule.
    void AskClosed(const Record& record, rules::Highest& highest) const {
        for (unsigned i = 0; i < record.nTriangles; ++i) {
            const Corners corners(record, i);
            float h;
            if (IsInBox(corners) &&
                rules::GetClosedHeight(corners.v0, corners.v1, corners.v2, {mfX, mfY}, h))
                highest.Add(h);
        }
    }

  private:
    struct Corners {
        Corners(const Record& record, unsigned triangle)
            : v0(record.GetVertex(triangle, 0)), v1(record.GetVertex(triangle, 1)),
              v2(record.GetVertex(triangle, 2)) {}
        point3_t<float> v0;
        point3_t<float> v1;
        point3_t<float> v2;
    };

    /// A box is the least and the greatest coordinate of the vertices, none of which is a NaN.
    bool IsInBox(const Corners& c) const {
        return mfX >= std::min({c.v0.x, c.v1.x, c.v2.x}) &&
               std::max({c.v0.x, c.v1.x, c.v2.x}) >= mfX &&
               mfY >= std::min({c.v0.y, c.v1.y, c.v2.y}) &&
               std::max({c.v0.y, c.v1.y, c.v2.y}) >= mfY;
    }

    void AskTriangle(const Record& record, unsigned triangle, rules::Highest& highest) const {
        const Corners corners(record, triangle);
        rules::Barycentric barycentric(corners.v0, corners.v1, corners.v2);
        if (!IsInBox(corners) || barycentric.IsFlat())
            return;
        barycentric.SetRow(mfY);
        double l0;
        double l1;
        double l2;
        if (barycentric.GetWeights(mfX, l0, l1, l2))
            highest.Add(
                rules::GetWeightedHeight(corners.v0.z, corners.v1.z, corners.v2.z, l0, l1, l2));
    }

#ifdef __SSE2__
    /// One bit a triangle. Left out are those that the inside rule certainly refuses: the
    /// numerators of its weights, which are computed here as there, to the bit, are compared with
    /// the determinant instead of divided by it.
    std::uint64_t FindCandidates(const Record& record) const {
        const __m128 x = _mm_set1_ps(mfX);
        const __m128 y = _mm_set1_ps(mfY);
        std::uint64_t found = 0;
        const unsigned groups = record.GetGroupCount();
        for (unsigned i = 0; i < groups; ++i)
            found |= static_cast<std::uint64_t>(TestGroup(record, i, x, y)) << (4 * i);
        const unsigned unused = 64U - record.nTriangles;
        return unused < 64U ? found << unused >> unused : 0;
    }

    struct Plan {
        __m128 x;
        __m128 y;
    };
    static __m128 LoadPair(const Record& record, std::uint8_t a, std::uint8_t b) {
        const auto* first = reinterpret_cast<const __m64*>(record.GetValues(a));
        const auto* second = reinterpret_cast<const __m64*>(record.GetValues(b));
        return _mm_loadh_pi(_mm_loadl_pi(_mm_setzero_ps(), first), second);
    }
    static Plan Load(const Record& record, unsigned group, unsigned corner) {
        const std::uint8_t* places = record.GetPlaces(group, corner);
        const __m128 low = LoadPair(record, places[0], places[1]);
        const __m128 high = LoadPair(record, places[2], places[3]);
        return {_mm_shuffle_ps(low, high, _MM_SHUFFLE(2, 0, 2, 0)),
                _mm_shuffle_ps(low, high, _MM_SHUFFLE(3, 1, 3, 1))};
    }
    static unsigned TestGroup(const Record& record, unsigned group, __m128 x, __m128 y) {
        const Plan v0 = Load(record, group, 0);
        const Plan v1 = Load(record, group, 1);
        const Plan v2 = Load(record, group, 2);
        const __m128 x02 = _mm_sub_ps(v0.x, v2.x);
        const __m128 y02 = _mm_sub_ps(v0.y, v2.y);
        const __m128 x12 = _mm_sub_ps(v1.x, v2.x);
        const __m128 y12 = _mm_sub_ps(v1.y, v2.y);
        const __m128 px = _mm_sub_ps(x, v2.x);
        const __m128 py = _mm_sub_ps(y, v2.y);
        const __m128 det = _mm_sub_ps(_mm_mul_ps(x02, y12), _mm_mul_ps(x12, y02));
        const __m128 n0 = _mm_sub_ps(_mm_mul_ps(px, y12), _mm_mul_ps(x12, py));
        const __m128 n1 = _mm_sub_ps(_mm_mul_ps(py, x02), _mm_mul_ps(y02, px));
        return TestWeights(det, n0, n1);
    }
    /// A NaN fails each comparison and so stays.
    static unsigned TestWeights(__m128 det, __m128 n0, __m128 n1) {
        const __m128 sign = _mm_and_ps(det, _mm_set1_ps(-0.0F));
        const __m128 size = _mm_xor_ps(det, sign);
        const __m128 w0 = _mm_xor_ps(n0, sign);
        const __m128 w1 = _mm_xor_ps(n1, sign);
        const __m128 most = _mm_mul_ps(size, _mm_set1_ps(1.0F + 0x1p-20F));
        const __m128 refused = _mm_or_ps(
            _mm_or_ps(_mm_cmplt_ps(w0, _mm_setzero_ps()), _mm_cmplt_ps(w1, _mm_setzero_ps())),
            _mm_cmpgt_ps(_mm_add_ps(w0, w1), most));
        return static_cast<unsigned>(_mm_movemask_ps(refused)) ^ 0xFU;
    }
#else
    std::uint64_t FindCandidates(const Record& record) const {
        return record.nTriangles == 0 ? 0 : ~std::uint64_t{0} >> (64U - record.nTriangles);
    }
#endif

    float mfX;
    float mfY;
};

} // namespace kelm::tin::heightgrid

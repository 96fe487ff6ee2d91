#include "tin/heightgrid/batch/runprobe.h"

#ifdef __SSE2__

#include "tin/rules/barycentric.h"

#include <algorithm>
#include <cstring>

namespace kelm::tin::heightgrid {

namespace {

__m128 Select(__m128 mask, __m128 a, __m128 b) {
    return _mm_or_ps(_mm_and_ps(mask, a), _mm_andnot_ps(mask, b));
}

__m128d WidenLow(__m128 v) {
    return _mm_cvtps_pd(v);
}
__m128d WidenHigh(__m128 v) {
    return _mm_cvtps_pd(_mm_movehl_ps(v, v));
}

__m128 SpreadLeast(__m128 v) {
    const __m128 pairs = _mm_min_ps(v, _mm_shuffle_ps(v, v, _MM_SHUFFLE(1, 0, 3, 2)));
    return _mm_min_ps(pairs, _mm_shuffle_ps(pairs, pairs, _MM_SHUFFLE(2, 3, 0, 1)));
}
__m128 SpreadMost(__m128 v) {
    const __m128 pairs = _mm_max_ps(v, _mm_shuffle_ps(v, v, _MM_SHUFFLE(1, 0, 3, 2)));
    return _mm_max_ps(pairs, _mm_shuffle_ps(pairs, pairs, _MM_SHUFFLE(2, 3, 0, 1)));
}

/// Two heights, and a mask of those inside.
struct Heights2 {
    __m128d h;
    __m128d isInside;
};

/// The inside rule and the height rule. A weight that is NaN passes the former, but its height is
/// NaN too and counts for nothing, so that here it may do either.
Heights2 GetHeights2(__m128d w0, __m128d w1, __m128d det, __m128d z0, __m128d z1, __m128d z2) {
    const __m128d one = _mm_set1_pd(1.0);
    const __m128d l0 = _mm_div_pd(w0, det);
    const __m128d l1 = _mm_div_pd(w1, det);
    const __m128d l2 = _mm_sub_pd(_mm_sub_pd(one, l0), l1);
    const __m128d most = _mm_max_pd(_mm_max_pd(l0, l1), l2);
    const __m128d least = _mm_min_pd(_mm_min_pd(l0, l1), l2);
    const __m128d sum = _mm_add_pd(_mm_mul_pd(z1, l1), _mm_mul_pd(z0, l0));
    return {_mm_add_pd(sum, _mm_mul_pd(z2, l2)),
            _mm_and_pd(_mm_cmple_pd(most, one), _mm_cmpge_pd(least, _mm_setzero_pd()))};
}

/// The range of a coefficient times a difference.
struct Products {
    Products(__m128 low, __m128 high, __m128 factor) {
        const __m128 a = _mm_mul_ps(low, factor);
        const __m128 b = _mm_mul_ps(high, factor);
        least = _mm_min_ps(a, b);
        most = _mm_max_ps(a, b);
    }
    __m128 least;
    __m128 most;
};

} // namespace

RunProbe::RunProbe(const Run& run) : moRun(run) {
    __m128 xLow = _mm_loadu_ps(run.pfX);
    __m128 yLow = _mm_loadu_ps(run.pfY);
    __m128 xHigh = xLow;
    __m128 yHigh = yLow;
    for (std::size_t i = LANES; i < run.nCount; i += LANES) {
        // The last ones overlap those before them.
        const std::size_t first = std::min(i, run.nCount - LANES);
        const __m128 x = _mm_loadu_ps(run.pfX + first);
        const __m128 y = _mm_loadu_ps(run.pfY + first);
        xLow = _mm_min_ps(xLow, x);
        yLow = _mm_min_ps(yLow, y);
        xHigh = _mm_max_ps(xHigh, x);
        yHigh = _mm_max_ps(yHigh, y);
    }
    moBounds = {SpreadLeast(xLow), SpreadLeast(yLow), SpreadMost(xHigh), SpreadMost(yHigh)};
}

void RunProbe::Ask(const Record& record, float* heights) {
    mnCandidates = 0;
    const unsigned groups = record.GetGroupCount();
    for (unsigned i = 0; i < groups; ++i)
        AddGroup(record, i);
    if (mnCandidates == 0)
        return;
    for (std::size_t i = 0; i < moRun.nCount; i += LANES) {
        const __m128 x = _mm_loadu_ps(moRun.pfX + i);
        const __m128 y = _mm_loadu_ps(moRun.pfY + i);
        _mm_storeu_ps(heights + i, AskFour(x, y, _mm_loadu_ps(heights + i)));
    }
}

void RunProbe::AddGroup(const Record& record, unsigned group) {
    const Corners4 corners(record, group);
    const Edges4 edges = MakeEdges(corners);
    const Box4 box = MakeBoxes(corners);
    unsigned left = TestGroup(edges, box);
    for (; left != 0; left &= left - 1)
        AddCandidate(record, 4 * group + static_cast<unsigned>(__builtin_ctz(left)), edges, box);
}

/// One bit a triangle. Left out are those that certainly hold no position of the run, and what
/// fills up a group, which is flat.
///
/// Rounding keeps the order of what it rounds: over a part of the plan a numerator lies between
/// those computed from the ranges of its terms. The part here is what the bounds and the triangle's
/// box share, so that its differences are finite.
unsigned RunProbe::TestGroup(const Edges4& edges, const Box4& box) const {
    const __m128 xLow = _mm_max_ps(box.xLow, moBounds.xLow);
    const __m128 yLow = _mm_max_ps(box.yLow, moBounds.yLow);
    const __m128 xHigh = _mm_min_ps(box.xHigh, moBounds.xHigh);
    const __m128 yHigh = _mm_min_ps(box.yHigh, moBounds.yHigh);
    const __m128 apart = _mm_or_ps(_mm_cmpgt_ps(xLow, xHigh), _mm_cmpgt_ps(yLow, yHigh));
    const __m128 fromX = _mm_sub_ps(xLow, edges.x2);
    const __m128 fromY = _mm_sub_ps(yLow, edges.y2);
    const __m128 toX = _mm_sub_ps(xHigh, edges.x2);
    const __m128 toY = _mm_sub_ps(yHigh, edges.y2);
    const Products a0(fromX, toX, _mm_xor_ps(edges.a0, edges.sign));
    const Products b0(fromY, toY, _mm_xor_ps(edges.b0, edges.sign));
    const Products a1(fromX, toX, _mm_xor_ps(edges.a1, edges.sign));
    const Products b1(fromY, toY, _mm_xor_ps(edges.b1, edges.sign));
    const __m128 most0 = _mm_add_ps(a0.most, b0.most);
    const __m128 most1 = _mm_add_ps(a1.most, b1.most);
    const __m128 sum = _mm_add_ps(_mm_add_ps(a0.least, b0.least), _mm_add_ps(a1.least, b1.least));
    const __m128 beyond = _mm_or_ps(
        _mm_or_ps(_mm_cmplt_ps(most0, _mm_setzero_ps()), _mm_cmplt_ps(most1, _mm_setzero_ps())),
        _mm_cmpgt_ps(sum, GetMostOfSum(edges.size)));
    return static_cast<unsigned>(
               _mm_movemask_ps(_mm_or_ps(_mm_or_ps(apart, beyond), edges.IsFlat()))) ^
           0xFU;
}

void RunProbe::AddCandidate(const Record& record, unsigned triangle, const Edges4& edges,
                            const Box4& box) {
    const unsigned lane = triangle % 4;
    Candidate& rCandidate = maoCandidates[mnCandidates];
    const auto get = [lane](const __m128& v) { return reinterpret_cast<const float*>(&v)[lane]; };
    const auto fill = [&](const __m128& v) { return _mm_set1_ps(get(v)); };
    rCandidate.oEdges = {fill(edges.x2), fill(edges.y2), fill(edges.a0),   fill(edges.b0),
                         fill(edges.a1), fill(edges.b1), fill(edges.sign), fill(edges.size)};
    rCandidate.most = GetMostOfSum(rCandidate.oEdges.size);
    rCandidate.number = _mm_castsi128_ps(_mm_set1_epi32(static_cast<int>(mnCandidates)));
    for (unsigned corner = 0; corner < 3; ++corner)
        rCandidate.fHeights[corner] =
            record.GetValues(record.GetPlaces(triangle / 4, corner)[lane])[2];
    rCandidate.fHeights[3] = get(edges.size);
    rCandidate.fBox[0] = get(box.xLow);
    rCandidate.fBox[1] = get(box.yLow);
    rCandidate.fBox[2] = get(box.xHigh);
    rCandidate.fBox[3] = get(box.yHigh);
    ++mnCandidates;
}

inline RunProbe::Chosen RunProbe::Choose(const Weights4& weights, __m128 numbers,
                                         __m128 isHit) const {
    alignas(16) int each[4];
    _mm_store_si128(reinterpret_cast<__m128i*>(each), _mm_castps_si128(numbers));
    const auto heights = [&](int lane) { return _mm_load_ps(maoCandidates[each[lane]].fHeights); };
    const auto box = [&](int lane) { return _mm_load_ps(maoCandidates[each[lane]].fBox); };
    Chosen chosen{weights,    heights(0), heights(1),
                  heights(2), heights(3), {box(0), box(1), box(2), box(3)},
                  isHit};
    _MM_TRANSPOSE4_PS(chosen.z0, chosen.z1, chosen.z2, chosen.size);
    _MM_TRANSPOSE4_PS(chosen.oBox.xLow, chosen.oBox.yLow, chosen.oBox.xHigh, chosen.oBox.yHigh);
    return chosen;
}

inline __m128 RunProbe::GetHeights(const Chosen& chosen, __m128 x, __m128 y, __m128 highest) {
    const auto get = [&](const auto& widen) {
        return GetHeights2(widen(chosen.oWeights.w0), widen(chosen.oWeights.w1), widen(chosen.size),
                           widen(chosen.z0), widen(chosen.z1), widen(chosen.z2));
    };
    const Heights2 low = get(WidenLow);
    const Heights2 high = get(WidenHigh);
    const __m128 h = _mm_movelh_ps(_mm_cvtpd_ps(low.h), _mm_cvtpd_ps(high.h));
    const __m128 isInside = _mm_shuffle_ps(_mm_castpd_ps(low.isInside),
                                           _mm_castpd_ps(high.isInside), _MM_SHUFFLE(2, 0, 2, 0));
    const __m128 isHigher =
        _mm_and_ps(_mm_and_ps(chosen.isHit, isInside),
                   _mm_and_ps(chosen.oBox.Holds(x, y), _mm_cmpgt_ps(h, highest)));
    return Select(isHigher, h, highest);
}

/// Most positions are held by at most one candidate. Only then are the weights divided out.
__m128 RunProbe::AskFour(__m128 x, __m128 y, __m128 highest) const {
    __m128 numbers = _mm_setzero_ps();
    __m128 seen = _mm_setzero_ps();
    __m128 again = _mm_setzero_ps();
    Weights4 weights{_mm_setzero_ps(), _mm_setzero_ps()};
    for (std::size_t i = 0; i < mnCandidates; ++i) {
        const Candidate& candidate = maoCandidates[i];
        const Weights4 own = candidate.oEdges.Weigh(x, y);
        const __m128 isHit = TestWeights(own, candidate.most);
        again = _mm_or_ps(again, _mm_and_ps(isHit, seen));
        seen = _mm_or_ps(seen, isHit);
        numbers = _mm_or_ps(numbers, _mm_and_ps(isHit, candidate.number));
        weights.w0 = _mm_or_ps(weights.w0, _mm_and_ps(isHit, own.w0));
        weights.w1 = _mm_or_ps(weights.w1, _mm_and_ps(isHit, own.w1));
    }
    if (_mm_movemask_ps(again) != 0)
        return AskEach(x, y, highest);
    return GetHeights(Choose(weights, numbers, seen), x, y, highest);
}

/// Where several triangles may hold a position, one after the other.
__m128 RunProbe::AskEach(__m128 x, __m128 y, __m128 highest) const {
    for (std::size_t i = 0; i < mnCandidates; ++i) {
        const Candidate& candidate = maoCandidates[i];
        const Weights4 own = candidate.oEdges.Weigh(x, y);
        const __m128 isHit = TestWeights(own, candidate.most);
        if (_mm_movemask_ps(isHit) != 0)
            highest = GetHeights(Choose(own, candidate.number, isHit), x, y, highest);
    }
    return highest;
}

} // namespace kelm::tin::heightgrid

#endif

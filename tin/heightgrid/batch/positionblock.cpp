#include "tin/heightgrid/batch/positionblock.h"

#include "tin/rules/frame.h"

#include <algorithm>
#include <limits>

namespace kelm::tin::heightgrid {

namespace {

constexpr float LOWEST = -std::numeric_limits<float>::max();

#ifdef __SSE2__

/// Writes the numbers of four cells, or all bits set for those that are not inside.
void StoreCells(std::uint64_t* cells, __m128i cols, __m128i rows, std::uint32_t colCount,
                __m128 isInside) {
    const __m128i count = _mm_set1_epi32(static_cast<int>(colCount));
    const __m128i even =
        _mm_add_epi64(_mm_mul_epu32(rows, count), _mm_and_si128(cols, _mm_set_epi32(0, -1, 0, -1)));
    const __m128i odd =
        _mm_add_epi64(_mm_mul_epu32(_mm_srli_epi64(rows, 32), count), _mm_srli_epi64(cols, 32));
    const __m128i outside = _mm_xor_si128(_mm_castps_si128(isInside), _mm_set1_epi32(-1));
    auto* out = reinterpret_cast<__m128i*>(cells);
    _mm_storeu_si128(
        out, _mm_or_si128(_mm_unpacklo_epi64(even, odd), _mm_unpacklo_epi32(outside, outside)));
    _mm_storeu_si128(
        out + 1, _mm_or_si128(_mm_unpackhi_epi64(even, odd), _mm_unpackhi_epi32(outside, outside)));
}

#endif

} // namespace

void PositionBlock::Take(const point2_t<double>* positions, std::size_t count) {
    std::size_t i = 0;
    for (; i + 4 <= count; i += 4)
        TakeFour(positions + i, i);
    if (i < count) {
        point2_t<double> last[4];
        std::fill(std::copy(positions + i, positions + count, last), last + 4, positions[i]);
        TakeFour(last, i);
    }
    CutRuns(count);
}

#ifdef __SSE2__

void PositionBlock::TakeFour(const point2_t<double>* positions, std::size_t place) {
    const __m128d base = _mm_loadu_pd(&moGround.dfXBase);
    const auto narrow = [&](std::size_t i) {
        return _mm_cvtpd_ps(_mm_sub_pd(_mm_loadu_pd(&positions[i].x), base));
    };
    const __m128 low = _mm_movelh_ps(narrow(0), narrow(1));
    const __m128 high = _mm_movelh_ps(narrow(2), narrow(3));
    const __m128 x = _mm_shuffle_ps(low, high, _MM_SHUFFLE(2, 0, 2, 0));
    const __m128 y = _mm_shuffle_ps(low, high, _MM_SHUFFLE(3, 1, 3, 1));
    const BBox<float, point2_t<float>>& box = moGround.oBox;
    const __m128 isInside = _mm_and_ps(_mm_and_ps(_mm_cmpge_ps(x, _mm_set1_ps(box.min.x)),
                                                  _mm_cmple_ps(x, _mm_set1_ps(box.max.x))),
                                       _mm_and_ps(_mm_cmpge_ps(y, _mm_set1_ps(box.min.y)),
                                                  _mm_cmple_ps(y, _mm_set1_ps(box.max.y))));
    _mm_storeu_ps(&mafX[place], x);
    _mm_storeu_ps(&mafY[place], y);
    StoreCells(&manCells[place], moGround.oCells.cols.Find4(x), moGround.oCells.rows.Find4(y),
               moGround.oCells.cols.GetCount(), isInside);
}

#else

void PositionBlock::TakeFour(const point2_t<double>* positions, std::size_t place) {
    for (std::size_t i = 0; i < 4; ++i) {
        const point2_t<float> p =
            rules::Frame(moGround.dfXBase, moGround.dfYBase).ToLocal(positions[i]);
        mafX[place + i] = p.x;
        mafY[place + i] = p.y;
        manCells[place + i] =
            TestInside(moGround.oBox, p.x, p.y) ? moGround.oCells.Find(p.x, p.y) : NOWHERE;
    }
}

#endif

/// Without a branch: where a run ends is hard to foresee.
void PositionBlock::CutRuns(std::size_t count) {
    std::size_t last = 0;
    manFirsts[0] = 0;
    for (std::size_t i = 1; i < count; ++i) {
        manFirsts[last + 1] = static_cast<std::uint32_t>(i);
        last += manCells[i] != manCells[i - 1] ? 1U : 0U;
    }
    mnRuns = count == 0 ? 0 : last + 1;
    manFirsts[mnRuns] = static_cast<std::uint32_t>(count);
    mnApproached = 0;
}

/// Asks for the records of the first runs, as far as that has not been done.
inline void PositionBlock::Approach(const Cells& cells, std::size_t runs) {
    for (; mnApproached < std::min(runs, mnRuns); ++mnApproached)
        if (GetCell(mnApproached) != NOWHERE)
            cells.Approach(GetCell(mnApproached));
}

inline void PositionBlock::FindRun(const Cells& cells, std::size_t run, float* highest,
                                   EdgeRule eRule) const {
    const std::size_t first = manFirsts[run];
    const std::size_t last = manFirsts[run + 1];
    if (GetCell(run) == NOWHERE)
        std::fill(highest + first, highest + last, LOWEST);
    else
        cells.FindRun(GetCell(run), {&mafX[first], &mafY[first], last - first}, highest + first,
                      eRule);
}

std::size_t PositionBlock::Find(const Cells& cells, PositionBlock& rNext, float* heights,
                                EdgeRule eRule) {
    constexpr std::size_t AHEAD = 24;
    std::array<float, LENGTH + Run::BEYOND> highest;
    for (std::size_t i = 0; i < mnRuns; ++i) {
        const std::size_t runs = i + AHEAD + 1;
        Approach(cells, runs);
        rNext.Approach(cells, runs - std::min(runs, mnRuns));
        FindRun(cells, i, highest.data(), eRule);
    }
    std::size_t found = 0;
    for (std::size_t i = 0; i < manFirsts[mnRuns]; ++i) {
        const bool isFound = highest[i] > LOWEST;
        heights[i] = isFound ? highest[i] : std::numeric_limits<float>::quiet_NaN();
        found += isFound ? 1U : 0U;
    }
    return found;
}

} // namespace kelm::tin::heightgrid

#pragma once

#include "tin/heightgrid/batch/edges4.h"
#include "tin/heightgrid/record.h"

#include <cstddef>

namespace kelm::tin::heightgrid {

/// Positions that follow each other in one cell.
struct Run {
    /// Positions behind them that are read and not used, as lanes are filled up.
    static constexpr std::size_t BEYOND = 3;

    const float* pfX;
    const float* pfY;
    std::size_t nCount; ///< above 0
};

#ifdef __SSE2__

/// Puts four positions at a time to the triangles of a list.
///
/// What the inside rule needs of a triangle is computed once for all positions, by the same
/// operations and so to the same bits as for one position.
class RunProbe {
  public:
    static constexpr std::size_t LANES = 1 + Run::BEYOND;

    /// @param run LANES positions or more
    explicit RunProbe(const Run& run);

    /// Raises the greatest heights so far by those of the triangles that hold the positions, in the
    /// list's order.
    /// @param heights of the run's positions; Run::BEYOND more are overwritten
    void Ask(const Record& record, float* heights);

  private:
    /// A triangle that may hold a position of the run.
    struct Candidate {
        Edges4 oEdges;
        __m128 most;       ///< of the sum of the numerators
        __m128 number;     ///< of this candidate, as bits
        float fHeights[4]; ///< of the corners, and the size of the determinant
        float fBox[4];
    };
    /// Candidates of four positions, one each.
    struct Chosen {
        Weights4 oWeights;
        __m128 z0;
        __m128 z1;
        __m128 z2;
        __m128 size;
        Box4 oBox;
        __m128 isHit;
    };

    static __m128 GetHeights(const Chosen& chosen, __m128 x, __m128 y, __m128 highest);

    unsigned TestGroup(const Edges4& edges, const Box4& box) const;
    void AddGroup(const Record& record, unsigned group);
    void AddCandidate(const Record& record, unsigned triangle, const Edges4& edges,
                      const Box4& box);
    __m128 AskFour(__m128 x, __m128 y, __m128 highest) const;
    __m128 AskEach(__m128 x, __m128 y, __m128 highest) const;
    Chosen Choose(const Weights4& weights, __m128 numbers, __m128 isHit) const;

    Run moRun;
    Box4 moBounds; ///< of the positions, each value in all lanes
    std::size_t mnCandidates = 0;
    Candidate maoCandidates[Record::MOST_TRIANGLES];
};

#endif

} // namespace kelm::tin::heightgrid

#pragma once

#include "tin/bbox.h"
#include "tin/heightgrid/cells.h"

#include <array>
#include <cstddef>
#include <cstdint>

namespace kelm::tin::heightgrid {

/// What leads from a position in map coordinates to its cell.
struct Ground {
    double dfXBase;
    double dfYBase;
    BBox<float, point2_t<float>> oBox; ///< of the surface
    index::CellFrame oCells;
};

/// A part of a batch: its positions, cut into runs that share a cell.
class PositionBlock {
  public:
    static constexpr std::size_t LENGTH = 64;

    explicit PositionBlock(const Ground& ground) : moGround(ground) {}

    /// @param count up to LENGTH
    void Take(const point2_t<double>* positions, std::size_t count);
    /// Finds the heights, NaN where there is none. Asks for records well before they are read, also
    /// those of the next block.
    /// @return their number
    std::size_t Find(const Cells& cells, PositionBlock& rNext, float* heights, EdgeRule eRule);

  private:
    /// The cell of the positions outside the surface's box.
    static constexpr std::uint64_t NOWHERE = ~std::uint64_t{0};

    std::uint64_t GetCell(std::size_t run) const { return manCells[manFirsts[run]]; }
    void TakeFour(const point2_t<double>* positions, std::size_t place);
    void CutRuns(std::size_t count);
    void Approach(const Cells& cells, std::size_t runs);
    void FindRun(const Cells& cells, std::size_t run, float* highest, EdgeRule eRule) const;

    Ground moGround;
    std::array<float, LENGTH + Run::BEYOND> mafX{};
    std::array<float, LENGTH + Run::BEYOND> mafY{};
    std::array<std::uint64_t, LENGTH> manCells;
    std::array<std::uint32_t, LENGTH + 1> manFirsts; ///< of the runs, and the number of positions
    std::size_t mnRuns = 0;
    std::size_t mnApproached = 0; ///< runs whose records have been asked for
};

} // namespace kelm::tin::heightgrid

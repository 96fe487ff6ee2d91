#pragma once

#include "tin/heightgrid/celllists.h"
#include "tin/heightgrid/recordwriter.h"
#include "tin/index/lines.h"

#include <atomic>
#include <vector>

namespace kelm::tin::heightgrid {

/// @return bounds of the positions of a cell, within those of all cells
Region GetPart(const index::CellFrame& frame, std::size_t cell, const Region& region);

/// Lines that the records of a build may take beyond those at their cell's number.
class Budget {
  public:
    explicit Budget(std::size_t lines) : mnLeft(static_cast<std::int64_t>(lines)) {}

    /// @return false if that is more than what is left
    bool Take(std::size_t lines) { return (mnLeft -= static_cast<std::int64_t>(lines)) >= 0; }
    bool IsSpent() const { return mnLeft < 0; }

  private:
    std::atomic<std::int64_t> mnLeft;
};

/// Makes the records of a block of cells. Once the budget is spent they are of no use, and the rest
/// is left out.
///
/// What does not fit into a cell's own record goes to further lines of the block, which count from
/// 1 until they are moved.
class CellBlock {
  public:
    CellBlock(const Source& source, Budget& rBudget)
        : moSource(source), mrBudget(rBudget), moWriter(source.poVertices) {}

    /// @param rRecord of the cell @param region bounds of its positions
    /// @throw std::bad_alloc
    void Write(IdList ids, const Region& region, Record& rRecord);

    std::size_t CountLines() const { return moLines.size(); }
    /// Triangles of the cells that the crowd has taken, with repeats.
    const std::vector<unsigned>& GetCrowd() const { return moCrowd; }
    /// Moves the further lines behind others, and the numbers in all records of the block.
    /// @param records of the block's cells @param lines of the whole index
    void Move(Record* records, std::size_t count, index::Line* lines, std::size_t before) const;

  private:
    void WriteCell(IdList ids, const Region& region, unsigned level, std::size_t place);
    void WriteCrowd(IdList ids, std::size_t place);
    void WriteList(IdList ids, std::size_t place);
    bool IsDivided(IdList ids, const index::CellFrame& frame) const;
    void WriteFrame(IdList ids, const index::CellFrame& frame, const Region& region, unsigned level,
                    std::size_t place);
    bool TakeLines(std::size_t count, std::size_t place);
    Record& GetRecord(std::size_t place);

    Source moSource;
    Budget& mrBudget;
    RecordWriter moWriter;
    Record* mpoOwn = nullptr;         ///< the record of the cell at work, which is at place 0
    std::vector<index::Line> moLines; ///< place 1 is the first
    std::vector<unsigned> moCrowd;
};

} // namespace kelm::tin::heightgrid

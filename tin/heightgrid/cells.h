#pragma once

#include "tin/buildoptions.h"
#include "tin/heightgrid/batch/runprobe.h"
#include "tin/heightgrid/celllists.h"
#include "tin/heightgrid/crowd.h"
#include "tin/heightgrid/recordprobe.h"
#include "tin/index/lines.h"
#include "tin/index/prefetch.h"

namespace kelm::tin::heightgrid {

class CellBlock;

/// The cells of an index and all that their records lead to.
class Cells {
  public:
    /// Default of BuildOptions::bytesPerTriangle.
    static constexpr unsigned BYTES_A_TRIANGLE = 110;

    /// @throw std::bad_alloc, and what the progress function throws
    Cells(const Tin& tin, const BuildOptions& options);

    /// Finds the record for a position and asks for its memory.
    const Record& Approach(float x, float y) const {
        const Record& record = Record::At(moCells.Get() + moFrame.Find(x, y) * Record::LINES);
        for (std::size_t line = 0; line < Record::LINES; ++line)
            index::Prefetch(reinterpret_cast<const index::Line*>(&record) + line);
        return record;
    }
    const index::CellFrame& GetFrame() const { return moFrame; }
    /// Asks for the memory of a cell's record.
    void Approach(std::size_t cell) const {
        const index::Line* lines = moCells.Get() + cell * Record::LINES;
        for (std::size_t line = 0; line < Record::LINES; ++line)
            index::Prefetch(lines + line);
    }
    /// The greatest heights at positions of a cell, as Highest tells them.
    /// @param heights of the run's positions; Run::BEYOND more are overwritten
    void FindRun(std::size_t cell, const Run& run, float* heights, EdgeRule eRule) const {
        FindRun(Record::At(moCells.Get() + cell * Record::LINES), run, heights, eRule);
    }
    /// The greatest height at the position of which the record was found.
    rules::Highest Find(const Record& record, float x, float y, EdgeRule eRule) const;

    std::uint64_t GetBytes() const {
        return sizeof *this + moCells.GetBytes() + moLines.GetBytes() + moCrowd.GetBytes();
    }

  private:
    /// Positions of a run from which on lanes are quicker.
    static constexpr std::size_t LONG_RUN = 4;

    struct Attempt;

    void FindRun(const Record& record, const Run& run, float* heights, EdgeRule eRule) const;
    void FindLongRun(const Record& record, const Run& run, float* heights, EdgeRule eRule) const;
    void DivideRun(const Record& record, const Run& run, float* heights, EdgeRule eRule) const;
    template <typename Ask>
    void ForEachOfList(const Record& list, const Ask& ask) const;
    /// The greatest height by the closed rule alone.
    rules::Highest FindClosed(const Record& list, const RecordProbe& probe) const;
    rules::Highest FindFurther(const Record& record, float x, float y, EdgeRule eRule) const;
    void LeaveToCrowd(const Tin& tin, Attempt& rAttempt);
    bool Build(const Tin& tin, const BuildOptions& options, Attempt& rAttempt);
    void WriteBlocks(const Attempt& attempt, CellLists& rLists, std::vector<CellBlock>& rBlocks);
    void Join(const Tin& tin, const Attempt& attempt, const std::vector<CellBlock>& blocks,
              const std::vector<unsigned>& crowd);

    index::CellFrame moFrame;
    index::Lines moCells; ///< a record at the number of each cell
    index::Lines moLines; ///< what did not fit into these; the first stays free
    Crowd moCrowd;
};

inline rules::Highest Cells::Find(const Record& record, float x, float y, EdgeRule eRule) const {
    if (record.eKind != KIND_LIST || record.nNext != 0)
        return FindFurther(record, x, y, eRule);
    const RecordProbe probe(x, y);
    rules::Highest highest;
    probe.Ask(record, highest);
    if (eRule == ER_Closed && !highest.IsFound())
        probe.AskClosed(record, highest);
    return highest;
}

inline void Cells::FindRun(const Record& record, const Run& run, float* heights,
                           EdgeRule eRule) const {
#ifdef __SSE2__
    if (run.nCount >= LONG_RUN && record.eKind != KIND_CROWD)
        return FindLongRun(record, run, heights, eRule);
#endif
    for (std::size_t i = 0; i < run.nCount; ++i)
        heights[i] = Find(record, run.pfX[i], run.pfY[i], eRule).Get();
}

} // namespace kelm::tin::heightgrid

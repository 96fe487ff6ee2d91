#include "tin/heightgrid/cells.h"

#include "tin/heightgrid/cellblock.h"
#include "tin/parallel/parallelbatch.h"

#include <algorithm>
#include <iterator>
#include <limits>

namespace kelm::tin::heightgrid {

namespace {

constexpr double INFINITE = std::numeric_limits<double>::infinity();
constexpr Region EVERYWHERE{-INFINITE, INFINITE, -INFINITE, INFINITE};

/// Triangles that a cell is made for. Where they crowd, fewer and larger cells leave more memory to
/// the grids of their own.
constexpr unsigned TRIANGLES_A_CELL[] = {4, 16, 64};
/// Most cells of all boxes together, a triangle.
constexpr std::uint64_t MOST_ENTRIES = 16;
/// Share of the memory that the cells' own records may take.
constexpr double SHARE_OF_CELLS = 0.75;
/// Memory that a small surface may take beyond its share.
constexpr std::uint64_t LEAST_BYTES = 16384;

std::size_t GetBlockLength(std::size_t cells) {
    return std::max<std::size_t>(512, cells / 4096);
}

std::size_t CountSteps(std::size_t cells) {
    return (cells - 1) / GetBlockLength(cells) + 1;
}

std::vector<unsigned> JoinCrowds(const std::vector<CellBlock>& blocks) {
    std::vector<unsigned> ids;
    for (const CellBlock& block : blocks)
        ids.insert(ids.end(), block.GetCrowd().begin(), block.GetCrowd().end());
    std::sort(ids.begin(), ids.end());
    ids.erase(std::unique(ids.begin(), ids.end()), ids.end());
    return ids;
}

} // namespace

/// What the attempts to build share.
struct Cells::Attempt {
    Source oSource;
    const Survey& oSurvey;
    std::uint64_t nBytes;
    int nThreads;
    index::Meter& rMeter;
    index::CellFrame oFrame;

    IdList GetIds() const {
        return {oSurvey.oIds.data(), oSurvey.oIds.data() + oSurvey.oIds.size()};
    }
    /// Cells that are not too many for the memory, nor for boxes that span many of them.
    void ChooseFrame(unsigned trianglesACell) {
        const double most = SHARE_OF_CELLS * static_cast<double>(nBytes) / Record::BYTES;
        double wanted = static_cast<double>(GetIds().GetCount()) / trianglesACell;
        for (wanted = std::min(wanted, most);; wanted /= 4.0) {
            oFrame = oSurvey.oSizes.ChooseFrame(wanted);
            if (oFrame.GetCount() == 1 || CountCells(oSource, GetIds(), oFrame, nThreads) <=
                                              MOST_ENTRIES * GetIds().GetCount())
                return;
        }
    }
};

Cells::Cells(const Tin& tin, const BuildOptions& options) {
    const std::size_t count = tin.GetTriangleCount();
    index::Meter meter(options.progress, "Building a HeightGrid",
                       Survey::CountSteps(tin.GetTriangleCount()) +
                           CountSteps(count / TRIANGLES_A_CELL[0] + 1));
    const Survey survey(tin, options.threads, meter);
    const unsigned perTriangle =
        options.bytesPerTriangle == 0 ? BYTES_A_TRIANGLE : options.bytesPerTriangle;
    Attempt attempt{{tin.GetTriangle(0), tin.GetVertex(0), survey.oHoldings.data()},
                    survey,
                    std::uint64_t{perTriangle} * count + LEAST_BYTES,
                    options.threads,
                    meter,
                    {}};
    const auto build = [&](unsigned trianglesACell) {
        attempt.ChooseFrame(trianglesACell);
        return Build(tin, options, attempt);
    };
    if (!std::any_of(std::begin(TRIANGLES_A_CELL), std::end(TRIANGLES_A_CELL), build))
        LeaveToCrowd(tin, attempt);
    meter.Finish();
}

void Cells::LeaveToCrowd(const Tin& tin, Attempt& rAttempt) {
    rAttempt.oFrame = {};
    moCells = index::Lines(Record::LINES);
    std::memset(moCells.Get(), 0, Record::BYTES);
    Record::At(moCells.Get()).eKind = KIND_CROWD;
    Join(tin, rAttempt, {}, rAttempt.oSurvey.oIds);
}

/// @return false if the memory does not suffice
bool Cells::Build(const Tin& tin, const BuildOptions& options, Attempt& rAttempt) {
    const std::size_t cells = rAttempt.oFrame.GetCount();
    const std::uint64_t bytes = std::uint64_t{cells} * Record::BYTES;
    if (bytes > rAttempt.nBytes)
        return false;
    Budget budget((rAttempt.nBytes - bytes) / sizeof(index::Line));
    moCells = index::Lines(cells * Record::LINES);
    std::vector<CellBlock> blocks(CountSteps(cells), CellBlock(rAttempt.oSource, budget));
    {
        CellLists lists(rAttempt.oSource, rAttempt.GetIds(), rAttempt.oFrame, EVERYWHERE,
                        options.threads);
        WriteBlocks(rAttempt, lists, blocks);
    }
    if (budget.IsSpent())
        return false;
    const std::vector<unsigned> crowd = JoinCrowds(blocks);
    if (!crowd.empty() && !budget.Take(Crowd::EstimateBytes(crowd.size()) / sizeof(index::Line)))
        return false;
    Join(tin, rAttempt, blocks, crowd);
    return true;
}

void Cells::WriteBlocks(const Attempt& attempt, CellLists& rLists,
                        std::vector<CellBlock>& rBlocks) {
    const std::size_t cells = attempt.oFrame.GetCount();
    const std::size_t length = GetBlockLength(cells);
    const auto write = [&](std::size_t block) {
        const std::size_t last = std::min(cells, (block + 1) * length);
        for (std::size_t cell = block * length; cell < last; ++cell)
            rBlocks[block].Write(rLists.Get(cell), GetPart(attempt.oFrame, cell, EVERYWHERE),
                                 Record::At(moCells.Get() + cell * Record::LINES));
        attempt.rMeter.Count();
    };
    parallel::ParallelBatch(rBlocks.size(), 1, attempt.nThreads,
                            [&](std::size_t first, std::size_t last) {
                                for (; first < last; ++first)
                                    write(first);
                            });
}

/// Lays the further lines of the blocks one behind the other.
void Cells::Join(const Tin& tin, const Attempt& attempt, const std::vector<CellBlock>& blocks,
                 const std::vector<unsigned>& crowd) {
    moFrame = attempt.oFrame;
    const std::size_t cells = moFrame.GetCount();
    const std::size_t length = GetBlockLength(cells);
    std::vector<std::size_t> before{0};
    for (const CellBlock& block : blocks)
        before.push_back(before.back() + block.CountLines());
    moLines = index::Lines(before.back() + 1);
    const auto move = [&](std::size_t first, std::size_t last) {
        for (; first < last; ++first)
            blocks[first].Move(&Record::At(moCells.Get() + first * length * Record::LINES),
                               std::min(length, cells - first * length), moLines.Get(),
                               before[first]);
    };
    parallel::ParallelBatch(blocks.size(), 16, attempt.nThreads, move);
    moCrowd = Crowd(tin, crowd);
}

#ifdef __SSE2__
void Cells::FindLongRun(const Record& record, const Run& run, float* heights,
                        EdgeRule eRule) const {
    if (record.eKind == KIND_FRAME)
        return DivideRun(record, run, heights, eRule);
    const float none = rules::Highest().Get();
    std::fill(heights, heights + run.nCount + Run::BEYOND, none);
    RunProbe probe(run);
    ForEachOfList(record, [&](const Record& list) { probe.Ask(list, heights); });
    if (eRule == ER_Float || std::find(heights, heights + run.nCount, none) == heights + run.nCount)
        return;
    for (std::size_t i = 0; i < run.nCount; ++i)
        if (heights[i] == none)
            heights[i] = FindClosed(record, {run.pfX[i], run.pfY[i]}).Get();
}

/// Runs of the cells of a cell.
void Cells::DivideRun(const Record& record, const Run& run, float* heights, EdgeRule eRule) const {
    const index::CellFrame frame = record.GetFrame();
    std::size_t first = 0;
    std::size_t cell = frame.Find(run.pfX[0], run.pfY[0]);
    while (first < run.nCount) {
        const std::size_t own = cell;
        std::size_t last = first + 1;
        while (last < run.nCount && (cell = frame.Find(run.pfX[last], run.pfY[last])) == own)
            ++last;
        FindRun(Record::At(moLines.Get() + record.nNext + own * Record::LINES),
                {run.pfX + first, run.pfY + first, last - first}, heights + first, eRule);
        first = last;
    }
}
#endif

rules::Highest Cells::FindFurther(const Record& record, float x, float y, EdgeRule eRule) const {
    const Record* found = &record;
    while (found->eKind == KIND_FRAME)
        found = &Record::At(moLines.Get() + found->nNext +
                            found->GetFrame().Find(x, y) * Record::LINES);
    rules::Highest highest;
    if (found->eKind == KIND_CROWD) {
        highest = moCrowd.Find(x, y, ER_Float);
        return eRule == ER_Float || highest.IsFound() ? highest : moCrowd.Find(x, y, eRule);
    }
    const RecordProbe probe(x, y);
    ForEachOfList(*found, [&](const Record& list) { probe.Ask(list, highest); });
    return eRule == ER_Float || highest.IsFound() ? highest : FindClosed(*found, probe);
}

rules::Highest Cells::FindClosed(const Record& list, const RecordProbe& probe) const {
    rules::Highest highest;
    ForEachOfList(list, [&](const Record& part) { probe.AskClosed(part, highest); });
    return highest;
}

template <typename Ask>
void Cells::ForEachOfList(const Record& list, const Ask& ask) const {
    const Record* next = &list;
    ask(*next);
    while (next->nNext != 0) {
        next = &Record::At(moLines.Get() + next->nNext);
        ask(*next);
    }
}

} // namespace kelm::tin::heightgrid

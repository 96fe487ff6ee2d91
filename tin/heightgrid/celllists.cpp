#include "tin/heightgrid/celllists.h"

#include "tin/heightgrid/cellclip.h"
#include "tin/parallel/parallelbatch.h"

#include <algorithm>

namespace kelm::tin::heightgrid {

namespace {

/// Triangles that are worth a thread.
constexpr std::size_t SMALLEST = 20000;
/// Fewer cells than this are not worth a look at the shape of a triangle.
constexpr std::uint64_t CLIP_FROM = 4;

/// A step that other threads see costs as much as all else here.
std::size_t Increment(std::atomic<std::size_t>& rCounter, bool isShared) {
    if (isShared)
        return rCounter.fetch_add(1, std::memory_order_relaxed);
    const std::size_t value = rCounter.load(std::memory_order_relaxed);
    rCounter.store(value + 1, std::memory_order_relaxed);
    return value;
}

} // namespace

std::uint64_t CountCells(const Source& source, IdList ids, const index::CellFrame& frame,
                         int threads) {
    std::atomic<std::uint64_t> sum{0};
    parallel::ParallelBatch(
        ids.GetCount(), SMALLEST, threads, [&](std::size_t first, std::size_t last) {
            std::uint64_t count = 0;
            for (; first < last; ++first)
                count += frame.Find(source.poTriangles[ids.pnFirst[first]].GetBBox()).GetCount();
            sum += count;
        });
    return sum;
}

CellLists::CellLists(const Source& source, IdList ids, const index::CellFrame& frame,
                     const Region& region, int threads)
    : moSource(source), moFrame(frame), moRegion(region), moEnds(new Counter[frame.GetCount()]()),
      mbShared(parallel::GetTeamForBatch(ids.GetCount(), SMALLEST, threads) > 1) {
    VisitAll(ids, threads, [&](unsigned, std::size_t cell) { Increment(moEnds[cell], mbShared); });
    std::size_t sum = 0;
    for (std::size_t cell = 0; cell < frame.GetCount(); ++cell) {
        const std::size_t count = moEnds[cell].load(std::memory_order_relaxed);
        moEnds[cell].store(sum, std::memory_order_relaxed);
        sum += count;
    }
    moIds.resize(sum);
    VisitAll(ids, threads,
             [&](unsigned id, std::size_t cell) { moIds[Increment(moEnds[cell], mbShared)] = id; });
}

IdList CellLists::Get(std::size_t cell) {
    const auto getEnd = [&](std::size_t of) { return moEnds[of].load(std::memory_order_relaxed); };
    unsigned* first = moIds.data() + (cell == 0 ? 0 : getEnd(cell - 1));
    unsigned* last = moIds.data() + getEnd(cell);
    if (mbShared)
        std::sort(first, last);
    return {first, last};
}

template <typename Visit>
void CellLists::VisitAll(IdList ids, int threads, const Visit& visit) const {
    parallel::ParallelBatch(ids.GetCount(), SMALLEST, threads,
                            [&](std::size_t first, std::size_t last) {
                                for (; first < last; ++first) {
                                    const unsigned id = ids.pnFirst[first];
                                    VisitCells(id, [&](std::size_t cell) { visit(id, cell); });
                                }
                            });
}

template <typename Visit>
void CellLists::VisitCells(unsigned id, const Visit& visit) const {
    const Triangle& triangle = moSource.poTriangles[id];
    const BBox<float, point2_t<float>>& box = triangle.GetBBox();
    const index::CellRange range = moFrame.Find(box);
    const auto visitRange = [&](const auto& isKept) {
        for (std::uint32_t row = range.firstRow; row <= range.lastRow; ++row)
            for (std::uint32_t col = range.firstCol; col <= range.lastCol; ++col)
                if (isKept(col, row))
                    visit(moFrame.GetNumber(col, row));
    };
    if (range.GetCount() < CLIP_FROM || moSource.peHoldings[id] != HOLDS_PLAINLY)
        return visitRange([](std::uint32_t, std::uint32_t) { return true; });
    const CellClip clip(triangle);
    const double xFrom = std::max(rules::Widen(box.min.x), moRegion.xFrom);
    const double xTo = std::min(rules::Widen(box.max.x), moRegion.xTo);
    const double yFrom = std::max(rules::Widen(box.min.y), moRegion.yFrom);
    const double yTo = std::min(rules::Widen(box.max.y), moRegion.yTo);
    visitRange([&](std::uint32_t col, std::uint32_t row) {
        Region part;
        moFrame.cols.GetBounds(col, xFrom, xTo, part.xFrom, part.xTo);
        moFrame.rows.GetBounds(row, yFrom, yTo, part.yFrom, part.yTo);
        return !clip.Misses(part);
    });
}

} // namespace kelm::tin::heightgrid

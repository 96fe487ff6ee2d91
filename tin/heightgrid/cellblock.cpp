#include "tin/heightgrid/cellblock.h"

#include <algorithm>

namespace kelm::tin::heightgrid {

namespace {

/// More triangles than this are divided among the cells of a grid of their own.
constexpr std::size_t CROWDED = 48;
constexpr unsigned MOST_LEVELS = 3;
/// Triangles that a cell of such a grid is made for.
constexpr double TRIANGLES_A_CELL = 4.0;
/// Most entries in its lists by boxes, a triangle: else it divides too little.
constexpr std::uint64_t MOST_ENTRIES = 8;
/// More triangles than this are quicker by the tree of the crowd, if they cannot be divided.
constexpr std::size_t MOST_LISTED = 256;

/// Fewer cells than this are not worth a grid.
constexpr std::size_t LEAST_CELLS = 4;

bool HasOdd(const Source& source, IdList ids) {
    return std::any_of(ids.begin(), ids.end(),
                       [&](unsigned id) { return source.peHoldings[id] == HOLDS_ODDLY; });
}

/// The numbers of a record and of all that follow it.
void MoveNumbers(Record* record, index::Line* lines, std::uint32_t before) {
    while (record->nNext != 0) {
        record->nNext += before;
        index::Line* next = lines + record->nNext;
        if (record->eKind == KIND_FRAME) {
            const std::size_t cells = record->GetFrame().GetCount();
            for (std::size_t i = 0; i < cells; ++i)
                MoveNumbers(&Record::At(next + i * Record::LINES), lines, before);
            return;
        }
        record = &Record::At(next);
    }
}

} // namespace

Region GetPart(const index::CellFrame& frame, std::size_t cell, const Region& region) {
    const auto col = static_cast<std::uint32_t>(cell % frame.cols.GetCount());
    const auto row = static_cast<std::uint32_t>(cell / frame.cols.GetCount());
    Region part;
    frame.cols.GetBounds(col, region.xFrom, region.xTo, part.xFrom, part.xTo);
    frame.rows.GetBounds(row, region.yFrom, region.yTo, part.yFrom, part.yTo);
    return part;
}

void CellBlock::Write(IdList ids, const Region& region, Record& rRecord) {
    mpoOwn = &rRecord;
    WriteCell(ids, region, 0, 0);
}

void CellBlock::WriteCell(IdList ids, const Region& region, unsigned level, std::size_t place) {
    if (mrBudget.IsSpent())
        return;
    if (HasOdd(moSource, ids))
        return WriteCrowd(ids, place);
    if (ids.GetCount() > CROWDED && level < MOST_LEVELS) {
        BoxSizes sizes;
        for (const unsigned id : ids)
            sizes.Add(moSource.poTriangles[id].GetBBox(), region);
        const auto frame =
            sizes.ChooseFrame(static_cast<double>(ids.GetCount()) / TRIANGLES_A_CELL);
        if (IsDivided(ids, frame))
            return WriteFrame(ids, frame, region, level, place);
    }
    return ids.GetCount() > MOST_LISTED ? WriteCrowd(ids, place) : WriteList(ids, place);
}

bool CellBlock::IsDivided(IdList ids, const index::CellFrame& frame) const {
    return frame.GetCount() >= LEAST_CELLS &&
           CountCells(moSource, ids, frame, 1) <= MOST_ENTRIES * ids.GetCount();
}

void CellBlock::WriteCrowd(IdList ids, std::size_t place) {
    std::memset(&GetRecord(place), 0, sizeof(Record));
    GetRecord(place).eKind = KIND_CROWD;
    moCrowd.insert(moCrowd.end(), ids.begin(), ids.end());
}

/// Writes as many records as it takes. Those behind the first are as long as what they hold.
void CellBlock::WriteList(IdList ids, std::size_t place) {
    moWriter.Clear();
    bool isFirst = true;
    const auto write = [&] {
        const std::size_t lines = moWriter.CountLines();
        if (!isFirst && !TakeLines(lines, place))
            return false;
        place = isFirst ? place : moLines.size() + 1 - lines;
        moWriter.Write(GetRecord(place));
        moWriter.Clear();
        isFirst = false;
        return true;
    };
    for (const unsigned id : ids) {
        if (moWriter.Add(moSource.poTriangles[id]))
            continue;
        if (!write())
            return;
        moWriter.Add(moSource.poTriangles[id]);
    }
    write();
}

void CellBlock::WriteFrame(IdList ids, const index::CellFrame& frame, const Region& region,
                           unsigned level, std::size_t place) {
    std::memset(&GetRecord(place), 0, sizeof(Record));
    if (!TakeLines(frame.GetCount() * Record::LINES, place))
        return;
    GetRecord(place).eKind = KIND_FRAME;
    GetRecord(place).SetFrame(frame);
    const std::size_t first = GetRecord(place).nNext;
    CellLists lists(moSource, ids, frame, region, 1);
    for (std::size_t cell = 0; cell < frame.GetCount(); ++cell)
        WriteCell(lists.Get(cell), GetPart(frame, cell, region), level + 1,
                  first + cell * Record::LINES);
}

/// Adds lines that follow a record. @return false if the budget is spent
bool CellBlock::TakeLines(std::size_t count, std::size_t place) {
    if (!mrBudget.Take(count))
        return false;
    GetRecord(place).nNext = static_cast<std::uint32_t>(moLines.size() + 1);
    moLines.resize(moLines.size() + count);
    return true;
}

Record& CellBlock::GetRecord(std::size_t place) {
    return place == 0 ? *mpoOwn : Record::At(&moLines[place - 1]);
}

void CellBlock::Move(Record* records, std::size_t count, index::Line* lines,
                     std::size_t before) const {
    if (moLines.empty())
        return;
    std::memcpy(lines + before + 1, moLines.data(), moLines.size() * sizeof(index::Line));
    for (std::size_t i = 0; i < count; ++i)
        MoveNumbers(&records[i], lines, static_cast<std::uint32_t>(before));
}

} // namespace kelm::tin::heightgrid

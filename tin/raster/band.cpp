#include "tin/raster/band.h"

#include "tin/rules/exactplan.h"

#include <algorithm>
#include <cmath>
#include <limits>

namespace kelm::tin::raster {

namespace {

using heightgrid::CellClip;

/// What a cell holds while it has no height.
constexpr float NONE = -std::numeric_limits<float>::max();

/// Cells in a row that are quicker tested than left out.
constexpr std::size_t SHORT = 24;

/// Calls visit(first, last) for parts of a row that a triangle may hold centres of. A long part is
/// halved until it is short or certainly missed.
template <typename Visit>
void VisitParts(const CellClip& clip, const float* xs, float y, std::size_t first, std::size_t last,
                const Visit& visit) {
    if (last - first <= SHORT)
        return visit(first, last);
    const double row = static_cast<double>(y);
    if (clip.Misses({static_cast<double>(xs[first]), static_cast<double>(xs[last - 1]), row, row}))
        return;
    const std::size_t middle = first + (last - first) / 2;
    VisitParts(clip, xs, y, first, middle, visit);
    VisitParts(clip, xs, y, middle, last, visit);
}

} // namespace

/// A bound of the surface's that is NaN stays; a triangle whose bound is NaN has no rows.
BBox<float, point2_t<float>> Sheet::GetBox(const Triangle& triangle) const {
    BBox<float, point2_t<float>> box = triangle.GetBBox();
    box.min = {std::max(oBBox.min.x, box.min.x), std::max(oBBox.min.y, box.min.y)};
    box.max = {std::min(oBBox.max.x, box.max.x), std::min(oBBox.max.y, box.max.y)};
    return box;
}

std::pair<unsigned, unsigned> Sheet::FindRows(const Triangle& triangle) const {
    const BBox<float, point2_t<float>>& own = triangle.GetBBox();
    if (triangle.GetVertex(0) == nullptr || !(own.max.x >= own.min.x && own.max.y >= own.min.y))
        return {0, 0};
    const BBox<float, point2_t<float>> box = GetBox(triangle);
    const Axis::Range rows = oRows.Find(box.min.y, box.max.y);
    return {static_cast<unsigned>(rows.first), static_cast<unsigned>(rows.last)};
}

/// Calls visit(triangle, first, last) for the triangles that reach into the band, ascending, with
/// their rows there.
template <typename Visit>
void Band::VisitTriangles(const Visit& visit) const {
    for (std::size_t i = 0; i < mrSheet.oRowRanges.size(); ++i) {
        const auto [first, last] = mrSheet.oRowRanges[i];
        if (first < mnLast && last > mnFirst && first < last)
            visit(mrSheet.poTriangles[i], std::max<std::size_t>(first, mnFirst),
                  std::min<std::size_t>(last, mnLast));
    }
}

std::size_t Band::Fill(EdgeRule eRule) const {
    for (std::size_t row = mnFirst; row < mnLast; ++row)
        std::fill_n(mrSheet.GetRow(row), mrSheet.oCols.GetCount(), NONE);
    VisitTriangles([&](const Triangle& triangle, std::size_t first, std::size_t last) {
        AddTriangle(triangle, first, last);
    });
    std::size_t found = 0;
    std::vector<Gaps> gaps;
    for (std::size_t row = mnFirst; row < mnLast; ++row) {
        const std::size_t foundHere = Finish(row);
        found += foundHere;
        if (eRule == ER_Closed)
            gaps.push_back(FindGaps(row, foundHere));
    }
    const bool isMissed = found < (mnLast - mnFirst) * mrSheet.oCols.GetCount();
    return eRule == ER_Closed && isMissed ? found + Close(gaps) : found;
}

void Band::AddTriangle(const Triangle& triangle, std::size_t first, std::size_t last) const {
    const BBox<float, point2_t<float>> box = mrSheet.GetBox(triangle);
    const Axis::Range cols = mrSheet.oCols.Find(box.min.x, box.max.x);
    RowWalk walk(triangle, box);
    if (cols.first == cols.last || walk.IsFlat())
        return;
    const float* xs = mrSheet.oCols.GetValues();
    const auto addRows = [&](const auto& visitParts) {
        for (std::size_t row = first; row < last; ++row) {
            const float y = mrSheet.oRows.GetValues()[row];
            walk.SetRow(y);
            visitParts(y, [&](std::size_t from, std::size_t to) {
                walk.Add(xs, mrSheet.GetRow(row), mrSheet.oCols.GetCount(), from, to);
            });
        }
    };
    // A determinant beyond the range of float makes weights that have nothing to do with the edges.
    if (cols.last - cols.first <= SHORT || !walk.IsFinite())
        return addRows([&](float, const auto& add) { add(cols.first, cols.last); });
    const CellClip clip(triangle);
    addRows([&](float y, const auto& add) { VisitParts(clip, xs, y, cols.first, cols.last, add); });
}

/// Marks the cells of a row that have no height. @return the number of the others
std::size_t Band::Finish(std::size_t row) const {
    float* cells = mrSheet.GetRow(row);
    std::size_t found = 0;
    for (std::size_t col = 0; col < mrSheet.oCols.GetCount(); ++col) {
        const bool isFound = cells[col] > NONE;
        found += isFound ? 1 : 0;
        cells[col] = isFound ? cells[col] : std::numeric_limits<float>::quiet_NaN();
    }
    return found;
}

Band::Gaps Band::FindGaps(std::size_t row, std::size_t found) const {
    const float* cells = mrSheet.GetRow(row);
    const std::size_t count = mrSheet.oCols.GetCount();
    Gaps gaps{0, count, false};
    while (gaps.left < count && std::isnan(cells[gaps.left]))
        ++gaps.left;
    while (gaps.right > gaps.left && std::isnan(cells[gaps.right - 1]))
        --gaps.right;
    gaps.isInside = gaps.right - gaps.left > found;
    return gaps;
}

void Band::FindClosed(const Triangle& triangle, std::size_t row, Axis::Range cols,
                      std::vector<Closed>& rFound) const {
    float* cells = mrSheet.GetRow(row);
    for (std::size_t col = cols.first; col < cols.last; ++col) {
        const point2_t<float> centre{mrSheet.oCols.GetValues()[col],
                                     mrSheet.oRows.GetValues()[row]};
        float h;
        if (std::isnan(cells[col]) &&
            rules::GetClosedHeight(*triangle.GetVertex(0), *triangle.GetVertex(1),
                                   *triangle.GetVertex(2), centre, h) &&
            h > NONE)
            rFound.push_back({&cells[col], h});
    }
}

/// Puts the cells that the weights have left to the closed rule. @return those that get a height
std::size_t Band::Close(const std::vector<Gaps>& gaps) const {
    std::vector<Closed> closed;
    VisitTriangles([&](const Triangle& triangle, std::size_t first, std::size_t last) {
        const BBox<float, point2_t<float>> box = mrSheet.GetBox(triangle);
        const Axis::Range cols = mrSheet.oCols.Find(box.min.x, box.max.x);
        for (std::size_t row = first; row < last; ++row)
            if (gaps[row - mnFirst].AreMet(cols))
                FindClosed(triangle, row, cols, closed);
    });
    std::size_t found = 0;
    for (const auto& [cell, height] : closed) {
        found += std::isnan(*cell) ? 1 : 0;
        *cell = std::isnan(*cell) ? height : std::max(*cell, height);
    }
    return found;
}

} // namespace kelm::tin::raster

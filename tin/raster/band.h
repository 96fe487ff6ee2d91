#pragma once

#include "tin/edgerule.h"
#include "tin/heightgrid/cellclip.h"
#include "tin/raster/axis.h"
#include "tin/raster/rowwalk.h"

#include <utility>
#include <vector>

namespace kelm::tin::raster {

/// What all bands of a raster work on.
struct Sheet {
    const Triangle* poTriangles;
    BBox<float, point2_t<float>> oBBox; ///< of the surface
    Axis oCols;                         ///< not reversed
    Axis oRows;
    std::vector<std::pair<unsigned, unsigned>> oRowRanges; ///< of each triangle, by the row axis
    float* pfCells;

    /// @return the box of a triangle within that of the surface
    BBox<float, point2_t<float>> GetBox(const Triangle& triangle) const;
    /// @return first row, and the one behind the last, that a triangle can hold a centre of
    std::pair<unsigned, unsigned> FindRows(const Triangle& triangle) const;
    float* GetRow(std::size_t row) const { return pfCells + oRows.GetCell(row) * oCols.GetCount(); }
};

/// Rows of a raster, filled on one thread.
class Band {
  public:
    Band(const Sheet& sheet, std::size_t first, std::size_t last)
        : mrSheet(sheet), mnFirst(first), mnLast(last) {}

    /// @return the number of heights found @throw std::bad_alloc
    std::size_t Fill(EdgeRule eRule) const;

  private:
    /// A height by the closed rule.
    struct Closed {
        float* pfCell;
        float fHeight;
    };

    /// Where the cells of a row are that have no height. Most rows have some at both ends alone.
    struct Gaps {
        std::size_t left = 0;  ///< cells without one at the start of the row
        std::size_t right = 0; ///< the first of those at its end
        bool isInside = false; ///< are there others?

        bool AreMet(const Axis::Range& cols) const {
            return isInside || cols.first < left || cols.last > right;
        }
    };

    template <typename Visit>
    void VisitTriangles(const Visit& visit) const;
    void AddTriangle(const Triangle& triangle, std::size_t first, std::size_t last) const;
    void FindClosed(const Triangle& triangle, std::size_t row, Axis::Range cols,
                    std::vector<Closed>& rFound) const;
    std::size_t Close(const std::vector<Gaps>& gaps) const;
    std::size_t Finish(std::size_t row) const;
    Gaps FindGaps(std::size_t row, std::size_t found) const;

    const Sheet& mrSheet;
    std::size_t mnFirst;
    std::size_t mnLast;
};

} // namespace kelm::tin::raster

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

    template <typename Visit>
    void VisitTriangles(const Visit& visit) const;
    void AddTriangle(const Triangle& triangle, std::size_t first, std::size_t last) const;
    std::vector<std::size_t> CountMissed() const;
    void FindClosed(const Triangle& triangle, std::size_t row, std::vector<Closed>& rFound) const;
    void Close(const std::vector<std::size_t>& missed) const;
    std::size_t Finish() const;

    const Sheet& mrSheet;
    std::size_t mnFirst;
    std::size_t mnLast;
};

} // namespace kelm::tin::raster

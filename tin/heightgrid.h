#pragma once

#include "tin/bbox.h"
#include "tin/buildoptions.h"
#include "tin/edgerule.h"
#include "tin/point.h"
#include "tin/tinexport.h"

#include <cstddef>
#include <cstdint>
#include <memory>

namespace kelm::tin {

class Tin;

namespace heightgrid {
class Cells;
}

/// Index of a surface for heights alone: a grid of cells, each with the triangles that can hold a
/// position of it. For very many heights it is the quickest one.
///
/// Every answer is that of the surface's own GetHeight without a tree, to the bit, for any surface
/// and any position. The index is a snapshot: it has copies of all that it needs, knows nothing of
/// later changes and outlives the surface. Coordinates and base are those of the surface.
///
/// It does not copy. A move exchanges the contents, and one into a new index leaves an index that
/// finds nothing. The constant operations may run on any number of threads at a time.
class KELM_TIN_EXPORT HeightGrid {
  public:
    /// Builds on all threads that the options allow. The index is the same on any number of them.
    ///
    /// Cells are made for four triangles. Where more crowd, a cell has a grid of its own or, if
    /// that does not divide them or the memory does not suffice, a tree.
    /// @param options bytesPerTriangle is 110 by default; a tree for all triangles, the slowest
    /// way, takes up to 110 itself
    /// @throw std::bad_alloc; CancelledException and what the progress function throws
    explicit HeightGrid(const Tin& tin, const BuildOptions& options = {});
    HeightGrid(HeightGrid&& other) noexcept;
    HeightGrid& operator=(HeightGrid&& other) noexcept;
    HeightGrid(const HeightGrid&) = delete;
    HeightGrid& operator=(const HeightGrid&) = delete;
    ~HeightGrid();

    /// The greatest height of the triangles at a position, surface-local or in map coordinates. A
    /// map position is narrowed to `float` once the base is subtracted. A NaN finds no height.
    /// @param height untouched if the position lies outside the surface's box; the lowest finite
    /// `float` if it lies inside the box but in no triangle
    /// @return is there a height?
    bool GetHeight(const float& x, const float& y, float& height, EdgeRule eRule = ER_Float) const;
    bool GetHeight(const double& x, const double& y, float& height,
                   EdgeRule eRule = ER_Float) const;

    /// The heights at many positions in map coordinates, each as GetHeight tells it.
    /// @param heights count values of the caller's, in the order of the positions; NaN where there
    /// is no height @param threads most threads; 0 for the runtime's default. A small batch stays
    /// on the calling thread
    /// @return the number of heights found
    std::size_t GetHeights(const point2_t<double>* positions, std::size_t count, float* heights,
                           int threads = 0, EdgeRule eRule = ER_Float) const;

    /// @return bytes held by this index
    std::uint64_t GetObjBytes() const;
    /// @return bytes that an index over so many triangles will about hold, of a terrain whose
    /// triangles lie side by side. At most bytesPerTriangle a triangle are added to what the least
    /// surface takes
    static std::uint64_t EstimateObjBytes(unsigned triangleCount, const BuildOptions& options = {});

  private:
    std::size_t FindBlock(const point2_t<double>* positions, std::size_t count, float* heights,
                          EdgeRule eRule) const;

    BBox<float, point2_t<float>> moBBox; ///< of the surface, or without any position
    double mdfXBase = 0.0;
    double mdfYBase = 0.0;
    std::unique_ptr<const heightgrid::Cells> mpoCells;
};

} // namespace kelm::tin

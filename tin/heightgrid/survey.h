#pragma once

#include "tin/index/cellframe.h"
#include "tin/index/meter.h"
#include "tin/rules/extent.h"
#include "tin/tin.h"

#include <cstdint>
#include <vector>

namespace kelm::tin::heightgrid {

/// How a triangle can hold a position.
enum Holding : std::uint8_t {
    HOLDS_NOTHING = 0, ///< by no rule
    HOLDS_PLAINLY = 1, ///< a record can tell
    HOLDS_ODDLY = 2    ///< only the triangle itself can tell
};

Holding FindHolding(const Triangle& triangle);

/// Bounds of the positions that cells are made for.
struct Region {
    double xFrom;
    double xTo;
    double yFrom;
    double yTo;
};

/// The sizes of boxes, as far as they lie in a region.
class BoxSizes {
  public:
    void Add(const BBox<float, point2_t<float>>& box, const Region& region);
    void Add(const BoxSizes& other);
    /// Cells after the shape of the mean box. @param wanted number of cells; there are fewer if
    /// boxes lie above each other, so that no cell is much smaller than a box
    index::CellFrame ChooseFrame(double wanted) const;

  private:
    std::uint64_t mnCount = 0;
    double mdfWidth = 0.0;
    double mdfHeight = 0.0;
    rules::Extent<double> moExtent;
};

/// The triangles of a surface that can hold a position.
struct Survey {
    /// Steps that a meter counts.
    static std::size_t CountSteps(unsigned triangleCount) { return triangleCount / BLOCK + 1; }

    Survey(const Tin& tin, int threads, index::Meter& rMeter);

    std::vector<Holding> oHoldings; ///< by triangle
    std::vector<unsigned> oIds;     ///< ascending
    BoxSizes oSizes;

  private:
    struct Part {
        std::vector<unsigned> oIds;
        BoxSizes oSizes;
    };
    static constexpr unsigned BLOCK = 1U << 14;

    void AddBlock(const Triangle* triangles, std::size_t block, Part& rPart);
};

} // namespace kelm::tin::heightgrid

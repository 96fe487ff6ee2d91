#pragma once

#include "tin/heightgrid/survey.h"
#include "tin/index/cellframe.h"

#include <atomic>
#include <memory>
#include <utility>
#include <vector>

namespace kelm::tin::heightgrid {

/// What a build works on.
struct Source {
    const Triangle* poTriangles;
    const point3_t<float>* poVertices;
    const Holding* peHoldings;
};

/// Triangles of a part of a grid, ascending.
struct IdList {
    const unsigned* pnFirst;
    const unsigned* pnLast;

    std::size_t GetCount() const { return static_cast<std::size_t>(pnLast - pnFirst); }
    const unsigned* begin() const { return pnFirst; }
    const unsigned* end() const { return pnLast; }
};

/// @return the cells of all boxes together
std::uint64_t CountCells(const Source& source, IdList ids, const index::CellFrame& frame,
                         int threads);

/// For each cell of a grid the triangles that can hold a position of it, ascending.
class CellLists {
  public:
    /// @param region bounds of the positions
    /// @throw std::bad_alloc
    CellLists(const Source& source, IdList ids, const index::CellFrame& frame, const Region& region,
              int threads);

    /// @return the list of a cell; its first call for this cell must be the only one at a time
    IdList Get(std::size_t cell);

  private:
    using Counter = std::atomic<std::size_t>;

    template <typename Visit>
    void VisitCells(unsigned id, const Visit& visit) const;
    template <typename Visit>
    void VisitAll(IdList ids, int threads, const Visit& visit) const;

    Source moSource;
    index::CellFrame moFrame;
    Region moRegion;
    std::unique_ptr<Counter[]> moEnds; ///< of the lists; while they are filled, what they hold
    std::vector<unsigned> moIds;
    bool mbShared; ///< several threads have filled the lists, each in its own time
};

} // namespace kelm::tin::heightgrid

#pragma once

#include "services/vectorlayer.h"

#include <cstdint>
#include <utility>
#include <vector>

namespace kelm::store::landxml {

/// The points of a surface, found by the numbers that the file gives them. Numbers come in any
/// order and need not be dense.
class PointTable {
  public:
    static constexpr std::uint32_t UNKNOWN = 0xFFFFFFFF;   ///< no point has the number
    static constexpr std::uint32_t AMBIGUOUS = 0xFFFFFFFE; ///< points at several places have it

    /// @return the number of points
    std::size_t GetCount() const { return moPositions.size(); }
    void Add(std::uint32_t number, const ZARVertex& position);
    /// Must be called behind the last Add, before Find.
    void Sort();
    /// @return the index of the point of this number, or UNKNOWN or AMBIGUOUS
    std::uint32_t Find(std::uint32_t number) const;
    /// @return the positions, in the order of the indices
    const std::vector<ZARVertex>& GetPositions() const { return moPositions; }
    /// Hands the positions over. The table is not to be used any more.
    std::vector<ZARVertex> TakePositions() { return std::move(moPositions); }

  private:
    struct Entry {
        std::uint32_t mnNumber;
        std::uint32_t mnIndex;
    };
    void JoinEqual();

    std::vector<ZARVertex> moPositions;
    std::vector<Entry> moEntries;
    bool mbRising = true; ///< each number is greater than the one before
};

} // namespace kelm::store::landxml

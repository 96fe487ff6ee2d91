#pragma once

#include "containers/keypoint.h"

#include <array>
#include <cstddef>
#include <cstdint>
#include <vector>

namespace kelm::tin::load {

/// Welds the corners of a load where the octree's answer is plain to see: wherever no two different
/// corners lie within its tolerance, it keeps the first of every group of equal corners, and that
/// one stands for the others.
///
/// Corners are hashed by small cells, so that a near twin shows in the cell of a corner or, next to
/// a side of it, in one beyond. A table slot takes 8 bytes, less than the octree's nodes by far.
/// Only the kept corners are held.
class CornerHash {
  public:
    using Point = containers::KeyPoint<double>;

    /// @param corners about as many as will be added; room for a closed sheet of them is made
    explicit CornerHash(std::size_t corners);

    /// Adds corners in their order. @param numbers one a corner: its position among the kept ones
    /// @return the corners that were added; fewer than all if only the octree can tell about the
    /// next one: another one lies within the tolerance, it is not finite or beyond the range of the
    /// cells, or its cell is crowded. Nothing can be added from then on
    /// @throw std::bad_alloc
    std::size_t Add(const Point* corners, std::size_t count, std::uint32_t* numbers);

    /// @return the kept corners in the order in which they came
    std::vector<Point>& GetKept() { return moKept; }

  private:
    struct Slot {
        std::uint32_t nCorner; ///< kept corner, or NONE
        std::uint32_t nTag;    ///< upper half of its hash
    };
    enum class Find { None, Equal, Undecided };

    /// Corners whose slots are fetched ahead of their turn.
    static constexpr std::size_t BATCH = 32;
    using Hashes = std::array<std::uint64_t, BATCH>;

    std::size_t Fetch(const Point* corners, std::size_t count, Hashes& hashes) const;
    bool Resolve(const Point& corner, std::uint64_t hash, std::uint32_t& number);
    Find Search(const Point& point, std::uint64_t hash, std::uint32_t& found) const;
    bool IsAlone(const Point& point) const;
    void Keep(const Point& corner, std::uint64_t hash);
    void Grow();
    void Place(const Slot& slot, std::uint64_t hash);

    std::vector<Point> moKept;
    std::vector<Slot> moSlots; ///< a power of two, at most half full
    std::size_t mnMask = 0;
};

} // namespace kelm::tin::load

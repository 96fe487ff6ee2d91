#pragma once

#include "containers/keypoint.h"

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
class CornerHash {
  public:
    /// @param standIns one entry a corner; the kept corner that stands for it, itself if it is kept
    /// @return false if only the octree can tell: two different corners lie within the tolerance, a
    /// corner is not finite or beyond the range of the cells, or one cell is crowded
    /// @throw std::bad_alloc
    static bool FindStandIns(const std::vector<containers::KeyPoint<double>>& points,
                             std::vector<unsigned>& standIns);

  private:
    using Point = containers::KeyPoint<double>;
    struct Slot {
        std::uint32_t nCorner; ///< kept corner, or NONE
        std::uint32_t nTag;    ///< upper half of its hash
    };
    enum class Find { None, Equal, Undecided };

    explicit CornerHash(const std::vector<Point>& rPoints);

    bool Run(std::vector<unsigned>& standIns);
    bool Resolve(unsigned corner, std::uint64_t hash, unsigned& standIn);
    Find Search(const Point& point, std::uint64_t hash, unsigned& found) const;
    bool IsAlone(const Point& point) const;
    void Keep(unsigned corner, std::uint64_t hash);
    void Grow();
    void Place(const Slot& slot, std::uint64_t hash);

    const std::vector<Point>& mrPoints;
    std::vector<Slot> moSlots; ///< a power of two, at most half full
    std::size_t mnMask = 0;
    std::size_t mnKept = 0;
};

} // namespace kelm::tin::load

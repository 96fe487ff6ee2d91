#pragma once

#include "tin/aabbtree.h"
#include "tin/edgerule.h"
#include "tin/rules/highest.h"
#include "tin/tin.h"

#include <cstdint>
#include <memory>
#include <vector>

namespace kelm::tin::heightgrid {

/// Triangles that lie too close for a grid or that no record can hold, as a surface of their own
/// with a tree. It answers for a cell if all triangles of the cell are in it.
class Crowd {
  public:
    Crowd() = default;
    /// @param ids ascending, without repeats @throw std::bad_alloc
    Crowd(const Tin& tin, const std::vector<unsigned>& ids);

    /// The greatest height at a position, of equal heights that of the first triangle.
    rules::Highest Find(float x, float y, EdgeRule eRule) const;

    std::uint64_t GetBytes() const;
    /// Bytes that so many triangles take at most, each with three vertices of its own.
    static std::uint64_t EstimateBytes(std::uint64_t triangles) { return 105 * triangles; }

  private:
    std::unique_ptr<const Tin> mpoSurface; ///< null without triangles
    std::unique_ptr<const AabbTree> mpoTree;
};

} // namespace kelm::tin::heightgrid

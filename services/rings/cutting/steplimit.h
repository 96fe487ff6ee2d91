#pragma once

#include <algorithm>
#include <cstdint>

namespace kelm::rings {

/// Counts the steps of a search by an index, and tells when the search should give way to one that
/// looks at all corners. So no ring takes much longer than it would without an index.
class StepLimit {
  public:
    explicit StepLimit(std::uint64_t steps) : mnLeft(steps) {}

    /// @return for large rings so many steps that they take less time than the way without an
    /// index; none for rings of which most are cut faster without one
    static StepLimit OfRing(std::uint64_t corners) {
        return StepLimit(
            corners < LEAST_INDEXED ? 0 : corners * std::min(corners / 32, 256 + corners / 128));
    }

    void Count(std::uint64_t steps) { mnLeft -= steps < mnLeft ? steps : mnLeft; }
    bool IsReached() const { return mnLeft == 0; }

  private:
    static constexpr std::uint64_t LEAST_INDEXED = 2048;

    std::uint64_t mnLeft;
};

} // namespace kelm::rings

#pragma once

#include <cstdint>

namespace kelm::rings {

/// Counts the steps of a search by an index, and tells when the search should give way to one that
/// looks at all corners. So no ring takes much longer than it would without an index.
class StepLimit {
  public:
    explicit StepLimit(std::uint64_t steps) : mnLeft(steps) {}

    /// @return a small part of the steps that are possible without an index
    static StepLimit OfRing(std::uint64_t corners) {
        return StepLimit(corners * (64 + corners / 64));
    }

    void Count(std::uint64_t steps) { mnLeft -= steps < mnLeft ? steps : mnLeft; }
    bool IsReached() const { return mnLeft == 0; }

  private:
    std::uint64_t mnLeft;
};

} // namespace kelm::rings

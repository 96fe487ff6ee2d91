#pragma once

#include <cstdint>

namespace kelm::bench {

/// Linear congruential generator (Knuth, The Art of Computer Programming, volume 2, section 3.3.4):
/// the same workload on every machine.
class Random {
  public:
    explicit Random(std::uint64_t seed) : mnState(seed) { Below(1); }

    /// @return an integer from 0 to n - 1
    std::uint32_t Below(std::uint32_t n) {
        mnState = mnState * 6364136223846793005U + 1442695040888963407U;
        return static_cast<std::uint32_t>(((mnState >> 32) * n) >> 32);
    }
    /// @return a number from 0 to below 1, in steps of 2^-24
    float Unit() { return static_cast<float>(Below(1U << 24)) / static_cast<float>(1U << 24); }

  private:
    std::uint64_t mnState;
};

} // namespace kelm::bench

#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

namespace kelm::rings {

/// Set of numbers below a bound that finds the next member in a few steps. Each level has one bit
/// for a word of the level below it that is not empty.
class NumberSet {
  public:
    static constexpr unsigned NONE = 0xFFFFFFFFU;

    /// @param bound 1 or more; the set holds all numbers below it @throw std::bad_alloc
    explicit NumberSet(unsigned bound) {
        for (std::size_t bits = bound, words = 0; words != 1; bits = words) {
            words = (bits + 63) / 64;
            moLevels.emplace_back(words, ~std::uint64_t{0});
            if (bits % 64 != 0)
                moLevels.back().back() = ~std::uint64_t{0} >> (64 - bits % 64);
        }
    }

    void Add(unsigned number) {
        for (std::vector<std::uint64_t>& level : moLevels) {
            level[number / 64] |= std::uint64_t{1} << number % 64;
            number /= 64;
        }
    }

    void Remove(unsigned number) {
        for (std::vector<std::uint64_t>& level : moLevels) {
            std::uint64_t& word = level[number / 64];
            word &= ~(std::uint64_t{1} << number % 64);
            if (word != 0)
                return;
            number /= 64;
        }
    }

    /// @return the least member that is not below a number; else the least of all; else NONE
    unsigned FindAround(unsigned number) const {
        const unsigned next = FindFrom(number);
        return next != NONE ? next : FindFrom(0);
    }

  private:
    unsigned FindFrom(std::size_t number) const {
        for (std::size_t level = 0; level < moLevels.size(); ++level) {
            if (number / 64 >= moLevels[level].size())
                return NONE;
            const std::uint64_t word = moLevels[level][number / 64] >> number % 64;
            if (word != 0)
                return Descend(level, number + CountZeros(word));
            number = number / 64 + 1;
        }
        return NONE;
    }

    /// @return the least number below a bit of a level
    unsigned Descend(std::size_t level, std::size_t bit) const {
        while (level-- > 0)
            bit = bit * 64 + CountZeros(moLevels[level][bit]);
        return static_cast<unsigned>(bit);
    }

    static std::size_t CountZeros(std::uint64_t word) {
        return static_cast<std::size_t>(__builtin_ctzll(word));
    }

    std::vector<std::vector<std::uint64_t>> moLevels;
};

} // namespace kelm::rings

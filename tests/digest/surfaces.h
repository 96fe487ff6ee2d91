#pragma once

#include <tin/tin.h>

#include <cstdint>
#include <cstring>
#include <vector>

namespace digest {

using kelm::tin::Tin;

constexpr float UNTOUCHED = -1.0f;

/// Linear congruential generator (Knuth, The Art of Computer Programming, volume 2, section 3.3.4).
class Random {
  public:
    /// @return an integer from 0 to n - 1
    std::uint32_t Below(std::uint32_t n) {
        state = state * 6364136223846793005u + 1442695040888963407u;
        return static_cast<std::uint32_t>(((state >> 32) * n) >> 32);
    }
    /// @return thousandths from 0 to below n units
    double Milli(std::uint32_t n) { return Below(n * 1000) / 1000.0; }

  private:
    std::uint64_t state = 1;
};

/// Fowler-Noll-Vo hash, variant 1a, 64 bits, over little-endian numbers.
struct Digest {
    /// @param number one, or a struct of some without gaps
    template <typename T>
    void Add(const T& number) {
        unsigned char bytes[sizeof number];
        std::memcpy(bytes, &number, sizeof number);
        for (const unsigned char byte : bytes)
            value = (value ^ byte) * 1099511628211u;
    }
    void AddAnswer(bool found, float height) {
        Add(found);
        Add(height);
        hits += found ? 1 : 0;
        ++count;
    }
    template <typename T>
    void AddList(const std::vector<T>& list) {
        for (const T& number : list)
            Add(number);
        AddAnswer(!list.empty(), static_cast<float>(list.size()));
    }
    std::uint64_t value = 14695981039346656037u;
    unsigned count = 0;
    unsigned hits = 0;
};

/// Nodes 10 m apart with 3 m of jitter in millimetres, two triangles a cell with one in fifty left
/// out, and one cell in a hundred covered once more by a triangle to a node some cells away.
Tin MakeSheet(unsigned cells, double xBase, double yBase, Random& random);

/// A local position of one of four kinds: a vertex, the float nearest to a point of an edge, a
/// whole metre, or anywhere, a margin around the sheet included.
point2_t<float> MakePosition(const Tin& tin, Random& random);

/// The answers to all queries but plain heights, over sheets of their own.
Digest AskEverything();

} // namespace digest

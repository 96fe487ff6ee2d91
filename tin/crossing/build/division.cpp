#include "tin/crossing/build/division.h"

#include "tin/crossing/layout.h"

#include <algorithm>
#include <array>

namespace kelm::tin::crossing {

namespace {

constexpr unsigned BINS = 32;

/// Twice the centre of a box on one axis.
float GetCenter(const Reference& reference, unsigned axis) {
    return reference.low[axis] + reference.high[axis];
}

/// Order of references along an axis. Those of equal centres keep the order of their triangles.
struct Less {
    unsigned axis;
    bool operator()(const Reference& a, const Reference& b) const {
        const float left = GetCenter(a, axis);
        const float right = GetCenter(b, axis);
        return left < right || (left == right && a.id < b.id);
    }
};

/// The axis on which the centres spread most, of the first two or all three, and how they fall into
/// bins on it.
class Spread {
  public:
    Spread(const Reference* first, std::size_t count, unsigned axes) {
        Bounds centers;
        for (const Reference* r = first; r != first + count; ++r) {
            const float* values = reinterpret_cast<const float*>(r);
            const Float4 center = Load4(values) + Load4(values + 4);
            centers.Add({center, center});
        }
        float sides[4];
        centers.GetSides(sides);
        mnAxis = static_cast<unsigned>(std::max_element(sides, sides + axes) - sides);
        float low[4];
        Store4(low, centers.low);
        mfLow = low[mnAxis];
        mfScale = static_cast<float>(BINS) / sides[mnAxis];
    }

    unsigned GetAxis() const { return mnAxis; }
    unsigned GetBin(const Reference& reference) const {
        const float at = (GetCenter(reference, mnAxis) - mfLow) * mfScale;
        // A NaN, of sides that are zero or infinite, goes to the first.
        return at > 0.0F ? static_cast<unsigned>(std::min(at, static_cast<float>(BINS - 1))) : 0U;
    }

  private:
    unsigned mnAxis;
    float mfLow;
    float mfScale;
};

struct Bin {
    Bounds bounds;
    std::size_t count = 0;

    void Add(const Bin& other) {
        bounds.Add(other.bounds);
        count += other.count;
    }
    /// What a visit costs: the surface of the box by the number of triangles; in plan its sides.
    float GetCost(unsigned axes) const {
        float s[4];
        bounds.GetSides(s);
        const float size = axes == 2 ? s[0] + s[1] : s[0] * s[1] + s[1] * s[2] + s[2] * s[0];
        return size * static_cast<float>(count);
    }
};

/// @return the number of references below the border of bins where both sides cost least together;
/// the half if no border lies within the middle
std::size_t FindCut(const Reference* first, std::size_t count, const Spread& spread,
                    unsigned axes) {
    std::array<Bin, BINS> bins;
    for (const Reference* r = first; r != first + count; ++r) {
        Bin& bin = bins[spread.GetBin(*r)];
        bin.bounds.Add(*r);
        ++bin.count;
    }
    std::array<float, BINS> right;
    Bin behind;
    for (unsigned i = BINS - 1; i > 0; --i) {
        behind.Add(bins[i]);
        right[i] = behind.GetCost(axes);
    }
    std::size_t cut = count / 2;
    float least = std::numeric_limits<float>::max();
    Bin before;
    for (unsigned i = 1; i < BINS; ++i) {
        before.Add(bins[i - 1]);
        const float cost = before.GetCost(axes) + right[i];
        if (cost < least && before.count >= count / 4 && before.count <= count - count / 4) {
            least = cost;
            cut = before.count;
        }
    }
    return cut;
}

} // namespace

std::size_t Divide(Reference* first, std::size_t count, unsigned axes) {
    const std::size_t step = count > GROUP ? GROUP : WIDTH;
    const Spread spread(first, count, axes);
    const std::size_t cut = count > GROUP ? FindCut(first, count, spread, axes) : count / 2;
    const std::size_t left =
        std::clamp((cut + step / 2) / step * step, step, (count - 1) / step * step);
    std::nth_element(first, first + left, first + count, Less{spread.GetAxis()});
    return left;
}

} // namespace kelm::tin::crossing

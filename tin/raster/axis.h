#pragma once

#include <algorithm>
#include <cmath>
#include <cstddef>
#include <vector>

namespace kelm::tin::raster {

/// The coordinates of the centres on one axis of a raster, ascending. They may run against the
/// numbers of the cells.
class Axis {
  public:
    /// Numbers from first to last - 1.
    struct Range {
        std::size_t first;
        std::size_t last;
    };

    /// @param getCentre getCentre(i) gives a coordinate, which never falls, or never rises, with i
    template <typename GetCentre>
    Axis(std::size_t count, const GetCentre& getCentre) : moValues(count) {
        for (std::size_t i = 0; i < count; ++i)
            moValues[i] = getCentre(i);
        mbReversed = count > 0 && moValues.front() > moValues.back();
        if (mbReversed)
            std::reverse(moValues.begin(), moValues.end());
        if (IsFinite() && moValues.back() > moValues.front())
            mdfScale = static_cast<double>(count - 1) / (Widen(count - 1) - Widen(0));
    }

    bool IsFinite() const {
        return moValues.empty() || std::isfinite(moValues.front() + moValues.back());
    }
    bool IsReversed() const { return mbReversed; }
    std::size_t GetCount() const { return moValues.size(); }
    const float* GetValues() const { return moValues.data(); }
    /// @return the number of the cell of a value
    std::size_t GetCell(std::size_t i) const { return mbReversed ? GetCount() - 1 - i : i; }

    /// The values from low to high. A NaN bound gives none.
    Range Find(float low, float high) const {
        if (!(high >= low) || moValues.empty())
            return {0, 0};
        std::size_t first = Guess(low);
        while (first > 0 && moValues[first - 1] >= low)
            --first;
        while (first < GetCount() && moValues[first] < low)
            ++first;
        std::size_t last = std::max(first, Guess(high));
        while (last > first && moValues[last - 1] > high)
            --last;
        while (last < GetCount() && high >= moValues[last])
            ++last;
        return {first, last};
    }

  private:
    double Widen(std::size_t i) const { return static_cast<double>(moValues[i]); }
    std::size_t Guess(float v) const {
        const double at = (static_cast<double>(v) - Widen(0)) * mdfScale;
        return at > 0.0
                   ? static_cast<std::size_t>(std::min(at, static_cast<double>(GetCount() - 1)))
                   : 0;
    }

    std::vector<float> moValues;
    double mdfScale = 0.0;
    bool mbReversed = false;
};

} // namespace kelm::tin::raster

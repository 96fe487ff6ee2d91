#pragma once

#include "tin/bbox.h"
#include "tin/point.h"

#include <limits>

namespace kelm::tin::rules {

/// Range of one coordinate that grows with each value. A NaN takes no part: it fails both tests.
template <typename T>
struct Range {
    T low = std::numeric_limits<T>::max();
    T high = -std::numeric_limits<T>::max();

    void Add(T value) { Add(value, value); }
    void Add(T otherLow, T otherHigh) {
        if (low > otherLow)
            low = otherLow;
        if (otherHigh > high)
            high = otherHigh;
    }
};

/// Box in plan that grows with each point or box.
template <typename T>
struct Extent {
    Range<T> x;
    Range<T> y;

    void Add(const point2_t<T>& point) {
        x.Add(point.x);
        y.Add(point.y);
    }
    void Add(const BBox<T, point2_t<T>>& box) {
        x.Add(box.min.x, box.max.x);
        y.Add(box.min.y, box.max.y);
    }
    point2_t<T> GetMin() const { return {x.low, y.low}; }
    point2_t<T> GetMax() const { return {x.high, y.high}; }
};

} // namespace kelm::tin::rules

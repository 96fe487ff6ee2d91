#pragma once

namespace kelm::containers {

/// A corner in map coordinates, with its height as stored.
template <typename T>
struct KeyPoint {
    T x;
    T y;
    T z;
};

} // namespace kelm::containers

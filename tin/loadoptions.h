#pragma once

#include "tin/point.h"
#include "tin/progress.h"

#include <optional>

namespace kelm::tin {

/// How TinReader::Load is to load, beside what. A plain value; what is not set is as in a load
/// without options.
struct LoadOptions {
    /// XY base of the surface in map coordinates, both finite. Without it, the first corner of the
    /// first triangle is the base, so that each window has another one. A vertex has the same x and
    /// y to the bit in all surfaces of one base that make it of the same corner.
    std::optional<point2_t<double>> base = {};
    /// Is told how far the load is.
    Progress progress = {};
};

} // namespace kelm::tin

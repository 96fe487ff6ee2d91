#pragma once

#include "tin/crossing/lanes.h"
#include "tin/triangle.h"

#include <limits>

namespace kelm::tin::crossing {

/// How a triangle is indexed. The order is that in the array of references.
enum Kind : unsigned {
    K_Tight,  ///< by its box in space
    K_Loose,  ///< by its box in plan: a wall or sliver, whose crossings may have any height
    K_Stale,  ///< apart, since its stored box is not that of its corners
    K_Dropped ///< not at all, since it can have no crossing
};

/// What the build of an index moves about for each triangle.
struct Reference {
    float low[3]; ///< corners of the box in space
    unsigned id;
    float high[3];
    Kind kind;
};

/// @return the reference of a triangle, its box widened by what the rule for ends inside allows
Reference CreateReference(const Triangle& triangle, unsigned id);

/// Box in space that grows with each box; the fourth lane has no meaning.
struct Bounds {
    Float4 low = Fill4(std::numeric_limits<float>::max());
    Float4 high = Fill4(-std::numeric_limits<float>::max());

    void Add(const Reference& reference) {
        Add({Load4(reinterpret_cast<const float*>(&reference)),
             Load4(reinterpret_cast<const float*>(&reference) + 4)});
    }
    void Add(const Bounds& other) {
        low = Least(other.low, low);
        high = Greatest(other.high, high);
    }
    /// @param sides x, y, z and room for a fourth
    void GetSides(float* sides) const { Store4(sides, high - low); }
};

} // namespace kelm::tin::crossing

#pragma once

#include <cstdint>

/// Positions in a vertex array of the three corners of a triangle.
struct Triangle_Id {
    std::uint32_t id0;
    std::uint32_t id1;
    std::uint32_t id2;
};

#pragma once

/// Point in the plane: `float` for surface-local data, `double` for map coordinates.
template <typename T>
struct point2_t {
    T x;
    T y;
};

/// Point in space. `point3_t<float>` is the vertex of a surface: x and y relative to the surface's
/// XY base, z an absolute height.
template <typename T>
struct point3_t {
    T x;
    T y;
    T z;
};

/// Plain box with an inclusive low and high corner.
template <typename P>
struct aabb_t {
    P min;
    P max;
};

static_assert(sizeof(point3_t<float>) == 12, "a surface accounts 12 bytes for a vertex");

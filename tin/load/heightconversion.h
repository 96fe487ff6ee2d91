#pragma once

#include "services/crs.h"
#include "tin/point.h"

class InterpGrid3D;

namespace kelm::tin::load {

/// The elevation factor: a stored height h counts as (h + offset) * scale. An offset of 0 and a
/// scale of 1 change no bit.
struct ElevationFactor {
    double offset;
    double scale;

    bool IsIdentity() const { return offset == 0.0 && scale == 1.0; }
    double Apply(float h) const { return (static_cast<double>(h) + offset) * scale; }
    double Get(float h) const { return IsIdentity() ? static_cast<double>(h) : Apply(h); }
};

/// Vertices of a new surface whose heights are to be changed in place, surface-local.
struct HeightColumn {
    point3_t<float>* vertices;
    unsigned count;
    point2_t<double> base; ///< map coordinates of the local origin
};

/// Applies the elevation factor alone.
void ApplyFactor(const HeightColumn& column, const ElevationFactor& factor);

/// Sends each vertex through the transform. @throw what it throws; std::bad_alloc
void ConvertFewHeights(const HeightColumn& column, const ElevationFactor& factor,
                       ogc::ct::IMathTransform& transform);

/// Sends a grid over the window through the transform and interpolates each vertex in it.
/// @param window box of the surface, surface-local @throw what transform and grid throw
void ConvertManyHeights(const HeightColumn& column, const aabb_t<point2_t<float>>& window,
                        const ElevationFactor& factor, ogc::ct::IMathTransform& transform);

/// Lays out a new grid over a window and a range of heights, and fills it with the heights that the
/// transform gives at its nodes. @param window surface-local, relative to the base
void BuildGrid(const aabb_t<point2_t<float>>& window, const point2_t<double>& base, float zMin,
               float zMax, ogc::ct::IMathTransform& transform, InterpGrid3D& grid);

} // namespace kelm::tin::load

#pragma once

#include "tin/detail/polygon.h"
#include "tin/tinexport.h"
#include "tin/triangleid.h"

#include <vector>

/// Cuts a polygon into triangles by ear clipping (Meisters 1975), in plan.
///
/// Every triangle is counter-clockwise and at least 2^-24 squared map units in area. A polygon is
/// refused if it is not simple, if it has fewer than three points, or if only corners too flat to
/// cut off remain.
/// @param oTriangles point numbers of the polygon's ring are appended, two less than its points. A
/// refused polygon leaves the list alone, except that running out of corners to cut off empties it,
/// earlier entries included
/// @return 0, or -1 for a refused polygon @throw std::bad_alloc
KELM_TIN_EXPORT int Triangulate(const kelm::tin::Polygon<double>& oPolygon,
                                std::vector<Triangle_Id>& oTriangles);

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
/// @param oTriangles receives n - 2 triangles at its end for a ring of n points, as point numbers
/// of the ring. A refused polygon leaves the list as it was. If only flat corners remain, the list
/// is cleared, earlier entries included
/// @return 0, or -1 for a refused polygon @throw std::bad_alloc
KELM_TIN_EXPORT int Triangulate(const kelm::tin::Polygon<double>& oPolygon,
                                std::vector<Triangle_Id>& oTriangles);

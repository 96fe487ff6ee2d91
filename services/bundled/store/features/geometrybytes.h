#pragma once

#include "services/vectorlayer.h"

#include <array>
#include <cstddef>

namespace kelm::store {

/// Reads a triangle from a geometry as a GeoPackage stores it: a header, an envelope or none, and
/// well-known binary (GeoPackage Encoding Standard, clause 2.1.3; ISO 19125-1).
///
/// Only the plainest form is taken: little-endian, a polygon of one ring of four points, with or
/// without heights, and nothing behind it. All else is GDAL's to judge.
/// @param vertices as they are stored; heights are 0 if there are none @param flat are there none?
/// @return false if it is anything else; the outputs are then of no use
bool ReadTriangleBytes(const unsigned char* bytes, std::size_t size,
                       std::array<ZARVertex, 4>& vertices, bool& flat);

} // namespace kelm::store

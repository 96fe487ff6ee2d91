#pragma once

#include "services/vectorlayer.h"

#include <ogr_geometry.h>

#include <algorithm>
#include <cmath>
#include <vector>

namespace kelm::store {

inline bool IsFinite(const ZARVertex& vertex) {
    return std::isfinite(vertex.x) && std::isfinite(vertex.y) && std::isfinite(vertex.z);
}

inline bool AreFinite(const std::vector<ZARVertex>& vertices) {
    return std::all_of(vertices.begin(), vertices.end(), IsFinite);
}

inline bool IsClosedInSpace(const ZARVertex& first, const ZARVertex& last) {
    return first.x == last.x && first.y == last.y && first.z == last.z;
}

/// Copies the vertices of a ring as they are stored. A ring without heights gets 0.
/// @param vertices room for all of them
inline void CopyVertices(const OGRSimpleCurve& ring, ZARVertex* vertices) {
    constexpr int STRIDE = sizeof(ZARVertex);
    ring.getPoints(&vertices->x, STRIDE, &vertices->y, STRIDE, &vertices->z, STRIDE);
}

/// @param vertices replaced
inline void CopyVertices(const OGRSimpleCurve& ring, std::vector<ZARVertex>& vertices) {
    vertices.resize(static_cast<std::size_t>(ring.getNumPoints()));
    CopyVertices(ring, vertices.data());
}

} // namespace kelm::store

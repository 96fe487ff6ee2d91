#include "services/bundled/store/facets/ring.h"

#include <algorithm>
#include <cmath>

namespace kelm::store {

namespace {

bool IsFinite(const ZARVertex& vertex) {
    return std::isfinite(vertex.x) && std::isfinite(vertex.y) && std::isfinite(vertex.z);
}

/// Heights are not compared. A ring that ends above its start is closed in plan, and another vertex
/// would make a quadrangle of a triangle.
bool IsClosed(const std::vector<ZARVertex>& vertices) {
    return vertices.front().x == vertices.back().x && vertices.front().y == vertices.back().y;
}

} // namespace

void CopyVertices(const OGRSimpleCurve& ring, std::vector<ZARVertex>& vertices) {
    constexpr int STRIDE = sizeof(ZARVertex);
    vertices.resize(static_cast<std::size_t>(ring.getNumPoints()));
    ZARVertex* first = vertices.data();
    ring.getPoints(&first->x, STRIDE, &first->y, STRIDE, &first->z, STRIDE);
}

bool AreFinite(const std::vector<ZARVertex>& vertices) {
    return std::all_of(vertices.begin(), vertices.end(), IsFinite);
}

FacetFault ReadRing(const OGRSimpleCurve& ring, std::vector<ZARVertex>& vertices) {
    CopyVertices(ring, vertices);
    if (!AreFinite(vertices))
        return FacetFault::NotFinite;
    if (!IsClosed(vertices))
        vertices.push_back(vertices.front());
    return vertices.size() < 4 ? FacetFault::FewCorners : FacetFault::None;
}

} // namespace kelm::store

#include "services/bundled/store/facets/ring.h"

#include "services/bundled/store/features/vertices.h"

namespace kelm::store {

namespace {

/// Heights are not compared. A ring that ends above its start is closed in plan, and another vertex
/// would make a quadrangle of a triangle.
bool IsClosed(const std::vector<ZARVertex>& vertices) {
    return vertices.front().x == vertices.back().x && vertices.front().y == vertices.back().y;
}

} // namespace

FacetFault ReadRing(const OGRSimpleCurve& ring, std::vector<ZARVertex>& vertices) {
    CopyVertices(ring, vertices);
    if (!AreFinite(vertices))
        return FacetFault::NotFinite;
    if (!IsClosed(vertices))
        vertices.push_back(vertices.front());
    return vertices.size() < 4 ? FacetFault::FewCorners : FacetFault::None;
}

} // namespace kelm::store

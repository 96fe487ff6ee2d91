#include "services/bundled/store/features/storedfeature.h"

#include "services/bundled/store/features/geometrybytes.h"
#include "services/bundled/store/features/vertices.h"

#include <algorithm>

namespace kelm::store {

namespace {

/// @return the only ring of a polygon if it has four points, else null
const OGRSimpleCurve* FindRingOfFour(const OGRGeometry* geometry) {
    if (geometry == nullptr)
        return nullptr;
    const OGRwkbGeometryType type = wkbFlatten(geometry->getGeometryType());
    if (type != wkbPolygon && type != wkbTriangle)
        return nullptr;
    const OGRPolygon& polygon = *geometry->toPolygon();
    const OGRLinearRing* ring = polygon.getExteriorRing();
    const bool fits =
        ring != nullptr && ring->getNumPoints() == 4 && polygon.getNumInteriorRings() == 0;
    return fits ? ring : nullptr;
}

} // namespace

void StoredFeature::TakeTriangle() {
    const OGRSimpleCurve* ring = FindRingOfFour(mpoFeature->GetGeometryRef());
    if (ring == nullptr)
        return;
    CopyVertices(*ring, maTriangle.data());
    mbTriangle = HasTriangle();
    mbFlat = !ring->Is3D();
    if (mbTriangle)
        mpoFeature.reset();
}

bool StoredFeature::TakeTriangle(const unsigned char* bytes, int size) {
    mbTriangle = ReadTriangleBytes(bytes, static_cast<std::size_t>(size), maTriangle, mbFlat) &&
                 HasTriangle();
    return mbTriangle;
}

bool StoredFeature::HasTriangle() const {
    return IsClosedInSpace(maTriangle.front(), maTriangle.back()) &&
           std::all_of(maTriangle.begin(), maTriangle.end(), IsFinite);
}

} // namespace kelm::store

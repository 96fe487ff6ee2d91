#pragma once

#include "services/vectorlayer.h"

#include <ogr_feature.h>

#include <array>
#include <cstdint>
#include <utility>

namespace kelm::store {

/// A feature as it was read.
///
/// Most layers hold triangles, one a feature. Their corners are taken at once, so that GDAL's
/// objects live no longer than a moment.
struct StoredFeature {
    std::int64_t mnId = 0;
    /// Null for a triangle, and behind the last feature of the layer.
    OGRFeatureUniquePtr mpoFeature;
    /// Is it a triangle that is stored as the library takes it, all finite?
    bool mbTriangle = false;
    bool mbFlat = false;                 ///< a triangle that is stored without heights
    std::array<ZARVertex, 4> maTriangle; ///< its corners, and the first one again

    bool IsEnd() const { return !mpoFeature && !mbTriangle; }

    /// Becomes a feature of GDAL; null is the end of the layer.
    void Assign(OGRFeatureUniquePtr feature) {
        mnId = feature ? feature->GetFID() : 0;
        mpoFeature = std::move(feature);
        mbTriangle = false;
    }
    /// Drops GDAL's feature if it is a triangle, and keeps the corners.
    void TakeTriangle();
    /// Becomes the triangle of a geometry's bytes, without an id. @return false, and then nothing
    /// has changed but maTriangle, if the geometry is anything else; see ReadTriangleBytes
    bool TakeTriangle(const unsigned char* bytes, int size);

  private:
    bool HasTriangle() const;
};

} // namespace kelm::store

#pragma once

#include "services/bundled/store/features/storedfeature.h"

#include <gdal_priv.h>
#include <ogrsf_frmts.h>

#include <cstdint>
#include <memory>
#include <string>

namespace kelm::store {

/// Reads a layer of a GeoPackage by a query for the bytes of its geometries. A triangle is taken
/// from its bytes, in about half the time that GDAL needs to make a geometry of them. All else,
/// damaged bytes included, comes as the layer gives it.
///
/// Rows come in the order of the layer. To be called in the scope of a GdalCall.
class GeometryQuery {
  public:
    /// @return null if the layer has no column of feature ids
    static std::unique_ptr<GeometryQuery> Create(GDALDataset& dataset, OGRLayer& layer);

    /// Goes to the position in front of the first feature. @return false if the query cannot serve
    bool Start();
    /// Gives the result of the query back.
    void Stop() { mpoResult.reset(); }
    /// Reads the next feature; the end of the layer if there is none or the reading fails.
    void Read(StoredFeature& stored);
    /// @return false if so many features are no triangles that the layer reads quicker by itself
    bool IsWorthwhile() const;

  private:
    struct ResultRelease {
        GDALDataset* mpoDataset;
        void operator()(OGRLayer* result) const { mpoDataset->ReleaseResultSet(result); }
    };

    GeometryQuery(GDALDataset& dataset, OGRLayer& layer);
    bool Fits(OGRLayer& result) const;
    void ReadByLayer(std::int64_t id, StoredFeature& stored);

    GDALDataset& moDataset;
    OGRLayer& moLayer;
    std::string moQuery;
    std::unique_ptr<OGRLayer, ResultRelease> mpoResult;
    std::int64_t mnRead = 0;   ///< by all queries
    std::int64_t mnOthers = 0; ///< of them, those that were no triangles
};

} // namespace kelm::store

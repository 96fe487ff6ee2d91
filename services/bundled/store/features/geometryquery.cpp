#include "services/bundled/store/features/geometryquery.h"

#include "services/bundled/store/runs/sqlname.h"

namespace kelm::store {

namespace {

/// GDAL would make a geometry of bytes that look like one, so they get a byte in front.
constexpr int IN_FRONT = 1;

std::string CreateQuery(OGRLayer& layer) {
    return "SELECT " + QuoteName(layer.GetFIDColumn()) + " AS fid, CAST(x'00' || " +
           QuoteName(layer.GetGeometryColumn()) + " AS BLOB) FROM " + QuoteName(layer.GetName());
}

} // namespace

std::unique_ptr<GeometryQuery> GeometryQuery::Create(GDALDataset& dataset, OGRLayer& layer) {
    if (*layer.GetFIDColumn() == '\0' || *layer.GetGeometryColumn() == '\0')
        return nullptr;
    return std::unique_ptr<GeometryQuery>(new GeometryQuery(dataset, layer));
}

GeometryQuery::GeometryQuery(GDALDataset& dataset, OGRLayer& layer)
    : moDataset(dataset), moLayer(layer), moQuery(CreateQuery(layer)),
      mpoResult(nullptr, ResultRelease{&dataset}) {}

bool GeometryQuery::Start() {
    mpoResult.reset();
    mpoResult.reset(moDataset.ExecuteSQL(moQuery.c_str(), nullptr, nullptr));
    return mpoResult != nullptr && Fits(*mpoResult);
}

/// GDAL tells the type of a column by its first row, and the ids by the name of theirs.
bool GeometryQuery::Fits(OGRLayer& result) const {
    const OGRFeatureDefn& columns = *result.GetLayerDefn();
    return columns.GetFieldCount() == 1 && columns.GetGeomFieldCount() == 0 &&
           columns.GetFieldDefn(0)->GetType() == OFTBinary && *result.GetFIDColumn() != '\0';
}

void GeometryQuery::Read(StoredFeature& stored) {
    stored.Assign(nullptr);
    const OGRFeatureUniquePtr row(mpoResult ? mpoResult->GetNextFeature() : nullptr);
    if (!row)
        return;
    ++mnRead;
    int size = 0;
    const GByte* bytes = row->GetFieldAsBinary(0, &size);
    if (size > IN_FRONT && stored.TakeTriangle(bytes + IN_FRONT, size - IN_FRONT))
        stored.mnId = row->GetFID();
    else
        ReadByLayer(row->GetFID(), stored);
}

/// A row without a feature must not pass for the end of the layer.
void GeometryQuery::ReadByLayer(std::int64_t id, StoredFeature& stored) {
    ++mnOthers;
    stored.Assign(OGRFeatureUniquePtr(moLayer.GetFeature(id)));
    if (stored.IsEnd())
        CPLError(CE_Failure, CPLE_AppDefined, "feature %lld is in the table but cannot be found",
                 static_cast<long long>(id));
}

bool GeometryQuery::IsWorthwhile() const {
    constexpr std::int64_t FEW = 64;
    return mnOthers < FEW || mnOthers < mnRead / 4;
}

} // namespace kelm::store

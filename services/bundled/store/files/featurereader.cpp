#include "services/bundled/store/files/featurereader.h"

#include "services/exception.h"
#include "services/reporting.h"

#include <cpl_error.h>

#include <utility>

namespace kelm::store {

namespace {

constexpr const char* SOURCE = "services/bundled/store/files/featurereader";

constexpr std::size_t MOST_AHEAD = 64;
constexpr std::size_t MOST_BYTES_AHEAD = 65536;

/// Tells drivers that can skip attributes and styles to do so: nobody asks for them.
void IgnoreAttributes(OGRLayer& layer) {
    if (!layer.TestCapability(OLCIgnoreFields))
        return;
    const OGRFeatureDefn& definition = *layer.GetLayerDefn();
    std::vector<const char*> names;
    for (int field = 0; field < definition.GetFieldCount(); ++field)
        names.push_back(definition.GetFieldDefn(field)->GetNameRef());
    names.push_back("OGR_STYLE");
    names.push_back(nullptr);
    static_cast<void>(layer.SetIgnoredFields(names.data()));
}

std::size_t CountBytes(const OGRFeature& feature) {
    const OGRGeometry* geometry = feature.GetGeometryRef();
    return geometry ? geometry->WkbSize() : 0;
}

} // namespace

FeatureReader::FeatureReader(Dataset& dataset, OGRLayer& layer)
    : moDataset(dataset), moLayer(layer),
      moSubject(FormatString("layer %s of file %s", layer.GetName(), dataset.GetName().c_str())) {
    Warnings warnings;
    {
        GdalCall call;
        IgnoreAttributes(layer);
        if (dataset.GetFormat().mbExactCount)
            mnKnown = layer.GetFeatureCount(FALSE);
        TestCall(call);
        warnings = call.TakeWarnings();
    }
    PassOn(warnings, "The " + moSubject);
}

void FeatureReader::Restart() {
    moDataset.EndTurn();
    moFeatures.clear();
    mnNext = 0;
    mnRead = 0;
    moWarnings.clear();
}

const OGRFeature* FeatureReader::Next() {
    if (mnNext == moFeatures.size())
        ReadAhead();
    return moFeatures[mnNext++].get();
}

Warnings FeatureReader::TakeWarnings() {
    return std::exchange(moWarnings, {});
}

void FeatureReader::ReadAhead() {
    moFeatures.clear();
    mnNext = 0;
    GdalCall call;
    if (!moDataset.IsTurnOf(*this))
        TakeTurn();
    FetchBatch();
    moWarnings = call.TakeWarnings();
    TestCall(call);
}

void FeatureReader::FetchBatch() {
    for (std::size_t bytes = 0; moFeatures.size() < MOST_AHEAD && bytes < MOST_BYTES_AHEAD;) {
        Fetch();
        if (!moFeatures.back())
            return TestEnd();
        bytes += CountBytes(*moFeatures.back());
    }
}

void FeatureReader::TestCall(const GdalCall& call) const {
    if (call.HasFailed())
        throw DataException(FormatString("The %s cannot be read, near feature number %lld: %s",
                                         moSubject.c_str(), static_cast<long long>(mnRead),
                                         call.GetFailures().c_str()),
                            SOURCE, __PRETTY_FUNCTION__, __LINE__);
}

void FeatureReader::TakeTurn() {
    moDataset.TakeTurn(*this);
    moLayer.ResetReading();
    const std::int64_t known = std::exchange(mnRead, 0);
    while (mnRead < known) {
        Fetch();
        if (!moFeatures.back())
            break;
        moFeatures.clear();
    }
}

void FeatureReader::TestEnd() const {
    if (mnKnown >= 0 && mnRead != mnKnown)
        CPLError(CE_Failure, CPLE_FileIO, "the file ends early, it should have %lld features",
                 static_cast<long long>(mnKnown));
}

void FeatureReader::Fetch() {
    OGRFeatureUniquePtr feature(moLayer.GetNextFeature());
    moFeatures.push_back(std::move(feature));
    mnRead += moFeatures.back() != nullptr;
}

} // namespace kelm::store

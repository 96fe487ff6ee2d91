#include "services/bundled/store/files/featurereader.h"

#include "services/exception.h"
#include "services/reporting.h"

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
    Prepare(ReadCrs());
    PassOn(std::exchange(moWarnings, {}), "The " + moSubject);
}

/// Drivers read the CRS of a layer when they are first asked about the layer. One that cannot be
/// read is no reason to refuse the layer. @return false if something could not be read
bool FeatureReader::ReadCrs() {
    GdalCall call;
    static_cast<void>(moLayer.GetSpatialRef());
    moWarnings = call.TakeWarnings();
    if (!call.HasFailed())
        return true;
    AddWarning(moWarnings,
               "its CRS cannot be read, so it counts as a layer without one: " + call.GetFailures(),
               1);
    return false;
}

/// @param sound if false, the features are counted: a layer of which more than the CRS cannot be
/// read must not pass for an empty one
void FeatureReader::Prepare(bool sound) {
    GdalCall call;
    IgnoreAttributes(moLayer);
    if (!sound || moDataset.GetFormat().Has(FT_ExactCount))
        mnKnown = moLayer.GetFeatureCount(sound ? FALSE : TRUE);
    TestFailure(call.TakeFailures());
    AddWarnings(call);
}

void FeatureReader::AddWarnings(GdalCall& call) {
    for (const auto& [text, times] : call.TakeWarnings())
        AddWarning(moWarnings, text, times);
}

void FeatureReader::Restart() {
    moDataset.EndTurn();
    moFeatures.clear();
    mnNext = 0;
    mnRead = 0;
    mnSkipped = 0;
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
    moFailure.clear();
    moWarnings.clear();
    GdalCall call(moDataset.GetFormat().mpszRings);
    if (!moDataset.IsTurnOf(*this))
        TakeTurn(call);
    FetchBatch(call);
    AddWarnings(call);
    TestFailure(moFailure);
}

void FeatureReader::TestFailure(const std::string& failures) const {
    if (!failures.empty())
        throw DataException(FormatString("The %s cannot be read, near feature number %lld: %s",
                                         moSubject.c_str(), static_cast<long long>(mnRead),
                                         failures.c_str()),
                            SOURCE, __PRETTY_FUNCTION__, __LINE__);
}

void FeatureReader::TakeTurn(GdalCall& call) {
    moDataset.TakeTurn(*this);
    moLayer.ResetReading();
    const std::int64_t known = std::exchange(mnRead, 0);
    mnSkipped = 0;
    while (mnRead < known && Fetch(call) != nullptr)
        moFeatures.clear();
}

void FeatureReader::FetchBatch(GdalCall& call) {
    for (std::size_t bytes = 0; moFeatures.size() < MOST_AHEAD && bytes < MOST_BYTES_AHEAD;) {
        const OGRFeature* feature = Fetch(call);
        if (feature == nullptr)
            return;
        bytes += CountBytes(*feature);
    }
}

/// @return the next feature, which is kept, or null behind the last one or if the reading fails
const OGRFeature* FeatureReader::Fetch(GdalCall& call) {
    OGRFeatureUniquePtr feature(moLayer.GetNextFeature());
    std::string failures = call.TakeFailures();
    while (!feature && !failures.empty() && SkipsDamaged()) {
        ++mnSkipped;
        AddWarning(moWarnings, "a feature cannot be read: " + failures, 1);
        feature.reset(moLayer.GetNextFeature());
        failures = call.TakeFailures();
    }
    mnRead += feature != nullptr;
    if (!feature)
        TestEnd(failures);
    else if (!failures.empty())
        MarkDamage(*feature, failures);
    moFeatures.push_back(std::move(feature));
    return moFeatures.back().get();
}

/// The number of features bounds the reading: a driver could fail for ever.
bool FeatureReader::SkipsDamaged() const {
    return moDataset.GetFormat().Has(FT_SkipsDamaged) && mnRead + mnSkipped < mnKnown;
}

void FeatureReader::MarkDamage(OGRFeature& feature, const std::string& failures) {
    if (moDataset.GetFormat().Has(FT_ReadsAhead))
        return AddWarning(moWarnings, failures, 1);
    feature.SetGeometryDirectly(nullptr);
    AddWarning(moWarnings,
               FormatString("feature %lld cannot be read: %s",
                            static_cast<long long>(feature.GetFID()), failures.c_str()),
               1);
}

void FeatureReader::TestEnd(const std::string& failures) {
    moFailure = failures;
    if (mnKnown >= 0 && mnRead + mnSkipped != mnKnown)
        moFailure += FormatString("%sthe file ends early, it should have %lld features",
                                  failures.empty() ? "" : "; ", static_cast<long long>(mnKnown));
}

} // namespace kelm::store

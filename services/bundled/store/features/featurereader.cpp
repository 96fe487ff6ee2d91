#include "services/bundled/store/features/featurereader.h"

#include "services/exception.h"
#include "services/reporting.h"

#include <utility>

namespace kelm::store {

namespace {

constexpr const char* SOURCE = "services/bundled/store/features/featurereader";

constexpr std::size_t MOST_AHEAD = 256;
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

std::size_t CountBytes(const StoredFeature& stored) {
    const OGRGeometry* geometry = stored.mpoFeature ? stored.mpoFeature->GetGeometryRef() : nullptr;
    return geometry ? geometry->WkbSize() : sizeof(stored.maTriangle);
}

} // namespace

FeatureReader::FeatureReader(Dataset& dataset, OGRLayer& layer)
    : moDataset(dataset), moLayer(layer),
      moSubject(FormatString("layer %s of file %s", layer.GetName(), dataset.GetName().c_str())),
      moAhead(MOST_AHEAD) {
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
    if (moDataset.GetFormat().mpfnRuns != nullptr)
        mpoRuns = moDataset.GetFormat().mpfnRuns(moLayer);
    if (moDataset.GetFormat().Has(FT_GeometryBytes))
        mpoQuery = GeometryQuery::Create(moDataset.GetHandle(), moLayer);
    if (!sound || moDataset.GetFormat().Has(FT_ExactCount))
        mnKnown = moLayer.GetFeatureCount(sound ? FALSE : TRUE);
    TestFailure(call.TakeFailures());
    AddWarnings(call);
}

void FeatureReader::AddWarnings(GdalCall& call) {
    for (const auto& [text, times] : call.TakeWarnings())
        AddWarning(moWarnings, text, times);
}

void FeatureReader::Restart(const FeatureRun& run) {
    Restart();
    moRun = run;
}

void FeatureReader::Restart() {
    moDataset.EndTurn();
    moRun.reset();
    mnAhead = 0;
    mnNext = 0;
    mnRead = 0;
    mnSkipped = 0;
    moWarnings.clear();
}

void FeatureReader::ReadAhead() {
    mnAhead = 0;
    mnNext = 0;
    moFailure.clear();
    moWarnings.clear();
    GdalCall call(moDataset.GetFormat().mpszRings);
    if (mpoQuery && !mpoQuery->IsWorthwhile()) {
        mpoQuery.reset();
        moDataset.EndTurn();
    }
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
    StartReading(call);
    const std::int64_t known = std::exchange(mnRead, 0);
    mnSkipped = 0;
    while (mnRead < known && Fetch(call))
        mnAhead = 0;
    if (known == 0)
        return;
    // What is skipped was warned of when it was read.
    moWarnings.clear();
    static_cast<void>(call.TakeWarnings());
}

void FeatureReader::StartReading(GdalCall& call) {
    if (mpoQuery)
        mpoQuery->Stop();
    if (moRun)
        return mpoRuns->Start(*moRun);
    if (mpoRuns)
        mpoRuns->Stop();
    if (mpoQuery && mpoQuery->Start())
        return;
    mpoQuery.reset();
    static_cast<void>(call.TakeFailures()); // of the query: the layer has its own
    moLayer.ResetReading();
}

void FeatureReader::ReadFeature(StoredFeature& stored) {
    if (moRun)
        stored.Assign(mpoRuns->Next());
    else if (mpoQuery)
        mpoQuery->Read(stored);
    else
        stored.Assign(OGRFeatureUniquePtr(moLayer.GetNextFeature()));
}

void FeatureReader::FetchBatch(GdalCall& call) {
    for (std::size_t bytes = 0; mnAhead < MOST_AHEAD && bytes < MOST_BYTES_AHEAD;) {
        if (!Fetch(call))
            return;
        bytes += CountBytes(moAhead[mnAhead - 1]);
    }
}

/// Reads the next feature, or the end of the layer. @return false at the end or if the reading
/// fails
bool FeatureReader::Fetch(GdalCall& call) {
    StoredFeature& stored = moAhead[mnAhead++];
    ReadFeature(stored);
    if (stored.IsEnd() || call.HasFailed())
        return FetchFailed(call, stored);
    ++mnRead;
    if (!stored.mbTriangle)
        stored.TakeTriangle();
    return true;
}

/// Goes on where something has failed, or the layer seems to end. @return as Fetch
bool FeatureReader::FetchFailed(GdalCall& call, StoredFeature& stored) {
    std::string failures = call.TakeFailures();
    while (stored.IsEnd() && !failures.empty() && SkipsDamaged()) {
        ++mnSkipped;
        AddWarning(moWarnings, "a feature cannot be read: " + failures, 1);
        ReadFeature(stored);
        failures = call.TakeFailures();
    }
    if (stored.IsEnd()) {
        TestEnd(failures);
        return false;
    }
    ++mnRead;
    if (!failures.empty())
        MarkDamage(stored, failures);
    return true;
}

/// The number of features bounds the reading: a driver could fail for ever.
bool FeatureReader::SkipsDamaged() const {
    return moDataset.GetFormat().Has(FT_SkipsDamaged) && mnRead + mnSkipped < mnKnown;
}

void FeatureReader::MarkDamage(StoredFeature& stored, const std::string& failures) {
    if (stored.mbTriangle || moDataset.GetFormat().Has(FT_ReadsAhead))
        return AddWarning(moWarnings, failures, 1);
    stored.mpoFeature->SetGeometryDirectly(nullptr);
    AddWarning(moWarnings,
               FormatString("feature %lld cannot be read: %s", static_cast<long long>(stored.mnId),
                            failures.c_str()),
               1);
}

void FeatureReader::TestEnd(const std::string& failures) {
    moFailure = failures;
    if (moRun)
        return TestRunEnd();
    if (mnKnown >= 0 && mnRead + mnSkipped != mnKnown)
        moFailure += FormatString("%sthe file ends early, it should have %lld features",
                                  failures.empty() ? "" : "; ", static_cast<long long>(mnKnown));
}

void FeatureReader::TestRunEnd() {
    if (mnRead != moRun->mnFeatures)
        moFailure += FormatString("%sthe file has changed since it was opened: there are %lld "
                                  "features from %lld to %lld, there were %lld",
                                  moFailure.empty() ? "" : "; ", static_cast<long long>(mnRead),
                                  static_cast<long long>(moRun->mnFirst),
                                  static_cast<long long>(moRun->mnLast),
                                  static_cast<long long>(moRun->mnFeatures));
}

} // namespace kelm::store

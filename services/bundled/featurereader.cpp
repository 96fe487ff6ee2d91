#include "services/bundled/featurereader.h"

#include "services/bundled/datasetfile.h"
#include "services/bundled/formats.h"
#include "services/exception.h"
#include "services/reporting.h"

#include <cpl_error.h>

#include <utility>

namespace kelm::store {

namespace {

constexpr std::size_t knMostAhead = 64;
constexpr std::size_t knMostBytesAhead = 65536;

/// Attributes and styles are never asked for, so drivers that can skip them shall.
void IgnoreAttributes(OGRLayer& oLayer) {
    if (!oLayer.TestCapability(OLCIgnoreFields))
        return;
    const OGRFeatureDefn& oDefinition = *oLayer.GetLayerDefn();
    std::vector<const char*> oNames;
    for (int nField = 0; nField < oDefinition.GetFieldCount(); ++nField)
        oNames.push_back(oDefinition.GetFieldDefn(nField)->GetNameRef());
    oNames.push_back("OGR_STYLE");
    oNames.push_back(nullptr);
    static_cast<void>(oLayer.SetIgnoredFields(oNames.data()));
}

std::size_t CountBytes(const OGRFeature& oFeature) {
    const OGRGeometry* poGeometry = oFeature.GetGeometryRef();
    return poGeometry ? poGeometry->WkbSize() : 0;
}

} // namespace

FeatureReader::FeatureReader(_iobuf& oFile, OGRLayer& oLayer)
    : moFile(oFile), moLayer(oLayer),
      moSubject(FormatString("layer %s of file %s", oLayer.GetName(), oFile.moName.c_str())) {
    Warnings oWarnings;
    {
        GdalCall oCall;
        IgnoreAttributes(oLayer);
        if (oFile.moFormat.mbExactCount)
            mnKnown = oLayer.GetFeatureCount(FALSE);
        TestCall(oCall);
        oWarnings = oCall.TakeWarnings();
    }
    PassOn(oWarnings, "The " + moSubject);
}

void FeatureReader::Restart() {
    moFile.mpoReading = nullptr;
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
    GdalCall oCall;
    if (moFile.mpoReading != this)
        TakeTurn();
    for (std::size_t nBytes = 0; moFeatures.size() < knMostAhead && nBytes < knMostBytesAhead;) {
        Fetch();
        if (!moFeatures.back()) {
            TestEnd();
            break;
        }
        nBytes += CountBytes(*moFeatures.back());
    }
    moWarnings = oCall.TakeWarnings();
    TestCall(oCall);
}

void FeatureReader::TestCall(const GdalCall& oCall) const {
    if (oCall.HasFailed())
        throw DataException(FormatString("The %s cannot be read, near feature number %lld: %s",
                                         moSubject.c_str(), static_cast<long long>(mnRead),
                                         oCall.GetFailures().c_str()),
                            "services/bundled/featurereader", __PRETTY_FUNCTION__, __LINE__);
}

void FeatureReader::TakeTurn() {
    moFile.mpoReading = this;
    moLayer.ResetReading();
    const std::int64_t nKnown = std::exchange(mnRead, 0);
    while (mnRead < nKnown) {
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
    OGRFeatureUniquePtr poFeature(moLayer.GetNextFeature());
    moFeatures.push_back(std::move(poFeature));
    mnRead += moFeatures.back() != nullptr;
}

} // namespace kelm::store

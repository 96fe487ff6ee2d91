#include "services/bundled/store/storelayer.h"

#include "services/exception.h"
#include "services/reporting.h"

#include <cpl_conv.h>

#include <chrono>
#include <utility>

namespace kelm::store {

namespace {

constexpr const char* SOURCE = "services/bundled/store/storelayer";

OGRLayer& FindLayer(const Dataset& dataset, int segment) {
    return *dataset.GetLayers()[static_cast<std::size_t>(segment) - 1];
}

std::int64_t GetNow() {
    const auto now = std::chrono::system_clock::now().time_since_epoch();
    return std::chrono::duration_cast<std::chrono::nanoseconds>(now).count();
}

} // namespace

StoreLayer::StoreLayer(_iobuf& file, Dataset& dataset, int segment, const ProgressCall& progress)
    : moFile(file), moDataset(dataset), mnSegment(segment),
      moWalk(dataset, FindLayer(dataset, segment)), mnOpened(GetNow()), moStamp(dataset.GetStamp()),
      moSurvey(SurveyLayer(moWalk, progress)) {
    shapeCount = moSurvey.mnShapes;
    shapeCountValid = 1;
}

StoreLayer::StoreLayer(_iobuf& file, Dataset& dataset, HandedSurvey survey)
    : moFile(file), moDataset(dataset), mnSegment(survey.moOrigin.mnSegment),
      moWalk(dataset, FindLayer(dataset, mnSegment)), mnOpened(GetNow()),
      moStamp(survey.moOrigin.moStamp), moSurvey(std::move(survey.moSurvey)) {
    moWalk.GetFacets().SetWhole(std::move(survey.moWhole));
    shapeCount = moSurvey.mnShapes;
    shapeCountValid = 1;
}

std::string StoreLayer::GetSurvey() const {
    const SurveyOrigin origin{CPLGetFilename(moDataset.GetName().c_str()),
                              moWalk.GetReader().GetLayer().GetName(), mnSegment, moStamp};
    return WriteSurvey(origin, moSurvey, moWalk.GetFacets().GetWhole());
}

void StoreLayer::SetWindow(const ZARVertex* low, const ZARVertex* high) {
    moRuns.reset();
    mnId = -1;
    if (low == nullptr || high == nullptr || !moWalk.GetReader().HasRuns() ||
        !moSurvey.moBlocks.AreRising() || moDataset.GetStamp() != moStamp)
        return;
    std::vector<FeatureRun> runs = moSurvey.moBlocks.Find(*low, *high);
    std::int64_t features = 0;
    for (const FeatureRun& run : runs)
        features += run.mnFeatures;
    if (features <= moSurvey.moBlocks.GetFeatureCount() / 2)
        moRuns = std::move(runs);
}

int StoreLayer::CountShapes(const ZARVertex& low, const ZARVertex& high) const {
    return static_cast<int>(moSurvey.moBlocks.CountShapes(low, high, moSurvey.mnShapes));
}

int StoreLayer::GetFirst() {
    Restart();
    return Step();
}

void StoreLayer::Restart() {
    mnRun = 0;
    mbKept = !moRuns && moSurvey.moKept.AreWhole() && IsUntouched();
    if (mbKept)
        return moSurvey.moKept.Restart();
    moSurvey.moKept.Drop();
    moWalk.Restart();
}

bool StoreLayer::IsUntouched() const {
    const FileStamp stamp = moDataset.GetStamp();
    return stamp == moStamp && stamp.AreOlderThan(mnOpened);
}

bool StoreLayer::Advance() {
    if (!moSurvey.IsRead())
        return false;
    if (mbKept)
        return moSurvey.moKept.Advance();
    if (!moRuns)
        return moWalk.Advance();
    while (mnRun == 0 || !moWalk.Advance()) {
        if (mnRun == moRuns->size())
            return false;
        moWalk.Restart((*moRuns)[mnRun++]);
    }
    return true;
}

int StoreLayer::GetBehind(int id) {
    Seek(id);
    return Step();
}

ZARShape& StoreLayer::GetShape(int id) {
    Seek(id);
    const FacetFault fault = ReadShape();
    if (fault != FacetFault::None)
        throw DataException(FormatString("Shape %d (feature %lld) of %s cannot be used: %s", id,
                                         static_cast<long long>(GetFeature()), GetSubject().c_str(),
                                         GetFaultText(fault)),
                            SOURCE, __PRETTY_FUNCTION__, __LINE__);
    moShape = {moVertices.data(), static_cast<int>(moVertices.size())};
    return moShape;
}

FacetFault StoreLayer::ReadShape() {
    return mbKept ? moSurvey.moKept.Read(moVertices) : ReadFacet(moWalk.GetFacet(), moVertices);
}

int StoreLayer::Step() {
    mnId = -1;
    const bool more = Advance();
    const std::size_t number = mbKept ? moSurvey.moKept.GetFacetNumber() : moWalk.GetFacetNumber();
    const int id = more ? moSurvey.moIds.GetId(GetFeature(), number, GetShapes()) : -1;
    TestUnchanged(more, id);
    mnId = id;
    return id;
}

/// Some formats end early without an error; that would pass for a smaller surface.
void StoreLayer::TestUnchanged(bool more, int id) const {
    if (more ? id < 0 : !moRuns && GetShapes() != moSurvey.mnShapes)
        throw DataException(FormatString("The %s has changed since it was opened: there were %d "
                                         "shapes",
                                         GetSubject().c_str(), moSurvey.mnShapes),
                            SOURCE, __PRETTY_FUNCTION__, __LINE__);
}

void StoreLayer::Seek(int id) {
    if (id >= 0 && id == mnId)
        return;
    // A shape that is asked for out of turn may lie beside the window. Ids rise along the walk, so
    // one behind the present is found by walking on.
    if (moRuns || mnId < 0 || id < mnId) {
        moRuns.reset();
        Restart();
    }
    while (id >= 0 && Step() >= 0 && mnId < id)
        continue;
    if (id < 0 || mnId != id)
        throw DataException(FormatString("The %s has no shape %d", GetSubject().c_str(), id),
                            SOURCE, __PRETTY_FUNCTION__, __LINE__);
}

} // namespace kelm::store

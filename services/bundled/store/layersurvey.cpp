#include "services/bundled/store/layersurvey.h"

#include "services/bundled/store/facets/refusallog.h"
#include "services/bundled/store/layertype.h"
#include "services/exception.h"
#include "services/reporting.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <utility>

namespace kelm::store {

namespace {

constexpr const char* SOURCE = "services/bundled/store/layersurvey";

/// Extents that grow with each shape.
struct Extents {
    static constexpr double MOST = std::numeric_limits<double>::max();
    ZARVertex moLow{MOST, MOST, MOST};
    ZARVertex moHigh{-MOST, -MOST, -MOST};

    void Add(const ZARVertex& vertex) {
        moLow = {std::min(moLow.x, vertex.x), std::min(moLow.y, vertex.y),
                 std::min(moLow.z, vertex.z)};
        moHigh = {std::max(moHigh.x, vertex.x), std::max(moHigh.y, vertex.y),
                  std::max(moHigh.z, vertex.z)};
    }
};

/// Tells the progress some hundred times, however many features there are.
class Meter {
  public:
    /// @param features -1 if that is not known
    Meter(const ProgressCall& progress, std::int64_t features)
        : moProgress(progress), mnAll(features) {}

    void Count() {
        if (++mnDone < mnNext)
            return;
        constexpr std::int64_t LEAST_STEP = 4096;
        mnNext = mnDone + std::max({LEAST_STEP, mnAll / 100, mnDone / 100});
        if (mnAll > 0)
            mdfShare = std::min(static_cast<double>(mnDone) / static_cast<double>(mnAll), 1.0);
        moProgress.Tell(mdfShare);
    }
    void Finish() const { moProgress.Tell(1.0); }

  private:
    ProgressCall moProgress;
    std::int64_t mnAll;
    std::int64_t mnDone = 0;
    std::int64_t mnNext = 1;
    double mdfShare = 0.0;
};

/// One survey under way.
class Survey {
  public:
    Survey(LayerWalk& walk, const ProgressCall& progress)
        : moWalk(walk), moMeter(progress, walk.GetReader().GetKnownCount()),
          moRefusals(walk.GetReader().GetSubject()) {}
    LayerSurvey Run();

  private:
    void Walk();
    void AddShape();
    void AddFeature();
    void TestCount() const;
    void TakeWarnings();
    void FinishWarnings();
    void AddRing(bool flat);
    double ComputeArea() const;
    LayerSurvey GetResult();
    void WarnOfHeights() const;
    void WarnOfColumns() const;
    void ReportIds() const;
    const char* GetSubject() const { return moWalk.GetReader().GetSubject().c_str(); }
    OGRLayer& GetLayer() const { return moWalk.GetReader().GetLayer(); }

    LayerWalk& moWalk;
    Meter moMeter;
    Warnings moWarnings;
    RefusalLog moRefusals;
    LayerType moType;
    ShapeIds moIds;
    FeatureBlocks moBlocks;
    KeptFacets moKept;
    Extents moExtents;
    std::vector<ZARVertex> moVertices;
    std::int64_t mnDeliverable = 0;
    std::int64_t mnFlat = 0;
};

LayerSurvey Survey::Run() {
    Walk();
    moIds.Choose();
    WarnOfHeights();
    WarnOfColumns();
    ReportIds();
    return GetResult();
}

/// If the layer cannot be read to its end, the warnings up to there are given all the same.
void Survey::Walk() {
    moWalk.Restart();
    try {
        while (moWalk.Advance())
            AddShape();
    } catch (...) {
        FinishWarnings();
        throw;
    }
    FinishWarnings();
    moMeter.Finish();
}

void Survey::TakeWarnings() {
    for (const auto& [text, times] : moWalk.GetReader().TakeWarnings())
        AddWarning(moWarnings, text, times);
}

void Survey::FinishWarnings() {
    TakeWarnings();
    PassOn(moWarnings, "The " + moWalk.GetReader().GetSubject());
    moRefusals.Finish();
}

void Survey::AddShape() {
    if (moWalk.GetReader().HasWarnings())
        TakeWarnings();
    TestCount();
    if (moWalk.GetFacetNumber() == 0)
        AddFeature();
    const Facet& facet = moWalk.GetFacet();
    const FacetFault fault = ReadFacet(facet, moVertices);
    moKept.Add(moWalk.GetFeature(), moWalk.GetFacetNumber(), fault, moVertices);
    if (fault == FacetFault::None)
        AddRing(facet.mbFlat);
    const FacetFault reason = fault == FacetFault::None ? facet.meFault : fault;
    moRefusals.Add(moWalk.GetFeature(), reason,
                   reason == FacetFault::None ? ComputeArea() : facet.mdfRefusedArea);
    moType.Add(fault);
}

void Survey::AddFeature() {
    moMeter.Count();
    moIds.AddFeature(moWalk.GetFeature(), moWalk.GetFacetCount());
    moBlocks.AddFeature(moWalk.GetFeature(), moWalk.GetShapes() - 1, moWalk.GetPolygonsInFront());
}

void Survey::TestCount() const {
    constexpr int MOST = std::numeric_limits<int>::max();
    if (moWalk.GetShapes() > MOST)
        throw DataException(FormatString("The %s has more than %d shapes", GetSubject(), MOST),
                            SOURCE, __PRETTY_FUNCTION__, __LINE__);
}

void Survey::AddRing(bool flat) {
    for (const ZARVertex& vertex : moVertices)
        moExtents.Add(vertex);
    moBlocks.AddRing(moVertices);
    ++mnDeliverable;
    mnFlat += flat;
}

/// @return the area of the ring in plan. Products of map coordinates would lose what is small
double Survey::ComputeArea() const {
    const ZARVertex& from = moVertices.front();
    double sum = 0.0;
    for (std::size_t i = 1; i + 1 < moVertices.size(); ++i)
        sum += (moVertices[i].x - from.x) * (moVertices[i + 1].y - from.y) -
               (moVertices[i].y - from.y) * (moVertices[i + 1].x - from.x);
    return std::fabs(sum) / 2;
}

LayerSurvey Survey::GetResult() {
    LayerSurvey result;
    result.mnShapes = static_cast<int>(moWalk.GetShapes());
    result.mnType = moType.Get(GetLayer());
    result.moIds = moIds;
    result.moBlocks = std::move(moBlocks);
    if (result.mnType == 2)
        result.moKept = std::move(moKept);
    if (mnDeliverable > 0) {
        result.moLow = moExtents.moLow;
        result.moHigh = moExtents.moHigh;
    }
    return result;
}

void Survey::WarnOfHeights() const {
    if (mnFlat > 0)
        tellus::Warning::Warn(FormatString("The %s: %lld of %lld shapes have no heights and are "
                                           "read with height 0",
                                           GetSubject(), static_cast<long long>(mnFlat),
                                           static_cast<long long>(mnDeliverable)),
                              SOURCE, __LINE__);
}

void Survey::WarnOfColumns() const {
    if (GetLayer().GetLayerDefn()->GetGeomFieldCount() > 1)
        tellus::Warning::Warn(
            FormatString("The %s: only the first of its geometry columns is read", GetSubject()),
            SOURCE, __LINE__);
}

void Survey::ReportIds() const {
    if (moIds.GetFactor() == 0)
        tellus::Report::AddInfo(FormatString(
            "The %s: shape ids count the shapes in reading order, from 1", GetSubject()));
    else if (moIds.GetFactor() > 1)
        tellus::Report::AddInfo(FormatString("The %s: shape id = feature id x %lld + number of the "
                                             "facet in the feature, from 0",
                                             GetSubject(),
                                             static_cast<long long>(moIds.GetFactor())));
}

/// @param type 1 or 3
LayerSurvey CreateUnread(const LayerWalk& walk, int type) {
    tellus::Warning::Warn(FormatString("The %s is declared as a layer of %s, so it is not read",
                                       walk.GetReader().GetSubject().c_str(),
                                       type == 1 ? "points" : "lines"),
                          SOURCE, __LINE__);
    LayerSurvey result;
    result.mnType = type;
    return result;
}

} // namespace

LayerSurvey SurveyLayer(LayerWalk& walk, const ProgressCall& progress) {
    const int declared = GetDeclaredType(walk.GetReader().GetLayer());
    if (declared != 2)
        return CreateUnread(walk, declared);
    return Survey(walk, progress).Run();
}

} // namespace kelm::store

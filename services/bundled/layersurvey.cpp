#include "services/bundled/layersurvey.h"

#include "services/bundled/gdalcall.h"
#include "services/bundled/layerwalk.h"
#include "services/bundled/refusallog.h"
#include "services/exception.h"
#include "services/reporting.h"

#include <algorithm>
#include <limits>

namespace kelm::store {

namespace {

constexpr const char* kpszSource = "services/bundled/layersurvey";

/// Extents that grow with each shape.
struct Extents {
    static constexpr double kdfMost = std::numeric_limits<double>::max();
    ZARVertex moLow{kdfMost, kdfMost, kdfMost};
    ZARVertex moHigh{-kdfMost, -kdfMost, -kdfMost};

    void Add(const ZARVertex& oVertex) {
        moLow = {std::min(moLow.x, oVertex.x), std::min(moLow.y, oVertex.y),
                 std::min(moLow.z, oVertex.z)};
        moHigh = {std::max(moHigh.x, oVertex.x), std::max(moHigh.y, oVertex.y),
                  std::max(moHigh.z, oVertex.z)};
    }
};

/// One survey under way.
class Survey {
  public:
    explicit Survey(LayerWalk& oWalk) : moWalk(oWalk), moRefusals(oWalk.GetReader().GetSubject()) {}
    LayerSurvey Run();

  private:
    void Walk();
    void AddShape();
    void TakeWarnings();
    void FinishWarnings();
    FacetFault ReadFacet();
    int GetType() const;
    void Report() const;

    LayerWalk& moWalk;
    Warnings moWarnings;
    RefusalLog moRefusals;
    ShapeIds moIds;
    Extents moExtents;
    std::vector<ZARVertex> moVertices;
    std::int64_t mnDeliverable = 0;
    std::int64_t mnFlat = 0;
    std::int64_t mnFacets = 0;
    std::int64_t mnLines = 0;
    std::int64_t mnPoints = 0;
};

LayerSurvey Survey::Run() {
    Walk();
    moIds.Choose();
    Report();

    LayerSurvey oSurvey;
    oSurvey.mnShapes = static_cast<int>(moWalk.GetShapes());
    oSurvey.mnType = GetType();
    oSurvey.moIds = moIds;
    if (mnDeliverable > 0) {
        oSurvey.moLow = moExtents.moLow;
        oSurvey.moHigh = moExtents.moHigh;
    }
    return oSurvey;
}

/// What was found wrong is told also if the layer cannot be read to its end.
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
}

void Survey::TakeWarnings() {
    for (const auto& [text, nTimes] : moWalk.GetReader().TakeWarnings())
        AddWarning(moWarnings, text, nTimes);
}

void Survey::FinishWarnings() {
    TakeWarnings();
    PassOn(moWarnings, "The " + moWalk.GetReader().GetSubject());
    moRefusals.Finish();
}

void Survey::AddShape() {
    TakeWarnings();
    if (moWalk.GetShapes() > std::numeric_limits<int>::max())
        throw DataException(FormatString("The %s has more than %d shapes",
                                         moWalk.GetReader().GetSubject().c_str(),
                                         std::numeric_limits<int>::max()),
                            kpszSource, __PRETTY_FUNCTION__, __LINE__);
    if (moWalk.GetFacetNumber() == 0)
        moIds.AddFeature(moWalk.GetFeature(), moWalk.GetFacetCount());
    const FacetFault eFault = ReadFacet();
    moRefusals.Add(moWalk.GetFeature(), eFault);
    mnLines += eFault == FacetFault::Line;
    mnPoints += eFault == FacetFault::Point;
    mnFacets += eFault != FacetFault::Line && eFault != FacetFault::Point &&
                eFault != FacetFault::NoGeometry;
}

FacetFault Survey::ReadFacet() {
    const Facet& oFacet = moWalk.GetFacet();
    if (oFacet.meFault != FacetFault::None)
        return oFacet.meFault;
    const FacetFault eFault = ReadRing(*oFacet.mpoRing, moVertices);
    if (eFault != FacetFault::None)
        return eFault;
    for (const ZARVertex& oVertex : moVertices)
        moExtents.Add(oVertex);
    ++mnDeliverable;
    mnFlat += !oFacet.mpoRing->Is3D();
    return FacetFault::None;
}

int Survey::GetType() const {
    if (mnFacets > 0)
        return 2;
    if (mnLines > 0)
        return 3;
    if (mnPoints > 0)
        return 1;
    switch (wkbFlatten(moWalk.GetReader().GetLayer().GetGeomType())) {
    case wkbPoint:
    case wkbMultiPoint:
        return 1;
    case wkbLineString:
    case wkbMultiLineString:
    case wkbCircularString:
    case wkbCompoundCurve:
    case wkbMultiCurve:
        return 3;
    default:
        return 2;
    }
}

void Survey::Report() const {
    const char* pszSubject = moWalk.GetReader().GetSubject().c_str();
    if (mnFlat > 0)
        tellus::Warning::Warn(FormatString("The %s: %lld of %lld shapes have no heights and are "
                                           "read with height 0",
                                           pszSubject, static_cast<long long>(mnFlat),
                                           static_cast<long long>(mnDeliverable)),
                              kpszSource, __LINE__);
    if (moWalk.GetReader().GetLayer().GetLayerDefn()->GetGeomFieldCount() > 1)
        tellus::Warning::Warn(
            FormatString("The %s: only the first of its geometry columns is read", pszSubject),
            kpszSource, __LINE__);
    if (moIds.GetFactor() == 0)
        tellus::Report::AddInfo(FormatString(
            "The %s: shape ids count the shapes in reading order, from 1", pszSubject));
    else if (moIds.GetFactor() > 1)
        tellus::Report::AddInfo(FormatString("The %s: shape id = feature id x %lld + number of the "
                                             "facet in the feature, from 0",
                                             pszSubject,
                                             static_cast<long long>(moIds.GetFactor())));
}

} // namespace

LayerSurvey SurveyLayer(LayerWalk& oWalk) {
    return Survey(oWalk).Run();
}

} // namespace kelm::store

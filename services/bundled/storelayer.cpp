#include "services/bundled/storelayer.h"

#include "services/exception.h"
#include "services/reporting.h"

namespace kelm::store {

namespace {

constexpr const char* kpszSource = "services/bundled/storelayer";

} // namespace

StoreLayer::StoreLayer(_iobuf& oFile, OGRLayer& oLayer)
    : ZARLayer_t{}, moFile(oFile), moWalk(oFile, oLayer), moSurvey(SurveyLayer(moWalk)) {
    shapeCount = moSurvey.mnShapes;
    shapeCountValid = 1;
}

int StoreLayer::GetFirst() {
    moWalk.Restart();
    return Step();
}

int StoreLayer::GetBehind(int nId) {
    Seek(nId);
    return Step();
}

ZARShape& StoreLayer::GetShape(int nId) {
    Seek(nId);
    const Facet& oFacet = moWalk.GetFacet();
    FacetFault eFault = oFacet.meFault;
    if (eFault == FacetFault::None)
        eFault = ReadRing(*oFacet.mpoRing, moVertices);
    if (eFault != FacetFault::None)
        throw DataException(FormatString("Shape %d (feature %lld) of %s cannot be used: %s", nId,
                                         static_cast<long long>(moWalk.GetFeature()),
                                         moWalk.GetReader().GetSubject().c_str(),
                                         GetFaultText(eFault)),
                            kpszSource, __PRETTY_FUNCTION__, __LINE__);
    moShape = {moVertices.data(), static_cast<int>(moVertices.size())};
    return moShape;
}

int StoreLayer::Step() {
    mnId = -1;
    const bool bMore = moWalk.Advance();
    const int nId = bMore ? moSurvey.moIds.GetId(moWalk.GetFeature(), moWalk.GetFacetNumber(),
                                                 moWalk.GetShapes())
                          : -1;
    // A format that ends early without an error would pass for a smaller surface.
    if (bMore ? nId < 0 : moWalk.GetShapes() != moSurvey.mnShapes)
        throw DataException(FormatString("The %s has changed since it was opened: there were %d "
                                         "shapes",
                                         moWalk.GetReader().GetSubject().c_str(),
                                         moSurvey.mnShapes),
                            kpszSource, __PRETTY_FUNCTION__, __LINE__);
    mnId = nId;
    return nId;
}

void StoreLayer::Seek(int nId) {
    if (nId >= 0 && nId == mnId)
        return;
    // Ids rise along the walk, so one behind the present is found by walking on.
    if (mnId < 0 || nId < mnId)
        moWalk.Restart();
    while (nId >= 0 && Step() >= 0 && mnId < nId)
        continue;
    if (nId < 0 || mnId != nId)
        throw DataException(
            FormatString("The %s has no shape %d", moWalk.GetReader().GetSubject().c_str(), nId),
            kpszSource, __PRETTY_FUNCTION__, __LINE__);
}

} // namespace kelm::store

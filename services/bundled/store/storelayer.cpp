#include "services/bundled/store/storelayer.h"

#include "services/exception.h"
#include "services/reporting.h"

namespace kelm::store {

namespace {

constexpr const char* SOURCE = "services/bundled/store/storelayer";

} // namespace

StoreLayer::StoreLayer(_iobuf& file, Dataset& dataset, OGRLayer& layer)
    : moFile(file), moWalk(dataset, layer), moSurvey(SurveyLayer(moWalk)) {
    shapeCount = moSurvey.mnShapes;
    shapeCountValid = 1;
}

int StoreLayer::GetFirst() {
    moWalk.Restart();
    return Step();
}

int StoreLayer::GetBehind(int id) {
    Seek(id);
    return Step();
}

ZARShape& StoreLayer::GetShape(int id) {
    Seek(id);
    const FacetFault fault = ReadFacet(moWalk.GetFacet(), moVertices);
    if (fault != FacetFault::None)
        throw DataException(FormatString("Shape %d (feature %lld) of %s cannot be used: %s", id,
                                         static_cast<long long>(moWalk.GetFeature()),
                                         GetSubject().c_str(), GetFaultText(fault)),
                            SOURCE, __PRETTY_FUNCTION__, __LINE__);
    moShape = {moVertices.data(), static_cast<int>(moVertices.size())};
    return moShape;
}

int StoreLayer::Step() {
    mnId = -1;
    const bool more = moWalk.Advance();
    const int id = more ? moSurvey.moIds.GetId(moWalk.GetFeature(), moWalk.GetFacetNumber(),
                                               moWalk.GetShapes())
                        : -1;
    TestUnchanged(more, id);
    mnId = id;
    return id;
}

/// Some formats end early without an error; that would pass for a smaller surface.
void StoreLayer::TestUnchanged(bool more, int id) const {
    if (more ? id < 0 : moWalk.GetShapes() != moSurvey.mnShapes)
        throw DataException(FormatString("The %s has changed since it was opened: there were %d "
                                         "shapes",
                                         GetSubject().c_str(), moSurvey.mnShapes),
                            SOURCE, __PRETTY_FUNCTION__, __LINE__);
}

void StoreLayer::Seek(int id) {
    if (id >= 0 && id == mnId)
        return;
    // Ids rise along the walk, so one behind the present is found by walking on.
    if (mnId < 0 || id < mnId)
        moWalk.Restart();
    while (id >= 0 && Step() >= 0 && mnId < id)
        continue;
    if (id < 0 || mnId != id)
        throw DataException(FormatString("The %s has no shape %d", GetSubject().c_str(), id),
                            SOURCE, __PRETTY_FUNCTION__, __LINE__);
}

} // namespace kelm::store

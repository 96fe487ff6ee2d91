#include "services/bundled/store/storefile.h"

#include "services/bundled/store/layertype.h"
#include "services/exception.h"
#include "services/reporting.h"

#include <cpl_conv.h>

#include <utility>

namespace kelm::store {

namespace {

constexpr const char* SOURCE = "services/bundled/store/storefile";
/// A geodatabase can have hundreds of layers.
constexpr int MOST_NAMED = 10;

} // namespace

StoreFile::StoreFile(std::unique_ptr<Dataset> dataset)
    : mpoDataset(std::move(dataset)), moLayers(mpoDataset->GetLayers().size()) {}

OGRLayer& StoreFile::Get(int segment) const {
    return *mpoDataset->GetLayers()[static_cast<std::size_t>(segment) - 1];
}

OpenLayer& StoreFile::GetLayer(int segment) {
    std::unique_ptr<StoreLayer>& layer = moLayers[static_cast<std::size_t>(segment) - 1];
    if (!layer) {
        layer = std::make_unique<StoreLayer>(*this, *mpoDataset, segment, moProgress);
        if (GetLayerCount() > 1 && (layer->GetType() != 2 || layer->shapeCount == 0))
            WarnOfChoice(FormatString("The layer %s of file %s holds no polygons",
                                      Get(segment).GetName(), mpoDataset->GetName().c_str()));
    }
    return *layer;
}

int StoreFile::TakeSurvey(const std::string& survey) {
    HandedSurvey handed = ReadSurvey(survey, mpoDataset->GetName());
    TestSurvey(handed);
    const int segment = handed.mnSegment;
    std::unique_ptr<StoreLayer>& layer = moLayers[static_cast<std::size_t>(segment) - 1];
    if (!layer)
        layer = std::make_unique<StoreLayer>(*this, *mpoDataset, std::move(handed));
    return segment;
}

void StoreFile::TestSurvey(const HandedSurvey& survey) const {
    const std::string file = CPLGetFilename(mpoDataset->GetName().c_str());
    const bool exists = survey.mnSegment >= 1 && survey.mnSegment <= GetLayerCount() &&
                        Get(survey.mnSegment).GetName() == survey.moLayer;
    std::string reason;
    if (survey.moFile != file)
        reason = "it is of file " + survey.moFile;
    else if (survey.moStamp != mpoDataset->GetStamp())
        reason = "the file has been written to since";
    else if (!exists)
        reason = "there is no layer " + survey.moLayer;
    if (!reason.empty())
        RefuseSurvey(mpoDataset->GetName(), reason);
}

int StoreFile::FindFirst() {
    if (GetLayerCount() == 1)
        return 1;
    for (int segment = 1; segment <= GetLayerCount(); ++segment)
        try {
            if (HoldsFacets(*mpoDataset, Get(segment)))
                return segment;
        } catch (const DataException&) {
            return segment; // whoever takes it is told the reason
        }
    return 1;
}

void StoreFile::WarnOfChoice(const std::string& found) {
    const std::string choice = GetChoice();
    if (!choice.empty())
        tellus::Warning::Warn(found + "; layers with polygons: " + choice, SOURCE, __LINE__);
}

void StoreFile::WarnOfNumber(int segment) {
    WarnOfChoice(
        FormatString("The file %s has no layer %d", mpoDataset->GetName().c_str(), segment));
}

/// @return layers that hold polygons, as "2 (roofs), 3 (walls)"
std::string StoreFile::GetChoice() {
    std::string choice;
    int named = 0;
    for (int segment = 1; segment <= GetLayerCount() && named < MOST_NAMED; ++segment)
        try {
            if (!HoldsFacets(*mpoDataset, Get(segment)))
                continue;
            ++named;
            choice += FormatString("%s%d (%s)", choice.empty() ? "" : ", ", segment,
                                   Get(segment).GetName());
        } catch (const DataException&) {
            continue; // it is no choice
        }
    return choice;
}

} // namespace kelm::store

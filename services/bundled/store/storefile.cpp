#include "services/bundled/store/storefile.h"

#include "services/bundled/store/layertype.h"
#include "services/exception.h"
#include "services/reporting.h"

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
        layer = std::make_unique<StoreLayer>(*this, *mpoDataset, Get(segment));
        if (GetLayerCount() > 1 && (layer->GetType() != 2 || layer->shapeCount == 0))
            WarnOfChoice(FormatString("The layer %s of file %s holds no polygons",
                                      Get(segment).GetName(), mpoDataset->GetName().c_str()));
    }
    return *layer;
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

#include "services/bundled/store/files/dataset.h"

#include <ogrsf_frmts.h>

#include <utility>

namespace kelm::store {

namespace {

/// Tables without a geometry are no vector layers, nor are those that a driver keeps for itself.
std::vector<OGRLayer*> FindLayers(GDALDataset& handle) {
    std::vector<OGRLayer*> layers;
    for (int number = 0; number < handle.GetLayerCount(); ++number) {
        OGRLayer* layer = handle.GetLayer(number);
        if (layer && !handle.IsLayerPrivate(number) && layer->GetGeomType() != wkbNone)
            layers.push_back(layer);
    }
    return layers;
}

} // namespace

Dataset::Dataset(std::string name, const Format& format, GDALDatasetUniquePtr handle)
    : moName(std::move(name)), moFormat(format), mpoHandle(std::move(handle)),
      moLayers(FindLayers(*mpoHandle)) {}

} // namespace kelm::store

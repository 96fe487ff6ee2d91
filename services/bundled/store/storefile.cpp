#include "services/bundled/store/storefile.h"

#include "services/bundled/store/gdal/confinement.h"

#include <utility>

using kelm::store::StoreLayer;

_iobuf::_iobuf(std::unique_ptr<kelm::store::Dataset> dataset)
    : mpoDataset(std::move(dataset)), moLayers(mpoDataset->GetLayers().size()) {}

StoreLayer& _iobuf::GetLayer(int segment) {
    const auto index = static_cast<std::size_t>(segment) - 1;
    std::unique_ptr<StoreLayer>& layer = moLayers[index];
    if (!layer) {
        const kelm::store::Confinement confinement;
        layer = std::make_unique<StoreLayer>(*this, *mpoDataset, *mpoDataset->GetLayers()[index]);
    }
    return *layer;
}

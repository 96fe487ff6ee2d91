#include "services/bundled/store/storefile.h"

#include "services/bundled/store/gdal/confinement.h"

#include <utility>

namespace kelm::store {

StoreFile::StoreFile(std::unique_ptr<Dataset> dataset)
    : mpoDataset(std::move(dataset)), moLayers(mpoDataset->GetLayers().size()) {}

OpenLayer& StoreFile::GetLayer(int segment) {
    const auto index = static_cast<std::size_t>(segment) - 1;
    std::unique_ptr<StoreLayer>& layer = moLayers[index];
    if (!layer) {
        const Confinement confinement;
        layer = std::make_unique<StoreLayer>(*this, *mpoDataset, *mpoDataset->GetLayers()[index]);
    }
    return *layer;
}

} // namespace kelm::store

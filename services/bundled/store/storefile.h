#pragma once

#include "services/bundled/store/files/dataset.h"
#include "services/bundled/store/storelayer.h"
#include "services/vectorlayer.h"

#include <memory>
#include <string>
#include <vector>

/// An open file as the store hands it out: the dataset, and the layers that were taken from it.
struct _iobuf {
  public:
    explicit _iobuf(std::unique_ptr<kelm::store::Dataset> dataset);
    _iobuf(const _iobuf&) = delete;
    _iobuf& operator=(const _iobuf&) = delete;

    /// @return the number of layers: the segments 1, 2 and so on
    int GetLayerCount() const { return static_cast<int>(moLayers.size()); }
    /// @param segment from 1 to the number of layers. @return the layer, surveyed by the first call
    /// @throw kelm::DataException, see SurveyLayer
    kelm::store::StoreLayer& GetLayer(int segment);
    /// @return the first layer with polygons, or that cannot be read; 1 if there is none
    int FindFirst();
    /// Warns that there is no such layer, if any hold polygons, and names these.
    void WarnOfNumber(int segment);

  private:
    void WarnOfChoice(const std::string& found);
    OGRLayer& Get(int segment) const;
    std::string GetChoice();

    std::unique_ptr<kelm::store::Dataset> mpoDataset;
    /// Null until the layer is taken. Declared behind the dataset, which must end last.
    std::vector<std::unique_ptr<kelm::store::StoreLayer>> moLayers;
};

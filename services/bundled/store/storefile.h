#pragma once

#include "services/bundled/store/files/dataset.h"
#include "services/bundled/store/handles/openfile.h"
#include "services/bundled/store/storelayer.h"

#include <memory>
#include <string>
#include <vector>

namespace kelm::store {

/// An open file that GDAL reads: the dataset, and the layers that were taken from it.
class StoreFile final : public _iobuf {
  public:
    explicit StoreFile(std::unique_ptr<Dataset> dataset);

    int GetLayerCount() const override { return static_cast<int>(moLayers.size()); }
    /// Surveys the layer by the first call. @throw kelm::DataException, see SurveyLayer
    OpenLayer& GetLayer(int segment) override;
    int FindFirst() override;
    void WarnOfNumber(int segment) override;
    void SetProgress(const ProgressCall& progress) override { moProgress = progress; }
    int TakeSurvey(const std::string& survey) override;

  private:
    void WarnOfChoice(const std::string& found);
    OGRLayer& Get(int segment) const;
    std::string GetChoice();

    void TestSurvey(const HandedSurvey& survey) const;

    std::unique_ptr<Dataset> mpoDataset;
    ProgressCall moProgress;
    /// Null until the layer is taken. Declared behind the dataset, which must end last.
    std::vector<std::unique_ptr<StoreLayer>> moLayers;
};

} // namespace kelm::store

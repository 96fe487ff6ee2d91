#pragma once

#include "services/bundled/store/handles/openlayer.h"
#include "services/bundled/store/layercrs.h"
#include "services/bundled/store/layersurvey.h"

#include <vector>

namespace kelm::store {

/// An open layer that GDAL reads: its record, what the survey found, and one walk that all
/// questions share.
class StoreLayer final : public OpenLayer {
  public:
    /// Surveys the layer. @param file the handle that GetFile gives back, not used otherwise
    /// @param dataset owns the layer, and outlives this object
    /// @throw kelm::DataException, see SurveyLayer
    StoreLayer(_iobuf& file, Dataset& dataset, OGRLayer& layer);

    int GetFirst() override;
    int GetBehind(int id) override;
    ZARShape& GetShape(int id) override;
    int GetType() const override { return moSurvey.mnType; }
    ZARVertex GetLow() const override { return moSurvey.moLow; }
    ZARVertex GetHigh() const override { return moSurvey.moHigh; }
    /// See ReadCrsText.
    std::string GetCrsText() const override {
        return ReadCrsText(moWalk.GetReader().GetLayer(), GetSubject());
    }
    _iobuf& GetFile() const override { return moFile; }

  private:
    int Step();
    void TestUnchanged(bool more, int id) const;
    void Seek(int id);
    const std::string& GetSubject() const { return moWalk.GetReader().GetSubject(); }

    _iobuf& moFile;
    LayerWalk moWalk;
    LayerSurvey moSurvey;
    int mnId = -1; ///< of the facet that the walk is at, or -1
    std::vector<ZARVertex> moVertices;
    ZARShape moShape{};
};

} // namespace kelm::store

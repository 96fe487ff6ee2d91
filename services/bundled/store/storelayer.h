#pragma once

#include "services/bundled/store/handedsurvey.h"
#include "services/bundled/store/handles/openlayer.h"
#include "services/bundled/store/layercrs.h"
#include "services/bundled/store/layersurvey.h"

#include <cstddef>
#include <optional>
#include <vector>

namespace kelm::store {

/// An open layer that GDAL reads: its record, what the survey found, and one walk that all
/// questions share.
///
/// The first walk over the whole layer takes the facets that the survey kept, unless the file was
/// touched since. Later ones read the file.
class StoreLayer final : public OpenLayer {
  public:
    /// Surveys the layer. @param file the handle that GetFile gives back, not used otherwise
    /// @param dataset owns the layer, and outlives this object @param segment number of the layer
    /// @throw kelm::DataException, see SurveyLayer
    StoreLayer(_iobuf& file, Dataset& dataset, int segment, const ProgressCall& progress);
    /// Takes a survey that was made of the file as it is now.
    StoreLayer(_iobuf& file, Dataset& dataset, HandedSurvey survey);

    int GetFirst() override;
    int GetBehind(int id) override;
    ZARShape& GetShape(int id) override;
    /// Walks then skip the blocks of features beside the window, unless the file has been written
    /// to since it was surveyed.
    void SetWindow(const ZARVertex* low, const ZARVertex* high) override;
    int CountShapes(const ZARVertex& low, const ZARVertex& high) const override;
    std::string GetSurvey() const override;
    int GetType() const override { return moSurvey.mnType; }
    ZARVertex GetLow() const override { return moSurvey.moLow; }
    ZARVertex GetHigh() const override { return moSurvey.moHigh; }
    /// See ReadCrsText.
    std::string GetCrsText() const override {
        return ReadCrsText(moWalk.GetReader().GetLayer(), GetSubject());
    }
    _iobuf& GetFile() const override { return moFile; }

  private:
    void Restart();
    bool IsUntouched() const;
    bool Advance();
    FacetFault ReadShape();
    std::int64_t GetFeature() const {
        return mbKept ? moSurvey.moKept.GetFeature() : moWalk.GetFeature();
    }
    std::int64_t GetShapes() const {
        return mbKept ? moSurvey.moKept.GetShapes() : moWalk.GetShapes();
    }
    int Step();
    void TestUnchanged(bool more, int id) const;
    void Seek(int id);
    const std::string& GetSubject() const { return moWalk.GetReader().GetSubject(); }

    _iobuf& moFile;
    const Dataset& moDataset;
    int mnSegment;
    LayerWalk moWalk;
    std::int64_t mnOpened; ///< nanoseconds since 1970, from before the survey
    FileStamp moStamp;     ///< from before the survey
    LayerSurvey moSurvey;
    std::optional<std::vector<FeatureRun>> moRuns; ///< those of the window; none: the whole layer
    std::size_t mnRun = 0;                         ///< the next one
    bool mbKept = false; ///< does the walk take what the survey kept, and not the file?
    int mnId = -1;       ///< of the facet that the walk is at, or -1
    std::vector<ZARVertex> moVertices;
    ZARShape moShape{};
};

} // namespace kelm::store

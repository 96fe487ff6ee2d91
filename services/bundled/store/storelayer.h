#pragma once

#include "services/bundled/store/layercrs.h"
#include "services/bundled/store/layersurvey.h"
#include "services/vectorlayer.h"

#include <vector>

namespace kelm::store {

/// An open layer: its record, what the survey found, and one walk that all questions share.
class StoreLayer : public ZARLayer_t {
  public:
    /// Surveys the layer. @param file the handle that GetFile gives back, not used otherwise
    /// @param dataset owns the layer, and outlives this object
    /// @throw kelm::DataException, see SurveyLayer
    StoreLayer(_iobuf& file, Dataset& dataset, OGRLayer& layer);

    /// @return the first shape id, or -1
    int GetFirst();
    /// @return the shape id behind `id`, or -1. @throw kelm::DataException if there is no shape
    /// `id`, or the layer has changed since it was opened
    int GetBehind(int id);
    /// @return the shape, good until the next call for one. @throw kelm::DataException if there is
    /// no such shape or it cannot be delivered
    ZARShape& GetShape(int id);

    _iobuf& GetFile() const { return moFile; }
    const LayerSurvey& GetSurvey() const { return moSurvey; }
    /// @return the CRS as text, see ReadCrsText
    std::string GetCrsText() const {
        return ReadCrsText(moWalk.GetReader().GetLayer(), GetSubject());
    }

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

#pragma once

#include "services/bundled/layercrs.h"
#include "services/bundled/layersurvey.h"
#include "services/bundled/layerwalk.h"
#include "services/vectorlayer.h"

#include <vector>

namespace kelm::store {

/// An open layer: its record, what the survey found, and one walk that all questions share.
class StoreLayer : public ZARLayer_t {
  public:
    /// Surveys the layer. @throw kelm::DataException, see SurveyLayer
    StoreLayer(_iobuf& oFile, OGRLayer& oLayer);

    /// @return the first shape id, or -1
    int GetFirst();
    /// @return the shape id behind nId, or -1. @throw kelm::DataException if there is no nId or the
    /// layer is not what it was when it was opened
    int GetBehind(int nId);
    /// @return the shape, good until the next call for one. @throw kelm::DataException if there is
    /// no such shape or it cannot be delivered
    ZARShape& GetShape(int nId);

    _iobuf& GetFile() const { return moFile; }
    const LayerSurvey& GetSurvey() const { return moSurvey; }
    /// @return the CRS as text, see ReadCrsText
    std::string GetCrsText() const {
        return ReadCrsText(moWalk.GetReader().GetLayer(), moWalk.GetReader().GetSubject());
    }

  private:
    int Step();
    void Seek(int nId);

    _iobuf& moFile;
    LayerWalk moWalk;
    LayerSurvey moSurvey;
    int mnId = -1; ///< of the facet that the walk is at, or -1
    std::vector<ZARVertex> moVertices;
    ZARShape moShape{};
};

} // namespace kelm::store

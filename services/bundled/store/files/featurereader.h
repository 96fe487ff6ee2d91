#pragma once

#include "services/bundled/store/files/dataset.h"
#include "services/bundled/store/gdal/gdalcall.h"

#include <ogrsf_frmts.h>

#include <cstdint>
#include <string>
#include <vector>

namespace kelm::store {

/// Reads the features of a layer in their order, without attributes.
///
/// Features are read ahead in batches of some tens and some kilobytes, so that small features share
/// the cost of a call into GDAL. Two readers of one dataset may take turns. After each change of
/// turn the reader starts anew and skips what it has read already.
class FeatureReader {
  public:
    /// @param dataset owns the layer, and outlives this reader. @throw kelm::DataException
    FeatureReader(Dataset& dataset, OGRLayer& layer);

    /// Goes back to the position in front of the first feature.
    void Restart();
    /// @return the next feature, good until the next call, or null behind the last one
    /// @throw kelm::DataException if the layer cannot be read on; Restart must come next
    const OGRFeature* Next();
    /// @return what GDAL warned of in the last batch; to be taken before the next call of Next
    Warnings TakeWarnings();

    OGRLayer& GetLayer() const { return moLayer; }
    /// @return what is read, for a message: "layer l of file f"
    const std::string& GetSubject() const { return moSubject; }

  private:
    void ReadAhead();
    void FetchBatch();
    void TestCall(const GdalCall& call) const;
    void TakeTurn();
    void TestEnd() const;
    void Fetch();

    Dataset& moDataset;
    OGRLayer& moLayer;
    std::string moSubject;
    std::vector<OGRFeatureUniquePtr> moFeatures; ///< read ahead; a null is the end of the layer
    std::size_t mnNext = 0;
    std::int64_t mnKnown = -1; ///< number of features if the driver knows it exactly, else -1
    std::int64_t mnRead = 0;   ///< features that came from GDAL since the start
    Warnings moWarnings;
};

} // namespace kelm::store

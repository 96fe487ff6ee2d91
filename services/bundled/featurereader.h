#pragma once

#include "services/bundled/gdalcall.h"

#include <ogrsf_frmts.h>

#include <cstdint>
#include <string>
#include <vector>

struct _iobuf;

namespace kelm::store {

/// Reads the features of a layer in their order, without attributes.
///
/// Small features are read ahead, some tens at a time and no more than fit into some kilobytes, so
/// that what a call into GDAL costs is shared by many. Two readers of one file may take turns; each
/// change of turn costs the second a new start, since formats that are read as a stream have one
/// reading position for all their layers.
class FeatureReader {
  public:
    /// @param oFile owns the layer, as it does this reader. @throw kelm::DataException
    FeatureReader(_iobuf& oFile, OGRLayer& oLayer);

    /// Goes back to the position in front of the first feature.
    void Restart();
    /// @return the next feature, good until the next call, or null behind the last one
    /// @throw kelm::DataException if the layer cannot be read on; Restart must come next
    const OGRFeature* Next();
    /// @return what GDAL warned of while it last read ahead; asked for before the next call of Next
    Warnings TakeWarnings();

    OGRLayer& GetLayer() const { return moLayer; }
    /// @return what is read, for a message: "layer l of file f"
    const std::string& GetSubject() const { return moSubject; }

  private:
    void ReadAhead();
    void TestCall(const GdalCall& oCall) const;
    void TakeTurn();
    void TestEnd() const;
    void Fetch();

    _iobuf& moFile;
    OGRLayer& moLayer;
    std::string moSubject;
    std::vector<OGRFeatureUniquePtr> moFeatures; ///< read ahead; a null is the end of the layer
    std::size_t mnNext = 0;
    std::int64_t mnKnown = -1; ///< number of features that the driver knows of; -1: none
    std::int64_t mnRead = 0;   ///< features that came from GDAL since the start
    Warnings moWarnings;
};

} // namespace kelm::store

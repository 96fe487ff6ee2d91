#pragma once

#include "services/bundled/store/files/formats.h"
#include "services/bundled/store/runs/filestamp.h"

#include <gdal_priv.h>

#include <string>
#include <vector>

namespace kelm::store {

class FeatureReader;

/// An open file: its name, its format, its layers and whose turn it is to read.
///
/// GDAL reads some formats as a stream, with one reading position for all layers of the file. A
/// reader therefore takes its turn before it reads, and has lost its position if another reader has
/// had a turn since. The dataset owns no reader, and must outlive all that read it.
class Dataset {
  public:
    /// @param name as the caller gave it, for messages
    Dataset(std::string name, const Format& format, GDALDatasetUniquePtr handle);
    Dataset(const Dataset&) = delete;
    Dataset& operator=(const Dataset&) = delete;

    const std::string& GetName() const { return moName; }
    const Format& GetFormat() const { return moFormat; }
    GDALDataset& GetHandle() { return *mpoHandle; }
    /// @return the layers that have a geometry, in GDAL's order; owned by the dataset
    const std::vector<OGRLayer*>& GetLayers() const { return moLayers; }
    /// @return the stamp of the files as they are now
    FileStamp GetStamp() const;

    /// @return true if no other reader has had a turn since this one took its own
    bool IsTurnOf(const FeatureReader& reader) const { return mpoTurn == &reader; }
    void TakeTurn(const FeatureReader& reader) { mpoTurn = &reader; }
    /// Leaves the turn to nobody: whoever reads next must take it.
    void EndTurn() { mpoTurn = nullptr; }

  private:
    std::string moName;
    const Format& moFormat;
    GDALDatasetUniquePtr mpoHandle;
    std::vector<OGRLayer*> moLayers;
    const FeatureReader* mpoTurn = nullptr;
};

} // namespace kelm::store

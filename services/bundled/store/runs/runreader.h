#pragma once

#include "services/bundled/store/runs/featurerun.h"

#include <ogrsf_frmts.h>

#include <memory>

namespace kelm::store {

/// Reads runs of a layer's features, in time that does not grow with what lies in front of them. To
/// be called in the scope of a GdalCall.
class RunReader {
  public:
    RunReader() = default;
    RunReader(const RunReader&) = delete;
    RunReader& operator=(const RunReader&) = delete;
    virtual ~RunReader() = default;

    /// Goes to the position in front of a run. Whoever else reads the layer takes it from there.
    virtual void Start(const FeatureRun& run) = 0;
    /// @return the next feature of the run, or null behind its last one or if the reading fails
    virtual OGRFeatureUniquePtr Next() = 0;
    /// Takes back what Start has set, so that the layer can be read as a whole.
    virtual void Stop() = 0;
};

// Each makes a reader for one kind of driver; null if this layer cannot be read so. The layer
// outlives the reader.

/// For drivers that go to a feature id at once and then read on.
std::unique_ptr<RunReader> ReadRunsByPosition(OGRLayer& layer);
/// For databases: a query for the range of feature ids.
std::unique_ptr<RunReader> ReadRunsByQuery(OGRLayer& layer);
/// For drivers that are quick by a spatial index only. The index fetches the features of the run's
/// box; what it misses is fetched by its id, so nothing depends on the index being right.
std::unique_ptr<RunReader> ReadRunsByIndex(OGRLayer& layer);

} // namespace kelm::store

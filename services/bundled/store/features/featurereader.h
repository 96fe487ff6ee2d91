#pragma once

#include "services/bundled/store/features/geometryquery.h"
#include "services/bundled/store/features/storedfeature.h"
#include "services/bundled/store/files/dataset.h"
#include "services/bundled/store/gdal/gdalcall.h"

#include <ogrsf_frmts.h>

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace kelm::store {

/// Reads the features of a layer in their order, without attributes.
///
/// Features are read ahead in batches of some hundreds and some kilobytes, so that small features
/// share the cost of a call into GDAL. Two readers of one dataset may take turns. After each change
/// of turn the reader starts anew and skips what it has read already.
///
/// A damaged record costs that record: it comes as a feature without geometry, or not at all if the
/// driver gives none, and a warning tells its number. A layer that ends early costs the layer.
class FeatureReader {
  public:
    /// @param dataset owns the layer, and outlives this reader. @throw kelm::DataException
    FeatureReader(Dataset& dataset, OGRLayer& layer);

    /// Goes back to the position in front of the first feature.
    void Restart();
    /// @return true if the layer can be read by runs
    bool HasRuns() const { return mpoRuns != nullptr; }
    /// Goes to the position in front of a run, behind which Next gives null. Needs HasRuns.
    void Restart(const FeatureRun& run);
    /// @return the next feature, good until the next call, or null behind the last one
    /// @throw kelm::DataException if the layer cannot be read on; Restart must come next
    const StoredFeature* Next() {
        if (mnNext == mnAhead)
            ReadAhead();
        const StoredFeature& feature = moAhead[mnNext++];
        return feature.IsEnd() ? nullptr : &feature;
    }
    /// @return what GDAL warned of in the last batch, and the damaged records in it; to be taken
    /// before the next call of Next
    Warnings TakeWarnings() { return std::exchange(moWarnings, {}); }
    bool HasWarnings() const { return !moWarnings.empty(); }

    /// @return the number of features if it is known exactly, else -1
    std::int64_t GetKnownCount() const { return mnKnown; }
    OGRLayer& GetLayer() const { return moLayer; }
    /// @return what is read, for a message: "layer l of file f"
    const std::string& GetSubject() const { return moSubject; }

  private:
    bool ReadCrs();
    void Prepare(bool sound);
    void AddWarnings(GdalCall& call);
    void ReadAhead();
    void TakeTurn(GdalCall& call);
    void StartReading(GdalCall& call);
    void ReadFeature(StoredFeature& stored);
    void FetchBatch(GdalCall& call);
    bool Fetch(GdalCall& call);
    bool FetchFailed(GdalCall& call, StoredFeature& stored);
    void MarkDamage(StoredFeature& stored, const std::string& failures);
    bool SkipsDamaged() const;
    void TestEnd(const std::string& failures);
    void TestRunEnd();
    void TestFailure(const std::string& failures) const;

    Dataset& moDataset;
    OGRLayer& moLayer;
    std::unique_ptr<RunReader> mpoRuns;
    std::unique_ptr<GeometryQuery> mpoQuery; ///< reads the whole layer; null: the layer itself
    std::optional<FeatureRun> moRun;         ///< what is being read; none: the whole layer
    std::string moSubject;
    std::vector<StoredFeature> moAhead; ///< read ahead, and room for more
    std::size_t mnAhead = 0;            ///< features that were read ahead
    std::size_t mnNext = 0;
    std::int64_t mnKnown = -1; ///< number of features if it is known exactly, else -1
    std::int64_t mnRead = 0;   ///< features that came from GDAL since the start of the run or layer
    std::int64_t mnSkipped = 0; ///< damaged ones that GDAL did not give
    std::string moFailure;      ///< why the layer cannot be read on; empty if it can
    Warnings moWarnings;
};

} // namespace kelm::store

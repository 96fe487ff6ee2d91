#include "services/bundled/store/runs/runreader.h"

#include "services/bundled/store/runs/sqlname.h"

#include <algorithm>
#include <string>
#include <vector>

namespace kelm::store {

namespace {

class PositionReader final : public RunReader {
  public:
    explicit PositionReader(OGRLayer& layer) : moLayer(layer) {}
    void Start(const FeatureRun& run) override {
        mnLeft = run.mnFeatures;
        static_cast<void>(moLayer.SetNextByIndex(run.mnFirst));
    }
    OGRFeatureUniquePtr Next() override {
        return OGRFeatureUniquePtr(mnLeft-- > 0 ? moLayer.GetNextFeature() : nullptr);
    }
    void Stop() override {}

  private:
    OGRLayer& moLayer;
    std::int64_t mnLeft = 0;
};

class QueryReader final : public RunReader {
  public:
    explicit QueryReader(OGRLayer& layer)
        : moLayer(layer), moColumn(QuoteName(layer.GetFIDColumn())) {}
    void Start(const FeatureRun& run) override {
        const std::string query = moColumn + " >= " + std::to_string(run.mnFirst) + " AND " +
                                  moColumn + " <= " + std::to_string(run.mnLast);
        static_cast<void>(moLayer.SetAttributeFilter(query.c_str()));
        moLayer.ResetReading();
    }
    OGRFeatureUniquePtr Next() override { return OGRFeatureUniquePtr(moLayer.GetNextFeature()); }
    void Stop() override { static_cast<void>(moLayer.SetAttributeFilter(nullptr)); }

  private:
    OGRLayer& moLayer;
    std::string moColumn;
};

class IndexReader final : public RunReader {
  public:
    explicit IndexReader(OGRLayer& layer) : moLayer(layer) {}
    void Start(const FeatureRun& run) override;
    OGRFeatureUniquePtr Next() override;
    void Stop() override;

  private:
    void Fetch(const FeatureRun& run);

    OGRLayer& moLayer;
    std::vector<OGRFeatureUniquePtr> moFeatures; ///< by id, from the first of the run on
    std::int64_t mnFirst = 0;
    std::size_t mnNext = 0;
};

void IndexReader::Start(const FeatureRun& run) {
    moFeatures.clear();
    mnFirst = run.mnFirst;
    mnNext = 0;
    // Ids of such a layer count its features. A run that says otherwise is not of this file: it
    // then ends at once, which the caller takes for a change of the file.
    const std::int64_t count = run.mnLast - run.mnFirst + 1;
    if (count != run.mnFeatures || count > moLayer.GetFeatureCount(FALSE))
        return;
    moFeatures.resize(static_cast<std::size_t>(count));
    Fetch(run);
    Stop();
}

/// Features that lie in the box by chance are dropped. Their number is bounded, since a box may
/// hold the whole layer.
void IndexReader::Fetch(const FeatureRun& run) {
    moLayer.SetSpatialFilterRect(run.mdfLowX, run.mdfLowY, run.mdfHighX, run.mdfHighY);
    moLayer.ResetReading();
    for (std::size_t left = 4 * moFeatures.size() + 1000; left > 0; --left) {
        OGRFeatureUniquePtr feature(moLayer.GetNextFeature());
        if (!feature)
            return;
        const std::int64_t number = feature->GetFID() - mnFirst;
        if (number >= 0 && number < static_cast<std::int64_t>(moFeatures.size()))
            moFeatures[static_cast<std::size_t>(number)] = std::move(feature);
    }
}

OGRFeatureUniquePtr IndexReader::Next() {
    if (mnNext == moFeatures.size())
        return nullptr;
    OGRFeatureUniquePtr feature = std::move(moFeatures[mnNext]);
    if (!feature)
        feature.reset(moLayer.GetFeature(mnFirst + static_cast<std::int64_t>(mnNext)));
    ++mnNext;
    return feature;
}

void IndexReader::Stop() {
    moLayer.SetSpatialFilter(nullptr);
}

} // namespace

std::unique_ptr<RunReader> ReadRunsByPosition(OGRLayer& layer) {
    if (!layer.TestCapability(OLCFastSetNextByIndex))
        return nullptr;
    return std::make_unique<PositionReader>(layer);
}

std::unique_ptr<RunReader> ReadRunsByQuery(OGRLayer& layer) {
    if (*layer.GetFIDColumn() == '\0')
        return nullptr;
    return std::make_unique<QueryReader>(layer);
}

std::unique_ptr<RunReader> ReadRunsByIndex(OGRLayer& layer) {
    if (!layer.TestCapability(OLCFastSpatialFilter) || !layer.TestCapability(OLCRandomRead))
        return nullptr;
    return std::make_unique<IndexReader>(layer);
}

} // namespace kelm::store

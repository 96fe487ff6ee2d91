#include "services/bundled/store/runs/featureblocks.h"

#include <algorithm>

namespace kelm::store {

namespace {

/// A reader may keep a whole run in memory.
constexpr std::int64_t MOST_JOINED = 8192;

/// Calls a function with each field of a run.
template <typename Run, typename Function>
void Visit(Run& run, const Function& function) {
    function(run.mnFirst);
    function(run.mnLast);
    function(run.mnFeatures);
    function(run.mnShapes);
    function(run.mnPolygons);
    function(run.mdfLowX);
    function(run.mdfLowY);
    function(run.mdfHighX);
    function(run.mdfHighY);
}

bool IsMet(const FeatureRun& block, const ZARVertex& low, const ZARVertex& high) {
    return high.x >= block.mdfLowX && block.mdfHighX >= low.x && high.y >= block.mdfLowY &&
           block.mdfHighY >= low.y;
}

/// A reader may keep a place for each id between the first and the last.
bool CanBeRead(const FeatureRun& run) {
    constexpr std::int64_t MOST_FEATURES = std::int64_t{1} << 31U;
    const std::uint64_t span =
        static_cast<std::uint64_t>(run.mnLast) - static_cast<std::uint64_t>(run.mnFirst);
    return run.mnFirst <= run.mnLast && span < std::uint64_t{1} << 62U && run.mnFeatures > 0 &&
           run.mnFeatures <= MOST_FEATURES;
}

/// Adds the run that follows right behind.
void Join(FeatureRun& run, const FeatureRun& next) {
    run.mnLast = next.mnLast;
    run.mnFeatures += next.mnFeatures;
    run.mdfLowX = std::min(run.mdfLowX, next.mdfLowX);
    run.mdfLowY = std::min(run.mdfLowY, next.mdfLowY);
    run.mdfHighX = std::max(run.mdfHighX, next.mdfHighX);
    run.mdfHighY = std::max(run.mdfHighY, next.mdfHighY);
}

} // namespace

void FeatureBlocks::AddFeature(std::int64_t id, std::int64_t shapes, std::size_t polygons) {
    mbRising = mbRising && (moBlocks.empty() || id > moBlocks.back().mnLast);
    if (moBlocks.empty() || moBlocks.back().mnFeatures == mnPerBlock)
        StartBlock(id, shapes, polygons);
    moBlocks.back().mnLast = id;
    ++moBlocks.back().mnFeatures;
    ++mnFeatures;
}

void FeatureBlocks::StartBlock(std::int64_t id, std::int64_t shapes, std::size_t polygons) {
    if (moBlocks.size() == MOST_BLOCKS)
        JoinPairs();
    FeatureRun block;
    block.mnFirst = id;
    block.mnShapes = shapes;
    block.mnPolygons = polygons;
    moBlocks.push_back(block);
}

void FeatureBlocks::JoinPairs() {
    for (std::size_t i = 0; i < MOST_BLOCKS; i += 2) {
        moBlocks[i / 2] = moBlocks[i];
        Join(moBlocks[i / 2], moBlocks[i + 1]);
    }
    moBlocks.resize(MOST_BLOCKS / 2);
    mnPerBlock *= 2;
}

void FeatureBlocks::AddRing(const std::vector<ZARVertex>& vertices) {
    FeatureRun& block = moBlocks.back();
    for (const ZARVertex& vertex : vertices) {
        block.mdfLowX = std::min(block.mdfLowX, vertex.x);
        block.mdfLowY = std::min(block.mdfLowY, vertex.y);
        block.mdfHighX = std::max(block.mdfHighX, vertex.x);
        block.mdfHighY = std::max(block.mdfHighY, vertex.y);
    }
}

std::vector<FeatureRun> FeatureBlocks::Find(const ZARVertex& low, const ZARVertex& high) const {
    std::vector<FeatureRun> runs;
    bool joins = false;
    for (const FeatureRun& block : moBlocks) {
        const bool met = IsMet(block, low, high);
        if (met && joins && runs.back().mnFeatures + block.mnFeatures <= MOST_JOINED)
            Join(runs.back(), block);
        else if (met)
            runs.push_back(block);
        joins = met;
    }
    return runs;
}

std::int64_t FeatureBlocks::CountShapes(const ZARVertex& low, const ZARVertex& high,
                                        std::int64_t all) const {
    std::int64_t shapes = 0;
    for (std::size_t i = 0; i < moBlocks.size(); ++i) {
        const std::int64_t behind = i + 1 < moBlocks.size() ? moBlocks[i + 1].mnShapes : all;
        shapes += IsMet(moBlocks[i], low, high) ? behind - moBlocks[i].mnShapes : 0;
    }
    return shapes;
}

void FeatureBlocks::Write(ByteWriter& bytes) const {
    bytes.Put(static_cast<unsigned char>(mbRising));
    bytes.Put(static_cast<std::uint64_t>(moBlocks.size()));
    for (const FeatureRun& block : moBlocks)
        Visit(block, [&](const auto& field) { bytes.Put(field); });
}

bool FeatureBlocks::Read(ByteReader& bytes, std::size_t polygons) {
    mbRising = bytes.Get<unsigned char>() != 0;
    moBlocks.resize(bytes.GetCount(9 * sizeof(std::int64_t)));
    mnFeatures = 0;
    bool sound = true;
    for (FeatureRun& block : moBlocks) {
        Visit(block,
              [&](auto& field) { field = bytes.Get<std::remove_reference_t<decltype(field)>>(); });
        sound = sound && block.mnPolygons <= polygons && (!mbRising || CanBeRead(block));
        mnFeatures += sound ? block.mnFeatures : 0;
    }
    return sound && moBlocks.size() <= MOST_BLOCKS;
}

} // namespace kelm::store

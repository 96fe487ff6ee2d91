#include "services/bundled/store/runs/featureblocks.h"

#include <algorithm>

namespace kelm::store {

namespace {

/// A reader may keep a whole run in memory.
constexpr std::int64_t MOST_JOINED = 8192;

bool IsMet(const FeatureRun& block, const ZARVertex& low, const ZARVertex& high) {
    return high.x >= block.mdfLowX && block.mdfHighX >= low.x && high.y >= block.mdfLowY &&
           block.mdfHighY >= low.y;
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

} // namespace kelm::store

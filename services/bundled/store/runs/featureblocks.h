#pragma once

#include "services/bundled/store/runs/bytes.h"
#include "services/bundled/store/runs/featurerun.h"
#include "services/vectorlayer.h"

#include <vector>

namespace kelm::store {

/// Where the features of a layer lie: a box for each block of features that follow each other.
///
/// The boxes are those of the corners that are delivered, to the bit, so what lies beside a box
/// shares no point with any shape of its block. All blocks but the last have the same number of
/// features. It doubles whenever there would be too many blocks, so the memory has a bound whatever
/// the layer holds.
class FeatureBlocks {
  public:
    /// Most blocks that are kept: 5 MB.
    static constexpr std::size_t MOST_BLOCKS = 65536;

    /// Takes note of the next feature in reading order. @param shapes,polygons see FeatureRun
    void AddFeature(std::int64_t id, std::int64_t shapes, std::size_t polygons);
    /// Takes note of a shape that is delivered, of the feature that was added last.
    void AddRing(const std::vector<ZARVertex>& vertices);

    /// @return true if feature ids rise in reading order, so that ids tell a run
    bool AreRising() const { return mbRising; }
    std::int64_t GetFeatureCount() const { return mnFeatures; }
    /// @return the blocks whose box shares a point with a window, in reading order; neighbours are
    /// joined to runs of some thousand features
    std::vector<FeatureRun> Find(const ZARVertex& low, const ZARVertex& high) const;
    /// @param all shapes of the layer @return the shapes of the blocks that Find gives
    std::int64_t CountShapes(const ZARVertex& low, const ZARVertex& high, std::int64_t all) const;

    void Write(ByteWriter& bytes) const;
    /// @param polygons the layer's polygons that are no triangles
    /// @return false if these are not the blocks of a layer
    bool Read(ByteReader& bytes, std::size_t polygons);

  private:
    void StartBlock(std::int64_t id, std::int64_t shapes, std::size_t polygons);
    void JoinPairs();

    std::vector<FeatureRun> moBlocks;
    std::int64_t mnFeatures = 0;
    std::int64_t mnPerBlock = 1;
    bool mbRising = true;
};

} // namespace kelm::store

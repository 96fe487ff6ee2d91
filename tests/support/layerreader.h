#pragma once

#include "services/vectorlayer.h"

#include <array>
#include <memory>
#include <string>
#include <vector>

namespace kelm::test {

using FilePtr = std::unique_ptr<_iobuf, decltype(&ZARClose)>;
using Ring = std::vector<std::array<double, 3>>;

/// All that a caller of the store learns of a layer.
struct LayerContents {
    int mnType = 0;
    int mnCount = 0;
    ZARVertex moLow{};
    ZARVertex moHigh{};
    std::string moCrs;
    std::vector<int> moIds;
    std::vector<Ring> moRings; ///< of each id; empty if the store refuses the shape
};

FilePtr OpenFile(const std::string& path);

/// @return the ring of a shape; empty if the store refuses it
Ring ReadShape(ZARLayer_t* poLayer, int nId);

/// Reads a layer by one walk, and tests that the count is the one of the record.
LayerContents ReadLayer(_iobuf* poFile, int nSegment = 1);
LayerContents ReadLayer(const std::string& path);

/// @return the number of vertices of each shape
std::vector<std::size_t> CountVertices(const LayerContents& oContents);

} // namespace kelm::test
